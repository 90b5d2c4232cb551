#include "system/include/ThreadTable.h"

#include <iterator>
#include <new>

#include "common/include/Exception.h"
#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"

void ZTCThreadTable::add(ZTCThreadComponent* apComponent, ZTCSystemInterface* apSystemInterface) {
    try {
        mThreads.push_back({{apComponent, apSystemInterface}, {}, false, false});
    } catch (const std::bad_alloc&) {
        throw ZTCNoMemoryEx();
    }
}

void ZTCThreadTable::start(unsigned aIndex, void* (*apProcedure)(void*)) {
    if (aIndex >= mThreads.size() || isStarted(aIndex)) {
        throwWith<ZTCInvalidEx>("Thread %u of %u cannot be started: it %s", aIndex, size(),
                                aIndex >= mThreads.size() ? "does not exist" : "was started before");
    }
    ZTSEntry& lrEntry = *std::next(mThreads.begin(), aIndex);
    OsCreateThread(lrEntry.mThread, apProcedure, &lrEntry.mArguments);
    lrEntry.mIsStarted = true;
    ++mNumberOfStarted;
}

bool ZTCThreadTable::isStarted(unsigned aIndex) const {
    return aIndex < mThreads.size() && std::next(mThreads.begin(), aIndex)->mIsStarted;
}

bool ZTCThreadTable::haveAllEnded() const {
    return mNumberOfEnded.load(std::memory_order_acquire) == mNumberOfStarted;
}

void ZTCThreadTable::noteEnd() noexcept {
    mNumberOfEnded.fetch_add(1, std::memory_order_release);
    mEndEvent.raise();
}

void ZTCThreadTable::joinAll() {
    for (ZTSEntry& lrEntry : mThreads) {
        if (lrEntry.mIsStarted && !lrEntry.mIsJoined) {
            OsJoinThread(lrEntry.mThread);
            lrEntry.mIsJoined = true;
        }
    }
}
