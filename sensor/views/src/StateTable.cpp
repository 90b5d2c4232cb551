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
        .mpMeans = "A newer version of Tavik has written the history. This version cannot read it and does not change "
                   "it. Its sensor ends with status 2 at each start, and nothing is collected.",
        .mpCauses = "Tavik was replaced by an older version, or the state directory comes from another host.",
        .mpLookAt =
            "Install the newer version: it can read the whole history. To keep this version, move history.db, "
            "history.db-wal and history.db-shm out of sensor.state together. The sensor then begins a new history."},
    ZTSStateRow{
        .mpId = "sensor-vanished",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_NoSensor && sHasVanished(acrFacts); },
        .mpHeadline = "no sensor is running",
        .mpStatus = describeVanishedState,
        .mpAction = "sudo systemctl start tavik;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain gap",
        .mpMeans = "The sensor ended without an orderly stop. Nothing is collected. What was stored before can still "
                   "be read, with tavik events and tavik ports. The events that the agent held at that moment are "
                   "lost. The next start records them as a gap.",
        .mpCauses = "Somebody killed the sensor, the kernel killed it because memory ran out, it crashed, or the host "
                    "lost power.",
        .mpLookAt = "Read the service's messages and the kernel's log of that time. The service should start the "
                    "sensor again by itself. If it did not, check whether the service is enabled."},
    ZTSStateRow{
        .mpId = "no-sensor",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_NoSensor; },
        .mpHeadline = "no sensor is running",
        .mpStatus = describeNoSensorState,
        .mpAction = "sudo systemctl start tavik;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain no-sensor",
        .mpMeans = "Nobody listens on the sensor's control socket. No agent is watched, and nothing is collected. "
                   "What was stored before can still be read, with tavik events and tavik ports.",
        .mpCauses =
            "The service was never started or was stopped, or it ends at once because its configuration has an error.",
        .mpLookAt = "The service's messages say why it ended. Check the configuration with: tavik-sensor --check"},
    ZTSStateRow{
        .mpId = "not-permitted",
        .mVerdict = ZTVD_NotKnown,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_NotPermitted; },
        .mpHeadline = "you may not ask the sensor",
        .mpStatus = describeAnswerState,
        .mpAction = "sudo tavik status",
        .mpSee = "tavik explain not-permitted",
        .mpMeans = "The sensor's control socket is there, but this user may not connect to it. So it is not known "
                   "whether Tavik collects.",
        .mpCauses = "The socket and the history belong to the sensor's user and group. This user is not in the group.",
        .mpLookAt = "Ask with sudo, or let an administrator add your user to the sensor's group. The new group takes "
                    "effect at the next login."},
    ZTSStateRow{.mpId = "collector-silent",
                .mVerdict = ZTVD_NotKnown,
                .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_Silent; },
                .mpHeadline = "the collector does not answer",
                .mpStatus = describeAnswerState,
                .mpAction = "Ask again in a minute;  journalctl -u tavik -n 50",
                .mpSee = "tavik explain collector-silent",
                .mpMeans = "The sensor holds its control socket, but its collector did not answer in time. The agent "
                           "goes on holding events. Nothing is lost before its memory for events is full.",
                .mpCauses = "The collector is just being restarted, the disk is so slow that a write takes seconds, or "
                            "the host is overloaded.",
                .mpLookAt = "The sensor restarts a collector that has ended or has completed no look for two minutes. "
                            "If this state lasts, the service's messages say what the collector was doing."},
    ZTSStateRow{
        .mpId = "collector-refuses",
        .mVerdict = ZTVD_NotKnown,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return acrFacts.mAnswer == ZTAN_Refused; },
        .mpHeadline = "the collector's answer cannot be used",
        .mpStatus = describeAnswerState,
        .mpAction = "sudo systemctl restart tavik;  journalctl -u tavik -n 50",
        .mpSee = "tavik explain collector-refuses",
        .mpMeans = "The collector answered with an error, or with something that this version of tavik cannot read.",
        .mpCauses = "The package was updated but the old version of the sensor is still running, or another program "
                    "serves the control socket that the configuration names.",
        .mpLookAt = "Restart the service after an update. If this state lasts, check that sensor.directory in the "
                    "configuration is the folder that the service uses."},
    ZTSStateRow{.mpId = "stopping",
                .mVerdict = ZTVD_NotCollecting,
                .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sIsKeeper(acrFacts, ZTKP_Stopping); },
                .mpHeadline = "the sensor is stopping",
                .mpStatus = describeStoppingState,
                .mpAction = "sudo systemctl start tavik",
                .mpSee = "tavik explain stopping",
                .mpMeans = "The sensor ends in order. It tells the agent to stop listening, stores the events that the "
                           "agent holds, and ends.",
                .mpCauses = "Somebody stopped the service, or the host shuts down.",
                .mpLookAt = "If the stop was wanted, there is nothing to do. Events from now on are not seen."},
    ZTSStateRow{.mpId = "no-library",
                .mVerdict = ZTVD_NotCollecting,
                .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sHasEndReason(acrFacts, "no-library"); },
                .mpHeadline = "the adapters' library cannot be loaded",
                .mpStatus = describeNoLibraryState,
                .mpAction = "sudo tail -n 5 /var/log/tavik/qrv-tvk.log;  sudo grep -n library /etc/tavik/tavik.toml",
                .mpSee = "tavik explain no-library",
                .mpMeans = "All events come from the adapters' library, and the agent could not load it. The sensor "
                           "tries again after a minute at the latest.",
                .mpCauses = "The library is not installed, or agent.library names a file that does not exist, lacks "
                            "the entry point, or is of another version.",
                .mpLookAt = "The agent's log has the loader's error message."},
    ZTSStateRow{.mpId = "no-event-support",
                .mVerdict = ZTVD_NotCollecting,
                .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sHasEndReason(acrFacts, "no-event-support"); },
                .mpHeadline = "the adapters' driver reports no events",
                .mpStatus = describeNoEventSupportState,
                .mpAction = "Update the adapters' driver;  sudo tail -n 5 /var/log/tavik/qrv-tvk.log",
                .mpSee = "tavik explain no-event-support",
                .mpMeans =
                    "This host has adapters, but their library says that the driver cannot report events. The sensor "
                    "tries again after a minute at the latest.",
                .mpCauses = "The driver is older than the library, or the library is not the one for these adapters.",
                .mpLookAt = "Compare the versions of driver and library. agent.library in the configuration names the "
                            "library."},
    ZTSStateRow{
        .mpId = "no-adapters",
        .mVerdict = ZTVD_NotCollecting,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) {
                return sIsKeeper(acrFacts, ZTKP_WaitingForAdapters) || sHasEndReason(acrFacts, "no-adapters");
            },
        .mpHeadline = "no Fibre Channel adapter was found",
        .mpStatus = describeNoAdaptersState,
        .mpAction = "ls /sys/class/fc_host;  lspci | grep -i fibre",
        .mpSee = "tavik explain no-adapters",
        .mpMeans = "The agent runs only where the adapters' library shows an adapter that can report events. This host "
                   "shows none now. This is not an error: the sensor waits for one.",
        .mpCauses = "The host has no Fibre Channel adapter, its driver is not loaded, the adapter failed or was "
                    "removed, or the library is not the one for this adapter.",
        .mpLookAt = "Check whether the kernel shows the adapter: each of its ports is a folder in /sys/class/fc_host. "
                    "If the kernel shows it but the library does not, look at agent.library in the configuration.",
        .mIsWithoutFc = true},
    ZTSStateRow{.mpId = "agent-down",
                .mVerdict = ZTVD_NotCollecting,
                .mpHolds =
                    [](const ZTSStatusFacts& acrFacts) {
                        return sIsKeeper(acrFacts, ZTKP_WaitingToRestart) ||
                               (acrFacts.mLive && acrFacts.mLive->mAgent.mIsRunning == false &&
                                !sIsKeeper(acrFacts, ZTKP_Starting));
                    },
                .mpHeadline = "the agent is down",
                .mpStatus = describeAgentDownState,
                .mpAction = "journalctl -u tavik -n 50;  sudo tail -n 20 /var/log/tavik/qrv-tvk.log",
                .mpSee = "tavik explain agent-down",
                .mpMeans = "The agent has ended, and the sensor will start it again. Events until then are not seen.",
                .mpCauses = "Somebody killed the agent, the kernel killed it because memory ran out, the adapters' "
                            "library crashed, or the agent hung and the sensor ended it.",
                .mpLookAt = "Read the agent's log and the kernel's log of that time. The pause before each start "
                            "doubles, up to a minute."},
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
        .mpCauses =
            "The service was just started, or an adapter was added and the sensor restarts the agent to see it.",
        .mpLookAt = "If this lasts longer than a minute, read the service's messages."},
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
        .mpMeans =
            "The sensor asks the agent for events only when it has reserved room for the answer. There is no room now, "
            "so the agent goes on holding the events. Nothing is lost before its memory for events is full.",
        .mpCauses = "The file system of sensor.state is full, over quota, or read-only.",
        .mpLookAt = "Find out what fills the file system. history.days and history.size in the configuration limit "
                    "what Tavik itself keeps there."},
    ZTSStateRow{
        .mpId = "deaf",
        .mVerdict = ZTVD_PartlyDeaf,
        .mpHolds = [](const ZTSStatusFacts& acrFacts) { return sIsAnyKind(acrFacts, isDeafState); },
        .mpHeadline = "silence below proves nothing",
        .mpStatus = describeDeafState,
        .mpAction = "sudo systemctl edit tavik      # AmbientCapabilities=",
        .mpSee = "tavik explain deaf",
        .mpMeans = "Some kinds of events do not reach Tavik although this host could report them. If none of them is "
                   "shown, they may have happened all the same.",
        .mpCauses = "no_rights: the agent lacks a capability, or runs in a name space that hides the source. The words "
                    "in parentheses say which. failed: the adapters' library refused the registration.",
        .mpLookAt = "For no_rights, give the service the capability that is named, then restart it. For failed, the "
                    "agent's log has the status of each registration. no_source does not count as deaf: this library "
                    "cannot observe that kind at all."},
    ZTSStateRow{
        .mpId = "gap",
        .mVerdict = ZTVD_Lossy,
        .mpHolds =
            [](const ZTSStatusFacts& acrFacts) { return acrFacts.mHistory && !acrFacts.mHistory->mGaps.empty(); },
        .mpHeadline = nullptr,
        .mpStatus = describeGapState,
        .mpAction = "journalctl -u tavik --since yesterday",
        .mpSee = "tavik explain gap",
        .mpMeans = "In a gap, events were lost or may have been lost: the events that a killed agent held, or the "
                   "unread rest of its last answer. Each gap is shown with its time, and with the number of lost "
                   "events if that is known. A gap is "
                   "reported for 24 hours.",
        .mpCauses = "The agent or the sensor was killed or crashed, or the host lost power.",
        .mpLookAt = "Read the service's messages around the gap. Compare the time with what the SAN did: the switch's "
                    "log still has the events of the gap."},
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
        .mpCauses = "total-limit: more events came than the agent may hold before the collector took them. too-short, "
                    "unknown-kind, unknown-board, no-list: the library delivered an event that the agent cannot "
                    "assign. failed: the agent had no memory.",
        .mpLookAt =
            "For total-limit, find the port that sends so many, and check whether the collector was down or had no "
            "disk space at that time. For the others, compare the versions of adapter, driver and library."},
    ZTSStateRow{.mpId = "collecting",
                .mVerdict = ZTVD_Collecting,
                .mpHolds = [](const ZTSStatusFacts&) { return true; },
                .mpHeadline = "nothing lost",
                .mpStatus = describeCollectingState,
                .mpAction = "",
                .mpSee = "tavik events",
                .mpMeans =
                    "The agent listens, the collector stores what it reports, and nothing was lost in the last 24 "
                    "hours. If no event comes, the SAN is quiet: for the kinds that are listened to, silence means "
                    "that nothing happened.",
                .mpCauses = "This is the normal state.",
                .mpLookAt = "tavik status names the kinds without a source: this host's library cannot observe these "
                            "kinds at all. tavik ports and tavik events show what was collected."},
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
