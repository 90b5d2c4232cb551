#include "sensor/views/include/StateTable.h"

#include <algorithm>
#include <array>

#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

using ZTCLines = std::vector<std::string>;

// ---- verdicts ----

struct ZTSVerdictRow {
    const char* mpWord;
    int mExit;
};

static constexpr std::array<ZTSVerdictRow, ZTVD_Count> scVerdicts{
    {{"NOT COLLECTING", 3}, {"NOT KNOWN", 3}, {"PARTLY DEAF", 1}, {"COLLECTING", 1}, {"COLLECTING", 0}}};

const char* getVerdictWord(ZTEVerdict aVerdict) {
    return scVerdicts.at(aVerdict).mpWord;
}

int getVerdictExit(ZTEVerdict aVerdict) {
    return scVerdicts.at(aVerdict).mExit;
}

// ---- how the states are told ----

static bool sIsKeeper(const ZTSStatusFacts& acrFacts, ZTELiveKeeperState aState) {
    return acrFacts.mLive && acrFacts.mLive->mKeeper.mState == aState;
}

static bool sHasEndReason(const ZTSStatusFacts& acrFacts, std::string_view aReason) {
    return acrFacts.mLive && acrFacts.mLive->mAgent.mIsRunning == false && acrFacts.mLive->mAgent.mEndReason == aReason;
}

static bool sIsAnyKind(const ZTSStatusFacts& acrFacts, bool (*apIsWanted)(std::string_view aState)) {
    if (!acrFacts.mLive || !acrFacts.mLive->mKinds) {
        return false;
    }
    for (const ZTSLiveKinds& lrKinds : *acrFacts.mLive->mKinds) {
        for (const auto& [lKind, lState] : lrKinds.mStates) {
            if (apIsWanted(lState)) {
                return true;
            }
        }
    }
    return false;
}

static bool sIsOff(std::string_view aState) {
    return aState == getKindStateName(ZTKST_Off);
}

static bool sIsNotOff(std::string_view aState) {
    return !sIsOff(aState);
}

static bool sIsDeafState(std::string_view aState) {
    return aState == getKindStateName(ZTKST_Failed) || aState == getKindStateName(ZTKST_NoRights);
}

/// The agent runs, but has not been told to listen yet: every kind is off.
static bool sIsNotStartedYet(const ZTSStatusFacts& acrFacts) {
    return acrFacts.mLive && acrFacts.mLive->mAgent.mIsRunning == true && sIsAnyKind(acrFacts, sIsOff) &&
           !sIsAnyKind(acrFacts, sIsNotOff);
}

// ---- what they say ----

static std::string sSince(const std::optional<ZTCHistoryTime>& acrTime, const ZTSStatusFacts& acrFacts) {
    return acrTime ? " since " + formatShortTime(*acrTime, acrFacts.mNow) : "";
}

static ZTCLines sOneLine(const std::string& acrText) {
    return acrText.empty() ? ZTCLines() : ZTCLines{acrText};
}

/// What is known of the agent's end and of the next start.
static std::string sDescribeAgentEnd(const ZTSStatusFacts& acrFacts) {
    const ZTSLiveAgent& lrAgent = acrFacts.mLive->mAgent;
    const ZTSLiveKeeper& lrKeeper = acrFacts.mLive->mKeeper;
    std::string lText = "No agent runs" + sSince(lrKeeper.mSince, acrFacts) + ".";
    lText += !lrAgent.mProblem.empty()     ? " " + lrAgent.mProblem
             : !lrAgent.mEndReason.empty() ? " The last one ended: " + lrAgent.mEndReason
                                           : " Why the last one ended is not known";
    lText += lText.ends_with('.') ? "" : ".";
    if (lrKeeper.mNextStart) {
        lText += " The next start is at " + formatShortTime(*lrKeeper.mNextStart, acrFacts.mNow) + ".";
    }
    return lText;
}

static std::string sDescribeLeftPage(const ZTSStatusFacts& acrFacts) {
    const ZTSLeftPage& lrPage = *acrFacts.mLeftPage;
    if (lrPage.mIsAgentAlive) {
        return "Its agent runs on and holds " + formatCount(lrPage.mHeld, "event") + ".";
    }
    return lrPage.mHeld == 0
               ? "Its agent held nothing (from the page it left)."
               : "Lost: the " + formatCount(lrPage.mHeld, "event") + " its agent held (from the page it left).";
}

/// A run that was not ended, or a page that was left behind: an orderly stop leaves neither.
static bool sHasVanished(const ZTSStatusFacts& acrFacts) {
    const bool lIsRunOpen = acrFacts.mHistory && acrFacts.mHistory->mLastRun && acrFacts.mHistory->mLastRun->mIsOpen;
    return lIsRunOpen || acrFacts.mLeftPage;
}

static ZTCLines sStatusOfNewerHistory(const ZTSStatusFacts& acrFacts) {
    return {acrFacts.mHistoryProblem + ". No sensor of this version runs with it, and nothing is collected."};
}

static ZTCLines sStatusOfNoSensor(const ZTSStatusFacts& acrFacts) {
    if (!acrFacts.mHistory) {
        return {"Nothing listens on its control socket."};
    }
    if (!acrFacts.mHistory->mLastRun) {
        return {"None has ever run with this history."};
    }
    return {"It was stopped in order at " + formatShortTime(acrFacts.mHistory->mLastRun->mTo, acrFacts.mNow) +
            ". Unseen: all since."};
}

static ZTCLines sStatusOfVanished(const ZTSStatusFacts& acrFacts) {
    const bool lHasRun = acrFacts.mHistory && acrFacts.mHistory->mLastRun;
    std::string lText = "It vanished";
    lText += lHasRun ? " about " + formatShortTime(acrFacts.mHistory->mLastRun->mTo, acrFacts.mNow) : "";
    lText += " without an orderly stop.";
    lText += acrFacts.mLeftPage ? " " + sDescribeLeftPage(acrFacts) : "";
    return {lText + " Unseen: all since."};
}

static ZTCLines sStatusOfAnswer(const ZTSStatusFacts& acrFacts) {
    return sOneLine(acrFacts.mAnswerProblem);
}

static ZTCLines sStatusOfStopping(const ZTSStatusFacts& acrFacts) {
    return {"It has been asked to stop" + sSince(acrFacts.mLive->mKeeper.mSince, acrFacts) +
            ": it takes in what the agent holds, and ends within 20 s."};
}

static ZTCLines sStatusOfNoAdapters(const ZTSStatusFacts& acrFacts) {
    return {"The agent found none" + sSince(acrFacts.mLive->mKeeper.mSince, acrFacts) +
            ". The sensor looks every 10 s and starts the agent by itself."};
}

static ZTCLines sStatusOfNoLibrary(const ZTSStatusFacts& acrFacts) {
    const std::string& lrProblem = acrFacts.mLive->mAgent.mProblem;
    return {lrProblem.empty() ? "The agent ended because it could not load the adapters' library." : lrProblem};
}

static std::string sStartedAt(const ZTSStatusFacts& acrFacts) {
    const auto& lrSince = acrFacts.mLive->mKeeper.mSince;
    return lrSince ? "; it was started at " + formatShortTime(*lrSince, acrFacts.mNow) : "";
}

static ZTCLines sStatusOfStarting(const ZTSStatusFacts& acrFacts) {
    return {"Its agent has not begun to listen yet" + sStartedAt(acrFacts) + "."};
}

static ZTCLines sStatusOfAgentDown(const ZTSStatusFacts& acrFacts) {
    return {sDescribeAgentEnd(acrFacts)};
}

static ZTCLines sStatusOfDisk(const ZTSStatusFacts& acrFacts) {
    const ZTSLiveState& lrLive = *acrFacts.mLive;
    const std::string& lrProblem = lrLive.mCollector.mDiskProblem;
    std::string lText = lrProblem.empty() ? "The folder of the history cannot be written" : lrProblem;
    lText += lText.ends_with('.') ? "" : ".";
    if (lrLive.mAgent.mHeldBytes && lrLive.mAgent.mLimitBytes) {
        lText += " The agent holds " + formatBytes(*lrLive.mAgent.mHeldBytes) + " of " +
                 formatBytes(*lrLive.mAgent.mLimitBytes) + "; beyond that it has to refuse.";
    }
    return {lText};
}

/// Kinds in one state, with the same words of the library.
struct ZTSKindGroup {
    std::string mState;
    std::string mWords;
    ZTCLines mKinds;
};

static std::string sJoin(const ZTCLines& acrTexts) {
    std::string lText;
    for (const std::string& lrText : acrTexts) {
        lText += (lText.empty() ? "" : ", ") + lrText;
    }
    return lText;
}

/// Kinds of every adapter that are in one of these states, each once, by state and words.
static std::vector<ZTSKindGroup> sGroupKinds(const ZTSStatusFacts& acrFacts, bool aIsWithWords,
                                             bool (*apIsWanted)(std::string_view)) {
    std::vector<ZTSKindGroup> lGroups;
    for (const ZTSLiveKinds& lrKinds : *acrFacts.mLive->mKinds) {
        for (const auto& [lKind, lState] : lrKinds.getOrdered()) {
            if (!apIsWanted(lState)) {
                continue;
            }
            const auto lFound = lrKinds.mWords.find(lKind);
            const std::string lWords = lFound == lrKinds.mWords.end() ? "" : lFound->second;
            const std::string lName = lKind + (aIsWithWords && !lWords.empty() ? " (" + lWords + ")" : "");
            const std::string lKey = aIsWithWords ? "" : lWords;
            const auto lIsGroup = [&lKey, &lrState = lState](const ZTSKindGroup& acrGroup) {
                return acrGroup.mState == lrState && acrGroup.mWords == lKey;
            };
            auto lGroup = std::find_if(lGroups.begin(), lGroups.end(), lIsGroup);
            if (lGroup == lGroups.end()) {
                lGroup = lGroups.insert(lGroups.end(), {lState, lKey, {}});
            }
            if (std::find(lGroup->mKinds.begin(), lGroup->mKinds.end(), lName) == lGroup->mKinds.end()) {
                lGroup->mKinds.push_back(lName);
            }
        }
    }
    return lGroups;
}

/// "no_rights  rscn                (needs CAP_NET_ADMIN)", then what is heard.
static ZTCLines sStatusOfDeaf(const ZTSStatusFacts& acrFacts) {
    static constexpr std::size_t scStateWidth = 11;
    static constexpr std::size_t scKindsWidth = 20;
    const auto lPad = [](std::string aText, std::size_t aWidth) {
        aText.resize(std::max(aText.size() + 1, aWidth), ' ');
        return aText;
    };
    ZTCLines lLines;
    for (const ZTSKindGroup& lrGroup : sGroupKinds(acrFacts, false, sIsDeafState)) {
        const std::string lKinds = sJoin(lrGroup.mKinds);
        lLines.push_back(lPad(lrGroup.mState, scStateWidth) +
                         (lrGroup.mWords.empty() ? lKinds : lPad(lKinds, scKindsWidth) + "(" + lrGroup.mWords + ")"));
    }
    const auto lIsHeard = [](std::string_view aState) { return aState == getKindStateName(ZTKST_Listening); };
    for (const ZTSKindGroup& lrGroup : sGroupKinds(acrFacts, true, lIsHeard)) {
        lLines.push_back(lPad(lrGroup.mState, scStateWidth) + sJoin(lrGroup.mKinds));
    }
    return lLines;
}

static std::string sLossSpan(const ZTSStatusFacts& acrFacts) {
    return " in the last " + (acrFacts.mLossSpan == gcLossSpan ? "24 h" : formatSpan(acrFacts.mLossSpan));
}

static ZTCLines sStatusOfGap(const ZTSStatusFacts& acrFacts) {
    static constexpr std::size_t scMostGaps = 2;
    const std::vector<ZTSGap>& lrGaps = acrFacts.mHistory->mGaps;
    ZTCLines lLines;
    for (std::size_t i = 0; i < std::min(lrGaps.size(), scMostGaps); ++i) {
        const ZTSGap& lrGap = lrGaps[lrGaps.size() - 1 - i];
        const std::uint64_t lCount = lrGap.getOccurrences();
        lLines.push_back(formatShortTime(lrGap.mFrom, acrFacts.mNow) + " to " +
                         formatShortTime(lrGap.mTo, acrFacts.mNow) + ": " +
                         (lrGap.mIsCountKnown && lCount == 0 ? "nothing is known to be lost"
                          : lrGap.mIsCountKnown              ? formatCount(lCount, "event") + " lost"
                          : lCount != 0                      ? "at least " + formatCount(lCount, "event") + " lost"
                                                             : "unknown how many events are lost") +
                         (lrGap.mReason.empty() ? "" : "; " + lrGap.mReason));
    }
    if (lrGaps.size() > scMostGaps) {
        lLines.push_back(formatCount(lrGaps.size() - scMostGaps, "earlier gap") + sLossSpan(acrFacts) + ".");
    }
    return lLines;
}

static ZTCLines sStatusOfRefused(const ZTSStatusFacts& acrFacts) {
    const ZTSLiveLosses& lrLosses = *acrFacts.mLive->mLosses;
    ZTCLines lParts;
    for (const auto& [lReason, lCount] : lrLosses.mRefused) {
        if (lCount != 0 && lReason != getRefusalName(ZTRF_CollectionOff)) {
            lParts.push_back(formatNumber(lCount) + " refused (" + lReason + ")");
        }
    }
    if (lrLosses.mDropped.value_or(0) != 0) {
        lParts.push_back(formatNumber(*lrLosses.mDropped) + " dropped by the agent");
    }
    for (const ZTSLibraryLoss& lrLoss : lrLosses.mLibrary) {
        if (lrLoss.mCount != 0) {
            lParts.push_back(formatNumber(lrLoss.mCount) + " lost by the adapters' library (" + lrLoss.mName + ")");
        }
    }
    const auto lSince = std::max(lrLosses.mSince.value_or(ZTCHistoryTime()), acrFacts.mNow - acrFacts.mLossSpan);
    return {sJoin(lParts) + "; since " + formatShortTime(lSince, acrFacts.mNow) + "."};
}

static ZTCLines sStatusOfCollecting(const ZTSStatusFacts&) {
    return {};
}

// ---- the table ----

static constexpr std::array scTable{
    ZTSStateRow{
        .mpId = "newer-history",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                return acrFacts.mAnswer == ZTAN_NoSensor && acrFacts.mIsHistoryNewer;
            },
        .mpHeadline = "the history is of a newer version of Tavik",
        .mpStatus = sStatusOfNewerHistory,
        .mpAction = "Install the newer version again, or move history.db out of /var/lib/tavik;  "
                    "sudo systemctl start tavik",
        .mpSee = "tavik explain newer-history",
        .mpMeans = "A newer version of Tavik has written the history. This version cannot read it, and leaves it as it "
                   "is: its sensor ends with status 2 at each start. Nothing is collected.",
        .mpCauses = "Tavik was replaced by an older version; the state directory was taken over from another host.",
        .mpLookAt = "With the newer version everything is there again. To stay with this one, move history.db, "
                    "history.db-wal and history.db-shm out of sensor.state together: the sensor then begins a new "
                    "history."},
    ZTSStateRow{
        .mpId = "sensor-vanished",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_NoSensor && sHasVanished(acrFacts); },
        .mpHeadline = "no sensor is running",
        .mpStatus = sStatusOfVanished,
        .mpAction = "sudo systemctl start tavik;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain gap",
        .mpMeans = "The sensor has gone without an orderly stop. Nothing is collected. What was stored before can "
                   "still be read: tavik events, tavik ports. What the agent held then is lost; the next start writes "
                   "it down as a gap.",
        .mpCauses = "The sensor was killed, by a person or for want of memory; it crashed; the host lost power.",
        .mpLookAt = "The service's messages and the kernel's log of that time. The service should start it again by "
                    "itself: if it did not, look whether it is enabled."},
    ZTSStateRow{
        .mpId = "no-sensor",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_NoSensor; },
        .mpHeadline = "no sensor is running",
        .mpStatus = sStatusOfNoSensor,
        .mpAction = "sudo systemctl start tavik;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain no-sensor",
        .mpMeans = "Nobody listens on the sensor's control socket. No agent is watched, and nothing is collected. "
                   "What was stored before can still be read: tavik events, tavik ports.",
        .mpCauses = "The service was never started, or was stopped; its configuration has an error, so that it ends at "
                    "once.",
        .mpLookAt = "The service's messages say why it ended. Check the configuration with: tavik-sensor --check"},
    ZTSStateRow{
        .mpId = "not-permitted",
        .mVerdict = ZTVD_NotKnown,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_NotPermitted; },
        .mpHeadline = "you may not ask the sensor",
        .mpStatus = sStatusOfAnswer,
        .mpAction = "sudo tavik status",
        .mpSee = "tavik explain not-permitted",
        .mpMeans = "The sensor's control socket is there, and this user may not connect to it. Whether Tavik collects "
                   "cannot be told.",
        .mpCauses = "The socket and the history belong to the sensor's user and group, and this user is in neither.",
        .mpLookAt = "Ask with sudo, or let an administrator add your user to the sensor's group. A new group counts "
                    "from the next login on."},
    ZTSStateRow{
        .mpId = "collector-silent",
        .mVerdict = ZTVD_NotKnown,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_Silent; },
        .mpHeadline = "the collector does not answer",
        .mpStatus = sStatusOfAnswer,
        .mpAction = "Ask again in a minute;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain collector-silent",
        .mpMeans = "The sensor holds its control socket, but its collector did not answer in time. The agent goes on "
                   "holding events; nothing is lost before it is full.",
        .mpCauses = "The collector is just being restarted; the disk is so slow that a write takes seconds; the host "
                    "is overloaded.",
        .mpLookAt = "The sensor restarts a collector that ends, and one that reports no progress for a minute. Where "
                    "it lasts, the service's messages name what the collector was doing."},
    ZTSStateRow{
        .mpId = "collector-refuses",
        .mVerdict = ZTVD_NotKnown,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_Refused; },
        .mpHeadline = "the collector's answer cannot be used",
        .mpStatus = sStatusOfAnswer,
        .mpAction = "sudo systemctl restart tavik;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain collector-refuses",
        .mpMeans = "The collector answered with an error, or with something that this version of tavik cannot read.",
        .mpCauses = "The package was updated and the sensor still runs in its old version; the control socket of the "
                    "configuration belongs to another program.",
        .mpLookAt = "Restart the service after an update. Compare tavik --version with what the service's first "
                    "message says."},
    ZTSStateRow{
        .mpId = "stopping",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sIsKeeper(acrFacts, ZTKP_Stopping); },
        .mpHeadline = "the sensor is stopping",
        .mpStatus = sStatusOfStopping,
        .mpAction = "sudo systemctl start tavik",
        .mpSee = "tavik explain stopping",
        .mpMeans = "The sensor ends in order: it tells the agent to stop listening, takes in what it holds, and ends.",
        .mpCauses = "Somebody stopped the service, or the host shuts down.",
        .mpLookAt = "Nothing, if the stop was meant. What happens from now on is not seen."},
    ZTSStateRow{
        .mpId = "no-library",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sHasEndReason(acrFacts, "no-library"); },
        .mpHeadline = "the adapters' library cannot be loaded",
        .mpStatus = sStatusOfNoLibrary,
        .mpAction = "sudo grep -n library /etc/tavik/tavik.toml;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain no-library",
        .mpMeans = "The agent could not load the adapters' library, which all events come from. The sensor tries "
                   "again, at the latest after a minute.",
        .mpCauses = "The library is not installed; agent.library names a file that does not exist, lacks the entry "
                    "point, or is of another version.",
        .mpLookAt = "The agent's log has the loader's own words."},
    ZTSStateRow{
        .mpId = "no-adapters",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                return sIsKeeper(acrFacts, ZTKP_WaitingForAdapters) || sHasEndReason(acrFacts, "no-adapters") ||
                       sHasEndReason(acrFacts, "no-event-support");
            },
        .mpHeadline = "no Fibre Channel adapter was found",
        .mpStatus = sStatusOfNoAdapters,
        .mpAction = "ls /sys/class/fc_host;  lspci | grep -i fibre",
        .mpSee = "tavik explain no-adapters",
        .mpMeans = "The agent runs only where the adapters' library shows an adapter that can report events. This host "
                   "shows none now. That is no failure: the sensor waits.",
        .mpCauses = "The host has no Fibre Channel adapter; its driver is not loaded; the adapter failed or was "
                    "removed; the library is not the one for this adapter.",
        .mpLookAt = "Whether the kernel shows the adapter: each of its ports is a folder in /sys/class/fc_host. If it "
                    "does and the library does not, look at agent.library in the configuration.",
        .mIsWithoutFc = true},
    ZTSStateRow{
        .mpId = "agent-down",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                return sIsKeeper(acrFacts, ZTKP_WaitingToRestart) ||
                       (acrFacts.mLive && acrFacts.mLive->mAgent.mIsRunning == false &&
                        !sIsKeeper(acrFacts, ZTKP_Starting));
            },
        .mpHeadline = "the agent is down",
        .mpStatus = sStatusOfAgentDown,
        .mpAction = "journalctl -u tavik -n 50",
        .mpSee = "tavik explain agent-down",
        .mpMeans = "The agent has ended and will be started again by the sensor. What happens until then is not seen.",
        .mpCauses = "It was killed, by a person or for want of memory; the adapters' library crashed; it hung, and the "
                    "sensor ended it.",
        .mpLookAt = "The agent's log and the kernel's log of that time. The pause before each start doubles up to a "
                    "minute, so a minute is the longest wait."},
    ZTSStateRow{
        .mpId = "starting",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                return sIsKeeper(acrFacts, ZTKP_Starting) || sIsNotStartedYet(acrFacts);
            },
        .mpHeadline = "the sensor is starting",
        .mpStatus = sStatusOfStarting,
        .mpAction = "tavik status --watch",
        .mpSee = "tavik explain starting",
        .mpMeans = "The agent was started and has not yet registered for events. This takes seconds.",
        .mpCauses = "The service was just started; an adapter was added, and the agent is started anew to see it.",
        .mpLookAt = "If it lasts over a minute, the service's messages."},
    ZTSStateRow{
        .mpId = "disk-full",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                return acrFacts.mLive && acrFacts.mLive->mCollector.mDisk.value_or(ZTDK_Ok) != ZTDK_Ok;
            },
        .mpHeadline = "there is no room to store what comes",
        .mpStatus = sStatusOfDisk,
        .mpAction = "df -h /var/lib/tavik;  make room: collecting goes on by itself",
        .mpSee = "tavik explain disk-full",
        .mpMeans = "The sensor asks the agent for events only when it has reserved room for the answer. It has none, "
                   "so the agent goes on holding. Nothing is lost before the agent's memory is full.",
        .mpCauses = "The file system of sensor.state is full, over quota, or read-only.",
        .mpLookAt = "What fills the file system. history.days and history.size in the configuration bound what Tavik "
                    "itself keeps there."},
    ZTSStateRow{
        .mpId = "deaf",
        .mVerdict = ZTVD_PartlyDeaf,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sIsAnyKind(acrFacts, sIsDeafState); },
        .mpHeadline = "silence below proves nothing",
        .mpStatus = sStatusOfDeaf,
        .mpAction = "sudo systemctl edit tavik      # AmbientCapabilities=",
        .mpSee = "tavik explain deaf",
        .mpMeans = "Some kinds of events do not reach Tavik although this host could report them. That none of them is "
                   "shown does not mean that none happened.",
        .mpCauses = "no_rights: the agent lacks a capability, or runs in a name space that hides the source; the words "
                    "in parentheses say which. failed: the adapters' library refused the registration.",
        .mpLookAt = "For no_rights, give the service the capability that is named, then restart it. For failed, the "
                    "agent's log has the status of each registration. no_source is not deafness: this library cannot "
                    "observe that kind at all."},
    ZTSStateRow{
        .mpId = "gap",
        .mVerdict = ZTVD_Lossy,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) { return acrFacts.mHistory && !acrFacts.mHistory->mGaps.empty(); },
        .mpHeadline = nullptr,
        .mpStatus = sStatusOfGap,
        .mpAction = "journalctl -u tavik --since yesterday",
        .mpSee = "tavik explain gap",
        .mpMeans = "In a gap events were lost or may have been: what a killed agent held, or the unread rest of its "
                   "last answer. Each is one row, with its time and what is known of how much is missing. A gap is "
                   "reported for 24 hours.",
        .mpCauses = "The agent or the sensor was killed or crashed; the host lost power.",
        .mpLookAt = "The service's messages around the gap. Compare the time with what the SAN did: events within a "
                    "gap are in the switch's log still."},
    ZTSStateRow{
        .mpId = "refused",
        .mVerdict = ZTVD_Lossy,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                const ZTSLossSum lSum = sumLosses(acrFacts);
                return lSum.mRefused + lSum.mDropped != 0;
            },
        .mpHeadline = nullptr,
        .mpStatus = sStatusOfRefused,
        .mpAction = "tavik ports --since 24h            # which port sends so many",
        .mpSee = "tavik explain refused",
        .mpMeans = "The agent or the adapters' library counted events that it could not keep. They are missing in "
                   "every count. They are reported for 24 hours.",
        .mpCauses = "total-limit: more came than the agent may hold before the collector took them over. too-short, "
                    "unknown-kind, unknown-board, no-list: the library delivered what the agent cannot place. failed: "
                    "the agent had no memory.",
        .mpLookAt = "For total-limit: which port sends so many, and whether the collector was down or had no disk at "
                    "the time. For the others: the versions of adapter, driver and library."},
    ZTSStateRow{
        .mpId = "collecting",
        .mVerdict = ZTVD_Collecting,
        .mpHolds = [](const ZTSStatusFacts&) { return true; },
        .mpHeadline = "nothing lost",
        .mpStatus = sStatusOfCollecting,
        .mpAction = "",
        .mpSee = "tavik events",
        .mpMeans = "The agent listens, the collector stores what it reports, and nothing was lost in the last 24 "
                   "hours. Where no event comes, the SAN is quiet: for the kinds that are listened to, silence means "
                   "that nothing happened.",
        .mpCauses = "This is the normal state.",
        .mpLookAt = "tavik status names the kinds without a source: of these, this host's library can see nothing. "
                    "tavik ports and tavik events show what was collected."},
};

std::span<const ZTSStateRow> getStateTable() {
    return scTable;
}

const ZTSStateRow* findState(std::string_view aId) {
    const auto lFound =
        std::find_if(scTable.begin(), scTable.end(), [aId](const ZTSStateRow& acrRow) { return acrRow.mpId == aId; });
    return lFound == scTable.end() ? nullptr : &*lFound;
}

std::size_t getStateNumber(const ZTSStateRow& acrRow) {
    return static_cast<std::size_t>(&scTable.back() - &acrRow);
}

ZTSJudgement judge(const ZTSStatusFacts& acrFacts) {
    ZTSJudgement lJudgement;
    for (const ZTSStateRow& lrRow : scTable) {
        const bool lIsExcluded = lrRow.mVerdict <= ZTVD_NotKnown && !lJudgement.mStates.empty();
        const bool lIsNeedless = lrRow.mVerdict == ZTVD_Collecting && !lJudgement.mStates.empty();
        if (!lIsExcluded && !lIsNeedless && lrRow.mpHolds(acrFacts)) {
            lJudgement.mStates.push_back(&lrRow);
        }
    }
    return lJudgement;
}

static std::string sLossHeadline(const ZTSStatusFacts& acrFacts) {
    const ZTSLossSum lSum = sumLosses(acrFacts);
    const std::string lSpan = sLossSpan(acrFacts);
    if (lSum.getTotal() == 0) {
        return lSum.mIsAtLeast ? "unknown how much was lost" + lSpan : "a gap" + lSpan + ", nothing lost";
    }
    return (lSum.mIsAtLeast ? "at least " : "") + formatCount(lSum.getTotal(), "event") + " lost" + lSpan;
}

std::string formatHeadline(const ZTSStatusFacts& acrFacts, const ZTSJudgement& acrJudgement, bool aHasSince) {
    const ZTSStateRow& lrWorst = acrJudgement.getWorst();
    std::string lText = getVerdictWord(lrWorst.mVerdict);
    if (aHasSince && lrWorst.mVerdict == ZTVD_Collecting && acrFacts.mLive) {
        lText += sSince(acrFacts.mLive->mAgent.mSince, acrFacts);
    }
    return lText + "; " + (lrWorst.mpHeadline != nullptr ? lrWorst.mpHeadline : sLossHeadline(acrFacts));
}

static ZTCLines sSplitLines(std::string_view aText) {
    ZTCLines lLines;
    while (!aText.empty()) {
        const std::size_t lEnd = std::min(aText.find('\n'), aText.size());
        lLines.emplace_back(aText.substr(0, lEnd));
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
    }
    return lLines;
}

std::vector<ZTSTroubleText> describeSanTroubles(const ZTSStatusFacts& acrFacts) {
    if (!acrFacts.mHistory || !acrFacts.mHistory->mSan) {
        return {};
    }
    return describeSanTroubles(acrFacts.mHistory->mSan->mFacts, acrFacts.mNames, acrFacts.mNow, ZTSS_Warning);
}

std::vector<ZTSTroubleText> describeTroubles(const ZTSStatusFacts& acrFacts, const ZTSJudgement& acrJudgement) {
    std::vector<ZTSTroubleText> lTroubles;
    for (const ZTSStateRow* lpRow : acrJudgement.mStates) {
        if (lpRow->mVerdict != ZTVD_Collecting) {
            lTroubles.push_back({.mId = lpRow->mpId,
                                 .mTitle = "",
                                 .mSubject = "",
                                 .mStatus = lpRow->mpStatus(acrFacts),
                                 .mAction = sSplitLines(lpRow->mpAction),
                                 .mSee = lpRow->mpSee});
        }
    }
    return lTroubles;
}
