/// The file of the log: opening it, its bound, and beginning it anew.
///
/// Each line is one write to a file opened for appending, so that it is with the kernel when the call returns and
/// several processes can share a file. Where a write was cut, the next line begins on a line of its own.
///
/// Opening a file ignores SIGXFSZ from then on, unless it has a handler: exceeding the limit on file sizes fails the
/// write instead of ending the process.

#ifndef COMMON_INCLUDE_LOGFILE_H
#define COMMON_INCLUDE_LOGFILE_H

#include <limits.h>

#include <cstddef>
#include <cstdint>

#include "common/include/Log.h"

/// Not locked: its owner guards it. Nothing throws, and there is no destructor to run at exit: the owner calls close()
/// where the descriptor is to be given back.
class ZTCLogFile {
public:
    /// A clock that never goes back, in milliseconds.
    using MonotonicClock = std::uint64_t (*)() noexcept;

    /// The milliseconds between two attempts to open a file that could not be opened or renamed.
    static constexpr std::uint64_t gcRetryIntervalMs = 1000;

    /// In place of an error number: what is at the path cannot be used as a log file.
    static constexpr int gcWrongKind = -2;

    constexpr ZTCLogFile() noexcept = default;
    ZTCLogFile(const ZTCLogFile&) = delete;
    ZTCLogFile& operator=(const ZTCLogFile&) = delete;

    /// Closes the file and opens the one at this absolute path, shorter than PATH_MAX. False where that fails; writing
    /// then tries again.
    bool setPath(const char* apPath) noexcept;
    const char* getPath() const noexcept { return mPath; }
    bool hasPath() const noexcept { return mPath[0] != '\0'; }

    /// Opens the path anew in place of what is open. False where that fails: what was open stays open, and writing
    /// tries again.
    bool reopen() noexcept;

    bool isOpen() const noexcept { return mDescriptor >= 0; }

    /// Writes a whole line. Opens the file first where it is not open, and begins it anew where it has reached its
    /// bound. aNow: nanoseconds of the line's time stamp, 0 where it has none. False where the line is not in the file,
    /// whole; getLastError() says why.
    bool write(const char* apLine, std::size_t aLength, std::int64_t aNow) noexcept;

    /// An error number, or gcWrongKind.
    int getLastError() const noexcept { return mLastError; }

    /// Whether a file that has reached its bound is renamed to NAME.1 and begun anew.
    void allowRotation(bool aAllowed) noexcept { mIsRotationAllowed = aAllowed; }

    /// Replaces the bound in bytes.
    void setBound(std::uint64_t aBytes) noexcept { mBound = aBytes; }

    /// Replaces the clock of the retries.
    void setClock(MonotonicClock aClock) noexcept { mClock = aClock; }

    /// Closes the file and forgets the path.
    void close() noexcept;

private:
    static std::uint64_t monotonicMilliSeconds() noexcept;

    bool openPath() noexcept;
    bool prepare(std::size_t aLength, std::int64_t aNow) noexcept;
    bool isSizeStale(std::int64_t aNow) const noexcept;
    bool isRetryDue() const noexcept { return mClock() >= mNextAttemptMs; }
    void fail(int aError) noexcept;
    bool rotate() noexcept;
    void closeDescriptor() noexcept;

    /// The size is read anew this near to the bound, and when this much time has passed: other processes may write to
    /// the file too. In between it is estimated: the size that was read plus the bytes written since.
    static constexpr std::uint64_t gcSizeSlack = std::uint64_t{64} * 1024;
    static constexpr std::int64_t gcSizeAgeNs = 1000000;

    MonotonicClock mClock = &ZTCLogFile::monotonicMilliSeconds;
    std::uint64_t mBound = gcDefaultLogFileBound;
    std::uint64_t mNextAttemptMs = 0;
    int mLastError = 0;
    int mDescriptor = -1;
    std::uint64_t mSize = 0;     ///< of the open file, as far as it is known
    std::int64_t mSizeTime = 0;  ///< when it was asked for; on the clock of the lines
    bool mIsRegularFile = false;
    bool mIsTorn = false;           ///< the file ends inside of a line
    bool mIsReopenPending = false;  ///< the descriptor is to be replaced when the path can be opened
    bool mIsRotationAllowed = false;
    char mPath[PATH_MAX] = {};
};

#endif
