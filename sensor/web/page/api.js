// Questions to the sensor. Every answer is one of its documents; a refusal is an error with its text.

async function ask(path, parameters = {}) {
  const query = new URLSearchParams();
  for (const [name, value] of Object.entries(parameters)) {
    if (value !== "" && value !== null && value !== undefined) {
      query.append(name, value);
    }
  }
  const response = await fetch(`/api/v1/${path}?${query}`);
  const document = await response.json();
  if (!response.ok) {
    throw new Error(document.error ?? `status ${response.status}`);
  }
  return document;
}

export const status = () => ask("status");
export const ports = (parameters) => ask("ports", parameters);
export const events = (parameters) => ask("events", parameters);
export const timeline = (from, to, columns) =>
  ask("timeline", { from: from.toISOString(), to: to.toISOString(), columns });

/** Calls back with every change of an episode; reconnects by itself. Returns nothing. */
export function follow(onEpisode, onState) {
  const source = new EventSource("/api/v1/stream");
  source.addEventListener("episode", (event) => onEpisode(JSON.parse(event.data)));
  source.addEventListener("open", () => onState("Live"));
  source.addEventListener("error", () => onState("Not live: the sensor does not answer. Trying again …"));
}
