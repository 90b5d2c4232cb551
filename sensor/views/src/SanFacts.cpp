#include "sensor/views/include/SanFacts.h"

#include <algorithm>
#include <array>
#include <set>

#include "sensor/views/src/SanLuns.h"

static constexpr std::array<const char*, ZTRD_Count> scRedundancies{"whole", "unknown", "reduced", "lost", "none"};
static constexpr std::array<const char*, ZTSS_Count> scSeverities{"notice", "warning", "critical"};

const char* getRedundancyName(ZTERedundancy aRedundancy) {
    return scRedundancies.at(aRedundancy);
}

const char* getSanSeverityName(ZTESanSeverity aSeverity) {
    return scSeverities.at(aSeverity);
}

std::size_t ZTSSanFacts::countLuns(ZTERedundancy aRedundancy) const {
    return static_cast<std::size_t>(std::ranges::count(mLuns, aRedundancy, &ZTSSanLun::mRedundancy));
}

std::optional<ZTESanSeverity> ZTSSanFacts::getWorst() const {
    const auto lWorst = std::ranges::max_element(mTroubles, {}, &ZTSSanTrouble::mSeverity);
    return lWorst == mTroubles.end() ? std::nullopt : std::optional(lWorst->mSeverity);
}

/// Looks for the troubles one after the other. What a trouble explains is not reported a second time: ports and paths
/// behind a link that is down, and paths behind a remote port that is away.
class ZTCSanJudge {
public:
    ZTCSanJudge(const ZTSTopology& acrNow, const ZTSSanPast& acrPast) : mrNow(acrNow), mrPast(acrPast) {
        mFacts.mLuns = findLuns(acrNow, acrPast);
        mFacts.mBlocked = acrNow.mBlocked.size();
        findWays();
    }

    ZTSSanFacts judge() {
        addLuns(ZTRD_None, ZTST_LunWithoutPath, ZTSS_Critical);
        addLuns(ZTRD_Lost, ZTST_RedundancyLost, ZTSS_Warning);
        addLinksDown();
        addInitiatorsWithoutPath();
        addPortsDown();
        addUselessPorts();
        addFlapping();
        addReducedLuns();
        std::ranges::stable_sort(mFacts.mTroubles, [](const ZTSSanTrouble& acrLeft, const ZTSSanTrouble& acrRight) {
            return acrLeft.mSeverity != acrRight.mSeverity ? acrLeft.mSeverity > acrRight.mSeverity
                                                           : acrLeft.mKind < acrRight.mKind;
        });
        return std::move(mFacts);
    }

private:
    // ---- what is asked of the topologies ----

    static bool isUp(const ZTSTopologyInitiator& acrPort) { return !acrPort.mState || *acrPort.mState == gcOnline; }

    /// Whether the host has a unit that runs through this initiator.
    bool hasRunningPath(const std::string& acrHost) const {
        return std::ranges::any_of(mFacts.mLuns, [&acrHost](const ZTSSanLun& acrLun) {
            return std::ranges::any_of(acrLun.mPaths, [&acrHost](const ZTSSanPath& acrPath) {
                return acrPath.mInitiator.mHost == acrHost && acrPath.mHealth != ZTPH_Down;
            });
        });
    }

    template <class ZTCPredicate>
    bool wasEver(const ZTCPredicate& acrHolds) const {
        return std::ranges::any_of(mrPast.mEarlier, acrHolds);
    }

    bool wasUp(const ZTSTopologyInitiator& acrPort) const {
        return wasEver([&acrPort](const ZTSTopology& acrEarlier) {
            const ZTSTopologyInitiator* const lpThen = acrEarlier.findInitiator(acrPort.mHost);
            return lpThen != nullptr && lpThen->mWwpn == acrPort.mWwpn && lpThen->mState == gcOnline;
        });
    }

    /// The same remote port, from the same initiator, at an earlier moment.
    static const ZTSTopologyRemotePort* findThen(const ZTSTopology& acrEarlier, const ZTSTopologyRemotePort& acrPort) {
        const auto lFound =
            std::ranges::find_if(acrEarlier.mRemotePorts, [&acrPort](const ZTSTopologyRemotePort& acrThen) {
                return acrThen.mHost == acrPort.mHost &&
                       (acrPort.mWwpn ? acrThen.mWwpn == acrPort.mWwpn : acrThen.mName == acrPort.mName);
            });
        return lFound == acrEarlier.mRemotePorts.end() ? nullptr : &*lFound;
    }

    bool wasUp(const ZTSTopologyRemotePort& acrPort) const {
        return wasEver([&acrPort](const ZTSTopology& acrEarlier) {
            const ZTSTopologyRemotePort* const lpThen = findThen(acrEarlier, acrPort);
            return lpThen != nullptr && lpThen->mState == gcOnline;
        });
    }

    /// The units' ways at every moment that is known.
    void findWays() {
        std::map<std::string, std::size_t> lPlaces;
        for (std::size_t i = 0; i < mFacts.mLuns.size(); ++i) {
            lPlaces[mFacts.mLuns[i].mId] = i;
        }
        mWays.resize(mFacts.mLuns.size());
        const auto lAdd = [&](const ZTSTopology& acrTopology) {
            std::map<std::string, std::string> lWwpns;
            for (const ZTSTopologyRemotePort& lrPort : acrTopology.mRemotePorts) {
                lWwpns[lrPort.mName] = lrPort.mWwpn ? lrPort.mWwpn->toText() : "";
            }
            for (const ZTSTopologyPath& lrPath : acrTopology.mPaths) {
                const auto lPlace = lPlaces.find(lrPath.mWwid.value_or(lrPath.mAddress));
                if (lPlace != lPlaces.end()) {
                    mWays[lPlace->second].emplace(lrPath.mHost, lWwpns[lrPath.mRemotePort]);
                }
            }
        };
        lAdd(mrNow);
        std::ranges::for_each(mrPast.mEarlier, lAdd);
    }

    /// Units with fewer paths than they had, that have or had one through this initiator, and this remote port where
    /// one is named.
    std::vector<std::size_t> findSufferers(const std::string& acrHost, const std::string& acrWwpn = {}) const {
        std::vector<std::size_t> lLuns;
        for (std::size_t i = 0; i < mFacts.mLuns.size(); ++i) {
            const auto lIsThrough = [&](const auto& acrWay) {
                return acrWay.first == acrHost && (acrWwpn.empty() || acrWay.second == acrWwpn);
            };
            if (mFacts.mLuns[i].mRedundancy >= ZTRD_Reduced && std::ranges::any_of(mWays[i], lIsThrough)) {
                lLuns.push_back(i);
            }
        }
        return lLuns;
    }

    ZTSSanPast::States statesOf(const std::string& acrName) const {
        const auto lFound = mrPast.mStates.find(acrName);
        return lFound == mrPast.mStates.end() ? ZTSSanPast::States() : lFound->second;
    }

    // ---- troubles ----

    void explain(const std::vector<std::size_t>& acrLuns) { mExplained.insert(acrLuns.begin(), acrLuns.end()); }

    void addLuns(ZTERedundancy aRedundancy, ZTESanTrouble aKind, ZTESanSeverity aSeverity) {
        ZTSSanTrouble lTrouble{.mKind = aKind, .mSeverity = aSeverity};
        for (std::size_t i = 0; i < mFacts.mLuns.size(); ++i) {
            if (mFacts.mLuns[i].mRedundancy == aRedundancy) {
                lTrouble.mLuns.push_back(i);
            }
        }
        if (!lTrouble.mLuns.empty()) {
            mFacts.mTroubles.push_back(std::move(lTrouble));
        }
    }

    /// A port without a cable is normal: it counts only where it was up, or has lost something.
    void addLinksDown() {
        for (const ZTSTopologyInitiator& lrPort : mrNow.mInitiators) {
            if (isUp(lrPort)) {
                continue;
            }
            mDown.insert(lrPort.mHost);
            const auto lIsOfIt = [&lrPort](const ZTSTopologyRemotePort& acrPort) {
                return acrPort.mHost == lrPort.mHost;
            };
            std::vector<std::size_t> lLuns = findSufferers(lrPort.mHost);
            const bool lHasLost = !lLuns.empty() || wasUp(lrPort) || std::ranges::any_of(mrNow.mRemotePorts, lIsOfIt);
            explain(lLuns);
            mFacts.mTroubles.push_back({.mKind = ZTST_LinkDown,
                                        .mSeverity = lHasLost ? ZTSS_Warning : ZTSS_Notice,
                                        .mInitiators = {toInitiator(lrPort)},
                                        .mState = *lrPort.mState,
                                        .mSince = statesOf(lrPort.mHost).mSince,
                                        .mLuns = std::move(lLuns)});
        }
    }

    /// A port that only other initiators see serves as a target: it needs no path of its own.
    bool servesAsTarget(const std::string& acrHost) const {
        bool lIsSeen = false;
        for (const ZTSTopologyRemotePort& lrPort : mrNow.mRemotePorts) {
            if (lrPort.mHost == acrHost) {
                if (mayBeTarget(lrPort)) {
                    return false;
                }
                lIsSeen = true;
            }
        }
        return lIsSeen;
    }

    void addInitiatorsWithoutPath() {
        const auto lHasRunning = [this](const ZTSTopologyInitiator& acrPort) { return hasRunningPath(acrPort.mHost); };
        if (!std::ranges::any_of(mrNow.mInitiators, lHasRunning)) {
            return;  // the units without a path say it, or there are none
        }
        for (const ZTSTopologyInitiator& lrPort : mrNow.mInitiators) {
            if (mDown.contains(lrPort.mHost) || hasRunningPath(lrPort.mHost) || servesAsTarget(lrPort.mHost)) {
                continue;
            }
            mPathless.insert(lrPort.mHost);
            std::vector<std::size_t> lLuns = findSufferers(lrPort.mHost);
            explain(lLuns);
            mFacts.mTroubles.push_back({.mKind = ZTST_InitiatorWithoutPath,
                                        .mSeverity = ZTSS_Warning,
                                        .mInitiators = {toInitiator(lrPort)},
                                        .mState = lrPort.mState.value_or(""),
                                        .mLuns = std::move(lLuns)});
        }
    }

    /// One trouble for a remote port, whatever the number of initiators that miss it.
    ZTSSanTrouble& findOrAdd(ZTESanTrouble aKind, const ZTSTopologyRemotePort& acrPort) {
        const ZTSRemotePort lPort = *toRemotePort(acrPort);
        for (ZTSSanTrouble& lrTrouble : mFacts.mTroubles) {
            if (lrTrouble.mKind == aKind && lrTrouble.mRemotePorts.size() == 1 &&
                lrTrouble.mRemotePorts[0].mWwpn == lPort.mWwpn) {
                return lrTrouble;
            }
        }
        mFacts.mTroubles.push_back(
            {.mKind = aKind, .mSeverity = ZTSS_Notice, .mRemotePorts = {lPort}, .mState = acrPort.mState.value_or("")});
        return mFacts.mTroubles.back();
    }

    ZTSInitiator initiatorOf(const std::string& acrHost) const {
        const ZTSTopologyInitiator* const lpInitiator = mrNow.findInitiator(acrHost);
        return lpInitiator != nullptr ? toInitiator(*lpInitiator)
                                      : ZTSInitiator{.mWwpn = {}, .mWwnn = {}, .mHost = acrHost};
    }

    static void addInitiator(ZTSSanTrouble& arTrouble, const ZTSInitiator& acrInitiator) {
        if (std::ranges::find(arTrouble.mInitiators, acrInitiator) == arTrouble.mInitiators.end()) {
            arTrouble.mInitiators.push_back(acrInitiator);
        }
    }

    std::size_t countOnlineTargets(const std::string& acrHost) const {
        return static_cast<std::size_t>(
            std::ranges::count_if(mrNow.mRemotePorts, [&acrHost](const ZTSTopologyRemotePort& acrPort) {
                return acrPort.mHost == acrHost && isTarget(acrPort) && acrPort.mState == gcOnline;
            }));
    }

    void addPortsDown() {
        for (const ZTSTopologyRemotePort& lrPort : mrNow.mRemotePorts) {
            if (!lrPort.mWwpn || !lrPort.mState || *lrPort.mState == gcOnline || !mayBeTarget(lrPort) ||
                mDown.contains(lrPort.mHost)) {
                continue;
            }
            const std::vector<std::size_t> lLuns = findSufferers(lrPort.mHost, lrPort.mWwpn->toText());
            explain(lLuns);
            ZTSSanTrouble& lrTrouble = findOrAdd(ZTST_PathLost, lrPort);
            // The kernel remembers a port until the next start. One that was away all the time is no warning.
            if (mrPast.mEarlier.empty() || !lLuns.empty() || wasUp(lrPort)) {
                lrTrouble.mSeverity = ZTSS_Warning;
            }
            const auto lSince = statesOf(lrPort.mName).mSince;
            if (lSince && (!lrTrouble.mSince || *lSince < *lrTrouble.mSince)) {
                lrTrouble.mSince = lSince;
            }
            lrTrouble.mState = lrTrouble.mState == *lrPort.mState ? lrTrouble.mState : "";
            lrTrouble.mOtherPorts = lrTrouble.mInitiators.empty() ? countOnlineTargets(lrPort.mHost) : 0;
            addInitiator(lrTrouble, initiatorOf(lrPort.mHost));
            addLunsOnce(lrTrouble, lLuns);
        }
    }

    static void addLunsOnce(ZTSSanTrouble& arTrouble, const std::vector<std::size_t>& acrLuns) {
        arTrouble.mLuns.insert(arTrouble.mLuns.end(), acrLuns.begin(), acrLuns.end());
        std::ranges::sort(arTrouble.mLuns);
        arTrouble.mLuns.erase(std::unique(arTrouble.mLuns.begin(), arTrouble.mLuns.end()), arTrouble.mLuns.end());
    }

    void addUselessPorts() {
        std::set<std::string> lUsed;
        for (const ZTSTopologyPath& lrPath : mrNow.mPaths) {
            lUsed.insert(lrPath.mRemotePort);
        }
        for (const ZTSTopologyRemotePort& lrPort : mrNow.mRemotePorts) {
            if (!lrPort.mWwpn || lrPort.mState != gcOnline || !isTarget(lrPort) || lUsed.contains(lrPort.mName) ||
                mDown.contains(lrPort.mHost) || mPathless.contains(lrPort.mHost)) {
                continue;
            }
            const std::vector<std::size_t> lLuns = findSufferers(lrPort.mHost, lrPort.mWwpn->toText());
            explain(lLuns);
            ZTSSanTrouble& lrTrouble = findOrAdd(ZTST_UselessPort, lrPort);
            lrTrouble.mSeverity = lLuns.empty() ? lrTrouble.mSeverity : ZTSS_Warning;
            addInitiator(lrTrouble, initiatorOf(lrPort.mHost));
            addLunsOnce(lrTrouble, lLuns);
        }
    }

    void addFlapping() {
        for (const ZTSTopologyInitiator& lrPort : mrNow.mInitiators) {
            const std::size_t lChanges = statesOf(lrPort.mHost).mChanges;
            if (lChanges >= gcFlappingChanges) {
                mFlapping.insert(lrPort.mHost);
                mFacts.mTroubles.push_back({.mKind = ZTST_Flapping,
                                            .mSeverity = ZTSS_Warning,
                                            .mInitiators = {toInitiator(lrPort)},
                                            .mState = lrPort.mState.value_or(""),
                                            .mSince = statesOf(lrPort.mHost).mSince,
                                            .mChanges = lChanges});
            }
        }
        for (const ZTSTopologyRemotePort& lrPort : mrNow.mRemotePorts) {
            const std::size_t lChanges = statesOf(lrPort.mName).mChanges;
            if (lChanges < gcFlappingChanges || !lrPort.mWwpn || mFlapping.contains(lrPort.mHost)) {
                continue;
            }
            ZTSSanTrouble& lrTrouble = findOrAdd(ZTST_Flapping, lrPort);
            lrTrouble.mSeverity = ZTSS_Warning;
            lrTrouble.mChanges = std::max(lrTrouble.mChanges, lChanges);
            lrTrouble.mSince = statesOf(lrPort.mName).mSince;
            addInitiator(lrTrouble, initiatorOf(lrPort.mHost));
        }
    }

    /// Units with fewer paths that nothing above explains, such as a device that somebody has set offline.
    void addReducedLuns() {
        ZTSSanTrouble lTrouble{.mKind = ZTST_RedundancyReduced, .mSeverity = ZTSS_Warning};
        for (std::size_t i = 0; i < mFacts.mLuns.size(); ++i) {
            if (mFacts.mLuns[i].mRedundancy == ZTRD_Reduced && !mExplained.contains(i)) {
                lTrouble.mLuns.push_back(i);
            }
        }
        if (!lTrouble.mLuns.empty()) {
            mFacts.mTroubles.push_back(std::move(lTrouble));
        }
    }

    const ZTSTopology& mrNow;
    const ZTSSanPast& mrPast;
    ZTSSanFacts mFacts;
    std::vector<std::set<std::pair<std::string, std::string>>> mWays;  ///< of each unit: host, remote port's WWPN
    std::set<std::string> mDown;                                       ///< hosts whose link is down
    std::set<std::string> mPathless;                                   ///< hosts that are up and have no path
    std::set<std::string> mFlapping;                                   ///< hosts whose link goes and comes
    std::set<std::size_t> mExplained;  ///< units whose missing paths a trouble has explained
};

ZTSSanFacts findSanFacts(const ZTSTopology& acrNow, const ZTSSanPast& acrPast) {
    return ZTCSanJudge(acrNow, acrPast).judge();
}
