#include "sensor/collector/include/ControlServer.h"

#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

/// Until the next try to accept a client, where one waits and there is no descriptor or no memory for it.
static constexpr std::chrono::seconds scAcceptPause{1};

struct ZTCControlServer::ZTSClient {
    ZTCFileDescriptor mSocket;
    ZTCTime mDeadline;
    std::string mInput;
    std::string mOutput;
    std::uint64_t mTicket = 0;  ///< of a request whose answer was put off; 0: none
};

ZTCControlServer::ZTCControlServer(ZTCFileDescriptor aSocket, Handler aHandler)
    : mSocket(std::move(aSocket)), mHandler(std::move(aHandler)) {}

ZTCControlServer::~ZTCControlServer() = default;

void ZTCControlServer::addTo(std::vector<pollfd>& arFds) const {
    if (mSocket.isOpen() && !mAcceptAgain && mClients.size() < gcMaxControlClients) {
        arFds.push_back({.fd = mSocket.get(), .events = POLLIN, .revents = 0});
    }
    for (const ZTSClient& lrClient : mClients) {
        // A client whose request is being worked on is not read from: its next request waits in its socket.
        const int lEvents = !lrClient.mOutput.empty() ? POLLOUT : lrClient.mTicket == 0 ? POLLIN : 0;
        arFds.push_back({.fd = lrClient.mSocket.get(), .events = static_cast<short>(lEvents), .revents = 0});
    }
}

std::optional<ZTCControlServer::ZTCTime> ZTCControlServer::getNextDeadline() const {
    std::optional<ZTCTime> lNext = mAcceptAgain;
    for (const ZTSClient& lrClient : mClients) {
        lNext = std::min(lNext.value_or(lrClient.mDeadline), lrClient.mDeadline);
    }
    return lNext;
}

void ZTCControlServer::accept(ZTCTime aNow) {
    if (mAcceptAgain && aNow < *mAcceptAgain) {
        return;
    }
    mAcceptAgain.reset();
    while (mSocket.isOpen() && mClients.size() < gcMaxControlClients) {
        ZTCFileDescriptor lSocket(accept4(mSocket.get(), nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC));
        if (!lSocket.isOpen()) {
            if (errno != EAGAIN && errno != EINTR && errno != ECONNABORTED) {
                mAcceptAgain = aNow + scAcceptPause;  // one waits: polling would return at once
            }
            return;
        }
        ZTSClient& lrClient = mClients.emplace_back();
        lrClient.mSocket = std::move(lSocket);
        lrClient.mDeadline = aNow + gcControlPatience;
    }
}

void ZTCControlServer::serve(ZTCTime aNow) {
    accept(aNow);
    std::erase_if(mClients,
                  [&](ZTSClient& arClient) { return !serveClient(arClient, aNow) || aNow >= arClient.mDeadline; });
}

/// False: disconnect.
bool ZTCControlServer::serveClient(ZTSClient& arClient, ZTCTime aNow) {
    bool lIsAtEnd = false;
    while (true) {
        if (!writeTo(arClient)) {
            return false;
        }
        if (!arClient.mOutput.empty() || arClient.mTicket != 0) {
            return true;
        }
        const std::size_t lEnd = arClient.mInput.find('\n');
        if (lEnd == std::string::npos) {
            if (arClient.mInput.size() > gcMaxControlRequest) {
                arClient.mInput.clear();
                arClient.mOutput =
                    "{\"error\":\"a request has at most " + std::to_string(gcMaxControlRequest) + " bytes\"}\n";
                writeTo(arClient);
                return false;
            }
            if (lIsAtEnd || !readFrom(arClient, lIsAtEnd)) {
                return !lIsAtEnd;
            }
            continue;
        }
        const std::string lRequest = arClient.mInput.substr(0, lEnd);
        arClient.mInput.erase(0, lEnd + 1);
        arClient.mDeadline = aNow + gcControlPatience;
        const std::uint64_t lTicket = mNextTicket++;
        if (const std::optional<std::string> lAnswer = mHandler(lTicket, lRequest)) {
            arClient.mOutput = *lAnswer + "\n";
        } else {
            arClient.mTicket = lTicket;
            if (mAllowedTicket == lTicket) {
                arClient.mDeadline = aNow + mAllowedTime;
            }
        }
    }
}

/// False: nothing came.
bool ZTCControlServer::readFrom(ZTSClient& arClient, bool& arIsAtEnd) {
    std::array<char, 2048> lBytes;
    const ssize_t lCount = recv(arClient.mSocket.get(), lBytes.data(), lBytes.size(), 0);
    if (lCount > 0) {
        arClient.mInput.append(lBytes.data(), static_cast<std::size_t>(lCount));
        return true;
    }
    arIsAtEnd = lCount == 0 || (errno != EAGAIN && errno != EINTR);
    return false;
}

/// False: the client has gone.
bool ZTCControlServer::writeTo(ZTSClient& arClient) {
    while (!arClient.mOutput.empty()) {
        const ssize_t lCount =
            send(arClient.mSocket.get(), arClient.mOutput.data(), arClient.mOutput.size(), MSG_NOSIGNAL);
        if (lCount < 0) {
            return errno == EAGAIN || errno == EINTR;
        }
        arClient.mOutput.erase(0, static_cast<std::size_t>(lCount));
    }
    return true;
}

void ZTCControlServer::allow(std::uint64_t aTicket, std::chrono::milliseconds aTime) {
    mAllowedTicket = aTicket;
    mAllowedTime = aTime;
}

void ZTCControlServer::answer(std::uint64_t aTicket, const std::string& acrAnswer) {
    for (ZTSClient& lrClient : mClients) {
        if (lrClient.mTicket == aTicket) {
            lrClient.mTicket = 0;
            lrClient.mOutput = acrAnswer + "\n";
        }
    }
}
