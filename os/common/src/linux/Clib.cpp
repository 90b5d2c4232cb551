#include "os/common/include/Clib.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <sys/types.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "common/include/ThrowWith.h"

namespace {

constexpr int scFirstOwnDescriptor = 3;

/// Throws the exception with "DOING 'PATH' failed: REASON".
template <typename Exception>
[[noreturn]] void sThrowForPath(const char* apDoing, const char* apPath, int aErrno) {
    throwWith<Exception>("%s '%s' failed: %s", apDoing, apPath, ZTCErrnoText(aErrno).get());
}

/// The same with a descriptor or a process id.
template <typename Exception>
[[noreturn]] void sThrowForNumber(const char* apDoing, int aNumber, int aErrno) {
    throwWith<Exception>("%s %d failed: %s", apDoing, aNumber, ZTCErrnoText(aErrno).get());
}

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

// ---- Environment, memory and text ----

const char* ClibGetenv(const char* apName, char* apBuffer) {
    const char* lpValue = std::getenv(apName);
    if (lpValue != nullptr && apBuffer != nullptr) {
        std::memcpy(apBuffer, lpValue, std::strlen(lpValue) + 1);
    }
    return lpValue;
}

char* ClibStrcpy(char* apTo, std::size_t aSize, const char* apFrom) {
    const std::size_t lLength = std::strlen(apFrom);
    if (lLength >= aSize) {
        throwWith<ZTCInvalidEx>("A text of %zu characters does not fit into %zu bytes", lLength, aSize);
    }
    std::memcpy(apTo, apFrom, lLength + 1);
    return apTo;
}

int ClibStrcmp(const char* apLeft, const char* apRight) {
    return std::strcmp(apLeft, apRight);
}

int ClibSprintf(char* apBuffer, std::size_t aSize, const char* apFormat, ...) {
    if (aSize == 0) {
        return 0;
    }
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    const int lLength = std::vsnprintf(apBuffer, aSize, apFormat, lArguments);
    va_end(lArguments);
    if (lLength < 0) {
        apBuffer[0] = '\0';
        return 0;
    }
    const std::size_t lMost = aSize - 1;
    return static_cast<std::size_t>(lLength) < lMost ? lLength : static_cast<int>(lMost);
}

std::uint32_t ClibNtohl(std::uint32_t aNetworkOrder) {
    return ntohl(aNetworkOrder);
}

std::uint32_t ClibHtonl(std::uint32_t aHostOrder) {
    return htonl(aHostOrder);
}

void* ClibMemcpy(void* apTo, const void* apFrom, std::size_t aSize) {
    return aSize == 0 ? apTo : std::memcpy(apTo, apFrom, aSize);
}

void* ClibMemset(void* apTo, int aByte, std::size_t aSize) {
    return aSize == 0 ? apTo : std::memset(apTo, aByte, aSize);
}

// ---- Paths ----

void ClibMkdir(const char* apPath, int aMode) {
    if (::mkdir(apPath, static_cast<::mode_t>(aMode)) == 0) {
        return;
    }
    const int lError = errno;
    // A system call filter of a sandbox refuses by the mode alone (set-group-id), before the kernel looks at the path.
    struct ::stat lStatus;
    if (lError == EEXIST || (lError == EPERM && ::lstat(apPath, &lStatus) == 0)) {
        sThrowForPath<ZTCExistsEx>("Making the directory", apPath, EEXIST);
    }
    sThrowForPath<ZTCClibMkdirFailedEx>("Making the directory", apPath, lError);
}

void ClibMkfifo(const char* apPath, ::mode_t aMode) {
    if (::mkfifo(apPath, aMode) == 0) {
        return;
    }
    if (errno == EEXIST) {
        sThrowForPath<ZTCExistsEx>("Making the FIFO", apPath, EEXIST);
    }
    sThrowForPath<ZTCClibMkfifoFailedEx>("Making the FIFO", apPath, errno);
}

void ClibStat(const char* apPath, struct stat* apStatus) {
    if (::stat(apPath, apStatus) != 0) {
        sThrowForPath<ZTCClibStatFailedEx>("Getting the status of", apPath, errno);
    }
}

bool ClibLstat(const char* apPath, struct stat* apStatus) {
    if (::lstat(apPath, apStatus) == 0) {
        return true;
    }
    if (errno == ENOENT) {
        return false;
    }
    sThrowForPath<ZTCClibStatFailedEx>("Getting the status of", apPath, errno);
}

void ClibUtime(const char* apPath) {
    if (::utimensat(AT_FDCWD, apPath, nullptr, AT_SYMLINK_NOFOLLOW) != 0) {
        sThrowForPath<ZTCClibUtimeFailedEx>("Setting the times of", apPath, errno);
    }
}

bool ClibUnlink(const char* apPath) {
    if (::unlink(apPath) == 0) {
        return true;
    }
    if (errno == ENOENT) {
        return false;
    }
    sThrowForPath<ZTCClibUnlinkFailedEx>("Removing", apPath, errno);
}

const char* ClibFileKind(::mode_t aMode) {
    switch (aMode & S_IFMT) {
        case S_IFIFO:
            return "a FIFO";
        case S_IFREG:
            return "a regular file";
        case S_IFDIR:
            return "a directory";
        case S_IFLNK:
            return "a symbolic link";
        case S_IFSOCK:
            return "a socket";
        case S_IFCHR:
            return "a character device";
        case S_IFBLK:
            return "a block device";
        default:
            return "something unknown";
    }
}

ZTCErrnoText::ZTCErrnoText(int aErrno) {
    char lBuffer[sizeof(mText)];
    ClibSprintf(mText, sizeof(mText), "%s", ::strerror_r(aErrno, lBuffer, sizeof(lBuffer)));
}

// ---- Descriptors ----

int ClibOpen(const char* apPath, int aFlags, ::mode_t aMode) {
    const int lDescriptor = ClibTryOpen(apPath, aFlags, aMode);
    if (lDescriptor < 0) {
        sThrowForPath<ZTCClibOpenFailedEx>("Opening", apPath, -lDescriptor);
    }
    return lDescriptor;
}

int ClibTryOpen(const char* apPath, int aFlags, ::mode_t aMode) noexcept {
    int lDescriptor;
    do {
        lDescriptor = ::open(apPath, aFlags | O_CLOEXEC | O_NOCTTY, aMode);
    } while (lDescriptor < 0 && errno == EINTR);
    return ClibLiftDescriptor(lDescriptor < 0 ? -errno : lDescriptor);
}

int ClibEventFd() {
    const int lDescriptor = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    const int lLifted = ClibLiftDescriptor(lDescriptor < 0 ? -errno : lDescriptor);
    if (lLifted < 0) {
        throwWith<ZTCClibEventFailedEx>("Making an event counter failed: %s", ZTCErrnoText(-lLifted).get());
    }
    return lLifted;
}

void ClibRaiseEvent(int aDescriptor) noexcept {
    const std::uint64_t lcOne = 1;
    // A counter that is full (EAGAIN) is raised already.
    while (::write(aDescriptor, &lcOne, sizeof(lcOne)) < 0 && errno == EINTR) {
    }
}

void ClibResetEvent(int aDescriptor) noexcept {
    std::uint64_t lCount;
    while (::read(aDescriptor, &lCount, sizeof(lCount)) < 0 && errno == EINTR) {
    }
}

const char* ClibAdoptEventFd(int aDescriptor) noexcept {
    const int lFlags = ::fcntl(aDescriptor, F_GETFL);
    if (lFlags < 0) {
        return "it is not open";
    }
    char lPath[64];
    char lTarget[64] = {};
    ClibSprintf(lPath, sizeof(lPath), "/proc/self/fd/%d", aDescriptor);
    if (::readlink(lPath, lTarget, sizeof(lTarget) - 1) < 0 || std::strcmp(lTarget, "anon_inode:[eventfd]") != 0) {
        return "it is no eventfd";
    }
    if ((lFlags & O_NONBLOCK) == 0) {
        return "it is blocking";
    }
    if (::fcntl(aDescriptor, F_SETFD, FD_CLOEXEC) < 0) {
        return "it cannot be set to close-on-exec";
    }
    return nullptr;
}

int ClibLiftDescriptor(int aDescriptor) noexcept {
    if (aDescriptor < 0 || aDescriptor >= scFirstOwnDescriptor) {
        return aDescriptor;
    }
    const int lLifted = ::fcntl(aDescriptor, F_DUPFD_CLOEXEC, scFirstOwnDescriptor);
    const int lErrno = errno;
    ::close(aDescriptor);
    return lLifted < 0 ? -lErrno : lLifted;
}

void ClibClose(int aDescriptor) noexcept {
    if (aDescriptor >= 0) {
        // Not tried again after EINTR: the descriptor is gone by then, and may be another thread's.
        ::close(aDescriptor);
    }
}

void ClibFstat(int aDescriptor, struct stat* apStatus) {
    if (::fstat(aDescriptor, apStatus) != 0) {
        sThrowForNumber<ZTCClibStatFailedEx>("Getting the status of descriptor", aDescriptor, errno);
    }
}

::ssize_t ClibRead(int aDescriptor, void* apTo, std::size_t aSize) {
    const ::ssize_t lCount = ::read(aDescriptor, apTo, aSize);
    if (lCount >= 0) {
        return lCount;
    }
    switch (errno) {
        case EAGAIN:
        case EINTR:
            return -errno;
        default:
            sThrowForNumber<ZTCClibReadFailedEx>("Reading from descriptor", aDescriptor, errno);
    }
}

::ssize_t ClibWritev(int aDescriptor, const struct iovec* apParts, int aNumberOfParts) {
    const ::ssize_t lCount = ::writev(aDescriptor, apParts, aNumberOfParts);
    if (lCount >= 0) {
        return lCount;
    }
    switch (errno) {
        case EAGAIN:
        case EINTR:
        case EPIPE:
            return -errno;
        default:
            sThrowForNumber<ZTCClibWriteFailedEx>("Writing to descriptor", aDescriptor, errno);
    }
}

void ClibPwriteAll(int aDescriptor, const void* apFrom, std::size_t aSize, ::off_t aOffset) {
    const char* lpFrom = static_cast<const char*>(apFrom);
    while (aSize > 0) {
        const ::ssize_t lCount = ::pwrite(aDescriptor, lpFrom, aSize, aOffset);
        if (lCount < 0 && errno == EINTR) {
            continue;
        }
        if (lCount <= 0) {
            sThrowForNumber<ZTCClibWriteFailedEx>("Writing to descriptor", aDescriptor, lCount < 0 ? errno : ENOSPC);
        }
        lpFrom += lCount;
        aSize -= static_cast<std::size_t>(lCount);
        aOffset += lCount;
    }
}

void ClibFtruncate(int aDescriptor, ::off_t aSize) {
    int lResult;
    do {
        lResult = ::ftruncate(aDescriptor, aSize);
    } while (lResult != 0 && errno == EINTR);
    if (lResult != 0) {
        sThrowForNumber<ZTCClibTruncateFailedEx>("Cutting descriptor", aDescriptor, errno);
    }
}

bool ClibTryGive(int aDescriptor, ::uid_t aUser) noexcept {
    return ::fchown(aDescriptor, aUser, static_cast<::gid_t>(-1)) == 0;
}

bool ClibTrySetMode(int aDescriptor, ::mode_t aMode) noexcept {
    return ::fchmod(aDescriptor, aMode) == 0;
}

int ClibPoll(struct pollfd* apDescriptors, unsigned aNumberOfDescriptors, int aMilliseconds) {
    const int lReady = ::poll(apDescriptors, aNumberOfDescriptors, aMilliseconds);
    if (lReady >= 0) {
        return lReady;
    }
    if (errno == EINTR) {
        return -EINTR;
    }
    throwWith<ZTCClibPollFailedEx>("Waiting on %u descriptors failed: %s", aNumberOfDescriptors,
                                   ZTCErrnoText(errno).get());
}

std::size_t ClibBytesWaiting(int aDescriptor) {
    int lCount = 0;
    if (::ioctl(aDescriptor, FIONREAD, &lCount) != 0) {
        sThrowForNumber<ZTCClibReadFailedEx>("Counting the bytes of descriptor", aDescriptor, errno);
    }
    return lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
}

std::size_t ClibPipeCapacity(int aDescriptor) {
    const int lCapacity = ::fcntl(aDescriptor, F_GETPIPE_SZ);
    if (lCapacity < 0) {
        sThrowForNumber<ZTCClibReadFailedEx>("Getting the capacity of descriptor", aDescriptor, errno);
    }
    return static_cast<std::size_t>(lCapacity);
}

bool ClibTryLock(int aDescriptor) {
    int lResult;
    do {
        lResult = ::flock(aDescriptor, LOCK_EX | LOCK_NB);
    } while (lResult != 0 && errno == EINTR);
    if (lResult == 0) {
        return true;
    }
    if (errno == EWOULDBLOCK) {
        return false;
    }
    sThrowForNumber<ZTCClibLockFailedEx>("Locking descriptor", aDescriptor, errno);
}

// ---- Processes and time ----

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
    sThrowForNumber<ZTCClibKillFailedEx>("Signalling process", static_cast<int>(aProcessId), errno);
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
        sThrowForPath<ZTCClibOpenFailedEx>("Changing into the directory", apPath, errno);
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
        sThrowForPath<ZTCClibDupFailedEx>("Replacing a standard stream by", apPath, lErrno);
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
