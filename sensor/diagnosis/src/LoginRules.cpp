#include <algorithm>

#include "sensor/client/include/NumberText.h"
#include "sensor/diagnosis/src/Rules.h"

// ---- LS_RJT: codes as FC-LS assigns them ----

enum ZTELinkService : std::uint32_t { ZTLS_Plogi = 0x03, ZTLS_Prli = 0x20 };

static constexpr std::uint32_t scNotSupported = 0x0B;         // reason
static constexpr std::uint32_t scNoResourcesForLogin = 0x29;  // explanation
static constexpr std::uint32_t scRequestNotSupported = 0x2C;  // explanation

static bool sIsForWantOfResources(const ZTSReasonCount& acrReason) {
    return acrReason.mExplanation == scNoResourcesForLogin;
}

static bool sIsNotSupported(const ZTSReasonCount& acrReason) {
    return acrReason.mValue == scNotSupported || acrReason.mExplanation == scRequestNotSupported;
}

/// Rejections of the given commands for such a reason, by remote port.
template <typename IsReason>
static void sLookForRejections(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings,
                               std::initializer_list<std::uint32_t> aCommands, IsReason aIsReason) {
    for (const auto& [lPort, lrAll] : acrEvidence.byRemotePort("lsrjt")) {
        ZTCEpisodes lFitting;
        std::uint64_t lRejections = 0;
        for (const ZTSEpisode* lpEpisode : lrAll) {
            const auto& lrCommand = lpEpisode->mDetail.mOriginalCommand;
            std::uint64_t lCount = 0;
            for (const ZTSReasonCount& lrReason : lpEpisode->mDetail.mReasons) {
                lCount += aIsReason(lrReason) ? lrReason.mCount : 0;
            }
            if (lCount != 0 && lrCommand && std::ranges::find(aCommands, *lrCommand) != aCommands.end()) {
                lFitting.push_back(lpEpisode);
                lRejections += lCount;
            }
        }
        if (!lFitting.empty()) {
            arFindings.push_back(beginFinding(acrEvidence, acrRule, lFitting));
            arFindings.back().mSeen.push_back(formatCount(lRejections, "rejection") + " of a login from " +
                                              joinNames(acrEvidence.namesOf(arFindings.back().mInitiators)) + ".");
        }
    }
}

void lookForLoginLimit(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    sLookForRejections(acrEvidence, acrRule, arFindings, {ZTLS_Plogi}, sIsForWantOfResources);
}

void lookForUnsupportedLogin(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    sLookForRejections(acrEvidence, acrRule, arFindings, {ZTLS_Plogi, ZTLS_Prli}, sIsNotSupported);
}

// ---- RSCN, then LOGO and PLOGI ----

/// What one initiator met after one run of state changes.
struct ZTSRelogin {
    ZTCEpisodes mChanges;                         ///< the RSCNs
    ZTCEpisodes mLogins;                          ///< LOGO and PLOGI of the ports that logged in again
    std::set<ZTCWwnBytes> mBack;                  ///< those ports
    std::set<ZTCWwnBytes> mGone;                  ///< ports that logged out and have not logged in again
    std::set<std::optional<ZTCWwnBytes>> mNodes;  ///< of mBack; absent: not known

    ZTCEpisodes getAll() const {
        ZTCEpisodes lAll = mChanges;
        lAll.insert(lAll.end(), mLogins.begin(), mLogins.end());
        return lAll;
    }
};

static ZTCEpisodes sOfInitiator(const ZTCEpisodes& acrEpisodes, const ZTSInitiator& acrInitiator) {
    ZTCEpisodes lOwn;
    std::ranges::copy_if(acrEpisodes, std::back_inserter(lOwn), [&](const ZTSEpisode* apEpisode) {
        return apEpisode->mInitiator.mWwpn == acrInitiator.mWwpn;
    });
    return lOwn;
}

static bool sHasFollower(const ZTCEpisodes& acrEarlier, const ZTSEpisode& acrLater) {
    return std::ranges::any_of(acrEarlier,
                               [&](const ZTSEpisode* apEarlier) { return isFollowedBy(*apEarlier, acrLater); });
}

static ZTSRelogin sFollow(const ZTCEvidenceIndex& acrEvidence, const ZTCEpisodes& acrChanges,
                          const ZTSInitiator& acrInitiator) {
    ZTSRelogin lRelogin;
    lRelogin.mChanges = acrChanges;
    const ZTCEpisodes lLogins = sOfInitiator(acrEvidence.of("plogi"), acrInitiator);
    for (const ZTSEpisode* lpLogout : sOfInitiator(acrEvidence.of("logo"), acrInitiator)) {
        if (!lpLogout->mRemotePort || !sHasFollower(acrChanges, *lpLogout)) {
            continue;
        }
        const ZTCWwnBytes& lrPort = lpLogout->mRemotePort->mWwpn.mBytes;
        const auto lLogin = std::ranges::find_if(lLogins, [&](const ZTSEpisode* apLogin) {
            return apLogin->mRemotePort && apLogin->mRemotePort->mWwpn.mBytes == lrPort &&
                   isFollowedBy(*lpLogout, *apLogin);
        });
        if (lLogin == lLogins.end()) {
            lRelogin.mGone.insert(lrPort);
            continue;
        }
        const auto lNode = acrEvidence.findNode(*lpLogout->mRemotePort);
        lRelogin.mNodes.insert(lNode ? std::optional(lNode->mBytes) : std::nullopt);
        lRelogin.mBack.insert(lrPort);
        lRelogin.mLogins.push_back(lpLogout);
        lRelogin.mLogins.push_back(*lLogin);
    }
    return lRelogin;
}

/// What each initiator met after state changes, where several ports logged out and in again and its own link stayed.
static std::vector<ZTSRelogin> sRelogins(const ZTCEvidenceIndex& acrEvidence) {
    std::vector<ZTSRelogin> lRelogins;
    for (const ZTSInitiator& lrInitiator : acrEvidence.initiatorsOf(acrEvidence.of("rscn"))) {
        const ZTCEpisodes lLinks = sOfInitiator(acrEvidence.of("link"), lrInitiator);
        for (const ZTCEpisodes& lrRun : splitIntoRuns(sOfInitiator(acrEvidence.of("rscn"), lrInitiator))) {
            const bool lHasLinkEvent = std::ranges::any_of(lrRun, [&](const ZTSEpisode* apChange) {
                return std::ranges::any_of(lLinks,
                                           [&](const ZTSEpisode* apLink) { return areTogether(*apLink, *apChange); });
            });
            ZTSRelogin lRelogin = sFollow(acrEvidence, lrRun, lrInitiator);
            if (!lHasLinkEvent && lRelogin.mBack.size() > 1) {
                lRelogins.push_back(std::move(lRelogin));
            }
        }
    }
    return lRelogins;
}

/// The node whose ports all logged in again, and no other port did.
static std::optional<ZTSFcName> sFindWholeNode(const ZTCEvidenceIndex& acrEvidence, const ZTSRelogin& acrRelogin) {
    if (acrRelogin.mNodes.size() != 1 || !*acrRelogin.mNodes.begin()) {
        return std::nullopt;
    }
    const ZTSFcName lNode{**acrRelogin.mNodes.begin()};
    return std::ranges::includes(acrRelogin.mBack, acrEvidence.portsOfNode(lNode)) ? std::optional(lNode)
                                                                                   : std::nullopt;
}

static void sAddRelogin(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, const ZTSRelogin& acrRelogin,
                        ZTCFindings& arFindings) {
    ZTSFinding lFinding = beginFinding(acrEvidence, acrRule, acrRelogin.getAll());
    // An RSCN's port is only the one that the fabric named.
    lFinding.mRemotePorts = acrEvidence.remotePortsOf(acrRelogin.mLogins);
    const std::vector<std::string> lPorts = acrEvidence.namesOf(lFinding.mRemotePorts);
    lFinding.mSubject = lPorts.size() > 2 ? std::to_string(lPorts.size()) + " ports" : joinNames(lPorts);
    lFinding.mSeen.push_back("After " + formatCount(countOccurrences(acrRelogin.mChanges), "RSCN page") + " at " +
                             joinNames(acrEvidence.namesOf(lFinding.mInitiators)) + ", " + joinNames(lPorts) +
                             " logged out and in again, and the link stayed up.");
    if (!acrRelogin.mGone.empty()) {
        std::vector<std::string> lGone;
        for (const ZTCWwnBytes& lrPort : acrRelogin.mGone) {
            lGone.push_back(acrEvidence.nameOf(ZTSRemotePort{ZTSFcName{lrPort}, {}, {}}));
        }
        lFinding.mSeen.push_back("Not back yet: " + joinNames(lGone) + ".");
    }
    arFindings.push_back(std::move(lFinding));
}

void lookForZoning(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    for (const ZTSRelogin& lrRelogin : sRelogins(acrEvidence)) {
        if (!sFindWholeNode(acrEvidence, lrRelogin)) {
            sAddRelogin(acrEvidence, acrRule, lrRelogin, arFindings);
            if (lrRelogin.mNodes.contains(std::nullopt)) {
                arFindings.back().mAgainst.emplace_back(
                    "It is not known which node each port belongs to: ports of one controller that fails over look "
                    "like this, too.");
            }
        }
    }
}

void lookForFailover(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    for (const ZTSRelogin& lrRelogin : sRelogins(acrEvidence)) {
        if (const auto lNode = sFindWholeNode(acrEvidence, lrRelogin)) {
            sAddRelogin(acrEvidence, acrRule, lrRelogin, arFindings);
            arFindings.back().mSeen.push_back("These are all known ports of node " + lNode->toText() +
                                              ", and no port of another node is among them.");
        }
    }
}
