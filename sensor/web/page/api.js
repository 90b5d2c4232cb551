// Questions to the sensor. Every answer is one of its documents; a refusal is an error with its text.

async function ask(path, parameters = {}) {
  const query = new URLSearchParams();
  for (const [name, value] of Object.entries(parameters)) {
    for (const one of Array.isArray(value) ? value : [value]) {
      if (one !== "" && one !== null && one !== undefined) {
        query.append(name, one);
      }
    }
  }
  let response;
  try {
    response = await fetch(`/api/v1/${path}?${query}`);
  } catch {
    throw new Error("the sensor does not answer");
  }
  const document = await response.json();
  if (!response.ok) {
    throw new Error(document.error ?? `status ${response.status}`);
  }
  return document;
}

const time = (value) => new Date(value).toISOString();

export const status = () => ask("status");
export const ports = (parameters) => ask("ports", parameters);
export const events = (parameters) => ask("events", parameters);
export const paths = () => ask("paths");
/** @param parameters  {from, to, "before-since", "after-since"} as texts */
export const diff = (parameters) => ask("diff", parameters);
export const explain = (subject) => ask("explain", { subject });
export const diagnose = () => ask("explain");
export const timeline = (from, to, columns) => ask("timeline", { from: time(from), to: time(to), columns });

/** Calls back with every change of an episode. Reconnects by itself. A page that is left may be kept by the browser for the
 *  way back: it gives its connection up, for there are only a few to one server. */
export function follow(onEpisode, onState) {
  let source = null;
  let retry = null;
  const open = () => {
    source = new EventSource("/api/v1/stream");
    source.addEventListener("episode", (event) => onEpisode(JSON.parse(event.data)));
    source.addEventListener("open", () => onState("Live", true));
    source.addEventListener("error", () => {
      onState("Not live. Trying again …", false);
      if (source.readyState === EventSource.CLOSED) { // refused: the browser does not try again by itself
        retry = setTimeout(open, 5000);
      }
    });
  };
  window.addEventListener("pagehide", () => {
    clearTimeout(retry);
    source.close();
  });
  window.addEventListener("pageshow", (event) => event.persisted && open());
  open();
}
