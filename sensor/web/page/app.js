// The page: which view is shown, and what is live in it.

import * as api from "./api.js";
import { readAddress, views, writeAddress } from "./address.js";
import * as compare from "./compare.js";
import { element } from "./dom.js";
import * as events from "./events.js";
import * as now from "./now.js";
import * as paths from "./paths.js";
import * as timeline from "./timeline.js";

/** A burst of changes becomes one loading, two seconds after its first. */
const gathering = 2000;
/** Also without a change things move: the time, the state, the age of what is shown. */
const beat = 15000;

function showView() {
  const [view, parameters] = readAddress();
  for (const name of views) {
    element(`view-${name}`).hidden = name !== view;
  }
  for (const each of document.querySelectorAll("nav a")) {
    if (each.dataset.view === view) {
      each.setAttribute("aria-current", "page");
    } else {
      each.removeAttribute("aria-current");
    }
  }
  const shows = { timeline: timeline.open, events: events.open, paths: paths.open, compare: compare.open, now: now.show };
  shows[view](parameters);
  if (view !== "now") {
    now.showHost();
  }
}

let gathered = 0;
let pending = null;

function showChanges() {
  pending = null;
  const [view] = readAddress();
  if (view === "now") {
    now.show();
  } else {
    now.showHost();
  }
  timeline.noteChanges(gathered);
  gathered = 0;
}

function noteChange() {
  gathered += 1;
  pending ??= setTimeout(showChanges, gathering);
}

timeline.start((parameters) => writeAddress("timeline", parameters));
events.start();
compare.start();
paths.start();
window.addEventListener("hashchange", showView);
showView();
api.follow(noteChange, (text, isLive) => {
  element("live").textContent = text;
  element("live").className = isLive ? "good" : "bad";
});
setInterval(showChanges, beat);
