#include "common/include/LogFile.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "common/include/RawWrite.h"

namespace {

/// Makes writes past the limit on file sizes fail for good, where they would end the process.
void sIgnoreFileSizeSignal() noexcept {
    struct sigaction lFormer {};
    if (::sigaction(SIGXFSZ, nullptr, &lFormer) == 0 && (lFormer.sa_flags & SA_SIGINFO) == 0 &&
        lFormer.sa_handler == SIG_DFL) {
        struct sigaction lIgnore {};
        lIgnore.sa_handler = SIG_IGN;
        ::sigaction(SIGXFSZ, &lIgnore, nullptr);
    }
}

/// Errors that leave the file usable: the next line may fit.
bool sIsPassing(int aError) noexcept {
    return aError == ENOSPC || aError == EFBIG || aError == EDQUOT || aError == EAGAIN;
}

int sOpenForAppending(const char* apPath, int aAccess) noexcept {
    constexpr int lcFlags = O_APPEND | O_CREAT | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;
    int lDescriptor;
    do {
        lDescriptor = ::open(apPath, aAccess | lcFlags, 0640);
    } while (lDescriptor < 0 && errno == EINTR);
    return lDescriptor;
}

/// Moves a descriptor above the standard ones: a process that runs without them may yet put others into their places.
int sLifted(int aDescriptor) noexcept {
    if (aDescriptor < 0 || aDescriptor > STDERR_FILENO) {
        return aDescriptor;
    }
    const int lLifted = ::fcntl(aDescriptor, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
    const int lError = errno;
    ::close(aDescriptor);
    errno = lError;
    return lLifted;
}

bool sEndsInsideOfALine(int aDescriptor, ::off_t aSize) noexcept {
    char lLast = '\n';
    return aSize > 0 && ::pread(aDescriptor, &lLast, 1, aSize - 1) == 1 && lLast != '\n';
}

/// Whether the file was left inside of a line. One that another process is writing at this moment seems to be: it is
/// looked at again a little later.
bool sIsTorn(int aDescriptor, ::off_t aSize) noexcept {
    constexpr unsigned lcLooks = 3;
    constexpr std::timespec lcPause{0, 1000000};
    bool lIsTorn = sEndsInsideOfALine(aDescriptor, aSize);
    for (unsigned lLook = 1; lIsTorn && lLook < lcLooks; ++lLook) {
        ::nanosleep(&lcPause, nullptr);
        struct stat lStatus {};
        lIsTorn = ::fstat(aDescriptor, &lStatus) != 0 || sEndsInsideOfALine(aDescriptor, lStatus.st_size);
    }
    return lIsTorn;
}

}  // namespace

bool ZTCLogFile::setPath(const char* apPath) noexcept {
    closeDescriptor();
    std::memcpy(mPath, apPath, std::strlen(apPath) + 1);
    mNextAttemptMs = 0;
    return openPath();
}

bool ZTCLogFile::reopen() noexcept {
    mNextAttemptMs = 0;
    const bool lIsOpened = openPath();
    mIsReopenPending = !lIsOpened && isOpen();
    return lIsOpened;
}

bool ZTCLogFile::write(const char* apLine, std::size_t aLength, std::int64_t aNow) noexcept {
    if (!prepare(aLength, aNow)) {
        return false;
    }
    std::size_t lWritten = 0;
    int lError = 0;
    if (mIsTorn) {
        lError = writeAll(mDescriptor, "\n", 1, lWritten);
        mIsTorn = lError != 0;
    }
    if (lError == 0) {
        lError = writeAll(mDescriptor, apLine, aLength, lWritten);
        mIsTorn = lWritten > 0 && lWritten < aLength;
        mSize += lWritten;
    }
    if (lError == 0) {
        return true;
    }
    mLastError = lError;
    if (!sIsPassing(lError)) {
        closeDescriptor();
        fail(lError);
    }
    return false;
}

void ZTCLogFile::close() noexcept {
    closeDescriptor();
    mPath[0] = '\0';
    mNextAttemptMs = 0;
}

std::uint64_t ZTCLogFile::monotonicMilliSeconds() noexcept {
    std::timespec lNow{};
    ::clock_gettime(CLOCK_MONOTONIC, &lNow);
    return static_cast<std::uint64_t>(lNow.tv_sec) * 1000 + static_cast<std::uint64_t>(lNow.tv_nsec) / 1000000;
}

/// Makes the file ready for a line of this length: opened, and within its bound.
bool ZTCLogFile::prepare(std::size_t aLength, std::int64_t aNow) noexcept {
    if (!isOpen()) {
        if (!isRetryDue() || !openPath()) {
            return false;
        }
    } else if (mIsReopenPending && isRetryDue()) {
        openPath();
    }
    if (!mIsRotationAllowed || !mIsRegularFile) {
        return true;
    }
    if (mSize + aLength + gcSizeSlack > mBound || isSizeStale(aNow)) {
        struct stat lStatus {};
        if (::fstat(mDescriptor, &lStatus) != 0) {
            return true;
        }
        mSize = static_cast<std::uint64_t>(lStatus.st_size);
        mSizeTime = aNow;
    }
    return mSize == 0 || mSize + aLength <= mBound || rotate();
}

/// Whether others may have changed the file's size since it was asked for. A line without a stamp has no time.
bool ZTCLogFile::isSizeStale(std::int64_t aNow) const noexcept {
    const std::int64_t lAge = aNow - mSizeTime;
    return aNow == 0 || lAge < 0 || lAge >= gcSizeAgeNs;
}

void ZTCLogFile::fail(int aError) noexcept {
    mLastError = aError;
    mNextAttemptMs = mClock() + gcRetryIntervalMs;
}

/// Opens the path in place of what was open; leaves that as it was on failure.
bool ZTCLogFile::openPath() noexcept {
    // Reading shows whether the file ends inside of a line. For a file that may only be written this is not known.
    int lDescriptor = sOpenForAppending(mPath, O_RDWR);
    if (lDescriptor < 0 && errno == EACCES) {
        lDescriptor = sOpenForAppending(mPath, O_WRONLY);
    }
    lDescriptor = sLifted(lDescriptor);
    struct stat lStatus {};
    if (lDescriptor < 0 || ::fstat(lDescriptor, &lStatus) != 0) {
        fail(errno);
    } else if (!S_ISREG(lStatus.st_mode) && !S_ISCHR(lStatus.st_mode)) {
        fail(gcWrongKind);
    } else {
        closeDescriptor();
        sIgnoreFileSizeSignal();
        mDescriptor = lDescriptor;
        mIsRegularFile = S_ISREG(lStatus.st_mode);
        mIsTorn = mIsRegularFile && sIsTorn(lDescriptor, lStatus.st_size);
        return true;
    }
    if (lDescriptor >= 0) {
        ::close(lDescriptor);
    }
    return false;
}

/// Renames the file that has reached its bound and begins anew. On failure the bound still holds: the line is lost.
bool ZTCLogFile::rotate() noexcept {
    if (!isRetryDue()) {
        return false;
    }
    struct stat lOpened {};
    struct stat lNamed {};
    const bool lIsOurs = ::fstat(mDescriptor, &lOpened) == 0 && ::lstat(mPath, &lNamed) == 0 &&
                         lOpened.st_dev == lNamed.st_dev && lOpened.st_ino == lNamed.st_ino;
    if (lIsOurs) {
        char lFormer[PATH_MAX + 2];
        const std::size_t lLength = std::strlen(mPath);
        std::memcpy(lFormer, mPath, lLength);
        std::memcpy(lFormer + lLength, ".1", 3);
        if (std::rename(mPath, lFormer) != 0) {
            fail(errno);
            return false;
        }
    }
    closeDescriptor();
    return openPath();
}

void ZTCLogFile::closeDescriptor() noexcept {
    if (isOpen()) {
        ::close(mDescriptor);
    }
    mDescriptor = -1;
    mSizeTime = 0;
    mIsRegularFile = false;
    mIsTorn = false;
    mIsReopenPending = false;
}
