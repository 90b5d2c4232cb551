#include "sensor/store/src/DamageCheck.h"

#include <array>
#include <fstream>
#include <string_view>
#include <vector>

#include "sensor/store/include/StoreErrors.h"

void refuseForeignFile(const std::string& acrPath) {
    static constexpr std::string_view scBegin("SQLite format 3\0", 16);
    std::array<char, scBegin.size()> lBegin{};
    std::ifstream lFile(acrPath, std::ios::binary);
    lFile.read(lBegin.data(), static_cast<std::streamsize>(lBegin.size()));
    const auto lCount = static_cast<std::size_t>(lFile.gcount());
    if (lCount != 0 && std::string_view(lBegin.data(), lCount) != scBegin) {
        throw ZTCStoreDamagedEx(acrPath + ": it does not begin as a database does");
    }
}

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
