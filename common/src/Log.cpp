#include "common/include/Log.h"

#include <cerrno>
#include <cstdarg>
#include <cstdlib>

#include "common/include/LogLine.h"
#include "common/include/LogSink.h"

constinit std::atomic<unsigned> gLogCode{gcDefaultLogCode};

namespace {

constinit ZTCLogSink sLogSink;

void sWrite(ZTCLogLine& arLine, const char* apFormat, std::va_list aArguments) noexcept {
    static constinit std::atomic<bool> sIsSpillRegistered{false};
    if (!sIsSpillRegistered.exchange(true, std::memory_order_relaxed)) {
        // A process that ends before it has set a log file shows its lines all the same.
        std::atexit([] { sLogSink.spillHeldLines(); });
    }
    arLine.finish(apFormat, aArguments);
    sLogSink.write(arLine);
}

}  // namespace

void PrintLogMessageWithTimeStamp(unsigned aLevel, const char* apMark, unsigned aLine, const char* apFunction,
                                  const char* apFile, const char* apFormat, ...) noexcept {
    if (!isLogLevelEnabled(aLevel)) {
        return;
    }
    const int lErrno = errno;
    ZTCLogLine lLine(apMark, aLine, apFunction, apFile);
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    sWrite(lLine, apFormat, lArguments);
    va_end(lArguments);
    errno = lErrno;
}

void PrintLogMessage(unsigned aLevel, const char* apMark, const char* apFormat, ...) noexcept {
    if (!isLogLevelEnabled(aLevel)) {
        return;
    }
    const int lErrno = errno;
    ZTCLogLine lLine(apMark);
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    sWrite(lLine, apFormat, lArguments);
    va_end(lArguments);
    errno = lErrno;
}

void setLogFilePath(const char* apPath) noexcept {
    const int lErrno = errno;
    sLogSink.setPath(apPath);
    errno = lErrno;
}

void setLogCode(unsigned aMask) noexcept {
    // Relaxed: the mask orders nothing else.
    gLogCode.store(aMask, std::memory_order_relaxed);
}

void getLogCode(unsigned& arMask) noexcept {
    arMask = gLogCode.load(std::memory_order_relaxed);
}

void reopenLogFile() noexcept {
    const int lErrno = errno;
    sLogSink.reopen();
    errno = lErrno;
}

void allowLogRotation(bool aAllowed) noexcept {
    sLogSink.allowRotation(aAllowed);
}

void setLogFileBound(std::uint64_t aBytes) noexcept {
    sLogSink.setBound(aBytes);
}

void printTraceLine(unsigned aLine, const char* apFunction, const char* apFile, const char* apText) noexcept {
    PrintLogMessageWithTimeStamp(ZTLL_Debug, "-T-", aLine, apFunction, apFile, "%s", apText);
}

void printLogMessageFromText(unsigned aLevel, const char* apMark, unsigned aLine, const char* apFunction,
                             const char* apFile, const char* apText) noexcept {
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-security"
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
    // The text is the format on purpose.
    PrintLogMessageWithTimeStamp(aLevel, apMark, aLine, apFunction, apFile, apText);
#pragma GCC diagnostic pop
}
