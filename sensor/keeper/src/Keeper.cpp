#include "sensor/keeper/include/Keeper.h"

#include <algorithm>
#include <csignal>

#include "sensor/keeper/src/KeeperTexts.h"

using std::chrono::milliseconds;
using std::chrono::seconds;

/// The longest pause between two looks at agent, host and pid files; with a short heartbeat they come more often.
static constexpr milliseconds scLongestPulse{10000};
static constexpr milliseconds scShortestPulse{500};
/// Until the next look at an agent that is just writing its pid file.
static constexpr milliseconds scStrangerPause{200};
/// Steps of an orderly stop after the first: SIGKILL for the agent, and no new try with a collector after this.
static constexpr seconds scStopKillAgent{17};
/// Ended agents of which something is kept for the collector. More can only pile up where it never says Drained.
static constexpr std::size_t scMaxEndedAgents = 16;

ZTCKeeper::ZTCKeeper(ZTCKeeperWorld& arWorld, seconds aHeartbeat)
    : mrWorld(arWorld),
      mHeartbeat(aHeartbeat),
      mAgentBackOff(keeperRule(ZTKR_AgentFailed).mFirst, keeperRule(ZTKR_AgentFailed).mMost),
      mCollectorBackOff(keeperRule(ZTKR_CollectorFailed).mFirst, keeperRule(ZTKR_CollectorFailed).mMost) {}

std::string ZTCKeeper::nameOf(ZTEWatched aProcess) const {
    if (aProcess == ZTWP_Agent && mAgent) {
        return "agent, process " + std::to_string(mAgent->mStarted.mPid);
    }
    return aProcess == ZTWP_Agent ? "agent" : aProcess == ZTWP_Collector ? "collector" : "agent of somebody else";
}

void ZTCKeeper::start(ZTCTime aNow) {
    mStateSince = mrWorld.getWallClock();
    startCollector(aNow);
    startAgent(aNow);
    handleTime(aNow);
}

// ---- the agent ----

void ZTCKeeper::startAgent(ZTCTime aNow) {
    mAgentStartAt.reset();
    const ZTEStrangerLook lLook = mrWorld.lookForStranger();
    if (lLook == ZTSL_Unknown) {
        mAgentStartAt = aNow + scStrangerPause;
        return;
    }
    if (lLook == ZTSL_Watched) {
        mStranger.emplace();
        mWhy = "an agent runs that this sensor has not started";
        askToEnd(aNow, ZTWP_Stranger, *mStranger, ZTKR_Stranger, "it holds this sensor's directory");
        return;
    }
    const std::set<std::string> lHostNames = mrWorld.getHostNames();
    std::optional<ZTSLinkMessage> lStarted = mrWorld.startAgent(++mStarts);
    if (!lStarted) {
        planAgent(aNow, ZTKR_AgentFailed, "cannot be started");
        return;
    }
    lStarted->mRestarts = mStarts - 1;
    mAgent.emplace();
    mAgent->mStarted = std::move(*lStarted);
    mAgent->mTouched = aNow;
    mAgent->mHeartbeat = mHeartbeat;
    mAgent->mHostNames = lHostNames;
    send(aNow, mAgent->mStarted);
}

void ZTCKeeper::planAgent(ZTCTime aNow, ZTEKeeperRule aRule, const std::string& acrHow) {
    const bool lIsNews = aRule != ZTKR_NothingToWatch || !mIsNothingToWatch || mWhy != acrHow;
    seconds lPause = keeperRule(aRule).mMost;
    if (aRule == ZTKR_AgentFailed) {
        lPause = mAgentBackOff.take();
    } else {
        mAgentBackOff.reset();
    }
    mIsNothingToWatch = aRule == ZTKR_NothingToWatch;
    mWhy = acrHow;
    mAgentStartAt = aNow + lPause;
    if (lIsNews) {
        mrWorld.say("agent: " + acrHow +
                    (mIsNothingToWatch
                         ? "; tried again when the names in /sys/class/fc_host change, every 60 s at least"
                         : "; the next one is started " + pauseText(lPause)));
    }
}

void ZTCKeeper::handleAgentEnd(ZTCTime aNow, int aWaitStatus, ZTEStatusEnd aReason) {
    if (!mAgent) {
        return;
    }
    ZTSKeptAgent lAgent = std::move(*mAgent);
    mAgent.reset();

    ZTSEndedAgent lEnded;
    lEnded.mEnded.mType = ZTLM_AgentEnded;
    lEnded.mEnded.mStart = lAgent.mStarted.mStart;
    lEnded.mEnded.mPid = lAgent.mStarted.mPid;
    lEnded.mEnded.mWaitStatus = aWaitStatus;
    lEnded.mEnded.mText = lAgent.mStarted.mText;
    lEnded.mStarted = std::move(lAgent.mStarted);
    mEndedAgents.push_back(std::move(lEnded));
    if (mEndedAgents.size() > scMaxEndedAgents) {
        mEndedAgents.pop_front();
    }
    send(aNow, mEndedAgents.back().mEnded);
    forgetDrained();

    if (!mIsStopping) {
        mHostNames = std::move(lAgent.mHostNames);
        planAgent(aNow, classifyAgentEnd(aReason, lAgent.mHasWorked, lAgent.mIsReplaced),
                  "ended: " + (aReason == ZTSE_Running ? endText(aWaitStatus) : gcStatusEndNames[aReason]));
    }
    handleTime(aNow);
}

void ZTCKeeper::handleStrangerEnd(ZTCTime aNow) {
    mStranger.reset();
    if (!mIsStopping) {
        startAgent(aNow);
    }
    handleTime(aNow);
}

void ZTCKeeper::lookAtAgent(ZTCTime aNow) {
    const std::optional<std::int64_t> lTouch = mrWorld.getAgentTouch();
    if (lTouch && *lTouch != mAgent->mTouch) {
        mAgent->mTouch = *lTouch;
        mAgent->mTouched = aNow;
    }
    const seconds lLimit = 2 * mAgent->mHeartbeat + keeperRule(ZTKR_AgentStill).mFirst;
    if (aNow - mAgent->mTouched > lLimit) {
        askToEnd(aNow, ZTWP_Agent, mAgent->mEnding, ZTKR_AgentStill,
                 "it hangs: its pid file has not been touched for more than " + std::to_string(lLimit.count()) +
                     " s, twice its heartbeat and 5 s");
    }
    const std::uint32_t lAdapters = mrWorld.countAdapters().value_or(mAgent->mAdapters);
    const bool lIsNew = mAgent->mAdapters != 0 && lAdapters > mAgent->mAdapters;
    const bool lIsTime = !mReplacedAt || aNow - *mReplacedAt >= keeperRule(ZTKR_NewAdapter).mFirst;
    if (!lIsNew || mIsStopping) {
        mAgent->mAdapters = lAdapters;
    } else if (lIsTime && mCollector && !mAgent->mIsReplaced && mAgent->mHasWorked) {
        mrWorld.say("agent: " + std::to_string(lAdapters) + " adapters instead of " +
                    std::to_string(mAgent->mAdapters) + ": it is stopped in order and started anew");
        stopAgentForNew(aNow);
    }
    if (mAgent->mIsReplaced && aNow >= mAgent->mReplaceUntil) {
        askToEnd(aNow, ZTWP_Agent, mAgent->mEnding, ZTKR_AgentStill, "it was not stopped in order within 90 s");
    }
}

void ZTCKeeper::stopAgentForNew(ZTCTime aNow) {
    mReplacedAt = aNow;
    mAgent->mIsReplaced = true;
    mAgent->mReplaceUntil = aNow + keeperRule(ZTKR_NewAdapter).mMost;
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_StopAgent;
    lMessage.mStart = mAgent->mStarted.mStart;
    send(aNow, lMessage);
}

void ZTCKeeper::lookAtHost(ZTCTime aNow) {
    if (mIsNothingToWatch && mAgentStartAt && mrWorld.getHostNames() != mHostNames) {
        mrWorld.say("agent: the names in /sys/class/fc_host have changed: it is started");
        mAgentStartAt = aNow;
    }
}

// ---- ends, the stop, time ----

void ZTCKeeper::askToEnd(ZTCTime aNow, ZTEWatched aProcess, ZTSEnding& arEnding, ZTEKeeperRule aRule,
                         const std::string& acrWhy) {
    if (arEnding.mIsAsked) {
        return;
    }
    const seconds lPatience = keeperRule(aRule).mMost;
    mrWorld.say(nameOf(aProcess) + ": " + acrWhy + ": SIGTERM; SIGKILL in " + std::to_string(lPatience.count()) + " s");
    arEnding.mIsAsked = true;
    arEnding.mKillAt = aNow + lPatience;
    mrWorld.sendSignal(aProcess, SIGTERM);
}

void ZTCKeeper::killIfDue(ZTCTime aNow, ZTEWatched aProcess, ZTSEnding& arEnding) {
    if (arEnding.mIsAsked && !arEnding.mIsKilled && aNow >= arEnding.mKillAt) {
        arEnding.mIsKilled = true;
        mHasForced = mHasForced || mIsStopping;
        mrWorld.say(nameOf(aProcess) + ": has not ended on SIGTERM: SIGKILL");
        mrWorld.sendSignal(aProcess, SIGKILL);
    }
}

void ZTCKeeper::handleStop(ZTCTime aNow) {
    if (mIsStopping) {
        return;
    }
    mIsStopping = true;
    mStoppedAt = aNow;
    mAgentStartAt.reset();
    mrWorld.notify("STOPPING=1");
    mrWorld.say("stops in order");
    if (mCollector) {
        ZTSLinkMessage lFinish;
        lFinish.mType = ZTLM_Finish;
        send(aNow, lFinish);
    } else {
        mCollectorStartAt = aNow;  // the agent holds what only a collector can take in
    }
    handleTime(aNow);
}

/// Ends the processes that take too long in an orderly stop.
void ZTCKeeper::pressStop(ZTCTime aNow) {
    const auto lSince = aNow - mStoppedAt;
    if (mCollectorStartAt && lSince >= gcStopLastCollector) {
        mCollectorStartAt.reset();
        mHasForced = true;
    }
    // A collector that ended in order has shut the agent down, which takes a moment to end.
    const bool lIsAlone = !mCollector && !mCollectorStartAt && aNow >= mAloneAt;
    if (mAgent && (lIsAlone || lSince >= keeperRule(ZTKR_Stop).mFirst) && !mAgent->mEnding.mIsAsked) {
        mHasForced = mHasForced || !lIsAlone;
        askToEnd(aNow, ZTWP_Agent, mAgent->mEnding, ZTKR_AgentStill, "it still runs, and this sensor stops");
    }
    if (mAgent && mAgent->mEnding.mIsAsked) {
        mAgent->mEnding.mKillAt = std::min(mAgent->mEnding.mKillAt, mStoppedAt + scStopKillAgent);
    }
    if (mCollector && lSince >= keeperRule(ZTKR_Stop).mMost) {
        mCollector->mEnding.mIsAsked = true;
        mCollector->mEnding.mKillAt = aNow;
    }
}

void ZTCKeeper::handleReload(ZTCTime aNow, seconds aHeartbeat, ZTCFileDescriptor aSettings) {
    mHeartbeat = aHeartbeat;
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Reload;
    lMessage.mSettings = std::move(aSettings);
    send(aNow, lMessage);
    handleTime(aNow);
}

void ZTCKeeper::handleTime(ZTCTime aNow) {
    if (aNow >= mNextPulse) {
        const auto lPulse = std::clamp(milliseconds(mHeartbeat) / 2, scShortestPulse, scLongestPulse);
        mNextPulse = aNow + lPulse;
        mrWorld.touchPidFile();
        if (mAgent) {
            lookAtAgent(aNow);
        }
        lookAtHost(aNow);
        if (!mCollector || !mCollector->mHasWorked) {
            mrWorld.notify("WATCHDOG=1");  // nothing collects yet that could feed it
        }
    }
    if (mCollector && aNow >= mCollector->mStillUntil) {
        askToEnd(aNow, ZTWP_Collector, mCollector->mEnding, ZTKR_CollectorStill,
                 "it hangs: it has completed no look for too long");
    }
    if (mIsStopping) {
        pressStop(aNow);
    }
    if (mAgent) {
        killIfDue(aNow, ZTWP_Agent, mAgent->mEnding);
    }
    if (mStranger) {
        killIfDue(aNow, ZTWP_Stranger, *mStranger);
    }
    if (mCollector) {
        killIfDue(aNow, ZTWP_Collector, mCollector->mEnding);
    }
    if (mCollectorStartAt && aNow >= *mCollectorStartAt) {
        startCollector(aNow);
    }
    if (mAgentStartAt && aNow >= *mAgentStartAt) {
        startAgent(aNow);
    }
    publishState(aNow);
}

ZTCKeeper::ZTCTime ZTCKeeper::getNextTime() const {
    ZTCTime lNext = mNextPulse;
    const auto lAdd = [&](ZTCTime aTime) { lNext = std::min(lNext, aTime); };
    for (const ZTSEnding* lpEnding : {mAgent ? &mAgent->mEnding : nullptr, mStranger ? &*mStranger : nullptr,
                                      mCollector ? &mCollector->mEnding : nullptr}) {
        if (lpEnding != nullptr && lpEnding->mIsAsked && !lpEnding->mIsKilled) {
            lAdd(lpEnding->mKillAt);
        }
    }
    for (const std::optional<ZTCTime>& lcrTime : {mAgentStartAt, mCollectorStartAt}) {
        if (lcrTime) {
            lAdd(*lcrTime);
        }
    }
    if (mCollector && !mCollector->mEnding.mIsAsked) {
        lAdd(mCollector->mStillUntil);
    }
    if (mIsStopping) {
        if (mAgent && !mAgent->mEnding.mIsAsked) {
            lAdd(mCollector || mCollectorStartAt ? mStoppedAt + keeperRule(ZTKR_Stop).mFirst : mAloneAt);
        }
        if (mCollector && !mCollector->mEnding.mIsKilled) {
            lAdd(mStoppedAt + keeperRule(ZTKR_Stop).mMost);
        }
    }
    return lNext;
}
