// How values are shown. Nothing here touches the page.

export function number(value) {
  return value === null || value === undefined ? "–" : value.toLocaleString("en-US");
}

/** "once", "2 times", "1,204 times". */
export function times(count) {
  return count === 1 ? "once" : `${number(count)} times`;
}

export function plural(count, noun) {
  return `${number(count)} ${noun}${count === 1 ? "" : "s"}`;
}

/** Local date and time; the date is left out where it is today's and `withDate` is false. */
export function time(value, withDate = true) {
  const date = new Date(value);
  const clock = date.toLocaleTimeString("en-GB");
  return withDate ? `${day(date)} ${clock}` : clock;
}

export function day(value) {
  return new Date(value).toLocaleDateString("sv-SE");
}

/** "12 Nov 09:58", with seconds where asked for. */
export function shortTime(value, withSeconds = false) {
  const date = new Date(value);
  const clock = date.toLocaleTimeString("en-GB", withSeconds ? {} : { hour: "2-digit", minute: "2-digit" });
  return `${date.getDate()} ${date.toLocaleDateString("en-GB", { month: "short" })} ${clock}`;
}

/** From a time to another; the second date is left out where it is the first's. */
export function span(from, to) {
  return day(from) === day(to) ? `${shortTime(from)} to ${time(to, false).slice(0, 5)}` : `${shortTime(from)} to ${shortTime(to)}`;
}

/** "40 s", "12 min", "3 h", "6 days". */
export function duration(milliseconds) {
  const seconds = Math.round(milliseconds / 1000);
  const steps = [[172800, 86400, "days"], [5400, 3600, "h"], [90, 60, "min"]];
  const [, unit, name] = steps.find(([least]) => seconds >= least) ?? [0, 1, "s"];
  return `${Math.round(seconds / unit)} ${name}`;
}

export function portName(port) {
  return port === null ? "no remote port" : port.name ?? port.wwpn;
}

export function initiatorName(initiator) {
  return initiator === null ? "–" : initiator.host ?? initiator.wwpn ?? "unknown adapter";
}

export function luns(set) {
  if (!set) {
    return "";
  }
  return set.all ? "all LUNs" : set.numbers.length === 0 ? "" : `${set.numbers.length === 1 ? "LUN" : "LUNs"} ${ranges(set.numbers)}${set.more ? " and more" : ""}`;
}

/** Rising numbers as "0-7, 12, 14". */
export function ranges(numbers) {
  const texts = [];
  for (let begin = 0; begin < numbers.length;) {
    let end = begin;
    while (end + 1 < numbers.length && numbers[end + 1] === numbers[end] + 1) {
      end += 1;
    }
    texts.push(end - begin < 2 ? numbers.slice(begin, end + 1).join(", ") : `${numbers[begin]}-${numbers[end]}`);
    begin = end + 1;
  }
  return texts.join(", ");
}

/** The codes of an episode: sense data, reasons, addresses, in the field's own words. */
export function codes(episode) {
  const detail = episode.detail ?? {};
  const hex = (value) => (value === null || value === undefined ? "?" : `0x${value.toString(16).padStart(2, "0")}`);
  const texts = [];
  if (detail.senseKey !== undefined) {
    texts.push(`sense key ${hex(detail.senseKey)}, ASC ${hex(detail.asc)}, ASCQ ${(detail.ascqs ?? []).map(hex).join(" ") || "?"}`);
    if ((detail.commandCodes ?? []).length > 0) {
      texts.push(`commands ${detail.commandCodes.map(hex).join(" ")}`);
    }
  }
  if (detail.opCode !== undefined) {
    texts.push(`command ${hex(detail.opCode)}`);
  }
  if (detail.originalCommand !== undefined) {
    texts.push(`rejected command ${hex(detail.originalCommand)}`);
  }
  for (const reason of detail.reasons ?? []) {
    const words = Object.entries(reason).filter(([name]) => name !== "count").map(([name, value]) => `${name} ${hex(value)}`);
    texts.push(`${words.join(", ")} (${times(reason.count)})`);
  }
  if (detail.address !== undefined) {
    texts.push(`${detail.addressFormat} ${detail.address}`);
  }
  return texts;
}
