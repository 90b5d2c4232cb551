// The page: which view is shown, and what is live in it.

import * as api from "./api.js";
import { fillTable, initiatorName, number, time } from "./format.js";
import * as timeline from "./timeline.js";

const element = (id) => document.getElementById(id);
const views = ["now", "timeline", "events"];

/** "#timeline;range=1h" is the view and what it needs to look the same again. */
function readAddress() {
  const [view, ...parts] = decodeURIComponent(location.hash.slice(1)).split(";");
  return [views.includes(view) ? view : "now", Object.fromEntries(parts.map((part) => part.split(/=(.*)/s)))];
}

function writeAddress(view, parameters) {
  const parts = Object.entries(parameters).map(([name, value]) => `;${name}=${encodeURIComponent(value)}`);
  window.history.replaceState(null, "", `#${view}${parts.join("")}`);
}

function showView() {
  const [view, parameters] = readAddress();
  for (const name of views) {
    element(`view-${name}`).hidden = name !== view;
  }
  for (const link of document.querySelectorAll("nav a")) {
    link.toggleAttribute("aria-current", false);
    if (link.dataset.view === view) {
      link.setAttribute("aria-current", "page");
    }
  }
  if (view === "timeline") {
    timeline.setRange(timeline.readRange(parameters.range ?? "24h"), false);
  } else if (view === "events") {
    for (const name of ["kind", "port", "since"]) {
      element("filter").elements[name].value = parameters[name] ?? element("filter").elements[name].value;
    }
    showEvents();
  } else {
    showNow();
  }
}

function troubleBox(trouble) {
  const box = document.createElement("div");
  box.className = "trouble";
  const add = (label, lines, isCode) => {
    for (const line of lines) {
      const paragraph = document.createElement("p");
      const text = document.createElement(isCode ? "code" : "span");
      text.textContent = line;
      paragraph.append(label, text);
      box.append(paragraph);
    }
  };
  if (trouble.title !== null) {
    const title = document.createElement("strong");
    title.textContent = `${trouble.title} ${trouble.subject ?? ""}`;
    box.append(title);
  }
  add("", trouble.status, false);
  add("What to do: ", trouble.action, true);
  add("More: ", [trouble.see], true);
  return box;
}

async function showNow() {
  let status;
  try {
    status = await api.status();
  } catch (problem) {
    element("headline").textContent = `The sensor does not answer: ${problem.message}`;
    element("headline").className = "headline bad";
    return;
  }
  element("host").textContent = status.host;
  document.title = `${status.host}: ${status.verdict.toLowerCase()} – Tavik`;
  element("headline").textContent = status.text;
  element("headline").className = `headline ${status.exit === 0 ? "good" : "bad"}`;
  element("troubles").replaceChildren(...status.troubles.map(troubleBox));
  const kinds = new Map((status.kinds ?? []).map((entry) => [entry.initiator.wwpn, Object.values(entry.kinds)]));
  const count = (wwpn, state) => (kinds.get(wwpn) ?? []).filter((value) => value === state).length;
  fillTable(element("links"), ["Local port", "WWPN", "State", "Speed", { text: "Listening to", number: true }, { text: "Without a source", number: true }, { text: "Deaf", number: true }],
    (status.adapters ?? []).map((adapter) => {
      const initiator = adapter.initiator ?? adapter;
      return [initiatorName(initiator), initiator.wwpn ?? "–", adapter.portState ?? "–", adapter.speed ?? "–",
        ...["listening", "no_source"].map((state) => ({ text: String(count(initiator.wwpn, state)), number: true })),
        { text: String(count(initiator.wwpn, "no_rights") + count(initiator.wwpn, "failed")), number: true }];
    }), "No Fibre Channel adapter is known.");
  try {
    const document = await api.ports({ since: "24h" });
    fillTable(element("ports"), ["Remote port", "Name", { text: "Events", number: true }, "Last", "Seen from", "Kinds"],
      document.ports.map((port) => [port.remotePort.wwpn, port.remotePort.name ?? "–", { text: number(port.count), number: true },
        time(port.last), port.initiators.map(initiatorName).join(", "),
        Object.entries(port.kinds).map(([kind, events]) => `${kind} ${number(events)}`).join(", ")]),
      "No remote port had an event.");
  } catch (problem) {
    fillTable(element("ports"), ["Remote ports"], [], problem.message);
  }
}

async function showEvents() {
  const form = element("filter").elements;
  const filter = { kind: form.kind.value.trim(), port: form.port.value.trim(), since: form.since.value.trim(),
    open: form.open.checked ? "true" : "" };
  writeAddress("events", Object.fromEntries(Object.entries(filter).filter(([, value]) => value !== "")));
  try {
    const document = await api.events(filter);
    element("events-text").textContent = `${number(document.episodes.length)} episodes, the newest first.`;
    timeline.showEpisodes(element("events"), document.episodes.reverse());
  } catch (problem) {
    element("events-text").textContent = problem.message;
    element("events").replaceChildren();
  }
}

/** Changes come in bursts: the views are loaded again once a burst is over, and at least every two seconds in it. */
let pending = null;
function noteChange() {
  pending ??= setTimeout(() => {
    pending = null;
    const [view] = readAddress();
    if (view === "now") {
      showNow();
    }
    timeline.noteChange();
  }, 2000);
}

timeline.start((range) => writeAddress("timeline", { range }));
element("filter").addEventListener("submit", (event) => {
  event.preventDefault();
  showEvents();
});
window.addEventListener("hashchange", showView);
showView();
api.follow(noteChange, (text) => { element("live").textContent = text; });
setInterval(noteChange, 15000);
