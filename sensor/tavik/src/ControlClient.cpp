#include "sensor/tavik/src/ControlClient.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <system_error>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/client/include/TimeLimit.h"

/// Pause before the next try where the socket's queue of connections is full.
static constexpr int scRetryMilliseconds = 20;

/// One conversation. Each step leaves its problem in the answer where it fails.
class ZTCControlConversation {
public:
    ZTCControlConversation(const std::string& acrPath, std::chrono::milliseconds aLimit)
        : mrPath(acrPath), mLimit(aLimit) {}

    ZTSControlAnswer ask(const nlohmann::json& acrRequest) {
        if (connect() && send(acrRequest.dump() + "\n") && receive()) {
            parse();
        }
        return std::move(mAnswer);
    }

private:
    bool fail(ZTEAnswer aAnswer, const std::string& acrProblem) {
        mAnswer.mAnswer = aAnswer;
        mAnswer.mProblem = acrProblem;
        return false;
    }
    bool failWith(const std::string& acrWhat, int aErrno) {
        const ZTEAnswer lAnswer = aErrno == ENOENT || aErrno == ECONNREFUSED || aErrno == ENOTDIR ? ZTAN_NoSensor
                                  : aErrno == EACCES || aErrno == EPERM                           ? ZTAN_NotPermitted
                                                                                                  : ZTAN_Refused;
        return fail(lAnswer, acrWhat + " " + mrPath + ": " + std::generic_category().message(aErrno));
    }
    bool isTooLate() {
        if (mLimit.hasPassed()) {
            fail(ZTAN_Silent, "nothing came from " + mrPath + " within " + mLimit.describeSpan());
            return true;
        }
        return false;
    }
    void wait(short aEvents) {
        pollfd lSocket{.fd = mSocket.get(), .events = aEvents, .revents = 0};
        poll(&lSocket, aEvents == 0 ? 0 : 1, aEvents == 0 ? scRetryMilliseconds : mLimit.remainingMilliseconds());
    }

    bool connect() {
        sockaddr_un lAddress{};
        lAddress.sun_family = AF_UNIX;
        if (mrPath.size() >= sizeof(lAddress.sun_path)) {
            return fail(ZTAN_Refused, "the path " + mrPath + " is too long for a socket: at most " +
                                          std::to_string(sizeof(lAddress.sun_path) - 1) + " bytes");
        }
        std::memcpy(lAddress.sun_path, mrPath.data(), mrPath.size());
        mSocket = ZTCFileDescriptor(socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
        if (!mSocket.isOpen()) {
            return failWith("cannot make a socket for", errno);
        }
        while (::connect(mSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) != 0) {
            if (errno != EAGAIN && errno != EINTR) {
                return failWith("cannot connect to", errno);
            }
            if (isTooLate()) {
                return false;
            }
            wait(0);
        }
        return true;
    }

    bool send(const std::string& acrLine) {
        for (std::size_t lSent = 0; lSent < acrLine.size();) {
            const ssize_t lCount =
                ::send(mSocket.get(), acrLine.data() + lSent, acrLine.size() - lSent, MSG_NOSIGNAL | MSG_DONTWAIT);
            if (lCount >= 0) {
                lSent += static_cast<std::size_t>(lCount);
            } else if (errno == EPIPE || errno == ECONNRESET) {
                return fail(ZTAN_Silent, "the sensor closed " + mrPath + " before it was asked");
            } else if (errno != EAGAIN && errno != EINTR) {
                return failWith("cannot write to", errno);
            } else if (isTooLate()) {
                return false;
            } else {
                wait(POLLOUT);
            }
        }
        return true;
    }

    /// Reads up to the line's end.
    bool receive() {
        std::array<char, 65536> lBytes;
        while (mLine.find('\n') == std::string::npos) {
            const ssize_t lCount = recv(mSocket.get(), lBytes.data(), lBytes.size(), MSG_DONTWAIT);
            if (lCount > 0) {
                mLine.append(lBytes.data(), static_cast<std::size_t>(lCount));
                if (mLine.size() > gcMostAnswerBytes) {
                    return fail(ZTAN_Refused, "the answer from " + mrPath + " has more than " +
                                                  std::to_string(gcMostAnswerBytes) + " bytes");
                }
            } else if (lCount == 0 || errno == ECONNRESET) {
                return fail(ZTAN_Silent, "the sensor closed " + mrPath + " after " + std::to_string(mLine.size()) +
                                             " bytes of an answer");
            } else if (errno != EAGAIN && errno != EINTR) {
                return failWith("cannot read from", errno);
            } else if (isTooLate()) {
                return false;
            } else {
                wait(POLLIN);
            }
        }
        return true;
    }

    void parse() {
        nlohmann::json lDocument = nlohmann::json::parse(mLine, nullptr, false);
        if (!lDocument.is_object()) {
            fail(ZTAN_Refused, "the answer from " + mrPath + " is not a JSON object");
        } else if (lDocument.contains("error")) {
            const nlohmann::json& lrError = lDocument["error"];
            fail(ZTAN_Refused,
                 "the sensor says: " + (lrError.is_string() ? lrError.get<std::string>() : lrError.dump()));
        } else {
            mAnswer.mAnswer = ZTAN_Answered;
            mAnswer.mDocument = std::move(lDocument);
        }
    }

    const std::string& mrPath;
    const ZTCTimeLimit mLimit;
    ZTCFileDescriptor mSocket;
    std::string mLine;
    ZTSControlAnswer mAnswer;
};

ZTSControlAnswer askSensor(const std::string& acrSocketPath, const nlohmann::json& acrRequest,
                           std::chrono::milliseconds aLimit) {
    return ZTCControlConversation(acrSocketPath, aLimit).ask(acrRequest);
}
