// In the build that counts what is reached: a process writes its counts down when it ends, by exit or by _exit.
// A copy of the process writes them. A test may kill a process that is about to end. It would leave half a file, into
// which no later process can count. Limits that a test has set do not keep the counts from being written either.

#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>

extern "C" void __gcov_dump();

namespace {

void sLiftLimits() {
    rlimit lLimit{RLIM_INFINITY, RLIM_INFINITY};
    if (setrlimit(RLIMIT_FSIZE, &lLimit) != 0) {
        getrlimit(RLIMIT_FSIZE, &lLimit);
        lLimit.rlim_cur = lLimit.rlim_max;
        setrlimit(RLIMIT_FSIZE, &lLimit);
    }
}

[[noreturn]] void sEnd(int aStatus) {
    for (;;) {
        syscall(SYS_exit_group, aStatus);
    }
}

/// Returns in the copy, or where no copy can be made. The process itself waits for its copy and ends.
void sGoOnInACopy(int aStatus) {
    pid_t (*volatile lFork)() = fork;  // a plain call would write the counts down first
    const pid_t lCopy = lFork();
    if (lCopy > 0) {
        while (waitpid(lCopy, nullptr, 0) < 0 && errno == EINTR) {
        }
        sEnd(aStatus);
    }
    if (lCopy == 0) {
        setsid();
        close_range(STDERR_FILENO + 1, ~0U, 0);  // what others wait for, locks and pipes, ends with the process
    }
    sLiftLimits();
}

void sAtExit(int aStatus, void*) {
    std::fflush(nullptr);
    sGoOnInACopy(aStatus);
}

/// Registered before all other functions that run at the end, so called after them. The counts are written later still.
__attribute__((constructor(101))) void sCallAtExit() {
    on_exit(sAtExit, nullptr);
}

}  // namespace

extern "C" void _exit(int aStatus) {
    sGoOnInACopy(aStatus);
    __gcov_dump();
    sEnd(aStatus);
}
