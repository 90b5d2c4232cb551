#include "tests/sensor/UnixLine.h"

#include <sys/socket.h>
#include <sys/time.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "tests/support/Waiting.h"

ZTCFileDescriptor makeUnixSocket(int aFlags) {
    ZTCFileDescriptor lSocket(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | aFlags, 0));
    if (!lSocket.isOpen()) {
        throw std::runtime_error(std::string("socket: ") + std::strerror(errno));
    }
    return lSocket;
}

sockaddr_un makeUnixAddress(const std::string& acrPath) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    std::strncpy(lAddress.sun_path, acrPath.c_str(), sizeof(lAddress.sun_path) - 1);
    return lAddress;
}

std::string askLine(const std::string& acrPath, const std::string& acrLine) {
    const ZTCFileDescriptor lSocket = makeUnixSocket(0);
    const sockaddr_un lAddress = makeUnixAddress(acrPath);
    const timeval lPatience{.tv_sec = 3 * gcTestPatience.count(), .tv_usec = 0};
    setsockopt(lSocket.get(), SOL_SOCKET, SO_RCVTIMEO, &lPatience, sizeof(lPatience));
    const std::string lLine = acrLine + "\n";
    if (connect(lSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) != 0 ||
        send(lSocket.get(), lLine.data(), lLine.size(), MSG_NOSIGNAL) != std::ssize(lLine)) {
        throw std::runtime_error("asking " + acrPath + ": " + std::strerror(errno));
    }
    std::string lAnswer;
    char lByte = 0;
    while (recv(lSocket.get(), &lByte, 1, 0) == 1 && lByte != '\n') {
        lAnswer += lByte;
    }
    return lAnswer;
}
