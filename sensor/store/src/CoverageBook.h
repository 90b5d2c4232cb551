/// When Tavik ran, and in which state each initiator's kinds were.
///
/// An open interval has no end: it lasts until its run was last seen. What a run that vanished left open is ended there
/// when the next run begins.
#ifndef SENSOR_STORE_SRC_COVERAGEBOOK_H
#define SENSOR_STORE_SRC_COVERAGEBOOK_H

#include <cstdint>
#include <map>
#include <span>

#include "sensor/store/include/Ledger.h"
#include "sensor/store/include/Store.h"
#include "sensor/store/src/Database.h"
#include "sensor/store/src/NameTable.h"

class ZTCCoverageBook {
public:
    ZTCCoverageBook(ZTCDatabase& arDatabase, ZTCNameTable& arNames) : mrDatabase(arDatabase), mrNames(arNames) {}

    /// Forgets everything and reads the open intervals.
    void load();

    void beginRun(std::int64_t aNow);
    void noteRunning(std::int64_t aNow);
    void endRun(std::int64_t aNow);
    void note(std::int64_t aNow, std::span<const ZTSKindStateNow> aStates);

private:
    using Key = std::pair<std::uint32_t, ZTCKindKey>;
    struct Interval {
        std::int64_t mId;
        ZTEKindState mState;
    };

    void endIntervals(std::int64_t aTime);

    ZTCDatabase& mrDatabase;
    ZTCNameTable& mrNames;
    std::map<Key, Interval> mOpen;
};

#endif
