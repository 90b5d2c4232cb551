// Sentences about cells and episodes. Nothing here touches the page.

import { duration, initiatorName, luns, number, portName, span, times } from "./format.js";
import { kindOf, kinds } from "./kinds.js";
import { hasCells, spanOf, whyBlind } from "./model.js";

const rank = (name) => kinds.indexOf(kindOf(name));

/** As a word of a command line. */
export const quote = (text) => (/^[\w.:@/+-]+$/.test(text) ? text : `'${text.replaceAll("'", "'\\''")}'`);

/** "array7 ctrl-A answered that its queue is full 20,000 times". */
export const saysOf = (kind, who, count) => kindOf(kind).says(who, times(count));

/** An episode in one sentence, with the local port that saw it where it is asked for. */
export function sentenceOf(episode, hasHost = true) {
  const who = episode.remotePort === null ? initiatorName(episode.initiator) : portName(episode.remotePort);
  const host = !hasHost || episode.remotePort === null ? "" : `, seen from ${initiatorName(episode.initiator)}`;
  const long = Date.parse(episode.last) - Date.parse(episode.first);
  const where = luns(episode.luns);
  const lasted = long < 1000 ? "" : ` within ${duration(long)}`;
  return `${saysOf(episode.kind, who, episode.count)}${lasted}${where === "" ? "" : `, on ${where}`}${host}.`;
}

/** A cell in one sentence. */
export function describeCell(model, lane, column) {
  const cell = lane.cells.get(column);
  const time = spanOf(model, column);
  const blind = whyBlind(model, time);
  const when = span(...time);
  if (!cell) {
    const why = time[0] >= model.now ? "not yet" : blind === "" ? "nothing happened" : `not known to be quiet: ${blind}`;
    return `${when}, ${lane.label}: ${why}.`;
  }
  const parts = [...cell.kinds].sort(([one], [other]) => rank(one) - rank(other)).map(([kind, count]) => saysOf(kind, lane.label, count));
  const spread = cell.spread === 0 ? "" : ` ${cell.spread === cell.count ? "They" : `${number(cell.spread)} of them`} may have begun earlier (dotted edge).`;
  return `${when}. ${parts.join(". ")}.${spread}${blind === "" ? "" : ` Not all could be seen: ${blind}.`}`;
}

/** What all lanes together show in a column, for the line above the chart. */
export function describeColumn(model, column) {
  const sums = new Map();
  for (const lane of model.lanes.filter(hasCells)) {
    for (const [kind, count] of lane.cells.get(column)?.kinds ?? []) {
      sums.set(kind, (sums.get(kind) ?? 0) + count);
    }
  }
  const time = spanOf(model, column);
  const blind = whyBlind(model, time);
  const most = [...sums].sort(([, one], [, other]) => other - one).slice(0, 3).map(([kind, count]) => `${kind} ${number(count)}`);
  const links = model.lanes.flatMap((lane) => lane.links.filter((link) => link.state !== "Online" && link.from < time[1] && link.to > time[0])
    .map((link) => `${lane.label} ${link.state}`));
  const marks = model.marks.filter(({ at }) => at >= time[0] && at < time[1]).map(({ name }) => `mark ${name}`);
  const quiet = time[0] >= model.now ? "not yet" : blind === "" ? "nothing happened" : "nothing is known";
  return [`${span(...time)}: ${most.length > 0 ? most.join(", ") : quiet}`, blind, [...new Set(links)].join(", "), marks.join(", ")].filter(Boolean).join(" · ");
}
