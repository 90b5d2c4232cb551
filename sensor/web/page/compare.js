// Before and after: two stretches of time side by side, of a mark or chosen in the timeline.

import * as api from "./api.js";
import { makeAddress, readSpan, writeAddress, writeSpan } from "./address.js";
import { findChanges } from "./changes.js";
import { element, figure, fillTable, link } from "./dom.js";
import { kindCell } from "./episodes.js";
import { duration, initiatorName, number, plural, portName, span } from "./format.js";
import { kindOf, kinds } from "./kinds.js";
import { findBlind } from "./model.js";

const hour = 3600000;
const mostChanges = 200;
const longest = 30 * 24 * hour;

let spans = null; // [[from, to], [from, to]]: before, after

/** Around a mark: as long before it as after it, a day at most. */
function around(at) {
  const long = Math.min(24 * hour, Math.max(60000, Date.now() - at));
  return [[at - long, at], [at, at + long]];
}

/** Occurrences of each port and kind in a stretch, and how much of it could be seen. */
async function count([from, to]) {
  const document = await api.timeline(from, to, 1);
  const rows = new Map();
  for (const row of document.rows) {
    const key = `${row.remotePort?.wwpn ?? `initiator ${row.initiator.wwpn}`} ${row.kind}`;
    const before = rows.get(key);
    rows.set(key, {
      label: row.remotePort === null ? initiatorName(row.initiator) : portName(row.remotePort), wwpn: row.remotePort?.wwpn ?? null, kind: row.kind,
      count: (before?.count ?? 0) + row.cells.reduce((sum, [, value]) => sum + value, 0),
    });
  }
  const unseen = findBlind(document, from, to, Date.now()).filter((stretch) => stretch.isTotal)
    .reduce((sum, stretch) => sum + Math.min(to, stretch.to) - Math.max(from, stretch.from), 0);
  return { rows, seen: Math.max(0, Math.min(to, Date.now()) - from - unseen), marks: document.marks };
}

const rate = (value, seen) => (seen === 0 ? null : (value * hour) / seen);
const rateText = (value) => (value === null ? "not seen" : value === 0 ? "0" : value < 1 ? value.toFixed(2) : value < 10 ? value.toFixed(1) : number(Math.round(value)));

/** Most changed first: new and gone ones in front of those that only grew or shrank; the worst kind where that is equal. */
function changeOf(before, after) {
  if (before === null || after === null) {
    return { text: "not known", weight: 0, className: "quiet" };
  }
  if (before === 0) {
    return { text: "new", weight: 1e6 + after, className: "worse" };
  }
  if (after === 0) {
    return { text: "gone", weight: 1e5 + before, className: "better" };
  }
  const ratio = after / before;
  const isSame = ratio < 1.25 && ratio > 0.8;
  const text = ratio >= 1 ? `× ${ratio < 10 ? ratio.toFixed(1) : number(Math.round(ratio))}` : `÷ ${1 / ratio < 10 ? (1 / ratio).toFixed(1) : number(Math.round(1 / ratio))}`;
  return { text: isSame ? "the same" : text, weight: isSame ? 0 : Math.abs(Math.log2(ratio)), className: isSame ? "quiet" : ratio > 1 ? "worse" : "better" };
}

function showRates([before, after]) {
  const keys = new Set([...before.rows.keys(), ...after.rows.keys()]);
  const rows = [...keys].map((key) => {
    const { label, wwpn, kind } = before.rows.get(key) ?? after.rows.get(key);
    const rates = [before, after].map((side) => rate(side.rows.get(key)?.count ?? 0, side.seen));
    return { label, wwpn, kind, rates, change: changeOf(...rates) };
  }).sort((one, other) => kindOf(other.kind).level - kindOf(one.kind).level || other.change.weight - one.change.weight || kinds.indexOf(kindOf(one.kind)) - kinds.indexOf(kindOf(other.kind)));
  const changed = rows.filter(({ change }) => change.text !== "the same").length;
  element("compare-sum").textContent = rows.length === 0 ? "Nothing happened in either range."
    : changed === 0 ? `The same in both ranges: ${plural(rows.length, "row")}, no rate differs by a quarter.` : `${plural(changed, "rate")} of ${number(rows.length)} differ by a quarter or more.`;
  fillTable(element("compare-rates"),
    ["Port", "Kind", { text: "Before, events an hour", number: true }, { text: "After, events an hour", number: true }, "Change"],
    rows.map((row) => [
      row.wwpn === null ? row.label : link(row.label, makeAddress("timeline", { range: writeSpan([spans[0][0], spans[1][1]].sort((one, other) => one - other)), find: row.wwpn })),
      kindCell(row.kind), figure(rateText(row.rates[0])), figure(rateText(row.rates[1])),
      { text: row.change.text, className: row.change.className }]),
    "Nothing happened in either range. Choose longer ones.");
}

/** The paths as they were at the end of either range. */
async function showChanges() {
  const place = element("compare-changes");
  try {
    const [before, after] = await Promise.all(spans.map(([, to]) => api.paths(Math.min(to, Date.now()))));
    if (before.luns === null || after.luns === null) {
      fillTable(place, ["What"], [], `The paths of ${before.luns === null ? "before" : "after"} are not known: no look at this host was stored by then.`);
      return;
    }
    const changes = findChanges(before.luns, after.luns);
    fillTable(place, ["What", "At the end of before", "At the end of after"], changes.slice(0, mostChanges).map((change) => [change.what, change.before, change.after]),
      "No port, path or mount is different.");
    element("compare-more").textContent = changes.length > mostChanges ? `${number(changes.length - mostChanges)} more differences are not shown.` : "";
  } catch (problem) {
    fillTable(place, ["What"], [], `Not known: ${problem.message}.`);
  }
}

function showSpans() {
  const texts = ["Before", "After"].map((name, index) => `${name}: ${span(...spans[index])} (${duration(spans[index][1] - spans[index][0])})`);
  element("compare-spans").textContent = texts.join(" · ");
}

export async function open(parameters) {
  const chosen = [readSpan(parameters.a), readSpan(parameters.b)];
  spans = chosen.every((each) => each !== null) ? chosen.sort(([one], [other]) => one - other) : null;
  await show(parameters.mark);
}

function fillMarks(marks, chosen) {
  const list = element("compare-mark");
  list.replaceChildren(new Option(marks.length === 0 ? "there is no mark" : "choose a mark", ""),
    ...marks.map((mark) => new Option(`${mark.name}, ${span(Date.parse(mark.time), Date.parse(mark.time)).split(" to ")[0]}`, mark.name)).reverse());
  list.value = marks.some(({ name }) => name === chosen) ? chosen : "";
}

async function show(markName) {
  const now = Date.now();
  try {
    const { marks } = await api.timeline(now - longest, now, 1);
    fillMarks(marks, markName);
    const mark = marks.find(({ name }) => name === markName);
    if (spans === null && mark) {
      spans = around(Date.parse(mark.time));
    }
    element("compare-how").hidden = spans !== null;
    element("compare-result").hidden = spans === null;
    if (spans !== null) {
      writeAddress("compare", mark && !location.hash.includes("a=") ? { mark: mark.name } : { a: writeSpan(spans[0]), b: writeSpan(spans[1]) });
      showSpans();
      showRates(await Promise.all(spans.map(count)));
      await showChanges();
    }
  } catch (problem) {
    element("compare-sum").textContent = `Not known: ${problem.message}.`;
  }
}

export function start() {
  element("compare-mark").addEventListener("change", (event) => {
    spans = null;
    writeAddress("compare", { mark: event.target.value });
    show(event.target.value);
  });
}
