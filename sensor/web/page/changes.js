// What is different between the paths of two moments. Nothing here touches the page.

import { initiatorName, number, portName } from "./format.js";

const nameOf = (unit) => unit.multipath ?? unit.paths.find((path) => path.disk)?.disk ?? unit.wwid ?? unit.id;
const pathsOf = (unit) => `${number(unit.running)} of ${number(unit.expected)} paths run`;

/** The state of each remote port as each local port sees it, and of each local port, by a name for people. */
function portStates(units) {
  const states = new Map();
  for (const path of units.flatMap((unit) => unit.paths)) {
    states.set(`Local port ${initiatorName(path.initiator)}`, path.initiatorState);
    if (path.remotePort) {
      states.set(`${portName(path.remotePort)} from ${initiatorName(path.initiator)}`, path.remotePortState);
    }
  }
  return states;
}

function differences(before, after, textOf) {
  const changes = [];
  for (const key of new Set([...before.keys(), ...after.keys()])) {
    const texts = [before, after].map((side) => (side.has(key) ? textOf(side.get(key)) : "not there"));
    if (texts[0] !== texts[1]) {
      changes.push({ key, before: texts[0], after: texts[1] });
    }
  }
  return changes;
}

/** [{what, before, after}], of two lists of LUNs as the document of the paths has them: ports first. */
export function findChanges(before, after) {
  const ports = differences(portStates(before), portStates(after), (state) => state ?? "not known")
    .map((change) => ({ what: change.key, before: change.before, after: change.after }));
  const [old, now] = [before, after].map((units) => new Map(units.map((unit) => [unit.id, unit])));
  const luns = differences(old, now, (unit) => [pathsOf(unit), ...(unit.mounts ?? [])].join(", "))
    .map((change) => ({ what: `LUN ${nameOf(now.get(change.key) ?? old.get(change.key))}`, before: change.before, after: change.after }))
    .sort((one, other) => one.what.localeCompare(other.what, "en", { numeric: true }));
  return [...ports, ...luns];
}
