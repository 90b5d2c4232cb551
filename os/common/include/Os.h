/// Mutexes, conditionals and threads of the operating system (POSIX), behind one thin layer.
///
/// Each failure is a ZTCOsMutexEx, ZTCOsConditionalEx or ZTCOsThreadEx that names the call and the reason.
/// An object that was never initialised, or was destroyed, is refused: destroying twice throws.

#ifndef OS_COMMON_INCLUDE_OS_H
#define OS_COMMON_INCLUDE_OS_H

#include <pthread.h>

#include <cstdint>

#include "common/include/Exception.h"

struct ZTSOsMutex {
    pthread_mutex_t mMutex;
    bool mIsInitialised = false;
};

/// A condition variable on the monotonic clock.
struct ZTSOsConditional {
    pthread_cond_t mConditional;
    bool mIsInitialised = false;
};

struct ZTSOsThread {
    pthread_t mThread{};
};

/// The mutex checks its use: locking it twice on one thread, or unlocking another's, throws instead of hanging.
void OsInitMutex(ZTSOsMutex& arMutex);
void OsDestroyMutex(ZTSOsMutex& arMutex);
void OsLockMutex(ZTSOsMutex& arMutex);
void OsUnlockMutex(ZTSOsMutex& arMutex);

void OsInitConditional(ZTSOsConditional& arConditional);
void OsDestroyConditional(ZTSOsConditional& arConditional);

/// The caller holds the mutex and tests its condition in a loop: the wait may return without a signal.
void OsWaitConditional(ZTSOsConditional& arConditional, ZTSOsMutex& arMutex);

/// The same, at most until the monotonic clock shows aDeadline (milliseconds, as ClibMonotonicMilliseconds counts):
/// then false.
bool OsTimedWaitConditional(ZTSOsConditional& arConditional, ZTSOsMutex& arMutex, std::int64_t aDeadline);

/// Wakes every thread that waits.
void OsBroadcastConditional(ZTSOsConditional& arConditional);

/// Starts a thread, which inherits the signal mask; it has to be joined.
void OsCreateThread(ZTSOsThread& arThread, void* (*apProcedure)(void*), void* apArgument);

/// Waits for the end of the thread. Never called on a thread itself, nor twice.
void OsJoinThread(ZTSOsThread& arThread);

#endif
