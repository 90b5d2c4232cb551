/// Deletes what is too old or too much, a bounded number of rows at a time. What it takes away is added to the retired
/// totals in the same transaction.
#ifndef SENSOR_STORE_SRC_RETENTION_H
#define SENSOR_STORE_SRC_RETENTION_H

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/Store.h"
#include "sensor/store/src/Database.h"

/// By age: whole days (UTC, by the episodes' last events), the oldest first, at most one an hour, so that a clock that
/// jumped cannot empty the history. By size: the episodes that ended first, until the rest fits. Open episodes stay.
class ZTCRetention {
public:
    explicit ZTCRetention(ZTCDatabase& arDatabase);

    /// Within a transaction. Deletes at most `mStepRows` rows. Returns whether there is more to do at once.
    bool step(const ZTSStoreLimits& acrLimits, std::int64_t aNow, std::chrono::steady_clock::time_point aSteadyNow);

    /// Outside of a transaction: gives at most 256 free pages back. Returns whether more are free.
    bool vacuumStep();

private:
    bool beginDay(const ZTSStoreLimits& acrLimits, std::int64_t aNow, std::chrono::steady_clock::time_point aSteadyNow);
    bool isTooBig(const ZTSStoreLimits& acrLimits);
    std::optional<std::int64_t> findOldestDay();
    void deleteEpisodes(std::int64_t aBefore);
    bool deleteEpisode(std::uint64_t aEpisode);
    void loadCursors();
    bool retire(const ZTSStoreLimits& acrLimits, std::int64_t aNow, std::chrono::steady_clock::time_point aSteadyNow);
    void storeMissed();
    void deleteSlots(const char* apSelect, const char* apDelete, std::int64_t aBefore);
    void deleteOlder(std::int64_t aBefore);

    ZTCDatabase& mrDatabase;
    std::uint32_t mBudget = 0;  ///< rows that the present step may still delete
    /// Of an output of the history, within one step: the last change that it has, and how many later ones were deleted.
    struct Output {
        std::string mName;
        std::uint64_t mSeq = 0;
        std::uint64_t mMissed = 0;
    };
    std::vector<Output> mOutputs;
    std::optional<std::int64_t> mDayInWork;
    std::optional<std::chrono::steady_clock::time_point> mLastBegin;
    ZTCStatement mOldest, mEpisode, mChunks, mDeleteChunk, mDeleteChange, mDeleteEpisode, mRetire;
};

#endif
