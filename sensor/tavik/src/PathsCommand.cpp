#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/PathsView.h"

int runPaths(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const std::unique_ptr<ZTCHistory> lpHistory = lContext.openHistory();
    const ZTCHistoryTime lNow = getHistoryTime();
    ZTSPathsRequest lRequest;
    lRequest.mTime = acrOptions.mAt.empty() ? lNow : readPoint(acrOptions.mAt, "--at", lpHistory->readMarks(), lNow);
    lRequest.mIsEachPath = acrOptions.mIsEachPath;
    const std::optional<ZTSSanView> lView = readSan(*lpHistory, lRequest.mTime);
    ZTCNameBook lNames = lContext.makeNames(lpHistory.get());
    if (lView) {
        addPorts(lNames, lView->mTopology);
    }
    lRequest.mFilter = readPathsFilter(acrOptions.mFilter, lNames, acrOptions.mIsTroubleOnly);
    if (acrOptions.mIsJson) {
        writeDocument(makePathsDocument(lView ? &*lView : nullptr, lRequest, lNames, lContext.getHost(),
                                        lpHistory->getStoreId()));
        return ZTTX_Done;
    }
    if (!lView) {
        throw ZTCNotKnownEx("no paths have been stored " +
                            std::string(acrOptions.mAt.empty() ? "yet: tavik status" : "by that time"));
    }
    writeOutput(formatPaths(*lView, lRequest, lNames, getTableWidth(), getPageStyle()));
    return ZTTX_Done;
}
