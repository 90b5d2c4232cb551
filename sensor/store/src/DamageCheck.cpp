#include "sensor/store/src/DamageCheck.h"

#include <string>
#include <vector>

#include "sensor/store/include/StoreErrors.h"

static std::string sQuoted(const std::string& acrName) {
    std::string lText = "\"";
    for (const char lCharacter : acrName) {
        lText += lCharacter == '"' ? "\"\"" : std::string(1, lCharacter);
    }
    return lText + "\"";
}

static void sCheckWhole(ZTCDatabase& arDatabase) {
    ZTCStatement lCheck(arDatabase, "PRAGMA quick_check(1)");
    lCheck.query();
    while (lCheck.step()) {
        if (lCheck.text(0) != "ok") {
            throw ZTCStoreDamagedEx(arDatabase.getPath() + ": " + lCheck.text(0));
        }
    }
}

static void sReadFirstRows(ZTCDatabase& arDatabase) {
    std::vector<std::string> lTables;
    ZTCStatement lNames(arDatabase, "SELECT name FROM sqlite_schema WHERE type = 'table'");
    lNames.query();
    while (lNames.step()) {
        lTables.push_back(lNames.text(0));
    }
    for (const std::string& lrTable : lTables) {
        ZTCStatement(arDatabase, "SELECT * FROM " + sQuoted(lrTable) + " LIMIT 1").query().step();
    }
}

void checkForDamage(ZTCDatabase& arDatabase, std::uint64_t aWholeCheckBytes) {
    const std::int64_t lBytes = arDatabase.readNumber("PRAGMA page_count") * arDatabase.readNumber("PRAGMA page_size");
    if (static_cast<std::uint64_t>(lBytes) <= aWholeCheckBytes) {
        sCheckWhole(arDatabase);
    } else {
        sReadFirstRows(arDatabase);
    }
}
