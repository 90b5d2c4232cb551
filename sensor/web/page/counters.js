// Counters of the local and remote ports below the chart, on the same time axis: a small chart for each counter.

import uPlot from "./vendor/uPlot.js";
import { element, make } from "./dom.js";
import { initiatorName, number } from "./format.js";
import { drawBlind, gutter } from "./lanes.js";
import { readColors } from "./palette.js";

const height = 64;
const mostCharts = 6;

/** The kernel's names in the field's words; the first are shown first. */
const names = {
  invalid_crc_count: "CRC errors",
  loss_of_sync_count: "Loss of sync",
  loss_of_signal_count: "Loss of signal",
  link_failure_count: "Link failures",
  invalid_tx_word_count: "Invalid words",
  error_frames: "Error frames",
  dumped_frames: "Dropped frames",
  lip_count: "Loop resets",
  nos_count: "Not operational",
  prim_seq_protocol_err_count: "Protocol errors",
};

let charts = [];

export const nameOf = (counter) => names[counter] ?? counter;

function group(counters) {
  const groups = new Map();
  for (const counter of counters) {
    groups.set(counter.counter, [...(groups.get(counter.counter) ?? []), counter]);
  }
  const order = Object.keys(names);
  const rank = (name) => (order.indexOf(name) < 0 ? order.length : order.indexOf(name));
  return [...groups].sort(([one], [other]) => rank(one) - rank(other) || one.localeCompare(other)).slice(0, mostCharts);
}

const ownerOf = (counter) => `${initiatorName(counter.initiator)}${counter.remotePort ? ` to ${counter.remotePort.name ?? counter.remotePort.wwpn}` : ""}`;

/** A value for each column; null where nothing is known, which is not zero. */
function values(counter, model) {
  const cells = new Map(counter.cells);
  return Array.from({ length: model.columns }, (_, column) => {
    const from = model.from + column * model.width;
    const isKnown = from < model.now && !model.blind.some((stretch) => stretch.isTotal && stretch.from <= from && stretch.to >= from + model.width);
    return cells.get(column) ?? (isKnown ? 0 : null);
  });
}

function makeChart(place, members, model, width) {
  const colors = readColors();
  const inks = [colors.accent, colors.warn, colors.good, colors.bad, colors.quiet];
  const left = gutter(width);
  const columns = Array.from({ length: model.columns }, (_, column) => (model.from + column * model.width) / 1000);
  const stepped = uPlot.paths.stepped({ align: 1 });
  return new uPlot({
    width, height,
    padding: [6, 0, 2, 0],
    legend: { show: false },
    cursor: { show: false },
    scales: {
      x: { range: [model.from / 1000, model.to / 1000] },
      y: { range: (chart, least, most) => [0, Math.max(4, most)] },
    },
    axes: [
      { show: true, size: 2, values: () => [], grid: { stroke: colors.line, width: 1 }, ticks: { show: false } },
      { size: left, stroke: colors.quiet, font: "11px system-ui, sans-serif", grid: { stroke: colors.line, width: 1 }, ticks: { show: false },
        splits: (chart) => [0, chart.scales.y.max], values: (chart, splits) => splits.map((value) => number(Math.round(value))), gap: 8 },
    ],
    series: [{}, ...members.map((member, index) => ({
      label: ownerOf(member), stroke: inks[index % inks.length], width: 1.5, fill: `${inks[index % inks.length]}33`,
      paths: stepped, points: { show: false },
    }))],
    hooks: {
      drawClear: [(chart) => {
        const ratio = uPlot.pxRatio;
        const { ctx, bbox } = chart;
        ctx.save();
        ctx.scale(ratio, ratio);
        drawBlind(ctx, model, colors, [left, width], [bbox.top / ratio, (bbox.top + bbox.height) / ratio],
          (at) => left + ((at - model.from) / (model.to - model.from)) * (width - left));
        ctx.restore();
      }],
    },
  }, [columns, ...members.map((member) => values(member, model))], place);
}

export function drawCounters(model, width) {
  charts.forEach((chart) => chart.destroy());
  charts = [];
  const groups = group(model.counters);
  const place = element("counters");
  element("counters-empty").hidden = groups.length > 0;
  place.replaceChildren();
  for (const [name, members] of groups) {
    const shown = members.slice(0, 5);
    const box = make("figure", "", "counter");
    const sum = members.reduce((total, member) => total + member.cells.reduce((part, [, value]) => part + value, 0), 0);
    const caption = make("figcaption", [make("strong", nameOf(name)), ` ${number(sum)}: ${shown.map(ownerOf).join(", ")}${members.length > shown.length ? " …" : ""}`]);
    box.append(caption);
    place.append(box);
    charts.push(makeChart(box, shown, model, width));
  }
}

/** What the counters did in a column: "CRC errors 12 (host7)". */
export function describeCounters(model, column) {
  return model.counters.flatMap((counter) => {
    const value = new Map(counter.cells).get(column) ?? 0;
    return value > 0 ? [`${nameOf(counter.counter)} ${number(value)} (${ownerOf(counter)})`] : [];
  }).slice(0, 3).join(", ");
}
