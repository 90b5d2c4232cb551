#include "sensor/collector/include/AgentQueue.h"

#include <fcntl.h>
#include <poll.h>

#include <algorithm>
#include <utility>

/// Of an orderly end: how long a full disk may hold up the agent's shut-down.
static constexpr std::chrono::seconds scStopPatience{8};

ZTCAgentQueue::ZTCAgentQueue(ZTCKeeperPort& arKeeper, ZTCSpool& arSpool, ZTCHistorySink& arHistory,
                             std::string aDirectory, const ZTSSessionSettings& acrSettings, Report aReport)
    : mrKeeper(arKeeper),
      mrSpool(arSpool),
      mrHistory(arHistory),
      mDirectory(std::move(aDirectory)),
      mReport(std::move(aReport)),
      mSettings(acrSettings),
      mLosses(getHistoryTime()) {}

// ---- what the keeper and others say ----

void ZTCAgentQueue::noteStarted(ZTSLinkMessage aMessage) {
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

void ZTCAgentQueue::noteEnded(const ZTSLinkMessage& acrMessage, ZTCTime aNow) {
    if (mpSession != nullptr && mpSession->getStart() == acrMessage.mStart) {
        mpSession->noteEnded(acrMessage.mWaitStatus, aNow);
    }
    for (ZTSWaitingAgent& lrAgent : mWaiting) {
        if (lrAgent.mStart.mStart == acrMessage.mStart) {
            lrAgent.mWaitStatus = acrMessage.mWaitStatus;
        }
    }
}

void ZTCAgentQueue::stop(std::uint64_t aStart, ZTCTime aNow) {
    if (mpSession != nullptr && mpSession->getStart() == aStart) {
        mpSession->requestStop(aNow, scStopPatience);
    }
}

void ZTCAgentQueue::stopAll(ZTCTime aNow) {
    mIsStoppingAll = true;
    if (mpSession != nullptr) {
        mpSession->requestStop(aNow, scStopPatience);
    }
}

void ZTCAgentQueue::setSettings(const ZTSSessionSettings& acrSettings, ZTCTime aNow) {
    mSettings = acrSettings;
    if (mpSession != nullptr) {
        mpSession->setSettings(acrSettings, aNow);
    }
}

void ZTCAgentQueue::setTargets(std::vector<ZTSTargetPort> aTargets, ZTCTime aNow) {
    mTargets = std::move(aTargets);
    if (mpSession != nullptr) {
        mpSession->offerTargets(mTargets, aNow);
    }
}

// ---- the loop ----

void ZTCAgentQueue::run(ZTCTime aNow) {
    do {
        beginNext(aNow);
        step(aNow);
    } while (mpSession == nullptr && !mWaiting.empty());
}

std::optional<ZTCAgentQueue::ZTCTime> ZTCAgentQueue::getNextStep() const {
    return mpSession != nullptr ? std::optional(mpSession->getNextStep()) : std::nullopt;
}

void ZTCAgentQueue::noteResponseEvents(short aEvents) {
    if ((aEvents & POLLIN) != 0) {
        mIsDue = true;
    } else if (aEvents != 0 && mpSession != nullptr) {
        mpSession->noteHangUp();
    }
}

void ZTCAgentQueue::noteBellEvents(short aEvents, ZTCTime aNow) {
    if (aEvents != 0 && mpSession != nullptr) {
        mpSession->noteBell(aNow);
    }
}

ZTCPagePointer ZTCAgentQueue::readPage() {
    return mpSession != nullptr ? mpSession->readPageNow() : mpLastPage;
}

std::optional<std::string> ZTCAgentQueue::takeNewLosses() {
    return std::exchange(mHasNewLosses, false) ? std::optional(mLosses.toText()) : std::nullopt;
}

void ZTCAgentQueue::beginNext(ZTCTime aNow) {
    if (mpSession != nullptr || mWaiting.empty()) {
        return;
    }
    ZTSWaitingAgent lAgent = std::move(mWaiting.front());
    mWaiting.pop_front();
    mpSession =
        std::make_unique<ZTCAgentSession>(std::move(lAgent.mStart), mrSpool, mrHistory, mDirectory, mSettings, aNow);
    mpSession->offerTargets(mTargets, aNow);
    if (lAgent.mWaitStatus) {
        mpSession->noteEnded(*lAgent.mWaitStatus, aNow);
    } else if (mIsStoppingAll) {
        mpSession->requestStop(aNow, scStopPatience);
    }
    mIsDue = true;
}

void ZTCAgentQueue::step(ZTCTime aNow) {
    if (mpSession == nullptr || (!mIsDue && aNow < mpSession->getNextStep())) {
        return;
    }
    mIsDue = false;
    mpSession->step(aNow);
    const ZTSSessionEvents lEvents = mpSession->takeEvents();
    for (const std::string& lrLine : lEvents.mLines) {
        mReport(lrLine);
    }
    if (mpSession->getPage() != nullptr) {
        if (mpLastPage != mpSession->getPage()) {
            mHasNewLosses |= mLosses.note(*mpSession->getPage(), getHistoryTime());
        }
        mpLastPage = mpSession->getPage();
    }
    mLastAsked = mpSession->getLastAsked() ? mpSession->getLastAsked() : mLastAsked;
    if (lEvents.mIsStartAnswered) {
        mrKeeper.send(ZTLM_StartAnswered, mpSession->getStart());
    }
    if (lEvents.mIsSilent) {
        mrKeeper.send(ZTLM_Silent, mpSession->getStart());
    }
    if (lEvents.mLooks != 0 || lEvents.mFrames != 0) {
        mrKeeper.sendLook(aNow);
    }
    if (mpSession->isDrained()) {
        mrKeeper.send(ZTLM_Drained, mpSession->getStart());
        mpSession.reset();
    }
}
