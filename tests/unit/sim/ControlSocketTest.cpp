#include "libkpm/sim/src/ControlSocket.h"

#include <gtest/gtest.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "libkpm/sim/src/Control.h"
#include "libkpm/sim/src/ControlClient.h"
#include "libkpm/sim/src/Scenario.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/sim/Recorder.h"

static std::string sEcho(std::string_view aLine) {
    return "ok <" + std::string(aLine) + ">";
}

/// Runs behind each call of bind(); empty: nothing.
static std::function<void()> sAfterBind;

extern "C" int sRealBind(int aSocket, const sockaddr* apAddress, socklen_t aSize) __asm__("__real_bind");
extern "C" int sWrappedBind(int aSocket, const sockaddr* apAddress, socklen_t aSize) __asm__("__wrap_bind");
int sWrappedBind(int aSocket, const sockaddr* apAddress, socklen_t aSize) {
    const int lResult = sRealBind(aSocket, apAddress, aSize);
    if (sAfterBind) {
        sAfterBind();
    }
    return lResult;
}

/// How often a thread has looked at more than one descriptor: the socket's, since a client looks at its own alone.
static std::atomic<unsigned> sPolls{0};

extern "C" int sRealPoll(pollfd* apPolled, nfds_t aCount, int aMilliseconds) __asm__("__real_poll");
extern "C" int sWrappedPoll(pollfd* apPolled, nfds_t aCount, int aMilliseconds) __asm__("__wrap_poll");
int sWrappedPoll(pollfd* apPolled, nfds_t aCount, int aMilliseconds) {
    sPolls += aCount > 1 ? 1 : 0;
    return sRealPoll(apPolled, aCount, aMilliseconds);
}

/// The reason for which a socket is refused.
static std::string sRefusal(const std::string& acrPath) {
    try {
        const ZTCSimControlSocket lSocket(acrPath, sEcho);
    } catch (const std::runtime_error& lrException) {
        return lrException.what();
    }
    return "made";
}

/// A connection that sends bytes as they are told.
static ZTCLibraryDescriptor sConnect(const std::string& acrPath) {
    ZTCLibraryDescriptor lSocket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const sockaddr_un lAddress = makeSimSocketAddress(acrPath);
    EXPECT_EQ(::connect(lSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress), 0);
    return lSocket;
}

/// Everything until the other side closes.
static std::string sReadAll(const ZTCLibraryDescriptor& acrSocket) {
    std::string lText;
    char lBytes[4096];
    ssize_t lCount = 0;
    while ((lCount = ::recv(acrSocket.get(), lBytes, sizeof lBytes, 0)) > 0) {
        lText.append(lBytes, static_cast<std::size_t>(lCount));
    }
    return lText;
}

TEST(ControlSocket, AnswersEachLineInOrder) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSimControlSocket lSocket(lDirectory.path("s"), sEcho);
    ZTCSimControlClient lClient(lDirectory.path("s"));
    EXPECT_EQ(lClient.ask("one"), "ok <one>");
    EXPECT_EQ(lClient.ask(""), "ok <>");
    const ZTCLibraryDescriptor lRaw = sConnect(lDirectory.path("s"));
    ASSERT_EQ(::send(lRaw.get(), "a\nb\nc\nrest", 10, 0), 10);
    ASSERT_EQ(::shutdown(lRaw.get(), SHUT_WR), 0);
    EXPECT_EQ(sReadAll(lRaw), "ok <a>\nok <b>\nok <c>\n");
}

TEST(ControlSocket, PutsLinesTogetherHoweverTheyAreSplit) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSimControlSocket lSocket(lDirectory.path("s"), sEcho);
    const ZTCLibraryDescriptor lRaw = sConnect(lDirectory.path("s"));
    for (const char lByte : std::string("split\nline\n")) {
        ASSERT_EQ(::send(lRaw.get(), &lByte, 1, 0), 1);
    }
    ASSERT_EQ(::shutdown(lRaw.get(), SHUT_WR), 0);
    EXPECT_EQ(sReadAll(lRaw), "ok <split>\nok <line>\n");
}

TEST(ControlSocket, RefusesALineThatIsTooLongAndServesTheNextClient) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSimControlSocket lSocket(lDirectory.path("s"), sEcho);
    ZTCSimControlClient lClient(lDirectory.path("s"));
    EXPECT_EQ(lClient.ask(std::string(gcSimMaxLineSize, 'x')).size(), gcSimMaxLineSize + 5);
    EXPECT_EQ(lClient.ask(std::string(gcSimMaxLineSize + 20000, 'x')), "error: the line has more than 262144 bytes");
    ZTCSimControlClient lNext(lDirectory.path("s"));
    EXPECT_EQ(lNext.ask("next"), "ok <next>");
}

TEST(ControlSocket, ServesSeveralClientsAtOnce) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSimControlSocket lSocket(lDirectory.path("s"), sEcho);
    std::vector<std::unique_ptr<ZTCSimControlClient>> lClients;
    for (int lClient = 0; lClient < 5; ++lClient) {
        lClients.push_back(std::make_unique<ZTCSimControlClient>(lDirectory.path("s")));
    }
    for (const auto& lrpClient : lClients) {
        EXPECT_EQ(lrpClient->ask("hello"), "ok <hello>");
    }
}

TEST(ControlSocket, ClientsThatOnlyWaitTakeNoTime) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSimControlSocket lSocket(lDirectory.path("s"), sEcho);
    ZTCSimControlClient lWaiting(lDirectory.path("s"));
    ZTCSimControlClient lClient(lDirectory.path("s"));
    EXPECT_EQ(lWaiting.ask("first"), "ok <first>");
    EXPECT_EQ(lClient.ask("first"), "ok <first>");
    sPolls = 0;
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    EXPECT_LE(sPolls, 1u) << "once it may go back to waiting";
    EXPECT_EQ(lWaiting.ask("second"), "ok <second>");
}

TEST(ControlSocket, WithoutADescriptorLeftItWaitsForOneWithoutSpinning) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSimControlSocket lSocket(lDirectory.path("s"), sEcho);
    const ZTCLibraryDescriptor lClient(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const int lFree = ::dup(lClient.get());
    ASSERT_GE(lFree, 0);
    ::close(lFree);
    const sockaddr_un lAddress = makeSimSocketAddress(lDirectory.path("s"));
    {
        const ZTCResourceLimit lLimit(RLIMIT_NOFILE, static_cast<rlim_t>(lFree));
        sPolls = 0;
        const auto lBegin = std::chrono::steady_clock::now();
        ASSERT_EQ(::connect(lClient.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress), 0);
        waitUntil([] { return sPolls >= 5; }, "some looks of the socket");
        const auto lPassed = std::chrono::steady_clock::now() - lBegin;
        EXPECT_GE(lPassed, std::chrono::milliseconds(100)) << "it pauses between its attempts";
    }
    ASSERT_EQ(::send(lClient.get(), "line\n", 5, 0), 5);
    ASSERT_EQ(::shutdown(lClient.get(), SHUT_WR), 0);
    EXPECT_EQ(sReadAll(lClient), "ok <line>\n");
}

TEST(ControlSocket, AClientThatDoesNotReadHoldsUpNobody) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSimControlSocket lSocket(lDirectory.path("s"), [](std::string_view) { return std::string(1 << 20, 'y'); });
    const ZTCLibraryDescriptor lDeaf = sConnect(lDirectory.path("s"));
    ASSERT_EQ(::send(lDeaf.get(), "a\nb\nc\n", 6, 0), 6);
    ZTCSimControlClient lClient(lDirectory.path("s"));
    EXPECT_EQ(lClient.ask("hello").size(), std::size_t{1} << 20);
}

TEST(ControlSocket, IsForItsOwnerAloneAndRemovedAtTheEnd) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("s");
    {
        const ZTCSimControlSocket lSocket(lPath, sEcho);
        struct stat lStatus {};
        ASSERT_EQ(::lstat(lPath.c_str(), &lStatus), 0);
        EXPECT_TRUE(S_ISSOCK(lStatus.st_mode));
        EXPECT_EQ(lStatus.st_mode & 07777u, 0600u);
    }
    EXPECT_FALSE(exists(lPath));
    EXPECT_THROW(ZTCSimControlClient{lPath}, ZTCSimNobodyListens);
}

TEST(ControlSocket, LeavesWhatHasTakenItsPlace) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("s");
    {
        const ZTCSimControlSocket lSocket(lPath, sEcho);
        ASSERT_EQ(::unlink(lPath.c_str()), 0);
        writeFile(lPath, "another's");
    }
    EXPECT_EQ(readFile(lPath), "another's");
}

TEST(ControlSocket, ALinkThatTakesItsPlaceWhileItIsMadeLeadsNowhere) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("s");
    const std::string lVictim = lDirectory.path("victim");
    writeFile(lVictim, "another's");
    ASSERT_EQ(::chmod(lVictim.c_str(), 0644), 0);
    sAfterBind = [&] {
        EXPECT_EQ(::unlink(lPath.c_str()), 0);
        EXPECT_EQ(::symlink(lVictim.c_str(), lPath.c_str()), 0);
    };
    const std::string lRefusal = sRefusal(lPath);
    sAfterBind = nullptr;
    EXPECT_EQ(lRefusal, lPath + ": was replaced by something that is not a socket");
    struct stat lStatus {};
    ASSERT_EQ(::stat(lVictim.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode & 07777u, 0644u);
}

TEST(ControlSocket, TakesOverAStaleSocket) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("s");
    {
        const ZTCLibraryDescriptor lDead(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
        const sockaddr_un lAddress = makeSimSocketAddress(lPath);
        ASSERT_EQ(::bind(lDead.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress), 0);
    }
    ASSERT_TRUE(exists(lPath));
    const ZTCSimControlSocket lSocket(lPath, sEcho);
    EXPECT_EQ(ZTCSimControlClient(lPath).ask("x"), "ok <x>");
}

TEST(ControlSocket, RefusesAnotherKindOfFileUntouched) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("s");
    writeFile(lPath, "precious");
    EXPECT_EQ(sRefusal(lPath), lPath + ": exists and is not a socket");
    EXPECT_EQ(readFile(lPath), "precious");
}

TEST(ControlSocket, RefusesASocketThatIsServed) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("s");
    const ZTCSimControlSocket lSocket(lPath, sEcho);
    EXPECT_EQ(sRefusal(lPath), lPath + ": another library listens there");
    EXPECT_EQ(ZTCSimControlClient(lPath).ask("x"), "ok <x>");
}

TEST(ControlSocket, RefusesAPathThatIsTooLong) {
    const std::string lPath(108, 'p');
    EXPECT_EQ(sRefusal(lPath), lPath + ": a socket's path has 1 to 107 bytes, not 108");
}

TEST(ControlSocket, RefusesADirectoryThatIsNotThere) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("none/s");
    EXPECT_EQ(sRefusal(lPath), lPath + ": bind: No such file or directory");
}

class ControlSocketOnEngine : public testing::Test {
protected:
    ControlSocketOnEngine()
        : mEngine(readScenario(gcTwoAdapters)),
          mSocket(mDirectory.path("s"), [this](std::string_view aLine) { return answerSimLine(mEngine, aLine); }),
          mClient(mDirectory.path("s")) {}

    ZTCTemporaryDirectory mDirectory;
    ZTCRecorder mRecorder;
    ZTCSimEngine mEngine;
    ZTCSimControlSocket mSocket;
    ZTCSimControlClient mClient;
};

TEST_F(ControlSocketOnEngine, AnInjectedLineIsAnsweredWithTheNumberOfItsCallbacks) {
    mRecorder.registerKind(mEngine, 0, "queue-full");
    EXPECT_EQ(mClient.ask("queue-full lun=4 times=3"), "ok 3");
    EXPECT_EQ(mRecorder.getCount(), 3u);
    EXPECT_EQ(mRecorder.getThreads().count(std::this_thread::get_id()), 0u);
    EXPECT_EQ(mClient.ask("queue-full board=1"), "ok 0");
    EXPECT_EQ(mClient.ask("storm count=20 kind=queue-full board=0"), "ok 20");
}

TEST_F(ControlSocketOnEngine, ALineThatIsRefusedIsAnsweredWithTheReason) {
    EXPECT_EQ(mClient.ask("queue-full lun=x"), "error: lun= takes a number, not \"x\"");
    EXPECT_EQ(mClient.ask("count 1"), "error: \"count\" is neither an event kind nor storm, state or loss");
    EXPECT_EQ(mClient.ask(""), "error: the line is empty");
    EXPECT_EQ(mClient.ask("plogi at=5"),
              "error: at=, every= and over= are for scenarios: an injected line is delivered at once");
}

TEST_F(ControlSocketOnEngine, TheStatusCountsWhatWasDeliveredAndDropped) {
    mRecorder.registerKind(mEngine, 0, "rscn");
    mClient.ask("rscn pages=fabric,fabric");
    mClient.ask("plogi");
    EXPECT_EQ(mClient.ask("status"), "ok delivered=1 dropped=1 pages=2 registered=1 adapters=2 schedule=waiting");
    mRecorder.registerAll(mEngine, 1);
    EXPECT_EQ(mClient.ask("status"), "ok delivered=1 dropped=1 pages=2 registered=21 adapters=2 schedule=done");
    EXPECT_EQ(mClient.ask("counts").substr(0, 50), "ok plogi=0 prlo=0 adisc=0 lsrjt=0 logo=0 rscn=1 fa");
}
