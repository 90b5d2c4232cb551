// Names of what hangs on a remote port: disks, multipath devices, mounts. From the document of the paths, which is asked
// for once a minute at most. Where there is none, nothing is named.

import * as api from "./api.js";

const minute = 60000;
let asked = 0;
let answer = null;

export async function readPaths() {
  if (Date.now() - asked > minute) {
    asked = Date.now();
    answer = api.paths().catch(() => null);
  }
  return answer;
}

/** {disks, multipaths, mounts, wwids}: sets of texts, for a remote port and some of its LUNs (null: all). */
export async function devicesOf(wwpn, luns) {
  const found = { disks: new Set(), multipaths: new Set(), mounts: new Set() };
  const document = await readPaths();
  for (const unit of document?.luns ?? []) {
    for (const path of unit.paths) {
      if (path.remotePort?.wwpn !== wwpn || (luns !== null && !luns.has(path.lun))) {
        continue;
      }
      if (path.disk) {
        found.disks.add(path.disk);
      }
      if (unit.multipath) {
        found.multipaths.add(unit.multipath);
      }
      (unit.mounts ?? []).forEach((mount) => found.mounts.add(mount));
    }
  }
  return found;
}
