#include "sensor/views/src/SanLuns.h"

#include <algorithm>
#include <set>

static constexpr std::string_view scMarginal = "Marginal";
static constexpr std::string_view scRunning = "running";

bool isRemotePortUp(const ZTSTopologyRemotePort& acrPort) {
    return !acrPort.mState || *acrPort.mState == gcOnline || *acrPort.mState == scMarginal;
}

bool isTarget(const ZTSTopologyRemotePort& acrPort) {
    return acrPort.mRoles && acrPort.mRoles->find("Target") != std::string::npos;
}

bool mayBeTarget(const ZTSTopologyRemotePort& acrPort) {
    return isTarget(acrPort) || !acrPort.mRoles || acrPort.mRoles->find("Initiator") == std::string::npos;
}

ZTSInitiator toInitiator(const ZTSTopologyInitiator& acrPort) {
    return {.mWwpn = acrPort.mWwpn, .mWwnn = acrPort.mWwnn, .mHost = acrPort.mHost};
}

std::optional<ZTSRemotePort> toRemotePort(const ZTSTopologyRemotePort& acrPort) {
    if (!acrPort.mWwpn) {
        return std::nullopt;
    }
    return ZTSRemotePort{.mWwpn = *acrPort.mWwpn, .mWwnn = acrPort.mWwnn, .mFcId = acrPort.mFcId};
}

static ZTEPathHealth sHealth(const ZTSSanPath& acrPath, const ZTSTopologyRemotePort* apPort) {
    const bool lIsPortDown = apPort != nullptr && !isRemotePortUp(*apPort);
    const bool lIsLinkDown = acrPath.mInitiatorState && *acrPath.mInitiatorState != gcOnline;
    if (lIsPortDown || lIsLinkDown || (acrPath.mState && *acrPath.mState != scRunning)) {
        return ZTPH_Down;
    }
    return acrPath.mState ? ZTPH_Running : ZTPH_Unknown;
}

static ZTSSanPath sMakePath(const ZTSTopology& acrTopology, const ZTSTopologyPath& acrPath) {
    const ZTSTopologyInitiator* const lpInitiator = acrTopology.findInitiator(acrPath.mHost);
    const ZTSTopologyRemotePort* const lpPort = acrTopology.findRemotePort(acrPath.mRemotePort);
    ZTSSanPath lPath{.mAddress = acrPath.mAddress,
                     .mInitiator = lpInitiator != nullptr
                                       ? toInitiator(*lpInitiator)
                                       : ZTSInitiator{.mWwpn = {}, .mWwnn = {}, .mHost = acrPath.mHost},
                     .mRemotePortName = acrPath.mRemotePort,
                     .mRemotePort = lpPort != nullptr ? toRemotePort(*lpPort) : std::nullopt,
                     .mLun = acrPath.mLun,
                     .mDisk = acrPath.mDisk,
                     .mQueueDepth = acrPath.mQueueDepth,
                     .mState = acrPath.mState,
                     .mRemotePortState = lpPort != nullptr ? lpPort->mState : std::nullopt,
                     .mInitiatorState = lpInitiator != nullptr ? lpInitiator->mState : std::nullopt};
    lPath.mHealth = sHealth(lPath, lpPort);
    return lPath;
}

static std::map<std::string, ZTSSanLun> sCollect(const ZTSTopology& acrTopology) {
    std::map<std::string, ZTSSanLun> lLuns;
    for (const ZTSTopologyPath& lrPath : acrTopology.mPaths) {
        const std::string lId = lrPath.mWwid.value_or(lrPath.mAddress);
        ZTSSanLun& lrLun = lLuns[lId];
        lrLun.mId = lId;
        lrLun.mWwid = lrPath.mWwid;
        lrLun.mVendor = lrLun.mVendor ? lrLun.mVendor : lrPath.mVendor;
        lrLun.mModel = lrLun.mModel ? lrLun.mModel : lrPath.mModel;
        if (const ZTSTopologyMapping* const lpMultipath = acrTopology.findMultipath(lrPath)) {
            lrLun.mMultipath = lpMultipath->mName;
            lrLun.mMultipathDevice = lpMultipath->mDevice;
        }
        for (const std::string& lrMount : acrTopology.findMounts(lrPath)) {
            if (std::ranges::find(lrLun.mMounts, lrMount) == lrLun.mMounts.end()) {
                lrLun.mMounts.push_back(lrMount);
            }
        }
        lrLun.mPaths.push_back(sMakePath(acrTopology, lrPath));
    }
    return lLuns;
}

// ---- redundancy ----

static ZTSLunWays sCountWays(const ZTSSanLun& acrLun, ZTEPathHealth aWorst) {
    ZTSLunWays lWays;
    std::set<std::string> lInitiators;
    std::set<std::string> lPorts;
    for (const ZTSSanPath& lrPath : acrLun.mPaths) {
        if (lrPath.mHealth <= aWorst) {
            ++lWays.mPaths;
            lInitiators.insert(lrPath.mInitiator.mHost);
            lPorts.insert(lrPath.mRemotePort ? lrPath.mRemotePort->mWwpn.toText() : lrPath.mRemotePortName);
        }
    }
    lWays.mInitiators = lInitiators.size();
    lWays.mRemotePorts = lPorts.size();
    return lWays;
}

static ZTERedundancy sCompare(const ZTSLunWays& acrLeft, const ZTSLunWays& acrExpected) {
    const auto lIsLast = [](std::size_t aLeft, std::size_t aExpected) { return aLeft == 1 && aExpected > 1; };
    if (acrLeft.mPaths == 0) {
        return ZTRD_None;
    }
    if (lIsLast(acrLeft.mPaths, acrExpected.mPaths) || lIsLast(acrLeft.mInitiators, acrExpected.mInitiators) ||
        lIsLast(acrLeft.mRemotePorts, acrExpected.mRemotePorts)) {
        return ZTRD_Lost;
    }
    return acrLeft.mPaths < acrExpected.mPaths ? ZTRD_Reduced : ZTRD_Whole;
}

static void sJudge(ZTSSanLun& arLun, const ZTSLunWays& acrExpected) {
    arLun.mRunning = sCountWays(arLun, ZTPH_Running).mPaths;
    arLun.mExpected = acrExpected.mPaths;
    // Paths of an unknown state count as running where that keeps the judgement mild: silence proves no loss.
    const ZTERedundancy lBest = sCompare(sCountWays(arLun, ZTPH_Unknown), acrExpected);
    const ZTERedundancy lWorst = sCompare(sCountWays(arLun, ZTPH_Running), acrExpected);
    arLun.mRedundancy = lBest == ZTRD_Whole && lWorst != ZTRD_Whole ? ZTRD_Unknown : lBest;
}

// ---- units that went away ----

/// Whether the way of a path that is gone is closed now: its initiator or its remote port is away. Where both are up,
/// the unit was unmapped or deleted on purpose.
static bool sIsWayClosed(const ZTSTopology& acrNow, const ZTSSanPath& acrPath) {
    for (const ZTSTopologyRemotePort& lrPort : acrNow.mRemotePorts) {
        if (lrPort.mHost == acrPath.mInitiator.mHost && acrPath.mRemotePort &&
            lrPort.mWwpn == acrPath.mRemotePort->mWwpn) {
            const ZTSTopologyInitiator* const lpInitiator = acrNow.findInitiator(lrPort.mHost);
            const bool lIsLinkUp = lpInitiator == nullptr || !lpInitiator->mState || *lpInitiator->mState == gcOnline;
            return !lIsLinkUp || !isRemotePortUp(lrPort);
        }
    }
    // The port is not shown any more. Where the adapter is gone too, somebody has taken it out.
    return acrNow.findInitiator(acrPath.mInitiator.mHost) != nullptr;
}

static void sAddGone(const ZTSTopology& acrNow, const std::map<std::string, ZTSSanLun>& acrBefore,
                     std::map<std::string, ZTSSanLun>& arNow) {
    for (const auto& [lId, lBefore] : acrBefore) {
        const auto lIsClosed = [&acrNow](const ZTSSanPath& acrPath) { return sIsWayClosed(acrNow, acrPath); };
        if (!lBefore.mWwid || arNow.contains(lId) || !std::ranges::all_of(lBefore.mPaths, lIsClosed)) {
            continue;
        }
        ZTSSanLun lGone = lBefore;
        lGone.mIsGone = true;
        for (ZTSSanPath& lrPath : lGone.mPaths) {
            lrPath.mHealth = ZTPH_Down;
            lrPath.mState.reset();
            lrPath.mRemotePortState.reset();
            lrPath.mInitiatorState.reset();
        }
        arNow.emplace(lId, std::move(lGone));
    }
}

std::vector<ZTSSanLun> findLuns(const ZTSTopology& acrNow, const ZTSSanPast& acrPast) {
    std::map<std::string, ZTSSanLun> lLuns = sCollect(acrNow);
    std::map<std::string, ZTSLunWays> lExpected = acrPast.mMostWays;
    const auto lExpect = [&lExpected](const std::map<std::string, ZTSSanLun>& acrLuns) {
        for (const auto& [lId, lLun] : acrLuns) {
            lExpected[lId].raise(sCountWays(lLun, ZTPH_Down));
        }
    };
    lExpect(lLuns);
    for (const ZTSTopology& lrEarlier : acrPast.mEarlier) {
        const std::map<std::string, ZTSSanLun> lBefore = sCollect(lrEarlier);
        lExpect(lBefore);
        sAddGone(acrNow, lBefore, lLuns);
    }
    std::vector<ZTSSanLun> lSorted;
    for (auto& [lId, lLun] : lLuns) {
        sJudge(lLun, lExpected[lId]);
        lSorted.push_back(std::move(lLun));
    }
    return lSorted;
}
