#include "sensor/views/include/Timeline.h"

#include <algorithm>
#include <map>
#include <nlohmann/json.hpp>

#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TimeText.h"
#include "sensor/views/src/TimelineColumns.h"
#include "sensor/views/src/TimelineTopology.h"

using ZTCJson = nlohmann::ordered_json;

namespace {

/// From this range on the columns are so wide that whole days do: the store keeps counts for both.
constexpr std::chrono::hours scDayColumns{24};

struct ZTSCell {
    std::uint64_t mCount = 0;
    std::uint64_t mSpread = 0;
};

struct ZTSRow {
    ZTSInitiator mInitiator;
    std::optional<ZTSRemotePort> mRemotePort;
    ZTCKindKey mKind = 0;
    std::map<std::size_t, ZTSCell> mCells;
};

/// Collects buckets into rows and columns.
class ZTCRows {
public:
    explicit ZTCRows(const ZTSTimelineRequest& acrRequest) : mrRequest(acrRequest) {}

    void add(const ZTSBucket& acrBucket) {
        if (acrBucket.mFrom >= mrRequest.mTo) {
            return;
        }
        ZTSRow& lrRow =
            mRows[{sBytes(acrBucket.mInitiator.mWwpn),
                   acrBucket.mRemotePort ? sBytes(acrBucket.mRemotePort->mWwpn) : ZTCBytes8(), acrBucket.mKind}];
        lrRow.mInitiator = acrBucket.mInitiator;
        lrRow.mRemotePort = acrBucket.mRemotePort;
        lrRow.mKind = acrBucket.mKind;
        ZTSCell& lrCell = lrRow.mCells[findColumn(mrRequest, acrBucket.mFrom)];
        lrCell.mCount += acrBucket.mOccurrences;
        lrCell.mSpread += acrBucket.mSpread;
    }

    ZTCJson toJsonRows(const ZTCNameBook& acrNames) const {
        ZTCJson lRows = ZTCJson::array();
        for (const auto& [lrKey, lrRow] : mRows) {
            ZTCJson lCells = ZTCJson::array();
            for (const auto& [lColumn, lrCell] : lrRow.mCells) {
                lCells.push_back({lColumn, lrCell.mCount, lrCell.mSpread});
            }
            lRows.push_back({{"initiator", toJson(lrRow.mInitiator)},
                             {"remotePort", toJson(lrRow.mRemotePort, acrNames)},
                             {"kind", getKindName(lrRow.mKind)},
                             {"cells", std::move(lCells)}});
        }
        return lRows;
    }

private:
    using ZTCBytes8 = std::array<std::uint8_t, 8>;
    using Key = std::tuple<ZTCBytes8, ZTCBytes8, ZTCKindKey>;

    static ZTCBytes8 sBytes(const std::optional<ZTSFcName>& acrName) { return acrName ? acrName->mBytes : ZTCBytes8(); }

    const ZTSTimelineRequest& mrRequest;
    std::map<Key, ZTSRow> mRows;
};

ZTCJson sCoverage(const ZTCHistory& acrHistory, const ZTSTimelineRequest& acrRequest) {
    ZTCJson lStates = ZTCJson::array();
    for (const ZTSCoverage& lrCoverage : acrHistory.readCoverage(acrRequest.mFrom, acrRequest.mTo)) {
        if (lrCoverage.mState != ZTKST_Listening && lrCoverage.mState != ZTKST_NoSource) {
            lStates.push_back({{"initiator", toJson(lrCoverage.mInitiator)},
                               {"kind", getKindName(lrCoverage.mKind)},
                               {"state", getKindStateName(lrCoverage.mState)},
                               {"from", toRfc3339(lrCoverage.mFrom)},
                               {"to", toRfc3339(lrCoverage.mTo)}});
        }
    }
    return lStates;
}

}  // namespace

ZTCJson makeTimelineDocument(const ZTCHistory& acrHistory, const ZTSTimelineRequest& acrRequest,
                             const ZTCNameBook& acrNames, const std::string& acrHost) {
    ZTCRows lRows(acrRequest);
    ZTSHistoryFilter lFilter;
    lFilter.mSince = acrRequest.mFrom;
    lFilter.mUntil = acrRequest.mTo;
    const auto lAdd = [&lRows](const ZTSBucket& acrBucket) {
        lRows.add(acrBucket);
        return true;
    };
    const auto lWidth = (acrRequest.mTo - acrRequest.mFrom) / static_cast<std::int64_t>(acrRequest.mColumns);
    if (lWidth >= scDayColumns) {
        acrHistory.visitDays(lFilter, lAdd);
    } else {
        acrHistory.visitMinutes(lFilter, lAdd);
    }

    ZTCJson lDocument = beginDocument("timeline", acrHost, acrHistory.getStoreId());
    lDocument["from"] = toRfc3339(acrRequest.mFrom);
    lDocument["to"] = toRfc3339(acrRequest.mTo);
    lDocument["columns"] = acrRequest.mColumns;
    lDocument["columnSeconds"] = std::chrono::duration<double>(lWidth).count();
    lDocument["rows"] = lRows.toJsonRows(acrNames);
    lDocument["coverage"] = sCoverage(acrHistory, acrRequest);
    lDocument["runs"] = ZTCJson::array();
    for (const ZTSRun& lrRun : acrHistory.readRuns(acrRequest.mFrom)) {
        lDocument["runs"].push_back({{"from", toRfc3339(lrRun.mFrom)}, {"to", toRfc3339(lrRun.mTo)}});
    }
    lDocument["gaps"] = ZTCJson::array();
    for (const ZTSGap& lrGap : acrHistory.readGaps(acrRequest.mFrom)) {
        lDocument["gaps"].push_back(toJson(lrGap));
    }
    lDocument["marks"] = ZTCJson::array();
    for (const ZTSMark& lrMark : acrHistory.readMarks()) {
        if (lrMark.mTime >= acrRequest.mFrom && lrMark.mTime <= acrRequest.mTo) {
            lDocument["marks"].push_back({{"name", lrMark.mName}, {"time", toRfc3339(lrMark.mTime)}});
        }
    }
    addTopology(lDocument, acrHistory, acrRequest, acrNames);
    return lDocument;
}
