#include "os/common/include/Conditional.h"

#include "common/include/Exception.h"
#include "os/common/include/Clib.h"

void ZTCConditional::wait() {
    ZTCMutexLock lLock(mMutex);
    if (takeWakeUp()) {
        return;
    }
    const std::uint64_t lGeneration = mGeneration;
    ++mNumberOfWaiters;
    while (lGeneration == mGeneration && !mIsInterrupted) {
        OsWaitConditional(mConditional, mMutex.getOsMutex());
    }
    if (lGeneration == mGeneration) {
        --mNumberOfWaiters;
    }
}

void ZTCConditional::timedWait(unsigned aSeconds) {
    timedWait(std::chrono::seconds(aSeconds));
}

void ZTCConditional::timedWait(std::chrono::milliseconds aTime) {
    const std::int64_t lDeadline = ClibMonotonicMilliseconds() + aTime.count();
    ZTCMutexLock lLock(mMutex);
    if (takeWakeUp()) {
        return;
    }
    const std::uint64_t lGeneration = mGeneration;
    ++mNumberOfWaiters;
    bool lIsInTime = true;
    while (lIsInTime && lGeneration == mGeneration && !mIsInterrupted) {
        lIsInTime = OsTimedWaitConditional(mConditional, mMutex.getOsMutex(), lDeadline);
    }
    if (lGeneration != mGeneration) {
        return;
    }
    --mNumberOfWaiters;
    if (!mIsInterrupted) {
        throw ZTCTimeOutEx();
    }
}

void ZTCConditional::signal() {
    ZTCMutexLock lLock(mMutex);
    if (mNumberOfWaiters == 0) {
        mIsSignalKept = true;
        return;
    }
    // The waiters are released here, not when they come to run: a signal that follows is for others.
    ++mGeneration;
    mNumberOfWaiters = 0;
    OsBroadcastConditional(mConditional);
}

void ZTCConditional::interrupt() {
    ZTCMutexLock lLock(mMutex);
    mIsInterrupted = true;
    OsBroadcastConditional(mConditional);
}

unsigned ZTCConditional::getNumberOfWaiters() {
    ZTCMutexLock lLock(mMutex);
    return mNumberOfWaiters;
}

bool ZTCConditional::takeWakeUp() {
    const bool lIsAwake = mIsInterrupted || mIsSignalKept;
    mIsSignalKept = false;
    return lIsAwake;
}
