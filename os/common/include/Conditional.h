/// A conditional: what one thread waits for and another signals.

#ifndef OS_COMMON_INCLUDE_CONDITIONAL_H
#define OS_COMMON_INCLUDE_CONDITIONAL_H

#include <chrono>
#include <cstdint>

#include "common/include/Log.h"
#include "common/include/ThreadAnnotations.h"
#include "os/common/include/Mutex.h"

/// A signal wakes every thread that is waiting. If none is, one signal is kept for the next wait. There are no spurious
/// wake-ups. Timed waits use a clock that never steps. All operations may be called from any thread. No thread may be
/// waiting when the conditional is destroyed.
class ZTCConditional {
public:
    ZTCConditional() { OsInitConditional(mConditional); }

    virtual ~ZTCConditional() {
        try {
            OsDestroyConditional(mConditional);
        } catch (const ZTCException&) {
            ZT_TRACE_MSG("%s", "Ignoring exceptions while destructing ...");
        }
    }

    ZTCConditional(const ZTCConditional&) = delete;
    ZTCConditional& operator=(const ZTCConditional&) = delete;

    /// Returns when signalled or interrupted.
    void wait();

    /// Returns when signalled or interrupted; throws ZTCTimeOutEx when the time passes first.
    void timedWait(unsigned aSeconds);
    void timedWait(std::chrono::milliseconds aTime);

    /// Wakes the threads that wait now, or the next one that comes to wait.
    void signal();

    /// Makes this wait and every later one, on all threads, return at once. For good.
    void interrupt();

    /// Threads that wait and that no signal has released.
    unsigned getNumberOfWaiters();

protected:
    ZTSOsConditional& getOsConditional() { return mConditional; }

private:
    bool takeWakeUp() ZT_REQUIRES(mMutex);

    ZTCMutex mMutex;
    ZTSOsConditional mConditional;  // waited on with mMutex held

    std::uint64_t mGeneration ZT_GUARDED_BY(mMutex) = 0;  // of the signals that found somebody waiting
    unsigned mNumberOfWaiters ZT_GUARDED_BY(mMutex) = 0;  // those that no signal has released yet
    bool mIsSignalKept ZT_GUARDED_BY(mMutex) = false;
    bool mIsInterrupted ZT_GUARDED_BY(mMutex) = false;
};

#endif
