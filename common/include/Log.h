/// The log: levels, the calls of its back end, and the macros through which everything logs, traces and throws.
///
/// A line is `YYYY-MM-DD HH:MM:SS.uuuuuu -N- FILE:LINE FUNCTION: TEXT` in local time, or `-PROT- TEXT` for protocol
/// dumps. Control characters inside of TEXT are escaped, so that one call is one line. When a call returns, its line is
/// with the kernel. Every function here may be called from any thread, before main and while the process exits, and
/// none throws. None may be called from a signal handler. The value of errno is kept.

#ifndef COMMON_INCLUDE_LOG_H
#define COMMON_INCLUDE_LOG_H

#include <atomic>
#include <cstdint>

#include "common/include/FileLabel.h"

/// The levels, one bit each. A set of levels is the log code.
enum ZTELogLevel : unsigned {
    ZTLL_Halt = 1,
    ZTLL_Alert = 2,
    ZTLL_Critical = 4,
    ZTLL_Error = 8,
    ZTLL_Warning = 16,
    ZTLL_Notice = 32,
    ZTLL_Info = 64,
    ZTLL_Debug = 128,
    ZTLL_Nap = 256  ///< protocol dumps; enabled whatever the log code
};

/// The log code from the first line on: halt to notice.
inline constexpr unsigned gcDefaultLogCode = 63;

/// The size in bytes at which the log file is renamed and begun anew.
inline constexpr std::uint64_t gcDefaultLogFileBound = 64ull * 1024 * 1024;

/// The current log code. Read through isLogLevelEnabled or getLogCode.
extern std::atomic<unsigned> gLogCode;

/// Whether a line of this level would be written now.
inline bool isLogLevelEnabled(unsigned aLevel) noexcept {
    // Relaxed: a line at the moment of a change may go either way, and nothing else hangs on the value.
    return (aLevel & (gLogCode.load(std::memory_order_relaxed) | ZTLL_Nap)) != 0;
}

/// Writes one line with time stamp and source position, if the level is enabled.
void PrintLogMessageWithTimeStamp(unsigned aLevel, const char* apMark, unsigned aLine, const char* apFunction,
                                  const char* apFile, const char* apFormat, ...) noexcept
    __attribute__((format(printf, 6, 7)));

/// Writes one line of mark and text alone, if the level is enabled.
void PrintLogMessage(unsigned aLevel, const char* apMark, const char* apFormat, ...) noexcept
    __attribute__((format(printf, 3, 4)));

/// Directs all further lines to this file, and writes to it what was held so far. A relative path is made absolute at
/// once. The file is made with mode 0640 less the umask; a symbolic link, and whatever is neither a regular file nor a
/// character device, is refused: the lines go to standard error then and are counted, and the opening is tried again
/// with later lines, at most once a second. A null or empty path changes nothing; a line on standard error says so.
void setLogFilePath(const char* apPath) noexcept;

/// Sets the log code: the OR of the enabled levels.
void setLogCode(unsigned aMask) noexcept;

/// Reads the log code.
void getLogCode(unsigned& arMask) noexcept;

/// Closes the log file and opens its path anew. Called after the file was renamed or removed. Until then, lines go to
/// the file that was opened, under whatever name. If the path cannot be opened, the former file is kept and the opening
/// tried again with later lines. Does nothing where no path is set.
void reopenLogFile() noexcept;

/// Whether this process renames a log file that has reached its bound to NAME.1 and begins it anew. Only the running
/// agent does; off at first.
void allowLogRotation(bool aAllowed) noexcept;

/// Replaces the bound of the log file, in bytes. For tests.
void setLogFileBound(std::uint64_t aBytes) noexcept;

/// Writes one line with time stamp and source position whose format is a text made at run time. A "%" in it is
/// interpreted.
void printLogMessageFromText(unsigned aLevel, const char* apMark, unsigned aLine, const char* apFunction,
                             const char* apFile, const char* apText) noexcept;

/// Writes one line at debug level, if the level is enabled. The text is not a format. Its calls are kept out of
/// the way of the code around them.
[[gnu::cold]] void printTraceLine(unsigned aLine, const char* apFunction, const char* apFile,
                                  const char* apText) noexcept;

// The arguments behind the level are evaluated only where the level is enabled. Each macro is one statement.

#define ZT_LOG(aLevel, aMark, ...)                                                                       \
    do {                                                                                                 \
        if (isLogLevelEnabled(aLevel)) {                                                                 \
            PrintLogMessageWithTimeStamp(aLevel, aMark, __LINE__, __func__, ZT_FILE_LABEL, __VA_ARGS__); \
        }                                                                                                \
    } while (false)

#define ZT_LOG_NOPREFIX(aLevel, aMark, ...)              \
    do {                                                 \
        if (isLogLevelEnabled(aLevel)) {                 \
            PrintLogMessage(aLevel, aMark, __VA_ARGS__); \
        }                                                \
    } while (false)

#define ZT_LOG_HALT(...) ZT_LOG(ZTLL_Halt, "-H-", __VA_ARGS__)
#define ZT_LOG_ALERT(...) ZT_LOG(ZTLL_Alert, "-A-", __VA_ARGS__)
#define ZT_LOG_CRIT(...) ZT_LOG(ZTLL_Critical, "-C-", __VA_ARGS__)
#define ZT_LOG_ERR(...) ZT_LOG(ZTLL_Error, "-E-", __VA_ARGS__)
#define ZT_LOG_WARN(...) ZT_LOG(ZTLL_Warning, "-W-", __VA_ARGS__)
#define ZT_LOG_NOTICE(...) ZT_LOG(ZTLL_Notice, "-N-", __VA_ARGS__)
#define ZT_LOG_INFO(...) ZT_LOG(ZTLL_Info, "-I-", __VA_ARGS__)
#define ZT_LOG_NAP(...) ZT_LOG_NOPREFIX(ZTLL_Nap, "-PROT-", __VA_ARGS__)

// Every function of the agent has these two, the path of an event included: where tracing is off, which is nearly
// always, they cost one load and one branch that is not taken.
#define ZT_TRACE_LINE(aText)                                          \
    do {                                                              \
        if (isLogLevelEnabled(ZTLL_Debug)) [[unlikely]] {             \
            printTraceLine(__LINE__, __func__, ZT_FILE_LABEL, aText); \
        }                                                             \
    } while (false)

#define ZT_ENTRY() ZT_TRACE_LINE("Entered")
#define ZT_EXIT() ZT_TRACE_LINE("Left")
#define ZT_TRACE() ZT_LOG(ZTLL_Debug, "-T-", "%s", "At")
#define ZT_TRACE_MSG(...) ZT_LOG(ZTLL_Debug, "-T-", __VA_ARGS__)

#define ZT_THROW(aType, aMessage, aError) \
    do {                                  \
        ZT_EXIT();                        \
        throw aType(aMessage, aError);    \
    } while (false)

#define ZT_RETHROW(aException, aType) \
    do {                              \
        ZT_EXIT();                    \
        throw aType(aException);      \
    } while (false)

/// Formats a text, logs it at error level, and throws the type with it and with the type's own code. The text is the
/// format of the error line: a "%" that the formatting produces is interpreted a second time, so callers pass texts
/// without it. Needs os/common/include/Clib.h where it is used.
#define ZT_LOGERR_THROW(aType, ...)                                                                 \
    do {                                                                                            \
        char lLogErrText[512] = {};                                                                 \
        ClibSprintf(lLogErrText, sizeof(lLogErrText), __VA_ARGS__);                                 \
        printLogMessageFromText(ZTLL_Error, "-E-", __LINE__, __func__, ZT_FILE_LABEL, lLogErrText); \
        ZT_EXIT();                                                                                  \
        throw aType(lLogErrText);                                                                   \
    } while (false)

#define CHECKLOGTHROWEXCEPTION(aExpression, aException, aText) \
    do {                                                       \
        if (aExpression) {                                     \
            ZT_LOG_ERR("%s", aText);                           \
            throw aException(aText);                           \
        }                                                      \
    } while (false)

#endif
