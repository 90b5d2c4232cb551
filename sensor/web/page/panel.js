// The panel beside the chart: all that is known of one cell.

import * as api from "./api.js";
import { devicesOf, listDevices } from "./devices.js";
import { button, copy, element, make } from "./dom.js";
import { showEpisodes } from "./episodes.js";
import { codes, luns, number, plural, span } from "./format.js";
import { kinds, kindOf } from "./kinds.js";
import { findingBox } from "./findings.js";
import { spanOf, whyBlind } from "./model.js";
import { describeCell, quote, sentenceOf } from "./words.js";

const panel = element("panel");
const most = 200;
let turn = 0;
let onClose = () => {};

export const isOpen = () => !panel.hidden;

export function close() {
  panel.hidden = true;
}

/** What `tavik events` is to be asked to show the same. */
function filterOf(lane, [from, to]) {
  const filter = { since: new Date(from).toISOString(), until: new Date(to - 1).toISOString() };
  if (lane.type === "port") {
    return { ...filter, port: lane.key };
  }
  return lane.owner.wwpn ? { ...filter, initiator: lane.owner.wwpn } : filter;
}

const commandOf = (filter) => `tavik events ${Object.entries(filter).map(([name, value]) => `--${name} ${quote(value)}`).join(" ")}`;

function addFact(list, name, values) {
  if (values.length > 0) {
    list.append(make("dt", name), ...values.map((value) => make("dd", value)));
  }
}

/** All LUNs that the episodes name; null where one is of all LUNs. */
function lunsOf(episodes) {
  const numbers = new Set();
  for (const { luns: set } of episodes) {
    if (set?.all) {
      return null;
    }
    (set?.numbers ?? []).forEach((lun) => numbers.add(lun));
  }
  return numbers;
}

async function showDevices(list, episodes, mine) {
  const found = await devicesOf(episodes);
  if (mine === turn) {
    listDevices(found, 12).forEach(([name, text]) => addFact(list, name, [text]));
  }
}

const headings = { means: "What it means", "usual causes": "Usual causes", "look at": "What to look at next", against: "What speaks against it" };

/** The explanation of the worst episode. Its facts are in the panel already. */
async function showExplanation(place, episode, mine) {
  const document = await api.explain(String(episode.episode));
  if (mine !== turn) {
    return;
  }
  place.replaceChildren(...(document.findings ?? []).map(findingBox));
  place.querySelectorAll("details").forEach((each) => { each.open = true; });
  for (const part of document.parts.filter(({ label }) => label !== "facts")) {
    place.append(make("h4", headings[part.label] ?? part.label.charAt(0).toUpperCase() + part.label.slice(1)), ...part.texts.map((text) => make("p", text)));
  }
  if (document.evidence.length > 0) {
    place.append(make("h4", "Evidence"), make("p", `Episode ${episode.episode}; ${plural(document.evidence.length, "record")} kept: ${document.evidence.slice(0, 8).join(", ")}${document.evidence.length > 8 ? " …" : ""}.`));
  }
}

/** What makes one doubt the cell: what could not be seen, and what may have begun earlier. */
function doubts(model, lane, column) {
  const cell = lane.cells.get(column);
  const blind = whyBlind(model, spanOf(model, column));
  return [
    ...(blind === "" ? [] : [`Tavik could not see everything at this time: ${blind}.`]),
    ...(cell?.spread ? [`${number(cell.spread)} of these events may have begun before this column.`] : []),
  ];
}

const rank = (episode) => kinds.indexOf(kindOf(episode.kind));
const worstFirst = (one, other) => rank(one) - rank(other) || other.count - one.count;

export async function open(model, lane, column, takesFocus) {
  turn += 1;
  const mine = turn;
  const time = spanOf(model, column);
  const filter = filterOf(lane, time);
  element("panel-title").textContent = lane.label;
  element("panel-time").textContent = span(...time);
  element("panel-sentence").textContent = describeCell(model, lane, column);
  element("panel-command").textContent = commandOf(filter);
  for (const id of ["panel-facts", "panel-explanation", "panel-episodes"]) {
    element(id).replaceChildren();
  }
  panel.hidden = false;
  if (takesFocus) {
    element("panel-title").focus();
  }
  try {
    const { episodes } = await api.events({ ...filter, limit: most });
    if (mine !== turn) {
      return;
    }
    const own = episodes.filter((episode) => (lane.type === "port" ? episode.remotePort !== null : episode.remotePort === null)).sort(worstFirst);
    await fill(model, lane, column, own, mine);
  } catch (problem) {
    if (mine === turn) {
      element("panel-explanation").replaceChildren(make("p", `The rest is not known: ${problem.message}.`));
    }
  }
}

async function fill(model, lane, column, episodes, mine) {
  const facts = element("panel-facts");
  if (episodes.length > 0) {
    element("panel-sentence").textContent = `${sentenceOf(episodes[0])}${episodes.length > 1 ? ` And ${plural(episodes.length - 1, "more episode")} in this time.` : ""}`;
  }
  const set = lunsOf(episodes);
  addFact(facts, "LUNs", set === null ? ["all LUNs"] : set.size === 0 ? [] : [luns({ all: false, numbers: [...set].sort((one, other) => one - other) })]);
  addFact(facts, "Codes", [...new Set(episodes.flatMap(codes))].slice(0, 8));
  addFact(facts, "Speaks against it", doubts(model, lane, column));
  showEpisodes(element("panel-episodes"), episodes, "There is no episode in this cell.");
  await showDevices(facts, episodes, mine);
  if (episodes.length > 0 && mine === turn) {
    await showExplanation(element("panel-explanation"), episodes[0], mine);
  }
}

export function start(whenClosed) {
  onClose = whenClosed;
  element("panel-close").addEventListener("click", () => {
    close();
    onClose();
  });
  panel.addEventListener("keydown", (event) => {
    if (event.key === "Escape") {
      close();
      onClose();
    }
  });
  element("panel-copy").append(button("Copy", () => {
    const command = element("panel-command");
    copy(command.textContent, command, (text) => { element("panel-said").textContent = text; });
  }));
}
