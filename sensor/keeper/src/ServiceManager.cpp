#include "sensor/keeper/include/ServiceManager.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string_view>

ZTCServiceManager::ZTCServiceManager() {
    const char* lpPath = std::getenv("NOTIFY_SOCKET");
    if (lpPath == nullptr || (*lpPath != '/' && *lpPath != '@') ||
        std::strlen(lpPath) >= sizeof(sockaddr_un::sun_path)) {
        return;
    }
    mPath = lpPath;
    if (mPath.front() == '@') {
        mPath.front() = '\0';
    }
    mSocket = ZTCFileDescriptor(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    const char* lpPid = std::getenv("WATCHDOG_PID");
    mHasWatchdog = std::getenv("WATCHDOG_USEC") != nullptr &&
                   (lpPid == nullptr || std::to_string(getpid()) == std::string_view(lpPid));
}

void ZTCServiceManager::notify(const std::string& acrAssignments) {
    if (!mSocket.isOpen() || (acrAssignments == "WATCHDOG=1" && !mHasWatchdog)) {
        return;
    }
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    std::memcpy(lAddress.sun_path, mPath.data(), mPath.size());
    sendto(mSocket.get(), acrAssignments.data(), acrAssignments.size(), MSG_NOSIGNAL,
           reinterpret_cast<const sockaddr*>(&lAddress),
           static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + mPath.size()));
}
