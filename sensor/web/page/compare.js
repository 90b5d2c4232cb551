// Before and after a mark, or of two ranges that were chosen in the timeline: what `tavik diff` says, on the page.

import * as api from "./api.js";
import { makeAddress, readSpan, writeAddress, writeSpan } from "./address.js";
import { changeRows, passingRows } from "./changes.js";
import { element, figure, fillTable, link } from "./dom.js";
import { kindCell } from "./episodes.js";
import { duration, number, plural, portName, shortTime, span } from "./format.js";
import { kindOf, kinds } from "./kinds.js";
import { findBlind } from "./model.js";
import { quote } from "./words.js";

const hour = 3600000;
const mostChanges = 200;
const longest = 30 * 24 * hour;

let turn = 0; // counts questions: only the newest answer is shown

/** [from, to] of the stretches that the rates are of: whole minutes, so that their ends are not quite the two moments. */
function stretchesOf(document) {
  const [before, after] = [Date.parse(document.endBefore), Date.parse(document.endAfter)];
  return [[before - document.secondsBefore * 1000, before], [after - document.secondsAfter * 1000, after]];
}

const rateText = (value) => (value === 0 ? "0" : value < 1 ? value.toFixed(2) : value < 10 ? value.toFixed(1) : number(Math.round(value)));

/** What became of a rate, and how much that is: new and gone ones are more than those that only grew or shrank. */
function changeOf(before, after, isDifferent) {
  if (!isDifferent) {
    return { text: "none", weight: 0, className: "quiet" };
  }
  if (before === 0) {
    return { text: "new", weight: 1e6 + after, className: "worse" };
  }
  if (after === 0) {
    return { text: "gone", weight: 1e5 + before, className: "better" };
  }
  const ratio = Math.max(before / after, after / before);
  return { text: `${after > before ? "×" : "÷"} ${ratio < 10 ? ratio.toFixed(1) : number(Math.round(ratio))}`,
    weight: ratio, className: after > before ? "worse" : "better" };
}

function showRates(document) {
  const stretches = stretchesOf(document);
  const range = writeSpan([Math.min(...stretches.flat()), Math.max(...stretches.flat())]);
  const place = (kind) => kinds.indexOf(kindOf(kind));
  const rows = document.rates.map((row) => {
    const rates = [(row.before * 3600) / document.secondsBefore, (row.after * 3600) / document.secondsAfter];
    return { ...row, rates, change: changeOf(...rates, row.different) };
  }).sort((one, other) => other.different - one.different || kindOf(other.kind).level - kindOf(one.kind).level
    || other.change.weight - one.change.weight || place(one.kind) - place(other.kind));
  fillTable(element("compare-rates"),
    ["Port", "Kind", { text: "Before, events an hour", number: true }, { text: "After, events an hour", number: true }, { text: "Counts", number: true }, "Difference"],
    rows.map((row) => [
      row.remotePort === null ? "Local ports" : link(portName(row.remotePort), makeAddress("timeline", { range, find: row.remotePort.wwpn })),
      kindCell(row.kind), figure(rateText(row.rates[0])), figure(rateText(row.rates[1])), figure(`${number(row.before)} → ${number(row.after)}`),
      { text: row.change.text, className: row.change.className }]),
    "Nothing happened in either range. Choose longer ones.");
}

function showChanges(document) {
  const place = element("compare-changes");
  if (document.changes === null) {
    fillTable(place, ["What"], [], "Not known: no scan of this host was stored before both moments.");
    element("compare-passing").replaceChildren();
    return;
  }
  const changes = changeRows(document);
  fillTable(place, ["What", "Name", `Before, ${shortTime(document.from.time)}`, `After, ${shortTime(document.to.time)}`], changes.slice(0, mostChanges),
    "No link, remote port, LUN or path is different.");
  element("compare-more").textContent = changes.length > mostChanges ? `${plural(changes.length - mostChanges, "more row")}: tavik diff shows them.` : "";
  fillTable(element("compare-passing"), ["What", "Name", "Was in between"], passingRows(document).slice(0, mostChanges),
    "No state changed in between and changed back.");
}

function showSum(document) {
  const rates = document.rates.filter((row) => row.different).length;
  element("compare-sum").textContent = document.same === false ? `Different: ${plural((document.changes ?? []).length, "state")}, ${plural(rates, "rate")}.`
    : document.same ? `Nothing is different: no state, and none of ${number(document.rates.length)} rates.` : "No rate is different. The links, ports and paths of these moments are not known.";
  const stretches = stretchesOf(document);
  element("compare-spans").textContent = ["Before", "After"]
    .map((name, index) => `${name}: ${span(...stretches[index])} (${duration(stretches[index][1] - stretches[index][0])})`).join(" · ");
}

/** Where Tavik could not see, a rate is too low. */
async function showBlind(document, mine) {
  const parts = await Promise.all(stretchesOf(document).map(async ([from, to], index) => {
    const unseen = findBlind(await api.timeline(from, to, 1), from, to, Date.now()).filter((stretch) => stretch.isTotal)
      .reduce((sum, stretch) => sum + Math.min(to, stretch.to) - Math.max(from, stretch.from), 0);
    return unseen < 1000 ? "" : `${duration(unseen)} of ${index === 0 ? "before" : "after"}`;
  }));
  if (mine === turn) {
    const text = parts.filter(Boolean).join(" and ");
    element("compare-blind").textContent = text === "" ? "" : `Tavik could not see ${text}: the true rates may be higher.`;
  }
}

/** What the address asks for: {question, address, command}, or null. */
function readWish({ a, b, mark }) {
  const ranges = [readSpan(a), readSpan(b)];
  if (ranges.every((each) => each !== null)) {
    const [before, after] = ranges.sort(([, one], [, other]) => one - other);
    const text = (time) => new Date(time).toISOString();
    return { question: { from: text(before[1]), to: text(after[1]), "before-since": text(before[0]), "after-since": text(after[0]) },
      address: { a: writeSpan(before), b: writeSpan(after) }, command: "" };
  }
  return mark ? { question: { from: mark }, address: { mark }, command: `tavik diff ${quote(mark)}` } : null;
}

function fillMarks(marks, chosen) {
  const list = element("compare-mark");
  list.replaceChildren(new Option(marks.length === 0 ? "there is no mark" : "choose a mark", ""),
    ...marks.map((mark) => new Option(`${mark.name}, ${shortTime(mark.time)}`, mark.name)).reverse());
  list.value = marks.some(({ name }) => name === chosen) ? chosen : "";
}

export async function open(parameters) {
  turn += 1;
  const mine = turn;
  const wish = readWish(parameters);
  element("compare-how").hidden = wish !== null;
  element("compare-result").hidden = wish === null;
  try {
    const now = Date.now();
    const { marks } = await api.timeline(now - longest, now, 1);
    fillMarks(marks, parameters.mark);
    writeAddress("compare", wish?.address ?? {});
    if (wish === null) {
      return;
    }
    element("compare-command").textContent = wish.command;
    element("compare-terminal").hidden = wish.command === "";
    const document = await api.diff(wish.question);
    if (mine === turn) {
      showSum(document);
      showRates(document);
      showChanges(document);
      await showBlind(document, mine);
    }
  } catch (problem) {
    if (mine === turn) {
      element("compare-result").hidden = false;
      element("compare-sum").textContent = `Not known: ${problem.message}.`;
    }
  }
}

export function start() {
  element("compare-mark").addEventListener("change", (event) => open({ mark: event.target.value }));
}
