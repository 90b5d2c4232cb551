// What the page knows of the twenty kinds of event: one row each. The documents bear the kinds' names; the words for
// people stand here. Nothing here touches the page.

/** Hues that people with any sort of color blindness tell apart, also where they are pale. The tests compute it. */
export const families = [
  { name: "load", light: "#e69f00", dark: "#ffc34d", tells: "a target or the fabric is busy" },
  { name: "path", light: "#cc3311", dark: "#d55e00", tells: "links, log-outs and log-ins" },
  { name: "SCSI", light: "#004488", dark: "#648fff", tells: "resets, sense data, short reads" },
  { name: "fabric", light: "#00a6a6", dark: "#00c08b", tells: "changes and rejects of the fabric" },
  { name: "adapter", light: "#222222", dark: "#e8e8e8", tells: "the adapters themselves" },
];

const [load, path, scsi, fabric, adapter] = families;

/** A kind's row: name, the letter that its cells show, family, level, and what happened in words. Level 3 may stop I/O, 2
 *  slows it down or comes before trouble, 1 is news. The worst kind stands first. */
const row = (name, letter, family, level, says) => ({ name, letter, family, level, says });
export const kinds = [
  row("bus-reset", "B", scsi, 3, (who, times) => `The bus of ${who} was reset ${times}`),
  row("target-reset", "T", scsi, 3, (who, times) => `${who} was reset ${times}`),
  row("lun-reset", "L", scsi, 3, (who, times) => `LUNs of ${who} were reset ${times}`),
  row("link", "K", path, 3, (who, times) => `The link of ${who} changed ${times}`),
  row("port-interrupt", "I", adapter, 3, (who, times) => `The adapter of ${who} reported an error of its own ${times}`),
  row("fcp-read-check", "R", scsi, 3, (who, times) => `Reads from ${who} returned other data than the target sent ${times}`),
  row("logo", "O", path, 3, (who, times) => `${who} logged out ${times}`),
  row("prlo", "P", path, 3, (who, times) => `${who} ended the SCSI session ${times}`),
  row("lsrjt", "J", fabric, 2, (who, times) => `${who} rejected a request ${times}`),
  row("temperature", "H", adapter, 2, (who, times) => `The adapter of ${who} reported its temperature ${times}`),
  row("check-condition", "C", scsi, 2, (who, times) => `LUNs of ${who} reported check conditions ${times}`),
  row("queue-full", "Q", load, 2, (who, times) => `${who} answered that its queue is full ${times}`),
  row("device-busy", "D", load, 2, (who, times) => `LUNs of ${who} answered that they are busy ${times}`),
  row("port-busy", "Y", load, 2, (who, times) => `${who} answered that it is busy ${times}`),
  row("fabric-busy", "F", load, 2, (who, times) => `The fabric answered ${who} that it is busy ${times}`),
  row("queue-depth", "U", load, 1, (who, times) => `The queue depth for ${who} was changed ${times}`),
  row("rscn", "S", fabric, 1, (who, times) => `The fabric reported a change of ${who} ${times}`),
  row("plogi", "G", path, 1, (who, times) => `${who} logged in ${times}`),
  row("adisc", "A", path, 1, (who, times) => `${who} verified its session ${times}`),
  row("adapter-arrival", "N", adapter, 1, (who, times) => `The adapter of ${who} arrived ${times}`),
];

const byName = new Map(kinds.map((kind) => [kind.name, kind]));

/** A kind that this page does not know is shown by its name, among those of the adapters. */
export function kindOf(name) {
  return byName.get(name) ?? row(name, "?", adapter, 2, (who, times) => `${who}: ${name} ${times}`);
}

/** The most severe of some kinds' names. */
export function worstOf(names) {
  const rank = (kind) => {
    const index = kinds.indexOf(kind);
    return index < 0 ? kinds.length : index;
  };
  return [...names].map(kindOf).reduce((worst, kind) => (rank(kind) < rank(worst) ? kind : worst));
}
