#include "common/include/RawWrite.h"

#include <limits.h>
#include <poll.h>
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>

namespace {

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
        if (aError == EPIPE || aError == EFBIG) {
            const std::timespec lAtOnce{};
            while (sigtimedwait(&mSignals, nullptr, &lAtOnce) > 0) {
            }
        }
    }

private:
    sigset_t mSignals{};
    sigset_t mFormerMask{};
};

}  // namespace

int writeAll(int aDescriptor, const char* apBytes, std::size_t aCount, std::size_t& arWritten) noexcept {
    arWritten = 0;
    while (arWritten < aCount) {
        const ::ssize_t lResult = ::write(aDescriptor, apBytes + arWritten, aCount - arWritten);
        if (lResult > 0) {
            arWritten += static_cast<std::size_t>(lResult);
        } else if (lResult == 0) {
            return EIO;
        } else if (errno != EINTR) {
            return errno;
        }
    }
    return 0;
}

void writeToStandardError(const char* apBytes, std::size_t aCount) noexcept {
    ZTCWriteSignalGuard lGuard;
    while (aCount > 0) {
        // A pipe that is ready takes PIPE_BUF bytes without waiting.
        struct pollfd lStandardError = {STDERR_FILENO, POLLOUT, 0};
        const std::size_t lPart = std::min(aCount, std::size_t{PIPE_BUF});
        if (::poll(&lStandardError, 1, 0) <= 0) {
            return;
        }
        std::size_t lWritten = 0;
        const int lError = writeAll(STDERR_FILENO, apBytes, lPart, lWritten);
        if (lError != 0) {
            lGuard.takeBackSignalOf(lError);
            return;
        }
        apBytes += lPart;
        aCount -= lPart;
    }
}
