// Names of what hangs on a remote port: disks, multipath devices, mounts. Episodes bear those of their own time; for others
// the document of the paths is asked, once a minute at most. What is not known is not named.

import * as api from "./api.js";

const minute = 60000;
let asked = 0;
let answer = null;

async function readPaths() {
  if (Date.now() - asked > minute) {
    asked = Date.now();
    answer = api.paths().catch(() => null);
  }
  return answer;
}

const makeFound = () => ({ multipaths: new Set(), disks: new Set(), mounts: new Set() });

function add(found, device) {
  if (device.disk) {
    found.disks.add(device.disk);
  }
  if (device.multipath) {
    found.multipaths.add(device.multipath);
  }
  (device.mounts ?? []).forEach((mount) => found.mounts.add(mount));
}

/** What hangs on the LUNs of some episodes of one remote port: {multipaths, disks, mounts}. */
export async function devicesOf(episodes) {
  const found = makeFound();
  const own = episodes.flatMap((episode) => episode.devices ?? []);
  own.forEach((device) => add(found, device));
  const about = episodes.filter((episode) => episode.remotePort !== null);
  if (own.length > 0 || about.length === 0) {
    return found;
  }
  const isAll = about.some(({ luns }) => luns?.all) || about.every(({ luns }) => !luns);
  const numbers = new Set(about.flatMap(({ luns }) => luns?.numbers ?? []));
  const wwpns = new Set(about.map(({ remotePort }) => remotePort.wwpn));
  for (const unit of (await readPaths())?.luns ?? []) {
    for (const path of unit.paths.filter(({ remotePort, lun }) => wwpns.has(remotePort?.wwpn) && (isAll || numbers.has(lun)))) {
      add(found, { disk: path.disk, multipath: unit.multipath, mounts: unit.mounts });
    }
  }
  return found;
}

const byName = (one, other) => one.localeCompare(other, "en", { numeric: true });

/** [["Disks", [...]], ...]: those that there are, each list cut to so many. */
export function listDevices(found, most) {
  const names = [["Multipath devices", found.multipaths], ["Disks", found.disks], ["Mounts", found.mounts]];
  return names.filter(([, values]) => values.size > 0)
    .map(([name, values]) => [name, `${[...values].sort(byName).slice(0, most).join(", ")}${values.size > most ? ` and ${values.size - most} more` : ""}`]);
}
