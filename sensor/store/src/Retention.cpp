#include "sensor/store/src/Retention.h"

#include <algorithm>
#include <array>
#include <limits>
#include <vector>

#include "sensor/store/src/CountBook.h"

static constexpr std::chrono::hours scBetweenDays(1);
static constexpr int scVacuumPages = 256;

/// The time at which a day was last begun, in the table of values, so that a restart does not begin one anew.
static constexpr const char* scLastBeginName = "retention.lastDay";

ZTCRetention::ZTCRetention(ZTCDatabase& arDatabase)
    : mrDatabase(arDatabase),
      mOldest(arDatabase,
              "SELECT id FROM episode INDEXED BY episode_last WHERE last < ? AND phase = 2 ORDER BY last "
              "LIMIT 1"),
      mEpisode(arDatabase,
               "SELECT initiator, kind, port, count, openSeq, updateSeq, closeSeq FROM episode WHERE id = ?"),
      mChunks(arDatabase, "SELECT ordinal FROM record WHERE episode = ? LIMIT ?"),
      mDeleteChunk(arDatabase, "DELETE FROM record WHERE episode = ? AND ordinal = ?"),
      mDeleteChange(arDatabase, "DELETE FROM change WHERE seq = ?"),
      mDeleteEpisode(arDatabase, "DELETE FROM episode WHERE id = ?"),
      mRetire(arDatabase, "UPDATE total SET retired = retired + ? WHERE initiator = ? AND kind = ? AND port = ?") {}

std::optional<std::int64_t> ZTCRetention::findOldestDay() {
    std::optional<std::int64_t> lOldest;
    for (const auto& [lpSql, lLength] :
         {std::pair("SELECT last FROM episode INDEXED BY episode_last WHERE last >= ? AND phase = 2 ORDER BY last "
                    "LIMIT 1",
                    std::int64_t{1}),
          std::pair("SELECT slot FROM minute WHERE slot >= ? ORDER BY slot LIMIT 1", gcMinuteMicroseconds),
          std::pair("SELECT timeTo FROM topology WHERE timeTo >= ? ORDER BY timeTo LIMIT 1", std::int64_t{1}),
          std::pair("SELECT slot FROM portCounter WHERE slot >= ? ORDER BY slot LIMIT 1", gcMinuteMicroseconds),
          std::pair("SELECT slot FROM day WHERE slot >= ? ORDER BY slot LIMIT 1", gcDayMicroseconds)}) {
        ZTCStatement lFirst(mrDatabase, lpSql);
        if (lFirst.query(std::numeric_limits<std::int64_t>::min()).step()) {
            const std::int64_t lDay = getSlot(lFirst.number(0) * lLength, gcDayMicroseconds);
            lOldest = std::min(lOldest.value_or(lDay), lDay);
        }
    }
    return lOldest;
}

/// Whether a day is to be deleted; sets it.
bool ZTCRetention::beginDay(const ZTSStoreLimits& acrLimits, std::int64_t aNow,
                            std::chrono::steady_clock::time_point aSteadyNow) {
    if (acrLimits.mDays == 0 || (mLastBegin && aSteadyNow - *mLastBegin < scBetweenDays)) {
        return false;
    }
    const std::optional<std::int64_t> lOldest = findOldestDay();
    if (!lOldest || *lOldest >= getSlot(aNow, gcDayMicroseconds) - acrLimits.mDays) {
        return false;
    }
    ZTCStatement lLast(mrDatabase, "SELECT value FROM value WHERE name = ?");
    if (lLast.query(std::string_view(scLastBeginName)).step()) {
        const std::int64_t lPassed = aNow - lLast.number(0);
        lLast.reset();
        const bool lIsRecent = lPassed >= 0 && lPassed < std::chrono::microseconds(scBetweenDays).count();
        if (!mLastBegin && lIsRecent) {
            return false;
        }
    }
    ZTCStatement(mrDatabase,
                 "INSERT INTO value(name, value) VALUES (?, ?) ON CONFLICT DO UPDATE SET value = excluded.value")
        .run(std::string_view(scLastBeginName), aNow);
    mLastBegin = aSteadyNow;
    mDayInWork = lOldest;
    return true;
}

bool ZTCRetention::isTooBig(const ZTSStoreLimits& acrLimits) {
    if (acrLimits.mBytes == 0) {
        return false;
    }
    const std::int64_t lPages =
        mrDatabase.readNumber("PRAGMA page_count") - mrDatabase.readNumber("PRAGMA freelist_count");
    return static_cast<std::uint64_t>(lPages * mrDatabase.readNumber("PRAGMA page_size")) > acrLimits.mBytes;
}

/// Returns whether it is gone; false where the step's rows did not suffice.
bool ZTCRetention::deleteEpisode(std::uint64_t aEpisode) {
    std::vector<std::uint64_t> lChunks;
    mChunks.query(aEpisode, mBudget);
    while (mChunks.step()) {
        lChunks.push_back(mChunks.number<std::uint64_t>(0));
    }
    for (const std::uint64_t lChunk : lChunks) {
        mDeleteChunk.run(aEpisode, lChunk);
        --mBudget;
    }
    static constexpr std::uint32_t scOwnRows = 4;  // the episode and its three changes
    if (mBudget < scOwnRows) {
        return false;
    }
    if (!mEpisode.query(aEpisode).step()) {
        return true;
    }
    const std::array<std::uint64_t, 3> lChanges = {mEpisode.number<std::uint64_t>(4), mEpisode.number<std::uint64_t>(5),
                                                   mEpisode.number<std::uint64_t>(6)};
    mRetire.run(mEpisode.number(3), mEpisode.number(0), mEpisode.number(1), mEpisode.number(2));
    mEpisode.reset();
    for (const std::uint64_t lSeq : lChanges) {
        if (lSeq == 0) {
            continue;
        }
        mDeleteChange.run(lSeq);
        for (Output& lrOutput : mOutputs) {
            lrOutput.mMissed += lSeq > lrOutput.mSeq ? 1 : 0;
        }
    }
    mDeleteEpisode.run(aEpisode);
    mBudget -= scOwnRows;
    return true;
}

/// Outputs keep their places as values: "outlet.NAME.seq".
void ZTCRetention::loadCursors() {
    mOutputs.clear();
    ZTCStatement lRows(mrDatabase, "SELECT name, value FROM value WHERE name GLOB 'outlet.*.seq'");
    lRows.query();
    while (lRows.step()) {
        const std::string lName = lRows.text(0);
        mOutputs.push_back({.mName = lName.substr(0, lName.rfind('.')), .mSeq = lRows.number<std::uint64_t>(1)});
    }
}

/// What an output can no longer get is counted with the deletion: "outlet.NAME.missed".
void ZTCRetention::storeMissed() {
    for (const Output& lrOutput : mOutputs) {
        if (lrOutput.mMissed != 0) {
            ZTCStatement(mrDatabase,
                         "INSERT INTO value(name, value) VALUES (?, ?) ON CONFLICT DO UPDATE SET value = "
                         "CAST(value AS INTEGER) + excluded.value")
                .run(lrOutput.mName + ".missed", std::to_string(lrOutput.mMissed));
        }
    }
}

/// Closed episodes whose last event lies before that time, the oldest first.
void ZTCRetention::deleteEpisodes(std::int64_t aBefore) {
    while (mBudget != 0 && mOldest.query(aBefore).step()) {
        const auto lEpisode = mOldest.number<std::uint64_t>(0);
        mOldest.reset();
        if (!deleteEpisode(lEpisode)) {
            mBudget = 0;
        }
    }
}

/// Rows with four columns of a key, of slots before that one.
void ZTCRetention::deleteSlots(const char* apSelect, const char* apDelete, std::int64_t aBefore) {
    std::vector<std::array<std::int64_t, 4>> lKeys;
    ZTCStatement lSelect(mrDatabase, apSelect);
    lSelect.query(aBefore, mBudget);
    while (lSelect.step()) {
        lKeys.push_back({lSelect.number(0), lSelect.number(1), lSelect.number(2), lSelect.number(3)});
    }
    ZTCStatement lDelete(mrDatabase, apDelete);
    for (const auto& [lSlot, lInitiator, lKind, lPort] : lKeys) {
        lDelete.run(lSlot, lInitiator, lKind, lPort);
        --mBudget;
    }
}

/// Counts, counters, coverage, runs, gaps and what the topology was, that ended before that time, which begins a day.
void ZTCRetention::deleteOlder(std::int64_t aBefore) {
    deleteSlots("SELECT slot, initiator, kind, port FROM minute WHERE slot < ? ORDER BY slot LIMIT ?",
                "DELETE FROM minute WHERE slot = ? AND initiator = ? AND kind = ? AND port = ?",
                getSlot(aBefore, gcMinuteMicroseconds));
    deleteSlots("SELECT slot, initiator, kind, port FROM day WHERE slot < ? ORDER BY slot LIMIT ?",
                "DELETE FROM day WHERE slot = ? AND initiator = ? AND kind = ? AND port = ?",
                getSlot(aBefore, gcDayMicroseconds));
    deleteSlots("SELECT slot, initiator, port, counter FROM portCounter WHERE slot < ? ORDER BY slot LIMIT ?",
                "DELETE FROM portCounter WHERE slot = ? AND initiator = ? AND port = ? AND counter = ?",
                getSlot(aBefore, gcMinuteMicroseconds));
    for (const char* const lpSql :
         {"DELETE FROM coverage WHERE id IN (SELECT id FROM coverage WHERE timeTo < ? LIMIT ?)",
          "DELETE FROM run WHERE id IN (SELECT id FROM run WHERE timeTo < ? AND id < (SELECT max(id) FROM run) LIMIT "
          "?)",
          "DELETE FROM topology WHERE id IN (SELECT id FROM topology WHERE timeTo < ? LIMIT ?)",
          "DELETE FROM scan WHERE id IN (SELECT id FROM scan WHERE timeTo < ? AND id < (SELECT max(id) FROM scan) "
          "LIMIT ?)",
          "DELETE FROM gapCount WHERE (gap, initiator, kind) IN (SELECT c.gap, c.initiator, c.kind FROM gap g "
          "JOIN gapCount c ON c.gap = g.seq WHERE g.timeTo < ? LIMIT ?)",
          "DELETE FROM gap WHERE seq IN (SELECT seq FROM gap WHERE timeTo < ? AND "
          "NOT EXISTS (SELECT 1 FROM gapCount WHERE gap = gap.seq) LIMIT ?)"}) {
        if (mBudget != 0) {
            ZTCStatement(mrDatabase, lpSql).run(aBefore, mBudget);
            mBudget -= static_cast<std::uint32_t>(mrDatabase.countChangedRows());
        }
    }
}

bool ZTCRetention::step(const ZTSStoreLimits& acrLimits, std::int64_t aNow,
                        std::chrono::steady_clock::time_point aSteadyNow) {
    mBudget = std::max<std::uint32_t>(acrLimits.mStepRows, 8);
    loadCursors();
    const bool lHasMore = retire(acrLimits, aNow, aSteadyNow);
    storeMissed();
    return lHasMore;
}

/// Returns whether there is more to do at once.
bool ZTCRetention::retire(const ZTSStoreLimits& acrLimits, std::int64_t aNow,
                          std::chrono::steady_clock::time_point aSteadyNow) {
    if (mDayInWork || beginDay(acrLimits, aNow, aSteadyNow)) {
        const std::int64_t lEnd = (*mDayInWork + 1) * gcDayMicroseconds;
        deleteEpisodes(lEnd);
        deleteOlder(lEnd);
        if (mBudget == 0) {
            return true;
        }
        mDayInWork.reset();
    }
    if (!isTooBig(acrLimits)) {
        return false;
    }
    const std::uint32_t lBefore = mBudget;
    deleteEpisodes(std::numeric_limits<std::int64_t>::max());
    ZTCStatement lOldest(mrDatabase, "SELECT last FROM episode ORDER BY last LIMIT 1");
    const std::int64_t lLast = lOldest.query().step() ? lOldest.number(0) : aNow;
    lOldest.reset();
    deleteOlder(getSlot(std::min(lLast, aNow), gcDayMicroseconds) * gcDayMicroseconds);
    return mBudget != lBefore;
}

bool ZTCRetention::vacuumStep() {
    if (mrDatabase.readNumber("PRAGMA freelist_count") == 0) {
        return false;
    }
    mrDatabase.execute(("PRAGMA incremental_vacuum(" + std::to_string(scVacuumPages) + ")").c_str());
    return mrDatabase.readNumber("PRAGMA freelist_count") != 0;
}
