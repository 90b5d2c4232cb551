#include "tests/unit/web/HttpClient.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <stdexcept>

ZTCHttpClient::ZTCHttpClient(unsigned aPort) : mSocket(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in lAddress{};
    lAddress.sin_family = AF_INET;
    lAddress.sin_port = htons(static_cast<std::uint16_t>(aPort));
    lAddress.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (connect(mSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress) != 0) {
        throw std::runtime_error("cannot connect to port " + std::to_string(aPort));
    }
}

ZTCHttpClient::ZTCHttpClient(const std::string& acrPath) : mSocket(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    std::strncpy(lAddress.sun_path, acrPath.c_str(), sizeof lAddress.sun_path - 1);
    if (connect(mSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress) != 0) {
        throw std::runtime_error("cannot connect to " + acrPath);
    }
}

bool ZTCHttpClient::send(const std::string& acrBytes) {
    std::size_t lSent = 0;
    while (lSent < acrBytes.size()) {
        const ssize_t lCount = ::send(mSocket.get(), acrBytes.data() + lSent, acrBytes.size() - lSent, MSG_NOSIGNAL);
        if (lCount < 0 && errno != EINTR) {
            return false;
        }
        lSent += lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
    }
    return true;
}

bool ZTCHttpClient::isHungUpOn() const {
    pollfd lSocket{.fd = mSocket.get(), .events = POLLRDHUP, .revents = 0};
    return poll(&lSocket, 1, 0) == 1;
}

bool ZTCHttpClient::readSome(const ZTCDeadline& acrDeadline) {
    pollfd lSocket{.fd = mSocket.get(), .events = POLLIN, .revents = 0};
    if (poll(&lSocket, 1, acrDeadline.remainingMilliseconds()) == 0) {
        throw std::runtime_error("the server sent no more than: " + mReceived);
    }
    std::array<char, 65536> lBytes;
    const ssize_t lCount = read(mSocket.get(), lBytes.data(), lBytes.size());
    mReceived.append(lBytes.data(), lCount > 0 ? static_cast<std::size_t>(lCount) : 0);
    return lCount > 0;
}

std::string ZTCHttpClient::readToEnd() {
    const ZTCDeadline lDeadline;
    while (readSome(lDeadline)) {
    }
    return std::exchange(mReceived, {});
}

std::string ZTCHttpClient::readUntil(const std::string& acrText) {
    const ZTCDeadline lDeadline;
    while (mReceived.find(acrText) == std::string::npos) {
        if (!readSome(lDeadline)) {
            throw std::runtime_error("the connection ended behind: " + mReceived);
        }
    }
    const std::size_t lEnd = mReceived.find(acrText) + acrText.size();
    const std::string lPart = mReceived.substr(0, lEnd);
    mReceived.erase(0, lEnd);
    return lPart;
}

std::string ZTCHttpClient::ask(unsigned aPort, const std::string& acrRequest) {
    ZTCHttpClient lClient(aPort);
    lClient.send(acrRequest);
    return lClient.readToEnd();
}

std::string ZTCHttpClient::get(unsigned aPort, const std::string& acrTarget, const std::string& acrHost) {
    return ask(aPort, "GET " + acrTarget + " HTTP/1.1\r\nHost: " + acrHost + "\r\nConnection: close\r\n\r\n");
}

std::string ZTCHttpClient::get(const std::string& acrPath, const std::string& acrTarget) {
    ZTCHttpClient lClient(acrPath);
    lClient.send("GET " + acrTarget + " HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n");
    return lClient.readToEnd();
}
