#include <algorithm>
#include <map>
#include <set>

#include "sensor/views/include/DiagnosisView.h"

std::size_t ZTSDiagnosis::countShown() const {
    return static_cast<std::size_t>(std::ranges::count_if(
        mFindings, [](const ZTSFinding& acrFinding) { return acrFinding.mSeverity != ZTSV_Noise; }));
}

static ZTSEvidenceWindow sGather(const ZTCHistory& acrHistory, const ZTCNameBook& acrNames, ZTCHistoryTime aFrom,
                                 ZTCHistoryTime aTo) {
    ZTSEvidenceWindow lWindow = gatherEvidence(acrHistory, aFrom, aTo);
    lWindow.mEvidence.mNameRemotePort = [&acrNames](const ZTSRemotePort& acrPort) {
        return acrNames.describe(acrPort);
    };
    lWindow.mEvidence.mNameInitiator = [&acrNames](const ZTSInitiator& acrInitiator) {
        return acrNames.describe(acrInitiator);
    };
    return lWindow;
}

ZTSDiagnosis diagnoseWindow(const ZTCHistory& acrHistory, const ZTCNameBook& acrNames, ZTCHistoryTime aFrom,
                            ZTCHistoryTime aTo) {
    const ZTSEvidenceWindow lWindow = sGather(acrHistory, acrNames, aFrom, aTo);
    ZTSDiagnosis lDiagnosis;
    lDiagnosis.mFrom = lWindow.mEvidence.mFrom;
    lDiagnosis.mTo = aTo;
    lDiagnosis.mFindings = diagnose(lWindow.mEvidence);
    std::set<std::uint64_t> lExplained;
    for (const ZTSFinding& lrFinding : lDiagnosis.mFindings) {
        lExplained.insert(lrFinding.mEpisodes.begin(), lrFinding.mEpisodes.end());
    }
    std::map<ZTCKindKey, ZTSUnexplained> lUnexplained;
    for (const ZTSEpisode& lrEpisode : lWindow.mEvidence.mEpisodes) {
        ++lDiagnosis.mEpisodes;
        lDiagnosis.mOccurrences += lrEpisode.mCount;
        if (!lExplained.contains(lrEpisode.mEpisode)) {
            ZTSUnexplained& lrKind = lUnexplained[lrEpisode.mKind];
            lrKind.mKind = lrEpisode.mKind;
            ++lrKind.mEpisodes;
            lrKind.mOccurrences += lrEpisode.mCount;
        }
    }
    for (const auto& [lKind, lrUnexplained] : lUnexplained) {
        lDiagnosis.mUnexplained.push_back(lrUnexplained);
    }
    lDiagnosis.mUnobserved = lWindow.mEvidence.mUnobserved;
    lDiagnosis.mTopologyScanned = lWindow.mTopologyScanned;
    lDiagnosis.mIsTopologyStale = lWindow.mIsTopologyStale;
    lDiagnosis.mNotRunning = lWindow.mNotRunning;
    lDiagnosis.mGaps = lWindow.mGaps.size();
    lDiagnosis.mIsCut = lWindow.mIsCut;
    return lDiagnosis;
}

std::vector<ZTSFinding> diagnoseEpisode(const ZTCHistory& acrHistory, const ZTCNameBook& acrNames,
                                        const ZTSEpisode& acrEpisode, ZTCHistoryTime aNow) {
    const ZTCHistoryTime lLast = std::max(acrEpisode.mFirst, acrEpisode.mLast);
    const ZTCHistoryTime lTo = std::max(lLast, std::min(lLast + gcEvidenceReach, aNow));
    const ZTSEvidenceWindow lWindow = sGather(acrHistory, acrNames, acrEpisode.mFirst - gcEvidenceReach, lTo);
    std::vector<ZTSFinding> lFindings = diagnose(lWindow.mEvidence);
    std::erase_if(lFindings, [&](const ZTSFinding& acrFinding) { return !acrFinding.isShownBy(acrEpisode.mEpisode); });
    return lFindings;
}
