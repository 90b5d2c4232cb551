#include "libkpm/linux/src/FcEventSocket.h"

#include <linux/netlink.h>
#include <sys/socket.h>
#include <sys/uio.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <utility>

#include "libkpm/linux/src/NetworkNamespace.h"
#include "libkpm/linux/src/Sysfs.h"

static constexpr unsigned scScsiTransportFamily = 18;  // NETLINK_SCSITRANSPORT
// The kernel multicasts to the group of this number; as a bit of the address it is the fourth.
static constexpr unsigned scFcEventGroup = 4;
static constexpr int scReceiveBytes = 4 * 1024 * 1024;

static ZTSFeedProblem sProblem(const char* apWhat, int aError) {
    ZTSFeedProblem lProblem{judgeFeedError(aError), std::string(apWhat) + ": " + std::strerror(aError)};
    if (lProblem.mHappening == ZTFH_NotGranted) {
        lProblem.mText += "; run the agent with CAP_NET_ADMIN in the first network namespace";
    } else if (aError == EPROTONOSUPPORT) {
        lProblem.mText += "; this kernel has no SCSI transport events (module scsi_transport_fc)";
    }
    return lProblem;
}

/// False where it is known that the kernel sends its events elsewhere.
static bool sHears() {
    static constexpr std::size_t scMostTable = std::size_t{4} * 1024 * 1024;
    const std::optional<std::string> lTable = readSmallFile("/proc/thread-self/net/netlink", scMostTable);
    return !lTable || hasKernelSocket(*lTable, scScsiTransportFamily).value_or(true);
}

std::unique_ptr<ZTCFcEventSource> ZTCFcEventSocket::open(ZTSFeedProblem& arProblem) {
    ZTCLibraryDescriptor lSocket(
        ::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, static_cast<int>(scScsiTransportFamily)));
    if (!lSocket.isOpen()) {
        arProblem = sProblem("the socket for FC events cannot be made", errno);
        return nullptr;
    }
    // A storm of events must fit until it is read; without the right to force it, as much as the system allows.
    if (::setsockopt(lSocket.get(), SOL_SOCKET, SO_RCVBUFFORCE, &scReceiveBytes, sizeof scReceiveBytes) != 0) {
        static_cast<void>(::setsockopt(lSocket.get(), SOL_SOCKET, SO_RCVBUF, &scReceiveBytes, sizeof scReceiveBytes));
    }
    sockaddr_nl lAddress{};
    lAddress.nl_family = AF_NETLINK;
    lAddress.nl_groups = 1u << (scFcEventGroup - 1);
    if (::bind(lSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress) != 0) {
        arProblem = sProblem("FC events cannot be subscribed to", errno);
        return nullptr;
    }
    if (!sHears()) {
        arProblem = {ZTFH_NotGranted,
                     "this process is in a network namespace of its own, where the kernel sends no FC events; run the "
                     "agent in the first one (a container: with the host's network)"};
        return nullptr;
    }
    return std::make_unique<ZTCFcEventSocket>(std::move(lSocket));
}

ZTSLinuxReceived ZTCFcEventSocket::receive(std::span<std::uint8_t> aBuffer) {
    sockaddr_nl lSender{};
    iovec lPart{aBuffer.data(), aBuffer.size()};
    msghdr lMessage{};
    lMessage.msg_name = &lSender;
    lMessage.msg_namelen = sizeof lSender;
    lMessage.msg_iov = &lPart;
    lMessage.msg_iovlen = 1;
    ssize_t lSize = -1;
    do {
        lSize = ::recvmsg(mSocket.get(), &lMessage, 0);
    } while (lSize < 0 && errno == EINTR);
    if (lSize < 0) {
        if (errno == EAGAIN) {
            return {ZTLR_Empty, 0};
        }
        return {errno == ENOBUFS ? ZTLR_Overrun : ZTLR_Failed, 0};
    }
    // Any process with the right may multicast to the group; only the kernel has the number 0.
    if (lMessage.msg_namelen != sizeof lSender || lSender.nl_pid != 0) {
        return {ZTLR_Foreign, 0};
    }
    if ((lMessage.msg_flags & MSG_TRUNC) != 0) {
        return {ZTLR_Truncated, 0};
    }
    return {ZTLR_Datagram, static_cast<std::size_t>(lSize)};
}
