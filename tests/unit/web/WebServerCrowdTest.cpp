#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/epoll.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <filesystem>
#include <stdexcept>
#include <thread>
#include <vector>

#include "sensor/web/include/WebServer.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/web/HttpClient.h"

using std::chrono::milliseconds;
using std::chrono::seconds;

static constexpr std::size_t scCrowd = 10000;
/// For what is no connection: files of the test and of the server's two threads.
static constexpr std::ptrdiff_t scOtherDescriptors = 64;
static constexpr seconds scCrowdPatience{120};

/// As many clients at once as there are ports for, in one thread.
class ZTCCrowd {
public:
    explicit ZTCCrowd(unsigned aPort) : mEvents(epoll_create1(EPOLL_CLOEXEC)), mSockets(scCrowd) {
        sockaddr_in lAddress{};
        lAddress.sin_family = AF_INET;
        lAddress.sin_port = htons(static_cast<std::uint16_t>(aPort));
        lAddress.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        for (std::size_t i = 0; i < scCrowd; ++i) {
            mSockets[i] = ZTCFileDescriptor(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
            const int lResult =
                connect(mSockets[i].get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress));
            EXPECT_TRUE(lResult == 0 || errno == EINPROGRESS) << errno;
        }
    }

    /// Every client sends the request and reads to the end, until enough have an answer: the kernel's queue for the
    /// server is short, so the last ones wait long. Returns the answers; an empty one is none.
    std::vector<std::string> ask(const std::string& acrRequest, std::size_t aEnough) {
        for (std::size_t i = 0; i < scCrowd; ++i) {
            epoll_event lEvent{.events = EPOLLOUT, .data = {.u64 = i}};
            epoll_ctl(mEvents.get(), EPOLL_CTL_ADD, mSockets[i].get(), &lEvent);
        }
        std::vector<std::string> lAnswers(scCrowd);
        std::size_t lAnswered = 0;
        const ZTCDeadline lDeadline(scCrowdPatience);
        std::array<epoll_event, 256> lEvents{};
        while (lAnswered < aEnough && !lDeadline.isOver()) {
            const int lCount = epoll_wait(mEvents.get(), lEvents.data(), static_cast<int>(lEvents.size()),
                                          lDeadline.remainingMilliseconds());
            for (int j = 0; j < lCount; ++j) {
                const std::size_t i = lEvents.at(static_cast<std::size_t>(j)).data.u64;
                if ((lEvents.at(static_cast<std::size_t>(j)).events & EPOLLOUT) != 0) {
                    send(mSockets[i].get(), acrRequest.data(), acrRequest.size(), MSG_NOSIGNAL);
                    epoll_event lEvent{.events = EPOLLIN, .data = {.u64 = i}};
                    epoll_ctl(mEvents.get(), EPOLL_CTL_MOD, mSockets[i].get(), &lEvent);
                } else if (!readSome(mSockets[i], lAnswers[i])) {
                    mSockets[i].reset();
                    lAnswered += lAnswers[i].empty() ? 0 : 1;
                }
            }
        }
        return lAnswers;
    }

    /// Sends one more byte of a request for each client. One that was hung up on does not count.
    void dripOnce() const {
        for (const ZTCFileDescriptor& lrSocket : mSockets) {
            send(lrSocket.get(), "G", 1, MSG_NOSIGNAL | MSG_DONTWAIT);
        }
    }

private:
    static bool readSome(const ZTCFileDescriptor& acrSocket, std::string& arText) {
        std::array<char, 1024> lBytes{};
        const ssize_t lCount = recv(acrSocket.get(), lBytes.data(), lBytes.size(), 0);
        if (lCount > 0) {
            arText.append(lBytes.data(), static_cast<std::size_t>(lCount));
        }
        return lCount > 0 || (lCount < 0 && (errno == EAGAIN || errno == EINTR));
    }

    ZTCFileDescriptor mEvents;
    std::vector<ZTCFileDescriptor> mSockets;
};

static std::ptrdiff_t sCountEntries(const char* apFolder) {
    return std::distance(std::filesystem::directory_iterator(apFolder), {});
}

static ZTSWebResponse sAnswer(const ZTSWebRequest&) {
    return {.mBody = "served"};
}

TEST(WebServerCrowd, OfTenThousandClientsAtOnceNoneGetsAWrongAnswerAndTheNextOneIsServed) {
    const ZTCResourceLimit lFiles(RLIMIT_NOFILE, scCrowd + 2000);
    const ZTSWebLimits lLimits;
    ZTCWebServer lServer({.mListen = "127.0.0.1:0", .mHosts = {}}, &sAnswer);
    std::size_t lServed = 0;
    {
        ZTCCrowd lCrowd(lServer.getPort());
        for (const std::string& lrAnswer :
             lCrowd.ask("GET / HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n", 2 * lLimits.mConnections)) {
            EXPECT_TRUE(lrAnswer.empty() || lrAnswer.starts_with("HTTP/1.1 200 ")) << lrAnswer;
            lServed += lrAnswer.empty() ? 0 : 1;
        }
    }
    EXPECT_GE(lServed, 2 * lLimits.mConnections);
    EXPECT_TRUE(ZTCHttpClient::get(lServer.getPort(), "/next").ends_with("served"));
}

/// A request behind a crowd that holds every place: it waits for one, in the kernel's queue. False where that was long.
static bool sIsServed(const ZTCWebServer& acrServer) {
    try {
        return ZTCHttpClient::get(acrServer.getPort(), "/").ends_with("served");
    } catch (const std::runtime_error&) {
        return false;
    }
}

TEST(WebServerCrowd, TenThousandSilentClientsHoldABoundedNumberOfPlacesAndLoseThem) {
    const ZTCResourceLimit lFiles(RLIMIT_NOFILE, scCrowd + 2000);
    const ZTSWebLimits lLimits{.mConnections = 1024, .mRequestTime = milliseconds(100)};
    ZTCWebServer lServer({.mListen = "127.0.0.1:0", .mHosts = {}, .mLimits = lLimits}, &sAnswer);
    const std::ptrdiff_t lThreads = sCountEntries("/proc/self/task");
    const ZTCCrowd lCrowd(lServer.getPort());
    std::ptrdiff_t lMost = 0;
    waitUntil(
        [&] {
            lMost = std::max(lMost, sCountEntries("/proc/self/fd"));
            EXPECT_EQ(sCountEntries("/proc/self/task"), lThreads) << "no connection has a thread of its own";
            return sIsServed(lServer);
        },
        "an answer behind the silent ones", ZTCDeadline(scCrowdPatience));
    EXPECT_LE(lMost, static_cast<std::ptrdiff_t>(scCrowd + lLimits.mConnections) + scOtherDescriptors);
}

TEST(WebServerCrowd, TenThousandClientsThatSendAByteAtATimeLoseTheirPlacesAllTheSame) {
    const ZTCResourceLimit lFiles(RLIMIT_NOFILE, scCrowd + 2000);
    const ZTSWebLimits lLimits{.mConnections = 1024, .mRequestTime = milliseconds(300)};
    ZTCWebServer lServer({.mListen = "127.0.0.1:0", .mHosts = {}, .mLimits = lLimits}, &sAnswer);
    const ZTCCrowd lCrowd(lServer.getPort());
    const ZTCTestThread lDripping([&](const std::stop_token& acrStop) {
        while (!acrStop.stop_requested()) {
            lCrowd.dripOnce();
            std::this_thread::sleep_for(milliseconds(100));
        }
    });
    waitUntil([&] { return sIsServed(lServer); }, "an answer behind the slow ones", ZTCDeadline(scCrowdPatience));
}
