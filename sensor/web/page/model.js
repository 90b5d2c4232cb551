// What the chart shows, out of a timeline document: lanes and their cells. Nothing here touches the page.

import { initiatorName, portName } from "./format.js";
import { kindOf, worstOf } from "./kinds.js";

/** Up to so much behind the right edge, a run that goes on has not been noted yet. */
const slack = 90000;

/** Of a port's name the words up to the first with a digit ("array7 ctrl-A port 0" and "array7 ctrl-B" are of array7), or, where
 *  that is none or the last, all words but the last. */
function arrayOfName(name) {
  const words = name.split(" ");
  const number = words.findIndex((word) => /\d/.test(word));
  const count = number >= 0 && number < words.length - 1 ? number + 1 : words.length - 1;
  return words.slice(0, Math.max(1, count)).join(" ");
}

/** An array is named by its administrator, else by its maker's words and node name. */
export function arrayOf(port) {
  if (port.name) {
    return arrayOfName(port.name);
  }
  const maker = [port.vendor, port.model].filter(Boolean).join(" ").trim();
  const node = port.wwnn ?? "";
  if (maker === "" && node === "") {
    return "Ports of unknown arrays";
  }
  return maker === "" ? `Node ${node}` : `${maker}${node === "" ? "" : ` ${node}`}`;
}

function addCells(lane, row) {
  for (const [column, count, spread] of row.cells) {
    const cell = lane.cells.get(column) ?? { count: 0, spread: 0, kinds: new Map() };
    cell.count += count;
    cell.spread += spread;
    cell.kinds.set(row.kind, (cell.kinds.get(row.kind) ?? 0) + count);
    lane.cells.set(column, cell);
    lane.total += count;
  }
  lane.kinds.set(row.kind, row.cells.reduce((sum, [, count]) => sum + count, lane.kinds.get(row.kind) ?? 0));
}

const makeLane = (type, key, label, owner) => ({ type, key, label, owner, total: 0, cells: new Map(), kinds: new Map(), links: [] });

/** Severe kinds weigh more than any number of lesser ones. */
export function weigh(lane) {
  return lane.total === 0 ? 0 : worstOf(lane.kinds.keys()).level * 1e15 + lane.total;
}

const worstFirst = (one, other) => weigh(other) - weigh(one) || one.label.localeCompare(other.label);

/** Stretches in which something could not be seen: Tavik did not run, lost something, or did not hear a kind. */
export function findBlind(document, from, to, now) {
  const blind = [];
  let seenTo = from;
  for (const run of document.runs) {
    if (Date.parse(run.from) > seenTo) {
      blind.push({ from: seenTo, to: Math.min(Date.parse(run.from), to), why: "Tavik did not run", isTotal: true });
    }
    seenTo = Math.max(seenTo, Date.parse(run.to));
  }
  if (seenTo + slack < Math.min(to, now)) {
    blind.push({ from: seenTo, to: Math.min(to, now), why: "Tavik did not run", isTotal: true });
  }
  for (const gap of document.gaps) {
    blind.push({ from: Date.parse(gap.from), to: Date.parse(gap.to), why: "events were lost", isTotal: true });
  }
  // All kinds that were not heard in one stretch are one stretch.
  const deaf = new Map();
  for (const state of document.coverage) {
    if (state.state !== "off") {
      const key = `${state.from} ${state.to} ${state.state}`;
      deaf.set(key, { state, kinds: new Set([...(deaf.get(key)?.kinds ?? []), state.kind]) });
    }
  }
  for (const { state, kinds } of deaf.values()) {
    const isOpen = Date.parse(state.to) + slack > now;
    blind.push({ from: Date.parse(state.from), to: isOpen ? now : Date.parse(state.to),
      why: `deaf for ${[...kinds].join(", ")} (${state.state.replace("_", " ")})`, isTotal: false });
  }
  return blind.filter((stretch) => stretch.to > from && stretch.from < to);
}

/** @param filter  {families: names or null for all, text}
 *  @param before  the model that was shown, whose order of lanes is kept; or null
 *  @param unfolded  names of the arrays whose quiet ports are shown */
export function makeModel(document, { filter, before, unfolded, now }) {
  const from = Date.parse(document.from);
  const to = Date.parse(document.to);
  const initiators = new Map();
  const ports = new Map();
  const initiatorLane = (initiator) => {
    const key = `initiator ${initiator.wwpn ?? initiator.host}`;
    if (!initiators.has(key)) {
      initiators.set(key, makeLane("initiator", key, initiatorName(initiator), initiator));
    }
    return initiators.get(key);
  };
  const portLane = (port) => {
    if (!ports.has(port.wwpn)) {
      ports.set(port.wwpn, makeLane("port", port.wwpn, portName(port), port));
    }
    return ports.get(port.wwpn);
  };
  for (const port of document.remotePorts ?? []) {
    portLane(port);
  }
  for (const link of document.links ?? []) {
    initiatorLane(link.initiator).links.push({ from: Date.parse(link.from), to: Date.parse(link.to), state: link.state });
  }
  for (const row of document.rows) {
    const isShown = filter.families === null || filter.families.includes(kindOf(row.kind).family.name);
    const lane = row.remotePort === null ? initiatorLane(row.initiator) : portLane(row.remotePort);
    if (isShown) {
      addCells(lane, row);
    }
  }
  const wanted = filter.text.toLowerCase();
  const matches = (lane) => wanted === "" || `${lane.label} ${lane.key} ${arrayOf(lane.owner)}`.toLowerCase().includes(wanted);

  const groups = new Map();
  for (const lane of [...ports.values()].filter(matches)) {
    const name = arrayOf(lane.owner);
    groups.set(name, [...(groups.get(name) ?? []), lane]);
  }
  const keep = (lanes) => keepOrder(lanes.sort(worstFirst), before);
  const lanes = [];
  const own = keep([...initiators.values()]);
  if (own.length > 0) {
    lanes.push({ ...makeLane("head", "head local", "Local ports", null) }, ...own);
  }
  const worst = (lanes) => Math.max(...lanes.map(weigh));
  const sorted = keepOrder([...groups].sort(([oneName, one], [otherName, other]) => worst(other) - worst(one) || oneName.localeCompare(otherName))
    .map(([name, members]) => ({ key: `head ${name}`, name, members })), before);
  for (const { key, name, members } of sorted) {
    members.forEach((lane) => { lane.short = lane.label.startsWith(`${name} `) ? lane.label.slice(name.length + 1) : lane.label; });
    const loud = keep(members.filter((lane) => lane.total > 0));
    const quiet = members.filter((lane) => lane.total === 0).sort((one, other) => one.label.localeCompare(other.label));
    const head = makeLane("head", key, name, null);
    head.total = loud.reduce((sum, lane) => sum + lane.total, 0);
    lanes.push(head, ...loud);
    if (quiet.length > 0) {
      const isOpen = unfolded.has(name);
      const fold = makeLane("fold", `fold ${name}`, `${isOpen ? "▾" : "▸"} ${quiet.length} quiet`, null);
      lanes.push({ ...fold, array: name, isOpen }, ...(isOpen ? quiet : []));
    }
  }
  return {
    from, to, columns: document.columns, width: (to - from) / document.columns, now, lanes,
    most: Math.max(10, ...lanes.flatMap((lane) => [...lane.cells.values()].map((cell) => cell.count))),
    blind: findBlind(document, from, to, now),
    marks: document.marks.map((mark) => ({ name: mark.name, at: Date.parse(mark.time) })),
    counters: document.counters ?? [],
    total: lanes.reduce((sum, lane) => sum + (lane.type === "port" || lane.type === "initiator" ? lane.total : 0), 0),
  };
}

/** Rows stay in place while time goes on: what was shown keeps its order, and what is new comes behind. */
function keepOrder(lanes, before) {
  if (!before) {
    return lanes;
  }
  const place = new Map(before.lanes.map((lane, index) => [lane.key, index]));
  const rank = (lane) => place.get(lane.key) ?? Infinity;
  return lanes.map((lane, index) => ({ lane, index }))
    .sort((one, other) => (rank(one.lane) === rank(other.lane) ? one.index - other.index : rank(one.lane) - rank(other.lane)))
    .map(({ lane }) => lane);
}

export const hasCells = (lane) => lane.type === "port" || lane.type === "initiator";

export const columnOf = (model, at) => Math.floor((at - model.from) / model.width);

/** [from, to] of a column. */
export function spanOf(model, column) {
  return [model.from + column * model.width, model.from + (column + 1) * model.width];
}

/** Why nothing, or not everything, could be seen in a span; "" where all could be. */
export function whyBlind(model, [from, to]) {
  return [...new Set(model.blind.filter((stretch) => stretch.from < to && stretch.to > from).map((stretch) => stretch.why))].join("; ");
}
