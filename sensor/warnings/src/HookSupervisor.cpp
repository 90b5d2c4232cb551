#include "sensor/warnings/src/HookSupervisor.h"

#include <fcntl.h>
#include <linux/close_range.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <ctime>

// Only system calls here, and no memory from the heap: another thread may have held a lock at the fork.

/// Where the report goes, beside standard input, output and error.
static constexpr int scReport = 3;
/// Above these, so that none is overwritten while they are put into their places.
static constexpr int scFirstSpare = 10;
/// The pause between two looks for processes that were killed.
static constexpr timespec scLookPeriod{.tv_sec = 0, .tv_nsec = 20'000'000};
/// The seconds for which such processes are looked for.
static constexpr time_t scEndPatience = 2;

static constexpr int scNotExecuted = 127;

/// Puts a descriptor into its place, open for the hook.
static void sPlace(int aDescriptor, int aPlace) {
    dup2(aDescriptor, aPlace);
}

static void sPlaceDescriptors(const ZTSHookPlan& acrPlan) {
    const int lInput = fcntl(acrPlan.mInput, F_DUPFD_CLOEXEC, scFirstSpare);
    const int lOutput = fcntl(acrPlan.mOutput, F_DUPFD_CLOEXEC, scFirstSpare);
    const int lReport = fcntl(acrPlan.mReport, F_DUPFD_CLOEXEC, scFirstSpare);
    sPlace(lInput, STDIN_FILENO);
    sPlace(lOutput, STDOUT_FILENO);
    sPlace(lOutput, STDERR_FILENO);
    sPlace(lReport, scReport);
    fcntl(scReport, F_SETFD, FD_CLOEXEC);
    syscall(SYS_close_range, scReport + 1, ~0U, 0);
}

/// The hook's own process. The pipe's end reports that it runs; an errno in the pipe says why it does not.
[[noreturn]] static void sExecute(const ZTSHookPlan& acrPlan, int aStart) {
    setpgid(0, 0);
    for (int lSignal = 1; lSignal < NSIG; ++lSignal) {
        signal(lSignal, SIG_DFL);
    }
    sigset_t lNone;
    sigemptyset(&lNone);
    sigprocmask(SIG_SETMASK, &lNone, nullptr);
    execvpe(acrPlan.mpArguments[0], acrPlan.mpArguments, acrPlan.mpEnvironment);
    const int lError = errno;
    [[maybe_unused]] const ssize_t lWritten = write(aStart, &lError, sizeof(lError));
    _exit(scNotExecuted);
}

/// Kills the children of this process. The children that a killed one leaves become its own.
static void sKillChildren() {
    const int lFile = open("/proc/thread-self/children", O_RDONLY | O_CLOEXEC);
    std::array<char, 4096> lBytes;
    pid_t lPid = 0;
    ssize_t lCount = 0;
    while (lFile >= 0 && (lCount = read(lFile, lBytes.data(), lBytes.size())) > 0) {
        for (ssize_t i = 0; i < lCount; ++i) {
            const char lByte = lBytes[static_cast<std::size_t>(i)];
            if (lByte >= '0' && lByte <= '9') {
                lPid = lPid * 10 + (lByte - '0');
            } else if (lPid != 0) {
                kill(lPid, SIGKILL);
                lPid = 0;
            }
        }
    }
    if (lFile >= 0) {
        close(lFile);
    }
}

/// Waits for children that have ended. Returns whether any are left; gives the hook's status where it is among them.
static bool sReap(pid_t aHook, bool& arHasEnded, int& arStatus) {
    int lStatus = 0;
    pid_t lEnded = 0;
    while ((lEnded = waitpid(-1, &lStatus, WNOHANG)) > 0) {
        if (lEnded == aHook) {
            arHasEnded = true;
            arStatus = lStatus;
        }
    }
    return lEnded == 0;
}

static time_t sSeconds() {
    timespec lNow{};
    clock_gettime(CLOCK_MONOTONIC, &lNow);
    return lNow.tv_sec;
}

static void sWatch(pid_t aHook, ZTSHookReport& arReport) {
    sigset_t lSignals;
    sigemptyset(&lSignals);
    sigaddset(&lSignals, SIGCHLD);
    sigset_t lEnds = lSignals;
    sigaddset(&lEnds, SIGTERM);
    bool lHasEnded = false;
    bool lIsTold = false;
    bool lAreLeft = sReap(aHook, lHasEnded, arReport.mStatus);
    while (!lHasEnded && !lIsTold) {
        lIsTold = sigwaitinfo(&lEnds, nullptr) == SIGTERM;
        lAreLeft = sReap(aHook, lHasEnded, arReport.mStatus);
    }
    arReport.mHasLeft = lHasEnded && lAreLeft;
    const time_t lEnd = sSeconds() + scEndPatience;
    while (lAreLeft && sSeconds() <= lEnd) {
        kill(-aHook, SIGKILL);  // where the kernel shows no children, at least its group
        sKillChildren();
        sigtimedwait(&lSignals, nullptr, &scLookPeriod);
        lAreLeft = sReap(aHook, lHasEnded, arReport.mStatus);
    }
    arReport.mIsUnended = lAreLeft;
}

void superviseHook(const ZTSHookPlan& acrPlan) {
    sigset_t lAll;
    sigfillset(&lAll);
    sigprocmask(SIG_SETMASK, &lAll, nullptr);
    signal(SIGCHLD, SIG_DFL);
    signal(SIGTERM, SIG_DFL);
    setpgid(0, 0);
    prctl(PR_SET_CHILD_SUBREAPER, 1);
    prctl(PR_SET_PDEATHSIG, SIGTERM);
    if (getppid() != acrPlan.mOwner) {
        _exit(EXIT_FAILURE);
    }
    sPlaceDescriptors(acrPlan);
    std::array<int, 2> lStart{-1, -1};
    int lError = pipe2(lStart.data(), O_CLOEXEC) == 0 ? 0 : errno;
    pid_t lHook = -1;
    if (lError == 0) {
        lHook = fork();
        lError = lHook < 0 ? errno : 0;
    }
    if (lHook == 0) {
        sExecute(acrPlan, lStart[1]);
    }
    // The pipes are the hook's alone: they end with it.
    close(lStart[1]);
    for (const int lDescriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        close(lDescriptor);
    }
    if (lError == 0) {
        while (read(lStart[0], &lError, sizeof(lError)) < 0 && errno == EINTR) {
        }
    }
    const ZTSHookStart lStarted{.mError = lError, .mPid = lHook};
    [[maybe_unused]] ssize_t lWritten = write(scReport, &lStarted, sizeof(lStarted));
    if (lError != 0) {
        _exit(EXIT_FAILURE);
    }
    ZTSHookReport lReport;
    sWatch(lHook, lReport);
    lWritten = write(scReport, &lReport, sizeof(lReport));
    _exit(EXIT_SUCCESS);
}
