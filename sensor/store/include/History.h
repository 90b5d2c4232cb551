/// The history's readers: questions to the database, also while a sensor writes it and when none runs.
///
/// Read-only, one thread for each object. No read transaction lasts longer than a second: large answers are read in
/// pages, each a transaction of its own, and visitors are called between them. An episode that changes meanwhile is
/// seen once, as it is when its page is read.
#ifndef SENSOR_STORE_INCLUDE_HISTORY_H
#define SENSOR_STORE_INCLUDE_HISTORY_H

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/include/Ledger.h"
#include "sensor/store/include/StoreErrors.h"
#include "sensor/store/include/TopologyHistory.h"

/// Versions of things that one question for changes looks at, the oldest first.
inline constexpr std::size_t gcMostTopologyVersions = 100000;

/// Which episodes or records. Several values of one field mean or; several fields mean and; an empty field means all.
struct ZTSHistoryFilter {
    std::optional<ZTCHistoryTime> mSince;  ///< episodes whose last event is not before
    std::optional<ZTCHistoryTime> mUntil;  ///< episodes whose first event is not after
    std::vector<ZTCKindKey> mKinds;
    std::vector<ZTSFcName> mPorts;       ///< WWPNs of remote ports
    std::vector<ZTSFcName> mInitiators;  ///< WWPNs of local ports
    std::vector<std::uint32_t> mLuns;    ///< episodes of all LUNs match every number
    bool mIsAllLuns = false;             ///< episodes of all LUNs match, beside those of mLuns
    bool mIsOpenOnly = false;
    std::uint64_t mAfterSeq = 0;  ///< only what changed (records: arrived) behind this number
    std::uint64_t mLimit = 0;     ///< the newest so many; 0: all
};

/// What one remote port has met, in a stretch of time.
struct ZTSPortSummary {
    ZTSRemotePort mPort;
    struct Count {
        ZTCKindKey mKind = 0;
        std::uint64_t mOccurrences = 0;
    };
    std::vector<Count> mCounts;             ///< rising by kind; only those that are not 0
    std::vector<ZTSInitiator> mInitiators;  ///< that reported events of it
    std::uint64_t mOccurrences = 0;
    ZTCHistoryTime mLastEvent;
};

/// Occurrences of one minute or day.
struct ZTSBucket {
    ZTCHistoryTime mFrom;
    ZTSInitiator mInitiator;
    ZTCKindKey mKind = 0;
    std::optional<ZTSRemotePort> mRemotePort;
    std::uint64_t mOccurrences = 0;
    std::uint64_t mSpread = 0;  ///< of these, occurrences of records that began before the bucket
    ZTCHistoryTime mLast;       ///< of the last event in it
};

class ZTCHistory {
public:
    /// Opens `history.db` in the directory. Throws ZTCNoHistoryEx, ZTCStoreNewerEx, ZTCStoreDamagedEx or ZTCStoreEx.
    explicit ZTCHistory(const std::string& acrStateDirectory);
    ~ZTCHistory();
    ZTCHistory(const ZTCHistory&) = delete;
    ZTCHistory& operator=(const ZTCHistory&) = delete;

    const std::string& getStoreId() const;

    /// Calls acrRead with one view of the history, which has nothing of what is stored meanwhile. Not for functions
    /// that read the ledger or the topology: each has a view of its own.
    void readAsOne(const std::function<void()>& acrRead) const;

    /// Visits matching episodes in the order in which they began to arrive, newest last. Return false to stop.
    void visitEpisodes(const ZTSHistoryFilter& acrFilter,
                       const std::function<bool(const ZTSEpisode&)>& acrVisitor) const;
    std::vector<ZTSEpisode> readEpisodes(const ZTSHistoryFilter& acrFilter) const;
    std::optional<ZTSEpisode> findEpisode(std::uint64_t aEpisode) const;
    /// The episode that has, or had, a change of that number.
    std::optional<ZTSEpisode> findEpisodeBySeq(std::uint64_t aSeq) const;

    /// Visits the changes behind `mAfterSeq` in the order of their numbers, at most `mLimit` (0: all): one when an
    /// episode opens, at most one a minute while it grows (a newer replaces an older one), one when it closes. `mSeq`
    /// and `mPhase` are those of the change; the other fields are as of now.
    void visitChanges(const ZTSHistoryFilter& acrFilter,
                      const std::function<bool(const ZTSEpisode&)>& acrVisitor) const;
    /// The number of the newest change; 0: none.
    std::uint64_t getLastSeq() const;

    /// Visits the raw records that are kept of matching episodes, in the order of arrival of their episodes and then of
    /// the records. `mSince` and `mUntil` are applied to each record too, and the limit counts records.
    void visitRecords(const ZTSHistoryFilter& acrFilter,
                      const std::function<bool(const ZTSStoredRecord&)>& acrVisitor) const;

    /// Remote ports with occurrences in the filter's time, kinds, ports and initiators, most occurrences first. Times
    /// are taken in whole minutes: `mSince` down, `mUntil` up.
    std::vector<ZTSPortSummary> readPorts(const ZTSHistoryFilter& acrFilter) const;

    /// Counts for drawing, by time: a minute each, or a day (UTC) each. Filter as readPorts.
    void visitMinutes(const ZTSHistoryFilter& acrFilter, const std::function<bool(const ZTSBucket&)>& acrVisitor) const;
    void visitDays(const ZTSHistoryFilter& acrFilter, const std::function<bool(const ZTSBucket&)>& acrVisitor) const;

    /// By initiator, then kind.
    std::vector<ZTSLedgerRow> readLedger() const;
    std::vector<ZTSTotal> readTotals() const;
    /// Gaps that end at or after this time, oldest first.
    std::vector<ZTSGap> readGaps(std::optional<ZTCHistoryTime> aSince = std::nullopt) const;
    /// Intervals that overlap, by time.
    std::vector<ZTSCoverage> readCoverage(std::optional<ZTCHistoryTime> aSince = std::nullopt,
                                          std::optional<ZTCHistoryTime> aUntil = std::nullopt) const;
    std::vector<ZTSRun> readRuns(std::optional<ZTCHistoryTime> aSince = std::nullopt) const;
    // Times here are microseconds since the epoch.

    /// The topology as it was at a time; absent where none was stored by then, or retention has taken it.
    std::optional<ZTSStoredTopology> readTopology(std::int64_t aTime) const;
    /// Turns the topology at `aFrom`, as readTopology() gave it, into the one at `aTo`, which is not before `aFrom`.
    /// The time it takes grows with the changes between the two.
    void advanceTopology(ZTSStoredTopology& arStored, std::int64_t aFrom, std::int64_t aTo) const;
    /// What changed later than `aFrom` and not later than `aTo`, by time, then thing and key. What the first
    /// scan found was there before, so it is not a change.
    std::vector<ZTSTopologyChange> readTopologyChanges(std::int64_t aFrom, std::int64_t aTo) const;
    /// The most ways that led to each logical unit, by its wwid, at one time from `aFrom` to `aTo`: whatever the paths'
    /// states were. Of very many changes it reads only the newest.
    std::map<std::string, ZTSLunWays> readMostWays(std::int64_t aFrom, std::int64_t aTo) const;
    /// How far counters rose in the minutes from that of `aFrom` to that of `aTo`, by minute: the oldest `aMost`.
    std::vector<ZTSCounterSample> readCounters(std::int64_t aFrom, std::int64_t aTo, std::size_t aMost) const;

    /// By time.
    std::vector<ZTSMark> readMarks() const;
    ZTSRetrievalTotals readRetrievalTotals() const;
    std::string getValue(const std::string& acrName) const;

    std::vector<ZTSInitiator> readInitiators() const;
    std::vector<ZTSRemotePort> readRemotePorts() const;

    /// The SQL of every query that reads a table which grows, so that a test can look at their plans.
    static std::vector<std::string> getQueries();

private:
    class ZTCImplementation;
    std::unique_ptr<ZTCImplementation> mpImplementation;
};

#endif
