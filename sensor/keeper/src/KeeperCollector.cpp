/// The keeper's side of the collector: starting it, telling it everything, listening to it.
#include <sys/wait.h>

#include <algorithm>

#include "sensor/keeper/include/Keeper.h"
#include "sensor/keeper/src/KeeperTexts.h"

using std::chrono::seconds;

/// A collector that migrates a large history needs its time before its first look.
static constexpr seconds scFirstLookLimit{600};
/// The exit status of a collector for which another try would change nothing.
static constexpr int scRefusedStatus = 2;
/// How long an agent that was shut down may take to end before it gets SIGTERM.
static constexpr seconds scAlonePause{5};

void ZTCKeeper::startCollector(ZTCTime aNow) {
    mCollectorStartAt.reset();
    if (!mrWorld.startCollector()) {
        mCollectorStartAt = aNow + mCollectorBackOff.take();
        return;
    }
    mCollector.emplace();
    mCollector->mStillUntil = aNow + scFirstLookLimit;
    greetCollector(aNow);
}

void ZTCKeeper::greetCollector(ZTCTime aNow) {
    for (const ZTSEndedAgent& lcrEnded : mEndedAgents) {
        send(aNow, lcrEnded.mStarted);
        send(aNow, lcrEnded.mEnded);
    }
    if (mAgent) {
        send(aNow, mAgent->mStarted);
        if (mAgent->mIsReplaced) {
            ZTSLinkMessage lMessage;
            lMessage.mType = ZTLM_StopAgent;
            lMessage.mStart = mAgent->mStarted.mStart;
            send(aNow, lMessage);
        }
    }
    send(aNow, describeState(aNow));
    if (mIsStopping) {
        ZTSLinkMessage lFinish;
        lFinish.mType = ZTLM_Finish;
        send(aNow, lFinish);
    }
}

void ZTCKeeper::send(ZTCTime aNow, const ZTSLinkMessage& acrMessage) {
    if (!mCollector || mCollector->mEnding.mIsAsked) {
        return;  // the next collector is told everything anew
    }
    mCollector->mIsFinishing = mCollector->mIsFinishing || acrMessage.mType == ZTLM_Finish;
    if (mrWorld.send(acrMessage) == ZTLR_NotNow) {
        askToEnd(aNow, ZTWP_Collector, mCollector->mEnding, ZTKR_CollectorStill, "it hangs: it reads no messages");
    }
}

void ZTCKeeper::handleCollectorEnd(ZTCTime aNow, int aWaitStatus) {
    if (!mCollector) {
        return;
    }
    const bool lHasWorked = mCollector->mHasWorked;
    const bool lIsInOrder = mCollector->mIsFinishing && WIFEXITED(aWaitStatus) && WEXITSTATUS(aWaitStatus) == 0;
    const bool lIsRefused = WIFEXITED(aWaitStatus) && WEXITSTATUS(aWaitStatus) == scRefusedStatus;
    mCollector.reset();
    mAloneAt = aNow + scAlonePause;
    forgetDrained();
    if (lIsRefused && !mIsReady && !mIsRefused) {
        stopRefused(aNow);
    } else if (mIsStopping) {
        if (!lIsInOrder && aNow - mStoppedAt < gcStopLastCollector) {
            mrWorld.say("collector: ended during the stop: " + endText(aWaitStatus) + "; started once more");
            mCollectorStartAt = aNow + (lHasWorked ? seconds(0) : mCollectorBackOff.take());
        } else if (!lIsInOrder) {
            mrWorld.say("collector: ended during the stop: " + endText(aWaitStatus) +
                        "; what is in the spool is taken in at the next start");
            mHasForced = true;
        }
    } else {
        const ZTEKeeperRule lRule = lHasWorked ? ZTKR_CollectorWorked : ZTKR_CollectorFailed;
        if (lHasWorked) {
            mCollectorBackOff.reset();
        }
        const seconds lPause = lHasWorked ? keeperRule(lRule).mFirst : mCollectorBackOff.take();
        mrWorld.say("collector: ended: " + endText(aWaitStatus) + "; the next one is started " + pauseText(lPause));
        mCollectorStartAt = aNow + lPause;
    }
    handleTime(aNow);
}

/// No agent has been told to collect: there is nothing to take in.
void ZTCKeeper::stopRefused(ZTCTime aNow) {
    mrWorld.say(
        "collector: ended: status 2: the history or the settings cannot be used, as its last line says; this sensor "
        "ends");
    mIsRefused = true;
    mIsStopping = true;
    mStoppedAt = aNow;
    mAloneAt = aNow;
    mAgentStartAt.reset();
    mCollectorStartAt.reset();
    mrWorld.notify("STOPPING=1");
}

void ZTCKeeper::handleBrokenLink(ZTCTime aNow, const std::string& acrWhy) {
    if (mCollector) {
        askToEnd(aNow, ZTWP_Collector, mCollector->mEnding, ZTKR_CollectorStill, acrWhy);
    }
    handleTime(aNow);
}

void ZTCKeeper::handleMessage(ZTCTime aNow, const ZTSLinkMessage& acrMessage) {
    const bool lIsAgent = mAgent && mAgent->mStarted.mStart == acrMessage.mStart;
    switch (acrMessage.mType) {
        case ZTLM_Look:
            if (mCollector) {
                mCollector->mHasWorked = true;
                mCollector->mStillUntil = aNow + keeperRule(ZTKR_CollectorStill).mFirst;
                mCollectorBackOff.reset();
            }
            if (!mIsReady) {
                mIsReady = true;
                mrWorld.notify("READY=1");
            }
            mrWorld.notify("WATCHDOG=1");
            break;
        case ZTLM_StartAnswered:
            if (lIsAgent) {
                mAgent->mHasWorked = true;
                mIsNothingToWatch = false;
                mAgentBackOff.reset();
            }
            break;
        case ZTLM_Silent:
            if (lIsAgent) {
                askToEnd(aNow, ZTWP_Agent, mAgent->mEnding, ZTKR_AgentSilent,
                         "it hangs: the collector has waited 60 s for a byte of an answer");
            }
            break;
        case ZTLM_Drained:
            std::erase_if(mEndedAgents,
                          [&](const ZTSEndedAgent& acrEnded) { return acrEnded.mStarted.mStart == acrMessage.mStart; });
            break;
        case ZTLM_Text:
            mText = acrMessage.mText;
            std::replace_if(
                mText.begin(), mText.end(), [](char aByte) { return static_cast<unsigned char>(aByte) < ' '; }, ' ');
            mrWorld.notify("STATUS=" + mText);
            break;
        default:
            handleBrokenLink(aNow, "it sent a message that only a keeper may send");
            return;
    }
    handleTime(aNow);
}

/// Without a collector nobody drains. Ended agents are kept for the next one only if bytes are left in their FIFO.
void ZTCKeeper::forgetDrained() {
    if (!mCollector) {
        std::erase_if(mEndedAgents,
                      [&](const ZTSEndedAgent& acrEnded) { return mrWorld.isEmpty(acrEnded.mStarted.mResponseFifo); });
    }
}

ZTSLinkMessage ZTCKeeper::describeState(ZTCTime aNow) const {
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_KeeperState;
    lMessage.mState = mIsStopping         ? ZTKS_Stopping
                      : mAgent            ? (mAgent->mHasWorked ? ZTKS_Running : ZTKS_Starting)
                      : mIsNothingToWatch ? ZTKS_WaitingForAdapters
                                          : ZTKS_WaitingToRestart;
    lMessage.mSince = mStateSince;
    lMessage.mRestarts = mStarts > 0 ? mStarts - 1 : 0;
    if (mAgentStartAt) {
        const auto lLeft = std::chrono::ceil<seconds>(*mAgentStartAt - aNow);
        lMessage.mNextStart = mrWorld.getWallClock() + std::max<std::int64_t>(lLeft.count(), 0);
    }
    if (!mAgent && !mIsStopping) {
        lMessage.mText = mWhy;
    }
    return lMessage;
}

void ZTCKeeper::publishState(ZTCTime aNow) {
    ZTSLinkMessage lState = describeState(aNow);
    const bool lIsSame = lState.mState == mState.mState && lState.mText == mState.mText &&
                         lState.mRestarts == mState.mRestarts && mState.mType == ZTLM_KeeperState &&
                         (lState.mNextStart == 0) == (mState.mNextStart == 0);
    if (lIsSame) {
        return;
    }
    if (lState.mState != mState.mState) {
        mStateSince = mrWorld.getWallClock();
        lState.mSince = mStateSince;
    }
    mState = std::move(lState);
    send(aNow, mState);
    if (mState.mState != ZTKS_Running || mText.empty()) {
        mrWorld.notify(std::string("STATUS=") + keeperStateName(mState.mState) +
                       (mState.mText.empty() ? "" : ": " + mState.mText));
    }
}
