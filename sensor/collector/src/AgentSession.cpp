#include "sensor/collector/include/AgentSession.h"

#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/collector/include/EndedAgent.h"
#include "sensor/collector/include/SpoolRecovery.h"
#include "sensor/link/include/Link.h"

using std::chrono::milliseconds;
using std::chrono::seconds;

/// Between two tries to reach an agent that is starting, and to empty the FIFO of one that is ending.
static constexpr milliseconds scAgentPause{100};
/// An agent makes its page before it serves commands: one without a page after this time has none.
static constexpr seconds scPagePatience{10};
static constexpr seconds scDiskPause{1};
/// Until a start command that failed is sent again.
static constexpr seconds scStartPause{5};
static constexpr std::chrono::hours scNever{24};

ZTCAgentSession::ZTCAgentSession(ZTSAgentStart aStart, ZTCSpool& arSpool, ZTCHistorySink& arHistory,
                                 std::string aDirectory, const ZTSSessionSettings& acrSettings, ZTCTime aNow)
    : mStart(std::move(aStart)),
      mrSpool(arSpool),
      mrHistory(arHistory),
      mSettings(acrSettings),
      mBegin(aNow),
      mBeginTime(getHistoryTime()),
      mTalk(arSpool, std::move(aDirectory)),
      mSchedule(acrSettings.mPeriod, aNow),
      mNextStep(aNow) {}

int ZTCAgentSession::getResponseFifo() const {
    return mIsHungUp || mIsDrained || !mDiskProblem.empty() ? -1 : mTalk.getResponseFifo();
}

void ZTCAgentSession::noteBell(ZTCTime aNow) {
    std::uint64_t lCount = 0;
    [[maybe_unused]] const ssize_t lRead = read(mStart.mBell.get(), &lCount, sizeof(lCount));
    mSchedule.noteBell(aNow);
    scheduleNext(aNow);
}

void ZTCAgentSession::setSettings(const ZTSSessionSettings& acrSettings, ZTCTime aNow) {
    if (acrSettings.mRecordLimit != mSettings.mRecordLimit) {
        mIsStarted = false;  // a further start command sets the new limit
    }
    mSettings = acrSettings;
    mSchedule.setPeriod(mSettings.mPeriod);
    mSchedule.noteBell(aNow);  // look now, and again after the new period
    scheduleNext(aNow);
}

void ZTCAgentSession::offerTargets(const std::vector<ZTSTargetPort>& acrTargets, ZTCTime aNow) {
    mTargets.offer(acrTargets);
    if (mTargets.hasMore()) {
        scheduleNext(aNow);
    }
}

void ZTCAgentSession::requestStop(ZTCTime aNow, milliseconds aPatience) {
    if (mStop == ZTSTP_None) {
        mStop = ZTSTP_Command;
    }
    mStopGivesUp = aNow + aPatience;
    scheduleNext(aNow);
}

void ZTCAgentSession::noteEnded(int aWaitStatus, ZTCTime aNow) {
    mHasEnded = true;
    mWaitStatus = aWaitStatus;
    scheduleNext(aNow);
}

void ZTCAgentSession::noteTrouble(const ZTCSpoolTroubleEx& acrEx, ZTCTime aNow) {
    if (mDiskProblem.empty()) {
        mEvents.mLines.push_back(std::string(acrEx.what()) +
                                 ": the agent is not asked and goes on holding; tried again every second");
    }
    mDiskProblem = acrEx.what();
    mDiskErrno = acrEx.getErrno();
    mLastByte = aNow;  // the agent is not to blame
    mNotBefore = aNow + scDiskPause;
    mSchedule.notePostponed(aNow);
    scheduleNext(mNotBefore);
}

void ZTCAgentSession::noteNoTrouble() {
    if (!mDiskProblem.empty()) {
        mEvents.mLines.emplace_back("there is room in " + mrSpool.getFolder() + " again: collecting goes on");
        mDiskProblem.clear();
        mDiskErrno = 0;
    }
}

void ZTCAgentSession::readPage() {
    auto lpPage = std::make_shared<ZTSStatusSnapshot>();
    if (mHasPage && mPageReader.read(*lpPage)) {
        mpPage = std::move(lpPage);
    } else {
        mpPage = nullptr;
    }
}

/// False: not yet.
bool ZTCAgentSession::attach(ZTCTime aNow) {
    if (mTalk.isAttached()) {
        return true;
    }
    mHasPage = mPageReader.isOpen() || mPageReader.open(mStart.mPagePath);
    if (!mHasPage && !mHasEnded && aNow < mBegin + scPagePatience) {
        scheduleNext(aNow + scAgentPause);
        return false;
    }
    readPage();
    if (mpPage == nullptr && !mPageReader.hasLooked()) {
        // Without its page nobody can say what the agent has lost.
        if (!std::exchange(mHasToldPage, true)) {
            mEvents.mLines.push_back(mPageReader.getReason() + ": the agent is not asked; tried again every second");
        }
        scheduleNext(aNow + scDiskPause);
        return false;
    }
    std::string lGeneration;
    if (mpPage != nullptr) {
        lGeneration = mpPage->mStartId;
    } else {
        mEvents.mLines.push_back("the agent has no status page: " + mPageReader.getReason());
        char lText[2 * gcMaxGenerationDigits];
        std::snprintf(lText, sizeof(lText), "%08x%08llx%016llx", static_cast<unsigned>(mStart.mPid),
                      static_cast<unsigned long long>(mStart.mStart),
                      static_cast<unsigned long long>(toMicroseconds(getHistoryTime())));
        lGeneration = lText;
        mHasPage = false;
    }
    const std::vector<ZTSSpoolEntry> lEntries = mrSpool.list();
    const ZTSSpoolPlan lPlan = planSpoolRecovery(lEntries, lGeneration);
    for (const ZTSSpoolEntry& lrEntry : lPlan.mTear) {
        ZTSSpoolPart lPart = mrSpool.openPart(lrEntry.mName);
        const ZTSSpoolName lName = mrSpool.tear(lPart);
        if (lName.mState == ZTSPS_Torn) {
            mrHistory.takeIn({lName, lrEntry.mSize}, nullptr);
        }
    }
    mrSpool.raiseNumber(lPlan.mNextNumber);
    std::optional<ZTSSpoolName> lPart;
    if (lPlan.mResume) {
        lPart = lPlan.mResume->mName;
    }
    mTalk.attach(std::move(mStart.mResponseFifo), lGeneration, lPart);
    mLastByte = aNow;
    return true;
}

void ZTCAgentSession::step(ZTCTime aNow) {
    mNextStep = aNow + scNever;
    mIsHungUp = false;
    if (mIsDrained) {
        return;
    }
    try {
        if (!attach(aNow)) {
            return;
        }
        if (mHasEnded) {
            drain(aNow);
            return;
        }
        receive(aNow);
        watchSilence(aNow);
        if (aNow < mNotBefore) {
            scheduleNext(mNotBefore);
        } else {
            decide(aNow);
        }
    } catch (const ZTCSpoolTroubleEx& lrEx) {
        noteTrouble(lrEx, aNow);
    }
}

void ZTCAgentSession::receive(ZTCTime aNow) {
    ZTSProgress lProgress;
    try {
        mTalk.advance(lProgress);
    } catch (const ZTCSpoolTroubleEx&) {
        settle(lProgress, aNow);
        throw;
    }
    if (lProgress.mMoved != 0) {
        noteNoTrouble();
    }
    settle(lProgress, aNow);
}

void ZTCAgentSession::settle(const ZTSProgress& acrProgress, ZTCTime aNow) {
    if (acrProgress.mMoved != 0) {
        mLastByte = aNow;
    }
    if (!acrProgress.mSpooled.empty()) {
        readPage();
    }
    for (const ZTSSpoolEntry& lrEntry : acrProgress.mSpooled) {
        ++mEvents.mFrames;
        mrHistory.takeIn(lrEntry, mpPage);
    }
    for (const ZTSRequestAnswer& lrAnswer : acrProgress.mAnswers) {
        settleAnswer(lrAnswer, aNow);
    }
}

void ZTCAgentSession::settleAnswer(const ZTSRequestAnswer& acrAnswer, ZTCTime aNow) {
    const bool lIsRefused = acrAnswer.mOutcome == ZTRO_Failed && acrAnswer.mRequest != ZTRQ_Marker;
    if (lIsRefused) {
        mEvents.mLines.push_back("the agent answered \"" + std::string(getRequestName(acrAnswer.mRequest)) +
                                 "\" with status " + std::to_string(acrAnswer.mStatus));
    }
    switch (acrAnswer.mRequest) {
        case ZTRQ_Start:
            // Refused as not allowed: some kind could not be registered, the others were. The page says which.
            mIsStarted = !lIsRefused || acrAnswer.mStatus == ZTSAPS_NotAllowed;
            mEvents.mIsStartAnswered = mIsStarted;
            if (mIsStarted) {
                mSchedule.noteStart(aNow);
            } else {
                mNotBefore = aNow + scStartPause;
            }
            break;
        case ZTRQ_Get:
            mSchedule.noteAnswer(aNow);
            break;
        case ZTRQ_RegisterTargets:
            mTargets.noteRegistered(mOffered);
            break;
        case ZTRQ_Stop:
            mStop = ZTSTP_Getting;
            break;
        case ZTRQ_ShutDown:
            mStop = ZTSTP_Done;
            break;
        case ZTRQ_Marker:
        case ZTRQ_Unknown:
            break;
    }
}

void ZTCAgentSession::watchSilence(ZTCTime aNow) {
    if (!mTalk.getRequest()) {
        return;
    }
    if (aNow - mLastByte >= gcSilenceLimit) {
        mEvents.mLines.push_back("the agent (process " + std::to_string(mStart.mPid) +
                                 ") has sent no byte of its answer to \"" + getRequestName(*mTalk.getRequest()) +
                                 "\" for " + std::to_string(gcSilenceLimit.count()) + " s");
        mEvents.mIsSilent = true;
        mLastByte = aNow;
    }
    scheduleNext(mLastByte + gcSilenceLimit);
}

/// Returns whether it was sent.
bool ZTCAgentSession::send(ZTERequest aRequest, const ZTCWireBytes& acrBody, ZTCTime aNow) {
    try {
        if (mTalk.request(aRequest, acrBody) == ZTSND_Sent) {
            noteNoTrouble();
            mLastByte = aNow;
            scheduleNext(aNow + gcSilenceLimit);
            return true;
        }
    } catch (const ZTCSpoolTroubleEx&) {
        throw;
    } catch (const ZTCClientEx& lrEx) {
        mEvents.mLines.emplace_back(lrEx.what());
        mNotBefore = aNow + scDiskPause;
    }
    mNotBefore = std::max(mNotBefore, aNow + scAgentPause);
    scheduleNext(mNotBefore);
    return false;
}

void ZTCAgentSession::decide(ZTCTime aNow) {
    if (mTalk.needsMarker()) {
        send(ZTRQ_Marker, encodeCollectionPeriod(0), aNow);
        return;
    }
    if (!mTalk.isIdle()) {
        return;
    }
    if (mStop != ZTSTP_None) {
        decideStop(aNow);
    } else if (mTargets.hasMore()) {
        const std::vector<ZTSTargetPort> lNext = mTargets.getNext(gcMaxTargetsPerSpooledRequest);
        mOffered = lNext.size();
        send(ZTRQ_RegisterTargets, encodeRegisterTargets(lNext), aNow);
    } else if (!mIsStarted) {
        send(ZTRQ_Start, encodeStartScope(mSettings.mRecordLimit), aNow);
    } else if (mSchedule.isDue(aNow)) {
        look(aNow);
    }
    if (mIsStarted && mStop == ZTSTP_None) {
        scheduleNext(std::max(aNow, mSchedule.getNextLook()));
    }
}

void ZTCAgentSession::look(ZTCTime aNow) {
    readPage();
    if (mpPage != nullptr) {
        mrHistory.notePage(mpPage);
    }
    ++mEvents.mLooks;
    std::optional<bool> lIsHolding;
    if (mpPage != nullptr) {
        lIsHolding = mpPage->mHeldRecords != 0 || mpPage->getHeld() != 0;
    }
    if (!mSchedule.look(aNow, lIsHolding)) {
        return;
    }
    if (send(ZTRQ_Get, encodeGetScopeData(), aNow)) {
        mLastAsked = getHistoryTime();
    } else {
        mSchedule.notePostponed(aNow);
    }
}

void ZTCAgentSession::decideStop(ZTCTime aNow) {
    if (!mDiskProblem.empty() && aNow >= mStopGivesUp && mStop < ZTSTP_ShutDown) {
        mEvents.mLines.emplace_back("there is still no room: what the agent holds is given up, and counted in a gap");
        mStop = ZTSTP_ShutDown;
    }
    if (mStop == ZTSTP_Command) {
        send(ZTRQ_Stop, encodeStop(), aNow);
        return;
    }
    if (mStop == ZTSTP_Getting) {
        readPage();
        const bool lIsHolding = mpPage != nullptr ? mpPage->mHeldRecords != 0 || mpPage->getHeld() != 0 : !mLastAsked;
        if (lIsHolding && send(ZTRQ_Get, encodeGetScopeData(), aNow)) {
            mLastAsked = getHistoryTime();
        }
        if (lIsHolding) {
            return;
        }
        mStop = ZTSTP_ShutDown;
    }
    if (mStop == ZTSTP_ShutDown) {
        send(ZTRQ_ShutDown, encodeShutDown(), aNow);
    }
}

void ZTCAgentSession::drain(ZTCTime aNow) {
    ZTSProgress lProgress;
    bool lIsAtEnd = false;
    try {
        lIsAtEnd = mTalk.drain(lProgress);
    } catch (const ZTCSpoolTroubleEx&) {
        settle(lProgress, aNow);
        throw;
    }
    noteNoTrouble();
    settle(lProgress, aNow);
    if (lIsAtEnd) {
        end();
    } else {
        scheduleNext(aNow + scAgentPause);
    }
}

void ZTCAgentSession::end() {
    const ZTCPagePointer lpLast = mpPage;
    readPage();
    mpPage = mpPage != nullptr ? mpPage : lpLast;
    ZTSEndedAgent lAgent;
    lAgent.mGeneration = mTalk.getGeneration();
    lAgent.mPagePath = mStart.mPagePath;
    lAgent.mpPage = mpPage;
    lAgent.mFrom = mLastAsked.value_or(mBeginTime);
    lAgent.mTo = getHistoryTime();
    if (mpPage != nullptr) {
        lAgent = describeEndedAgent(mpPage, mStart.mPagePath);
    } else {
        // One that was never told to collect has lost nothing, and neither has one that was shut down in order.
        lAgent.mIsVanished = mIsStarted && mStop != ZTSTP_Done;
        lAgent.mReason = "the agent ended and left no page";
    }
    if (WIFSIGNALED(mWaitStatus)) {
        lAgent.mReason = "the agent was killed by signal " + std::to_string(WTERMSIG(mWaitStatus));
        lAgent.mIsVanished = true;
    }
    mrHistory.endAgent(std::move(lAgent));
    mIsDrained = true;
}
