#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/DiffView.h"

/// The exit status where something is different.
static constexpr int scDifferent = 1;

int runDiff(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const std::unique_ptr<ZTCHistory> lpHistory = lContext.openHistory();
    const ZTSDiff lDiff = makeDiff(*lpHistory, readDiffRequest({.mFrom = acrOptions.mFrom, .mTo = acrOptions.mTo},
                                                               lpHistory->readMarks(), getHistoryTime()));
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
