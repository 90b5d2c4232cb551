#include "sensor/views/include/EpisodePlace.h"

#include <algorithm>
#include <map>
#include <set>

#include "sensor/client/include/NumberText.h"

static const ZTSTopologyInitiator* sFindInitiator(const ZTSTopology& acrTopology, const ZTSInitiator& acrInitiator) {
    const auto lFound = std::ranges::find(acrTopology.mInitiators, acrInitiator.mWwpn, &ZTSTopologyInitiator::mWwpn);
    return !acrInitiator.mWwpn || lFound == acrTopology.mInitiators.end() ? nullptr : &*lFound;
}

static void sName(ZTSPlace& arPlace, const ZTSTopology& acrTopology, const ZTSTopologyInitiator& acrInitiator) {
    arPlace.mInitiator.mHost = acrInitiator.mHost;
    arPlace.mInitiator.mWwnn = acrInitiator.mWwnn ? acrInitiator.mWwnn : arPlace.mInitiator.mWwnn;
    if (!arPlace.mRemotePort) {
        return;
    }
    for (const ZTSTopologyRemotePort& lrPort : acrTopology.mRemotePorts) {
        if (lrPort.mHost == acrInitiator.mHost && lrPort.mWwpn == arPlace.mRemotePort->mWwpn) {
            arPlace.mRport = lrPort.mName;
            arPlace.mRemotePort->mWwnn = lrPort.mWwnn ? lrPort.mWwnn : arPlace.mRemotePort->mWwnn;
            arPlace.mRemotePort->mFcId = lrPort.mFcId ? lrPort.mFcId : arPlace.mRemotePort->mFcId;
        }
    }
}

ZTSPlace findPlace(const ZTSInitiator& acrInitiator, const std::optional<ZTSRemotePort>& acrPort, ZTCHistoryTime aTime,
                   const ZTCNameBook& acrNames) {
    ZTSPlace lPlace{.mInitiator = acrInitiator,
                    .mRemotePort = acrPort,
                    .mRport = std::nullopt,
                    .mDevices = {},
                    .mAffected = std::nullopt};
    if (const ZTSTopology* const lpTopology = acrNames.findTopology(aTime)) {
        if (const ZTSTopologyInitiator* const lpInitiator = sFindInitiator(*lpTopology, acrInitiator)) {
            sName(lPlace, *lpTopology, *lpInitiator);
        }
    }
    return lPlace;
}

static bool sIsAmong(const ZTSLunSet& acrLuns, std::uint64_t aLun) {
    return acrLuns.mIsAll || std::ranges::binary_search(acrLuns.mNumbers, aLun);
}

static std::vector<ZTSPlaceDevice> sFindDevices(const ZTSTopology& acrTopology, const std::string& acrRport,
                                                const ZTSLunSet& acrLuns) {
    std::vector<ZTSPlaceDevice> lDevices;
    for (const ZTSTopologyPath& lrPath : acrTopology.mPaths) {
        if (lrPath.mRemotePort != acrRport || !sIsAmong(acrLuns, lrPath.mLun) ||
            lDevices.size() >= gcMostPlaceDevices) {
            continue;
        }
        const ZTSTopologyMapping* const lpMultipath = acrTopology.findMultipath(lrPath);
        lDevices.push_back({.mLun = lrPath.mLun,
                            .mAddress = lrPath.mAddress,
                            .mVendor = lrPath.mVendor,
                            .mModel = lrPath.mModel,
                            .mWwid = lrPath.mWwid,
                            .mDisk = lrPath.mDisk,
                            .mMultipath = lpMultipath != nullptr ? lpMultipath->mName : std::nullopt,
                            .mMounts = acrTopology.findMounts(lrPath)});
    }
    std::ranges::sort(lDevices, {}, &ZTSPlaceDevice::mLun);
    return lDevices;
}

/// The remote ports whose addresses lie in the area (format 1) or domain (format 2) of an RSCN's page.
static std::optional<std::vector<ZTSRemotePort>> sFindAffected(const ZTSTopology& acrTopology,
                                                               const std::string& acrHost, std::uint32_t aPage) {
    const std::uint32_t lFormat = aPage >> 24 & 3;
    if (lFormat != 1 && lFormat != 2) {
        return std::nullopt;
    }
    const std::uint32_t lMask = lFormat == 1 ? 0xFFFF00U : 0xFF0000U;
    std::vector<ZTSRemotePort> lAffected;
    for (const ZTSTopologyRemotePort& lrPort : acrTopology.mRemotePorts) {
        if (lrPort.mHost == acrHost && lrPort.mWwpn && lrPort.mFcId && (*lrPort.mFcId & lMask) == (aPage & lMask)) {
            lAffected.push_back({.mWwpn = *lrPort.mWwpn, .mWwnn = lrPort.mWwnn, .mFcId = lrPort.mFcId});
        }
    }
    return lAffected;
}

ZTSPlace findPlace(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames) {
    ZTSPlace lPlace = findPlace(acrEpisode.mInitiator, acrEpisode.mRemotePort, acrEpisode.mFirst, acrNames);
    const ZTSTopology* const lpTopology = acrNames.findTopology(acrEpisode.mFirst);
    if (lpTopology == nullptr) {
        return lPlace;
    }
    if (lPlace.mRport && acrEpisode.mDetail.mLuns) {
        lPlace.mDevices = sFindDevices(*lpTopology, *lPlace.mRport, *acrEpisode.mDetail.mLuns);
    }
    if (acrEpisode.mDetail.mPage && sFindInitiator(*lpTopology, acrEpisode.mInitiator) != nullptr) {
        lPlace.mAffected = sFindAffected(*lpTopology, lPlace.mInitiator.mHost, *acrEpisode.mDetail.mPage);
    }
    return lPlace;
}

ZTSPortView findPortView(const ZTSPortSummary& acrPort, const ZTCNameBook& acrNames) {
    ZTSPortView lView{.mState = {}, .mInitiators = acrPort.mInitiators, .mRports = {}};
    const ZTSTopology* const lpTopology = acrNames.findTopology(getHistoryTime());
    if (lpTopology == nullptr) {
        return lView;
    }
    std::set<std::string> lStates;
    for (const ZTSTopologyRemotePort& lrPort : lpTopology->mRemotePorts) {
        if (lrPort.mWwpn != acrPort.mPort.mWwpn) {
            continue;
        }
        lView.mRports.push_back(lrPort);
        if (lrPort.mState) {
            lStates.insert(*lrPort.mState);
        }
        const ZTSTopologyInitiator* const lpInitiator = lpTopology->findInitiator(lrPort.mHost);
        if (lpInitiator == nullptr || !lpInitiator->mWwpn) {
            continue;
        }
        const auto lKnown = std::ranges::find(lView.mInitiators, lpInitiator->mWwpn, &ZTSInitiator::mWwpn);
        if (lKnown == lView.mInitiators.end()) {
            lView.mInitiators.push_back(
                {.mWwpn = lpInitiator->mWwpn, .mWwnn = lpInitiator->mWwnn, .mHost = lpInitiator->mHost});
        } else {
            lKnown->mHost = lpInitiator->mHost;
        }
    }
    for (const std::string& lrState : lStates) {
        lView.mState += (lView.mState.empty() ? "" : ", ") + lrState;
    }
    return lView;
}

std::string formatDevices(const std::vector<ZTSPlaceDevice>& acrDevices) {
    static constexpr std::size_t scMostShown = 3;
    std::string lText;
    std::size_t lShown = 0;
    for (const ZTSPlaceDevice& lrDevice : acrDevices) {
        const std::string lName = lrDevice.mMultipath.value_or(lrDevice.mDisk.value_or(""));
        if (lName.empty()) {
            continue;
        }
        if (++lShown > scMostShown) {
            lText += " ...";
            break;
        }
        lText += (lText.empty() ? "" : ", ") + lName;
        if (!lrDevice.mMounts.empty()) {
            lText += " (" + lrDevice.mMounts.front() + (lrDevice.mMounts.size() > 1 ? " ...)" : ")");
        }
    }
    return lText;
}

/// Adds a sample to the sum of its counter: those of the initiator come first, then those of the remote port.
using ZTCCounterSums = std::map<std::pair<bool, std::string>, ZTSCounterSample>;

static void sAddSample(const ZTSCounterSample& acrSample, ZTCCounterSums& arSums) {
    const auto [lPlace, lIsNew] =
        arSums.try_emplace({acrSample.mRemotePort.has_value(), acrSample.mCounter}, acrSample);
    if (!lIsNew) {
        lPlace->second.mDifference += acrSample.mDifference;
    }
}

static std::vector<ZTSCounterSample> sListSums(ZTCCounterSums& arSums) {
    std::vector<ZTSCounterSample> lCounters;
    for (auto& [lKey, lSample] : arSums) {
        lCounters.push_back(std::move(lSample));
    }
    return lCounters;
}

std::vector<ZTSCounterSample> countersBeside(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames) {
    ZTCCounterSums lSums;
    for (const ZTSCounterSample& lrSample : acrNames.findCounters(acrEpisode.mFirst, acrEpisode.mLast)) {
        const bool lIsSamePort =
            !lrSample.mRemotePort || (acrEpisode.mRemotePort && *lrSample.mRemotePort == acrEpisode.mRemotePort->mWwpn);
        if (acrEpisode.mInitiator.mWwpn == lrSample.mInitiator && lIsSamePort) {
            sAddSample(lrSample, lSums);
        }
    }
    return sListSums(lSums);
}

std::vector<ZTSCounterSample> countersOf(const ZTSRemotePort& acrPort, const ZTCNameBook& acrNames,
                                         ZTCHistoryTime aNow) {
    static constexpr std::chrono::hours scSpan(24);
    ZTCCounterSums lSums;
    for (const ZTSCounterSample& lrSample : acrNames.findCounters(aNow - scSpan, aNow)) {
        if (lrSample.mRemotePort == acrPort.mWwpn) {
            sAddSample(lrSample, lSums);
        }
    }
    return sListSums(lSums);
}

std::string formatCounters(const std::vector<ZTSCounterSample>& acrCounters) {
    std::string lText;
    for (const ZTSCounterSample& lrSample : acrCounters) {
        lText += (lText.empty() ? "" : ", ") + std::string(lrSample.mRemotePort ? "port's " : "") + lrSample.mCounter +
                 " +" + formatNumber(lrSample.mDifference);
    }
    return lText;
}
