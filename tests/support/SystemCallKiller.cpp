#include "tests/support/SystemCallKiller.h"

#include <signal.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <string>

static constexpr int scSystemCallStop = SIGTRAP | 0x80;  // with PTRACE_O_TRACESYSGOOD

[[noreturn]] static void sRunChild(const std::function<int()>& acrAction) {
    setpgid(0, 0);
    if (ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) != 0) {
        _exit(0);
    }
    raise(SIGSTOP);
    int lStatus = 255;
    try {
        lStatus = acrAction();
    } catch (...) {
        lStatus = 254;
    }
    _exit(lStatus);
}

/// The next change of a thread of the child's; 0: there are none.
static pid_t sWait(pid_t aGroup, int& arStatus) {
    pid_t lThread;
    do {
        lThread = waitpid(-aGroup, &arStatus, __WALL);
    } while (lThread < 0 && errno == EINTR);
    return lThread < 0 ? 0 : lThread;
}

static int sExitStatus(int aStatus) {
    return WIFSIGNALED(aStatus) ? 1000 + WTERMSIG(aStatus) : WEXITSTATUS(aStatus);
}

ZTSKilledRun killAtSystemCall(unsigned aStop, const std::function<int()>& acrAction) {
    const pid_t lChild = fork();
    if (lChild < 0) {
        throw std::runtime_error(std::string("fork: ") + std::strerror(errno));
    }
    if (lChild == 0) {
        sRunChild(acrAction);
    }
    setpgid(lChild, lChild);
    ZTSKilledRun lRun;
    int lStatus = 0;
    while (waitpid(lChild, &lStatus, __WALL) < 0 && errno == EINTR) {
    }
    if (!WIFSTOPPED(lStatus)) {
        return lRun;
    }
    lRun.mIsTraced = true;
    const auto lOptions = PTRACE_O_TRACESYSGOOD | PTRACE_O_TRACECLONE | PTRACE_O_TRACEEXEC | PTRACE_O_EXITKILL;
    ptrace(PTRACE_SETOPTIONS, lChild, nullptr, lOptions);
    ptrace(PTRACE_SYSCALL, lChild, nullptr, nullptr);
    while (const pid_t lThread = sWait(lChild, lStatus)) {
        if (!WIFSTOPPED(lStatus)) {
            if (lThread == lChild) {
                lRun.mStatus = sExitStatus(lStatus);
            }
            continue;
        }
        const int lSignal = WSTOPSIG(lStatus);
        if (lSignal == scSystemCallStop && !lRun.mIsKilled && ++lRun.mStops == aStop) {
            lRun.mIsKilled = true;
            kill(lChild, SIGKILL);
            continue;
        }
        // The stops of tracing itself are no signals of the process.
        const bool lIsTracing = lSignal == scSystemCallStop || lSignal == SIGTRAP || lSignal == SIGSTOP;
        ptrace(PTRACE_SYSCALL, lThread, nullptr, lIsTracing ? 0 : lSignal);
    }
    return lRun;
}
