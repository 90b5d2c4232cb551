#include "sensor/diagnosis/src/EvidenceIndex.h"

#include <algorithm>

/// Names in a sentence before the rest is only counted.
static constexpr std::size_t scMostNames = 4;

bool areTogether(const ZTSEpisode& acrOne, const ZTSEpisode& acrOther, std::chrono::seconds aApart) {
    return acrOne.mFirst <= acrOther.mLast + aApart && acrOther.mFirst <= acrOne.mLast + aApart;
}

bool isFollowedBy(const ZTSEpisode& acrEarlier, const ZTSEpisode& acrLater) {
    return acrLater.mLast >= acrEarlier.mFirst && acrLater.mFirst <= acrEarlier.mLast + gcTogether;
}

static bool sIsEarlier(const ZTSEpisode* apOne, const ZTSEpisode* apOther) {
    return apOne->mFirst != apOther->mFirst ? apOne->mFirst < apOther->mFirst : apOne->mEpisode < apOther->mEpisode;
}

std::vector<ZTCEpisodes> splitIntoRuns(ZTCEpisodes aEpisodes, std::chrono::seconds aApart) {
    std::ranges::sort(aEpisodes, sIsEarlier);
    std::vector<ZTCEpisodes> lRuns;
    ZTCHistoryTime lEnd;
    for (const ZTSEpisode* lpEpisode : aEpisodes) {
        if (lRuns.empty() || lpEpisode->mFirst > lEnd + aApart) {
            lRuns.emplace_back();
            lEnd = lpEpisode->mLast;
        }
        lRuns.back().push_back(lpEpisode);
        lEnd = std::max(lEnd, lpEpisode->mLast);
    }
    return lRuns;
}

std::string joinNames(const std::vector<std::string>& acrNames) {
    std::string lText;
    for (std::size_t i = 0; i < acrNames.size(); ++i) {
        if (i == scMostNames && acrNames.size() > scMostNames + 1) {
            return lText + " and " + std::to_string(acrNames.size() - scMostNames) + " more";
        }
        const bool lIsLast = i + 1 == acrNames.size();
        lText += (i == 0 ? "" : lIsLast ? " and " : ", ") + acrNames[i];
    }
    return lText;
}

/// Each of the words between the blanks.
static std::vector<std::string_view> sWords(std::string_view aText) {
    std::vector<std::string_view> lWords;
    while (!aText.empty()) {
        const std::size_t lEnd = std::min(aText.find(' '), aText.size());
        lWords.push_back(aText.substr(0, lEnd));
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
    }
    return lWords;
}

static bool sIsSame(const ZTSInitiator& acrOne, const ZTSInitiator& acrOther) {
    return acrOne.mWwpn && acrOther.mWwpn ? acrOne.mWwpn == acrOther.mWwpn
                                          : !acrOne.mHost.empty() && acrOne.mHost == acrOther.mHost;
}

ZTCEvidenceIndex::ZTCEvidenceIndex(const ZTSEvidence& acrEvidence) : mrEvidence(acrEvidence) {
    for (const ZTSEpisode& lrEpisode : mrEvidence.mEpisodes) {
        addInitiator(lrEpisode.mInitiator);
        if (lrEpisode.mIsMalformed) {
            continue;
        }
        mByKind[lrEpisode.mKind].push_back(&lrEpisode);
        const auto& lrNode = lrEpisode.mRemotePort && lrEpisode.mRemotePort->mWwnn ? lrEpisode.mRemotePort->mWwnn
                                                                                   : lrEpisode.mDetail.mNodeName;
        if (lrEpisode.mRemotePort && lrNode) {
            mNodes[lrEpisode.mRemotePort->mWwpn.mBytes] = *lrNode;
        }
    }
    for (auto& [lKind, lrEpisodes] : mByKind) {
        std::ranges::sort(lrEpisodes, sIsEarlier);
    }
    for (const ZTSUnobserved& lrUnobserved : mrEvidence.mUnobserved) {
        addInitiator(lrUnobserved.mInitiator);
    }
    if (mrEvidence.mTopology) {
        for (const ZTSTopologyInitiator& lrInitiator : mrEvidence.mTopology->mInitiators) {
            addInitiator({.mWwpn = lrInitiator.mWwpn, .mWwnn = lrInitiator.mWwnn, .mHost = lrInitiator.mHost});
        }
        for (const ZTSTopologyRemotePort& lrPort : mrEvidence.mTopology->mRemotePorts) {
            if (lrPort.mWwpn && lrPort.mWwnn) {
                mNodes[lrPort.mWwpn->mBytes] = *lrPort.mWwnn;
            }
        }
    }
}

/// Events that came before the topology knew the port may lack its host, and the other way round.
void ZTCEvidenceIndex::addInitiator(const ZTSInitiator& acrInitiator) {
    if (!acrInitiator.mWwpn && acrInitiator.mHost.empty()) {
        return;
    }
    const auto lFound = std::ranges::find_if(
        mInitiators, [&](const ZTSInitiator& acrKnown) { return sIsSame(acrKnown, acrInitiator); });
    if (lFound == mInitiators.end()) {
        mInitiators.push_back(acrInitiator);
    } else if (lFound->mHost.empty()) {
        lFound->mHost = acrInitiator.mHost;
    }
}

const ZTCEpisodes& ZTCEvidenceIndex::of(std::string_view aKind) const {
    static const ZTCEpisodes scNone;
    const auto lKey = findKind(aKind);
    const auto lFound = lKey ? mByKind.find(*lKey) : mByKind.end();
    return lFound == mByKind.end() ? scNone : lFound->second;
}

std::map<ZTCWwnBytes, ZTCEpisodes> ZTCEvidenceIndex::byRemotePort(std::string_view aKinds) const {
    std::map<ZTCWwnBytes, ZTCEpisodes> lByPort;
    for (const std::string_view lKind : sWords(aKinds)) {
        for (const ZTSEpisode* lpEpisode : of(lKind)) {
            if (lpEpisode->mRemotePort) {
                lByPort[lpEpisode->mRemotePort->mWwpn.mBytes].push_back(lpEpisode);
            }
        }
    }
    return lByPort;
}

std::string ZTCEvidenceIndex::nameOf(const ZTSRemotePort& acrPort) const {
    if (!mrEvidence.mNameRemotePort) {
        return acrPort.mWwpn.toText();
    }
    ZTSRemotePort lPort = acrPort;
    lPort.mWwnn = findNode(acrPort);
    return mrEvidence.mNameRemotePort(lPort);
}

std::string ZTCEvidenceIndex::nameOf(const ZTSInitiator& acrInitiator) const {
    ZTSInitiator lInitiator = acrInitiator;
    lInitiator.mHost = findHost(acrInitiator);
    return mrEvidence.mNameInitiator   ? mrEvidence.mNameInitiator(lInitiator)
           : !lInitiator.mHost.empty() ? lInitiator.mHost
           : lInitiator.mWwpn          ? lInitiator.mWwpn->toText()
                                       : "unknown adapter";
}

std::vector<ZTSInitiator> ZTCEvidenceIndex::initiatorsOf(const ZTCEpisodes& acrEpisodes) const {
    std::map<std::string, ZTSInitiator> lByName;
    for (const ZTSEpisode* lpEpisode : acrEpisodes) {
        lByName.emplace(nameOf(lpEpisode->mInitiator), lpEpisode->mInitiator);
    }
    std::vector<ZTSInitiator> lInitiators;
    for (const auto& [lName, lrInitiator] : lByName) {
        lInitiators.push_back(lrInitiator);
    }
    return lInitiators;
}

std::vector<ZTSRemotePort> ZTCEvidenceIndex::remotePortsOf(const ZTCEpisodes& acrEpisodes) const {
    std::map<ZTCWwnBytes, ZTSRemotePort> lByName;
    for (const ZTSEpisode* lpEpisode : acrEpisodes) {
        if (lpEpisode->mRemotePort) {
            lByName.emplace(lpEpisode->mRemotePort->mWwpn.mBytes, *lpEpisode->mRemotePort);
        }
    }
    std::vector<ZTSRemotePort> lPorts;
    for (const auto& [lName, lrPort] : lByName) {
        lPorts.push_back(lrPort);
    }
    return lPorts;
}

std::vector<std::string> ZTCEvidenceIndex::namesOf(const std::vector<ZTSInitiator>& acrInitiators) const {
    std::vector<std::string> lNames;
    for (const ZTSInitiator& lrInitiator : acrInitiators) {
        lNames.push_back(nameOf(lrInitiator));
    }
    return lNames;
}

std::vector<std::string> ZTCEvidenceIndex::namesOf(const std::vector<ZTSRemotePort>& acrPorts) const {
    std::vector<std::string> lNames;
    for (const ZTSRemotePort& lrPort : acrPorts) {
        lNames.push_back(nameOf(lrPort));
    }
    return lNames;
}

std::optional<ZTSFcName> ZTCEvidenceIndex::findNode(const ZTSRemotePort& acrPort) const {
    if (acrPort.mWwnn) {
        return acrPort.mWwnn;
    }
    const auto lFound = mNodes.find(acrPort.mWwpn.mBytes);
    return lFound == mNodes.end() ? std::nullopt : std::optional(lFound->second);
}

std::set<ZTCWwnBytes> ZTCEvidenceIndex::portsOfNode(const ZTSFcName& acrNode) const {
    std::set<ZTCWwnBytes> lPorts;
    for (const auto& [lPort, lNode] : mNodes) {
        if (lNode == acrNode) {
            lPorts.insert(lPort);
        }
    }
    return lPorts;
}

const ZTSTopologyInitiator* ZTCEvidenceIndex::findInTopology(const ZTSInitiator& acrInitiator) const {
    if (!mrEvidence.mTopology) {
        return nullptr;
    }
    const auto lFound =
        std::ranges::find_if(mrEvidence.mTopology->mInitiators, [&](const ZTSTopologyInitiator& acrKnown) {
            return sIsSame({.mWwpn = acrKnown.mWwpn, .mWwnn = {}, .mHost = acrKnown.mHost}, acrInitiator);
        });
    return lFound == mrEvidence.mTopology->mInitiators.end() ? nullptr : &*lFound;
}

std::string ZTCEvidenceIndex::findHost(const ZTSInitiator& acrInitiator) const {
    if (!acrInitiator.mHost.empty()) {
        return acrInitiator.mHost;
    }
    const ZTSTopologyInitiator* const lpInitiator = findInTopology(acrInitiator);
    return lpInitiator != nullptr ? lpInitiator->mHost : std::string();
}

std::optional<ZTSFcName> ZTCEvidenceIndex::findFabric(const ZTSInitiator& acrInitiator) const {
    const ZTSTopologyInitiator* const lpInitiator = findInTopology(acrInitiator);
    return lpInitiator != nullptr ? lpInitiator->mFabric : std::nullopt;
}

std::optional<std::string> ZTCEvidenceIndex::findState(const ZTSInitiator& acrInitiator) const {
    const ZTSTopologyInitiator* const lpInitiator = findInTopology(acrInitiator);
    return lpInitiator != nullptr ? lpInitiator->mState : std::nullopt;
}

std::vector<ZTSInitiator> ZTCEvidenceIndex::findOtherUsers(const ZTSRemotePort& acrPort,
                                                           const std::vector<ZTSInitiator>& acrExcept) const {
    std::vector<ZTSInitiator> lUsers;
    if (!mrEvidence.mTopology) {
        return lUsers;
    }
    for (const ZTSTopologyRemotePort& lrPort : mrEvidence.mTopology->mRemotePorts) {
        if (lrPort.mWwpn != acrPort.mWwpn || lrPort.mState.value_or("") != "Online") {
            continue;
        }
        for (const ZTSInitiator& lrInitiator : mInitiators) {
            const bool lIsExcepted = std::ranges::any_of(
                acrExcept, [&](const ZTSInitiator& acrOther) { return sIsSame(acrOther, lrInitiator); });
            if (findHost(lrInitiator) == lrPort.mHost && !lIsExcepted) {
                lUsers.push_back(lrInitiator);
            }
        }
    }
    return lUsers;
}

bool ZTCEvidenceIndex::isObserved(const ZTSInitiator& acrInitiator, ZTCKindKey aKind) const {
    return std::ranges::none_of(mrEvidence.mUnobserved, [&](const ZTSUnobserved& acrUnobserved) {
        return acrUnobserved.mKind == aKind && sIsSame(acrUnobserved.mInitiator, acrInitiator);
    });
}

std::vector<const ZTSTopologyPath*> ZTCEvidenceIndex::pathsTo(const ZTSRemotePort& acrPort) const {
    std::vector<const ZTSTopologyPath*> lPaths;
    if (mrEvidence.mTopology) {
        for (const ZTSTopologyPath& lrPath : mrEvidence.mTopology->mPaths) {
            const ZTSTopologyRemotePort* const lpPort = mrEvidence.mTopology->findRemotePort(lrPath.mRemotePort);
            if (lpPort != nullptr && lpPort->mWwpn == acrPort.mWwpn) {
                lPaths.push_back(&lrPath);
            }
        }
    }
    return lPaths;
}
