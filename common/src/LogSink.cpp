#include "common/include/LogSink.h"

#include <fcntl.h>
#include <limits.h>
#include <poll.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <type_traits>

static_assert(std::is_trivially_destructible_v<ZTCLogSink>, "nothing of the log ends before the process does");

namespace {

class ZT_SCOPED_CAPABILITY ZTCLogSinkLock {
public:
    explicit ZTCLogSinkLock(ZTCLogSinkMutex& arMutex) noexcept ZT_ACQUIRE(arMutex) : mrMutex(arMutex) {
        mrMutex.lock();
    }
    ZTCLogSinkLock(const ZTCLogSinkLock&) = delete;
    ZTCLogSinkLock& operator=(const ZTCLogSinkLock&) = delete;
    ~ZTCLogSinkLock() ZT_RELEASE() { mrMutex.unlock(); }

private:
    ZTCLogSinkMutex& mrMutex;
};

/// While it lives, a write into a closed pipe or past the limit on file sizes fails and does not end the process.
class ZTCWriteSignalGuard {
public:
    ZTCWriteSignalGuard() noexcept {
        sigemptyset(&mSignals);
        sigaddset(&mSignals, SIGPIPE);
        sigaddset(&mSignals, SIGXFSZ);
        pthread_sigmask(SIG_BLOCK, &mSignals, &mFormerMask);
    }
    ZTCWriteSignalGuard(const ZTCWriteSignalGuard&) = delete;
    ZTCWriteSignalGuard& operator=(const ZTCWriteSignalGuard&) = delete;
    ~ZTCWriteSignalGuard() { pthread_sigmask(SIG_SETMASK, &mFormerMask, nullptr); }

    /// Takes back the signal that came with a failure.
    void takeBackSignalOf(int aError) noexcept {
        if (EPIPE == aError || EFBIG == aError) {
            const std::timespec lAtOnce{};
            while (sigtimedwait(&mSignals, nullptr, &lAtOnce) > 0) {
            }
        }
    }

private:
    sigset_t mSignals{};
    sigset_t mFormerMask{};
};

/// Makes writes past the limit on file sizes fail for good, where they would end the process.
void sIgnoreFileSizeSignal() noexcept {
    struct sigaction lFormer {};
    if (0 == sigaction(SIGXFSZ, nullptr, &lFormer) && 0 == (lFormer.sa_flags & SA_SIGINFO) &&
        SIG_DFL == lFormer.sa_handler) {
        struct sigaction lIgnore {};
        lIgnore.sa_handler = SIG_IGN;
        sigaction(SIGXFSZ, &lIgnore, nullptr);
    }
}

/// Writes all bytes. Returns 0 or the error; arWritten counts what was written either way.
int sWriteAll(int aDescriptor, const char* apBytes, std::size_t aCount, std::size_t& arWritten) noexcept {
    arWritten = 0;
    while (arWritten < aCount) {
        const ssize_t lResult = ::write(aDescriptor, apBytes + arWritten, aCount - arWritten);
        if (lResult > 0) {
            arWritten += static_cast<std::size_t>(lResult);
        } else if (0 == lResult) {
            return EIO;
        } else if (EINTR != errno) {
            return errno;
        }
    }
    return 0;
}

/// Drops what finds no room: a standard error that nobody reads holds up no thread. A pipe that is ready takes PIPE_BUF
/// bytes without waiting; one without a reader raises a signal.
void sWriteToStandardError(const char* apBytes, std::size_t aCount) noexcept {
    ZTCWriteSignalGuard lGuard;
    while (aCount > 0) {
        struct pollfd lStandardError = {STDERR_FILENO, POLLOUT, 0};
        const std::size_t lPart = std::min(aCount, std::size_t{PIPE_BUF});
        if (poll(&lStandardError, 1, 0) <= 0) {
            return;
        }
        std::size_t lWritten = 0;
        const int lError = sWriteAll(STDERR_FILENO, apBytes, lPart, lWritten);
        if (0 != lError) {
            lGuard.takeBackSignalOf(lError);
            return;
        }
        apBytes += lPart;
        aCount -= lPart;
    }
}

void sFinish(ZTCLogLine& arLine, const char* apFormat, ...) noexcept __attribute__((format(printf, 2, 3)));
void sFinish(ZTCLogLine& arLine, const char* apFormat, ...) noexcept {
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    arLine.finish(apFormat, lArguments);
    va_end(lArguments);
}

// Reasons beside those of errno.
constexpr int gcHeldOverflow = -1;
constexpr int gcWrongKind = -2;

/// The text of a reason; apBuffer may be used for it.
const char* sDescribe(int aError, char* apBuffer, std::size_t aSize) noexcept {
    switch (aError) {
        case gcHeldOverflow:
            return "too many lines before a log file was set";
        case gcWrongKind:
            return "neither a regular file nor a character device";
        default:
            return strerror_r(aError, apBuffer, aSize);
    }
}

void sPutDigits(char* apDigits, std::size_t aCount, long aValue) noexcept {
    for (std::size_t i = aCount; i > 0; --i) {
        apDigits[i - 1] = static_cast<char>('0' + aValue % 10);
        aValue /= 10;
    }
}

/// Errors that leave the file usable: the next line may fit.
bool sIsPassing(int aError) noexcept {
    return ENOSPC == aError || EFBIG == aError || EDQUOT == aError || EAGAIN == aError;
}

}  // namespace

void ZTCLogSink::setPath(const char* apPath) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    if (nullptr == apPath || '\0' == apPath[0]) {
        sayOnStandardError("Cannot set the log file", "", "its path is empty", "the log goes on as before");
        return;
    }

    char lPath[PATH_MAX] = {};
    std::size_t lDirectoryLength = 0;
    if ('/' != apPath[0]) {
        if (nullptr == getcwd(lPath, sizeof(lPath))) {
            lPath[0] = '\0';
            sayOnStandardError("Cannot make the path of the log file absolute", apPath, "no current directory",
                               "it is used as it stands");
        } else {
            lDirectoryLength = std::strlen(lPath);
            if ('/' != lPath[lDirectoryLength - 1]) {
                lPath[lDirectoryLength++] = '/';
            }
        }
    }
    const std::size_t lLength = std::strlen(apPath);
    if (lDirectoryLength + lLength >= sizeof(lPath)) {
        sayOnStandardError("Cannot set the log file", apPath, "its path is too long", "the log goes on as before");
        return;
    }
    std::memcpy(lPath + lDirectoryLength, apPath, lLength + 1);

    closeDescriptor();
    std::memcpy(mPath, lPath, sizeof(mPath));
    mHasPath = true;
    mNextAttemptMs = 0;
    if (!openPath()) {
        char lWhy[128];
        sayOnStandardError("Cannot open the log file", mPath, sDescribe(mLastError, lWhy, sizeof(lWhy)),
                           "lines go to standard error until it can be opened");
    }
    writeHeldLines();
}

void ZTCLogSink::reopen() noexcept {
    ZTCLogSinkLock lLock(mMutex);
    if (!mHasPath) {
        return;
    }
    mNextAttemptMs = 0;
    if (openPath()) {
        return;
    }
    char lWhy[128];
    const char* const lpWhy = sDescribe(mLastError, lWhy, sizeof(lWhy));
    if (mDescriptor < 0) {
        sayOnStandardError("Cannot open the log file", mPath, lpWhy,
                           "lines go to standard error until it can be opened");
        return;
    }
    mIsReopenPending = true;
    if (isLogLevelEnabled(ZTLL_Warning)) {
        ZTCLogLine lLine("-W-", __LINE__, __func__, ZT_FILE_LABEL);
        sFinish(lLine,
                "Cannot open the log file '%s' anew (%s): lines go on into the former one until it can be opened",
                mPath, lpWhy);
        stamp(lLine.getData());
        put(lLine.getData(), lLine.getLength());
    }
}

void ZTCLogSink::allowRotation(bool aAllowed) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mIsRotationAllowed = aAllowed;
}

void ZTCLogSink::setBound(std::uint64_t aBytes) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mBound = aBytes;
}

void ZTCLogSink::setClock(MonotonicClock aClock) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mClock = aClock;
}

void ZTCLogSink::write(ZTCLogLine& arLine) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mNow = 0;
    if (arLine.isStamped()) {
        stamp(arLine.getData());
    }
    if (mHasPath) {
        put(arLine.getData(), arLine.getLength());
    } else {
        hold(arLine.getData(), arLine.getLength());
    }
}

void ZTCLogSink::spillHeldLines() noexcept {
    ZTCLogSinkLock lLock(mMutex);
    if (0 != mHeldLength) {
        sWriteToStandardError(mpHeld, mHeldLength);
    }
    dropHeldLines();
}

void ZTCLogSink::close() noexcept {
    ZTCLogSinkLock lLock(mMutex);
    closeDescriptor();
    dropHeldLines();
    mHasPath = false;
    mLostLines = 0;
    mNextAttemptMs = 0;
}

std::uint64_t ZTCLogSink::monotonicMilliSeconds() noexcept {
    std::timespec lNow{};
    clock_gettime(CLOCK_MONOTONIC, &lNow);
    return static_cast<std::uint64_t>(lNow.tv_sec) * 1000 + static_cast<std::uint64_t>(lNow.tv_nsec) / 1000000;
}

void ZTCLogSink::stamp(char* apStamp) noexcept {
    constexpr std::size_t lcSecondsLength = 20;  // "YYYY-MM-DD HH:MM:SS."

    std::timespec lNow{};
    clock_gettime(CLOCK_REALTIME, &lNow);
    if (!mHasStamp || lNow.tv_sec != mStampSecond) {
        std::tm lLocal{};
        localtime_r(&lNow.tv_sec, &lLocal);
        std::memcpy(mStamp, "0000-00-00 00:00:00.", lcSecondsLength);
        sPutDigits(mStamp, 4, lLocal.tm_year + 1900L);
        sPutDigits(mStamp + 5, 2, lLocal.tm_mon + 1L);
        sPutDigits(mStamp + 8, 2, lLocal.tm_mday);
        sPutDigits(mStamp + 11, 2, lLocal.tm_hour);
        sPutDigits(mStamp + 14, 2, lLocal.tm_min);
        sPutDigits(mStamp + 17, 2, lLocal.tm_sec);
        mStampSecond = lNow.tv_sec;
        mHasStamp = true;
    }
    mNow = std::int64_t{lNow.tv_sec} * 1000000000 + lNow.tv_nsec;
    std::memcpy(apStamp, mStamp, lcSecondsLength);
    sPutDigits(apStamp + lcSecondsLength, 6, lNow.tv_nsec / 1000);
}

void ZTCLogSink::hold(const char* apLine, std::size_t aLength) noexcept {
    const std::size_t lNeeded = mHeldLength + aLength;
    if (lNeeded > gcHeldCapacity) {
        mLastError = gcHeldOverflow;
        lose(apLine, aLength);
        return;
    }
    if (lNeeded > mHeldCapacity) {
        const std::size_t lCapacity = std::min(gcHeldCapacity, std::max(lNeeded, mHeldCapacity * 2));
        void* const lpHeld = std::realloc(mpHeld, lCapacity);
        if (nullptr == lpHeld) {
            mLastError = ENOMEM;
            lose(apLine, aLength);
            return;
        }
        mpHeld = static_cast<char*>(lpHeld);
        mHeldCapacity = lCapacity;
    }
    std::memcpy(mpHeld + mHeldLength, apLine, aLength);
    mHeldLength = lNeeded;
}

void ZTCLogSink::writeHeldLines() noexcept {
    if (0 == mHeldLength) {
        return;
    }
    std::size_t lBegin = 0;
    while (lBegin < mHeldLength) {
        const char* const lpLine = mpHeld + lBegin;
        const void* const lpEnd = std::memchr(lpLine, '\n', mHeldLength - lBegin);
        const std::size_t lLength = static_cast<std::size_t>(static_cast<const char*>(lpEnd) - lpLine) + 1;
        if (!prepare(lLength) || !writeWhole(lpLine, lLength)) {
            lose(lpLine, lLength);
        }
        lBegin += lLength;
    }
    dropHeldLines();
    reportLostLines();
}

void ZTCLogSink::dropHeldLines() noexcept {
    std::free(mpHeld);
    mpHeld = nullptr;
    mHeldLength = 0;
    mHeldCapacity = 0;
}

void ZTCLogSink::put(const char* apLine, std::size_t aLength) noexcept {
    if (!reportLostLines() || !prepare(aLength) || !writeWhole(apLine, aLength)) {
        lose(apLine, aLength);
    }
}

void ZTCLogSink::lose(const char* apLine, std::size_t aLength) noexcept {
    ++mLostLines;
    sWriteToStandardError(apLine, aLength);
}

bool ZTCLogSink::reportLostLines() noexcept {
    if (0 == mLostLines || !isLogLevelEnabled(ZTLL_Warning)) {
        return true;
    }
    char lWhy[128];
    ZTCLogLine lLine("-W-", __LINE__, __func__, ZT_FILE_LABEL);
    sFinish(lLine, "%llu log lines could not be written to '%s' and went to standard error: %s",
            static_cast<unsigned long long>(mLostLines), mPath, sDescribe(mLastError, lWhy, sizeof(lWhy)));
    stamp(lLine.getData());
    if (!prepare(lLine.getLength()) || !writeWhole(lLine.getData(), lLine.getLength())) {
        return false;
    }
    mLostLines = 0;
    return true;
}

/// Makes the file ready for a line of this length: opened, and within its bound.
bool ZTCLogSink::prepare(std::size_t aLength) noexcept {
    if (mDescriptor < 0) {
        if (!isRetryDue() || !openPath()) {
            return false;
        }
    } else if (mIsReopenPending && isRetryDue()) {
        openPath();
    }
    if (!mIsRotationAllowed || !mIsRegularFile) {
        return true;
    }
    if (mSize + aLength + gcSizeSlack > mBound || isSizeStale()) {
        struct stat lStatus {};
        if (0 != fstat(mDescriptor, &lStatus)) {
            return true;
        }
        mSize = static_cast<std::uint64_t>(lStatus.st_size);
        mSizeTime = mNow;
    }
    return 0 == mSize || mSize + aLength <= mBound || rotate();
}

/// Whether others may have changed the file's size since it was asked for. A line without a stamp has no time.
bool ZTCLogSink::isSizeStale() const noexcept {
    const std::int64_t lAge = mNow - mSizeTime;
    return 0 == mNow || lAge < 0 || lAge >= gcSizeAgeNs;
}

bool ZTCLogSink::isRetryDue() noexcept {
    return mClock() >= mNextAttemptMs;
}

void ZTCLogSink::failToOpen(int aError) noexcept {
    mLastError = aError;
    mNextAttemptMs = mClock() + gcRetryIntervalMs;
}

/// Opens the path in place of what was open; leaves that as it was on failure.
bool ZTCLogSink::openPath() noexcept {
    constexpr int lcFlags = O_APPEND | O_CREAT | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;

    // Reading tells whether the file ends inside of a line; who may only write goes without.
    int lDescriptor = -1;
    do {
        lDescriptor = ::open(mPath, O_RDWR | lcFlags, 0640);
    } while (lDescriptor < 0 && EINTR == errno);
    if (lDescriptor < 0 && EACCES == errno) {
        do {
            lDescriptor = ::open(mPath, O_WRONLY | lcFlags, 0640);
        } while (lDescriptor < 0 && EINTR == errno);
    }
    if (lDescriptor >= 0 && lDescriptor <= STDERR_FILENO) {
        // Somebody runs us without standard descriptors, and may yet put others into their places.
        const int lMoved = fcntl(lDescriptor, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
        const int lError = errno;
        ::close(lDescriptor);
        errno = lError;
        lDescriptor = lMoved;
    }
    if (lDescriptor < 0) {
        failToOpen(errno);
        return false;
    }

    struct stat lStatus {};
    if (0 != fstat(lDescriptor, &lStatus)) {
        failToOpen(errno);
        ::close(lDescriptor);
        return false;
    }
    if (!S_ISREG(lStatus.st_mode) && !S_ISCHR(lStatus.st_mode)) {
        failToOpen(gcWrongKind);
        ::close(lDescriptor);
        return false;
    }

    closeDescriptor();
    sIgnoreFileSizeSignal();
    mDescriptor = lDescriptor;
    mIsRegularFile = S_ISREG(lStatus.st_mode);
    char lLast = '\n';
    mIsTorn = mIsRegularFile && lStatus.st_size > 0 && 1 == pread(mDescriptor, &lLast, 1, lStatus.st_size - 1) &&
              '\n' != lLast;
    return true;
}

/// Renames the file that has reached its bound and begins anew. On failure the bound still holds: the line is lost.
bool ZTCLogSink::rotate() noexcept {
    if (!isRetryDue()) {
        return false;
    }
    struct stat lOpened {};
    struct stat lNamed {};
    const bool lIsOurs = 0 == fstat(mDescriptor, &lOpened) && 0 == lstat(mPath, &lNamed) &&
                         lOpened.st_dev == lNamed.st_dev && lOpened.st_ino == lNamed.st_ino;
    if (lIsOurs) {
        char lFormer[PATH_MAX + 2];
        const std::size_t lLength = std::strlen(mPath);
        std::memcpy(lFormer, mPath, lLength);
        std::memcpy(lFormer + lLength, ".1", 3);
        if (0 != std::rename(mPath, lFormer)) {
            failToOpen(errno);
            return false;
        }
    }
    closeDescriptor();
    return openPath();
}

bool ZTCLogSink::writeWhole(const char* apBytes, std::size_t aCount) noexcept {
    std::size_t lWritten = 0;
    int lError = 0;
    if (mIsTorn) {
        lError = sWriteAll(mDescriptor, "\n", 1, lWritten);
        mIsTorn = 0 != lError;
    }
    if (0 == lError) {
        lError = sWriteAll(mDescriptor, apBytes, aCount, lWritten);
        mIsTorn = lWritten > 0 && lWritten < aCount;
        mSize += lWritten;
    }
    if (0 == lError) {
        return true;
    }
    mLastError = lError;
    if (!sIsPassing(lError)) {
        closeDescriptor();
        failToOpen(lError);
    }
    return false;
}

void ZTCLogSink::closeDescriptor() noexcept {
    if (mDescriptor >= 0) {
        ::close(mDescriptor);
    }
    mDescriptor = -1;
    mSizeTime = 0;
    mIsRegularFile = false;
    mIsTorn = false;
    mIsReopenPending = false;
}

void ZTCLogSink::sayOnStandardError(const char* apWhat, const char* apPath, const char* apWhy,
                                    const char* apNext) noexcept {
    ZTCLogLine lLine("-W-", __LINE__, __func__, ZT_FILE_LABEL);
    sFinish(lLine, "%s '%s': %s: %s", apWhat, apPath, apWhy, apNext);
    stamp(lLine.getData());
    sWriteToStandardError(lLine.getData(), lLine.getLength());
}
