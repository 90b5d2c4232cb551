// How values are shown. Nothing here touches the page.

/** The families of kinds, with what a person thinks of first when one shows up. */
export const families = [
  { name: "load", light: "#b35900", dark: "#ffb066", letter: "L",
    kinds: ["queue-full", "device-busy", "fabric-busy", "port-busy", "queue-depth"] },
  { name: "path", light: "#8f1d5c", dark: "#ff8fc4", letter: "P",
    kinds: ["link", "logo", "prlo", "rscn", "plogi", "adisc"] },
  { name: "SCSI", light: "#0b5cad", dark: "#7db8f5", letter: "S",
    kinds: ["check-condition", "lun-reset", "target-reset", "bus-reset", "fcp-read-check"] },
  { name: "fabric", light: "#5a5a00", dark: "#d6d65c", letter: "F", kinds: ["lsrjt"] },
  { name: "adapter", light: "#3d4148", dark: "#c3c8d0", letter: "A",
    kinds: ["port-interrupt", "temperature", "adapter-arrival"] },
];

/** Kinds from the gravest down: a cell shows the letter of the gravest. */
export const gravity = [
  "bus-reset", "target-reset", "lun-reset", "fcp-read-check", "port-interrupt", "link", "logo", "prlo", "lsrjt",
  "temperature", "check-condition", "queue-full", "device-busy", "fabric-busy", "port-busy", "queue-depth", "rscn",
  "plogi", "adisc", "adapter-arrival",
];

export function familyOf(kind) {
  return families.find((family) => family.kinds.includes(kind)) ?? families[families.length - 1];
}

export function gravest(kinds) {
  return [...kinds].sort((one, other) => gravity.indexOf(one) - gravity.indexOf(other))[0];
}

export function number(value) {
  return value === null || value === undefined ? "–" : value.toLocaleString("en-US");
}

/** Local time, as short as the distance from now allows. */
export function time(value, withDate = true) {
  const date = new Date(value);
  const clock = date.toLocaleTimeString("en-GB");
  return withDate ? `${date.toLocaleDateString("sv-SE")} ${clock}` : clock;
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
  return set.all ? "all LUNs" : set.numbers.length === 0 ? "" : `LUN ${set.numbers.join(", ")}`;
}

/** A table of rows of cells; a cell is a text, or {text, number}. */
export function fillTable(table, heads, rows, empty) {
  const make = (name, cell) => {
    const element = document.createElement(name);
    element.textContent = cell.text ?? cell;
    if (cell.number) {
      element.className = "number";
    }
    return element;
  };
  const head = document.createElement("thead");
  const headRow = head.insertRow();
  for (const cell of heads) {
    const element = make("th", cell);
    element.scope = "col";
    headRow.append(element);
  }
  const body = document.createElement("tbody");
  for (const row of rows) {
    const line = body.insertRow();
    row.forEach((cell) => line.append(make("td", cell)));
  }
  if (rows.length === 0) {
    const cell = body.insertRow().insertCell();
    cell.colSpan = heads.length;
    cell.textContent = empty;
  }
  table.replaceChildren(head, body);
}
