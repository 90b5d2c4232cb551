/// Totals per initiator and kind, what was lost, and when Tavik listened.
#ifndef SENSOR_STORE_INCLUDE_LEDGER_H
#define SENSOR_STORE_INCLUDE_LEDGER_H

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/Episode.h"

/// Why an event was refused. The order is that of the status page.
enum ZTERefusal : std::uint8_t {
    ZTRF_CollectionOff,
    ZTRF_TotalLimit,
    ZTRF_UnknownBoard,
    ZTRF_NoList,
    ZTRF_TooShort,
    ZTRF_UnknownKind,
    ZTRF_Failed,
    ZTRF_Count
};

/// "collection-off", "total-limit", "unknown-board", "no-list", "too-short", "unknown-kind", "failed".
const char* getRefusalName(ZTERefusal aRefusal);

/// Whether events of a kind reach the agent. The numbers are those in the database.
enum ZTEKindState : std::uint8_t {
    ZTKST_Off = 0,
    ZTKST_Listening = 1,
    ZTKST_Failed = 2,
    ZTKST_NoRights = 3,
    ZTKST_NoSource = 4
};

/// "off", "listening", "failed", "no_rights", "no_source".
const char* getKindStateName(ZTEKindState aState);

/// What the agent counted for one initiator and kind since it started.
struct ZTSPageCounts {
    std::optional<ZTSFcName> mWwpn;  ///< of the initiator; absent: the row for unknown boards
    std::optional<ZTSFcName> mWwnn;
    ZTCKindKey mKind = 0;  ///< 0: the row `other`
    std::uint64_t mReceived = 0;
    std::array<std::uint64_t, ZTRF_Count> mRefused{};
    std::uint64_t mConsolidated = 0;
    std::uint64_t mHandedOver = 0;
    std::uint64_t mHeld = 0;
    std::uint64_t mDropped = 0;
};

/// One row of the ledger, over all agents that this database has seen.
///
/// stored + retired + lost = handedOver. `lost` are occurrences that were handed over and never arrived, as gaps count
/// them. `held` is of the running agent; what an ended agent still held is in its gap.
struct ZTSLedgerRow {
    ZTSInitiator mInitiator;
    ZTCKindKey mKind = 0;
    std::uint64_t mReceived = 0;
    std::array<std::uint64_t, ZTRF_Count> mRefused{};
    std::uint64_t mConsolidated = 0;
    std::uint64_t mHandedOver = 0;
    std::uint64_t mStored = 0;
    std::uint64_t mRetired = 0;
    std::uint64_t mLost = 0;
    std::uint64_t mHeld = 0;
    std::uint64_t mDropped = 0;

    std::uint64_t getRefusedTotal() const;
};

/// What one gap is known to have cost, for one initiator and kind.
struct ZTSGapCount {
    ZTSInitiator mInitiator;
    ZTCKindKey mKind = 0;
    std::uint64_t mHeld = 0;        ///< occurrences that the agent held when it ended
    std::uint64_t mHandedOver = 0;  ///< occurrences handed over that never arrived
};

/// A stretch of time in which events were lost or may have been.
struct ZTSGap {
    std::uint64_t mSeq = 0;
    ZTCHistoryTime mFrom;
    ZTCHistoryTime mTo;
    std::string mReason;         ///< for people, one line
    std::string mGeneration;     ///< the agent's start id; empty: none
    bool mIsCountKnown = false;  ///< false: how much is missing is not known; the counts are a lower bound
    std::vector<ZTSGapCount> mCounts;

    std::uint64_t getOccurrences() const;
};

/// One initiator's kind in one state.
struct ZTSCoverage {
    ZTSInitiator mInitiator;
    ZTCKindKey mKind = 0;
    ZTEKindState mState = ZTKST_Off;
    ZTCHistoryTime mFrom;
    ZTCHistoryTime mTo;    ///< of an open interval: when Tavik was last seen running
    bool mIsOpen = false;  ///< true of the current run
};

/// A stretch of time in which Tavik ran.
struct ZTSRun {
    ZTCHistoryTime mFrom;
    ZTCHistoryTime mTo;    ///< when it was last seen running
    bool mIsOpen = false;  ///< it has not ended in order: it runs, or it vanished
};

/// Occurrences of one initiator, kind and remote port since the database was begun; retention takes nothing away.
struct ZTSTotal {
    ZTSInitiator mInitiator;
    ZTCKindKey mKind = 0;
    std::optional<ZTSRemotePort> mRemotePort;
    std::uint64_t mOccurrences = 0;  ///< stored and retired together
    std::uint64_t mRetired = 0;
    ZTCHistoryTime mLastEvent;
};

/// A name that a person gave to a point in time.
struct ZTSMark {
    std::string mName;
    ZTCHistoryTime mTime;
};

/// Totals over all retrievals since the database was begun.
struct ZTSRetrievalTotals {
    std::uint64_t mRetrievals = 0;
    std::uint64_t mBytes = 0;
    std::uint64_t mRecords = 0;
    std::uint64_t mOccurrences = 0;
    std::optional<ZTCHistoryTime> mLast;  ///< when the last one was taken in
    std::uint64_t mTornFrames = 0;
    std::uint64_t mGaps = 0;
};

#endif
