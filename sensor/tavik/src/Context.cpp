#include "sensor/tavik/src/Context.h"

#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>

#include "sensor/client/include/AgentState.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/StatusPageReader.h"
#include "sensor/store/include/DamagedHistories.h"
#include "sensor/tavik/src/ControlClient.h"
#include "sensor/views/include/TimeText.h"

namespace fs = std::filesystem;

static constexpr std::string_view scPagePrefix = "page.";

static std::string sHostName() {
    std::array<char, 256> lName{};
    return gethostname(lName.data(), lName.size() - 1) == 0 ? lName.data() : "unknown";
}

ZTCContext::ZTCContext(const ZTSTavikOptions& acrOptions) : mHost(sHostName()) {
    ZTSSettingsReading lReading = readSettings(acrOptions.mConfig);
    if (!lReading.isGood()) {
        const std::size_t lMore = lReading.mErrors.size() - 1;
        throw ZTCWrongUseEx(lReading.mErrors.front().toText() +
                            (lMore == 0 ? "" : " (and " + std::to_string(lMore) + " more: tavik-sensor --check)"));
    }
    mSettings = std::move(lReading.mSettings);
    mSettingsFile = std::move(lReading.mFile);
}

std::unique_ptr<ZTCHistory> ZTCContext::openHistory() const {
    return std::make_unique<ZTCHistory>(mSettings.mSensorState);
}

std::string ZTCContext::findStoreId() const {
    try {
        return openHistory()->getStoreId();
    } catch (const ZTCStoreEx& lrEx) {
        complain(lrEx.what());
        return {};
    }
}

ZTCNameBook ZTCContext::makeNames(const ZTCHistory* apHistory) const {
    ZTCNameBook lNames;
    lNames.addNames(mSettings.mNames);
    if (apHistory != nullptr) {
        lNames.setTopology(readTopologyOf(*apHistory));
        lNames.setCounters(readCountersOf(*apHistory));
        for (const ZTSInitiator& lrInitiator : apHistory->readInitiators()) {
            lNames.addInitiator(lrInitiator);
        }
        for (const ZTSRemotePort& lrPort : apHistory->readRemotePorts()) {
            lNames.addRemotePort(lrPort);
        }
        if (const auto lStored = apHistory->readTopology(toMicroseconds(getHistoryTime()))) {
            addPorts(lNames, lStored->mTopology);
        }
    }
    return lNames;
}

ZTSStatusFacts ZTCContext::gatherFacts(std::optional<ZTCHistoryTime> aLossesSince) const {
    ZTSStatusFacts lFacts;
    lFacts.mHost = mHost;
    lFacts.mPlaces = {.mSettingsFile = mSettingsFile,
                      .mStateDirectory = mSettings.mSensorState,
                      .mAgentLog = mSettings.mAgentLog,
                      .mLibrary = mSettings.mAgentLibrary};
    nlohmann::json lRequest{{"request", "status"}};
    if (aLossesSince) {
        lRequest["lossesSince"] = toRfc3339(*aLossesSince);
        lFacts.mLossSpan = std::chrono::floor<std::chrono::seconds>(getHistoryTime() - *aLossesSince);
    }
    ZTSControlAnswer lAnswer = askSensor(mSettings.controlPath(), lRequest, gcAskLimit);
    lFacts.mAnswer = lAnswer.mAnswer;
    lFacts.mAnswerProblem = lAnswer.mProblem;
    if (lAnswer.mAnswer == ZTAN_Answered) {
        lFacts.mLive = readLiveState(lAnswer.mDocument);
    }
    lFacts.mNow = getHistoryTime();
    std::unique_ptr<ZTCHistory> lpHistory;
    try {
        lpHistory = openHistory();
        lFacts.mHistory = readHistoryFacts(*lpHistory, lFacts.mNow);
        if (aLossesSince) {
            lFacts.mHistory->mGaps = lpHistory->readGaps(*aLossesSince);
        }
    } catch (const ZTCStoreEx& lrEx) {
        lpHistory.reset();
        lFacts.mHistoryProblem = lrEx.what();
        lFacts.mIsHistoryNewer = dynamic_cast<const ZTCStoreNewerEx*>(&lrEx) != nullptr;
    }
    lFacts.mDamagedHistories = listDamagedHistories(mSettings.mSensorState);
    lFacts.mNames = makeNames(lpHistory.get());
    lFacts.mNames.setTopology(nullptr);  // the history ends here
    lFacts.mNames.setCounters(nullptr);
    if (lFacts.mAnswer == ZTAN_NoSensor) {
        addLeftPage(lFacts);
    }
    return lFacts;
}

/// The newest page in the folder; empty: there is none.
static std::string sFindPage(const std::string& acrDirectory, std::error_code& arError) {
    std::string lNewest;
    fs::file_time_type lNewestTime;
    for (fs::directory_iterator lEntry(acrDirectory, arError); !arError && lEntry != fs::directory_iterator();
         lEntry.increment(arError)) {
        std::error_code lGone;
        const fs::file_time_type lTime = fs::last_write_time(lEntry->path(), lGone);
        const bool lIsPage = lEntry->path().filename().string().starts_with(scPagePrefix);
        if (lIsPage && !lGone && (lNewest.empty() || lTime > lNewestTime)) {
            lNewest = lEntry->path();
            lNewestTime = lTime;
        }
    }
    return lNewest;
}

static std::optional<ZTCHistoryTime> sTimeOf(std::int64_t aMicroseconds) {
    return aMicroseconds == 0 ? std::nullopt : std::optional(fromMicroseconds(aMicroseconds));
}

void ZTCContext::addLeftPage(ZTSStatusFacts& arFacts) const {
    const std::string lDirectory = mSettings.agentDirectory();
    std::error_code lError;
    const std::string lPath = sFindPage(lDirectory, lError);
    if (lError && lError != std::errc::no_such_file_or_directory) {
        arFacts.mPageProblem = "cannot look for what the agent left in " + lDirectory + ": " + lError.message();
        return;
    }
    ZTCStatusPageReader lReader;
    ZTSStatusSnapshot lSnapshot;
    if (lPath.empty()) {
        return;
    }
    if (!lReader.open(lPath) || !lReader.read(lSnapshot)) {
        arFacts.mPageProblem = lReader.getReason();
        return;
    }
    ZTSLeftPage lPage;
    lPage.mHeld = lSnapshot.getHeld();
    lPage.mHasEndedInOrder = lSnapshot.mEndReason != ZTSE_Running;
    lPage.mLast = sTimeOf(lSnapshot.mEndTime != 0 ? lSnapshot.mEndTime : lSnapshot.mLastRetrieval);
    try {
        const ZTSAgentState lAgent = lookAtAgent(lDirectory);
        lPage.mIsAgentAlive = lAgent.mPresence == ZTAP_Running && lAgent.mPid == static_cast<long>(lSnapshot.mPid);
    } catch (const ZTCSystemCallEx& lrEx) {
        arFacts.mPageProblem = lrEx.what();
    }
    arFacts.mLeftPage = lPage;
}
