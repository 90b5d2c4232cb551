#include <algorithm>
#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/DiffView.h"
#include "sensor/views/include/TimeText.h"

/// Where no mark has been set.
static constexpr std::chrono::hours scDefaultSpan{24};

/// The exit status where something is different.
static constexpr int scDifferent = 1;

static ZTSDiffPoint sReadPoint(const std::string& acrText, const char* apName, const std::vector<ZTSMark>& acrMarks,
                               ZTCHistoryTime aNow) {
    const bool lIsMark = std::ranges::find(acrMarks, acrText, &ZTSMark::mName) != acrMarks.end();
    return {.mTime = readPoint(acrText, apName, acrMarks, aNow), .mMark = lIsMark ? acrText : ""};
}

int runDiff(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const std::unique_ptr<ZTCHistory> lpHistory = lContext.openHistory();
    const std::vector<ZTSMark> lMarks = lpHistory->readMarks();
    const ZTCHistoryTime lNow = getHistoryTime();
    ZTSDiffPoint lFrom{.mTime = lNow - scDefaultSpan, .mMark = ""};
    if (!acrOptions.mFrom.empty()) {
        lFrom = sReadPoint(acrOptions.mFrom, "FROM", lMarks, lNow);
    } else if (!lMarks.empty()) {
        lFrom = {.mTime = lMarks.back().mTime, .mMark = lMarks.back().mName};
    }
    const ZTSDiffPoint lTo = acrOptions.mTo.empty() ? ZTSDiffPoint{.mTime = lNow, .mMark = ""}
                                                    : sReadPoint(acrOptions.mTo, "TO", lMarks, lNow);
    if (lFrom.mTime >= lTo.mTime) {
        throw ZTCWrongUseEx("FROM has to be earlier than TO, and " + formatDateTime(lFrom.mTime) +
                            " is not earlier than " + formatDateTime(lTo.mTime));
    }
    const ZTSDiff lDiff = makeDiff(*lpHistory, lFrom, lTo);
    const ZTCNameBook lNames = lContext.makeNames(lpHistory.get());
    if (acrOptions.mIsJson) {
        writeDocument(makeDiffDocument(lDiff, lNames, lContext.getHost(), lpHistory->getStoreId()));
    } else {
        writeOutput(formatDiff(lDiff, lNames, getTableWidth(), getPageStyle()));
    }
    if (!lDiff.isSame()) {
        return scDifferent;
    }
    return lDiff.mHasTopology ? ZTTX_Done : ZTTX_NotKnown;
}
