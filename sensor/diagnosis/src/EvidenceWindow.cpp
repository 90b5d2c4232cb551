#include "sensor/diagnosis/include/EvidenceWindow.h"

#include <algorithm>
#include <map>

static void sAddUnobserved(const ZTCHistory& acrHistory, ZTSEvidence& arEvidence) {
    std::map<std::pair<std::string, ZTCKindKey>, ZTSCoverage> lLatest;
    for (ZTSCoverage& lrCoverage : acrHistory.readCoverage(arEvidence.mFrom, arEvidence.mTo)) {
        const std::string lWho =
            lrCoverage.mInitiator.mWwpn ? lrCoverage.mInitiator.mWwpn->toText() : lrCoverage.mInitiator.mHost;
        ZTSCoverage& lrLatest = lLatest[{lWho, lrCoverage.mKind}];
        if (lrLatest.mKind == 0 || lrCoverage.mFrom >= lrLatest.mFrom) {
            lrLatest = std::move(lrCoverage);
        }
    }
    for (const auto& [lKey, lrCoverage] : lLatest) {
        if (lrCoverage.mKind != 0 && lrCoverage.mState != ZTKST_Off && lrCoverage.mState != ZTKST_Listening) {
            arEvidence.mUnobserved.push_back({lrCoverage.mInitiator, lrCoverage.mKind, lrCoverage.mState});
        }
    }
}

/// Many drivers show no fabric while the link is down: it counts as the one that the port was on before.
static void sAddFormerFabrics(const ZTCHistory& acrHistory, ZTSEvidence& arEvidence) {
    std::vector<ZTSTopologyInitiator>& lrInitiators = arEvidence.mTopology->mInitiators;
    const auto lIsWithout = [](const ZTSTopologyInitiator& acrInitiator) { return !acrInitiator.mFabric; };
    if (std::ranges::none_of(lrInitiators, lIsWithout)) {
        return;
    }
    ZTCHistoryTime lBefore = arEvidence.mTo;
    for (const ZTSEpisode& lrEpisode : arEvidence.mEpisodes) {
        if (getKindName(lrEpisode.mKind) == "link") {
            lBefore = std::min(lBefore, lrEpisode.mFirst - std::chrono::microseconds(1));
        }
    }
    const auto lFormer = acrHistory.readTopology(toMicroseconds(lBefore));
    for (ZTSTopologyInitiator& lrInitiator : lrInitiators) {
        const ZTSTopologyInitiator* const lpFormer =
            lFormer ? lFormer->mTopology.findInitiator(lrInitiator.mHost) : nullptr;
        if (!lrInitiator.mFabric && lpFormer != nullptr && lpFormer->mWwpn == lrInitiator.mWwpn) {
            lrInitiator.mFabric = lpFormer->mFabric;
        }
    }
}

static void sAddTopology(const ZTCHistory& acrHistory, ZTSEvidenceWindow& arWindow) {
    ZTSEvidence& lrEvidence = arWindow.mEvidence;
    if (auto lStored = acrHistory.readTopology(toMicroseconds(lrEvidence.mTo))) {
        lrEvidence.mTopology = std::move(lStored->mTopology);
        arWindow.mTopologyScanned = fromMicroseconds(lStored->mScanned);
        arWindow.mIsTopologyStale = lStored->mIsStale;
        sAddFormerFabrics(acrHistory, lrEvidence);
    }
    for (ZTSCounterSample& lrSample : acrHistory.readCounters(toMicroseconds(lrEvidence.mFrom),
                                                              toMicroseconds(lrEvidence.mTo), gcMostEvidenceCounters)) {
        lrEvidence.mCounters.push_back({.mMinute = fromMicroseconds(lrSample.mMinute),
                                        .mInitiator = lrSample.mInitiator,
                                        .mRemotePort = lrSample.mRemotePort,
                                        .mCounter = std::move(lrSample.mCounter),
                                        .mDifference = lrSample.mDifference});
    }
}

static std::chrono::microseconds sNotRunning(const ZTCHistory& acrHistory, ZTCHistoryTime aFrom, ZTCHistoryTime aTo) {
    std::chrono::microseconds lMissing = aTo - aFrom;
    for (const ZTSRun& lrRun : acrHistory.readRuns(aFrom)) {
        const ZTCHistoryTime lFrom = std::max(lrRun.mFrom, aFrom);
        const ZTCHistoryTime lTo = std::min(lrRun.mTo, aTo);
        lMissing -= std::max(lTo - lFrom, std::chrono::microseconds(0));
    }
    return std::max(lMissing, std::chrono::microseconds(0));
}

ZTSEvidenceWindow gatherEvidence(const ZTCHistory& acrHistory, ZTCHistoryTime aFrom, ZTCHistoryTime aTo) {
    ZTSEvidenceWindow lWindow;
    ZTSEvidence& lrEvidence = lWindow.mEvidence;
    lrEvidence.mFrom = aFrom;
    lrEvidence.mTo = aTo;
    ZTSHistoryFilter lFilter;
    lFilter.mSince = aFrom;
    lFilter.mUntil = aTo;
    lFilter.mLimit = gcMostEvidenceEpisodes;
    lrEvidence.mEpisodes = acrHistory.readEpisodes(lFilter);
    if (lrEvidence.mEpisodes.size() == gcMostEvidenceEpisodes) {
        lWindow.mIsCut = true;
        lrEvidence.mFrom = lrEvidence.mEpisodes.front().mFirst;
    }
    sAddUnobserved(acrHistory, lrEvidence);
    sAddTopology(acrHistory, lWindow);
    lWindow.mNotRunning = sNotRunning(acrHistory, lrEvidence.mFrom, aTo);
    for (ZTSGap& lrGap : acrHistory.readGaps(lrEvidence.mFrom)) {
        if (lrGap.mFrom <= aTo) {
            lWindow.mGaps.push_back(std::move(lrGap));
        }
    }
    return lWindow;
}
