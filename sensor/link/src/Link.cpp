#include "sensor/link/include/Link.h"

#include <fcntl.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <span>
#include <vector>

#include "sensor/client/include/ClientErrors.h"

/// Says that a packet is a message of this version: keeper and collector of different versions do not talk.
static constexpr std::uint32_t scMagic = 0x54564B01;

/// A message as it travels, in the host's byte order.
struct ZTSLinkPacket {
    std::uint32_t mMagic = scMagic;
    std::uint32_t mType = 0;
    std::uint64_t mStart = 0;
    std::uint64_t mRestarts = 0;
    std::int64_t mSince = 0;
    std::int64_t mNextStart = 0;
    std::int32_t mPid = 0;
    std::int32_t mWaitStatus = 0;
    std::uint32_t mState = 0;
    std::uint32_t mTextSize = 0;
    char mText[gcMaxLinkText] = {};
};
static_assert(sizeof(ZTSLinkPacket) == 56 + gcMaxLinkText, "the packet must have no padding");

static constexpr std::size_t scMaxDescriptors = 2;

/// The members of a message that hold its descriptors, in their order on the way; null = none.
struct ZTSMessageRow {
    ZTELinkMessageType mType;
    const char* mpName;
    std::array<ZTCFileDescriptor ZTSLinkMessage::*, scMaxDescriptors> mDescriptors;
};
static constexpr ZTSMessageRow scMessages[] = {
    {ZTLM_AgentStarted, "AgentStarted", {&ZTSLinkMessage::mResponseFifo, &ZTSLinkMessage::mBell}},
    {ZTLM_AgentEnded, "AgentEnded", {}},
    {ZTLM_KeeperState, "KeeperState", {}},
    {ZTLM_StopAgent, "StopAgent", {}},
    {ZTLM_Finish, "Finish", {}},
    {ZTLM_Reload, "Reload", {&ZTSLinkMessage::mSettings}},
    {ZTLM_Look, "Look", {}},
    {ZTLM_StartAnswered, "StartAnswered", {}},
    {ZTLM_Silent, "Silent", {}},
    {ZTLM_Drained, "Drained", {}},
    {ZTLM_Text, "Text", {}},
};

static constexpr const char* scStateNames[] = {"starting", "running", "waiting-for-adapters", "waiting-to-restart",
                                               "stopping"};

static const ZTSMessageRow* sFindRow(std::uint32_t aType) {
    const auto* lpRow = std::find_if(std::begin(scMessages), std::end(scMessages),
                                     [&](const ZTSMessageRow& acrRow) { return acrRow.mType == aType; });
    return lpRow == std::end(scMessages) ? nullptr : lpRow;
}

static const ZTSMessageRow& sGetRow(std::uint32_t aType) {
    const ZTSMessageRow* lpRow = sFindRow(aType);
    if (lpRow == nullptr) {
        throw ZTCBadInputEx("the link has no message of type " + std::to_string(aType));
    }
    return *lpRow;
}

const char* keeperStateName(ZTEKeeperState aState) {
    return aState < std::size(scStateNames) ? scStateNames[aState] : "unknown";
}

ZTCLink::ZTCLink(ZTCFileDescriptor aSocket) : mSocket(std::move(aSocket)) {
    const int lFlags = fcntl(mSocket.get(), F_GETFL);
    if (lFlags < 0 || fcntl(mSocket.get(), F_SETFL, lFlags | O_NONBLOCK) != 0 ||
        fcntl(mSocket.get(), F_SETFD, FD_CLOEXEC) != 0) {
        throw ZTCSystemCallEx("cannot use descriptor " + std::to_string(mSocket.get()) + " as a link", errno);
    }
}

std::pair<ZTCLink, ZTCLink> ZTCLink::makePair() {
    int lEnds[2];
    if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, lEnds) != 0) {
        throw ZTCSystemCallEx("cannot make a link between keeper and collector", errno);
    }
    ZTCFileDescriptor lFirst(lEnds[0]);
    ZTCFileDescriptor lSecond(lEnds[1]);
    return {ZTCLink(std::move(lFirst)), ZTCLink(std::move(lSecond))};
}

static ZTSLinkPacket sPack(const ZTSLinkMessage& acrMessage) {
    if (acrMessage.mText.size() > gcMaxLinkText && acrMessage.mType != ZTLM_Text &&
        acrMessage.mType != ZTLM_KeeperState) {
        throw ZTCBadInputEx("a text of " + std::to_string(acrMessage.mText.size()) +
                            " bytes is too long for a link: " + "at most " + std::to_string(gcMaxLinkText));
    }
    ZTSLinkPacket lPacket;
    lPacket.mType = acrMessage.mType;
    lPacket.mStart = acrMessage.mStart;
    lPacket.mRestarts = acrMessage.mRestarts;
    lPacket.mSince = acrMessage.mSince;
    lPacket.mNextStart = acrMessage.mNextStart;
    lPacket.mPid = acrMessage.mPid;
    lPacket.mWaitStatus = acrMessage.mWaitStatus;
    lPacket.mState = acrMessage.mState;
    lPacket.mTextSize = static_cast<std::uint32_t>(std::min(acrMessage.mText.size(), gcMaxLinkText));
    std::memcpy(lPacket.mText, acrMessage.mText.data(), lPacket.mTextSize);
    return lPacket;
}

ZTELinkResult ZTCLink::send(const ZTSLinkMessage& acrMessage) {
    const ZTSMessageRow& lcrRow = sGetRow(acrMessage.mType);
    ZTSLinkPacket lPacket = sPack(acrMessage);
    std::array<int, scMaxDescriptors> lDescriptors{};
    std::size_t lCount = 0;
    for (const auto lpMember : lcrRow.mDescriptors) {
        if (lpMember == nullptr) {
            continue;
        }
        if (!(acrMessage.*lpMember).isOpen()) {
            throw ZTCBadInputEx(std::string("the message ") + lcrRow.mpName + " lacks a descriptor");
        }
        lDescriptors[lCount++] = (acrMessage.*lpMember).get();
    }

    iovec lPart{.iov_base = &lPacket, .iov_len = sizeof(lPacket)};
    alignas(cmsghdr) char lControl[CMSG_SPACE(sizeof(lDescriptors))] = {};
    msghdr lHeader{};
    lHeader.msg_iov = &lPart;
    lHeader.msg_iovlen = 1;
    if (lCount > 0) {
        lHeader.msg_control = lControl;
        lHeader.msg_controllen = CMSG_SPACE(lCount * sizeof(int));
        cmsghdr* lpControl = CMSG_FIRSTHDR(&lHeader);
        lpControl->cmsg_level = SOL_SOCKET;
        lpControl->cmsg_type = SCM_RIGHTS;
        lpControl->cmsg_len = CMSG_LEN(lCount * sizeof(int));
        std::memcpy(CMSG_DATA(lpControl), lDescriptors.data(), lCount * sizeof(int));
    }
    ssize_t lSent;
    do {
        lSent = sendmsg(mSocket.get(), &lHeader, MSG_DONTWAIT | MSG_NOSIGNAL);
    } while (lSent < 0 && errno == EINTR);
    if (lSent >= 0) {
        return ZTLR_Done;
    }
    if (errno == EAGAIN || errno == ENOBUFS || errno == ETOOMANYREFS) {
        return ZTLR_NotNow;
    }
    if (errno == EPIPE || errno == ECONNRESET) {
        return ZTLR_PeerGone;
    }
    throw ZTCSystemCallEx(std::string("cannot send the message ") + lcrRow.mpName, errno);
}

/// Takes the descriptors that came with a packet: whatever happens next, they are closed.
static std::vector<ZTCFileDescriptor> sTakeDescriptors(msghdr& arHeader) {
    std::vector<ZTCFileDescriptor> lDescriptors;
    for (cmsghdr* lpControl = CMSG_FIRSTHDR(&arHeader); lpControl != nullptr;
         lpControl = CMSG_NXTHDR(&arHeader, lpControl)) {
        if (lpControl->cmsg_level != SOL_SOCKET || lpControl->cmsg_type != SCM_RIGHTS) {
            continue;
        }
        for (std::size_t i = 0; i < (lpControl->cmsg_len - CMSG_LEN(0)) / sizeof(int); ++i) {
            int lDescriptor;
            std::memcpy(&lDescriptor, CMSG_DATA(lpControl) + i * sizeof(int), sizeof(int));
            lDescriptors.emplace_back(lDescriptor);
        }
    }
    return lDescriptors;
}

static ZTSLinkMessage sUnpack(const ZTSLinkPacket& acrPacket, std::span<ZTCFileDescriptor> aDescriptors) {
    const ZTSMessageRow& lcrRow = sGetRow(acrPacket.mType);
    ZTSLinkMessage lMessage;
    lMessage.mType = lcrRow.mType;
    lMessage.mStart = acrPacket.mStart;
    lMessage.mRestarts = acrPacket.mRestarts;
    lMessage.mSince = acrPacket.mSince;
    lMessage.mNextStart = acrPacket.mNextStart;
    lMessage.mPid = acrPacket.mPid;
    lMessage.mWaitStatus = acrPacket.mWaitStatus;
    if (acrPacket.mState >= std::size(scStateNames) || acrPacket.mTextSize > gcMaxLinkText) {
        throw ZTCBadInputEx(std::string("the message ") + lcrRow.mpName + " is broken: state " +
                            std::to_string(acrPacket.mState) + ", text of " + std::to_string(acrPacket.mTextSize) +
                            " bytes");
    }
    lMessage.mState = static_cast<ZTEKeeperState>(acrPacket.mState);
    lMessage.mText.assign(acrPacket.mText, acrPacket.mTextSize);
    std::size_t lTaken = 0;
    for (const auto lpMember : lcrRow.mDescriptors) {
        if (lpMember != nullptr && lTaken < aDescriptors.size()) {
            lMessage.*lpMember = std::move(aDescriptors[lTaken]);
        }
        lTaken += lpMember != nullptr ? 1 : 0;
    }
    if (lTaken != aDescriptors.size()) {
        throw ZTCBadInputEx(std::string("the message ") + lcrRow.mpName + " came with " +
                            std::to_string(aDescriptors.size()) + " descriptors instead of " + std::to_string(lTaken));
    }
    return lMessage;
}

ZTELinkResult ZTCLink::receive(ZTSLinkMessage& arMessage) {
    ZTSLinkPacket lPacket;
    iovec lPart{.iov_base = &lPacket, .iov_len = sizeof(lPacket)};
    alignas(cmsghdr) char lControl[CMSG_SPACE(scMaxDescriptors * sizeof(int))] = {};
    msghdr lHeader{};
    lHeader.msg_iov = &lPart;
    lHeader.msg_iovlen = 1;
    lHeader.msg_control = lControl;
    lHeader.msg_controllen = sizeof(lControl);
    ssize_t lRead;
    do {
        lRead = recvmsg(mSocket.get(), &lHeader, MSG_DONTWAIT | MSG_CMSG_CLOEXEC);
    } while (lRead < 0 && errno == EINTR);
    if (lRead < 0 && errno == EAGAIN) {
        return ZTLR_NotNow;
    }
    if (lRead == 0 || (lRead < 0 && errno == ECONNRESET)) {
        return ZTLR_PeerGone;
    }
    if (lRead < 0) {
        throw ZTCSystemCallEx("cannot receive from the link", errno);
    }
    std::vector<ZTCFileDescriptor> lDescriptors = sTakeDescriptors(lHeader);
    if (lRead != sizeof(lPacket) || (lHeader.msg_flags & (MSG_TRUNC | MSG_CTRUNC)) != 0 || lPacket.mMagic != scMagic) {
        throw ZTCBadInputEx("a packet of " + std::to_string(lRead) +
                            " bytes on the link is not a message of this version: keeper and collector must be of one "
                            "version");
    }
    arMessage = sUnpack(lPacket, lDescriptors);
    return ZTLR_Done;
}
