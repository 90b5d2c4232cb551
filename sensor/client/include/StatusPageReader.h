/// Reads the agent's status page (sensor/agentcommon/include/StatusPage.h): of an agent that runs, and of one that has
/// ended.
#ifndef SENSOR_CLIENT_INCLUDE_STATUSPAGEREADER_H
#define SENSOR_CLIENT_INCLUDE_STATUSPAGEREADER_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "sensor/agentcommon/include/StatusPage.h"
#include "sensor/client/include/FileDescriptor.h"

/// What had happened to the events of one kind on one board. Times are microseconds since the epoch, 0: never.
struct ZTSStatusRowCopy {
    std::uint64_t mConsolidated = 0;                         ///< occurrences
    std::uint64_t mHandedOver = 0;                           ///< occurrences
    std::uint64_t mDropped = 0;                              ///< occurrences
    std::array<std::uint64_t, gcStatusRefusals> mRefused{};  ///< by ZTEStatusRefusal
    std::int64_t mLastEvent = 0;                             ///< time of the last one, whatever its outcome
    ZTEStatusState mState = ZTSS_Off;
    std::int64_t mStateSince = 0;
    std::string mStateReason;  ///< in words of the adapters' library; empty: none, or being written

    std::uint64_t getRefused() const;
    std::uint64_t getReceived() const { return mConsolidated + getRefused(); }
    std::uint64_t getHeld() const { return mConsolidated - mHandedOver - mDropped; }
};

struct ZTSStatusBoardCopy {
    std::array<std::uint8_t, 8> mWwnn{};
    std::array<std::uint8_t, 8> mWwpn{};
    std::array<ZTSStatusRowCopy, gcStatusRowsPerBoard> mRows;  ///< named by getStatusRowName
};

struct ZTSStatusLossCopy {
    std::string mName;
    std::uint64_t mTotal = 0;
};

/// A copy of the whole page.
struct ZTSStatusSnapshot {
    std::string mStartId;  ///< 32 hexadecimal digits
    std::uint32_t mPid = 0;
    std::int64_t mStartTime = 0;
    std::uint32_t mAdaptersAtStart = 0;
    std::uint32_t mAdaptersNow = 0;
    bool mIsCollecting = false;
    std::uint32_t mRecordLimit = 0;
    std::uint32_t mTotalLimit = 0;
    std::int64_t mEndTime = 0;
    ZTEStatusEnd mEndReason = ZTSE_Running;  ///< still "running" after the agent is gone: it was killed or it crashed

    std::uint64_t mHeldBytes = 0;
    std::uint64_t mHeldRecords = 0;
    std::uint64_t mRetrievals = 0;
    std::uint64_t mHandedOverRecords = 0;
    std::uint64_t mHandedOverOccurrences = 0;
    std::uint64_t mHandedOverBytes = 0;
    std::int64_t mLastRetrieval = 0;

    std::vector<ZTSStatusLossCopy> mLosses;
    std::uint64_t mLossesLost = 0;  ///< reports of a loss for which the page had no room
    ZTSStatusRowCopy mUnknownBoards;
    std::vector<ZTSStatusBoardCopy> mBoards;  ///< by board id

    /// Whether everything below belongs to one moment between two retrievals. False only where retrievals followed each
    /// other faster than the page could be copied.
    bool mIsConsistent = false;

    /// Occurrences held, of all boards and kinds.
    std::uint64_t getHeld() const;
};

/// The name of a board's row: that of the kind in the table of kinds, "other" for the last row.
const char* getStatusRowName(std::size_t aRow);

/// One page, mapped read-only. Not for several threads at once.
///
/// WHAT A COPY HOLDS. The two equations of StatusPage.h hold in every copy, of an agent in the middle of a storm too:
/// received is the sum of what was read, and a row's handed-over and dropped occurrences are read before its
/// consolidated ones, which never fall below their sum. Between two retrievals "handed over" does not change; a copy
/// that a retrieval interrupted is thrown away and made again, so that what is handed over belongs to one moment for
/// all rows. Counters of different rows may be some events apart while events arrive. When no event is on its way, all
/// of it is exact.
class ZTCStatusPageReader {
public:
    ZTCStatusPageReader() = default;
    ~ZTCStatusPageReader();
    ZTCStatusPageReader(const ZTCStatusPageReader&) = delete;
    ZTCStatusPageReader& operator=(const ZTCStatusPageReader&) = delete;

    /// Maps the page at the path. False where there is none, or the file is not a page of this version: getReason says
    /// why, naming the path. The file that was open before is closed in any case.
    bool open(const std::string& acrPath);

    /// Copies the page. False where none is open or the file has become shorter, which the agent never makes it:
    /// getReason says why.
    bool read(ZTSStatusSnapshot& arSnapshot);

    void close() noexcept;
    bool isOpen() const { return mpMapped != nullptr; }

    /// After open() or read() has failed: whether that says something about the file. False: a call failed for a reason
    /// of its own, such as a lack of descriptors or memory. The file may be a good page, and is to be tried again.
    bool hasLooked() const { return mHasLooked; }

    /// In words; empty after a success.
    const std::string& getReason() const { return mReason; }

private:
    bool fail(const std::string& acrWhat);
    bool failToLook(const char* apWhat);
    bool map(std::size_t aSize);
    bool checkHeader();
    const ZTSStatusPage& getPage() const { return *static_cast<const ZTSStatusPage*>(mpMapped); }
    const ZTSStatusBoard* getBoards() const;

    std::string mPath;
    std::string mReason;
    bool mHasLooked = true;
    ZTCFileDescriptor mFile;
    void* mpMapped = nullptr;
    std::size_t mMappedSize = 0;
};

#endif
