#include "sensor/outlets/include/JournalSocket.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstring>

#include "sensor/client/include/ClientErrors.h"

static constexpr long scPatienceSeconds = 1;

std::string toJournalEntry(const ZTCJournalFields& acrFields) {
    std::string lEntry;
    for (const auto& [lName, lValue] : acrFields) {
        lEntry += lName;
        if (lValue.find('\n') == std::string::npos) {
            lEntry += "=" + lValue + "\n";
            continue;
        }
        lEntry += "\n";
        for (unsigned i = 0; i < 8; ++i) {
            lEntry += static_cast<char>(static_cast<std::uint64_t>(lValue.size()) >> (8 * i) & 0xFF);
        }
        lEntry += lValue + "\n";
    }
    return lEntry;
}

static sockaddr_un sAddress(const std::string& acrPath) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    acrPath.copy(lAddress.sun_path, sizeof(lAddress.sun_path) - 1);
    return lAddress;
}

void ZTCJournalSocket::send(const ZTCJournalFields& acrFields) {
    if (!mSocket.isOpen()) {
        mSocket = ZTCFileDescriptor(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
        const timeval lPatience{.tv_sec = scPatienceSeconds, .tv_usec = 0};
        if (!mSocket.isOpen() ||
            setsockopt(mSocket.get(), SOL_SOCKET, SO_SNDTIMEO, &lPatience, sizeof(lPatience)) != 0) {
            throw ZTCSystemCallEx("cannot make a socket for the journal", errno);
        }
    }
    const std::string lEntry = toJournalEntry(acrFields);
    const sockaddr_un lAddress = sAddress(mPath);
    ssize_t lSent;
    do {
        lSent = sendto(mSocket.get(), lEntry.data(), lEntry.size(), MSG_NOSIGNAL,
                       reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress));
    } while (lSent < 0 && errno == EINTR);
    if (lSent < 0 && (errno == EMSGSIZE || errno == ENOBUFS)) {
        sendFile(lEntry);
    } else if (lSent < 0) {
        throw ZTCSystemCallEx("cannot send to the journal at " + mPath, errno);
    }
}

/// The journal maps the file; so nothing may change it any more.
void ZTCJournalSocket::sendFile(const std::string& acrEntry) {
    const ZTCFileDescriptor lFile(memfd_create("tavik-journal", MFD_CLOEXEC | MFD_ALLOW_SEALING));
    std::size_t lWritten = 0;
    while (lFile.isOpen() && lWritten < acrEntry.size()) {
        const ssize_t lCount = write(lFile.get(), acrEntry.data() + lWritten, acrEntry.size() - lWritten);
        if (lCount < 0 && errno != EINTR) {
            break;
        }
        lWritten += lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
    }
    if (!lFile.isOpen() || lWritten < acrEntry.size() ||
        fcntl(lFile.get(), F_ADD_SEALS, F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL) != 0) {
        throw ZTCSystemCallEx("cannot make a file in memory for the journal", errno);
    }
    sockaddr_un lAddress = sAddress(mPath);
    alignas(cmsghdr) char lControl[CMSG_SPACE(sizeof(int))]{};
    msghdr lMessage{};
    lMessage.msg_name = &lAddress;
    lMessage.msg_namelen = sizeof(lAddress);
    lMessage.msg_control = lControl;
    lMessage.msg_controllen = sizeof(lControl);
    cmsghdr* const lpHeader = CMSG_FIRSTHDR(&lMessage);
    lpHeader->cmsg_level = SOL_SOCKET;
    lpHeader->cmsg_type = SCM_RIGHTS;
    lpHeader->cmsg_len = CMSG_LEN(sizeof(int));
    const int lDescriptor = lFile.get();
    std::memcpy(CMSG_DATA(lpHeader), &lDescriptor, sizeof(lDescriptor));
    ssize_t lSent;
    do {
        lSent = sendmsg(mSocket.get(), &lMessage, MSG_NOSIGNAL);
    } while (lSent < 0 && errno == EINTR);
    if (lSent < 0) {
        throw ZTCSystemCallEx("cannot send a file to the journal at " + mPath, errno);
    }
}
