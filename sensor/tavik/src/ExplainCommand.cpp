#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/Explanation.h"

static void sPrint(const ZTSTavikOptions& acrOptions, const ZTCContext& acrContext, const std::string& acrStoreId,
                   const ZTSExplanation& acrExplanation, const ZTCNameBook& acrNames) {
    if (acrOptions.mIsJson) {
        writeDocument(makeExplainDocument(acrExplanation, acrContext.getHost(), acrStoreId, acrNames));
    } else {
        writeOutput(formatExplanation(acrExplanation, getPageStyle()));
    }
}

/// The database's id where there is one: what is explained then is a fixed text.
static std::string sStoreId(const ZTCContext& acrContext) {
    try {
        return acrContext.openHistory()->getStoreId();
    } catch (const ZTCStoreEx&) {
        return {};
    }
}

int runExplain(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const std::string& lrSubject = acrOptions.mSubject;
    if (const auto lTopic = lrSubject.empty() ? explainTopics() : explainTopic(lrSubject)) {
        sPrint(acrOptions, lContext, sStoreId(lContext), *lTopic, ZTCNameBook());
        return ZTTX_Done;
    }
    checkEpisodeNumber(lrSubject);  // wrong use is reported also where there is no history
    const std::unique_ptr<ZTCHistory> lpHistory = lContext.openHistory();
    const ZTCNameBook lNames = lContext.makeNames(lpHistory.get());
    sPrint(acrOptions, lContext, lpHistory->getStoreId(),
           explainEpisode(lrSubject, *lpHistory, lNames, getHistoryTime()), lNames);
    return ZTTX_Done;
}
