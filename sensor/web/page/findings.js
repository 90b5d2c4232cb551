// A finding of the rules: what the evidence means, what speaks against it, and what to look at next.

import { make } from "./dom.js";
import { plural } from "./format.js";

const levels = { problem: 3, warning: 2 };

const list = (texts) => make("ul", texts.map((text) => make("li", text)));
const asList = (texts) => (Array.isArray(texts) ? texts : texts ? [texts] : []);

export function findingBox(finding) {
  const box = make("article", "", `trouble level-${levels[finding.severity] ?? 1}`);
  box.append(make("h4", [finding.title, finding.subject ? make("span", `, ${finding.subject}`, "plain") : ""]));
  box.append(...asList(finding.seen).map((text) => make("p", text)));
  box.append(make("p", finding.means, "quiet"));
  const more = make("details", make("summary", "What to look at next, and what speaks against it"));
  more.append(list(asList(finding.next)));
  const against = [...asList(finding.against), ...asList(finding.unless)];
  if (against.length > 0) {
    more.append(make("p", make("b", "What speaks against it")), list(against));
  }
  more.append(make("p", `Evidence: ${plural(finding.episodes.length, "episode")} (${finding.episodes.slice(0, 8).join(", ")}${finding.episodes.length > 8 ? " …" : ""}).`, "quiet small"));
  box.append(more);
  return box;
}
