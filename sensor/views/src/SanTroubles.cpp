#include "sensor/views/include/SanTroubles.h"

#include <algorithm>
#include <array>
#include <map>

#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

/// Units that are named one by one; of more only the number is shown.
static constexpr std::size_t scMostNamedLuns = 3;

// ---- the table ----

static constexpr std::array<ZTSSanTroubleRow, ZTST_Count> scTable{{
    {.mKind = ZTST_LunWithoutPath,
     .mpId = "lun-without-path",
     .mpTitle = "NO PATH",
     .mpAction = "See which links and ports are down;  tavik paths --trouble",
     .mpMeans = "No path of a LUN works. I/O to it fails, or waits if multipath queues it.",
     .mpCauses = "All its ports or links are down, the array removed the LUN while it was in use, or somebody set the "
                 "last path offline.",
     .mpLookAt = "Check whether links or remote ports are down too: they are reported as troubles of their own. If all "
                 "are up, look at the array: is the LUN still mapped to this host?"},
    {.mKind = ZTST_RedundancyLost,
     .mpId = "redundancy-lost",
     .mpTitle = "REDUNDANCY LOST",
     .mpAction = "Mend the cause before the next fault;  tavik paths --trouble",
     .mpMeans = "I/O goes on, but only one path, one initiator or one remote port is left, and there were more before. "
                "The next fault there stops I/O.",
     .mpCauses = "A link, a fabric or a controller of the array is down, or only one of several paths was brought back "
                 "after a maintenance.",
     .mpLookAt =
         "Look at the links and remote ports that are down. The number of paths is compared with the largest number "
         "that the LUN had in the whole history. If it is to have fewer from now on, run: tavik mark baseline"},
    {.mKind = ZTST_LinkDown,
     .mpId = "link-down",
     .mpTitle = "LINK DOWN",
     .mpAction = "Look at PORT's cable and transceiver, then at the switch's port.",
     .mpMeans = "A port of an adapter has no link. Nothing can be reached through it.",
     .mpCauses = "The cable or a transceiver is bad, the switch's port is disabled or down, or nothing is plugged in.",
     .mpLookAt =
         "Look at the light at both ends and at the switch's port. If the port's counters of loss of signal and CRC "
         "errors rose, the cable or a transceiver is bad. If they did not, the port was probably switched off."},
    {.mKind = ZTST_PathLost,
     .mpId = "path-lost",
     .mpTitle = "PATH LOST",
     .mpAction = "Look at PORT on the array and the switch, then at its zone.",
     .mpMeans = "A remote port that this host knew is not Online. Blocked means that it has just disappeared, and I/O "
                "to it waits. Not Present means that it did not come back, and the kernel has removed its paths.",
     .mpCauses = "The array's port or controller is down or restarting, the array's port on the switch is down, or the "
                 "zones were changed.",
     .mpLookAt = "Check whether other ports of the same array are still reached: then the cause is this port and not "
                 "the fabric. Check whether other hosts lost the port too: then the cause is not this host's zone."},
    {.mKind = ZTST_RedundancyReduced,
     .mpId = "redundancy-reduced",
     .mpTitle = "REDUNDANCY REDUCED",
     .mpAction = "tavik paths --trouble",
     .mpMeans = "Paths of a LUN do not work, although their link and their remote port are up.",
     .mpCauses = "The kernel or a person set a device offline, the LUN is not mapped to all ports of the array, or a "
                 "path was deleted and not scanned again.",
     .mpLookAt = "Look at the state of the devices. The kernel sets a device offline after errors from which it could "
                 "not recover. Its log says why. A scan of the host finds paths that were deleted. If there are to be "
                 "fewer paths from now on, run: tavik mark baseline"},
    {.mKind = ZTST_InitiatorWithoutPath,
     .mpId = "initiator-without-path",
     .mpTitle = "INITIATOR WITHOUT PATH",
     .mpAction = "Look at PORT's zone on the switch, and at this host's entry on the array.",
     .mpMeans = "A port of an adapter is Online, but no LUN is reached through it. Other ports reach LUNs.",
     .mpCauses = "Its zone is missing or wrong, the array does not know its WWPN, or its LUNs are not mapped.",
     .mpLookAt = "Check whether it sees remote ports. If it sees none, look at the zone. If it sees some but no LUN, "
                 "look at the array's entry for this host."},
    {.mKind = ZTST_Flapping,
     .mpId = "flapping",
     .mpTitle = "FLAPPING",
     .mpAction = "Look at PORT's cable, transceivers and switch port;  tavik events --since 1h",
     .mpMeans = "A link or a remote port disappeared and came back at least twice in the last hour.",
     .mpCauses = "A cable or a transceiver is bad, a port has a wrong speed, or a controller restarts again and again.",
     .mpLookAt = "Look at the counters of CRC errors and loss of signal at both ends. If only one of several remote "
                 "ports flaps, look at its end."},
    {.mKind = ZTST_UselessPort,
     .mpId = "port-without-path",
     .mpTitle = "UNUSED PORT",
     .mpAction = "Map LUNs to it on the array, or take it out of the zone;  tavik paths",
     .mpMeans = "A target port is Online and zoned to this host, but no LUN is reached through it. This is only a "
                "notice, because nothing has become worse.",
     .mpCauses = "The array maps no LUN to this host on that port, or the devices were deleted and not scanned again.",
     .mpLookAt = "Decide whether the port should be used. If the LUNs need its paths, map LUNs to it."},
}};

std::span<const ZTSSanTroubleRow> getSanTroubleTable() {
    return scTable;
}

const ZTSSanTroubleRow* findSanTrouble(std::string_view aId) {
    const auto lFound = std::ranges::find(scTable, aId, &ZTSSanTroubleRow::mpId);
    return lFound == scTable.end() ? nullptr : &*lFound;
}

const ZTSSanTroubleRow& getSanTroubleRow(ZTESanTrouble aKind) {
    return scTable.at(aKind);
}

std::string getSanAction(const ZTSSanTroubleRow& acrRow, const std::string& acrPort) {
    static constexpr std::string_view scPort = "PORT";
    std::string lAction = acrRow.mpAction;
    const std::size_t lPlace = lAction.find(scPort);
    return lPlace == std::string::npos ? lAction : lAction.replace(lPlace, scPort.size(), acrPort);
}

// ---- LUNs in words ----

std::string describeLun(const ZTSSanLun& acrLun) {
    const bool lHasDisk = !acrLun.mPaths.empty() && acrLun.mPaths.front().mDisk;
    return acrLun.mMultipath ? *acrLun.mMultipath : lHasDisk ? *acrLun.mPaths.front().mDisk : acrLun.mId;
}

/// "mpatha (/data), mpathb and 4 more".
static std::string sNameLuns(const std::vector<std::size_t>& acrLuns, const ZTSSanFacts& acrFacts) {
    std::string lText;
    const std::size_t lNamed = std::min(acrLuns.size(), scMostNamedLuns);
    for (std::size_t i = 0; i < lNamed; ++i) {
        const ZTSSanLun& lrLun = acrFacts.mLuns[acrLuns[i]];
        const bool lIsLast = i + 1 == lNamed && lNamed == acrLuns.size();
        lText += i == 0 ? "" : lIsLast ? " and " : ", ";
        lText += describeLun(lrLun) + (lrLun.mMounts.empty() ? "" : " (" + lrLun.mMounts.front() + ")");
    }
    return lNamed < acrLuns.size() ? lText + " and " + formatNumber(acrLuns.size() - lNamed) + " more" : lText;
}

/// "40 LUNs run on 7 of 8 paths; I/O goes on."
static std::string sCountWays(const std::vector<std::size_t>& acrLuns, const ZTSSanFacts& acrFacts) {
    std::map<std::pair<std::size_t, std::size_t>, std::size_t> lWays;
    std::size_t lWithout = 0;
    for (const std::size_t lPlace : acrLuns) {
        const ZTSSanLun& lrLun = acrFacts.mLuns[lPlace];
        if (lrLun.mRedundancy == ZTRD_None) {
            ++lWithout;
        } else {
            ++lWays[{lrLun.mRunning, lrLun.mExpected}];
        }
    }
    static constexpr std::size_t scMostWays = 2;
    std::string lText;
    std::size_t lShown = 0;
    std::size_t lRest = acrLuns.size() - lWithout;
    for (const auto& [lWay, lCount] : lWays) {
        if (lShown++ == scMostWays) {
            break;
        }
        lText +=
            lText.empty() ? formatCount(lCount, "LUN") + (lCount == 1 ? " runs" : " run") : ", " + formatNumber(lCount);
        lText += " on " + formatNumber(lWay.first) + " of " + formatCount(lWay.second, "path");
        lRest -= lCount;
    }
    lText += lRest == 0 ? "" : ", " + formatNumber(lRest) + " on others";
    lText += lText.empty() ? "" : "; I/O goes on.";
    if (lWithout != 0) {
        lText += (lText.empty() ? "" : " ") + formatCount(lWithout, "LUN") + (lWithout == 1 ? " has" : " have") +
                 " no path left.";
    }
    return lText;
}

std::string summarizePaths(const ZTSSanFacts& acrFacts) {
    std::size_t lPaths = 0;
    std::size_t lRunning = 0;
    std::size_t lFewest = SIZE_MAX;
    std::size_t lMost = 0;
    for (const ZTSSanLun& lrLun : acrFacts.mLuns) {
        lPaths += lrLun.mExpected;
        lRunning += lrLun.mRunning;
        lFewest = std::min(lFewest, lrLun.mExpected);
        lMost = std::max(lMost, lrLun.mExpected);
    }
    if (acrFacts.mLuns.empty()) {
        return "no LUN is seen";
    }
    const std::string lLuns = formatCount(acrFacts.mLuns.size(), "LUN") + ", ";
    if (lRunning < lPaths) {
        const std::size_t lWithout = acrFacts.countLuns(ZTRD_None);
        return lLuns + formatNumber(lRunning) + " of " + formatCount(lPaths, "path") + " running" +
               (lWithout == 0 ? "" : "; " + formatCount(lWithout, "LUN") + " without a path");
    }
    const std::string lEach =
        lFewest == lMost ? formatCount(lMost, "path") : formatNumber(lFewest) + " to " + formatCount(lMost, "path");
    return lLuns + lEach + (acrFacts.mLuns.size() == 1 ? "" : " each") + (lPaths == 1 ? ", running" : ", all running");
}

// ---- ports in words ----

static std::string sJoin(const std::vector<std::string>& acrTexts) {
    std::string lText;
    for (std::size_t i = 0; i < acrTexts.size(); ++i) {
        lText += (i == 0 ? "" : i + 1 == acrTexts.size() ? " and " : ", ") + acrTexts[i];
    }
    return lText;
}

static std::string sNameInitiators(const ZTSSanTrouble& acrTrouble, const ZTCNameBook& acrNames) {
    std::vector<std::string> lTexts;
    for (const ZTSInitiator& lrInitiator : acrTrouble.mInitiators) {
        lTexts.push_back(acrNames.describe(lrInitiator));
    }
    return sJoin(lTexts);
}

/// What has the trouble: the remote port, else the initiator.
static std::string sNamePort(const ZTSSanTrouble& acrTrouble, const ZTCNameBook& acrNames) {
    return acrTrouble.mRemotePorts.empty() ? sNameInitiators(acrTrouble, acrNames)
                                           : acrNames.describe(acrTrouble.mRemotePorts.front());
}

/// "array7 ctrl-B  50:06:01:68:3b:a0:12:34  from host8", "host8  10:00:...", "40 LUNs" or "mpatha".
static std::string sSubject(const ZTSSanTrouble& acrTrouble, const ZTSSanFacts& acrFacts, const ZTCNameBook& acrNames) {
    if (!acrTrouble.mRemotePorts.empty()) {
        const std::string lWwpn = acrTrouble.mRemotePorts.front().mWwpn.toText();
        const std::string lName = sNamePort(acrTrouble, acrNames);
        return (lName == lWwpn ? "" : lName + "  ") + lWwpn + "  from " + sNameInitiators(acrTrouble, acrNames);
    }
    if (!acrTrouble.mInitiators.empty()) {
        const std::string lName = sNameInitiators(acrTrouble, acrNames);
        const auto& lrWwpn = acrTrouble.mInitiators.front().mWwpn;
        return lName + (lrWwpn && lrWwpn->toText() != lName ? "  " + lrWwpn->toText() : "");
    }
    return acrTrouble.mLuns.size() == 1 ? describeLun(acrFacts.mLuns[acrTrouble.mLuns.front()])
                                        : formatCount(acrTrouble.mLuns.size(), "LUN");
}

/// "Not Present since 09:57:40."
static std::string sState(const ZTSSanTrouble& acrTrouble, ZTCHistoryTime aNow) {
    return (acrTrouble.mState.empty() ? "Not Online" : acrTrouble.mState) +
           (acrTrouble.mSince ? " since " + formatShortTime(*acrTrouble.mSince, aNow) : "") + ".";
}

static std::string sLunsSuffer(const ZTSSanTrouble& acrTrouble, const ZTSSanFacts& acrFacts) {
    return acrTrouble.mLuns.empty() ? " No LUN has fewer paths by it." : " " + sCountWays(acrTrouble.mLuns, acrFacts);
}

/// The devices of these units that do not run: "7:0:0:0 (sdc) offline".
static std::string sListDownPaths(const ZTSSanTrouble& acrTrouble, const ZTSSanFacts& acrFacts) {
    static constexpr std::size_t scMostDevices = 3;
    std::string lText;
    std::size_t lCount = 0;
    for (const std::size_t lPlace : acrTrouble.mLuns) {
        for (const ZTSSanPath& lrPath : acrFacts.mLuns[lPlace].mPaths) {
            if (lrPath.mHealth == ZTPH_Down && lCount++ < scMostDevices) {
                lText += (lText.empty() ? "" : ", ") + lrPath.mAddress +
                         (lrPath.mDisk ? " (" + *lrPath.mDisk + ")" : "") + (lrPath.mState ? " " + *lrPath.mState : "");
            }
        }
    }
    return lText.empty()            ? "The missing paths were removed."
           : lCount > scMostDevices ? lText + " and " + formatNumber(lCount - scMostDevices) + " more."
                                    : lText + ".";
}

static std::vector<std::string> sStatus(const ZTSSanTrouble& acrTrouble, const ZTSSanFacts& acrFacts,
                                        const ZTCNameBook& acrNames, ZTCHistoryTime aNow) {
    const std::string lInitiators = sNameInitiators(acrTrouble, acrNames);
    switch (acrTrouble.mKind) {
        case ZTST_LunWithoutPath:
            return {sNameLuns(acrTrouble.mLuns, acrFacts) + (acrTrouble.mLuns.size() == 1 ? " has" : " have") +
                    " no running path: I/O fails or waits."};
        case ZTST_RedundancyLost:
            return {sNameLuns(acrTrouble.mLuns, acrFacts) + (acrTrouble.mLuns.size() == 1 ? " is" : " are") +
                        " down to one path, initiator or remote port.",
                    sCountWays(acrTrouble.mLuns, acrFacts)};
        case ZTST_LinkDown:
            return {sState(acrTrouble, aNow) + sLunsSuffer(acrTrouble, acrFacts)};
        case ZTST_PathLost: {
            std::vector<std::string> lLines{sState(acrTrouble, aNow) + sLunsSuffer(acrTrouble, acrFacts)};
            if (acrTrouble.mInitiators.size() == 1 && acrTrouble.mOtherPorts != 0) {
                lLines.push_back(
                    lInitiators + " still reaches its " +
                    (acrTrouble.mOtherPorts == 1 ? "other port" : formatCount(acrTrouble.mOtherPorts, "other port")) +
                    ": not its cable.");
            }
            return lLines;
        }
        case ZTST_RedundancyReduced:
            return {sCountWays(acrTrouble.mLuns, acrFacts), sListDownPaths(acrTrouble, acrFacts)};
        case ZTST_InitiatorWithoutPath:
            return {(acrTrouble.mState.empty() ? "It" : acrTrouble.mState + ", but it") +
                    " reaches no LUN; other initiators do." +
                    (acrTrouble.mLuns.empty() ? "" : sLunsSuffer(acrTrouble, acrFacts))};
        case ZTST_Flapping:
            return {"Its state changed " + formatNumber(acrTrouble.mChanges) + " times in the last hour. " +
                    (acrTrouble.mState.empty() ? "" : "Now: " + sState(acrTrouble, aNow))};
        case ZTST_UselessPort:
            return {"Online, but " + lInitiators + (acrTrouble.mInitiators.size() == 1 ? " reaches" : " reach") +
                    " no LUN through it." + (acrTrouble.mLuns.empty() ? "" : sLunsSuffer(acrTrouble, acrFacts))};
        case ZTST_Count:
            break;
    }
    return {};
}

ZTSTroubleText describeSanTrouble(const ZTSSanTrouble& acrTrouble, const ZTSSanFacts& acrFacts,
                                  const ZTCNameBook& acrNames, ZTCHistoryTime aNow) {
    const ZTSSanTroubleRow& lrRow = getSanTroubleRow(acrTrouble.mKind);
    return {.mId = lrRow.mpId,
            .mTitle = lrRow.mpTitle,
            .mSubject = sSubject(acrTrouble, acrFacts, acrNames),
            .mSeverity = getSanSeverityName(acrTrouble.mSeverity),
            .mStatus = sStatus(acrTrouble, acrFacts, acrNames, aNow),
            .mAction = {getSanAction(lrRow, sNamePort(acrTrouble, acrNames))},
            .mSee = "tavik explain " + (acrTrouble.mEpisode ? std::to_string(*acrTrouble.mEpisode) : lrRow.mpId)};
}

std::vector<ZTSTroubleText> describeSanTroubles(const ZTSSanFacts& acrFacts, const ZTCNameBook& acrNames,
                                                ZTCHistoryTime aNow, ZTESanSeverity aLeast) {
    std::vector<ZTSTroubleText> lTexts;
    for (const ZTSSanTrouble& lrTrouble : acrFacts.mTroubles) {
        if (lrTrouble.mSeverity >= aLeast) {
            lTexts.push_back(describeSanTrouble(lrTrouble, acrFacts, acrNames, aNow));
        }
    }
    return lTexts;
}
