/// The history's one writer: takes frames into episodes, counts and records, and keeps the ledger.
///
/// One thread, one connection, one process at a time. All changes happen in transactions: a transaction is stored
/// whole or not at all, also across a kill or a power cut, and nothing of it is visible to readers before its commit.
/// Open episodes are kept in memory and rebuilt from the database at open and after a rollback.
#ifndef SENSOR_STORE_INCLUDE_STORE_H
#define SENSOR_STORE_INCLUDE_STORE_H

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/include/Ledger.h"
#include "sensor/store/include/StoreErrors.h"
#include "sensor/store/include/TopologyHistory.h"

/// Settings of the store. The defaults are those of the configuration.
struct ZTSStoreLimits {
    std::chrono::microseconds mEpisodeGap = std::chrono::seconds(60);
    std::uint32_t mRecordsPerEnd = 100;                                ///< raw records kept at each end of an episode
    std::uint32_t mDays = 90;                                          ///< stored days; 0: no limit by age
    std::uint64_t mBytes = 2ULL * 1024 * 1024 * 1024;                  ///< size of the database; 0: no limit by size
    std::uint32_t mStepRows = 2000;                                    ///< most rows that one step of retention deletes
    std::chrono::milliseconds mReportAfter = std::chrono::seconds(1);  ///< a longer operation is reported
};

/// Rows of the topology that one transaction writes, so that frames do not wait for a large host's first scan.
inline constexpr std::uint32_t gcMostTopologyRows = 10000;

/// What was taken in from one frame.
struct ZTSTakenIn {
    std::uint64_t mRecords = 0;
    std::uint64_t mOccurrences = 0;
    std::string mProblem;  ///< what ended the decoding, or why nothing was taken in; empty: the frame was whole
};

/// Resolves an FC address, as an RSCN of one initiator reports it, to the remote port that has it now. Nothing:
/// unknown.
using ZTCAddressResolver =
    std::function<std::optional<ZTSRemotePort>(const ZTSFcName& acrInitiator, std::uint32_t aFcId)>;

/// Whether the agent holds nothing more for one initiator and kind.
using ZTCNothingHeld = std::function<bool(const ZTSInitiator& acrInitiator, ZTCKindKey aKind)>;

/// One initiator's kind and its state, for coverage.
struct ZTSKindStateNow {
    std::optional<ZTSFcName> mWwpn;
    std::optional<ZTSFcName> mWwnn;
    ZTCKindKey mKind = 0;
    ZTEKindState mState = ZTKST_Off;
};

class ZTCStore;

/// A transaction. Rolled back where it goes out of scope without a commit.
class ZTCStoreTransaction {
public:
    ZTCStoreTransaction(ZTCStoreTransaction&& arOther) noexcept;
    ZTCStoreTransaction& operator=(ZTCStoreTransaction&&) = delete;
    ZTCStoreTransaction(const ZTCStoreTransaction&) = delete;
    ZTCStoreTransaction& operator=(const ZTCStoreTransaction&) = delete;
    ~ZTCStoreTransaction();

    /// Makes everything since begin() durable. Writes nothing where nothing changed. On an exception the transaction is
    /// rolled back.
    void commit();

private:
    friend class ZTCStore;
    ZTCStoreTransaction(ZTCStore& arStore, std::uint64_t aSerial);
    ZTCStore* mpStore;
    std::uint64_t mSerial;  ///< which of the store's transactions it is
};

class ZTCStore {
public:
    /// Reports a line for the log, such as an operation that took long or a database that was set aside.
    using Report = std::function<void(const std::string& acrLine)>;

    /// Opens `history.db` in the directory, which exists; creates or migrates it. A damaged database is renamed to
    /// `history.damaged-DATE.db`, reported, and a new one begun. Throws ZTCStoreNewerEx, ZTCStoreNoRoomEx, ZTCStoreEx.
    ZTCStore(const std::string& acrStateDirectory, const ZTSStoreLimits& acrLimits, Report aReport);
    ~ZTCStore();
    ZTCStore(const ZTCStore&) = delete;
    ZTCStore& operator=(const ZTCStore&) = delete;

    /// After ZTCStoreDamagedEx: sets the damaged file aside and begins a new one. Throws as the constructor.
    void reopen();

    /// Random text that names this database: 32 hex digits.
    const std::string& getStoreId() const;
    const std::string& getPath() const;

    /// Takes effect from the next transaction on. Outside of a transaction.
    void setLimits(const ZTSStoreLimits& acrLimits);

    /// Used for RSCNs from now on. None: their ports stay unknown.
    void setAddressResolver(ZTCAddressResolver aResolver);

    /// Begins a transaction; one at a time. Everything below that changes the store, up to the next heading, needs one,
    /// and throws std::logic_error without. On an exception of the ZTCStoreEx family the transaction is rolled back,
    /// and its object does nothing more.
    [[nodiscard]] ZTCStoreTransaction begin();

    // ---- frames ----

    /// Whether the database has taken in the frame of that number. Needs no transaction.
    bool hasFrame(std::uint64_t aNumber) const;
    /// The highest number of a frame that was ever taken in; 0: none. Needs no transaction.
    std::uint64_t getLastFrame() const;
    /// Takes a response in: `aBody` without its four bytes of length. A frame that the database has is skipped,
    /// with a problem that says so. Bytes that cannot be decoded end the taking in, never the frame's number: all whole
    /// records in front of them are taken in. A response without scope data holds no records. `aIsTorn`: the body may
    /// be cut anywhere.
    ZTSTakenIn takeIn(std::uint64_t aNumber, const std::string& acrGeneration, std::span<const std::uint8_t> aBody,
                      bool aIsTorn, ZTCHistoryTime aNow);

    /// Closes the episodes whose last event and the gap lie before `aNow`, and of which nothing is held. Returns how
    /// many.
    std::size_t closeEpisodes(ZTCHistoryTime aNow, const ZTCNothingHeld& acrNothingHeld);

    // ---- names ----

    /// Stores what is known of a port beside its WWPN. A field that is absent leaves the stored value.
    void noteInitiator(const ZTSInitiator& acrInitiator);
    void noteRemotePort(const ZTSRemotePort& acrPort);

    // ---- topology ----

    /// A scan that was finished at this time (microseconds since the epoch). Only what differs from the scan before is
    /// written. Values whose files blocked stay as they were. At most `aMostRows` rows are written: returns false where
    /// more remain, and the same call in a later transaction goes on.
    bool noteTopology(std::int64_t aTime, const ZTSTopology& acrTopology, std::uint32_t aMostRows = gcMostTopologyRows);
    /// How far counters rose. Adds to what is stored of the same minute, port and counter.
    void noteCounters(std::span<const ZTSCounterSample> aSamples);

    // ---- ledger, gaps, coverage ----

    /// The page's counts of the agent with this start id, replacing those noted before. Rows that are absent keep their
    /// counts. Does nothing for an agent that endAgent() was called for.
    void noteLedger(const std::string& acrGeneration, std::span<const ZTSPageCounts> aCounts);
    /// Once for each agent that has ended, when its last page was noted and all its frames were taken in. What it held,
    /// and what it handed over that never arrived, becomes one gap; so does an agent that `aIsVanished` (killed, or
    /// gone without a word), even where nothing is known to be missing. A second call does nothing. Returns whether a
    /// gap was written. `aHasLastPage`: its last page was noted; otherwise the gap's count is a lower bound.
    bool endAgent(const std::string& acrGeneration, ZTCHistoryTime aFrom, ZTCHistoryTime aTo, bool aIsVanished,
                  const std::string& acrReason, bool aHasLastPage = true);
    /// Whether endAgent() was called for it. Needs no transaction.
    bool hasEnded(const std::string& acrGeneration) const;
    /// The counts of all agents but this one, by initiator and kind.
    std::vector<ZTSPageCounts> sumCountsOfOthers(const std::string& acrGeneration) const;
    /// A gap of another sort. Where it names a generation, it is written once for each pair of reason and generation.
    /// Returns whether it was written.
    bool noteGap(const ZTSGap& acrGap);

    /// Begins a run of Tavik now. What an earlier run left open ends where that run was last seen.
    void beginRun(ZTCHistoryTime aNow);
    /// Tavik still runs. Call about once a minute.
    void noteRunning(ZTCHistoryTime aNow);
    /// Tavik ends in order.
    void endRun(ZTCHistoryTime aNow);
    /// The states from now on. An interval begins where a state differs from the one before. Kinds that are absent here
    /// and were present before have no state from now on.
    void noteCoverage(ZTCHistoryTime aNow, std::span<const ZTSKindStateNow> aStates);

    // ---- marks and values ----

    /// Sets a mark; one of the same name is moved.
    void setMark(const std::string& acrName, ZTCHistoryTime aTime);
    /// A named value, such as an output's cursor. Empty: none.
    void setValue(const std::string& acrName, const std::string& acrValue);
    /// Needs no transaction.
    std::string getValue(const std::string& acrName) const;

    // ---- upkeep; each is a transaction of its own, so not within one ----

    /// Deletes at most `mStepRows` rows that retention no longer keeps, and gives at most 256 free pages back. By age
    /// at most one stored day an hour. Returns whether there is more to do at once.
    bool retireStep(ZTCHistoryTime aNow, std::chrono::steady_clock::time_point aSteadyNow);
    /// Moves what readers allow from the journal to the database, without waiting for them. Does nothing before the
    /// journal has 4 MiB.
    void checkpoint();

    // ---- figures; need no transaction ----

    std::uint64_t getDatabaseBytes() const;
    std::uint64_t getJournalBytes() const;
    std::size_t countOpenEpisodes() const;

private:
    friend class ZTCStoreTransaction;
    class ZTCImplementation;
    std::unique_ptr<ZTCImplementation> mpImplementation;
};

#endif
