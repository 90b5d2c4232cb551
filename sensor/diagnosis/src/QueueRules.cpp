#include <algorithm>

#include "sensor/client/include/NumberText.h"
#include "sensor/diagnosis/src/Rules.h"

/// So many LUNs of one port full at once are the port's queue, fewer are the LUNs' own.
static constexpr std::size_t scPortLuns = 4;

static bool sIsPort(const ZTSLunSet& acrLuns) {
    return acrLuns.mIsAll || acrLuns.mHasMore || acrLuns.mNumbers.size() >= scPortLuns;
}

/// The runs of one remote port's episodes that concern the port (or: a few of its LUNs).
static std::vector<ZTCEpisodes> sSelect(const ZTCEvidenceIndex& acrEvidence, bool aIsPort) {
    std::vector<ZTCEpisodes> lSelected;
    for (auto& [lPort, lrEpisodes] : acrEvidence.byRemotePort("queue-full")) {
        for (ZTCEpisodes& lrRun : splitIntoRuns(lrEpisodes)) {
            const ZTSLunSet lLuns = unionOfLuns(lrRun);
            const bool lIsNamed = lLuns.mIsAll || !lLuns.mNumbers.empty();
            if (lIsNamed && sIsPort(lLuns) == aIsPort) {
                lSelected.push_back(std::move(lrRun));
            }
        }
    }
    return lSelected;
}

/// "Queue depth: 32 on each of 12 LUNs at host7, 384 commands in all." of each host.
static std::vector<std::string> sDepths(const ZTCEvidenceIndex& acrEvidence, const ZTSRemotePort& acrPort,
                                        const ZTSLunSet& acrLuns) {
    struct ZTSDepth {
        std::uint32_t mLeast = UINT32_MAX;
        std::uint32_t mMost = 0;
        std::uint64_t mSum = 0;
        std::uint64_t mLuns = 0;
    };
    std::map<std::string, ZTSDepth> lByHost;
    for (const ZTSTopologyPath* lpPath : acrEvidence.pathsTo(acrPort)) {
        const bool lIsMeant =
            acrLuns.mIsAll || acrLuns.mHasMore ||
            std::ranges::any_of(acrLuns.mNumbers, [lpPath](std::uint32_t aLun) { return aLun == lpPath->mLun; });
        if (lIsMeant && lpPath->mQueueDepth) {
            ZTSDepth& lrDepth = lByHost[lpPath->mHost];
            lrDepth.mLeast = std::min(lrDepth.mLeast, *lpPath->mQueueDepth);
            lrDepth.mMost = std::max(lrDepth.mMost, *lpPath->mQueueDepth);
            lrDepth.mSum += *lpPath->mQueueDepth;
            ++lrDepth.mLuns;
        }
    }
    std::vector<std::string> lTexts;
    for (const auto& [lHost, lrDepth] : lByHost) {
        const std::string lOne = lrDepth.mLeast == lrDepth.mMost
                                     ? formatNumber(lrDepth.mMost)
                                     : formatNumber(lrDepth.mLeast) + " to " + formatNumber(lrDepth.mMost);
        lTexts.push_back("Queue depth at " + lHost + ": " + lOne + " for " +
                         (lrDepth.mLuns == 1 ? "the LUN."
                                             : "each of " + formatNumber(lrDepth.mLuns) + " LUNs, " +
                                                   formatNumber(lrDepth.mSum) + " commands in all."));
    }
    return lTexts;
}

/// Adds the changes of queue depth that the driver made meanwhile at the same ports.
static ZTCEpisodes sWithDepthChanges(const ZTCEvidenceIndex& acrEvidence, const ZTCEpisodes& acrEpisodes) {
    ZTCEpisodes lAll = acrEpisodes;
    for (const ZTSEpisode* lpChange : acrEvidence.of("queue-depth")) {
        const bool lBelongs = std::ranges::any_of(acrEpisodes, [lpChange](const ZTSEpisode* apFull) {
            return lpChange->mRemotePort && lpChange->mRemotePort->mWwpn == apFull->mRemotePort->mWwpn &&
                   lpChange->mInitiator.mWwpn == apFull->mInitiator.mWwpn && areTogether(*lpChange, *apFull);
        });
        if (lBelongs) {
            lAll.push_back(lpChange);
        }
    }
    return lAll;
}

/// "The driver changed queue depths 12 times, down to 16." of the changes among the episodes; empty: there is none.
static std::string sDescribeChanges(const ZTCEpisodes& acrEpisodes) {
    std::uint64_t lChanges = 0;
    std::uint32_t lLeast = UINT32_MAX;
    for (const ZTSEpisode* lpEpisode : acrEpisodes) {
        if (getKindName(lpEpisode->mKind) == "queue-depth") {
            lChanges += lpEpisode->mCount;
            for (const ZTSReasonCount& lrDepth : lpEpisode->mDetail.mReasons) {
                lLeast = std::min(lLeast, lrDepth.mValue);
            }
        }
    }
    return lChanges == 0 ? std::string()
                         : "The driver changed queue depths " + formatCount(lChanges, "time") +
                               (lLeast == UINT32_MAX ? "." : ", down to " + formatNumber(lLeast) + ".");
}

/// "20,000 QUEUE FULL answers on LUNs 0-11, seen by host7."
static void sAddSeen(const ZTCEvidenceIndex& acrEvidence, const ZTCEpisodes& acrEpisodes, ZTSFinding& arFinding) {
    const ZTSLunSet lLuns = unionOfLuns(acrEpisodes);
    arFinding.mSeen.push_back(formatCount(countOccurrences(acrEpisodes), "QUEUE FULL answer") + " on " +
                              describeLuns(lLuns) + ", seen by " +
                              joinNames(acrEvidence.namesOf(arFinding.mInitiators)) + ".");
    const std::string lChanges = sDescribeChanges(sWithDepthChanges(acrEvidence, acrEpisodes));
    if (!lChanges.empty()) {
        arFinding.mSeen.push_back(lChanges);
    }
    for (const ZTSRemotePort& lrPort : arFinding.mRemotePorts) {
        const std::vector<std::string> lDepths = sDepths(acrEvidence, lrPort, lLuns);
        arFinding.mSeen.insert(arFinding.mSeen.end(), lDepths.begin(), lDepths.end());
    }
}

void lookForPortOverload(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    std::map<ZTCWwnBytes, ZTCEpisodes> lByPort;
    for (const ZTCEpisodes& lrRun : sSelect(acrEvidence, true)) {
        ZTCEpisodes& lrAll = lByPort[lrRun.front()->mRemotePort->mWwpn.mBytes];
        lrAll.insert(lrAll.end(), lrRun.begin(), lrRun.end());
    }
    for (const auto& [lPort, lrEpisodes] : lByPort) {
        ZTSFinding lFinding = beginFinding(acrEvidence, acrRule, sWithDepthChanges(acrEvidence, lrEpisodes));
        sAddSeen(acrEvidence, lrEpisodes, lFinding);
        const std::vector<ZTSInitiator> lSilent =
            acrEvidence.findOtherUsers(lFinding.mRemotePorts.front(), lFinding.mInitiators);
        if (!lSilent.empty()) {
            lFinding.mAgainst.push_back(joinNames(acrEvidence.namesOf(lSilent)) +
                                        " uses this port too and had no QUEUE FULL: unless it was idle, look at the "
                                        "load that " +
                                        joinNames(acrEvidence.namesOf(lFinding.mInitiators)) + " makes.");
        }
        arFindings.push_back(std::move(lFinding));
    }
}

/// A LUN is busy behind every port of its node: one finding for all of them.
void lookForLunOverload(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    std::map<std::pair<ZTCWwnBytes, std::vector<std::uint32_t>>, ZTCEpisodes> lByLun;
    for (const ZTCEpisodes& lrRun : sSelect(acrEvidence, false)) {
        const ZTSRemotePort& lrPort = *lrRun.front()->mRemotePort;
        const ZTSFcName lPlace = acrEvidence.findNode(lrPort).value_or(lrPort.mWwpn);
        ZTCEpisodes& lrAll = lByLun[{lPlace.mBytes, unionOfLuns(lrRun).mNumbers}];
        lrAll.insert(lrAll.end(), lrRun.begin(), lrRun.end());
    }
    for (const auto& [lKey, lrEpisodes] : lByLun) {
        const ZTSLunSet lLuns = unionOfLuns(lrEpisodes);
        const std::string lPorts = joinNames(acrEvidence.namesOf(acrEvidence.remotePortsOf(lrEpisodes)));
        ZTSFinding lFinding = beginFinding(acrEvidence, acrRule, sWithDepthChanges(acrEvidence, lrEpisodes),
                                           describeLuns(lLuns) + " of " + lPorts);
        sAddSeen(acrEvidence, lrEpisodes, lFinding);
        if (lFinding.mRemotePorts.size() > 1) {
            lFinding.mSeen.push_back("The same is seen behind " + formatNumber(lFinding.mRemotePorts.size()) +
                                     " ports of one node, so no single port is at fault.");
        }
        if (lLuns.mNumbers.size() > 1) {
            lFinding.mAgainst.emplace_back("More than one LUN was full: the port may be near its limit, too.");
        }
        arFindings.push_back(std::move(lFinding));
    }
}
