// fc-capture: writes down what the kernel's interfaces say, byte for byte.
//   fc-capture netlink DIRECTORY    until it is killed, each message of the FC events' group into DIRECTORY/NN.bin, and
//                                   a line in DIRECTORY/index: the file, the sender's port number, the length
//   fc-capture pages RAW FILE       the ring-buffer pages that trace_pipe_raw RAW has now, into FILE
//   fc-capture forge CODE           multicasts a message of that event code in the kernel's stead
#include <fcntl.h>
#include <linux/netlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <string>
#include <string_view>
#include <vector>

// A message of the SCSI transports, as the transport class for FC posts it: the headers that tell it are not among the
// C library's.
struct ZTSFcEventMessage {
    nlmsghdr mHeader{};
    std::uint8_t mVersion = 1;
    std::uint8_t mTransport = 1;
    std::uint16_t mMagic = 0xA1B2;
    std::uint16_t mMessageType = 0x100;
    std::uint16_t mMessageLength = 40;
    std::uint64_t mSeconds = 0;
    std::uint64_t mVendorId = 0;
    std::uint16_t mHost = 0;
    std::uint16_t mDataLength = 4;
    std::uint32_t mNumber = 1;
    std::uint32_t mCode = 0;
    std::uint32_t mData = 0;
};
static_assert(sizeof(ZTSFcEventMessage) == 56);

static constexpr unsigned scFcEventsGroup = 4;
static constexpr std::uint16_t scScsiTransportMessage = NLMSG_MIN_TYPE + 1;
static constexpr int scReceiveBufferBytes = 4 << 20;

[[noreturn]] static void sFail(std::string_view aWhat) {
    std::cerr << "fc-capture: " << aWhat << ": " << std::strerror(errno) << '\n';
    std::exit(1);
}

static int sOpenSocket(unsigned aGroups) {
    const int lSocket = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_SCSITRANSPORT);
    sockaddr_nl lAddress{};
    lAddress.nl_family = AF_NETLINK;
    lAddress.nl_groups = aGroups;
    if (lSocket < 0 || bind(lSocket, reinterpret_cast<sockaddr*>(&lAddress), sizeof lAddress) != 0) {
        sFail("netlink socket");
    }
    return lSocket;
}

static void sWrite(const std::string& acrFile, const void* apBytes, std::size_t aLength) {
    std::ofstream lOut(acrFile, std::ios::binary | std::ios::app);
    if (!lOut.write(static_cast<const char*>(apBytes), static_cast<std::streamsize>(aLength)).flush()) {
        sFail(acrFile);
    }
}

static int sCaptureMessages(const std::string& acrDirectory) {
    const int lSocket = sOpenSocket(1U << (scFcEventsGroup - 1));
    setsockopt(lSocket, SOL_SOCKET, SO_RCVBUFFORCE, &scReceiveBufferBytes, sizeof scReceiveBufferBytes);
    std::ofstream lIndex(acrDirectory + "/index");
    for (unsigned lNumber = 1;; ++lNumber) {
        std::array<char, 8192> lBuffer{};
        sockaddr_nl lSender{};
        socklen_t lSenderLength = sizeof lSender;
        const ssize_t lLength =
            recvfrom(lSocket, lBuffer.data(), lBuffer.size(), 0, reinterpret_cast<sockaddr*>(&lSender), &lSenderLength);
        if (lLength < 0) {
            sFail("receive");
        }
        std::array<char, 16> lName{};
        std::snprintf(lName.data(), lName.size(), "%02u.bin", lNumber);
        sWrite(acrDirectory + "/" + lName.data(), lBuffer.data(), static_cast<std::size_t>(lLength));
        lIndex << lName.data() << " pid " << lSender.nl_pid << " length " << lLength << std::endl;
    }
}

static int sCapturePages(const char* apRaw, const char* apFile) {
    const int lRaw = open(apRaw, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (lRaw < 0) {
        sFail(apRaw);
    }
    std::vector<char> lPage(static_cast<std::size_t>(sysconf(_SC_PAGESIZE)));
    for (;;) {
        const ssize_t lLength = read(lRaw, lPage.data(), lPage.size());
        if (lLength == 0 || (lLength < 0 && errno == EAGAIN)) {
            return 0;
        }
        if (lLength < 0) {
            sFail(apRaw);
        }
        sWrite(apFile, lPage.data(), static_cast<std::size_t>(lLength));
    }
}

static int sForge(const char* apCode) {
    ZTSFcEventMessage lMessage;
    lMessage.mHeader.nlmsg_len = sizeof lMessage;
    lMessage.mHeader.nlmsg_type = scScsiTransportMessage;
    lMessage.mCode = static_cast<std::uint32_t>(std::strtoul(apCode, nullptr, 0));
    sockaddr_nl lTo{};
    lTo.nl_family = AF_NETLINK;
    lTo.nl_groups = 1U << (scFcEventsGroup - 1);
    if (sendto(sOpenSocket(0), &lMessage, sizeof lMessage, 0, reinterpret_cast<sockaddr*>(&lTo), sizeof lTo) < 0 &&
        errno != ECONNREFUSED) {  // refused: of the two ends it addresses, the kernel takes no such message
        sFail("send");
    }
    return 0;
}

int main(int aArgc, char** appArgv) {
    const std::vector<std::string_view> lArguments(appArgv + 1, appArgv + aArgc);
    if (lArguments.size() == 2 && lArguments[0] == "netlink") {
        return sCaptureMessages(appArgv[2]);
    }
    if (lArguments.size() == 3 && lArguments[0] == "pages") {
        return sCapturePages(appArgv[2], appArgv[3]);
    }
    if (lArguments.size() == 2 && lArguments[0] == "forge") {
        return sForge(appArgv[2]);
    }
    std::cerr << "usage: fc-capture netlink DIRECTORY | pages RAW FILE | forge CODE\n";
    return 2;
}
