#include "libkpm/sim/src/ControlClient.h"

#include <sys/socket.h>

#include <cerrno>
#include <cstddef>
#include <string_view>
#include <system_error>

#include "libkpm/sim/src/ControlSocket.h"

ZTCSimControlClient::ZTCSimControlClient(const std::string& acrPath) : mPath(acrPath) {
    const sockaddr_un lAddress = makeSimSocketAddress(mPath);
    mSocket = ZTCLibraryDescriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    if (!mSocket.isOpen() ||
        ::connect(mSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress) != 0) {
        throw ZTCSimNobodyListens(mPath + ": no library listens: " + std::system_category().message(errno));
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
        } else if (lCount == 0 || errno != EINTR) {
            const std::string lReason = lCount == 0 ? "it was closed" : std::system_category().message(errno);
            throw ZTCSimNobodyListens(mPath + ": the library has gone: " + lReason);
        }
    }
}
