// The last 30 days above the chart, with a brush: the window is what the chart shows.

import * as api from "./api.js";
import { element } from "./dom.js";
import { span } from "./format.js";
import { day, leastRange, makeGrid, ticks } from "./grid.js";
import { drawBlind, gutter, prepare } from "./lanes.js";
import { findBlind } from "./model.js";
import { isPaper, readColors } from "./palette.js";

const height = 56;
const axisHeight = 16;
const days = 30;
const grip = 6;
const canvas = element("overview");

let data = null; // {from, to, counts, blind, marks}
let shown = [0, 0];
let drag = null; // {mode, start, shown}
let choose = () => {};

const width = () => canvas.clientWidth;
const left = () => gutter(width());
const xOf = (at) => left() + ((at - data.from) / (data.to - data.from)) * (width() - left());
const timeAt = (x) => data.from + Math.min(1, Math.max(0, (x - left()) / (width() - left()))) * (data.to - data.from);

export async function load(now) {
  const grid = makeGrid(now - days * day, now, Math.max(50, width() - left()), 4);
  const document = await api.timeline(grid.from, grid.to, grid.columns);
  const counts = new Map();
  for (const row of document.rows) {
    for (const [column, count] of row.cells) {
      counts.set(column, (counts.get(column) ?? 0) + count);
    }
  }
  data = { ...grid, counts, blind: findBlind(document, grid.from, grid.to, now), marks: document.marks };
  draw();
}

export function show(from, to) {
  shown = [from, to];
  canvas.setAttribute("aria-valuetext", span(from, to));
  draw();
}

export function draw() {
  if (data === null || width() === 0) {
    return;
  }
  const colors = readColors();
  const context = prepare(canvas, width(), height);
  context.fillStyle = colors.ground;
  context.fillRect(0, 0, width(), height);
  context.font = "11.5px system-ui, sans-serif";
  context.fillStyle = colors.quiet;
  context.fillText(width() < 500 ? "30 days" : "Last 30 days", 2, height / 2);
  context.font = "11px system-ui, sans-serif";
  for (const tick of ticks(data.from, data.to, width() - left())) {
    const x = Math.round(xOf(tick.at)) + 0.5;
    if (x + 40 < width()) {
      context.fillText(tick.text, x + 3, height - axisHeight / 2 + 1);
    }
    context.fillRect(x, height - axisHeight, 1, 5);
  }
  const floor = height - axisHeight;
  drawBlind(context, data, colors, [left(), width()], [2, floor], xOf);
  const most = Math.log10(1 + Math.max(10, ...data.counts.values()));
  const wide = (width() - left()) / data.columns;
  context.fillStyle = isPaper() ? "#000000" : colors.quiet;
  for (const [column, count] of data.counts) {
    const tall = Math.max(2, (floor - 6) * (Math.log10(1 + count) / most));
    context.fillRect(left() + column * wide, floor - tall, Math.max(3, wide - 1), tall);
  }
  context.fillStyle = colors.line;
  context.fillRect(left(), floor, width() - left(), 1);
  for (const mark of data.marks) {
    context.fillStyle = colors.accent;
    const x = xOf(Date.parse(mark.time));
    if (x >= left()) {
      context.fillRect(x, 0, 2, floor);
    }
  }
  drawBrush(context, colors, floor);
}

function brush() {
  const from = Math.min(width() - 4, Math.max(left(), xOf(shown[0])));
  return [from, Math.max(from + 4, Math.min(width() - 1, xOf(shown[1])))];
}

function drawBrush(context, colors, floor) {
  const [from, to] = brush();
  context.globalAlpha = 0.18;
  context.fillStyle = colors.accent;
  context.fillRect(from, 0, to - from, floor);
  context.globalAlpha = 1;
  context.strokeStyle = colors.accent;
  context.lineWidth = 1.5;
  context.strokeRect(from, 0.75, to - from, floor - 0.75);
  context.fillStyle = colors.accent;
  for (const x of [from, to]) {
    context.fillRect(x - 2, floor / 2 - 7, 4, 14);
  }
}

/** What a press at x takes hold of: an edge of the window, the window, or a range that is new. */
function grasp(x) {
  const [from, to] = brush();
  if (to - from > 3 * grip && Math.abs(x - from) <= grip) {
    return "from";
  }
  if (to - from > 3 * grip && Math.abs(x - to) <= grip) {
    return "to";
  }
  return x > from - grip && x < to + grip ? "move" : "new";
}

function dragged(x) {
  const at = timeAt(x);
  const [from, to] = drag.shown;
  if (drag.mode === "from") {
    return [Math.min(at, to - leastRange), to];
  }
  if (drag.mode === "to") {
    return [from, Math.max(at, from + leastRange)];
  }
  if (drag.mode === "move") {
    const way = Math.min(data.to - to, Math.max(data.from - from, at - drag.start));
    return [from + way, to + way];
  }
  return [Math.min(drag.start, at), Math.max(drag.start + leastRange, at)];
}

/** Keys: arrows move the window by half of it, plus and minus change its length. */
function onKey(event) {
  const length = shown[1] - shown[0];
  const moves = {
    ArrowLeft: [-length / 2, -length / 2], ArrowRight: [length / 2, length / 2],
    "+": [length / 4, -length / 4], "-": [-length / 2, length / 2],
  };
  const move = moves[event.key];
  if (move && data !== null) {
    event.preventDefault();
    const from = Math.max(data.from, shown[0] + move[0]);
    const to = Math.min(data.to, shown[1] + move[1]);
    if (to - from >= leastRange) {
      choose(from, to);
    }
  }
}

/** @param whenChosen  called with [from, to) when a person has chosen a range */
export function start(whenChosen) {
  choose = whenChosen;
  const x = (event) => event.clientX - canvas.getBoundingClientRect().left;
  canvas.addEventListener("pointerdown", (event) => {
    if (data !== null && x(event) >= left() - grip) {
      drag = { mode: grasp(x(event)), start: timeAt(x(event)), shown };
      canvas.setPointerCapture(event.pointerId);
    }
  });
  canvas.addEventListener("pointermove", (event) => {
    if (drag) {
      show(...dragged(x(event)));
    } else if (data !== null) {
      canvas.dataset.grasp = grasp(x(event));
    }
  });
  canvas.addEventListener("pointerup", (event) => {
    const chosen = drag && dragged(x(event));
    const isClick = drag && Math.abs(timeAt(x(event)) - drag.start) < (data.to - data.from) / 400;
    const mode = drag?.mode;
    drag = null;
    if (!chosen || (isClick && mode !== "new")) {
      return;
    }
    if (isClick) { // a click beside the window brings it there
      const half = (shown[1] - shown[0]) / 2;
      const middle = (chosen[0] + chosen[1]) / 2;
      choose(Math.max(data.from, middle - half), Math.min(data.to, middle + half));
    } else {
      choose(...chosen);
    }
  });
  canvas.addEventListener("pointercancel", () => { drag = null; draw(); });
  canvas.addEventListener("keydown", onKey);
}
