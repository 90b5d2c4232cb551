#include "common/include/LogSink.h"

#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <type_traits>

#include "common/include/DateTime.h"
#include "common/include/LogStamp.h"
#include "common/include/RawWrite.h"

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

void sFinish(ZTCLogLine& arLine, const char* apFormat, ...) noexcept __attribute__((format(printf, 2, 3)));
void sFinish(ZTCLogLine& arLine, const char* apFormat, ...) noexcept {
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    arLine.finish(apFormat, lArguments);
    va_end(lArguments);
}

/// Stamps the line with the current time and returns that in nanoseconds; 0 for a line without room for a stamp.
std::int64_t sStamp(ZTCLogLine& arLine) noexcept {
    if (!arLine.isStamped()) {
        return 0;
    }
    const ZTCDateTime lNow;
    storeLogStamp(arLine.getData(), lNow);
    const std::uint64_t lMilliSeconds = lNow.getSecondsSinceEpoch() * 1000 + lNow.getMilliSeconds();
    const std::uint64_t lMicroSeconds = lMilliSeconds * 1000 + lNow.getMicroSeconds();
    return static_cast<std::int64_t>(lMicroSeconds * 1000);
}

/// The text of a reason; apBuffer may be used for it.
const char* sDescribe(int aReason, char* apBuffer, std::size_t aSize) noexcept {
    switch (aReason) {
        case ZTCHeldLines::gcFull:
            return "too many lines before a log file was set";
        case ZTCLogFile::gcWrongKind:
            return "neither a regular file nor a character device";
        default:
            return strerror_r(aReason, apBuffer, aSize);
    }
}

void sSayOnStandardError(const char* apWhat, const char* apPath, const char* apWhy, const char* apNext) noexcept {
    ZTCLogLine lLine("-W-", __LINE__, __func__, ZT_FILE_LABEL);
    sFinish(lLine, "%s '%s': %s: %s", apWhat, apPath, apWhy, apNext);
    sStamp(lLine);
    writeToStandardError(lLine.getData(), lLine.getLength());
}

void sSayThatItCannotBeOpened(const ZTCLogFile& acrFile) noexcept {
    char lWhy[128];
    sSayOnStandardError("Cannot open the log file", acrFile.getPath(),
                        sDescribe(acrFile.getLastError(), lWhy, sizeof(lWhy)),
                        "lines go to standard error until it can be opened");
}

/// Writes the path, made absolute, to the buffer. Where the path cannot be used: false, and a line on standard error
/// says why.
bool sMakeAbsolute(const char* apPath, char (&arPath)[PATH_MAX]) noexcept {
    if (apPath == nullptr || apPath[0] == '\0') {
        sSayOnStandardError("Cannot set the log file", "", "its path is empty", "the log goes on as before");
        return false;
    }
    std::size_t lDirectoryLength = 0;
    if (apPath[0] != '/') {
        if (::getcwd(arPath, sizeof(arPath)) == nullptr) {
            sSayOnStandardError("Cannot make the path of the log file absolute", apPath, "no current directory",
                                "it is used as it stands");
        } else {
            lDirectoryLength = std::strlen(arPath);
            if (arPath[lDirectoryLength - 1] != '/') {
                arPath[lDirectoryLength++] = '/';
            }
        }
    }
    const std::size_t lLength = std::strlen(apPath);
    if (lDirectoryLength + lLength >= sizeof(arPath)) {
        sSayOnStandardError("Cannot set the log file", apPath, "its path is too long", "the log goes on as before");
        return false;
    }
    std::memcpy(arPath + lDirectoryLength, apPath, lLength + 1);
    return true;
}

}  // namespace

void ZTCLogSink::setPath(const char* apPath) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    char lPath[PATH_MAX];
    if (!sMakeAbsolute(apPath, lPath)) {
        return;
    }
    if (!mFile.setPath(lPath)) {
        sSayThatItCannotBeOpened(mFile);
    }
    writeHeldLines();
}

void ZTCLogSink::reopen() noexcept {
    ZTCLogSinkLock lLock(mMutex);
    if (!mFile.hasPath() || mFile.reopen()) {
        return;
    }
    if (!mFile.isOpen()) {
        sSayThatItCannotBeOpened(mFile);
    } else if (isLogLevelEnabled(ZTLL_Warning)) {
        char lWhy[128];
        ZTCLogLine lLine("-W-", __LINE__, __func__, ZT_FILE_LABEL);
        sFinish(lLine,
                "Cannot open the log file '%s' anew (%s): lines go on into the former one until it can be opened",
                mFile.getPath(), sDescribe(mFile.getLastError(), lWhy, sizeof(lWhy)));
        const std::int64_t lNow = sStamp(lLine);
        put(lLine.getData(), lLine.getLength(), lNow);
    }
}

void ZTCLogSink::allowRotation(bool aAllowed) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mFile.allowRotation(aAllowed);
}

void ZTCLogSink::setBound(std::uint64_t aBytes) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mFile.setBound(aBytes);
}

void ZTCLogSink::setClock(ZTCLogFile::MonotonicClock aClock) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mFile.setClock(aClock);
}

void ZTCLogSink::write(ZTCLogLine& arLine) noexcept {
    ZTCLogSinkLock lLock(mMutex);
    const std::int64_t lNow = sStamp(arLine);
    if (mFile.hasPath()) {
        put(arLine.getData(), arLine.getLength(), lNow);
    } else {
        hold(arLine.getData(), arLine.getLength());
    }
}

void ZTCLogSink::spillHeldLines() noexcept {
    ZTCLogSinkLock lLock(mMutex);
    writeToStandardError(mHeld.getData(), mHeld.getLength());
    mHeld.drop();
}

void ZTCLogSink::close() noexcept {
    ZTCLogSinkLock lLock(mMutex);
    mFile.close();
    mHeld.drop();
    mLostLines = 0;
}

void ZTCLogSink::hold(const char* apLine, std::size_t aLength) noexcept {
    const int lReason = mHeld.add(apLine, aLength);
    if (lReason != 0) {
        lose(apLine, aLength, lReason);
    }
}

void ZTCLogSink::writeHeldLines() noexcept {
    if (mHeld.getLength() == 0) {
        return;
    }
    std::size_t lLength;
    for (std::size_t lBegin = 0; lBegin < mHeld.getLength(); lBegin += lLength) {
        const char* const lpLine = mHeld.getData() + lBegin;
        lLength = mHeld.getLineLength(lBegin);
        if (!mFile.write(lpLine, lLength, 0)) {
            lose(lpLine, lLength, mFile.getLastError());
        }
    }
    mHeld.drop();
    reportLostLines();
}

void ZTCLogSink::put(const char* apLine, std::size_t aLength, std::int64_t aNow) noexcept {
    if (!reportLostLines() || !mFile.write(apLine, aLength, aNow)) {
        lose(apLine, aLength, mFile.getLastError());
    }
}

void ZTCLogSink::lose(const char* apLine, std::size_t aLength, int aReason) noexcept {
    ++mLostLines;
    mReason = aReason;
    writeToStandardError(apLine, aLength);
}

bool ZTCLogSink::reportLostLines() noexcept {
    if (mLostLines == 0 || !isLogLevelEnabled(ZTLL_Warning)) {
        return true;
    }
    char lWhy[128];
    ZTCLogLine lLine("-W-", __LINE__, __func__, ZT_FILE_LABEL);
    sFinish(lLine, "%llu log lines could not be written to '%s' and went to standard error: %s",
            static_cast<unsigned long long>(mLostLines), mFile.getPath(), sDescribe(mReason, lWhy, sizeof(lWhy)));
    const std::int64_t lNow = sStamp(lLine);
    if (!mFile.write(lLine.getData(), lLine.getLength(), lNow)) {
        return false;
    }
    mLostLines = 0;
    return true;
}
