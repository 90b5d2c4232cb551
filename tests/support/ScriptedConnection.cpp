#include "tests/support/ScriptedConnection.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <exception>
#include <utility>

void ZTCScriptedConnection::open(const std::string& acrPath, Handle aHandle, Answered aAnswered) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    if (acrPath.size() >= sizeof(lAddress.sun_path)) {
        return;
    }
    std::memcpy(lAddress.sun_path, acrPath.c_str(), acrPath.size());
    mSocket = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (connect(mSocket, reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) != 0) {
        close();
        return;
    }
    mHandle = std::move(aHandle);
    mAnswered = std::move(aAnswered);
    mServer = std::thread([this] { serve(); });
}

void ZTCScriptedConnection::stopServing() {
    if (mSocket >= 0) {
        shutdown(mSocket, SHUT_RDWR);
    }
    if (mServer.joinable()) {
        mServer.join();
    }
}

void ZTCScriptedConnection::close() {
    stopServing();
    if (mSocket >= 0) {
        ::close(mSocket);
        mSocket = -1;
    }
}

bool ZTCScriptedConnection::answer(const std::string& acrLine) const {
    std::string lReply;
    try {
        lReply = "ok " + mHandle(acrLine);
    } catch (const std::exception& lcrError) {
        lReply = std::string("error ") + lcrError.what();
    }
    lReply += '\n';
    if (send(mSocket, lReply.data(), lReply.size(), MSG_NOSIGNAL) < 0) {
        return false;
    }
    mAnswered(acrLine);
    return true;
}

void ZTCScriptedConnection::serve() {
    std::string lBuffered;
    char lChunk[4096];
    for (ssize_t lCount = 1; lCount > 0;) {
        lCount = recv(mSocket, lChunk, sizeof(lChunk), 0);
        lBuffered.append(lChunk, lCount > 0 ? static_cast<std::size_t>(lCount) : 0);
        for (std::size_t lEnd = lBuffered.find('\n'); lEnd != std::string::npos; lEnd = lBuffered.find('\n')) {
            const std::string lLine = lBuffered.substr(0, lEnd);
            lBuffered.erase(0, lEnd + 1);
            if (!answer(lLine)) {
                return;
            }
        }
    }
}
