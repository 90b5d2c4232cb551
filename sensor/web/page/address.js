// The address of what is shown: "#timeline;range=1h;cell=..." is a view and all that it needs to look the same again.

export const views = ["now", "timeline", "paths", "compare", "events"];

export function readAddress() {
  const [view, ...parts] = location.hash.slice(1).split(";");
  const parameters = {};
  for (const part of parts) {
    const [name, ...rest] = part.split("=");
    try {
      parameters[name] = decodeURIComponent(rest.join("="));
    } catch {
      parameters[name] = "";
    }
  }
  return [views.includes(view) ? view : "now", parameters];
}

/** Characters that an address may hold as they are stay readable. */
const encode = (text) => encodeURIComponent(text).replace(/%3A/g, ":").replace(/%2C/g, ",").replace(/%40/g, "@");

export function makeAddress(view, parameters = {}) {
  const parts = Object.entries(parameters).filter(([, value]) => value !== "" && value !== null && value !== undefined);
  return `#${view}${parts.map(([name, value]) => `;${name}=${encode(String(value))}`).join("")}`;
}

export function writeAddress(view, parameters) {
  history.replaceState(null, "", makeAddress(view, parameters));
}

/** "FROM..TO" as [from, to] in milliseconds; null where it is none. */
export function readSpan(text) {
  const [from, to] = (text ?? "").split("..").map((part) => Date.parse(part));
  return to > from ? [from, to] : null;
}

export function writeSpan([from, to]) {
  return `${new Date(from).toISOString()}..${new Date(to).toISOString()}`;
}
