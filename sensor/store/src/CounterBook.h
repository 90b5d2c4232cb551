/// Writes how far the ports' counters rose, a row for each minute, port and counter.
#ifndef SENSOR_STORE_SRC_COUNTERBOOK_H
#define SENSOR_STORE_SRC_COUNTERBOOK_H

#include <cstdint>
#include <map>
#include <span>
#include <string>

#include "sensor/store/include/TopologyHistory.h"
#include "sensor/store/src/Database.h"
#include "sensor/store/src/NameTable.h"

class ZTCCounterBook {
public:
    ZTCCounterBook(ZTCDatabase& arDatabase, ZTCNameTable& arNames) : mrDatabase(arDatabase), mrNames(arNames) {}

    /// Forgets the numbers of names.
    void clear() { mIds.clear(); }

    /// Adds to what the database has of the same minute, port and counter. Differences of 0 are not written.
    void note(std::span<const ZTSCounterSample> aSamples);

private:
    std::int64_t findOrAddName(const std::string& acrName);

    ZTCDatabase& mrDatabase;
    ZTCNameTable& mrNames;
    std::map<std::string, std::int64_t> mIds;
};

#endif
