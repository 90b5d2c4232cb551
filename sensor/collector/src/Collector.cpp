#include "sensor/collector/include/Collector.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

#include "sensor/collector/include/CollectorLog.h"

using std::chrono::milliseconds;
using std::chrono::seconds;

static constexpr seconds scSpoolPause{1};
/// Between two sweeps of what earlier keepers and agents have left.
static constexpr seconds scSweepPeriod{10};
/// Of an orderly end: when the agent is given up, and how long the history may take after that. Together less than
/// gcFinishLimit.
static constexpr seconds scFinishPatience{14};
static constexpr seconds scHistoryPatience{4};
static_assert(scFinishPatience + scHistoryPatience < gcFinishLimit);

/// The places of what is polled; clients of the control socket come behind them.
enum ZTEPolled : std::size_t {
    ZTPD_Keeper,
    ZTPD_History,
    ZTPD_Response,
    ZTPD_AgentBell,
    ZTPD_Outputs,
    ZTPD_Topology,
    ZTPD_Count
};

static ZTSStoreLimits sStoreLimits(const ZTSSettings& acrSettings) {
    ZTSStoreLimits lLimits;
    lLimits.mEpisodeGap = acrSettings.mEpisodeGap;
    lLimits.mRecordsPerEnd = static_cast<std::uint32_t>(acrSettings.mHistoryRecords);
    lLimits.mDays = static_cast<std::uint32_t>(acrSettings.mHistoryDays);
    lLimits.mBytes = acrSettings.mHistorySize;
    return lLimits;
}

static ZTSSessionSettings sSessionSettings(const ZTSSettings& acrSettings) {
    return {.mPeriod = acrSettings.mCollectPeriod,
            .mRecordLimit = static_cast<std::uint32_t>(acrSettings.mCollectRecordLimit)};
}

ZTCCollector::ZTCCollector(ZTSInheritance aInheritance, const ZTSSettings& acrSettings)
    : mInheritance(std::move(aInheritance)),
      mSettings(acrSettings),
      mSince(getHistoryTime()),
      mKeeper(std::move(mInheritance.mLink)),
      mSpool(mInheritance.mState + "/spool"),
      mHistory(mSpool, mInheritance.mState, sStoreLimits(acrSettings),
               [](const std::string& acrLine) { logLine(acrLine); }),
      mLeftovers(mInheritance.mDirectory + "/agent", mSpool, mHistory,
                 [](const std::string& acrLine) { logLine(acrLine); }),
      mAgents(mKeeper, mSpool, mHistory, mInheritance.mDirectory + "/agent", sSessionSettings(acrSettings),
              [](const std::string& acrLine) { logLine(acrLine); }),
      mTopology(mHistory, makeTopologyWatchSetup()),
      mPorts(mTopology, [](const std::string& acrLine) { logLine(acrLine); }),
      mControl(std::move(mInheritance.mControl),
               [this](std::uint64_t aTicket, const std::string& acrRequest) { return serve(aTicket, acrRequest); }),
      mOutputs(mInheritance.mState, acrSettings, mHistory) {}

ZTCCollector::~ZTCCollector() = default;

int ZTCCollector::run() {
    turn(std::chrono::steady_clock::now());
    while (!isOver(std::chrono::steady_clock::now())) {
        poll(std::chrono::steady_clock::now());
        turn(std::chrono::steady_clock::now());
    }
    const std::string lFatal = mHistory.getState().mFatal;
    if (!lFatal.empty()) {
        logLine(lFatal);
        return 2;
    }
    if (mKeeper.isGone()) {
        logLine("the keeper is gone: ending");
        turn(std::chrono::steady_clock::now());
    }
    mTopology.stop();
    if (!mHistory.finish(scHistoryPatience)) {
        logLine("not everything could be stored in time: it stays in " + mSpool.getFolder() + " for the next start");
    }
    return mKeeper.isGone() ? 1 : 0;
}

bool ZTCCollector::isOver(ZTCTime aNow) {
    if (mKeeper.isGone() || !mHistory.getState().mFatal.empty()) {
        return true;
    }
    if (!mFinishBy) {
        return false;
    }
    if (aNow >= *mFinishBy && !mAgents.isEmpty()) {
        logLine("the agent has not ended in time: ending without it");
        return true;
    }
    return mAgents.isEmpty() && mKeeper.isFlushed();
}

/// All that is due.
void ZTCCollector::turn(ZTCTime aNow) {
    for (const std::string& lrLine :
         mKeeper.receive([&](ZTSLinkMessage aMessage) { handle(std::move(aMessage), aNow); })) {
        logLine(lrLine);
    }
    noteHistory();
    if (!mIsReady) {
        openSpool(aNow);
    }
    if (mIsReady) {
        if (mPorts.scan(mSettings, aNow)) {
            mAgents.setTargets(mPorts.getTargets(), aNow);
        }
        if (mPorts.isReady()) {
            mAgents.run(aNow);
            storeLosses();
            mPorts.noteEvents(mAgents.getPage());
            sweep(aNow);
        }
    }
    mControl.serve(aNow);
    tellState();
    mOutputs.feed(aNow, [this] { return describeState(); });
    if (hasWorked() && aNow >= mKeeper.getNextLook()) {
        mKeeper.sendLook(aNow);
    }
    mKeeper.flush();
}

/// A collector whose history is not open yet has not worked: it may be about to find that it must not use it.
bool ZTCCollector::hasWorked() const {
    const ZTSHistoryState lHistory = mHistory.getState();
    return lHistory.mIsOpen || !lHistory.mProblem.empty();
}

int ZTCCollector::getPollTime(ZTCTime aNow) const {
    ZTCTime lNext = hasWorked() ? mKeeper.getNextLook() : aNow + gcLookPeriod;
    if (mIsReady) {
        lNext = std::min(lNext, mPorts.getNextScan());
    } else if (mNextSpoolTry > aNow) {
        lNext = std::min(lNext, mNextSpoolTry);
    }
    lNext = std::min(lNext, mAgents.getNextStep().value_or(lNext));
    if (mFinishBy) {
        lNext = std::min(lNext, *mFinishBy);
    }
    lNext = std::min(lNext, mControl.getNextDeadline().value_or(lNext));
    const auto lTime = std::chrono::ceil<milliseconds>(lNext - aNow).count();
    return static_cast<int>(std::clamp<long long>(lTime, 0, 60000));
}

void ZTCCollector::poll(ZTCTime aNow) {
    mFds.assign(ZTPD_Count, {.fd = -1, .events = POLLIN, .revents = 0});
    mFds[ZTPD_Keeper].fd = mKeeper.getDescriptor();
    mFds[ZTPD_Keeper].events = mKeeper.getEvents();
    mFds[ZTPD_History].fd = mHistory.getBell().getDescriptor();
    mFds[ZTPD_Response].fd = mAgents.getResponseFifo();
    mFds[ZTPD_AgentBell].fd = mAgents.getBell();
    mFds[ZTPD_Outputs].fd = mOutputs.getBell();
    mFds[ZTPD_Topology].fd = mTopology.getBell().getDescriptor();
    mControl.addTo(mFds);
    const int lCount = ::poll(mFds.data(), static_cast<nfds_t>(mFds.size()), getPollTime(aNow));
    if (lCount < 0 && errno != EINTR) {
        throw ZTCSystemCallEx("cannot wait", errno);  // the keeper starts the next one, later and later
    }
    if (lCount <= 0) {
        return;
    }
    // The bell of the outputs is cleared with what it rings for, at every turn.
    mHistory.getBell().clear();
    mTopology.getBell().clear();
    mAgents.noteResponseEvents(mFds[ZTPD_Response].revents);
    mAgents.noteBellEvents(mFds[ZTPD_AgentBell].revents, std::chrono::steady_clock::now());
}

// ---- the keeper ----

void ZTCCollector::handle(ZTSLinkMessage aMessage, ZTCTime aNow) {
    switch (aMessage.mType) {
        case ZTLM_AgentStarted:
            mRestarts = std::max(mRestarts, aMessage.mRestarts);
            mAgents.noteStarted(std::move(aMessage));
            break;
        case ZTLM_AgentEnded:
            mAgents.noteEnded(aMessage, aNow);
            break;
        case ZTLM_KeeperState:
            mRestarts = std::max(mRestarts, aMessage.mRestarts);
            mKeeperState = std::move(aMessage);
            break;
        case ZTLM_StopAgent:
            mAgents.stop(aMessage.mStart, aNow);
            break;
        case ZTLM_Finish:
            if (!mFinishBy) {
                mFinishBy = aNow + scFinishPatience;
            }
            mAgents.stopAll(aNow);
            break;
        case ZTLM_Reload:
            reload(aMessage, aNow);
            break;
        default:
            logLine("the keeper has sent a message of type " + std::to_string(aMessage.mType) +
                    ", which a collector does not know");
    }
}

void ZTCCollector::reload(const ZTSLinkMessage& acrMessage, ZTCTime aNow) {
    const ZTSSettingsReading lReading = parseSettings(readWhole(acrMessage.mSettings), "settings");
    if (!lReading.isGood()) {
        logLine("the keeper's new settings have errors: the old ones stay");
        return;
    }
    mSettings = lReading.mSettings;
    mHistory.setLimits(sStoreLimits(mSettings));
    mOutputs.setSettings(mSettings);
    mAgents.setSettings(sSessionSettings(mSettings), aNow);
    mPorts.hurry();
}

void ZTCCollector::tellState() {
    const ZTSHistoryState lHistory = mHistory.getState();
    const ZTCAgentSession* const lpSession = mAgents.getSession();
    std::string lText = "no agent runs";
    if (!mSpoolProblem.empty() || !lHistory.mProblem.empty()) {
        lText = "not storing: " + (mSpoolProblem.empty() ? lHistory.mProblem : mSpoolProblem);
    } else if (lpSession != nullptr && !lpSession->getDiskProblem().empty()) {
        lText = "not asking: " + lpSession->getDiskProblem();
    } else if (lpSession != nullptr && lpSession->isStarted() && lpSession->getPage() != nullptr) {
        lText = "collecting from " + std::to_string(lpSession->getPage()->mBoards.size()) + " adapters, " +
                std::to_string(lpSession->countTargets()) + " targets registered";
    } else if (lpSession != nullptr) {
        lText = "waiting for the agent";
    }
    mKeeper.sendText(lText);
}

// ---- agents ----

void ZTCCollector::openSpool(ZTCTime aNow) {
    if (!mHistory.getState().mIsOpen || aNow < mNextSpoolTry) {
        return;  // the history rings when it is open
    }
    try {
        mLeftovers.takeInWaiting(mHistory.getState().mLastFrame);
        mAgents.restoreLosses(mHistory.takeStoredLosses());
        mIsReady = true;
        mSpoolProblem.clear();
    } catch (const ZTCSpoolTroubleEx& lrEx) {
        if (mSpoolProblem != lrEx.what()) {
            logLine(std::string(lrEx.what()) + ": nothing is asked; tried again every second");
        }
        mSpoolProblem = lrEx.what();
        mSpoolErrno = lrEx.getErrno();
        mNextSpoolTry = aNow + scSpoolPause;
    }
}

/// The losses of the last day outlive this process.
void ZTCCollector::storeLosses() {
    if (const std::optional<std::string> lLosses = mAgents.takeNewLosses()) {
        mHistory.setValue(gcLossesValue, *lLosses);
    }
}

/// When it is known which agent runs, and none waits to be emptied: what agents of earlier keepers have left. Looked
/// for again from time to time, since one of them may still have been running.
void ZTCCollector::sweep(ZTCTime aNow) {
    const ZTCAgentSession* const lpSession = mAgents.getSession();
    const bool lIsSessionKnown = lpSession == nullptr || !lpSession->getGeneration().empty();
    if (aNow < mNextSweep || !mKeeperState || mAgents.hasWaiting() || !lIsSessionKnown) {
        return;
    }
    mNextSweep = aNow + scSweepPeriod;
    try {
        if (lpSession == nullptr) {
            mLeftovers.tearParts();
        }
        const bool lIsComplete = mLeftovers.endPages(lpSession != nullptr ? lpSession->getPagePath() : "");
        // Agents are forgotten only where they have left no page.
        if (!mIsSwept && lIsComplete) {
            mHistory.endForgottenAgents(lpSession != nullptr ? lpSession->getGeneration() : "");
            mIsSwept = true;
        }
        mSpoolProblem.clear();
    } catch (const ZTCSpoolTroubleEx& lrEx) {
        mSpoolProblem = lrEx.what();
        mSpoolErrno = lrEx.getErrno();
    } catch (const ZTCClientEx& lrEx) {
        logLine(lrEx.what());
    }
}

void ZTCCollector::noteHistory() {
    for (const ZTSMarkResult& lrMark : mHistory.takeMarkResults()) {
        mControl.answer(lrMark.mTicket, toMarkJson(lrMark));
    }
    for (const ZTSHookTest& lrTest : mOutputs.takeHookTests()) {
        mControl.answer(lrTest.mTicket, lrTest.mAnswer);
    }
}

// ---- the control socket ----

std::optional<std::string> ZTCCollector::serve(std::uint64_t aTicket, const std::string& acrRequest) {
    const ZTSControlRequest lRequest = parseControlRequest(acrRequest);
    switch (lRequest.mKind) {
        case ZTCR_Status:
            return describeState(lRequest.mTime.value_or(ZTCHistoryTime()));
        case ZTCR_Mark:
            mHistory.setMark(aTicket, lRequest.mName, lRequest.mTime.value_or(getHistoryTime()));
            return std::nullopt;
        case ZTCR_WarnTest:
            mControl.allow(aTicket, mOutputs.testHooks(aTicket));
            return std::nullopt;
        case ZTCR_Wrong:
            break;
    }
    return toErrorJson(lRequest.mError);
}

std::string ZTCCollector::describeState(ZTCHistoryTime aLossesSince) {
    const ZTCAgentSession* const lpSession = mAgents.getSession();
    ZTSLiveFacts lFacts;
    lFacts.mNow = getHistoryTime();
    lFacts.mKeeperPid = getppid();
    lFacts.mpKeeperState = mKeeperState ? &*mKeeperState : nullptr;
    lFacts.mCollectorPid = getpid();
    lFacts.mSince = mSince;
    lFacts.mIsAgentRunning = lpSession != nullptr && !lpSession->hasEnded();
    lFacts.mAgentPid = lpSession != nullptr ? lpSession->getPid() : 0;
    lFacts.mRestarts = mRestarts;
    lFacts.mpPage = mAgents.readPage();
    lFacts.mLastAsked = mAgents.getLastAsked();
    lFacts.mSpoolProblem = mSpoolProblem;
    int lErrno = mSpoolErrno;
    if (mSpoolProblem.empty() && lpSession != nullptr) {
        lFacts.mSpoolProblem = lpSession->getDiskProblem();
        lErrno = lpSession->getDiskErrno();
    }
    lFacts.mIsSpoolReadOnly = !lFacts.mSpoolProblem.empty() && lErrno == EROFS;
    lFacts.mHistory = mHistory.getState();
    lFacts.mLosses = mAgents.getLosses(lFacts.mNow, aLossesSince);
    lFacts.mPorts = mPorts.getPorts();
    lFacts.mWarnings = mOutputs.describeWarnings();
    lFacts.mTopology = mTopology.getState();
    return toLiveStateJson(lFacts);
}
