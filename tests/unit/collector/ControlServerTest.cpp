#include "sensor/collector/include/ControlServer.h"

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cstring>

#include "tests/support/ResourceLimit.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

using std::chrono::seconds;

class ControlServerTest : public testing::Test {
protected:
    ControlServerTest() {
        mAddress.sun_family = AF_UNIX;
        std::strncpy(mAddress.sun_path, mDirectory.path("c").c_str(), sizeof(mAddress.sun_path) - 1);
        ZTCFileDescriptor lSocket(socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
        EXPECT_EQ(bind(lSocket.get(), address(), sizeof(mAddress)), 0);
        EXPECT_EQ(listen(lSocket.get(), 64), 0);
        mServer = std::make_unique<ZTCControlServer>(
            std::move(lSocket), [this](std::uint64_t aTicket, const std::string& acrRequest) {
                mTickets.push_back(aTicket);
                return acrRequest == "later" ? std::nullopt : std::optional("<" + acrRequest + ">");
            });
    }
    const sockaddr* address() const { return reinterpret_cast<const sockaddr*>(&mAddress); }
    ZTCFileDescriptor connectClient() const {
        ZTCFileDescriptor lSocket(socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
        EXPECT_EQ(connect(lSocket.get(), address(), sizeof(mAddress)), 0);
        return lSocket;
    }
    static void put(const ZTCFileDescriptor& acrClient, const std::string& acrText) {
        ASSERT_EQ(send(acrClient.get(), acrText.data(), acrText.size(), MSG_NOSIGNAL),
                  static_cast<ssize_t>(acrText.size()));
    }
    void serve() { mServer->serve(std::chrono::steady_clock::now() + mAhead); }
    /// What the server has sent; "EOF" behind it where it has closed.
    static std::string take(const ZTCFileDescriptor& acrClient) {
        std::string lText;
        std::array<char, 65536> lBytes;
        ssize_t lCount;
        while ((lCount = recv(acrClient.get(), lBytes.data(), lBytes.size(), 0)) > 0) {
            lText.append(lBytes.data(), static_cast<std::size_t>(lCount));
        }
        return lCount == 0 ? lText + "EOF" : lText;
    }

    ZTCTemporaryDirectory mDirectory;
    sockaddr_un mAddress{};
    std::unique_ptr<ZTCControlServer> mServer;
    std::vector<std::uint64_t> mTickets;
    seconds mAhead{0};
};

TEST_F(ControlServerTest, EachLineGetsALine) {
    const ZTCFileDescriptor lClient = connectClient();
    put(lClient, "one\ntwo\nthr");
    serve();
    EXPECT_EQ(take(lClient), "<one>\n<two>\n");
    put(lClient, "ee\n");
    serve();
    EXPECT_EQ(take(lClient), "<three>\n");
}

TEST_F(ControlServerTest, AnAnswerThatIsPutOffComesBeforeTheNextRequestIsServed) {
    const ZTCFileDescriptor lClient = connectClient();
    put(lClient, "later\ntwo\n");
    serve();
    EXPECT_EQ(take(lClient), "");
    mServer->answer(mTickets.at(0) + 77, "nobody's");
    mServer->answer(mTickets.at(0), "done");
    serve();
    EXPECT_EQ(take(lClient), "done\n<two>\n");
}

TEST_F(ControlServerTest, ARequestThatIsTooLongEndsTheConnectionWithAWord) {
    const ZTCFileDescriptor lClient = connectClient();
    put(lClient, std::string(gcMaxControlRequest + 1, 'x'));
    serve();
    EXPECT_EQ(take(lClient), "{\"error\":\"a request has at most 4096 bytes\"}\nEOF");
    EXPECT_EQ(mServer->countClients(), 0U);
}

TEST_F(ControlServerTest, AClientThatSaysNothingIsDisconnected) {
    const ZTCFileDescriptor lClient = connectClient();
    put(lClient, "half a line");
    serve();
    ASSERT_EQ(mServer->countClients(), 1U);
    ASSERT_TRUE(mServer->getNextDeadline());
    mAhead = gcControlPatience + seconds(1);
    serve();
    EXPECT_EQ(mServer->countClients(), 0U);
    EXPECT_FALSE(mServer->getNextDeadline());
    EXPECT_EQ(take(lClient), "EOF");
}

TEST_F(ControlServerTest, AClientThatGoesOnAskingStaysConnected) {
    const ZTCFileDescriptor lClient = connectClient();
    for (int i = 0; i < 5; ++i) {
        put(lClient, "one\n");
        serve();
        EXPECT_EQ(take(lClient), "<one>\n");
        mAhead += gcControlPatience - seconds(1);
    }
}

TEST_F(ControlServerTest, AClientThatTakesNoAnswerIsDisconnectedAndHoldsNobodyUp) {
    const ZTCFileDescriptor lGreedy = connectClient();
    const std::string lLine = std::string(4000, 'x') + "\n";
    for (int i = 0; i < 500 && send(lGreedy.get(), lLine.data(), lLine.size(), MSG_NOSIGNAL) > 0; ++i) {
        serve();
    }
    const ZTCFileDescriptor lClient = connectClient();
    put(lClient, "one\n");
    serve();
    EXPECT_EQ(take(lClient), "<one>\n");
    mAhead = gcControlPatience + seconds(1);
    serve();
    EXPECT_EQ(mServer->countClients(), 0U);
}

TEST_F(ControlServerTest, MoreClientsThanItServesWaitAndAreServedThen) {
    std::vector<ZTCFileDescriptor> lIdle;
    for (std::size_t i = 0; i < gcMaxControlClients; ++i) {
        lIdle.push_back(connectClient());
    }
    serve();
    const ZTCFileDescriptor lClient = connectClient();
    put(lClient, "one\n");
    serve();
    EXPECT_EQ(mServer->countClients(), gcMaxControlClients);
    std::vector<pollfd> lFds;
    mServer->addTo(lFds);
    EXPECT_EQ(lFds.size(), gcMaxControlClients) << "the listening socket is not polled, which would spin";
    EXPECT_EQ(take(lClient), "");
    lIdle.clear();
    serve();
    serve();
    EXPECT_EQ(take(lClient), "<one>\n");
}

TEST_F(ControlServerTest, WithoutADescriptorForAClientItIsNotPolledForOneUntilTheNextTry) {
    const ZTCFileDescriptor lClient = connectClient();
    put(lClient, "one\n");
    {
        const ZTCResourceLimit lNoMore(RLIMIT_NOFILE, 0);
        serve();
    }
    std::vector<pollfd> lFds;
    mServer->addTo(lFds);
    EXPECT_TRUE(lFds.empty()) << "poll() would return at once, again and again";
    ASSERT_TRUE(mServer->getNextDeadline());
    EXPECT_EQ(take(lClient), "");
    mAhead = seconds(2);
    serve();
    EXPECT_EQ(take(lClient), "<one>\n");
    mServer->addTo(lFds);
    EXPECT_EQ(lFds.size(), 2U);
}

TEST_F(ControlServerTest, AClientThatHasGoneLeavesNothing) {
    connectClient();
    serve();
    serve();
    EXPECT_EQ(mServer->countClients(), 0U);
}
