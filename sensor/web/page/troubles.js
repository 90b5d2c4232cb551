// A trouble of the documents: what is wrong, what to do, and where more stands. And a note, which is no trouble.

import { make } from "./dom.js";

const code = (text) => make("code", text);
/** Of what to do, some is a command and some is for people. */
const doing = (text) => (/^(sudo|tavik|systemctl|journalctl)\b/.test(text) ? code(text) : text);

export function troubleBox(trouble) {
  const box = make("article", "", `trouble level-${trouble.severity === "notice" ? 1 : trouble.severity === "warning" ? 2 : 3}`);
  const title = [trouble.title, trouble.subject].filter(Boolean).join("  ");
  if (title !== "") {
    box.append(make("h4", title));
  }
  box.append(...(trouble.status ?? []).map((text) => make("p", text)));
  if ((trouble.action ?? []).length > 0) {
    box.append(make("p", [make("b", "What to do: "), ...trouble.action.flatMap((text, index) => (index === 0 ? [doing(text)] : [make("br"), doing(text)]))]));
  }
  if (trouble.see) {
    box.append(make("p", [make("b", "More: "), code(trouble.see)], "quiet"));
  }
  return box;
}

export const noteBox = ([label, text]) => make("li", [make("b", `${label}: `), text], "trouble level-1");
