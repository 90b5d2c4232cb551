#include "libkpm/sim/src/ControlSocket.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <exception>
#include <iterator>
#include <stdexcept>
#include <system_error>
#include <utility>
#include <vector>

#include "libkpm/common/include/LibraryThread.h"
#include "libkpm/sim/src/Report.h"
#include "libkpm/sim/src/Scenario.h"

static constexpr std::size_t scMaxClients = 32;
static constexpr int scAcceptPause = 100;  // ms that a client waits while the process has no descriptor left

[[noreturn]] static void sRefuse(const std::string& acrPath, const std::string& acrReason) {
    throw std::runtime_error(acrPath + ": " + acrReason);
}

[[noreturn]] static void sRefuse(const std::string& acrPath, const char* apOperation, int aError) {
    sRefuse(acrPath, std::string(apOperation) + ": " + std::system_category().message(aError));
}

sockaddr_un makeSimSocketAddress(const std::string& acrPath) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    if (acrPath.empty() || acrPath.size() >= sizeof lAddress.sun_path) {
        sRefuse(acrPath, "a socket's path has 1 to " + std::to_string(sizeof lAddress.sun_path - 1) + " bytes, not " +
                             std::to_string(acrPath.size()));
    }
    std::memcpy(lAddress.sun_path, acrPath.c_str(), acrPath.size() + 1);
    return lAddress;
}

ZTCSimControlSocket::ZTCSimControlSocket(std::string aPath, Answer aAnswer)
    : mPath(std::move(aPath)), mAnswer(std::move(aAnswer)), mQuit(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    const sockaddr_un lAddress = makeSimSocketAddress(mPath);
    if (!mQuit.isOpen()) {
        sRefuse(mPath, "eventfd", errno);
    }
    removeStale();
    listenOn(lAddress);
    try {
        mThread = startLibraryThread([this] { serve(); });
    } catch (...) {
        ::unlink(mPath.c_str());
        throw;
    }
}

ZTCSimControlSocket::~ZTCSimControlSocket() {
    const std::uint64_t lOne = 1;
    while (::write(mQuit.get(), &lOne, sizeof lOne) < 0 && errno == EINTR) {
    }
    mThread.join();
    struct stat lFound {};
    if (::lstat(mPath.c_str(), &lFound) == 0 && lFound.st_dev == mIdentity.st_dev &&
        lFound.st_ino == mIdentity.st_ino) {
        ::unlink(mPath.c_str());
    }
}

void ZTCSimControlSocket::removeStale() const {
    struct stat lFound {};
    if (::lstat(mPath.c_str(), &lFound) != 0) {
        if (errno == ENOENT) {
            return;
        }
        sRefuse(mPath, "lstat", errno);
    }
    if (!S_ISSOCK(lFound.st_mode)) {
        sRefuse(mPath, "exists and is not a socket");
    }
    const ZTCLibraryDescriptor lProbe(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!lProbe.isOpen()) {
        sRefuse(mPath, "socket", errno);
    }
    const sockaddr_un lAddress = makeSimSocketAddress(mPath);
    if (::connect(lProbe.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress) == 0 ||
        errno == EAGAIN) {
        sRefuse(mPath, "another library listens there");
    }
    if (errno != ECONNREFUSED) {
        sRefuse(mPath, "connect", errno);
    }
    if (::unlink(mPath.c_str()) != 0 && errno != ENOENT) {
        sRefuse(mPath, "unlink", errno);
    }
}

void ZTCSimControlSocket::listenOn(const sockaddr_un& acrAddress) {
    mListener = ZTCLibraryDescriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!mListener.isOpen()) {
        sRefuse(mPath, "socket", errno);
    }
    // The socket's own mode, less the umask, becomes that of its file. So there is no moment at which others may
    // connect, and no mode is set by the path, where somebody may have put a link meanwhile.
    if (::fchmod(mListener.get(), 0600) != 0) {
        sRefuse(mPath, "fchmod", errno);
    }
    if (::bind(mListener.get(), reinterpret_cast<const sockaddr*>(&acrAddress), sizeof acrAddress) != 0) {
        sRefuse(mPath, "bind", errno);
    }
    if (::lstat(mPath.c_str(), &mIdentity) != 0) {
        sRefuse(mPath, "lstat", errno);
    }
    if (!S_ISSOCK(mIdentity.st_mode)) {
        sRefuse(mPath, "was replaced by something that is not a socket");
    }
    if (::listen(mListener.get(), static_cast<int>(scMaxClients)) != 0) {
        const int lError = errno;
        ::unlink(mPath.c_str());
        sRefuse(mPath, "listen", lError);
    }
}

void ZTCSimControlSocket::serve() {
    try {
        bool lIsPaused = false;
        while (true) {
            std::vector<pollfd> lPolled{{mQuit.get(), POLLIN, 0}};
            const bool lAccepts = mClients.size() < scMaxClients && !lIsPaused;
            lPolled.push_back({lAccepts ? mListener.get() : -1, POLLIN, 0});
            for (const Client& lrClient : mClients) {
                // A client with an answer on its way is not heard before it has read it.
                const auto lEvents = static_cast<short>(lrClient.mOut.empty() ? POLLIN : POLLOUT);
                lPolled.push_back({lrClient.mSocket.get(), lEvents, 0});
            }
            const int lReady =
                ::poll(lPolled.data(), static_cast<nfds_t>(lPolled.size()), lIsPaused ? scAcceptPause : -1);
            lIsPaused = false;
            if (lReady < 0) {
                if (errno == EINTR) {
                    continue;
                }
                reportSimProblem("libkpm-sim: " + mPath + ": poll: " + std::system_category().message(errno));
                return;
            }
            if (lPolled[0].revents != 0) {
                return;
            }
            std::size_t lPlace = 2;
            for (auto lClient = mClients.begin(); lClient != mClients.end(); ++lPlace) {
                const bool lIsKept = lPolled[lPlace].revents == 0 || serveClient(*lClient);
                lClient = lIsKept ? std::next(lClient) : mClients.erase(lClient);
            }
            if (lPolled[1].revents != 0) {
                lIsPaused = !acceptClient();
            }
        }
    } catch (const std::exception& lrException) {
        reportSimProblem("libkpm-sim: " + mPath + ": the service ends: " + lrException.what());
    }
}

/// One step for a client that has something to read or room for an answer. False: it is served to its end, or gone.
bool ZTCSimControlSocket::serveClient(Client& arClient) const {
    if (arClient.mOut.empty()) {
        receive(arClient);
        answerLine(arClient);
    }
    if (!send(arClient)) {
        return false;
    }
    answerLine(arClient);
    return !arClient.mIsAtEnd || !arClient.mOut.empty();
}

/// False: the process has no descriptor or memory left for a client.
bool ZTCSimControlSocket::acceptClient() {
    ZTCLibraryDescriptor lSocket(::accept4(mListener.get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (!lSocket.isOpen()) {
        return errno == EINTR || errno == EAGAIN || errno == ECONNABORTED;
    }
    mClients.emplace_back().mSocket = std::move(lSocket);
    return true;
}

void ZTCSimControlSocket::receive(Client& arClient) {
    char lBytes[16384];
    const ssize_t lCount = ::recv(arClient.mSocket.get(), lBytes, sizeof lBytes, 0);
    if (lCount > 0) {
        arClient.mIn.append(lBytes, static_cast<std::size_t>(lCount));
    } else if (lCount == 0) {
        arClient.mIsAtEnd = true;
    } else if (errno != EINTR && errno != EAGAIN) {
        arClient.mIsAtEnd = true;
        arClient.mIn.clear();
    }
}

/// Answers the next whole line, if the client has read the answer before.
void ZTCSimControlSocket::answerLine(Client& arClient) const {
    if (!arClient.mOut.empty()) {
        return;
    }
    const std::size_t lEnd = arClient.mIn.find('\n');
    if (lEnd > gcSimMaxLineSize && arClient.mIn.size() > gcSimMaxLineSize) {
        arClient.mOut = "error: the line has more than " + std::to_string(gcSimMaxLineSize) + " bytes\n";
        arClient.mIn.clear();
        arClient.mIsAtEnd = true;
        return;
    }
    if (lEnd == std::string::npos) {
        return;
    }
    const std::string lLine = arClient.mIn.substr(0, lEnd);
    arClient.mIn.erase(0, lEnd + 1);
    arClient.mOut = mAnswer(lLine) + "\n";
}

/// Sends what the socket takes of the answer. False: the client is gone.
bool ZTCSimControlSocket::send(Client& arClient) {
    while (!arClient.mOut.empty()) {
        const ssize_t lCount =
            ::send(arClient.mSocket.get(), arClient.mOut.data(), arClient.mOut.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
        if (lCount >= 0) {
            arClient.mOut.erase(0, static_cast<std::size_t>(lCount));
        } else if (errno == EAGAIN) {
            return true;
        } else if (errno != EINTR) {
            return false;
        }
    }
    return true;
}
