#include "libkpm/sim/src/ControlClient.h"

#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstddef>
#include <string_view>
#include <system_error>

#include "libkpm/sim/src/ControlSocket.h"

static constexpr int scConnectPauseMilliseconds = 20;

ZTCSimControlClient::ZTCSimControlClient(const std::string& acrPath, Deadline aDeadline)
    : mPath(acrPath), mDeadline(aDeadline) {
    connect();
}

void ZTCSimControlClient::connect() {
    const sockaddr_un lAddress = makeSimSocketAddress(mPath);
    mSocket = ZTCLibraryDescriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!mSocket.isOpen()) {
        throw ZTCSimNobodyListens(mPath + ": socket: " + std::system_category().message(errno));
    }
    while (::connect(mSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress) != 0) {
        if (errno != EAGAIN && errno != EINTR) {
            throw ZTCSimNobodyListens(mPath + ": no library listens: " + std::system_category().message(errno));
        }
        // EAGAIN: too many clients wait to be accepted. No event says when there is room.
        if (mDeadline && std::chrono::steady_clock::now() >= *mDeadline) {
            throw ZTCSimNoAnswer(mPath + ": the library accepts no connection");
        }
        ::poll(nullptr, 0, scConnectPauseMilliseconds);
    }
}

/// Returns when the socket has the event, has ended, or a signal came.
void ZTCSimControlClient::waitFor(short aEvent) const {
    int lMilliseconds = -1;
    if (mDeadline) {
        const auto lLeft = std::chrono::ceil<std::chrono::milliseconds>(*mDeadline - std::chrono::steady_clock::now());
        lMilliseconds = static_cast<int>(std::clamp<long long>(lLeft.count(), 0, INT_MAX));
    }
    pollfd lPolled{mSocket.get(), aEvent, 0};
    if (::poll(&lPolled, 1, lMilliseconds) == 0) {
        throw ZTCSimNoAnswer(mPath + ": the library does not answer");
    }
}

std::string ZTCSimControlClient::ask(const std::string& acrLine) {
    const std::string lText = acrLine + "\n";
    std::string_view lRest = lText;
    while (!lRest.empty()) {
        const ssize_t lCount = ::send(mSocket.get(), lRest.data(), lRest.size(), MSG_NOSIGNAL);
        if (lCount >= 0) {
            lRest.remove_prefix(static_cast<std::size_t>(lCount));
        } else if (errno == EPIPE || errno == ECONNRESET) {
            break;  // there may be an answer that says why
        } else if (errno == EAGAIN) {
            waitFor(POLLOUT);
        } else if (errno != EINTR) {
            throw ZTCSimNobodyListens(mPath + ": send: " + std::system_category().message(errno));
        }
    }
    while (true) {
        const std::size_t lEnd = mIn.find('\n');
        if (lEnd != std::string::npos) {
            std::string lAnswer = mIn.substr(0, lEnd);
            mIn.erase(0, lEnd + 1);
            return lAnswer;
        }
        char lBytes[4096];
        const ssize_t lCount = ::recv(mSocket.get(), lBytes, sizeof lBytes, 0);
        if (lCount > 0) {
            mIn.append(lBytes, static_cast<std::size_t>(lCount));
        } else if (lCount < 0 && errno == EAGAIN) {
            waitFor(POLLIN);
        } else if (lCount == 0 || errno != EINTR) {
            const std::string lReason = lCount == 0 ? "it was closed" : std::system_category().message(errno);
            throw ZTCSimNobodyListens(mPath + ": the library has gone: " + lReason);
        }
    }
}
