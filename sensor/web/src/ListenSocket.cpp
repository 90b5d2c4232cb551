#include "sensor/web/src/ListenSocket.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstring>

#include "sensor/client/include/ClientErrors.h"

/// Connections that wait to be accepted.
static constexpr int scBacklog = 128;

static ZTCFileDescriptor sSocket(int aFamily, const std::string& acrListen) {
    ZTCFileDescriptor lSocket(socket(aFamily, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!lSocket.isOpen()) {
        throw ZTCSystemCallEx("cannot make a socket for http.listen " + acrListen, errno);
    }
    return lSocket;
}

template <typename Address>
static void sBindAndListen(const ZTCFileDescriptor& acrSocket, const Address& acrAddress,
                           const std::string& acrListen) {
    if (bind(acrSocket.get(), reinterpret_cast<const sockaddr*>(&acrAddress), sizeof acrAddress) != 0 ||
        listen(acrSocket.get(), scBacklog) != 0) {
        throw ZTCSystemCallEx("cannot listen on " + acrListen + " (http.listen)", errno);
    }
}

/// Whether somebody accepts connections on a Unix socket.
static bool sIsServed(const sockaddr_un& acrAddress, const std::string& acrListen) {
    const ZTCFileDescriptor lProbe = sSocket(AF_UNIX, acrListen);
    return connect(lProbe.get(), reinterpret_cast<const sockaddr*>(&acrAddress), sizeof acrAddress) == 0 ||
           errno == EAGAIN;
}

static ZTSListenSocket sOpenUnix(const std::string& acrPath, const std::string& acrListen) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    if (acrPath.empty() || acrPath.size() >= sizeof lAddress.sun_path) {
        throw ZTCBadInputEx("http.listen \"" + acrListen + "\": the path of a socket has 1 to " +
                            std::to_string(sizeof lAddress.sun_path - 1) + " bytes, this one has " +
                            std::to_string(acrPath.size()));
    }
    std::memcpy(lAddress.sun_path, acrPath.c_str(), acrPath.size() + 1);
    struct stat lStatus {};
    if (lstat(acrPath.c_str(), &lStatus) == 0 && S_ISSOCK(lStatus.st_mode) && !sIsServed(lAddress, acrListen)) {
        unlink(acrPath.c_str());
    }
    ZTSListenSocket lResult{.mSocket = sSocket(AF_UNIX, acrListen), .mPort = 0, .mUnixPath = {}};
    const mode_t lMask = umask(0117);
    try {
        sBindAndListen(lResult.mSocket, lAddress, acrListen);
    } catch (...) {
        umask(lMask);
        throw;
    }
    umask(lMask);
    lResult.mUnixPath = acrPath;
    return lResult;
}

template <typename Address>
static ZTSListenSocket sOpenAddress(int aFamily, Address aAddress, const std::string& acrListen) {
    ZTSListenSocket lResult{.mSocket = sSocket(aFamily, acrListen), .mPort = 0, .mUnixPath = {}};
    const int lOn = 1;
    setsockopt(lResult.mSocket.get(), SOL_SOCKET, SO_REUSEADDR, &lOn, sizeof lOn);
    sBindAndListen(lResult.mSocket, aAddress, acrListen);
    socklen_t lSize = sizeof aAddress;
    if (getsockname(lResult.mSocket.get(), reinterpret_cast<sockaddr*>(&aAddress), &lSize) != 0) {
        throw ZTCSystemCallEx("cannot read the port of " + acrListen, errno);
    }
    if constexpr (std::is_same_v<Address, sockaddr_in>) {
        lResult.mPort = ntohs(aAddress.sin_port);
    } else {
        lResult.mPort = ntohs(aAddress.sin6_port);
    }
    return lResult;
}

ZTSListenSocket openListenSocket(const std::string& acrListen) {
    static constexpr const char* scUnix = "unix:";
    if (acrListen.starts_with(scUnix)) {
        return sOpenUnix(acrListen.substr(std::strlen(scUnix)), acrListen);
    }
    const std::size_t lColon = acrListen.rfind(':');
    unsigned lPort = 0;
    const char* lpEnd = acrListen.data() + acrListen.size();
    if (lColon != std::string::npos) {
        const auto [lpStop, lError] = std::from_chars(acrListen.data() + lColon + 1, lpEnd, lPort);
        const bool lIsPort = lError == std::errc() && lpStop == lpEnd && lPort <= 65535;
        std::string lHost = acrListen.substr(0, lColon);
        lHost = lHost == "localhost" ? "127.0.0.1" : lHost;
        sockaddr_in lFour{};
        lFour.sin_family = AF_INET;
        lFour.sin_port = htons(static_cast<std::uint16_t>(lPort));
        if (lIsPort && inet_pton(AF_INET, lHost.c_str(), &lFour.sin_addr) == 1) {
            return sOpenAddress(AF_INET, lFour, acrListen);
        }
        sockaddr_in6 lSix{};
        lSix.sin6_family = AF_INET6;
        lSix.sin6_port = lFour.sin_port;
        if (lIsPort && lHost.size() > 2 && lHost.front() == '[' && lHost.back() == ']' &&
            inet_pton(AF_INET6, lHost.substr(1, lHost.size() - 2).c_str(), &lSix.sin6_addr) == 1) {
            return sOpenAddress(AF_INET6, lSix, acrListen);
        }
    }
    throw ZTCBadInputEx(
        "http.listen \"" + acrListen +
        "\" is none of ADDRESS:PORT, [ADDRESS]:PORT, localhost:PORT and unix:PATH; a port is 0 to 65535");
}
