// What is different between two moments, as rows of a table, out of the document of `tavik diff`. Nothing here touches the page.

import { initiatorName, plural, portName, shortTime } from "./format.js";

const words = { link: "Link", remotePort: "Remote port", lun: "LUN", path: "Path" };
const mostStates = 4;

/** "array7 ctrl-B from host8"; of paths with how many LUNs, or which. */
function nameOf(subject, luns) {
  const port = subject.remotePort === null ? "an unknown port" : portName(subject.remotePort);
  return {
    link: () => initiatorName(subject.initiator),
    remotePort: () => `${port} from ${initiatorName(subject.initiator)}`,
    lun: () => subject.lunName ?? subject.lun,
    path: () => `${luns === 1 ? subject.lunName ?? subject.lun : plural(luns, "LUN")} by ${initiatorName(subject.initiator)}, ${port}`,
  }[subject.what]();
}

/** Rows of like cells; the paths of all LUNs through the same ports are one row. */
function rowsOf(subjects, cellsOf) {
  const rows = new Map();
  subjects.forEach((subject, index) => {
    const cells = cellsOf(subject);
    const key = subject.what === "path" ? [initiatorName(subject.initiator), subject.remotePort?.wwpn, ...cells].join("\n") : String(index);
    const row = rows.get(key) ?? { subject, cells, luns: 0 };
    row.luns += 1;
    rows.set(key, row);
  });
  return [...rows.values()].map(({ subject, cells, luns }) => [words[subject.what], nameOf(subject, luns), ...cells]);
}

/** [what, name, before, after] of each state that is different. */
export const changeRows = (document) => rowsOf(document.changes, (change) => [change.before ?? "not there", change.after ?? "not there"]);

function statesOf(passing) {
  const shown = passing.states.slice(0, mostStates).map((state) => `${state.state} ${shortTime(state.time, true)}`);
  const more = passing.states.length - shown.length;
  return `${shown.join(", ")}${more > 0 ? ` and ${more} more` : ""}`;
}

/** [what, name, states] of what is the same at both moments and was not in between. */
export const passingRows = (document) => rowsOf(document.passing, (passing) => [statesOf(passing)]);
