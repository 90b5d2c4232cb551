#include "tests/unit/store/Damage.h"

#include <algorithm>

#include "sensor/store/src/Database.h"
#include "tests/support/TemporaryDirectory.h"

void damageHistory(const std::string& acrPath) {
    std::string lContent = readFile(acrPath);
    std::fill(lContent.begin() + 4096 * 2, lContent.end(), '\x55');
    writeFile(acrPath, lContent);
    // After a change by somebody else, SQLite reads its pages anew.
    ZTCDatabase(acrPath, ZTDA_ReadWrite).execute("PRAGMA application_id = 1");
}
