// The chart of the timeline on its canvas: axis, coverage, marks, local ports, remote ports by array.

import { ticks } from "./grid.js";
import { worstOf } from "./kinds.js";
import { hasCells } from "./model.js";
import { fillOf, hatch, isPaper, readColors, strengthOf } from "./palette.js";

const axisHeight = 24;
const laneHeight = 18;
const heights = { head: 24, port: 20, initiator: 22, fold: 20 };
/** A cell is never narrower, so that one event shows at any range. */
export const leastCellWidth = 3;
/** Columns have room for a letter. */
export const columnPixels = 10;
const linkColors = { Online: "good", Linkdown: "bad", Offline: "bad", Error: "bad", Bypassed: "warn", Diagnostics: "warn" };

export function gutter(width) {
  return Math.round(Math.min(240, Math.max(96, width * 0.2)));
}

/** Where everything lies: {width, gutter, rows: [{lane, y, height}], coverage, marks, height}. */
export function layOut(model, width) {
  let y = axisHeight;
  const place = (height) => {
    const box = { y, height };
    y += height;
    return box;
  };
  const coverage = place(laneHeight);
  const marks = place(laneHeight);
  const rows = model.lanes.map((lane) => ({ lane, ...place(heights[lane.type]) }));
  if (rows.length === 0) {
    place(60);
  }
  return { width, gutter: gutter(width), coverage, marks, rows, height: y + 2 };
}

export const xOf = (layout, model, at) => layout.gutter + ((at - model.from) / (model.to - model.from)) * (layout.width - layout.gutter);

export function timeAt(layout, model, x) {
  const part = (x - layout.gutter) / (layout.width - layout.gutter);
  return model.from + Math.min(1, Math.max(0, part)) * (model.to - model.from);
}

/** The row at a height, or null. */
export const rowAt = (layout, y) => layout.rows.find((row) => y >= row.y && y < row.y + row.height) ?? null;

/** A context for a canvas of that size, in the pixels of the screen. */
export function prepare(canvas, width, height) {
  const ratio = window.devicePixelRatio || 1;
  canvas.style.height = `${height}px`;
  canvas.width = Math.round(width * ratio);
  canvas.height = Math.round(height * ratio);
  const context = canvas.getContext("2d");
  context.scale(ratio, ratio);
  context.textBaseline = "middle";
  return context;
}

const font = (size, weight = "") => `${weight} ${size}px system-ui, sans-serif`.trim();

/** Cut to a width. Of a WWN the end is kept: there the ports of an array differ. */
function clip(context, text, width) {
  if (context.measureText(text).width <= width) {
    return text;
  }
  const name = text.search(/([0-9a-f]{2}:){7}/);
  if (name >= 0) {
    let begin = name + 3;
    while (begin + 6 < text.length && context.measureText(`${text.slice(0, name)}…${text.slice(begin)}`).width > width) {
      begin += 3;
    }
    const short = `${text.slice(0, name)}…${text.slice(begin)}`;
    return context.measureText(short).width <= width ? short : cut(context, text.slice(0, name).trim(), width);
  }
  return cut(context, text, width);
}

function cut(context, text, width) {
  if (context.measureText(text).width <= width) {
    return text;
  }
  let end = text.length;
  while (end > 1 && context.measureText(`${text.slice(0, end)}…`).width > width) {
    end -= 1;
  }
  return `${text.slice(0, end)}…`;
}

function drawAxis(context, model, layout, colors) {
  context.font = font(11);
  for (const tick of ticks(model.from, model.to, layout.width - layout.gutter)) {
    const x = Math.round(xOf(layout, model, tick.at)) + 0.5;
    context.strokeStyle = colors.line;
    context.beginPath();
    context.moveTo(x, tick.isDay ? 3 : axisHeight - 5);
    context.lineTo(x, layout.height);
    context.stroke();
    if (x + 40 < layout.width) {
      context.fillStyle = tick.isDay ? colors.text : colors.quiet;
      context.fillText(tick.text, x + 4, axisHeight / 2);
    }
  }
}

/** The hatching runs through every row: what is blank has not happened. */
export function drawBlind(context, model, colors, [left, right], [top, bottom], toX) {
  for (const stretch of model.blind) {
    const from = Math.max(left, toX(stretch.from));
    const to = Math.min(right, Math.max(from + leastCellWidth, toX(stretch.to)));
    context.fillStyle = hatch(context, isPaper() ? "#999999" : colors.hatch, stretch.isTotal);
    context.fillRect(from, top, to - from, bottom - top);
  }
}

function drawCoverage(context, model, layout, colors) {
  const { y, height } = layout.coverage;
  const middle = y + height / 2;
  const end = xOf(layout, model, Math.min(model.now, model.to));
  context.fillStyle = colors.good;
  context.fillRect(layout.gutter, middle - 2, Math.max(0, end - layout.gutter), 4);
  for (const stretch of model.blind) {
    const from = Math.max(layout.gutter, xOf(layout, model, stretch.from));
    const to = Math.min(layout.width, Math.max(from + leastCellWidth, xOf(layout, model, stretch.to)));
    context.fillStyle = stretch.isTotal ? colors.ground : colors.warn;
    context.fillRect(from, middle - 2, to - from, 4);
    context.fillStyle = hatch(context, stretch.isTotal ? colors.bad : colors.warn, stretch.isTotal);
    context.fillRect(from, y + 3, to - from, height - 6);
  }
}

function drawMarks(context, model, layout, colors) {
  context.font = font(11);
  let free = layout.gutter;
  const marks = model.marks.filter(({ at }) => at >= model.from && at <= model.to).sort((one, other) => one.at - other.at);
  const places = marks.map(({ at }) => Math.round(xOf(layout, model, at)) + 0.5);
  for (const [index, mark] of marks.entries()) {
    const x = places[index];
    context.strokeStyle = colors.accent;
    context.fillStyle = colors.accent;
    context.beginPath();
    context.moveTo(x, layout.marks.y + 3);
    context.lineTo(x, layout.height);
    context.stroke();
    context.beginPath();
    context.moveTo(x, layout.marks.y + 3);
    context.lineTo(x + 7, layout.marks.y + 7);
    context.lineTo(x, layout.marks.y + 11);
    context.fill();
    // Up to the next mark, cut where that is near; the last one may stand on the other side of its line.
    const wide = context.measureText(mark.name).width;
    const room = (places[index + 1] ?? layout.width) - 4 - (x + 10);
    if (wide <= room || (room > 40 && index + 1 < marks.length)) {
      context.fillText(cut(context, mark.name, room), x + 10, layout.marks.y + 8);
      free = x + 10 + Math.min(wide, room) + 8;
    } else if (x - 4 - wide >= Math.max(free, (places[index - 1] ?? 0) + 10)) {
      context.fillText(mark.name, x - 4 - wide, layout.marks.y + 8);
      free = x + 8;
    }
  }
}

/** A line's state: thin and even while it is online, thick where it is not, dotted where it is not known. */
function drawLinks(context, model, layout, row, colors) {
  for (const link of row.lane.links) {
    const from = Math.max(layout.gutter, xOf(layout, model, link.from));
    const to = Math.min(layout.width, xOf(layout, model, link.to));
    if (to <= layout.gutter || from >= layout.width) {
      continue;
    }
    const thickness = link.state === "Online" ? 2 : 5;
    context.fillStyle = colors[linkColors[link.state] ?? "quiet"];
    context.fillRect(from, row.y + row.height - 1 - thickness, Math.max(leastCellWidth, to - from), thickness);
  }
}

function drawCells(context, model, layout, row, colors) {
  const wide = (layout.width - layout.gutter) / model.columns;
  const cellWidth = Math.max(leastCellWidth, wide - 1);
  const top = row.y + 2;
  const height = row.height - (row.lane.links.length > 0 ? 9 : 4);
  context.font = font(9, "bold");
  for (const [column, cell] of row.lane.cells) {
    const worst = worstOf(cell.kinds.keys());
    const x = layout.gutter + column * wide;
    const { fill, ink, isPattern } = fillOf(context, worst.family, strengthOf(cell.count, model.most), colors.ground);
    context.fillStyle = colors.ground;
    context.fillRect(x, top, cellWidth, height);
    context.fillStyle = fill;
    context.fillRect(x, top, cellWidth, height);
    if (isPattern) {
      context.strokeStyle = "#000000";
      context.strokeRect(x + 0.5, top + 0.5, cellWidth - 1, height - 1);
    }
    if (cell.spread !== 0) {
      context.strokeStyle = colors.text;
      context.setLineDash([2, 2]);
      context.beginPath();
      context.moveTo(x + 0.5, top);
      context.lineTo(x + 0.5, top + height);
      context.stroke();
      context.setLineDash([]);
    }
    if (wide >= 8.5) {
      const letter = context.measureText(worst.letter).width;
      // A letter on a pattern cannot be read: it stands above it.
      const middle = isPattern ? top + 5 : top + height / 2 + 0.5;
      if (isPattern) {
        context.fillStyle = colors.ground;
        context.fillRect(x + 1, top + 1, cellWidth - 2, 8);
      }
      context.fillStyle = ink;
      context.fillText(worst.letter, x + (cellWidth - letter) / 2, middle);
    }
  }
}

function drawLabel(context, layout, row, colors) {
  const { lane, y, height } = row;
  const isHead = lane.type === "head";
  context.font = font(isHead ? 12 : 11.5, isHead ? "600" : "");
  const sum = lane.total > 0 ? lane.total.toLocaleString("en-US") : "";
  const sumWidth = context.measureText(sum).width;
  const room = layout.gutter - 12 - (isHead ? 0 : 10);
  const hasSum = sum !== "" && room - sumWidth > 60;
  context.fillStyle = lane.type === "fold" ? colors.quiet : colors.text;
  context.fillText(clip(context, lane.short ?? lane.label, room - (hasSum ? sumWidth + 8 : 0)), isHead ? 2 : 12, y + height / 2 + 1);
  if (hasSum) {
    context.fillStyle = colors.quiet;
    context.fillText(sum, layout.gutter - 10 - sumWidth, y + height / 2 + 1);
  }
  if (isHead) {
    context.strokeStyle = colors.line;
    context.beginPath();
    context.moveTo(0, y + 0.5);
    context.lineTo(layout.width, y + 0.5);
    context.stroke();
  }
}

function drawFuture(context, model, layout, colors) {
  if (model.now < model.to) {
    const x = Math.max(layout.gutter, xOf(layout, model, model.now));
    context.globalAlpha = 0.6;
    context.fillStyle = colors.raised;
    context.fillRect(x, axisHeight, layout.width - x, layout.height - axisHeight);
    context.globalAlpha = 1;
    context.strokeStyle = colors.quiet;
    context.beginPath();
    context.moveTo(Math.round(x) + 0.5, axisHeight);
    context.lineTo(Math.round(x) + 0.5, layout.height);
    context.stroke();
  }
}

/** @param cursor  {key, column} of the cell that is pointed at, or null
 *  @param ranges  stretches to show, {from, to, isOther}: what a drag covers, and the range to compare with */
export function drawLanes(canvas, model, layout, cursor, ranges) {
  const colors = readColors();
  const context = prepare(canvas, layout.width, layout.height);
  context.fillStyle = colors.ground;
  context.fillRect(0, 0, layout.width, layout.height);
  const toX = (at) => xOf(layout, model, at);
  drawAxis(context, model, layout, colors);
  drawBlind(context, model, colors, [layout.gutter, layout.width], [layout.coverage.y, layout.height], toX);
  drawFuture(context, model, layout, colors);
  context.font = font(11.5);
  context.fillStyle = colors.quiet;
  context.fillText("Coverage", 2, layout.coverage.y + laneHeight / 2);
  context.fillText("Marks", 2, layout.marks.y + laneHeight / 2);
  drawCoverage(context, model, layout, colors);
  for (const row of layout.rows) {
    drawLabel(context, layout, row, colors);
    if (hasCells(row.lane)) {
      drawLinks(context, model, layout, row, colors);
      drawCells(context, model, layout, row, colors);
    }
  }
  drawMarks(context, model, layout, colors);
  for (const range of ranges) {
    const [from, to] = [toX(range.from), toX(range.to)];
    context.globalAlpha = 0.16;
    context.fillStyle = range.isOther ? colors.warn : colors.accent;
    context.fillRect(from, axisHeight, to - from, layout.height - axisHeight);
    context.globalAlpha = 1;
    context.strokeStyle = range.isOther ? colors.warn : colors.accent;
    context.strokeRect(from + 0.5, axisHeight + 0.5, to - from - 1, layout.height - axisHeight - 1);
  }
  const place = cursor && layout.rows.find((row) => row.lane.key === cursor.key);
  if (place) {
    const wide = (layout.width - layout.gutter) / model.columns;
    context.strokeStyle = colors.text;
    context.lineWidth = 2;
    context.strokeRect(layout.gutter + cursor.column * wide - 1.5, place.y + 0.5, Math.max(leastCellWidth, wide - 1) + 3, place.height - 1);
  }
}
