// The view with the chart: its range, its cursor, what is live in it.

import * as api from "./api.js";
import { readSpan, writeSpan, makeAddress } from "./address.js";
import { drawCounters, describeCounters } from "./counters.js";
import { button, copy, element, make, PagedTable } from "./dom.js";
import { number, shortTime, span } from "./format.js";
import { leastRange, makeGrid } from "./grid.js";
import { families, kinds } from "./kinds.js";
import * as lanes from "./lanes.js";
import { columnOf, hasCells, makeModel, spanOf } from "./model.js";
import * as overview from "./overview.js";
import { swatch } from "./palette.js";
import * as panel from "./panel.js";
import { describeCell, describeColumn } from "./words.js";

const presets = [["15m", 15], ["1h", 60], ["6h", 360], ["24h", 1440], ["7d", 10080], ["30d", 43200]];
const minute = 60000;
const canvas = element("chart");
const table = new PagedTable(element("chart-table"), "Cells of the timeline");

let range = { minutes: 1440 }; // live; or {from, to}
let filter = { families: null, text: "" };
let other = null; // [from, to] to compare with
let model = null;
let layout = null;
let cursor = null; // {key, column}
let wanted = null; // {key, at, isOpen}: the cell of an address, until a chart shows it
let drag = null; // {from, to, isOther}
let missed = 0; // changes while the right edge is not now
let loading = 0; // counts questions: only the newest answer is shown
let isRangeNew = false; // since the last answer that was shown
const before = [];
const unfolded = new Set();
let onAddress = () => {};

const isLive = () => range.minutes !== undefined;
const bounds = () => (isLive() ? [Date.now() - range.minutes * minute, Date.now()] : [range.from, range.to]);
const laneOf = (key) => model.lanes.find((lane) => lane.key === key);
const isShown = () => !element("view-timeline").hidden;

// ---- the address ----

function writeState() {
  const preset = presets.find(([, minutes]) => minutes === range.minutes);
  onAddress({
    range: preset ? preset[0] : isLive() ? `${range.minutes}m` : writeSpan(bounds()),
    families: filter.families === null ? "" : filter.families.join(",") || "none",
    find: filter.text,
    compare: other === null ? "" : writeSpan(other),
    cell: cursor === null || model === null ? "" : `${cursor.key}@${new Date(spanOf(model, cursor.column)[0]).toISOString()}`,
    open: panel.isOpen() ? "1" : "",
  });
}

function readRange(text) {
  const preset = presets.find(([name]) => name === text);
  const fixed = readSpan(text);
  const minutes = Number.parseInt(text, 10);
  return preset ? { minutes: preset[1] } : fixed ? { from: fixed[0], to: fixed[1] }
    : /^\d+m$/.test(text) && minutes >= 5 && minutes <= 43200 ? { minutes } : { minutes: 1440 };
}

/** Shows what an address says. */
export async function open(parameters) {
  range = readRange(parameters.range ?? "24h");
  const names = families.map((family) => family.name);
  filter = {
    families: parameters.families ? parameters.families.split(",").filter((name) => names.includes(name)) : null,
    text: parameters.find ?? "",
  };
  element("find").value = filter.text;
  other = readSpan(parameters.compare);
  missed = 0;
  cursor = null;
  const [key, at] = (parameters.cell ?? "").split("@");
  wanted = at ? { key, at: Date.parse(at), isOpen: parameters.open === "1" } : null;
  await reload(true);
}

/** The cell of an address, once there is a chart that has it. */
function showWanted() {
  const cell = wanted;
  wanted = null;
  if (cell && laneOf(cell.key)) {
    setCursor({ key: cell.key, column: Math.min(model.columns - 1, Math.max(0, columnOf(model, cell.at))) });
    if (cell.isOpen) {
      openCell(false);
    }
  }
}

// ---- loading and drawing ----

export async function reload(isNew = false) {
  if (!isShown()) {
    return;
  }
  loading += 1;
  isRangeNew = isRangeNew || isNew;
  canvas.setAttribute("aria-busy", "true");
  const turn = loading;
  const now = Date.now();
  const [from, to] = bounds();
  showRange(from, to);
  const width = canvas.clientWidth;
  const grid = makeGrid(from, to, Math.max(50, width - lanes.gutter(width)), lanes.columnPixels);
  try {
    const document = await api.timeline(grid.from, grid.to, grid.columns);
    if (turn !== loading) {
      return;
    }
    const at = cursor && model && spanOf(model, cursor.column)[0];
    model = makeModel(document, { filter, before: isRangeNew ? null : model, unfolded, now });
    cursor = cursor && laneOf(cursor.key) ? { key: cursor.key, column: Math.min(model.columns - 1, Math.max(0, columnOf(model, at))) } : null;
    element("chart-problem").hidden = true;
  } catch (problem) {
    element("chart-problem").hidden = false;
    canvas.setAttribute("aria-busy", "false");
    element("chart-problem").textContent = `No timeline: ${problem.message}. Look at tavik status; the page asks again.`;
    return;
  }
  redraw();
  showWanted();
  drawCounters(model, width);
  fillTable();
  showEmpty();
  canvas.setAttribute("aria-busy", "false");
  if (isRangeNew) {
    isRangeNew = false;
    overview.load(now).catch(() => {}); // the chart has said what is wrong
  }
}

export function redraw() {
  if (model === null || !isShown() || canvas.clientWidth === 0) {
    return;
  }
  layout = lanes.layOut(model, canvas.clientWidth);
  const ranges = [];
  if (other !== null) {
    ranges.push({ from: Math.max(model.from, other[0]), to: Math.min(model.to, other[1]), isOther: true });
  }
  if (drag?.isMoved) {
    ranges.push({ from: Math.min(drag.from, drag.to), to: Math.max(drag.from, drag.to), isOther: drag.isOther });
  }
  lanes.drawLanes(canvas, model, layout, cursor, ranges.filter(({ from, to }) => from < to));
}

function showRange(from, to) {
  element("range-text").textContent = `${span(from, to)}${isLive() ? "" : ", fixed"}`;
  overview.show(from, to);
  for (const each of element("ranges").querySelectorAll("button")) {
    each.setAttribute("aria-pressed", String(Number(each.dataset.minutes) === range.minutes));
  }
  element("pause").setAttribute("aria-pressed", String(isLive()));
  element("pause").textContent = isLive() ? "Live" : "Paused";
  element("zoom-out").disabled = before.length === 0;
  element("missed").hidden = isLive() || missed === 0;
  element("missed").textContent = `${number(missed)} new: go to now`;
  element("compare").hidden = other === null;
  if (other !== null) {
    element("compare-text").textContent = `Second range: ${span(...other)}.`;
    element("compare-link").href = makeAddress("compare", { a: writeSpan(other), b: writeSpan([from, to]) });
  }
  for (const each of element("legend").querySelectorAll("button")) {
    each.setAttribute("aria-pressed", String(filter.families === null || filter.families.includes(each.dataset.family)));
  }
}

function showEmpty() {
  const isFiltered = filter.families !== null || filter.text !== "";
  const isFound = filter.text === "" || model.lanes.some(({ type }) => type === "port" || type === "fold");
  element("chart-empty").hidden = model.total > 0 && isFound;
  element("chart-empty").textContent = isFiltered ? "Nothing in this range matches the filter. Clear the filter to see the rest."
    : model.blind.some((stretch) => stretch.isTotal) ? "No event in this range. Where the chart is hatched, Tavik could not see. Look at a longer range."
      : "No event in this range: nothing happened. Look at a longer range for older events.";
}

/** The chart for those who do not see it. */
function fillTable() {
  const rows = model.lanes.filter(hasCells).flatMap((lane) => [...lane.cells].sort(([one], [another]) => one - another)
    .map(([column, cell]) => [lane.label, span(...spanOf(model, column)), [...cell.kinds].map(([kind, count]) => `${kind} ${number(count)}`).join(", ")]));
  for (const stretch of model.blind) {
    rows.push(["Coverage", span(stretch.from, stretch.to), stretch.why]);
  }
  for (const mark of model.marks.filter(({ at }) => at >= model.from && at <= model.to)) {
    rows.push(["Mark", shortTime(mark.at), mark.name]);
  }
  table.fill(["Row", "Time", "What"], rows, "Nothing happened in this range.");
}

// ---- range ----

function setRange(next, isBack = false) {
  if (!isBack) {
    before.push({ range, other });
  }
  range = next;
  cursor = null;
  missed = 0;
  writeState();
  return reload(true);
}

function back() {
  const last = before.pop();
  if (last) {
    other = last.other;
    setRange(last.range, true);
  }
}

function fix(from, to) {
  const middle = (from + to) / 2;
  const half = Math.max(leastRange, to - from) / 2;
  setRange({ from: Math.round(middle - half), to: Math.round(middle + half) });
}

function togglePause() {
  const [from, to] = bounds();
  setRange(isLive() ? { from, to } : { minutes: Math.min(43200, Math.max(5, Math.round((to - from) / minute))) });
}

// ---- cursor ----

function say(text) {
  element("cell-text").textContent = text;
}

function setCursor(next) {
  cursor = next;
  say(describeCell(model, laneOf(cursor.key), cursor.column));
  const row = layout?.rows.find(({ lane }) => lane.key === cursor.key);
  if (row) {
    moveCrosshair(lanes.xOf(layout, model, spanOf(model, cursor.column)[0]) + 2);
  }
  writeState();
  redraw();
}

function moveCursor(rows, columns) {
  const keys = model.lanes.filter((lane) => hasCells(lane) || lane.type === "fold").map((lane) => lane.key);
  if (keys.length === 0) {
    return;
  }
  const last = Math.min(model.columns - 1, columnOf(model, Math.min(model.now, model.to - 1)));
  const row = cursor ? keys.indexOf(cursor.key) + rows : 0;
  const column = cursor ? cursor.column + columns : last;
  setCursor({ key: keys[Math.min(keys.length - 1, Math.max(0, row))], column: Math.min(model.columns - 1, Math.max(0, column)) });
}

/** To the next trouble in time, or the one before; those of one time from top to bottom. */
function jump(direction) {
  const order = new Map(model.lanes.map((lane, index) => [lane.key, index]));
  const rank = (place) => place.column * model.lanes.length + order.get(place.key);
  const places = model.lanes.filter(hasCells).flatMap((lane) => [...lane.cells.keys()].map((column) => ({ key: lane.key, column })))
    .sort((one, another) => rank(one) - rank(another));
  if (places.length === 0) {
    say("Nothing happened in this range.");
    return;
  }
  const at = cursor ? rank(cursor) : direction > 0 ? -1 : Infinity;
  setCursor(direction > 0 ? places.find((place) => rank(place) > at) ?? places[0]
    : places.filter((place) => rank(place) < at).pop() ?? places[places.length - 1]);
}

function openCell(takesFocus = true) {
  const lane = cursor && laneOf(cursor.key);
  if (!lane) {
    return;
  }
  if (lane.type === "fold") {
    toggleFold(lane);
    return;
  }
  panel.open(model, lane, cursor.column, takesFocus);
  writeState();
}

function toggleFold(lane) {
  if (!unfolded.delete(lane.array)) {
    unfolded.add(lane.array);
  }
  reload();
}

/** A mark is named by its time, so that the command can be run as it is. */
function copyMark() {
  const at = cursor ? new Date(spanOf(model, cursor.column)[0]) : new Date();
  const name = `at-${at.toLocaleDateString("sv-SE")}-${at.toLocaleTimeString("en-GB").slice(0, 5).replace(":", "")}`;
  const isNow = Math.abs(Date.now() - at) < 2 * minute;
  copy(isNow ? `tavik mark ${name}` : `tavik mark ${name} --at ${at.toISOString()}`, null, say);
}

// ---- pointer ----

const position = (event) => {
  const box = canvas.getBoundingClientRect();
  return [event.clientX - box.left, event.clientY - box.top];
};

function moveCrosshair(x) {
  element("crosshair").hidden = x === null;
  if (x !== null) {
    element("crosshair").style.left = `${Math.round(x)}px`;
  }
}

function onMove(event) {
  if (model === null || layout === null) {
    return;
  }
  const [x, y] = position(event);
  if (drag) {
    drag.to = lanes.timeAt(layout, model, x);
    drag.isMoved = drag.isMoved || Math.abs(x - drag.x) > 5;
    redraw();
  }
  const row = lanes.rowAt(layout, y);
  canvas.dataset.over = row?.lane.type === "fold" ? "fold" : "";
  if (x < layout.gutter) {
    moveCrosshair(null);
    return;
  }
  moveCrosshair(x);
  const column = Math.min(model.columns - 1, columnOf(model, lanes.timeAt(layout, model, x)));
  const cell = row && hasCells(row.lane) && row.lane.cells.has(column);
  say(cell ? describeCell(model, row.lane, column) : [describeColumn(model, column), describeCounters(model, column)].filter(Boolean).join(" · "));
}

function onDown(event) {
  if (model === null || layout === null || event.button !== 0) {
    return;
  }
  const [x] = position(event);
  const at = lanes.timeAt(layout, model, x);
  drag = { x, from: at, to: at, isOther: event.shiftKey, isMoved: false };
  canvas.setPointerCapture(event.pointerId);
}

function onUp(event) {
  const done = drag;
  drag = null;
  if (model === null || !done) {
    return;
  }
  const [x, y] = position(event);
  if (done.isMoved) {
    const [from, to] = [done.from, done.to].sort((one, another) => one - another);
    if (done.isOther) {
      other = [Math.round(from), Math.round(to)];
      writeState();
      showRange(...bounds());
      redraw();
    } else {
      fix(from, to);
    }
    return;
  }
  const row = lanes.rowAt(layout, y);
  if (row?.lane.type === "fold") {
    toggleFold(row.lane);
  } else if (row && hasCells(row.lane) && x >= layout.gutter) {
    setCursor({ key: row.lane.key, column: Math.min(model.columns - 1, columnOf(model, lanes.timeAt(layout, model, x))) });
    openCell();
  } else {
    redraw();
  }
}

// ---- filter and legend ----

function fillLegend() {
  element("legend").replaceChildren(...families.map((family) => {
    const each = button([swatch(family), make("span", family.name)], () => toggleFamily(family.name));
    each.dataset.family = family.name;
    each.title = `${family.tells}: ${kinds.filter((kind) => kind.family === family).map((kind) => `${kind.letter} ${kind.name}`).join(", ")}`;
    return each;
  }));
  element("letters").replaceChildren(...kinds.map((kind) => make("li", [make("b", kind.letter), ` ${kind.name}`])));
}

function toggleFamily(name) {
  const names = families.map((family) => family.name);
  const chosen = new Set(filter.families ?? names);
  if (!chosen.delete(name)) {
    chosen.add(name);
  }
  filter.families = chosen.size === names.length ? null : names.filter((each) => chosen.has(each));
  writeState();
  reload();
}

const keys = {
  ArrowUp: () => moveCursor(-1, 0), ArrowDown: () => moveCursor(1, 0),
  ArrowLeft: () => moveCursor(0, -1), ArrowRight: () => moveCursor(0, 1),
  "[": () => jump(-1), "]": () => jump(1), Backspace: back, Enter: openCell, m: copyMark,
  Escape: () => { panel.close(); other = null; writeState(); showRange(...bounds()); redraw(); },
};

function startChart() {
  canvas.addEventListener("keydown", (event) => {
    if (model !== null && keys[event.key] && !event.ctrlKey && !event.altKey && !event.metaKey) {
      event.preventDefault();
      keys[event.key]();
    }
  });
  canvas.addEventListener("pointerdown", onDown);
  canvas.addEventListener("pointermove", onMove);
  canvas.addEventListener("pointerup", onUp);
  canvas.addEventListener("pointercancel", () => { drag = null; redraw(); });
  canvas.addEventListener("pointerleave", () => moveCrosshair(null));
}

/** The window changes, or the panel opens: drawn at once with what is there, and soon with columns that fit. */
function watchWidth() {
  let width = 0;
  let pending = null;
  new ResizeObserver(() => {
    if (canvas.clientWidth === 0 || canvas.clientWidth === width) {
      return;
    }
    width = canvas.clientWidth;
    redraw();
    overview.draw();
    clearTimeout(pending);
    pending = setTimeout(() => reload(true), 150);
  }).observe(element("lanes"));
}

export function start(whenAddressChanges) {
  onAddress = whenAddressChanges;
  for (const [name, minutes] of presets) {
    const each = button(name, () => setRange({ minutes }));
    each.dataset.minutes = String(minutes);
    element("ranges").append(each);
  }
  fillLegend();
  element("zoom-out").addEventListener("click", back);
  element("pause").addEventListener("click", togglePause);
  element("missed").addEventListener("click", togglePause);
  element("compare-clear").addEventListener("click", () => keys.Escape());
  element("find").addEventListener("input", () => {
    filter.text = element("find").value.trim();
    writeState();
    reload();
  });
  startChart();
  overview.start(fix);
  panel.start(() => {
    writeState();
    canvas.focus();
  });
  watchWidth();
  matchMedia("print").addEventListener("change", ({ matches }) => {
    element("letters").parentElement.open = matches; // what the letters mean is on paper too
  });
  for (const query of ["(prefers-color-scheme: dark)", "print"]) {
    matchMedia(query).addEventListener("change", () => {
      fillLegend();
      redraw();
      overview.draw();
      if (model !== null && isShown()) {
        drawCounters(model, canvas.clientWidth);
        showRange(...bounds());
      }
    });
  }
}

/** Changes have come. They are appended while the right edge is now; else a button says how many there are. */
export function noteChanges(count) {
  if (!isShown() || drag) {
    return;
  }
  if (isLive()) {
    reload();
  } else {
    missed += count;
    showRange(...bounds());
  }
}
