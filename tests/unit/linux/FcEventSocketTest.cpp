// The socket's own code, over netlink sockets that every user has: the kernel's answers of the routing family in place
// of its FC events, and a process of another number in place of a forger.
#include "libkpm/linux/src/FcEventSocket.h"

#include <gtest/gtest.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <cstring>

static ZTCLibraryDescriptor sSocket(int aFamily) {
    ZTCLibraryDescriptor lSocket(::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, aFamily));
    sockaddr_nl lAddress{};
    lAddress.nl_family = AF_NETLINK;
    EXPECT_TRUE(lSocket.isOpen());
    EXPECT_EQ(::bind(lSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress), 0);
    return lSocket;
}

/// Asks the kernel for its links: it answers with datagrams of its own.
static void sAskKernel(int aSocket) {
    struct {
        nlmsghdr mHeader;
        rtgenmsg mFamily;
    } lRequest{};
    lRequest.mHeader.nlmsg_len = sizeof lRequest;
    lRequest.mHeader.nlmsg_type = RTM_GETLINK;
    lRequest.mHeader.nlmsg_flags = NLM_F_REQUEST | NLM_F_DUMP;
    ASSERT_EQ(::send(aSocket, &lRequest, sizeof lRequest, 0), static_cast<ssize_t>(sizeof lRequest));
    pollfd lPoll{aSocket, POLLIN, 0};
    ASSERT_EQ(::poll(&lPoll, 1, 20000), 1);
}

class FcEventSocket : public testing::Test {
protected:
    std::array<std::uint8_t, 65536> mBuffer{};
};

TEST_F(FcEventSocket, ADatagramOfTheKernelIsReceivedWithItsSize) {
    ZTCLibraryDescriptor lSocket = sSocket(NETLINK_ROUTE);
    const int lDescriptor = lSocket.get();
    ZTCFcEventSocket lSource(std::move(lSocket));
    EXPECT_EQ(lSource.getDescriptor(), lDescriptor);
    EXPECT_EQ(lSource.receive(mBuffer).mOutcome, ZTLR_Empty);
    sAskKernel(lDescriptor);
    const ZTSLinuxReceived lReceived = lSource.receive(mBuffer);
    EXPECT_EQ(lReceived.mOutcome, ZTLR_Datagram);
    nlmsghdr lHeader{};
    ASSERT_GE(lReceived.mSize, sizeof lHeader);
    std::memcpy(&lHeader, mBuffer.data(), sizeof lHeader);
    EXPECT_LE(lHeader.nlmsg_len, lReceived.mSize);
}

TEST_F(FcEventSocket, ADatagramThatIsLongerThanTheBufferIsTruncated) {
    ZTCLibraryDescriptor lSocket = sSocket(NETLINK_ROUTE);
    const int lDescriptor = lSocket.get();
    ZTCFcEventSocket lSource(std::move(lSocket));
    sAskKernel(lDescriptor);
    EXPECT_EQ(lSource.receive(std::span(mBuffer).first(16)).mOutcome, ZTLR_Truncated);
}

TEST_F(FcEventSocket, ADatagramOfAProcessIsForeignHoweverLongItIs) {
    ZTCLibraryDescriptor lSocket = sSocket(NETLINK_USERSOCK);
    const ZTCLibraryDescriptor lForger = sSocket(NETLINK_USERSOCK);
    sockaddr_nl lAddress{};
    socklen_t lSize = sizeof lAddress;
    ASSERT_EQ(::getsockname(lSocket.get(), reinterpret_cast<sockaddr*>(&lAddress), &lSize), 0);
    ZTCFcEventSocket lSource(std::move(lSocket));
    nlmsghdr lMessage{};
    lMessage.nlmsg_len = sizeof lMessage;
    for (const std::size_t lRoom : {mBuffer.size(), std::size_t{4}}) {
        ASSERT_EQ(::sendto(lForger.get(), &lMessage, sizeof lMessage, 0, reinterpret_cast<const sockaddr*>(&lAddress),
                           sizeof lAddress),
                  static_cast<ssize_t>(sizeof lMessage));
        EXPECT_EQ(lSource.receive(std::span(mBuffer).first(lRoom)).mOutcome, ZTLR_Foreign);
    }
    EXPECT_EQ(lSource.receive(mBuffer).mOutcome, ZTLR_Empty);
}

TEST_F(FcEventSocket, ADescriptorThatIsNoSocketFails) {
    ZTCFcEventSocket lSource{ZTCLibraryDescriptor()};
    EXPECT_EQ(lSource.receive(mBuffer).mOutcome, ZTLR_Failed);
}
