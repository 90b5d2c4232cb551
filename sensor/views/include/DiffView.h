/// `tavik diff`: what is different between two moments, such as before and after a maintenance.
///
/// - States: links, remote ports, LUNs and their paths as they were at FROM and at TO. Initiators and remote ports are
///   told apart by their WWPNs, LUNs by their wwids, so that a restart that renames disks is no difference.
/// - Passing: what is the same at both moments and was not in between. That is no difference.
/// - Rates: events of each kind and remote port between FROM and TO, compared with as long a time before FROM (an hour
///   at least), or of two other stretches that end at FROM and TO. They differ where the counts, scaled to equal times,
///   are farther apart than three times the square root of their sum, and one is at least twice the other.
#ifndef SENSOR_VIEWS_INCLUDE_DIFFVIEW_H
#define SENSOR_VIEWS_INCLUDE_DIFFVIEW_H

#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/StatusView.h"

enum ZTEDiffThing : std::uint8_t { ZTDF_Link, ZTDF_RemotePort, ZTDF_Lun, ZTDF_Path, ZTDF_Count };

/// "link", "remotePort", "lun", "path".
const char* getDiffThingName(ZTEDiffThing aThing);

/// What a change is about.
struct ZTSDiffSubject {
    ZTEDiffThing mThing = ZTDF_Link;
    std::optional<ZTSInitiator> mInitiator{};    ///< of links, remote ports and paths
    std::optional<ZTSRemotePort> mRemotePort{};  ///< of remote ports and paths
    std::string mLun{};                          ///< of LUNs and paths: the id
    std::string mLunName{};                      ///< multipath device or disk
};

struct ZTSDiffChange {
    ZTSDiffSubject mSubject;
    std::optional<std::string> mBefore;  ///< the state, in the kernel's word; of a LUN its paths; absent: not there
    std::optional<std::string> mAfter;

    bool operator==(const ZTSDiffChange& acrOther) const {
        return mBefore == acrOther.mBefore && mAfter == acrOther.mAfter;
    }
};

struct ZTSDiffPassing {
    ZTSDiffSubject mSubject;
    std::vector<std::pair<ZTCHistoryTime, std::string>> mStates;  ///< that it took on; an empty text: it was gone
};

struct ZTSDiffRate {
    ZTCKindKey mKind = 0;
    std::optional<ZTSRemotePort> mRemotePort;
    std::uint64_t mBefore = 0;
    std::uint64_t mAfter = 0;
    bool mIsDifferent = false;
};

struct ZTSDiffPoint {
    ZTCHistoryTime mTime;
    std::string mMark;  ///< empty: no mark was named
};

struct ZTSDiffRequest {
    ZTSDiffPoint mFrom;
    ZTSDiffPoint mTo;  ///< later than mFrom
    /// Where the stretch of the rates before begins, which ends at mFrom; absent: as long before mFrom as mTo is behind
    /// it.
    std::optional<ZTCHistoryTime> mBeforeSince{};
    std::optional<ZTCHistoryTime> mAfterSince{};  ///< where the stretch of the rates after begins; absent: at mFrom
};

/// A request as people and programs write it; an empty text is not given.
struct ZTSDiffTexts {
    std::string mFrom{};         ///< as of readPoint(); default: the last mark, without one 24 hours ago
    std::string mTo{};           ///< default: now
    std::string mBeforeSince{};  ///< defaults as of ZTSDiffRequest
    std::string mAfterSince{};
};

struct ZTSDiff {
    ZTSDiffPoint mFrom;
    ZTSDiffPoint mTo;
    bool mHasTopology = false;  ///< both topologies are stored; otherwise nothing is known of states
    std::vector<ZTSDiffChange> mChanges;
    std::vector<ZTSDiffPassing> mPassing;
    std::vector<ZTSDiffRate> mRates;          ///< kinds and ports with an event in one of the two times
    std::chrono::microseconds mBeforeSpan{};  ///< that the rates before are of
    std::chrono::microseconds mAfterSpan{};
    ZTCHistoryTime mBeforeEnd{};  ///< where the stretches of the rates end: whole minutes
    ZTCHistoryTime mAfterEnd{};

    bool isSame() const;
};

/// Links, remote ports, LUNs and paths that are different, in this order.
std::vector<ZTSDiffChange> compareTopologies(const ZTSTopology& acrBefore, const ZTSTopology& acrAfter);

/// Whether two counts, of times that are this long, are different.
bool areRatesDifferent(std::uint64_t aBefore, double aBeforeHours, std::uint64_t aAfter, double aAfterHours);

/// Throws ZTCBadFilterEx, also where a stretch of time ends before it begins.
ZTSDiffRequest readDiffRequest(const ZTSDiffTexts& acrTexts, const std::vector<ZTSMark>& acrMarks, ZTCHistoryTime aNow);

/// Throws what ZTCHistory throws.
ZTSDiff makeDiff(const ZTCHistory& acrHistory, const ZTSDiffRequest& acrRequest);

std::string formatDiff(const ZTSDiff& acrDiff, const ZTCNameBook& acrNames, std::size_t aTableWidth,
                       const ZTSTextStyle& acrStyle);

/// The document `tavik.diff/1`.
nlohmann::ordered_json makeDiffDocument(const ZTSDiff& acrDiff, const ZTCNameBook& acrNames, const std::string& acrHost,
                                        const std::string& acrStoreId);

#endif
