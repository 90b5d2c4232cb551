/// The one place that waits for signals.

#ifndef SYSTEM_INCLUDE_SIGNALWAITER_H
#define SYSTEM_INCLUDE_SIGNALWAITER_H

#include <sys/types.h>

#include "os/common/include/Os.h"
#include "os/common/include/ProcessEvents.h"

/// A thread that turns SIGTERM and SIGINT into the stop event, and SIGHUP into reopening the log file. start() and
/// stop() belong to the main thread.
class ZTCSignalWaiter {
public:
    ZTCSignalWaiter() = default;

    /// Stops the thread if it runs.
    ~ZTCSignalWaiter();

    ZTCSignalWaiter(const ZTCSignalWaiter&) = delete;
    ZTCSignalWaiter& operator=(const ZTCSignalWaiter&) = delete;

    /// Blocks the three signals on the calling thread and on those that it starts, and ignores SIGPIPE and SIGXFSZ.
    /// Comes before everything that could make a thread.
    static void blockSignals();

    /// Sends on to the process what blockSignals() has kept back from this one so far: a process that was forked
    /// inherits the mask but not the signals that wait.
    static void handOnSignals(::pid_t aProcess) noexcept;

    /// Starts the thread. Throws ZTCClibEx or ZTCOsException; nothing runs then.
    void start();

    /// Ends the thread and waits for it. Does nothing where none runs.
    void stop();

private:
    static void* run(void* apArgument);
    void waitForSignals() noexcept;
    void takeSignals();

    ZTCProcessEvent mQuitEvent;
    ZTSOsThread mThread;
    int mDescriptor = -1;
    bool mIsRunning = false;
};

#endif
