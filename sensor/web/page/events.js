// The view that lists episodes.

import * as api from "./api.js";
import { writeAddress } from "./address.js";
import { element } from "./dom.js";
import { showEpisodes } from "./episodes.js";
import { number } from "./format.js";
import { kinds } from "./kinds.js";

const names = ["kind", "port", "since"];
const most = 1000;

export function open(parameters) {
  const form = element("filter").elements;
  for (const name of names) {
    form[name].value = parameters[name] ?? (name === "since" && parameters.open ? "" : form[name].defaultValue);
  }
  form.open.checked = parameters.open === "true";
  return show();
}

export async function show() {
  const form = element("filter").elements;
  const filter = Object.fromEntries(names.map((name) => [name, form[name].value.trim()]));
  filter.open = form.open.checked ? "true" : "";
  writeAddress("events", filter);
  try {
    const document = await api.events({ ...filter, limit: most });
    const count = document.episodes.length;
    element("events-text").textContent = count === most ? `The newest ${number(most)} episodes, the newest first. Use a filter to see older ones.`
      : `${number(count)} ${count === 1 ? "episode" : "episodes, the newest first"}.`;
    showEpisodes(element("events"), document.episodes.reverse(), "No episode matches the filter. Choose a longer time, or a wider filter.");
  } catch (problem) {
    element("events-text").textContent = problem.message;
    element("events").replaceChildren();
  }
}

export function start() {
  element("kinds").replaceChildren(...kinds.map((kind) => new Option(kind.name)));
  element("filter").addEventListener("submit", (event) => {
    event.preventDefault();
    show();
  });
}
