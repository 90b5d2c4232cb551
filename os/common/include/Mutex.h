/// A mutex, and the lock of a scope.

#ifndef OS_COMMON_INCLUDE_MUTEX_H
#define OS_COMMON_INCLUDE_MUTEX_H

#include "common/include/Log.h"
#include "common/include/ThreadAnnotations.h"
#include "os/common/include/Os.h"

/// Any thread may lock; the one that locked unlocks. Failures are ZTCOsMutexEx, except in the destructor, which ignores
/// them with a trace line.
class ZT_CAPABILITY("mutex") ZTCMutex {
public:
    ZTCMutex() { OsInitMutex(mMutex); }

    virtual ~ZTCMutex() {
        try {
            OsDestroyMutex(mMutex);
        } catch (const ZTCException&) {
            ZT_TRACE_MSG("%s", "Ignoring exception in Mutex destruction ...");
        }
    }

    ZTCMutex(const ZTCMutex&) = delete;
    ZTCMutex& operator=(const ZTCMutex&) = delete;

    void lock() ZT_ACQUIRE() { OsLockMutex(mMutex); }
    void unlock() ZT_RELEASE() { OsUnlockMutex(mMutex); }

    /// The operating system's mutex, to wait on a conditional with. The caller holds the lock.
    ZTSOsMutex& getOsMutex() { return mMutex; }

private:
    ZTSOsMutex mMutex;
};

/// Holds a mutex for as long as it lives. Belongs to one thread's stack.
class ZT_SCOPED_CAPABILITY ZTCMutexLock {
public:
    explicit ZTCMutexLock(ZTCMutex& arMutex) ZT_ACQUIRE(arMutex) : mrMutex(arMutex) { mrMutex.lock(); }
    ~ZTCMutexLock() ZT_RELEASE() { mrMutex.unlock(); }

    ZTCMutexLock(const ZTCMutexLock&) = delete;
    ZTCMutexLock& operator=(const ZTCMutexLock&) = delete;

private:
    ZTCMutex& mrMutex;
};

#endif
