/// Where the lines of the log go.
///
/// Before a path is set, lines are held, up to a bound, and written to the first file that is set. A line that cannot
/// be written goes to standard error and is counted. The count is logged when writing works again.
///
/// If the file is renamed or removed by somebody else, lines go on into it until reopen() or the next rotation.

#ifndef COMMON_INCLUDE_LOGSINK_H
#define COMMON_INCLUDE_LOGSINK_H

#include <pthread.h>

#include <cstddef>
#include <cstdint>

#include "common/include/HeldLines.h"
#include "common/include/LogFile.h"
#include "common/include/LogLine.h"
#include "common/include/ThreadAnnotations.h"

/// The lock of a log: constant-initialised and never destroyed, unlike the mutexes of the layers above.
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

/// All operations are safe from any thread, and none throws. There is no destructor to run at exit: an owner that gives
/// up a sink calls close().
class ZTCLogSink {
public:
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
    void setClock(ZTCLogFile::MonotonicClock aClock) noexcept ZT_EXCLUDES(mMutex);

    /// Stamps a finished line with the current time and writes or holds it.
    void write(ZTCLogLine& arLine) noexcept ZT_EXCLUDES(mMutex);

    /// Sends lines that are still held, since no path was ever set, to standard error.
    void spillHeldLines() noexcept ZT_EXCLUDES(mMutex);

    /// Gives up the file, the held lines and the path.
    void close() noexcept ZT_EXCLUDES(mMutex);

private:
    void hold(const char* apLine, std::size_t aLength) noexcept ZT_REQUIRES(mMutex);
    void writeHeldLines() noexcept ZT_REQUIRES(mMutex);
    void put(const char* apLine, std::size_t aLength, std::int64_t aNow) noexcept ZT_REQUIRES(mMutex);
    void lose(const char* apLine, std::size_t aLength, int aReason) noexcept ZT_REQUIRES(mMutex);
    bool reportLostLines() noexcept ZT_REQUIRES(mMutex);

    ZTCLogSinkMutex mMutex;

    // Guarded by the mutex.
    ZTCHeldLines mHeld ZT_GUARDED_BY(mMutex);
    ZTCLogFile mFile ZT_GUARDED_BY(mMutex);
    std::uint64_t mLostLines ZT_GUARDED_BY(mMutex) = 0;
    int mReason ZT_GUARDED_BY(mMutex) = 0;  ///< why the latest of them was lost
};

#endif
