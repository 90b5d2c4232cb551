#include "sensor/views/include/StatusFacts.h"

#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

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
    lSum.mIsAtLeast = lSum.mIsAtLeast || acrFacts.mLossSpan > gcLossSpan;  // of what was refused, a day is known
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

std::string describeStaleNames(const ZTSStatusFacts& acrFacts) {
    // Right after its start the sensor has looked at nothing yet: that is no trouble.
    static constexpr std::chrono::seconds scFirstScan(30);
    if (!acrFacts.mLive || !acrFacts.mLive->mTopology || !acrFacts.mLive->mTopology->mIsStale.value_or(false)) {
        return {};
    }
    const ZTSLiveTopology& lrTopology = *acrFacts.mLive->mTopology;
    const ZTCHistoryTime lSince = lrTopology.mStaleSince.value_or(acrFacts.mNow);
    if (lrTopology.mBlocked.empty() && !lrTopology.mScanned && acrFacts.mNow - lSince < scFirstScan) {
        return {};
    }
    std::string lText =
        "names and states of ports and disks are stale since " + formatShortTime(lSince, acrFacts.mNow) + ": ";
    if (lrTopology.mBlocked.empty()) {
        lText += "the kernel does not answer when they are read";
    } else {
        lText += lrTopology.mBlocked.front() +
                 (lrTopology.mBlocked.size() == 1
                      ? std::string(" does not answer")
                      : " and " + formatCount(lrTopology.mBlocked.size() - 1, "more file") + " do not answer");
    }
    return lText +
           "; events are collected all the same. Look at that adapter in the kernel's log: " + gcStaleNamesAction;
}

std::string describeDamagedHistories(const ZTSStatusFacts& acrFacts) {
    if (!acrFacts.mDamagedHistories || acrFacts.mDamagedHistories->empty()) {
        return {};
    }
    const std::vector<std::string>& lrPaths = *acrFacts.mDamagedHistories;
    const std::string lWhat = lrPaths.size() == 1
                                  ? "a damaged history was set aside as "
                                  : formatNumber(lrPaths.size()) + " damaged histories were set aside, the last as ";
    return lWhat + lrPaths.back() +
           "; events in it are not shown. When nobody needs them any more, remove it and the -wal file beside it";
}

std::vector<std::string> listUnknown(const ZTSStatusFacts& acrFacts) {
    std::vector<std::string> lUnknown;
    const auto lAdd = [&lUnknown](bool aIsUnknown, const std::string& acrText) {
        if (aIsUnknown) {
            lUnknown.push_back(acrText);
        }
    };
    lAdd(!acrFacts.mHistory && !acrFacts.mHistoryProblem.empty(), acrFacts.mHistoryProblem);
    const std::string lDamaged = describeDamagedHistories(acrFacts);
    lAdd(!lDamaged.empty(), lDamaged);
    lAdd(acrFacts.mAnswer == ZTAN_NoSensor && !acrFacts.mPageProblem.empty(), acrFacts.mPageProblem);
    const std::string lStale = describeStaleNames(acrFacts);
    lAdd(!lStale.empty(), lStale);
    if (lStale.empty() && acrFacts.mLive && acrFacts.mHistory && acrFacts.mHistory->mSan) {
        const ZTSSanView& lrSan = *acrFacts.mHistory->mSan;
        lAdd(lrSan.mIsStale, "the paths are not whole: " + formatCount(lrSan.mFacts.mBlocked, "file") +
                                 " of /sys did not answer; of them earlier values are shown");
        lAdd(acrFacts.mNow - lrSan.mScanned > gcScanSpan,
             "the paths were last read at " + formatShortTime(lrSan.mScanned, acrFacts.mNow));
    }
    if (acrFacts.mLive) {
        const ZTSLiveState& lrLive = *acrFacts.mLive;
        lUnknown.insert(lUnknown.end(), lrLive.mProblems.begin(), lrLive.mProblems.end());
        lAdd(!lrLive.mAgent.mIsRunning, "the sensor did not say whether its agent runs");
        // While there is no agent, or it is just starting, these cannot be known: the state says so.
        const bool lIsSettled = lrLive.mKeeper.mState.value_or(ZTKP_Running) == ZTKP_Running;
        lAdd(lIsSettled && !lrLive.mKinds, "the sensor did not say which kinds it listens to");
        lAdd(lIsSettled && !lrLive.mLosses, "the sensor did not say what was refused in the last 24 h");
        lAdd(!lrLive.mCollector.mDisk, "the sensor did not say whether its disk has room");
    }
    return lUnknown;
}
