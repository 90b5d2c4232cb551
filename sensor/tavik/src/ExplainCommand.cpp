#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/DiagnosisView.h"
#include "sensor/views/include/Explanation.h"

static void sPrint(const ZTSTavikOptions& acrOptions, const ZTCContext& acrContext, const std::string& acrStoreId,
                   const ZTSExplanation& acrExplanation, const ZTCNameBook& acrNames) {
    if (acrOptions.mIsJson) {
        writeDocument(makeExplainDocument(acrExplanation, acrContext.getHost(), acrStoreId, acrNames));
    } else {
        writeOutput(formatExplanation(acrExplanation, getPageStyle(), getHistoryTime()));
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

/// What a stretch of time means: the last day unless it is given.
static int sExplainTime(const ZTSTavikOptions& acrOptions, const ZTCContext& acrContext) {
    const std::unique_ptr<ZTCHistory> lpHistory = acrContext.openHistory();
    const ZTCHistoryTime lNow = getHistoryTime();
    const ZTSFilterTexts& lrTexts = acrOptions.mFilter;
    const std::vector<ZTSMark> lMarks = lpHistory->readMarks();
    const ZTCHistoryTime lTo = lrTexts.mUntil.empty() ? lNow : readPoint(lrTexts.mUntil, "--until", lMarks, lNow);
    const ZTCHistoryTime lFrom =
        lrTexts.mSince.empty() ? lTo - gcDiagnosisSpan : readPoint(lrTexts.mSince, "--since", lMarks, lNow);
    checkOrder("--since", lFrom, "--until", lTo);
    const ZTCNameBook lNames = acrContext.makeNames(lpHistory.get());
    const ZTSDiagnosis lDiagnosis = diagnoseWindow(*lpHistory, lNames, lFrom, lTo);
    if (acrOptions.mIsJson) {
        writeDocument(makeDiagnosisDocument(lDiagnosis, acrContext.getHost(), lpHistory->getStoreId(), lNames));
    } else {
        writeOutput(formatDiagnosis(lDiagnosis, getPageStyle(), acrOptions.mIsAll, lNow));
    }
    return ZTTX_Done;
}

int runExplain(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const std::string& lrSubject = acrOptions.mSubject;
    if (lrSubject.empty()) {
        return sExplainTime(acrOptions, lContext);
    }
    if (!acrOptions.mFilter.mSince.empty() || !acrOptions.mFilter.mUntil.empty() || acrOptions.mIsAll) {
        throw ZTCWrongUseEx("--since, --until and --all choose what tavik explain looks at without \"" + lrSubject +
                            "\"; with it they mean nothing");
    }
    if (const auto lTopic = explainTopic(lrSubject)) {
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
