#include <algorithm>

#include "sensor/views/include/StatusFacts.h"

ZTSHistoryFacts readHistoryFacts(const ZTCHistory& acrHistory, ZTCHistoryTime aNow) {
    ZTSHistoryFacts lFacts;
    lFacts.mStoreId = acrHistory.getStoreId();
    lFacts.mLedger = acrHistory.readLedger();
    lFacts.mGaps = acrHistory.readGaps(aNow - gcLossSpan);
    const std::vector<ZTSRun> lRuns = acrHistory.readRuns();
    if (!lRuns.empty()) {
        lFacts.mLastRun = lRuns.back();
    }
    lFacts.mRetrievals = acrHistory.readRetrievalTotals();
    for (const ZTSTotal& lrTotal : acrHistory.readTotals()) {
        if (!lFacts.mLastEvent || lrTotal.mLastEvent > *lFacts.mLastEvent) {
            lFacts.mLastEvent = lrTotal.mLastEvent;
            lFacts.mLastEventKind = getKindName(lrTotal.mKind);
        }
    }
    std::vector<ZTSFcName> lPorts;
    ZTSHistoryFilter lOpen;
    lOpen.mIsOpenOnly = true;
    lOpen.mLimit = gcMostOpenEpisodes;
    acrHistory.visitEpisodes(lOpen, [&](const ZTSEpisode& acrEpisode) {
        ++lFacts.mOpenEpisodes;
        if (acrEpisode.mRemotePort &&
            std::find(lPorts.begin(), lPorts.end(), acrEpisode.mRemotePort->mWwpn) == lPorts.end()) {
            lPorts.push_back(acrEpisode.mRemotePort->mWwpn);
        }
        return true;
    });
    lFacts.mOpenPorts = lPorts.size();
    lFacts.mSan = readSan(acrHistory, aNow);
    return lFacts;
}
