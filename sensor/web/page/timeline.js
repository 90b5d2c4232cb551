// The view with the chart: its range, its cursor, its panel.

import * as api from "./api.js";
import * as chart from "./chart.js";
import { fillTable, initiatorName, luns, number, portName, time } from "./format.js";

const ranges = [["15m", 900], ["1h", 3600], ["6h", 21600], ["24h", 86400], ["7d", 604800], ["30d", 2592000]];
const element = (id) => document.getElementById(id);
const canvas = element("chart");

let model = null;
let cursor = null;
let drag = null;
let range = { seconds: 86400 }; // or {from, to}
const history = [];
let onRange = () => {};

const isLive = () => range.seconds !== undefined;

function bounds() {
  return isLive() ? [new Date(Date.now() - range.seconds * 1000), new Date()] : [range.from, range.to];
}

function redraw() {
  if (model !== null && !element("view-timeline").hidden) {
    chart.draw(canvas, model, cursor, drag && drag.isMoved ? [drag.from, drag.to] : null);
  }
}

export async function reload() {
  const [from, to] = bounds();
  try {
    model = chart.makeModel(await api.timeline(from, to, chart.columnsFor(canvas)));
  } catch (problem) {
    element("cell-text").textContent = `No timeline: ${problem.message}`;
    return;
  }
  if (cursor && cursor.row >= model.rows.length) {
    cursor = null;
  }
  element("range-text").textContent = `${time(from)} to ${time(to)}${isLive() ? ", live" : ""}`;
  for (const button of element("ranges").querySelectorAll("button")) {
    button.setAttribute("aria-pressed", String(Number(button.dataset.seconds) === range.seconds));
  }
  const rows = model.rows.map((row) => {
    const kinds = new Map();
    for (const cell of row.cells.values()) {
      cell.kinds.forEach((count, kind) => kinds.set(kind, (kinds.get(kind) ?? 0) + count));
    }
    return [row.label, { text: number(row.total), number: true },
      [...kinds].map(([kind, count]) => `${kind} ${number(count)}`).join(", ")];
  });
  fillTable(element("chart-table"), ["Remote port", { text: "Events", number: true }, "Kinds"], rows, "No event in this range.");
  redraw();
}

export function setRange(next, keep = true) {
  if (keep) {
    history.push(range);
  }
  range = next;
  cursor = null;
  onRange(describeRange());
  return reload();
}

/** As in the address: "24h", or "FROM..TO". */
function describeRange() {
  const preset = ranges.find(([, seconds]) => seconds === range.seconds);
  return preset ? preset[0] : `${range.from.toISOString()}..${range.to.toISOString()}`;
}

export function readRange(text) {
  const preset = ranges.find(([name]) => name === text);
  if (preset) {
    return { seconds: preset[1] };
  }
  const [from, to] = text.split("..").map((part) => new Date(part));
  return to instanceof Date && to > from ? { from, to } : { seconds: 86400 };
}

function moveCursor(rows, columns) {
  if (model.rows.length === 0) {
    return;
  }
  const place = cursor ?? { row: 0, column: model.columns - 1 };
  cursor = {
    row: Math.min(model.rows.length - 1, Math.max(0, place.row + rows)),
    column: Math.min(model.columns - 1, Math.max(0, place.column + columns)),
  };
  showCursor();
}

/** To the next cell with events in this row, or in the rows behind it. */
function jump(direction) {
  const places = model.rows.flatMap((row, index) =>
    [...row.cells.keys()].sort((one, other) => one - other).map((column) => ({ row: index, column })));
  if (places.length === 0) {
    return;
  }
  const order = (place) => place.row * model.columns + place.column;
  const at = cursor ? order(cursor) : direction > 0 ? -1 : Infinity;
  cursor = direction > 0 ? places.find((place) => order(place) > at) ?? places[0]
    : places.filter((place) => order(place) < at).pop() ?? places[places.length - 1];
  showCursor();
}

function showCursor() {
  element("cell-text").textContent = chart.describeCell(model, cursor);
  redraw();
}

async function open(place) {
  const row = model.rows[place.row];
  const [from, to] = chart.spanOf(model, place.column).map((at) => new Date(at));
  const filter = { since: from.toISOString(), until: to.toISOString() };
  const owner = row.port === null ? ["initiator", row.initiator.wwpn] : ["port", row.port.wwpn];
  filter[owner[0]] = owner[1] ?? "";
  element("panel-title").textContent = row.label;
  element("panel-sentence").textContent = chart.describeCell(model, place);
  element("panel-command").textContent =
    `tavik events --since ${filter.since} --until ${filter.until} --${owner[0]} ${owner[1]}`;
  element("panel").hidden = false;
  element("panel-title").focus();
  try {
    showEpisodes(element("panel-episodes"), (await api.events(filter)).episodes);
  } catch (problem) {
    fillTable(element("panel-episodes"), ["Episodes"], [], problem.message);
  }
}

export function showEpisodes(table, episodes) {
  fillTable(table,
    [{ text: "Episode", number: true }, "Kind", { text: "Count", number: true }, "First", "Last", "State", "Local port", "Remote port", "LUNs"],
    episodes.map((episode) => [
      { text: String(episode.episode), number: true }, episode.kind, { text: number(episode.count), number: true },
      time(episode.first), time(episode.last), episode.phase === "closed" ? "ended" : "goes on",
      initiatorName(episode.initiator), episode.remotePort === null ? "–" : portName(episode.remotePort), luns(episode.luns),
    ]),
    "No episode matches.");
}

function position(event) {
  const box = canvas.getBoundingClientRect();
  return [event.clientX - box.left, event.clientY - box.top];
}

export function start(whenRangeChanges) {
  onRange = whenRangeChanges;
  for (const [name, seconds] of ranges) {
    const button = document.createElement("button");
    button.type = "button";
    button.textContent = name;
    button.dataset.seconds = String(seconds);
    button.addEventListener("click", () => setRange({ seconds }));
    element("ranges").append(button);
  }
  chart.fillLegend(element("legend"));
  const back = () => history.length > 0 && setRange(history.pop(), false);
  element("zoom-out").addEventListener("click", back);
  element("panel-close").addEventListener("click", () => {
    element("panel").hidden = true;
    canvas.focus();
  });
  const keys = {
    ArrowUp: () => moveCursor(-1, 0), ArrowDown: () => moveCursor(1, 0),
    ArrowLeft: () => moveCursor(0, -1), ArrowRight: () => moveCursor(0, 1),
    "[": () => jump(-1), "]": () => jump(1), Backspace: back,
    Enter: () => cursor && open(cursor),
    Escape: () => { element("panel").hidden = true; },
  };
  canvas.addEventListener("keydown", (event) => {
    if (model !== null && keys[event.key]) {
      event.preventDefault();
      keys[event.key]();
    }
  });
  canvas.addEventListener("pointerdown", (event) => {
    const [x] = position(event);
    drag = { from: x, to: x, isMoved: false };
    canvas.setPointerCapture(event.pointerId);
  });
  canvas.addEventListener("pointermove", (event) => {
    if (model === null) {
      return;
    }
    const [x, y] = position(event);
    if (drag) {
      drag.to = x;
      drag.isMoved = drag.isMoved || Math.abs(x - drag.from) > 5;
    }
    const place = chart.cellAt(canvas, model, x, y);
    if (place) {
      cursor = place;
      showCursor();
    } else {
      redraw();
    }
  });
  canvas.addEventListener("pointerup", (event) => {
    const [x, y] = position(event);
    const done = drag;
    drag = null;
    if (model === null || !done) {
      return;
    }
    if (done.isMoved) {
      const ends = [chart.timeAt(canvas, model, done.from), chart.timeAt(canvas, model, x)].sort((one, other) => one - other);
      if (ends[1] - ends[0] >= 1000) {
        setRange({ from: ends[0], to: ends[1] });
      }
      return;
    }
    const place = chart.cellAt(canvas, model, x, y);
    if (place) {
      cursor = place;
      open(place);
    }
  });
  window.addEventListener("resize", () => reload());
  matchMedia("(prefers-color-scheme: dark)").addEventListener("change", () => {
    chart.fillLegend(element("legend"));
    redraw();
  });
}

/** A change has come: shown while the right edge is now. */
export function noteChange() {
  if (isLive() && !element("view-timeline").hidden) {
    reload();
  }
}
