// Columns of time. They lie on round local times, so that a cell keeps its place while time goes on.

const minute = 60000;
const hour = 60 * minute;
export const day = 24 * hour;
const steps = [1, 2, 5, 10, 15, 30].map((count) => count * minute).concat([1, 2, 3, 4, 6, 8, 12, 24, 48, 168].map((count) => count * hour));

const tickSteps = steps.concat([72, 120, 240].map((count) => count * hour)).sort((one, other) => one - other);

/** Counts are kept by the minute: a shorter range shows nothing more. */
export const leastRange = 5 * minute;

/** {from, to, columns, width}: columns of at least so many pixels, over a range that covers [from, to]. */
export function makeGrid(from, to, pixels, leastPixels) {
  const most = Math.max(4, Math.floor(pixels / leastPixels));
  const width = steps.find((step) => (to - from) / step <= most - 1) ?? Math.ceil((to - from) / most / day) * day;
  const zone = new Date(from).getTimezoneOffset() * minute;
  const begin = Math.floor((from - zone) / width) * width + zone;
  const columns = Math.max(1, Math.ceil((to - begin) / width));
  return { from: begin, to: begin + columns * width, columns, width };
}

/** Times of an axis with their texts, so far apart that the texts have room. */
export function ticks(from, to, pixels) {
  const room = (step) => (step / (to - from)) * pixels;
  const step = tickSteps.find((candidate) => room(candidate) >= (candidate < day ? 84 : 60)) ?? 30 * day;
  const zone = new Date(from).getTimezoneOffset() * minute;
  const found = [];
  let lastDay = "";
  for (let at = Math.ceil((from - zone) / step) * step + zone; at < to; at += step) {
    const date = new Date(at);
    const dayText = `${date.getDate()} ${date.toLocaleDateString("en-GB", { month: "short" })}`;
    const clock = date.toLocaleTimeString("en-GB", { hour: "2-digit", minute: "2-digit" });
    found.push({ at, text: dayText !== lastDay ? (clock === "00:00" || step >= day ? dayText : `${dayText} ${clock}`) : clock, isDay: dayText !== lastDay });
    lastDay = dayText;
  }
  return found;
}
