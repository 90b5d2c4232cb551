// A drawing of who reaches what: local ports on the left, remote ports by array in the middle, LUNs on the right.

import { initiatorName, number, plural, portName } from "./format.js";
import { arrayOf } from "./model.js";

const space = "http://www.w3.org/2000/svg";
const rowHeight = 26;
const [left, middle, right, width] = [150, 470, 800, 960];

function shape(name, attributes, text = "") {
  const made = document.createElementNS(space, name);
  for (const [key, value] of Object.entries(attributes)) {
    made.setAttribute(key, value);
  }
  made.textContent = text;
  return made;
}

const healthOf = (paths) => (paths.every((path) => path.running === true) ? "good" : paths.some((path) => path.running === true) ? "some" : "bad");
const words = { good: "all run", some: "some do not run", bad: "none runs" };

/** Paths by a key, in the order in which the keys come. */
function group(paths, keyOf) {
  const groups = new Map();
  for (const path of paths) {
    const key = keyOf(path);
    groups.set(key, [...(groups.get(key) ?? []), path]);
  }
  return groups;
}

function curve(fromX, fromY, toX, toY, paths, title) {
  const bend = (toX - fromX) / 2;
  const line = shape("path", { d: `M${fromX} ${fromY} C${fromX + bend} ${fromY} ${toX - bend} ${toY} ${toX} ${toY}`, class: `route ${healthOf(paths)}` });
  line.append(shape("title", {}, `${title}: ${plural(paths.length, "path")}, ${words[healthOf(paths)]}`));
  return line;
}

/** Draws into the place. Many ports make a drawing that nobody reads: then the tables alone are shown. */
export function drawMap(place, units) {
  place.replaceChildren();
  const paths = units.flatMap((unit) => unit.paths.map((path) => ({ ...path, array: arrayOf({ ...path.remotePort, vendor: unit.vendor, model: unit.model }) })))
    .filter((path) => path.remotePort);
  const byInitiator = group(paths, (path) => initiatorName(path.initiator));
  const byPort = group(paths, (path) => path.remotePort.wwpn);
  place.hidden = paths.length === 0 || byPort.size > 48;
  if (place.hidden) {
    return;
  }
  const ports = [...byPort].sort(([, [one]], [, [other]]) => one.array.localeCompare(other.array) || portName(one.remotePort).localeCompare(portName(other.remotePort)));
  const hosts = [...byInitiator].sort(([one], [other]) => one.localeCompare(other, "en", { numeric: true }));
  const arrays = group(ports.map(([wwpn, [path]]) => ({ wwpn, array: path.array })), ({ array }) => array);
  const rows = ports.length + arrays.size;
  const height = Math.max(rows, hosts.length) * rowHeight + 8;
  const drawing = shape("svg", { viewBox: `0 0 ${width} ${height}`, class: "map", role: "img",
    "aria-label": `${plural(hosts.length, "local port")} reach ${plural(ports.length, "remote port")}. The table below has the same.` });
  const portY = new Map();
  let y = 0;
  for (const [array, members] of arrays) {
    y += rowHeight;
    drawing.append(shape("text", { x: middle - 70, y: y - 8, class: "array" }, array));
    const top = y;
    for (const { wwpn } of members) {
      portY.set(wwpn, y + rowHeight / 2);
      y += rowHeight;
    }
    const own = paths.filter((path) => path.array === array);
    const luns = new Set(units.filter((unit) => unit.paths.some((path) => own.some(({ address }) => address === path.address))).map((unit) => unit.id));
    const center = (top + y) / 2;
    for (const { wwpn } of members) {
      drawing.append(curve(middle + 90, portY.get(wwpn), right, center, byPort.get(wwpn), portName(byPort.get(wwpn)[0].remotePort)));
    }
    drawing.append(shape("text", { x: right + 8, y: center + 4 }, plural(luns.size, "LUN")));
  }
  hosts.forEach(([name, own], index) => {
    const at = (height / (hosts.length + 1)) * (index + 1);
    drawing.append(shape("text", { x: left - 8, y: at + 4, "text-anchor": "end" }, name));
    for (const [wwpn, shared] of group(own, (path) => path.remotePort.wwpn)) {
      drawing.append(curve(left, at, middle - 76, portY.get(wwpn), shared, `${name} to ${portName(shared[0].remotePort)}`));
    }
  });
  for (const [wwpn, own] of ports) {
    const box = shape("rect", { x: middle - 76, y: portY.get(wwpn) - 10, width: 166, height: 20, rx: 3, class: `port ${healthOf(own)}` });
    const state = own.find((path) => path.remotePortState && path.remotePortState !== "Online")?.remotePortState;
    box.append(shape("title", {}, `${portName(own[0].remotePort)} ${wwpn}: ${number(own.length)} paths, ${state ?? words[healthOf(own)]}`));
    drawing.append(box, shape("text", { x: middle - 70, y: portY.get(wwpn) + 4 }, shortName(own[0], state)));
  }
  place.append(drawing);
}

/** Without the array's name, which stands above. */
function shortName(path, state) {
  const name = portName(path.remotePort);
  const own = name.startsWith(`${path.array} `) ? name.slice(path.array.length + 1) : name;
  return state ? `${own}: ${state}` : own;
}
