/// The inside of ZTCHistory: the connection, the names, and the queries.
#ifndef SENSOR_STORE_SRC_HISTORYIMPLEMENTATION_H
#define SENSOR_STORE_SRC_HISTORYIMPLEMENTATION_H

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/History.h"
#include "sensor/store/src/Database.h"
#include "sensor/store/src/NameTable.h"

/// Every query that reads a table which grows. Rows of one read transaction are bounded by a range of numbers or a
/// limit.
namespace HistoryQueries {
#define ZT_EPISODE_COLUMNS                                                                                          \
    "e.id, e.initiator, e.kind, e.port, e.phase, e.openSeq, e.updateSeq, e.closeSeq, e.count, e.records, e.first, " \
    "e.last, e.flags, e.identity, e.detail"
inline constexpr const char* gcEpisodeRange =
    "SELECT " ZT_EPISODE_COLUMNS
    " FROM episode e WHERE e.id >= ? AND e.id < ? AND e.last >= ? AND e.first <= ? ORDER BY e.id";
inline constexpr const char* gcOpenEpisodes =
    "SELECT " ZT_EPISODE_COLUMNS " FROM episode e INDEXED BY episode_open WHERE e.phase < 2";
inline constexpr const char* gcEpisode = "SELECT " ZT_EPISODE_COLUMNS " FROM episode e WHERE e.id = ?";
inline constexpr const char* gcChanges = "SELECT " ZT_EPISODE_COLUMNS
                                         ", c.seq FROM change c CROSS JOIN episode e ON e.id = c.episode "
                                         "WHERE c.seq > ? ORDER BY c.seq LIMIT ?";
#undef ZT_EPISODE_COLUMNS
inline constexpr const char* gcChangedEpisode = "SELECT episode FROM change WHERE seq = ?";
inline constexpr const char* gcFirstEpisodeSince = "SELECT min(id) FROM episode WHERE last >= ?";
inline constexpr const char* gcFirstEpisode = "SELECT min(id) FROM episode";
inline constexpr const char* gcLastEpisode = "SELECT max(id) FROM episode";
inline constexpr const char* gcRecords =
    "SELECT ordinal, data FROM record WHERE episode = ? AND ordinal >= ? ORDER BY ordinal LIMIT ?";
inline constexpr const char* gcMinutes =
    "SELECT slot, initiator, kind, port, count, spread, last FROM minute "
    "WHERE (slot, initiator, kind, port) > (?, ?, ?, ?) AND slot < ? ORDER BY slot, initiator, kind, port LIMIT ?";
inline constexpr const char* gcDays =
    "SELECT slot, initiator, kind, port, count, spread, last FROM day "
    "WHERE (slot, initiator, kind, port) > (?, ?, ?, ?) AND slot < ? ORDER BY slot, initiator, kind, port LIMIT ?";
inline constexpr const char* gcGaps =
    "SELECT seq, timeFrom, timeTo, reason, generation, isCountKnown FROM gap WHERE timeTo >= ? ORDER BY timeTo";
inline constexpr const char* gcGapCounts = "SELECT initiator, kind, held, handedOver FROM gapCount WHERE gap = ?";
inline constexpr const char* gcEndedCoverage =
    "SELECT initiator, kind, state, timeFrom, timeTo FROM coverage WHERE timeTo >= ?";
inline constexpr const char* gcOpenCoverage =
    "SELECT initiator, kind, state, timeFrom, timeTo FROM coverage WHERE timeTo IS NULL";
inline constexpr const char* gcScan =
    "SELECT timeTo, blocked FROM scan WHERE timeFrom <= ? ORDER BY timeFrom DESC LIMIT 1";
inline constexpr const char* gcFirstScan = "SELECT min(timeFrom) FROM scan";
#define ZT_THING_COLUMNS "id, thing, key, body, timeFrom, timeTo"
inline constexpr const char* gcOpenThings =
    "SELECT " ZT_THING_COLUMNS " FROM topology WHERE timeTo IS NULL AND timeFrom <= ?1";
inline constexpr const char* gcEndedThings =
    "SELECT " ZT_THING_COLUMNS " FROM topology WHERE timeTo > ?1 AND timeFrom <= ?1";
inline constexpr const char* gcThingsBegun =
    "SELECT " ZT_THING_COLUMNS " FROM topology WHERE timeFrom > ? AND timeFrom <= ? ORDER BY timeFrom LIMIT ?";
inline constexpr const char* gcThingsEnded =
    "SELECT " ZT_THING_COLUMNS " FROM topology WHERE timeTo > ? AND timeTo <= ? ORDER BY timeTo LIMIT ?";
inline constexpr const char* gcThingsLately =
    "SELECT " ZT_THING_COLUMNS " FROM topology WHERE timeTo > ? AND timeFrom <= ? ORDER BY timeTo DESC LIMIT ?";
#undef ZT_THING_COLUMNS
inline constexpr const char* gcCounters =
    "SELECT p.slot, p.initiator, p.port, n.name, p.difference FROM portCounter p "
    "CROSS JOIN counterName n ON n.id = p.counter WHERE p.slot >= ? AND p.slot <= ? ORDER BY p.slot LIMIT ?";
inline constexpr const char* gcRuns = "SELECT timeFrom, timeTo, ended FROM run WHERE timeTo >= ? ORDER BY timeTo";
}  // namespace HistoryQueries

/// A row of `minute` or `day`.
struct ZTSSlotRow {
    std::int64_t mSlot = 0;
    std::uint32_t mInitiator = 0;
    ZTCKindKey mKind = 0;
    std::uint32_t mPort = 0;
    std::uint64_t mCount = 0;
    std::uint64_t mSpread = 0;
    std::int64_t mLast = 0;
};

/// A filter with times and names as the tables hold them.
class ZTCFilterTest {
public:
    ZTCFilterTest(const ZTSHistoryFilter& acrFilter, const ZTCNameTable& acrNames);

    bool matches(std::uint32_t aInitiator, ZTCKindKey aKind, std::uint32_t aPort) const;
    bool matchesLuns(const std::optional<ZTSLunSet>& acrLuns) const;
    bool hasLuns() const { return mIsAllLuns || !mLuns.empty(); }
    std::int64_t getSince() const { return mSince; }
    std::int64_t getUntil() const { return mUntil; }

private:
    std::vector<ZTCKindKey> mKinds;
    std::optional<std::vector<std::uint32_t>> mPorts;  ///< absent: all
    std::optional<std::vector<std::uint32_t>> mInitiators;
    std::vector<std::uint32_t> mLuns;
    bool mIsAllLuns;
    std::int64_t mSince;
    std::int64_t mUntil;
};

class ZTCHistory::ZTCImplementation {
public:
    explicit ZTCImplementation(const std::string& acrStateDirectory);

    /// Reads the names again: they may have grown or changed.
    void loadNames() { mNames.load(); }
    const ZTSInitiator& getInitiator(std::uint32_t aId);
    std::optional<ZTSRemotePort> getPort(std::uint32_t aId);

    /// The episode of the statement's row; nothing where it does not match.
    std::optional<ZTSEpisode> readEpisode(const ZTCStatement& acrRow, const ZTCFilterTest* apTest);
    /// All matching episodes with numbers from `aFirst` to before `aEnd`, rising.
    std::vector<ZTSEpisode> readRange(std::uint64_t aFirst, std::uint64_t aEnd, const ZTCFilterTest& acrTest);
    std::vector<ZTSEpisode> readOpen(const ZTCFilterTest& acrTest);
    /// The lowest number of an episode that can match; nothing where there is none.
    std::optional<std::uint64_t> findFirst(const ZTSHistoryFilter& acrFilter);
    /// Visits matching episodes page by page, rising or falling, until the visitor returns false.
    void visitPages(const ZTSHistoryFilter& acrFilter, bool aIsRising,
                    const std::function<bool(const ZTSEpisode&)>& acrVisitor);
    /// Those kept of an episode that match, in their order.
    std::vector<ZTSStoredRecord> readRecords(const ZTSEpisode& acrEpisode, const ZTSHistoryFilter& acrFilter,
                                             const ZTCFilterTest& acrTest);

    /// Visits slots from `aFirst` to before `aEnd`, page by page, until the visitor returns false.
    bool visitSlots(const char* apSql, std::int64_t aFirst, std::int64_t aEnd,
                    const std::function<bool(const ZTSSlotRow&)>& acrVisitor);
    void visitBuckets(const char* apSql, std::int64_t aSlotMicroseconds, const ZTSHistoryFilter& acrFilter,
                      const std::function<bool(const ZTSBucket&)>& acrVisitor);

    ZTCDatabase mDatabase;
    ZTCNameTable mNames{mDatabase};
    std::string mStoreId;
};

#endif
