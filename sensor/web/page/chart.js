// The chart of the timeline: a row for each remote port, a column for each stretch of time, drawn on a canvas.

import { families, familyOf, gravest, number, portName, initiatorName, time } from "./format.js";

const rowHeight = 20;
const axisHeight = 26;
const laneHeight = 12;
const labelWidth = 200;
export const leastColumnWidth = 4;

/** Rows and cells out of a timeline document: the worst port first. */
export function makeModel(document) {
  const rows = new Map();
  for (const row of document.rows) {
    const key = row.remotePort === null ? `initiator ${row.initiator.wwpn}` : row.remotePort.wwpn;
    if (!rows.has(key)) {
      const label = row.remotePort === null ? `${initiatorName(row.initiator)} itself` : portName(row.remotePort);
      rows.set(key, { key, label, port: row.remotePort, initiator: row.initiator, total: 0, cells: new Map() });
    }
    const model = rows.get(key);
    for (const [column, count, spread] of row.cells) {
      const cell = model.cells.get(column) ?? { count: 0, spread: 0, kinds: new Map() };
      cell.count += count;
      cell.spread += spread;
      cell.kinds.set(row.kind, (cell.kinds.get(row.kind) ?? 0) + count);
      model.cells.set(column, cell);
      model.total += count;
    }
  }
  const from = Date.parse(document.from);
  const to = Date.parse(document.to);
  return {
    from, to, columns: document.columns, width: (to - from) / document.columns,
    rows: [...rows.values()].sort((one, other) => other.total - one.total || one.label.localeCompare(other.label)),
    blind: findBlind(document, from, to),
    marks: document.marks.map((mark) => ({ name: mark.name, at: Date.parse(mark.time) })),
  };
}

/** Stretches in which nothing could be seen: Tavik did not run, something was lost, or a kind was not heard. */
function findBlind(document, from, to) {
  const blind = [];
  let seenTo = from;
  for (const run of document.runs) {
    if (Date.parse(run.from) > seenTo) {
      blind.push({ from: seenTo, to: Math.min(Date.parse(run.from), to), why: "Tavik did not run" });
    }
    seenTo = Math.max(seenTo, Date.parse(run.to));
  }
  // The end of the last run is only noted once a minute.
  const slack = 90000;
  if (seenTo + slack < to) {
    blind.push({ from: seenTo, to, why: "Tavik did not run" });
  }
  for (const gap of document.gaps) {
    blind.push({ from: Date.parse(gap.from), to: Date.parse(gap.to), why: "events were lost" });
  }
  for (const state of document.coverage) {
    if (state.state !== "off") {
      blind.push({ from: Date.parse(state.from), to: Date.parse(state.to), why: `deaf for ${state.kind} (${state.state})` });
    }
  }
  return blind.filter((stretch) => stretch.to > from && stretch.from < to);
}

export function columnsFor(canvas) {
  return Math.max(10, Math.floor((canvas.clientWidth - labelWidth) / leastColumnWidth));
}

/** Where a point of the canvas lies: {row, column}, or null. */
export function cellAt(canvas, model, x, y) {
  const column = Math.floor((x - labelWidth) / ((canvas.clientWidth - labelWidth) / model.columns));
  const row = Math.floor((y - axisHeight - laneHeight) / rowHeight);
  return column >= 0 && column < model.columns && row >= 0 && row < model.rows.length ? { row, column } : null;
}

export function timeAt(canvas, model, x) {
  const part = (x - labelWidth) / (canvas.clientWidth - labelWidth);
  return new Date(model.from + Math.min(1, Math.max(0, part)) * (model.to - model.from));
}

/** The time that a cell is about, [from, to]: counts are kept by the minute, and a minute begins within its column. */
export function spanOf(model, column) {
  const from = model.from + column * model.width;
  return [from, from + model.width + (model.width < 60000 ? 60000 : 0)];
}

/** One plain sentence about a cell. */
export function describeCell(model, place) {
  const row = model.rows[place.row];
  const cell = row.cells.get(place.column);
  const [from, to] = spanOf(model, place.column);
  const span = `${time(from)} to ${time(to, false)}`;
  const blind = model.blind.find((stretch) => stretch.from < to && stretch.to > from);
  if (!cell) {
    return `${row.label}, ${span}: ${blind ? `nothing is known, ${blind.why}` : "nothing happened"}.`;
  }
  const kinds = [...cell.kinds].sort((one, other) => other[1] - one[1]).map(([kind, count]) => `${number(count)} ${kind}`);
  const spread = cell.spread === 0 ? "" : ` ${number(cell.spread)} of them may have begun earlier.`;
  return `${row.label}, ${span}: ${kinds.join(", ")}.${spread}`;
}

function hatch(context, color) {
  const tile = document.createElement("canvas");
  tile.width = tile.height = 8;
  const pen = tile.getContext("2d");
  pen.strokeStyle = color;
  pen.lineWidth = 1.5;
  pen.beginPath();
  pen.moveTo(-2, 10);
  pen.lineTo(10, -2);
  pen.moveTo(2, 14);
  pen.lineTo(14, 2);
  pen.moveTo(-6, 6);
  pen.lineTo(6, -6);
  pen.stroke();
  return context.createPattern(tile, "repeat");
}

/** Distances between two marks of the axis: the first that leaves room for its text is taken. */
const steps = [1, 5, 10, 30, 60, 300, 600, 1800, 3600, 10800, 21600, 43200, 86400, 172800, 604800, 2592000].map((s) => s * 1000);

function drawAxis(context, model, width, colors) {
  const perPixel = (model.to - model.from) / (width - labelWidth);
  const step = steps.find((candidate) => candidate / perPixel >= 90) ?? steps[steps.length - 1];
  const zone = new Date(model.from).getTimezoneOffset() * 60000;
  context.fillStyle = colors.quiet;
  context.strokeStyle = colors.line;
  context.textBaseline = "middle";
  for (let at = Math.ceil((model.from - zone) / step) * step + zone; at < model.to; at += step) {
    const x = labelWidth + (at - model.from) / perPixel;
    const text = step >= 86400000 ? new Date(at).toLocaleDateString("sv-SE").slice(5)
      : time(at, false).slice(0, step < 60000 ? 8 : 5);
    context.fillText(text, x + 3, axisHeight / 2);
    context.beginPath();
    context.moveTo(x, 4);
    context.lineTo(x, axisHeight + laneHeight + model.rows.length * rowHeight);
    context.stroke();
  }
}

/** @param cursor  the cell that is pointed at, or null  @param selection  [x, x] of a drag, or null */
export function draw(canvas, model, cursor, selection) {
  const style = getComputedStyle(document.documentElement);
  const isDark = matchMedia("(prefers-color-scheme: dark)").matches && !matchMedia("print").matches;
  const colors = Object.fromEntries(["ground", "text", "quiet", "line", "accent", "hatch"]
    .map((name) => [name, style.getPropertyValue(`--${name}`).trim()]));
  const width = canvas.clientWidth;
  const height = axisHeight + laneHeight + Math.max(1, model.rows.length) * rowHeight + 2;
  const ratio = window.devicePixelRatio || 1;
  canvas.style.height = `${height}px`;
  canvas.width = Math.round(width * ratio);
  canvas.height = Math.round(height * ratio);
  const context = canvas.getContext("2d");
  context.scale(ratio, ratio);
  context.font = "12px system-ui, sans-serif";
  context.fillStyle = colors.ground;
  context.fillRect(0, 0, width, height);
  const perPixel = (model.to - model.from) / (width - labelWidth);
  const xOf = (at) => labelWidth + (at - model.from) / perPixel;
  drawAxis(context, model, width, colors);

  context.fillStyle = hatch(context, colors.quiet);
  for (const stretch of model.blind) {
    const x = Math.max(labelWidth, xOf(stretch.from));
    context.fillRect(x, axisHeight, Math.max(3, Math.min(width, xOf(stretch.to)) - x), height - axisHeight);
  }
  context.fillStyle = colors.quiet;
  context.fillText("coverage", 4, axisHeight + laneHeight / 2);

  const columnWidth = (width - labelWidth) / model.columns;
  const most = Math.max(10, ...model.rows.flatMap((row) => [...row.cells.values()].map((cell) => cell.count)));
  model.rows.forEach((row, index) => {
    const y = axisHeight + laneHeight + index * rowHeight;
    context.fillStyle = colors.text;
    context.textBaseline = "middle";
    let label = row.label;
    while (context.measureText(label).width > labelWidth - 12) {
      label = `${label.slice(0, -2)}…`;
    }
    context.fillText(label, 4, y + rowHeight / 2);
    context.strokeStyle = colors.line;
    context.beginPath();
    context.moveTo(0, y + rowHeight);
    context.lineTo(width, y + rowHeight);
    context.stroke();
    for (const [column, cell] of row.cells) {
      const family = familyOf(gravest(cell.kinds.keys()));
      const x = labelWidth + column * columnWidth;
      // Counts are kept by the minute: where columns are narrower, a cell is as wide as its minute.
      const cellWidth = Math.max(3, columnWidth - 0.5, 60000 / perPixel - 0.5);
      context.globalAlpha = 0.4 + 0.6 * Math.log10(1 + cell.count) / Math.log10(1 + most);
      context.fillStyle = isDark ? family.dark : family.light;
      context.fillRect(x, y + 2, cellWidth, rowHeight - 4);
      context.globalAlpha = 1;
      if (cell.spread !== 0) {
        context.strokeStyle = colors.text;
        context.setLineDash([2, 2]);
        context.strokeRect(x + 0.5, y + 2.5, cellWidth - 1, rowHeight - 5);
        context.setLineDash([]);
      }
      if (columnWidth >= 11) {
        context.fillStyle = colors.ground;
        context.fillText(family.letter, x + columnWidth / 2 - 4, y + rowHeight / 2);
      }
    }
  });
  if (model.rows.length === 0) {
    context.fillStyle = colors.quiet;
    context.fillText("No event in this range.", labelWidth + 8, axisHeight + laneHeight + rowHeight / 2);
  }
  for (const mark of model.marks) {
    context.fillStyle = colors.accent;
    context.fillRect(xOf(mark.at) - 1, axisHeight - 6, 2, height - axisHeight + 6);
    context.fillText(mark.name, xOf(mark.at) + 4, axisHeight + laneHeight / 2);
  }
  if (cursor && cursor.row < model.rows.length) {
    context.strokeStyle = colors.accent;
    context.lineWidth = 2;
    context.strokeRect(labelWidth + cursor.column * columnWidth - 1, axisHeight + laneHeight + cursor.row * rowHeight + 1,
      Math.max(3, columnWidth) + 2, rowHeight - 2);
    context.lineWidth = 1;
  }
  if (selection) {
    context.globalAlpha = 0.25;
    context.fillStyle = colors.accent;
    context.fillRect(Math.min(...selection), axisHeight, Math.abs(selection[1] - selection[0]), height - axisHeight);
    context.globalAlpha = 1;
  }
}

export function fillLegend(list) {
  const isDark = matchMedia("(prefers-color-scheme: dark)").matches;
  list.replaceChildren(...families.map((family) => {
    const item = document.createElement("li");
    const picture = document.createElementNS("http://www.w3.org/2000/svg", "svg");
    picture.setAttribute("viewBox", "0 0 10 10");
    const square = document.createElementNS("http://www.w3.org/2000/svg", "rect");
    square.setAttribute("width", "10");
    square.setAttribute("height", "10");
    square.setAttribute("fill", isDark ? family.dark : family.light);
    picture.append(square);
    item.append(picture, `${family.letter} ${family.name}`);
    return item;
  }));
}
