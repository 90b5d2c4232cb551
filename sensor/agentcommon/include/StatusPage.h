/// The layout of the agent's status page: a file that shows what becomes of every event while the agent runs, and what
/// the agent held when it ended.
///
/// The agent makes the page where the environment variable ZT_TVK_STATUS_PAGE names a file, and writes it through a
/// shared mapping. Any process of the same user may map it read-only at the same time (ZTCStatusPageReader). The page
/// belongs to one host: integers have the host's byte order, and every multi-byte field lies at its natural alignment.
///
/// ORDER IN THE FILE
///     ZTSStatusHeader            at 0
///     ZTSStatusLoss              gcStatusLosses times: what the adapters' library says that it has lost
///     ZTSStatusRow               one row for events whose board the agent does not know, whatever their kind
///     ZTSStatusBoard             mBoards times, from board 0 on
/// The file is first as long as the fixed part, and grows once, when the number of boards is known. It never shrinks.
/// Read mBoards with acquire order: what it counts is in the file and filled in.
///
/// WHO WRITES
///     "once"     written before mBoards makes it visible, or before the file has its name; never changed after that
///     "lock"     written under the agent's record lock, so that each field has one writer at a time: plain stores
///     "atomic"   added to by any thread, with atomic additions
///     "command"  stored by the agent's command thread, or by its main thread while that one does not run
///     "report"   stored under the lock of the reports, by the thread that has something to report
///
/// MEMORY ORDER
/// Counters are stored with relaxed order, except mHandedOver and mDropped, whose release order makes sure that a
/// reader which reads them with acquire order reads an mConsolidated afterwards that is at least as large as their sum.
/// Fields that change together have a sequence number. It is odd while they change, and a new even number afterwards. A
/// reader compares the numbers before and after. It reads again where they differ or are odd.
///
/// EQUATIONS
/// Every event is counted once, where its outcome is decided: in mConsolidated, or in one of mRefused. So
///     received     = consolidated + all refusals
///     consolidated = handed over + held + dropped
/// where received and held are not stored: the first is the sum, the second the difference. An event that is still
/// being worked on is in no counter.
#ifndef SENSOR_AGENTCOMMON_INCLUDE_STATUSPAGE_H
#define SENSOR_AGENTCOMMON_INCLUDE_STATUSPAGE_H

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <type_traits>

/// Environment variable with the path of the page. Unset or empty: no page.
inline constexpr const char* gcStatusPageVariable = "ZT_TVK_STATUS_PAGE";

/// Environment variable with the number of an inherited eventfd that the agent rings when it should be asked.
inline constexpr const char* gcBellVariable = "ZT_TVK_BELL_FD";

inline constexpr std::array<char, 8> gcStatusMagic{'T', 'V', 'K', 'P', 'A', 'G', 'E', '\n'};
inline constexpr std::uint32_t gcStatusVersion = 1;

/// Rows of a board: one for each of the twenty kinds, in the order of the table of kinds, and one for all other pairs.
inline constexpr std::uint32_t gcStatusKinds = 20;
inline constexpr std::uint32_t gcStatusOtherRow = gcStatusKinds;
inline constexpr std::uint32_t gcStatusRowsPerBoard = gcStatusKinds + 1;

/// Named losses that the page has room for.
inline constexpr std::uint32_t gcStatusLosses = 32;

/// Why an event was not consolidated: an index into mRefused and gcStatusRefusalNames.
enum ZTEStatusRefusal : std::uint32_t {
    ZTSR_CollectionOff,  ///< no start command yet, or a stop command since
    ZTSR_TotalLimit,     ///< the bytes held had reached their limit
    ZTSR_UnknownBoard,   ///< a board that was not there when the agent started
    ZTSR_NoList,         ///< a board that has left: it has no list of records any more
    ZTSR_TooShort,       ///< less data than the kind has; an RSCN without a page
    ZTSR_UnknownKind,    ///< a pair outside of the twenty kinds
    ZTSR_Failed,         ///< an exception, such as no memory; and the pages of an RSCN behind one
};

inline constexpr std::array<const char*, 7> gcStatusRefusalNames{
    "collection-off", "total-limit", "unknown-board", "no-list", "too-short", "unknown-kind", "failed"};
inline constexpr std::uint32_t gcStatusRefusals = gcStatusRefusalNames.size();
static_assert(ZTSR_Failed + 1 == gcStatusRefusals);

/// Whether events of a kind on a board reach the agent: an index into gcStatusStateNames.
enum ZTEStatusState : std::uint32_t {
    ZTSS_Off,        ///< not registered: before a start command, and after a stop command
    ZTSS_Listening,  ///< events of this kind arrive
    ZTSS_Failed,     ///< the registration was refused, or its source broke
    ZTSS_NoRights,   ///< this host does not grant what the source needs
    ZTSS_NoSource,   ///< the adapters' library has no source for this kind on this board
};

inline constexpr std::array<const char*, 5> gcStatusStateNames{"off", "listening", "failed", "no_rights", "no_source"};
static_assert(ZTSS_NoSource + 1 == gcStatusStateNames.size());

/// Why the agent ended: an index into gcStatusEndNames. An agent that is gone with "running" was killed or crashed.
enum ZTEStatusEnd : std::uint32_t {
    ZTSE_Running,
    ZTSE_ShutDown,  ///< the shut-down command
    ZTSE_Signal,    ///< SIGTERM or SIGINT
    ZTSE_NoLibrary,
    ZTSE_NoAdapters,
    ZTSE_NoEventSupport,
    ZTSE_SensorGone,  ///< the sensor's process is gone, or nobody reads the response FIFO
    ZTSE_Other,       ///< the log says what
};

inline constexpr std::array<const char*, 8> gcStatusEndNames{
    "running", "shut-down", "signal", "no-library", "no-adapters", "no-event-support", "sensor-gone", "other"};
static_assert(ZTSE_Other + 1 == gcStatusEndNames.size());

/// A text of at most 8 * Words - 1 bytes, padded with null bytes, in words of eight bytes of the text in order.
template <std::size_t Words>
using ZTStatusText = std::array<std::atomic<std::uint64_t>, Words>;

/// What has happened to the events of one board and kind. 256 bytes; the parts that different threads write lie in
/// different cache lines.
struct alignas(64) ZTSStatusRow {
    // ---- lock ----
    std::atomic<std::uint64_t> mConsolidated;     ///< occurrences that went into a record
    std::atomic<std::uint64_t> mHandedOver;       ///< occurrences that a retrieval took; release
    std::atomic<std::uint64_t> mDropped;          ///< occurrences lost when their record was filed; release
    std::atomic<std::int64_t> mLastConsolidated;  ///< time of the last one: microseconds since the epoch, 0: none
    std::uint64_t mReservedLock[4];

    // ---- atomic ----
    std::atomic<std::uint64_t> mRefused[gcStatusRefusals];  ///< events, for RSCN pages, by ZTEStatusRefusal
    std::atomic<std::int64_t> mLastRefused;                 ///< time of the last one, as above; the latest store wins

    // ---- report: the three below change together ----
    std::atomic<std::uint32_t> mStateSequence;  ///< odd while they change
    std::atomic<std::uint32_t> mState;          ///< a ZTEStatusState
    std::atomic<std::int64_t> mStateSince;      ///< time of the last change of mState, as above; 0: never
    ZTStatusText<14> mStateReason;              ///< in words of the library, or empty
};

static_assert(sizeof(ZTSStatusRow) == 256 && std::is_standard_layout_v<ZTSStatusRow>);
static_assert(offsetof(ZTSStatusRow, mConsolidated) == 0 && offsetof(ZTSStatusRow, mHandedOver) == 8);
static_assert(offsetof(ZTSStatusRow, mDropped) == 16 && offsetof(ZTSStatusRow, mLastConsolidated) == 24);
static_assert(offsetof(ZTSStatusRow, mRefused) == 64 && offsetof(ZTSStatusRow, mLastRefused) == 120);
static_assert(offsetof(ZTSStatusRow, mStateSequence) == 128 && offsetof(ZTSStatusRow, mState) == 132);
static_assert(offsetof(ZTSStatusRow, mStateSince) == 136 && offsetof(ZTSStatusRow, mStateReason) == 144);

/// One named loss of the adapters' library. 64 bytes.
struct ZTSStatusLoss {
    ZTStatusText<7> mName;              ///< report; once mLossesUsed counts it, it stays
    std::atomic<std::uint64_t> mTotal;  ///< report; events lost since the library was opened
};

static_assert(sizeof(ZTSStatusLoss) == 64 && std::is_standard_layout_v<ZTSStatusLoss>);
static_assert(offsetof(ZTSStatusLoss, mTotal) == 56);

/// One board: an adapter port as it was when the agent started.
struct alignas(64) ZTSStatusBoard {
    std::uint8_t mWwnn[8];  ///< once; as on the wire
    std::uint8_t mWwpn[8];  ///< once; as on the wire
    std::uint64_t mReserved[6];
    ZTSStatusRow mRows[gcStatusRowsPerBoard];
};

static_assert(sizeof(ZTSStatusBoard) == 64 + gcStatusRowsPerBoard * sizeof(ZTSStatusRow));
static_assert(offsetof(ZTSStatusBoard, mWwpn) == 8 && offsetof(ZTSStatusBoard, mRows) == 64);

/// What is known of the agent as a whole. 256 bytes.
struct alignas(64) ZTSStatusHeader {
    // ---- once ----
    std::array<char, 8> mMagic;   ///< gcStatusMagic
    std::uint32_t mVersion;       ///< gcStatusVersion; another one is another layout
    std::uint32_t mHeaderSize;    ///< sizeof(ZTSStatusHeader)
    std::uint32_t mLossSize;      ///< sizeof(ZTSStatusLoss)
    std::uint32_t mLosses;        ///< gcStatusLosses
    std::uint32_t mRowSize;       ///< sizeof(ZTSStatusRow)
    std::uint32_t mRowsPerBoard;  ///< gcStatusRowsPerBoard
    std::uint32_t mBoardSize;     ///< sizeof(ZTSStatusBoard)
    std::uint32_t mPid;           ///< the agent's process
    std::uint64_t mStartId[2];    ///< random: no two starts have the same, on this host or another
    std::int64_t mStartTime;      ///< microseconds since the epoch

    // ---- command ----
    std::atomic<std::uint32_t> mBoards;           ///< boards behind the fixed part; release, stored once
    std::atomic<std::uint32_t> mAdaptersAtStart;  ///< adapters when the agent started
    std::atomic<std::uint32_t> mAdaptersNow;      ///< adapters at the last look: every 3 s, and at each retrieval
    std::atomic<std::uint32_t> mCollecting;       ///< 1: between a start and a stop command
    std::atomic<std::uint32_t> mRecordLimit;      ///< bytes a record may hold before it is not appended to
    std::atomic<std::uint32_t> mTotalLimit;       ///< bytes held from which on events are refused; once
    std::atomic<std::int64_t> mEndTime;           ///< microseconds since the epoch; 0 while the agent runs
    std::atomic<std::uint32_t> mEndReason;        ///< a ZTEStatusEnd; release, the first one that is stored stays

    // ---- report ----
    std::atomic<std::uint32_t> mLossesUsed;  ///< named losses in use, from the first; release
    std::atomic<std::uint64_t> mLossesLost;  ///< reports of a loss for which there was no room
    std::uint64_t mReservedReport[2];

    // ---- lock ----
    std::atomic<std::uint64_t> mHeldBytes;          ///< event-data bytes since the last retrieval
    std::atomic<std::uint64_t> mHeldRecords;        ///< records since then
    std::atomic<std::uint32_t> mRetrievalSequence;  ///< odd while a retrieval changes what it hands over, and the held
    std::atomic<std::uint32_t> mReservedSequence;
    std::atomic<std::uint64_t> mRetrievals;             ///< retrievals so far
    std::atomic<std::uint64_t> mHandedOverRecords;      ///< records handed over by all retrievals
    std::atomic<std::uint64_t> mHandedOverOccurrences;  ///< occurrences handed over by all retrievals
    std::atomic<std::uint64_t> mHandedOverBytes;        ///< event-data bytes handed over by all retrievals
    std::atomic<std::int64_t> mLastRetrieval;           ///< microseconds since the epoch; 0: none
    std::uint64_t mReservedLock[8];
};

static_assert(sizeof(ZTSStatusHeader) == 256 && std::is_standard_layout_v<ZTSStatusHeader>);
static_assert(offsetof(ZTSStatusHeader, mMagic) == 0 && offsetof(ZTSStatusHeader, mVersion) == 8);
static_assert(offsetof(ZTSStatusHeader, mHeaderSize) == 12 && offsetof(ZTSStatusHeader, mLossSize) == 16);
static_assert(offsetof(ZTSStatusHeader, mLosses) == 20 && offsetof(ZTSStatusHeader, mRowSize) == 24);
static_assert(offsetof(ZTSStatusHeader, mRowsPerBoard) == 28 && offsetof(ZTSStatusHeader, mBoardSize) == 32);
static_assert(offsetof(ZTSStatusHeader, mPid) == 36 && offsetof(ZTSStatusHeader, mStartId) == 40);
static_assert(offsetof(ZTSStatusHeader, mStartTime) == 56 && offsetof(ZTSStatusHeader, mBoards) == 64);
static_assert(offsetof(ZTSStatusHeader, mAdaptersAtStart) == 68 && offsetof(ZTSStatusHeader, mAdaptersNow) == 72);
static_assert(offsetof(ZTSStatusHeader, mCollecting) == 76 && offsetof(ZTSStatusHeader, mRecordLimit) == 80);
static_assert(offsetof(ZTSStatusHeader, mTotalLimit) == 84 && offsetof(ZTSStatusHeader, mEndTime) == 88);
static_assert(offsetof(ZTSStatusHeader, mEndReason) == 96 && offsetof(ZTSStatusHeader, mLossesUsed) == 100);
static_assert(offsetof(ZTSStatusHeader, mLossesLost) == 104 && offsetof(ZTSStatusHeader, mHeldBytes) == 128);
static_assert(offsetof(ZTSStatusHeader, mHeldRecords) == 136 && offsetof(ZTSStatusHeader, mRetrievalSequence) == 144);
static_assert(offsetof(ZTSStatusHeader, mRetrievals) == 152 && offsetof(ZTSStatusHeader, mHandedOverRecords) == 160);
static_assert(offsetof(ZTSStatusHeader, mHandedOverOccurrences) == 168);
static_assert(offsetof(ZTSStatusHeader, mHandedOverBytes) == 176 && offsetof(ZTSStatusHeader, mLastRetrieval) == 184);

/// The fixed part of the file. The boards follow it.
struct ZTSStatusPage {
    ZTSStatusHeader mHeader;
    ZTSStatusLoss mLosses[gcStatusLosses];
    ZTSStatusRow mUnknownBoards;  ///< nothing of it is consolidated, unless the page has no boards
};

static_assert(offsetof(ZTSStatusPage, mLosses) == 256 && offsetof(ZTSStatusPage, mUnknownBoards) == 2304);
static_assert(sizeof(ZTSStatusPage) == 2560 && sizeof(ZTSStatusPage) % alignof(ZTSStatusBoard) == 0);

// Processes share these: without a lock, and with the size that the layout gives them.
static_assert(std::atomic<std::uint64_t>::is_always_lock_free && sizeof(std::atomic<std::uint64_t>) == 8);
static_assert(std::atomic<std::int64_t>::is_always_lock_free && sizeof(std::atomic<std::int64_t>) == 8);
static_assert(std::atomic<std::uint32_t>::is_always_lock_free && sizeof(std::atomic<std::uint32_t>) == 4);

/// Bytes of a file with so many boards.
constexpr std::size_t getStatusPageSize(std::uint32_t aBoards) {
    return sizeof(ZTSStatusPage) + std::size_t{aBoards} * sizeof(ZTSStatusBoard);
}

#endif
