#include "sensor/views/include/StatusFacts.h"

#include <algorithm>

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
    return lFacts;
}

ZTSLossSum sumLosses(const ZTSStatusFacts& acrFacts) {
    ZTSLossSum lSum;
    if (acrFacts.mHistory) {
        for (const ZTSGap& lrGap : acrFacts.mHistory->mGaps) {
            lSum.mInGaps += lrGap.getOccurrences();
            lSum.mIsAtLeast = lSum.mIsAtLeast || !lrGap.mIsCountKnown;
        }
    }
    const bool lIsKnown = acrFacts.mLive && acrFacts.mLive->mLosses;
    lSum.mIsRefusedKnown = lIsKnown;
    if (lIsKnown) {
        const ZTSLiveLosses& lrLosses = *acrFacts.mLive->mLosses;
        for (const auto& [lReason, lCount] : lrLosses.mRefused) {
            lSum.mRefused += lReason == getRefusalName(ZTRF_CollectionOff) ? 0 : lCount;
        }
        lSum.mDropped = lrLosses.mDropped.value_or(0);
        for (const ZTSLibraryLoss& lrLoss : lrLosses.mLibrary) {
            lSum.mDropped += lrLoss.mCount;
        }
    }
    return lSum;
}

ZTSLastEvent findLastEvent(const ZTSStatusFacts& acrFacts) {
    if (acrFacts.mLive && acrFacts.mLive->mCollector.mLastEvent) {
        return {acrFacts.mLive->mCollector.mLastEvent, acrFacts.mLive->mCollector.mLastEventKind};
    }
    if (acrFacts.mHistory) {
        return {acrFacts.mHistory->mLastEvent, acrFacts.mHistory->mLastEventKind};
    }
    return {};
}

std::vector<std::string> listUnknown(const ZTSStatusFacts& acrFacts) {
    std::vector<std::string> lUnknown;
    const auto lAdd = [&lUnknown](bool aIsUnknown, const std::string& acrText) {
        if (aIsUnknown) {
            lUnknown.push_back(acrText);
        }
    };
    lAdd(!acrFacts.mHistory && !acrFacts.mHistoryProblem.empty(), acrFacts.mHistoryProblem);
    lAdd(acrFacts.mAnswer == ZTAN_NoSensor && !acrFacts.mPageProblem.empty(), acrFacts.mPageProblem);
    if (acrFacts.mLive) {
        const ZTSLiveState& lrLive = *acrFacts.mLive;
        lUnknown.insert(lUnknown.end(), lrLive.mProblems.begin(), lrLive.mProblems.end());
        lAdd(!lrLive.mAgent.mIsRunning, "the sensor did not say whether its agent runs");
        lAdd(!lrLive.mKinds, "the sensor did not say which kinds it listens to");
        lAdd(!lrLive.mLosses, "the sensor did not say what was refused in the last 24 h");
        lAdd(!lrLive.mCollector.mDisk, "the sensor did not say whether its disk has room");
    }
    return lUnknown;
}
