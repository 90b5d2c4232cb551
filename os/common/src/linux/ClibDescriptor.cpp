#include <fcntl.h>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "os/common/include/Clib.h"
#include "os/common/src/linux/ClibFailure.h"

namespace {

constexpr int scFirstOwnDescriptor = 3;

}  // namespace

int ClibOpen(const char* apPath, int aFlags, ::mode_t aMode) {
    const int lDescriptor = ClibTryOpen(apPath, aFlags, aMode);
    if (lDescriptor < 0) {
        throwForPath<ZTCClibOpenFailedEx>("Opening", apPath, -lDescriptor);
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
        throwForNumber<ZTCClibStatFailedEx>("Getting the status of descriptor", aDescriptor, errno);
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
            throwForNumber<ZTCClibReadFailedEx>("Reading from descriptor", aDescriptor, errno);
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
            throwForNumber<ZTCClibWriteFailedEx>("Writing to descriptor", aDescriptor, errno);
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
            throwForNumber<ZTCClibWriteFailedEx>("Writing to descriptor", aDescriptor, lCount < 0 ? errno : ENOSPC);
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
        throwForNumber<ZTCClibTruncateFailedEx>("Cutting descriptor", aDescriptor, errno);
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
        throwForNumber<ZTCClibReadFailedEx>("Counting the bytes of descriptor", aDescriptor, errno);
    }
    return lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
}

std::size_t ClibPipeCapacity(int aDescriptor) {
    const int lCapacity = ::fcntl(aDescriptor, F_GETPIPE_SZ);
    if (lCapacity < 0) {
        throwForNumber<ZTCClibReadFailedEx>("Getting the capacity of descriptor", aDescriptor, errno);
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
    throwForNumber<ZTCClibLockFailedEx>("Locking descriptor", aDescriptor, errno);
}
