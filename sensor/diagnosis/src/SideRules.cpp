/// Is it the target, the path of one initiator, or this host?

#include <algorithm>

#include "sensor/client/include/NumberText.h"
#include "sensor/diagnosis/src/Rules.h"

/// Troubles of a remote port whose side can be told from the initiators that meet them. Queue full is not among them:
/// its own rules look at the initiators.
static constexpr const char* scTroubles = "port-busy fcp-read-check device-busy check-condition lun-reset target-reset";

/// Runs of trouble of one remote port.
static std::vector<ZTCEpisodes> sTroubleRuns(const ZTCEvidenceIndex& acrEvidence) {
    std::vector<ZTCEpisodes> lRuns;
    for (const auto& [lPort, lrAll] : acrEvidence.byRemotePort(scTroubles)) {
        ZTCEpisodes lTroubles;
        std::ranges::copy_if(lrAll, std::back_inserter(lTroubles), [](const ZTSEpisode* apEpisode) {
            return !apEpisode->mDetail.mSenseKey || isTransportSense(*apEpisode);
        });
        for (ZTCEpisodes& lrRun : splitIntoRuns(std::move(lTroubles))) {
            lRuns.push_back(std::move(lrRun));
        }
    }
    return lRuns;
}

/// "40 lun-reset and 3 device-busy at host7 and host8."
static std::string sDescribeRun(const ZTCEvidenceIndex& acrEvidence, const ZTCEpisodes& acrRun) {
    std::map<std::string, std::uint64_t> lCounts;
    for (const ZTSEpisode* lpEpisode : acrRun) {
        lCounts[getKindName(lpEpisode->mKind)] += lpEpisode->mCount;
    }
    std::vector<std::string> lTexts;
    for (const auto& [lKind, lCount] : lCounts) {
        lTexts.push_back(formatNumber(lCount) + " " + lKind);
    }
    return joinNames(lTexts) + " at " + joinNames(acrEvidence.namesOf(acrEvidence.initiatorsOf(acrRun)));
}

void lookForTargetSide(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    for (const ZTCEpisodes& lrRun : sTroubleRuns(acrEvidence)) {
        if (acrEvidence.initiatorsOf(lrRun).size() > 1) {
            arFindings.push_back(beginFinding(acrEvidence, acrRule, lrRun));
            arFindings.back().mSeen.push_back(sDescribeRun(acrEvidence, lrRun) + ".");
        }
    }
}

void lookForOnePath(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    for (const ZTCEpisodes& lrRun : sTroubleRuns(acrEvidence)) {
        const std::vector<ZTSInitiator> lInitiators = acrEvidence.initiatorsOf(lrRun);
        if (lInitiators.size() != 1) {
            continue;
        }
        // Silence proves something only where the kinds could have been heard.
        std::vector<ZTSInitiator> lSilent = acrEvidence.findOtherUsers(*lrRun.front()->mRemotePort, lInitiators);
        std::erase_if(lSilent, [&](const ZTSInitiator& acrInitiator) {
            return std::ranges::any_of(lrRun, [&](const ZTSEpisode* apEpisode) {
                return !acrEvidence.isObserved(acrInitiator, apEpisode->mKind);
            });
        });
        if (lSilent.empty()) {
            continue;
        }
        ZTSFinding lFinding = beginFinding(
            acrEvidence, acrRule, lrRun,
            acrEvidence.nameOf(lInitiators.front()) + " to " + acrEvidence.nameOf(*lrRun.front()->mRemotePort));
        lFinding.mSeen.push_back(sDescribeRun(acrEvidence, lrRun) + ". " + joinNames(acrEvidence.namesOf(lSilent)) +
                                 (lSilent.size() == 1 ? " uses" : " use") + " the same port and had none of it.");
        arFindings.push_back(std::move(lFinding));
    }
}

static bool sIsSamePair(const ZTSEpisode& acrOne, const ZTSEpisode& acrOther) {
    return acrOne.mInitiator.mWwpn == acrOther.mInitiator.mWwpn && acrOne.mRemotePort && acrOther.mRemotePort &&
           acrOne.mRemotePort->mWwpn == acrOther.mRemotePort->mWwpn;
}

void lookForHostTimeouts(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    std::map<std::pair<std::string, ZTCWwnBytes>, ZTCEpisodes> lByPair;
    for (const ZTSEpisode* lpBusy : acrEvidence.of("device-busy")) {
        for (const ZTSEpisode* lpReset : acrEvidence.of("lun-reset")) {
            // The reset has to come first: resets that answer a busy LUN are the array's trouble.
            if (sIsSamePair(*lpBusy, *lpReset) && lpReset->mFirst < lpBusy->mFirst && isFollowedBy(*lpReset, *lpBusy)) {
                ZTCEpisodes& lrAll =
                    lByPair[{acrEvidence.nameOf(lpBusy->mInitiator), lpBusy->mRemotePort->mWwpn.mBytes}];
                for (const ZTSEpisode* lpEpisode : {lpReset, lpBusy}) {
                    if (std::ranges::find(lrAll, lpEpisode) == lrAll.end()) {
                        lrAll.push_back(lpEpisode);
                    }
                }
            }
        }
    }
    for (const auto& lrPair : lByPair) {
        const ZTCEpisodes& lrEpisodes = lrPair.second;
        ZTSFinding lFinding = beginFinding(acrEvidence, acrRule, lrEpisodes);
        lFinding.mSeen.push_back(sDescribeRun(acrEvidence, lrEpisodes) + ", on " +
                                 describeLuns(unionOfLuns(lrEpisodes)) + "; the resets came first.");
        const bool lIsFull = std::ranges::any_of(acrEvidence.of("queue-full"), [&](const ZTSEpisode* apFull) {
            return std::ranges::any_of(lrEpisodes, [&](const ZTSEpisode* apEpisode) {
                return sIsSamePair(*apFull, *apEpisode) && areTogether(*apFull, *apEpisode);
            });
        });
        if (lIsFull) {
            lFinding.mAgainst.emplace_back(
                "The port answered QUEUE FULL at that time, too: the time-outs may come "
                "from its load.");
        }
        arFindings.push_back(std::move(lFinding));
    }
}
