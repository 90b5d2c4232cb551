#include "sensor/views/include/StateTable.h"

#include <algorithm>
#include <array>

#include "sensor/views/src/StateTexts.h"

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

/// The agent runs, but has not been told to listen yet: every kind is off.
static bool sIsNotStartedYet(const ZTSStatusFacts& acrFacts) {
    return acrFacts.mLive && acrFacts.mLive->mAgent.mIsRunning == true && sIsAnyKind(acrFacts, sIsOff) &&
           !sIsAnyKind(acrFacts, sIsNotOff);
}

/// A run that was not ended, or a page that was left behind: an orderly stop leaves neither.
static bool sHasVanished(const ZTSStatusFacts& acrFacts) {
    const bool lIsRunOpen = acrFacts.mHistory && acrFacts.mHistory->mLastRun && acrFacts.mHistory->mLastRun->mIsOpen;
    return lIsRunOpen || acrFacts.mLeftPage;
}

static constexpr std::array scTable{
    ZTSStateRow{
        .mpId = "newer-history",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                return acrFacts.mAnswer == ZTAN_NoSensor && acrFacts.mIsHistoryNewer;
            },
        .mpHeadline = "the history is of a newer version of Tavik",
        .mpStatus = describeNewerHistoryState,
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
        .mpStatus = describeVanishedState,
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
        .mpStatus = describeNoSensorState,
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
        .mpStatus = describeAnswerState,
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
        .mpStatus = describeAnswerState,
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
        .mpStatus = describeAnswerState,
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
        .mpStatus = describeStoppingState,
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
        .mpStatus = describeNoLibraryState,
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
        .mpStatus = describeNoAdaptersState,
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
        .mpStatus = describeAgentDownState,
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
        .mpStatus = describeStartingState,
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
        .mpStatus = describeDiskState,
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
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sIsAnyKind(acrFacts, isDeafState); },
        .mpHeadline = "silence below proves nothing",
        .mpStatus = describeDeafState,
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
        .mpStatus = describeGapState,
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
        .mpStatus = describeRefusedState,
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
        .mpStatus = describeCollectingState,
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
