#include "system/include/SignalWaiter.h"

#include <signal.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"

namespace {

sigset_t sSignals() {
    sigset_t lSignals;
    sigemptyset(&lSignals);
    sigaddset(&lSignals, SIGTERM);
    sigaddset(&lSignals, SIGINT);
    sigaddset(&lSignals, SIGHUP);
    return lSignals;
}

[[noreturn]] void sThrowSignalFailed(const char* apCall, int aErrno) {
    throwWith<ZTCClibSignalFailedEx>("%s failed: %s", apCall, ZTCErrnoText(aErrno).get());
}

}  // namespace

ZTCSignalWaiter::~ZTCSignalWaiter() {
    stop();
}

void ZTCSignalWaiter::blockSignals() {
    const sigset_t lSignals = sSignals();
    const int lError = pthread_sigmask(SIG_BLOCK, &lSignals, nullptr);
    if (lError != 0) {
        sThrowSignalFailed("pthread_sigmask", lError);
    }
    // A reader that has gone and a limit on file sizes are errors of the write.
    struct sigaction lIgnore {};
    lIgnore.sa_handler = SIG_IGN;
    for (const int lSignal : {SIGPIPE, SIGXFSZ}) {
        if (::sigaction(lSignal, &lIgnore, nullptr) != 0) {
            sThrowSignalFailed("sigaction", errno);
        }
    }
}

void ZTCSignalWaiter::handOnSignals(::pid_t aProcess) noexcept {
    const sigset_t lSignals = sSignals();
    const std::timespec lAtOnce{};
    for (int lSignal; (lSignal = ::sigtimedwait(&lSignals, nullptr, &lAtOnce)) > 0;) {
        ::kill(aProcess, lSignal);
    }
}

void ZTCSignalWaiter::start() {
    const sigset_t lSignals = sSignals();
    const int lDescriptor = ::signalfd(-1, &lSignals, SFD_NONBLOCK | SFD_CLOEXEC);
    mDescriptor = ClibLiftDescriptor(lDescriptor < 0 ? -errno : lDescriptor);
    if (mDescriptor < 0) {
        sThrowSignalFailed("signalfd", -mDescriptor);
    }
    mQuitEvent.reset();
    try {
        OsCreateThread(mThread, &ZTCSignalWaiter::run, this);
    } catch (const ZTCException&) {
        ClibClose(mDescriptor);
        mDescriptor = -1;
        throw;
    }
    mIsRunning = true;
}

void ZTCSignalWaiter::stop() {
    if (!mIsRunning) {
        return;
    }
    mQuitEvent.raise();
    OsJoinThread(mThread);
    mIsRunning = false;
    ClibClose(mDescriptor);
    mDescriptor = -1;
}

void* ZTCSignalWaiter::run(void* apArgument) {
    static_cast<ZTCSignalWaiter*>(apArgument)->waitForSignals();
    return nullptr;
}

void ZTCSignalWaiter::waitForSignals() noexcept {
    try {
        for (;;) {
            struct pollfd lDescriptors[2] = {{mDescriptor, POLLIN, 0}, {mQuitEvent.getDescriptor(), POLLIN, 0}};
            if (ClibPoll(lDescriptors, 2, -1) == -EINTR) {
                continue;
            }
            if (lDescriptors[1].revents != 0) {
                return;
            }
            if (lDescriptors[0].revents != 0) {
                takeSignals();
            }
        }
    } catch (const ZTCException& acrException) {
        // Without this thread nothing could stop the process in order any more.
        ZT_LOG_HALT("Waiting for signals failed: %s; the process is stopped", acrException.what());
        getStopEvent().raise();
    }
}

void ZTCSignalWaiter::takeSignals() {
    struct signalfd_siginfo lSignal {};
    while (ClibRead(mDescriptor, &lSignal, sizeof(lSignal)) == static_cast<::ssize_t>(sizeof(lSignal))) {
        if (lSignal.ssi_signo == SIGHUP) {
            ZT_LOG_NOTICE("Signal %u from process %u: the log file is reopened", lSignal.ssi_signo, lSignal.ssi_pid);
            reopenLogFile();
            ZT_LOG_NOTICE("%s", "The log file was reopened");
        } else {
            ZT_LOG_NOTICE("Signal %u from process %u: stopping", lSignal.ssi_signo, lSignal.ssi_pid);
            getStopEvent().raise();
        }
    }
}
