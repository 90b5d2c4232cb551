/// The numbers that rise for the life of a database, in its one row of `counter`.
#ifndef SENSOR_STORE_SRC_COUNTER_H
#define SENSOR_STORE_SRC_COUNTER_H

#include <cstdint>
#include <optional>
#include <string>

#include "sensor/store/src/Database.h"

struct ZTSCounter {
    std::string mStoreId;
    std::uint64_t mNextSeq = 1;
    std::uint64_t mNextEpisode = 1;
    std::uint64_t mLastFrame = 0;
    std::uint64_t mRecordsPerEnd = 0;  ///< as set when the database was last written; readers cut to it
    std::uint64_t mRetrievals = 0;
    std::uint64_t mBytes = 0;
    std::uint64_t mRecords = 0;
    std::uint64_t mOccurrences = 0;
    std::optional<std::int64_t> mLastRetrieval;  ///< microseconds since the epoch
    std::uint64_t mTornFrames = 0;
    std::uint64_t mGaps = 0;

    bool operator==(const ZTSCounter&) const = default;

    static ZTSCounter read(ZTCDatabase& arDatabase);
    void write(ZTCDatabase& arDatabase) const;
};

#endif
