// Tables of episodes, as several views show them.

import { figure, fillTable, link, make } from "./dom.js";
import { makeAddress, writeSpan } from "./address.js";
import { initiatorName, luns, number, portName, shortTime } from "./format.js";
import { kindOf } from "./kinds.js";
import { swatch } from "./palette.js";

const minute = 60000;

/** The kind with its family's color. */
export const kindCell = (name) => make("span", [swatch(kindOf(name).family), ` ${name}`], "kind");

/** To the episode's place in the timeline. */
export function placeOf(episode) {
  const from = Date.parse(episode.first);
  const to = Math.max(Date.parse(episode.last), from + minute);
  const room = Math.max(10 * minute, to - from);
  const key = episode.remotePort === null ? `initiator ${episode.initiator.wwpn ?? episode.initiator.host}` : episode.remotePort.wwpn;
  return makeAddress("timeline", { range: writeSpan([from - room, to + room]), cell: `${key}@${new Date(from).toISOString()}` });
}

export function showEpisodes(table, episodes, empty) {
  fillTable(table,
    ["Kind", { text: "Count", number: true }, "First", "Last", "Remote port", "Local port", "LUNs", { text: "Episode", number: true }],
    episodes.map((episode) => [
      kindCell(episode.kind), figure(number(episode.count)), shortTime(episode.first, true),
      episode.phase === "closed" ? shortTime(episode.last, true) : make("span", "goes on", kindOf(episode.kind).level > 1 ? "goes-on" : "quiet"),
      episode.remotePort === null ? "–" : portName(episode.remotePort), initiatorName(episode.initiator), luns(episode.luns) || "–",
      { text: link(String(episode.episode), placeOf(episode)), number: true },
    ]), empty);
}
