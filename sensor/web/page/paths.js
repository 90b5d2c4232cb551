// The view of the paths: local port, remote port, LUN, disk. What has trouble stands first.

import * as api from "./api.js";
import { writeAddress } from "./address.js";
import { button, element, figure, make, PagedTable } from "./dom.js";
import { initiatorName, number, plural, portName } from "./format.js";
import { drawMap } from "./pathmap.js";
import { troubleBox } from "./troubles.js";

const table = new PagedTable(element("paths-units"), "LUNs and their paths", 100);
/** The worst first; the words of the document for what is left of a LUN's redundancy. */
const redundancies = { none: "no path", lost: "last path", reduced: "paths missing", unknown: "not known", whole: "whole" };

let units = [];
let initiators = [];
let onlyTrouble = false;

const rank = (unit) => Object.keys(redundancies).indexOf(unit.redundancy);
const isWhole = (unit) => unit.redundancy === "whole";

/** "mpatha", else the first disk, else the wwid. */
const nameOf = (unit) => unit.multipath ?? unit.paths.find((path) => path.disk)?.disk ?? unit.wwid ?? unit.id;

/** Why a path carries no I/O, in the kernel's word. */
function stateOf(path) {
  const states = [path.initiatorState, path.remotePortState, path.state];
  return states.find((state) => state && !["Online", "running"].includes(state)) ?? path.state ?? "not known";
}

/** One path: its disk and a dot; the state in words where it does not run. */
function chip(path) {
  const route = `${initiatorName(path.initiator)} → ${path.remotePort ? portName(path.remotePort) : "unknown port"} → LUN ${path.lun}, ${path.address}`;
  const runs = path.running === true;
  const made = make("span", [make("span", "", `dot ${runs ? "good" : path.running === null ? "unknown" : "bad"}`),
    ` ${path.disk ?? path.address}${runs ? "" : ` ${stateOf(path)}`}`], `chip${runs ? "" : " trouble-chip"}`);
  made.title = `${route}: ${stateOf(path)}`;
  return made;
}

const keyOf = (initiator) => initiator.wwpn ?? initiator.host;

function rowOf(unit) {
  const numbers = [...new Set(unit.paths.map((path) => path.lun))].join(", ");
  return [
    make("span", [make("b", nameOf(unit)), unit.wwid && nameOf(unit) !== unit.wwid ? make("span", ` ${unit.wwid}`, "quiet small") : ""]),
    figure(numbers), [unit.vendor, unit.model].filter(Boolean).join(" ") || "–", (unit.mounts ?? []).join(", ") || "–",
    { text: `${number(unit.running)} of ${number(unit.expected)}`, number: true, className: isWhole(unit) ? "" : "worse" },
    { text: redundancies[unit.redundancy] ?? unit.redundancy, className: isWhole(unit) ? "" : "worse" },
    ...initiators.map((initiator) => {
      const mine = unit.paths.filter((path) => keyOf(path.initiator) === keyOf(initiator));
      return mine.length === 0 ? "–" : make("span", mine.map(chip), "chips");
    }),
  ];
}

function textOf(unit) {
  return [nameOf(unit), unit.wwid, unit.vendor, unit.model, ...(unit.mounts ?? []),
    ...unit.paths.flatMap((path) => [path.disk, path.address, path.remotePort?.name, path.remotePort?.wwpn, path.initiator.host])].filter(Boolean).join(" ").toLowerCase();
}

function showUnits() {
  const wanted = element("paths-find").value.trim().toLowerCase();
  const shown = units.filter((unit) => (!onlyTrouble || !isWhole(unit)) && (wanted === "" || textOf(unit).includes(wanted)));
  table.fill(["LUN", { text: "Number", number: true }, "Array", "Mounted", { text: "Paths", number: true }, "Redundancy", ...initiators.map(initiatorName)],
    shown.map(rowOf), units.length === 0 ? "No LUN is known." : "No LUN matches the filter.");
  element("paths-only").setAttribute("aria-pressed", String(onlyTrouble));
  writeAddress("paths", { find: element("paths-find").value.trim(), only: onlyTrouble ? "trouble" : "" });
}

export async function open(parameters) {
  element("paths-find").value = parameters.find ?? "";
  onlyTrouble = parameters.only === "trouble";
  let answer;
  try {
    answer = await api.paths();
  } catch (problem) {
    element("paths-text").textContent = `The paths are not known: ${problem.message}.`;
    element("paths-known").hidden = true;
    return;
  }
  units = [...(answer.luns ?? [])].sort((one, other) => rank(one) - rank(other) || nameOf(one).localeCompare(nameOf(other), "en", { numeric: true }));
  const byKey = new Map(units.flatMap((unit) => unit.paths).map((path) => [keyOf(path.initiator), path.initiator]));
  initiators = [...byKey.values()].sort((one, other) => initiatorName(one).localeCompare(initiatorName(other), "en", { numeric: true }));
  const bad = units.filter((unit) => !isWhole(unit)).length;
  element("paths-text").textContent = answer.luns === null ? "The paths are not known yet: no scan of this host has been stored." : units.length === 0 ? "No LUN is known: no disk of this host is behind a Fibre Channel port."
    : bad === 0 ? `${plural(units.length, "LUN")}, all with all their paths.` : `${plural(bad, "LUN")} of ${number(units.length)} with trouble.`;
  element("paths-text").className = `headline ${bad > 0 ? "bad" : units.length === 0 ? "" : "good"}`;
  element("paths-known").hidden = units.length === 0;
  element("paths-troubles").replaceChildren(...(answer.troubles ?? []).map(troubleBox));
  drawMap(element("paths-map"), units);
  showUnits();
}

export function start() {
  element("paths-find").addEventListener("input", showUnits);
  element("paths-bar").append(button("Only with trouble", () => {
    onlyTrouble = !onlyTrouble;
    showUnits();
  }));
  element("paths-bar").lastChild.id = "paths-only";
}
