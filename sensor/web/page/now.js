// The view of this moment: does Tavik collect, on which adapters, and what is wrong, the worst first.

import * as api from "./api.js";
import { makeAddress } from "./address.js";
import { devicesOf, listDevices } from "./devices.js";
import { element, figure, fillTable, link, make } from "./dom.js";
import { placeOf } from "./episodes.js";
import { duration, initiatorName, number, plural, portName, shortTime } from "./format.js";
import { findingBox } from "./findings.js";
import { kindOf, kinds } from "./kinds.js";
import { makeGrid } from "./grid.js";
import { familyColor, mix, readColors, strengthOf, swatch } from "./palette.js";
import { noteBox, troubleBox } from "./troubles.js";
import { sentenceOf } from "./words.js";

const hour = 3600000;
const mostTroubles = 12;
const mostDevices = 12;
const mostKinds = 3;
let shownFindings = "";
let shownNotes = "";
const looks = new Map(); // what to look at next, by kind

const code = (text) => make("code", text);

// ---- open troubles ----

const rank = (episode) => kinds.indexOf(kindOf(episode.kind));

const ownerOf = (episode) => episode.remotePort ?? episode.initiator;

/** Episodes of one kind that several initiators see are one line. */
function join(members) {
  const numbers = [...new Set(members.flatMap((member) => member.luns?.numbers ?? []))].sort((one, other) => one - other);
  const times = (name) => members.map((member) => member[name]).sort((one, other) => Date.parse(one) - Date.parse(other));
  return { ...members[0], count: members.reduce((sum, member) => sum + member.count, 0), first: times("first")[0], last: times("last").pop(),
    seen: [...new Set(members.map((member) => initiatorName(member.initiator)))],
    devices: members.flatMap((member) => member.devices ?? []),
    luns: members[0].luns === null ? null : { all: members.some((member) => member.luns?.all), numbers } };
}

/** A trouble for each port, with a line for each kind, the worst first. */
function group(episodes) {
  const owners = new Map();
  for (const episode of episodes) {
    const key = ownerOf(episode).wwpn;
    const kindsOf = owners.get(key) ?? new Map();
    kindsOf.set(episode.kind, [...(kindsOf.get(episode.kind) ?? []), episode]);
    owners.set(key, kindsOf);
  }
  return [...owners.values()].map((kindsOf) => [...kindsOf.values()].map(join).sort((one, other) => rank(one) - rank(other)))
    .sort(([one], [other]) => rank(one) - rank(other) || other.count - one.count);
}

async function lookAt(kind) {
  if (!looks.has(kind)) {
    looks.set(kind, api.explain(kind).then((document) => document.parts.find(({ label }) => label === "look at")?.texts ?? []).catch(() => []));
  }
  return looks.get(kind);
}

async function openBox(lines) {
  const worst = lines[0];
  const box = make("article", "", `trouble level-${kindOf(worst.kind).level}`);
  const seen = worst.remotePort === null ? "" : `, seen from ${[...new Set(lines.flatMap((line) => line.seen))].join(" and ")}`;
  box.append(make("h4", [worst.remotePort === null ? initiatorName(worst.initiator) : portName(worst.remotePort), make("span", seen, "quiet plain")]));
  box.append(make("ul", lines.map((line) => make("li", [swatch(kindOf(line.kind).family), ` ${sentenceOf(line, false)} `,
    make("span", `${duration(Date.now() - Date.parse(line.last))} ago. `, "quiet"), link("Timeline", placeOf(line))]))));
  const devices = listDevices(await devicesOf(lines), mostDevices);
  if (devices.length > 0) {
    box.append(make("p", `${devices.map(([name, text]) => `${name}: ${text}`).join(". ")}.`));
  }
  const texts = await lookAt(worst.kind);
  if (texts.length > 0) {
    box.append(make("details", [make("summary", "What to look at next"), ...texts.map((text) => make("p", text))]));
  }
  return box;
}

async function showOpen() {
  const { episodes } = await api.events({ open: "true", limit: 2000 });
  const troubles = group(episodes.filter((episode) => kindOf(episode.kind).level > 1));
  const opened = new Set([...element("open-troubles").querySelectorAll("details[open]")].map((each) => each.parentElement.firstChild.textContent));
  const boxes = await Promise.all(troubles.slice(0, mostTroubles).map(openBox));
  boxes.filter((box) => opened.has(box.firstChild.textContent)).forEach((box) => { box.querySelector("details").open = true; });
  if (troubles.length > mostTroubles) {
    boxes.push(make("p", link(`${plural(troubles.length - mostTroubles, "more port")} with trouble`, makeAddress("events", { open: "true" }))));
  }
  if (boxes.length === 0) {
    boxes.push(make("p", ["No trouble goes on. ", link("See the last 24 hours", makeAddress("timeline", { range: "24h" })), "."], "calm"));
  }
  element("open-troubles").replaceChildren(...boxes);
}

/** What the rules make of the last 24 hours. Noise and notes are not troubles. */
async function showFindings() {
  const { findings } = await api.diagnose();
  const found = (findings ?? []).filter(({ severity }) => severity === "problem" || severity === "warning");
  const text = JSON.stringify(found);
  if (text === shownFindings) {
    return; // what a person has opened stays open
  }
  shownFindings = text;
  element("findings-title").hidden = found.length === 0;
  element("findings").replaceChildren(...found.slice(0, mostTroubles).map(findingBox));
}

// ---- ports ----

function stateDot(state) {
  const isGood = state === "Online";
  return make("span", [make("span", "", `dot ${isGood ? "good" : state === null ? "unknown" : "bad"}`), ` ${state ?? "not known"}`]);
}

function showLinks(status) {
  const kindsOf = new Map((status.kinds ?? []).map((entry) => [entry.initiator.wwpn, Object.values(entry.kinds)]));
  const count = (wwpn, ...states) => (kindsOf.get(wwpn) ?? []).filter((value) => states.includes(value)).length;
  fillTable(element("links"), ["Local port", "WWPN", "Link", "Speed", { text: "Listening to", number: true }, { text: "Without a source", number: true }, { text: "Deaf", number: true }],
    (status.adapters ?? []).map((adapter) => {
      const initiator = adapter.initiator ?? adapter;
      const deaf = count(initiator.wwpn, "no_rights", "failed");
      return [initiatorName(initiator), code(initiator.wwpn ?? "–"), stateDot(adapter.portState ?? null), adapter.speed ?? "–",
        figure(plural(count(initiator.wwpn, "listening"), "kind")), figure(String(count(initiator.wwpn, "no_source"))),
        { text: String(deaf), number: true, className: deaf > 0 ? "bad" : "" }];
    }), "No Fibre Channel adapter is known. Is one plugged in, and is its driver loaded?");
}

/** A day at one look: a bar an hour. */
function sparkline(cells, columns, most) {
  const canvas = make("canvas", "", "spark");
  canvas.width = columns * 8;
  canvas.height = 36;
  canvas.setAttribute("role", "img");
  canvas.setAttribute("aria-label", `${cells.size} of ${columns} half hours with events`);
  const context = canvas.getContext("2d");
  const { ground, line } = readColors();
  context.fillStyle = line;
  context.fillRect(0, 34, canvas.width, 2);
  for (const [column, { count, kind }] of cells) {
    const strength = strengthOf(count, most);
    context.fillStyle = mix(familyColor(kind.family), ground, Math.max(0.6, strength));
    context.fillRect(column * 8, 34 - 32 * strength, 7, 32 * strength);
  }
  return canvas;
}

function portCell(port) {
  const where = link(port.name ?? port.wwpn, makeAddress("timeline", { range: "24h", find: port.wwpn }));
  return port.name === null ? where : make("span", [where, " ", make("span", port.wwpn, "quiet small")]);
}

/** The kinds of a port, the most frequent ones. */
function mostOf(counts) {
  const sorted = Object.entries(counts).sort(([, one], [, other]) => other - one);
  const texts = sorted.slice(0, mostKinds).map(([kind, count]) => `${kind} ${number(count)}`);
  return `${texts.join(", ")}${sorted.length > mostKinds ? `, ${sorted.length - mostKinds} more` : ""}`;
}

async function showPorts() {
  const now = Date.now();
  const grid = makeGrid(now - 24 * hour, now, 500, 10);
  const [document, timeline] = await Promise.all([api.ports({ since: "24h", limit: 50 }), api.timeline(grid.from, grid.to, grid.columns)]);
  const days = new Map();
  let most = 10;
  for (const row of timeline.rows.filter(({ remotePort }) => remotePort !== null)) {
    const cells = days.get(row.remotePort.wwpn) ?? new Map();
    days.set(row.remotePort.wwpn, cells);
    for (const [column, count] of row.cells) {
      const before = cells.get(column);
      const kind = kindOf(row.kind);
      cells.set(column, { count: count + (before?.count ?? 0), kind: before && kinds.indexOf(before.kind) < kinds.indexOf(kind) ? before.kind : kind });
      most = Math.max(most, cells.get(column).count);
    }
  }
  fillTable(element("ports"), ["Remote port", { text: "Events", number: true }, "Last 24 hours", "Last event", "Seen from", "Kinds"],
    document.ports.map((port) => [
      portCell(port.remotePort),
      figure(number(port.count)), sparkline(days.get(port.remotePort.wwpn) ?? new Map(), grid.columns, most), shortTime(port.last),
      port.initiators.map(initiatorName).join(", "),
      mostOf(port.kinds)]),
    "No remote port had an event in the last 24 hours.");
}

// ---- the view ----

function showStatus(status) {
  element("host").textContent = status.host;
  document.title = `${status.host}: ${status.verdict.toLowerCase()} – Tavik`;
}

const failing = { hook: "Hook", output: "Output" };

/** [label, text] of the lines that `tavik status` calls notes, hooks and outputs: Tavik collects all the same. */
const notesOf = (status) => [
  ...status.unknown.map((text) => ["Note", text]),
  ...(status.warnings ?? []).filter(({ kind }) => kind in failing).map(({ kind, text }) => [failing[kind], text]),
];

function showNotes(notes) {
  const text = JSON.stringify(notes);
  if (text === shownNotes) {
    return; // what a person has selected stays selected
  }
  shownNotes = text;
  element("notes").hidden = notes.length === 0;
  element("notes").replaceChildren(...notes.map(noteBox));
}

/** The host's name stands above every view. */
export async function showHost() {
  try {
    showStatus(await api.status());
  } catch {
    // The view says what is wrong.
  }
}

async function part(id, show) {
  try {
    await show();
  } catch (problem) {
    element(id).replaceChildren(make("p", `Not known: ${problem.message}.`, "quiet"));
  }
}

export async function show() {
  let status;
  try {
    status = await api.status();
  } catch (problem) {
    element("headline").textContent = `No answer: ${problem.message}`;
    element("headline").className = "headline bad";
    element("troubles").replaceChildren(make("p", ["Look on the host: ", code("systemctl status tavik"), " and ", code("tavik status"), ". The page asks again by itself."]));
    showNotes([]);
    return;
  }
  showStatus(status);
  element("headline").textContent = status.text;
  element("headline").className = `headline ${status.exit === 0 ? "good" : "bad"}`;
  element("troubles").replaceChildren(...status.troubles.map(troubleBox));
  showNotes(notesOf(status));
  showLinks(status);
  await Promise.all([part("findings", showFindings), part("open-troubles", showOpen), part("ports", showPorts)]);
}
