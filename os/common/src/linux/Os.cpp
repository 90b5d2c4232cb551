#include "os/common/include/Os.h"

#include <time.h>

#include <cerrno>

#include "common/include/Memory.h"
#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"

namespace {

template <typename Exception>
void sCheck(const char* apCall, int aError) {
    if (aError == 0) {
        return;
    }
    throwWith<Exception>("%s failed: %s", apCall, ZTCErrnoText(aError).get());
}

void sRequireInitialised(const char* apCall, const ZTSOsMutex& acrMutex) {
    sCheck<ZTCOsMutexEx>(apCall, acrMutex.mIsInitialised ? 0 : EINVAL);
}

void sRequireInitialised(const char* apCall, const ZTSOsConditional& acrConditional) {
    sCheck<ZTCOsConditionalEx>(apCall, acrConditional.mIsInitialised ? 0 : EINVAL);
}

/// Tells the processor that this thread waits for another one.
void sPause() noexcept {
#if defined(__x86_64__) || defined(__i386__)
    __builtin_ia32_pause();
#elif defined(__aarch64__)
    asm volatile("yield");
#endif
}

/// Locks as pthread_mutex_lock does. Most holds end sooner than a thread falls asleep and is woken up again, so the
/// lock is tried a few times first, for about a microsecond in all.
int sLock(pthread_mutex_t* apMutex) noexcept {
    constexpr unsigned lcTries = 10;
    constexpr unsigned lcMostPauses = 8;
    unsigned lPauses = 1;
    for (unsigned lTry = 0; lTry < lcTries; ++lTry) {
        const int lError = pthread_mutex_trylock(apMutex);
        if (lError != EBUSY) {
            return lError;
        }
        for (unsigned i = 0; i < lPauses; ++i) {
            sPause();
        }
        lPauses = ZT_MIN(2 * lPauses, lcMostPauses);
    }
    return pthread_mutex_lock(apMutex);
}

}  // namespace

void OsInitMutex(ZTSOsMutex& arMutex) {
    pthread_mutexattr_t lAttributes;
    sCheck<ZTCOsMutexEx>("pthread_mutexattr_init", pthread_mutexattr_init(&lAttributes));
    int lError = pthread_mutexattr_settype(&lAttributes, PTHREAD_MUTEX_ERRORCHECK);
    if (lError == 0) {
        lError = pthread_mutex_init(&arMutex.mMutex, &lAttributes);
    }
    pthread_mutexattr_destroy(&lAttributes);
    sCheck<ZTCOsMutexEx>("pthread_mutex_init", lError);
    arMutex.mIsInitialised = true;
}

void OsDestroyMutex(ZTSOsMutex& arMutex) {
    sRequireInitialised("pthread_mutex_destroy", arMutex);
    sCheck<ZTCOsMutexEx>("pthread_mutex_destroy", pthread_mutex_destroy(&arMutex.mMutex));
    arMutex.mIsInitialised = false;
}

void OsLockMutex(ZTSOsMutex& arMutex) {
    sRequireInitialised("pthread_mutex_lock", arMutex);
    sCheck<ZTCOsMutexEx>("pthread_mutex_lock", sLock(&arMutex.mMutex));
}

void OsUnlockMutex(ZTSOsMutex& arMutex) {
    sRequireInitialised("pthread_mutex_unlock", arMutex);
    sCheck<ZTCOsMutexEx>("pthread_mutex_unlock", pthread_mutex_unlock(&arMutex.mMutex));
}

void OsInitConditional(ZTSOsConditional& arConditional) {
    pthread_condattr_t lAttributes;
    sCheck<ZTCOsConditionalEx>("pthread_condattr_init", pthread_condattr_init(&lAttributes));
    int lError = pthread_condattr_setclock(&lAttributes, CLOCK_MONOTONIC);
    if (lError == 0) {
        lError = pthread_cond_init(&arConditional.mConditional, &lAttributes);
    }
    pthread_condattr_destroy(&lAttributes);
    sCheck<ZTCOsConditionalEx>("pthread_cond_init", lError);
    arConditional.mIsInitialised = true;
}

void OsDestroyConditional(ZTSOsConditional& arConditional) {
    sRequireInitialised("pthread_cond_destroy", arConditional);
    sCheck<ZTCOsConditionalEx>("pthread_cond_destroy", pthread_cond_destroy(&arConditional.mConditional));
    arConditional.mIsInitialised = false;
}

void OsWaitConditional(ZTSOsConditional& arConditional, ZTSOsMutex& arMutex) {
    sRequireInitialised("pthread_cond_wait", arConditional);
    sCheck<ZTCOsConditionalEx>("pthread_cond_wait", pthread_cond_wait(&arConditional.mConditional, &arMutex.mMutex));
}

bool OsTimedWaitConditional(ZTSOsConditional& arConditional, ZTSOsMutex& arMutex, std::int64_t aDeadline) {
    sRequireInitialised("pthread_cond_timedwait", arConditional);
    struct timespec lDeadline {};
    lDeadline.tv_sec = static_cast<::time_t>(aDeadline / 1000);
    lDeadline.tv_nsec = static_cast<long>(aDeadline % 1000) * 1000000;
    const int lError = pthread_cond_timedwait(&arConditional.mConditional, &arMutex.mMutex, &lDeadline);
    if (lError == ETIMEDOUT) {
        return false;
    }
    sCheck<ZTCOsConditionalEx>("pthread_cond_timedwait", lError);
    return true;
}

void OsBroadcastConditional(ZTSOsConditional& arConditional) {
    sRequireInitialised("pthread_cond_broadcast", arConditional);
    sCheck<ZTCOsConditionalEx>("pthread_cond_broadcast", pthread_cond_broadcast(&arConditional.mConditional));
}

void OsCreateThread(ZTSOsThread& arThread, void* (*apProcedure)(void*), void* apArgument) {
    sCheck<ZTCOsThreadEx>("pthread_create", pthread_create(&arThread.mThread, nullptr, apProcedure, apArgument));
}

void OsJoinThread(ZTSOsThread& arThread) {
    sCheck<ZTCOsThreadEx>("pthread_join", pthread_join(arThread.mThread, nullptr));
}
