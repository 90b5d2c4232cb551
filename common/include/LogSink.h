/// The file that the lines of the log go to.
///
/// Before a path is set, lines are held, up to a bound, and written to the first file that is set. A line that cannot
/// be written goes to standard error and is counted; the count is logged when writing works again. Each line is one
/// write to a file opened for appending, so that it is with the kernel when the call returns and several processes can
/// share a file. Where a write was cut, the next line starts on a line of its own all the same.
///
/// Who opens a file ignores SIGXFSZ from then on, unless it has a handler: a limit on file sizes is a failed write.
///
/// If the file is renamed or removed by somebody else, lines go on into it until reopen() or the next rotation.

#ifndef COMMON_INCLUDE_LOGSINK_H
#define COMMON_INCLUDE_LOGSINK_H

#include <limits.h>
#include <pthread.h>
#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <ctime>

#include "common/include/Log.h"
#include "common/include/LogLine.h"
#include "common/include/ThreadAnnotations.h"

/// The lock of a log file: constant-initialised and never destroyed, unlike the mutexes of the layers above.
class ZT_CAPABILITY("mutex") ZTCLogSinkMutex {
public:
    constexpr ZTCLogSinkMutex() noexcept = default;
    ZTCLogSinkMutex(const ZTCLogSinkMutex&) = delete;
    ZTCLogSinkMutex& operator=(const ZTCLogSinkMutex&) = delete;

    void lock() noexcept ZT_ACQUIRE() { pthread_mutex_lock(&mMutex); }
    void unlock() noexcept ZT_RELEASE() { pthread_mutex_unlock(&mMutex); }

private:
    pthread_mutex_t mMutex = PTHREAD_MUTEX_INITIALIZER;
};

/// A log file. All operations are safe from any thread, none throws, and there is no destructor to run at exit: who
/// makes one that is to go away calls close().
class ZTCLogSink {
public:
    /// A clock that never goes back, in milliseconds.
    using MonotonicClock = std::uint64_t (*)() noexcept;

    /// The most bytes of lines that are held before a path is set; further lines count as lines that cannot be written.
    static constexpr std::size_t gcHeldCapacity = std::size_t{64} * 1024;

    /// The milliseconds between two attempts to open a file that could not be opened or renamed.
    static constexpr std::uint64_t gcRetryIntervalMs = 1000;

    constexpr ZTCLogSink() noexcept = default;
    ZTCLogSink(const ZTCLogSink&) = delete;
    ZTCLogSink& operator=(const ZTCLogSink&) = delete;

    /// See setLogFilePath.
    void setPath(const char* apPath) noexcept ZT_EXCLUDES(mMutex);

    /// See reopenLogFile.
    void reopen() noexcept ZT_EXCLUDES(mMutex);

    /// See allowLogRotation.
    void allowRotation(bool aAllowed) noexcept ZT_EXCLUDES(mMutex);

    /// Replaces the size in bytes at which the file is renamed.
    void setBound(std::uint64_t aBytes) noexcept ZT_EXCLUDES(mMutex);

    /// Replaces the clock of the retries.
    void setClock(MonotonicClock aClock) noexcept ZT_EXCLUDES(mMutex);

    /// Stamps a finished line with the current time and writes or holds it.
    void write(ZTCLogLine& arLine) noexcept ZT_EXCLUDES(mMutex);

    /// Sends lines that are still held, since no path was ever set, to standard error.
    void spillHeldLines() noexcept ZT_EXCLUDES(mMutex);

    /// Gives up the file, the held lines and the path.
    void close() noexcept ZT_EXCLUDES(mMutex);

private:
    static std::uint64_t monotonicMilliSeconds() noexcept;

    void stamp(char* apStamp) noexcept ZT_REQUIRES(mMutex);
    void hold(const char* apLine, std::size_t aLength) noexcept ZT_REQUIRES(mMutex);
    void writeHeldLines() noexcept ZT_REQUIRES(mMutex);
    void dropHeldLines() noexcept ZT_REQUIRES(mMutex);
    void put(const char* apLine, std::size_t aLength) noexcept ZT_REQUIRES(mMutex);
    void lose(const char* apLine, std::size_t aLength) noexcept ZT_REQUIRES(mMutex);
    bool reportLostLines() noexcept ZT_REQUIRES(mMutex);
    bool prepare(std::size_t aLength) noexcept ZT_REQUIRES(mMutex);
    bool isSizeStale() const noexcept ZT_REQUIRES(mMutex);
    bool isRetryDue() noexcept ZT_REQUIRES(mMutex);
    void failToOpen(int aError) noexcept ZT_REQUIRES(mMutex);
    void sayOnStandardError(const char* apWhat, const char* apPath, const char* apWhy, const char* apNext) noexcept
        ZT_REQUIRES(mMutex);
    bool openPath() noexcept ZT_REQUIRES(mMutex);
    bool rotate() noexcept ZT_REQUIRES(mMutex);
    bool writeWhole(const char* apBytes, std::size_t aCount) noexcept ZT_REQUIRES(mMutex);
    void closeDescriptor() noexcept ZT_REQUIRES(mMutex);

    /// Within so many bytes of the bound, and after so many nanoseconds, the file's size is asked for anew: other
    /// processes may write to it too. In between it is the size that was found and what was written since.
    static constexpr std::uint64_t gcSizeSlack = std::uint64_t{64} * 1024;
    static constexpr std::int64_t gcSizeAgeNs = 1000000;

    ZTCLogSinkMutex mMutex;

    // Guarded by the mutex.
    MonotonicClock mClock ZT_GUARDED_BY(mMutex) = &ZTCLogSink::monotonicMilliSeconds;
    std::uint64_t mBound ZT_GUARDED_BY(mMutex) = gcDefaultLogFileBound;
    std::uint64_t mNextAttemptMs ZT_GUARDED_BY(mMutex) = 0;
    std::uint64_t mLostLines ZT_GUARDED_BY(mMutex) = 0;
    int mLastError ZT_GUARDED_BY(mMutex) = 0;  ///< reason of the latest failure
    int mDescriptor ZT_GUARDED_BY(mMutex) = -1;
    std::uint64_t mSize ZT_GUARDED_BY(mMutex) = 0;     ///< of the open file, as far as it is known
    std::int64_t mSizeTime ZT_GUARDED_BY(mMutex) = 0;  ///< when it was asked for; on the clock of mNow
    std::int64_t mNow ZT_GUARDED_BY(mMutex) = 0;       ///< nanoseconds of the latest stamp; 0: the line has none
    bool mIsRegularFile ZT_GUARDED_BY(mMutex) = false;
    bool mIsTorn ZT_GUARDED_BY(mMutex) = false;           ///< the file ends inside of a line
    bool mIsReopenPending ZT_GUARDED_BY(mMutex) = false;  ///< the descriptor is to be replaced when the path opens
    bool mIsRotationAllowed ZT_GUARDED_BY(mMutex) = false;
    bool mHasPath ZT_GUARDED_BY(mMutex) = false;
    char* mpHeld ZT_GUARDED_BY(mMutex) = nullptr;
    std::size_t mHeldLength ZT_GUARDED_BY(mMutex) = 0;
    std::size_t mHeldCapacity ZT_GUARDED_BY(mMutex) = 0;
    std::time_t mStampSecond ZT_GUARDED_BY(mMutex) = 0;
    bool mHasStamp ZT_GUARDED_BY(mMutex) = false;
    char mStamp[ZTCLogLine::gcStampLength] ZT_GUARDED_BY(mMutex) = {};  ///< of mStampSecond
    char mPath[PATH_MAX] ZT_GUARDED_BY(mMutex) = {};
};

#endif
