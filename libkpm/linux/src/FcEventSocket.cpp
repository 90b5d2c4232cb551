#include "libkpm/linux/src/FcEventSocket.h"

#include <linux/netlink.h>
#include <sys/socket.h>
#include <sys/uio.h>

#include <cerrno>
#include <cstring>
#include <utility>

static constexpr int scScsiTransportFamily = 18;  // NETLINK_SCSITRANSPORT
// The kernel multicasts to the group of this number; as a bit of the address it is the fourth.
static constexpr unsigned scFcEventGroup = 4;
static constexpr int scReceiveBytes = 4 * 1024 * 1024;

static std::string sExplain(const char* apWhat, int aError) {
    std::string lText = std::string(apWhat) + ": " + std::strerror(aError);
    if (aError == EPERM || aError == EACCES) {
        lText += "; run the agent with CAP_NET_ADMIN in the first network namespace";
    } else if (aError == EPROTONOSUPPORT) {
        lText += "; this kernel has no SCSI transport events (module scsi_transport_fc)";
    }
    return lText;
}

std::unique_ptr<ZTCFcEventSource> ZTCFcEventSocket::open(std::string& arProblem) {
    ZTCLibraryDescriptor lSocket(::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, scScsiTransportFamily));
    if (!lSocket.isOpen()) {
        arProblem = sExplain("the socket for FC events cannot be made", errno);
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
        arProblem = sExplain("FC events cannot be subscribed to", errno);
        return nullptr;
    }
    return std::unique_ptr<ZTCFcEventSource>(new ZTCFcEventSocket(std::move(lSocket)));
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
