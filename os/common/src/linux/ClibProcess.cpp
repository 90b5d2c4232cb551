#include <fcntl.h>
#include <signal.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "os/common/include/Clib.h"
#include "os/common/src/linux/ClibFailure.h"

namespace {

/// The state letter of the process, or 0 where it cannot be had.
char sProcessState(::pid_t aProcessId) {
    char lPath[64];
    ClibSprintf(lPath, sizeof(lPath), "/proc/%d/stat", static_cast<int>(aProcessId));
    const int lDescriptor = ClibTryOpen(lPath, O_RDONLY);
    if (lDescriptor < 0) {
        return 0;
    }

    char lStat[512] = {};
    ::ssize_t lCount;
    do {
        lCount = ::read(lDescriptor, lStat, sizeof(lStat) - 1);
    } while (lCount < 0 && errno == EINTR);
    ClibClose(lDescriptor);

    // The name, which may hold any character, is in parentheses before the state.
    const char* lpNameEnd = lCount > 0 ? std::strrchr(lStat, ')') : nullptr;
    return lpNameEnd != nullptr && lpNameEnd[1] == ' ' ? lpNameEnd[2] : '\0';
}

}  // namespace

bool ClibIsProcessAlive(::pid_t aProcessId) {
    if (aProcessId <= 0) {
        return false;
    }
    if (::kill(aProcessId, 0) != 0 && errno != EPERM) {
        return false;
    }
    const char lState = sProcessState(aProcessId);
    return lState != 'Z' && lState != 'X';
}

bool ClibKill(::pid_t aProcessId, int aSignal) {
    if (::kill(aProcessId, aSignal) == 0) {
        return true;
    }
    if (errno == ESRCH) {
        return false;
    }
    throwForNumber<ZTCClibKillFailedEx>("Signalling process", static_cast<int>(aProcessId), errno);
}

::pid_t ClibFork() {
    const ::pid_t lProcessId = ::fork();
    if (lProcessId < 0) {
        throwWith<ZTCClibForkFailedEx>("Making a process failed: %s", ZTCErrnoText(errno).get());
    }
    return lProcessId;
}

void ClibSetsid() {
    if (::setsid() < 0) {
        throwWith<ZTCClibSessionFailedEx>("Making a session failed: %s", ZTCErrnoText(errno).get());
    }
}

void ClibChdir(const char* apPath) {
    if (::chdir(apPath) != 0) {
        throwForPath<ZTCClibOpenFailedEx>("Changing into the directory", apPath, errno);
    }
}

void ClibRedirect(int aDescriptor, const char* apPath, int aFlags) {
    const int lDescriptor = ClibOpen(apPath, aFlags);
    int lResult;
    do {
        lResult = ::dup2(lDescriptor, aDescriptor);
    } while (lResult < 0 && errno == EINTR);
    const int lErrno = errno;
    ClibClose(lDescriptor);
    if (lResult < 0) {
        throwForPath<ZTCClibDupFailedEx>("Replacing a standard stream by", apPath, lErrno);
    }
}

std::int64_t ClibMonotonicMilliseconds() noexcept {
    struct timespec lNow {};
    ::clock_gettime(CLOCK_MONOTONIC, &lNow);
    return static_cast<std::int64_t>(lNow.tv_sec) * 1000 + lNow.tv_nsec / 1000000;
}

void ClibSleep(int aMilliseconds) noexcept {
    ::poll(nullptr, 0, aMilliseconds);
}
