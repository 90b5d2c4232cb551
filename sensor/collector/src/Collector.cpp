#include "sensor/collector/include/Collector.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>

#include "sensor/collector/include/CollectorLog.h"

using std::chrono::milliseconds;
using std::chrono::seconds;

static constexpr seconds scSpoolPause{1};
/// Between two looks at the ports in sysfs and in the targets' file.
static constexpr seconds scScanPeriod{10};
/// Between two descriptions of the live state for the outlets.
static constexpr seconds scLivePause{1};
/// Of an orderly end: how long a full disk may hold up the agent's shut-down, when the agent is given up, and how long
/// the history may take after that. Together less than gcFinishLimit.
static constexpr seconds scStopPatience{8};
static constexpr seconds scFinishPatience{14};
static constexpr seconds scHistoryPatience{4};
static_assert(scFinishPatience + scHistoryPatience < gcFinishLimit);

static std::string sSysfsRoot() {
    const char* const lpRoot = std::getenv(gcSysfsVariable);
    return lpRoot != nullptr && *lpRoot != '\0' ? lpRoot : "/sys";
}

static std::string sHostName() {
    std::array<char, 256> lName{};
    return gethostname(lName.data(), lName.size() - 1) == 0 ? lName.data() : "unknown";
}

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
      mAgentDirectory(mInheritance.mDirectory + "/agent"),
      mSysfsRoot(sSysfsRoot()),
      mSince(getHistoryTime()),
      mKeeper(std::move(mInheritance.mLink)),
      mSpool(mInheritance.mState + "/spool"),
      mHistory(mSpool, mInheritance.mState, sStoreLimits(acrSettings),
               [](const std::string& acrLine) { logLine(acrLine); }),
      mLeftovers(mAgentDirectory, mSpool, mHistory, [](const std::string& acrLine) { logLine(acrLine); }),
      mControl(std::move(mInheritance.mControl),
               [this](std::uint64_t aTicket, const std::string& acrRequest) { return serve(aTicket, acrRequest); }),
      mpPorts(std::make_shared<ZTSTopology>()),
      mLosses(mSince) {}

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
    if (aNow >= *mFinishBy && (mpSession != nullptr || !mWaiting.empty())) {
        logLine("the agent has not ended in time: ending without it");
        return true;
    }
    return mpSession == nullptr && mWaiting.empty() && mKeeper.isFlushed();
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
        scanPorts(aNow);
        do {
            beginNextSession(aNow);
            runSession(aNow);
        } while (mpSession == nullptr && !mWaiting.empty());
        sweep(aNow);
    }
    mControl.serve(aNow);
    tellState();
    feedOutlets(aNow);
    if (aNow >= mKeeper.getNextLook()) {
        mKeeper.sendLook(aNow);
    }
    mKeeper.flush();
}

int ZTCCollector::getPollTime(ZTCTime aNow) const {
    ZTCTime lNext = mKeeper.getNextLook();
    if (mIsReady) {
        lNext = std::min(lNext, mNextScan);
    } else if (mNextSpoolTry > aNow) {
        lNext = std::min(lNext, mNextSpoolTry);
    }
    if (mpSession != nullptr) {
        lNext = std::min(lNext, mpSession->getNextStep());
    }
    if (mFinishBy) {
        lNext = std::min(lNext, *mFinishBy);
    }
    lNext = std::min(lNext, mControl.getNextDeadline().value_or(lNext));
    const auto lTime = std::chrono::ceil<milliseconds>(lNext - aNow).count();
    return static_cast<int>(std::clamp<long long>(lTime, 0, 60000));
}

void ZTCCollector::poll(ZTCTime aNow) {
    mFds.clear();
    mFds.push_back({.fd = mKeeper.getDescriptor(), .events = mKeeper.getEvents(), .revents = 0});
    mFds.push_back({.fd = mHistory.getBell(), .events = POLLIN, .revents = 0});
    mFds.push_back({.fd = mpSession != nullptr ? mpSession->getResponseFifo() : -1, .events = POLLIN, .revents = 0});
    mFds.push_back({.fd = mpSession != nullptr ? mpSession->getBell() : -1, .events = POLLIN, .revents = 0});
    mControl.addTo(mFds);
    if (::poll(mFds.data(), static_cast<nfds_t>(mFds.size()), getPollTime(aNow)) <= 0) {
        return;
    }
    if (mFds[1].revents != 0) {
        std::uint64_t lCount = 0;
        [[maybe_unused]] const ssize_t lRead = read(mHistory.getBell(), &lCount, sizeof(lCount));
    }
    if (mpSession == nullptr) {
        return;
    }
    const ZTCTime lNow = std::chrono::steady_clock::now();
    if (mFds[3].revents != 0) {
        mpSession->noteBell(lNow);
    }
    if ((mFds[2].revents & POLLIN) != 0) {
        mIsSessionDue = true;
    } else if (mFds[2].revents != 0) {
        mpSession->noteHangUp();
    }
}

// ---- the keeper ----

void ZTCCollector::handle(ZTSLinkMessage aMessage, ZTCTime aNow) {
    switch (aMessage.mType) {
        case ZTLM_AgentStarted:
            noteAgentStarted(std::move(aMessage));
            break;
        case ZTLM_AgentEnded:
            noteAgentEnded(aMessage, aNow);
            break;
        case ZTLM_KeeperState:
            mRestarts = std::max(mRestarts, aMessage.mRestarts);
            mKeeperState = std::move(aMessage);
            break;
        case ZTLM_StopAgent:
            if (mpSession != nullptr && mpSession->getStart() == aMessage.mStart) {
                mpSession->requestStop(aNow, scStopPatience);
            }
            break;
        case ZTLM_Finish:
            if (!mFinishBy) {
                mFinishBy = aNow + scFinishPatience;
            }
            if (mpSession != nullptr) {
                mpSession->requestStop(aNow, scStopPatience);
            }
            break;
        case ZTLM_Reload:
            reload(aMessage, aNow);
            break;
        default:
            logLine("the keeper has sent a message of type " + std::to_string(aMessage.mType) +
                    ", which a collector does not know");
    }
}

void ZTCCollector::noteAgentStarted(ZTSLinkMessage aMessage) {
    mRestarts = std::max(mRestarts, aMessage.mRestarts);
    const auto lIsKnown = [&](const ZTSWaitingAgent& acrAgent) { return acrAgent.mStart.mStart == aMessage.mStart; };
    if ((mpSession != nullptr && mpSession->getStart() == aMessage.mStart) || std::ranges::any_of(mWaiting, lIsKnown)) {
        return;
    }
    // A large response then needs few turns of agent and collector. The FIFO works with its own size, too.
    fcntl(aMessage.mResponseFifo.get(), F_SETPIPE_SZ, 1 << 20);
    ZTSWaitingAgent lAgent;
    lAgent.mStart.mStart = aMessage.mStart;
    lAgent.mStart.mPid = aMessage.mPid;
    lAgent.mStart.mPagePath = std::move(aMessage.mText);
    lAgent.mStart.mResponseFifo = std::move(aMessage.mResponseFifo);
    lAgent.mStart.mBell = std::move(aMessage.mBell);
    mWaiting.push_back(std::move(lAgent));
}

void ZTCCollector::noteAgentEnded(const ZTSLinkMessage& acrMessage, ZTCTime aNow) {
    if (mpSession != nullptr && mpSession->getStart() == acrMessage.mStart) {
        mpSession->noteEnded(acrMessage.mWaitStatus, aNow);
    }
    for (ZTSWaitingAgent& lrAgent : mWaiting) {
        if (lrAgent.mStart.mStart == acrMessage.mStart) {
            lrAgent.mWaitStatus = acrMessage.mWaitStatus;
        }
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
    if (mpOutlets != nullptr) {
        mpOutlets->setSettings(mSettings);
    }
    if (mpSession != nullptr) {
        mpSession->setSettings(sSessionSettings(mSettings), aNow);
    }
    mNextScan = aNow;
}

void ZTCCollector::tellState() {
    const ZTSHistoryState lHistory = mHistory.getState();
    std::string lText = "no agent runs";
    if (!mSpoolProblem.empty() || !lHistory.mProblem.empty()) {
        lText = "not storing: " + (mSpoolProblem.empty() ? lHistory.mProblem : mSpoolProblem);
    } else if (mpSession != nullptr && !mpSession->getDiskProblem().empty()) {
        lText = "not asking: " + mpSession->getDiskProblem();
    } else if (mpSession != nullptr && mpSession->isStarted() && mpSession->getPage() != nullptr) {
        lText = "collecting from " + std::to_string(mpSession->getPage()->mBoards.size()) + " adapters, " +
                std::to_string(mpSession->countTargets()) + " targets registered";
    } else if (mpSession != nullptr) {
        lText = "waiting for the agent";
    }
    mKeeper.sendText(lText);
}

/// What the outlets show is at most a second older than the last thing that happened.
void ZTCCollector::feedOutlets(ZTCTime aNow) {
    if (!mHistory.getState().mIsOpen) {
        return;
    }
    if (mpOutlets == nullptr) {
        // Not before: a reader that opens the database while the disk is read-only makes it read-only for the writer in
        // the same process, too.
        mpOutlets = std::make_unique<ZTCOutlets>(
            ZTSOutletsSetup{.mStateDirectory = mInheritance.mState,
                            .mHost = sHostName(),
                            .mVersion = TAVIK_VERSION,
                            .mSetValue = [this](const std::string& acrName,
                                                const std::string& acrValue) { mHistory.setValue(acrName, acrValue); },
                            .mReport = [](const std::string& acrLine) { logLine(acrLine); }},
            mSettings);
    }
    if (aNow - mLastLive >= scLivePause) {
        mLastLive = aNow;
        mpOutlets->setLive(describeState());
        mpOutlets->wake();
    }
}

// ---- agents ----

void ZTCCollector::openSpool(ZTCTime aNow) {
    if (!mHistory.getState().mIsOpen || aNow < mNextSpoolTry) {
        return;  // the history rings when it is open
    }
    try {
        mLeftovers.takeInWaiting(mHistory.getState().mLastFrame);
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

void ZTCCollector::beginNextSession(ZTCTime aNow) {
    if (mpSession != nullptr || mWaiting.empty()) {
        return;
    }
    ZTSWaitingAgent lAgent = std::move(mWaiting.front());
    mWaiting.pop_front();
    mpSession = std::make_unique<ZTCAgentSession>(std::move(lAgent.mStart), mSpool, mHistory, mAgentDirectory,
                                                  sSessionSettings(mSettings), aNow);
    mpSession->offerTargets(mTargets, aNow);
    if (lAgent.mWaitStatus) {
        mpSession->noteEnded(*lAgent.mWaitStatus, aNow);
    } else if (mFinishBy) {
        mpSession->requestStop(aNow, scStopPatience);
    }
    mIsSessionDue = true;
}

void ZTCCollector::runSession(ZTCTime aNow) {
    if (mpSession == nullptr || (!mIsSessionDue && aNow < mpSession->getNextStep())) {
        return;
    }
    mIsSessionDue = false;
    mpSession->step(aNow);
    const ZTSSessionEvents lEvents = mpSession->takeEvents();
    for (const std::string& lrLine : lEvents.mLines) {
        logLine(lrLine);
    }
    if (mpSession->getPage() != nullptr) {
        if (mpLastPage != mpSession->getPage()) {
            mLosses.note(*mpSession->getPage(), getHistoryTime());
        }
        mpLastPage = mpSession->getPage();
    }
    mLastAsked = mpSession->getLastAsked() ? mpSession->getLastAsked() : mLastAsked;
    if (lEvents.mIsStartAnswered) {
        mKeeper.send(ZTLM_StartAnswered, mpSession->getStart());
    }
    if (lEvents.mIsSilent) {
        mKeeper.send(ZTLM_Silent, mpSession->getStart());
    }
    if (lEvents.mLooks != 0 || lEvents.mFrames != 0) {
        mKeeper.sendLook(aNow);
    }
    if (mpSession->isDrained()) {
        mKeeper.send(ZTLM_Drained, mpSession->getStart());
        mpSession.reset();
    }
}

/// When it is known which agent runs, and none waits to be emptied: what agents of earlier keepers have left. Looked
/// for again from time to time, since one of them may still have been running.
void ZTCCollector::sweep(ZTCTime aNow) {
    const bool lIsSessionKnown = mpSession == nullptr || !mpSession->getGeneration().empty();
    if (aNow < mNextSweep || !mKeeperState || !mWaiting.empty() || !lIsSessionKnown) {
        return;
    }
    mNextSweep = aNow + scScanPeriod;
    try {
        if (mpSession == nullptr) {
            mLeftovers.tearParts();
        }
        mLeftovers.endPages(mpSession != nullptr ? mpSession->getPagePath() : "");
        if (!mIsSwept) {
            mHistory.endForgottenAgents(mpSession != nullptr ? mpSession->getGeneration() : "");
        }
        mIsSwept = true;
        mSpoolProblem.clear();
    } catch (const ZTCSpoolTroubleEx& lrEx) {
        mSpoolProblem = lrEx.what();
        mSpoolErrno = lrEx.getErrno();
    } catch (const ZTCClientEx& lrEx) {
        logLine(lrEx.what());
    }
}

void ZTCCollector::scanPorts(ZTCTime aNow) {
    if (aNow < mNextScan) {
        return;
    }
    mNextScan = aNow + scScanPeriod;
    auto lpPorts = std::make_shared<ZTSTopology>(::scanPorts(mSysfsRoot, mPortReader));
    if (*lpPorts != *mpPorts) {
        mpPorts = lpPorts;
        mHistory.notePorts(lpPorts);
    }
    mTargets = mSettings.mTargetsSysfs ? toTargets(*lpPorts) : std::vector<ZTSTargetPort>();
    try {
        std::ranges::copy(readTargetFile(mSettings.mTargetsFile), std::back_inserter(mTargets));
        mTargetFileProblem.clear();
    } catch (const ZTCBadInputEx& lrEx) {
        if (mTargetFileProblem != lrEx.what()) {
            mTargetFileProblem = lrEx.what();
            logLine(mTargetFileProblem + ": its targets are not registered");
        }
    }
    if (mpSession != nullptr) {
        mpSession->offerTargets(mTargets, aNow);
    }
}

void ZTCCollector::noteHistory() {
    for (const ZTSMarkResult& lrMark : mHistory.takeMarkResults()) {
        mControl.answer(lrMark.mTicket, toMarkJson(lrMark));
    }
}

// ---- the control socket ----

std::optional<std::string> ZTCCollector::serve(std::uint64_t aTicket, const std::string& acrRequest) {
    const ZTSControlRequest lRequest = parseControlRequest(acrRequest);
    switch (lRequest.mKind) {
        case ZTCR_Status:
            return describeState();
        case ZTCR_Mark:
            mHistory.setMark(aTicket, lRequest.mName, getHistoryTime());
            return std::nullopt;
        case ZTCR_Wrong:
            break;
    }
    return toErrorJson(lRequest.mError);
}

std::string ZTCCollector::describeState() {
    ZTSLiveFacts lFacts;
    lFacts.mNow = getHistoryTime();
    lFacts.mKeeperPid = getppid();
    lFacts.mpKeeperState = mKeeperState ? &*mKeeperState : nullptr;
    lFacts.mCollectorPid = getpid();
    lFacts.mSince = mSince;
    lFacts.mIsAgentRunning = mpSession != nullptr && !mpSession->hasEnded();
    lFacts.mAgentPid = mpSession != nullptr ? mpSession->getPid() : 0;
    lFacts.mRestarts = mRestarts;
    lFacts.mpPage = mpSession != nullptr ? mpSession->readPageNow() : mpLastPage;
    lFacts.mLastAsked = mLastAsked;
    lFacts.mSpoolProblem = mSpoolProblem;
    int lErrno = mSpoolErrno;
    if (mSpoolProblem.empty() && mpSession != nullptr) {
        lFacts.mSpoolProblem = mpSession->getDiskProblem();
        lErrno = mpSession->getDiskErrno();
    }
    lFacts.mIsSpoolReadOnly = !lFacts.mSpoolProblem.empty() && lErrno == EROFS;
    lFacts.mHistory = mHistory.getState();
    lFacts.mLosses = mLosses.get(lFacts.mNow);
    lFacts.mPorts = *mpPorts;
    return toLiveStateJson(lFacts);
}
