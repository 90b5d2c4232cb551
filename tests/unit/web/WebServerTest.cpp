#include "sensor/web/include/WebServer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>

#include <cstring>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/web/HttpClient.h"

using std::chrono::milliseconds;
using testing::AllOf;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

/// A server on any port of the loopback, whose handler shows what it was asked.
class WebServer : public testing::Test {
protected:
    static ZTSWebResponse answer(const ZTSWebRequest& acrRequest) {
        if (acrRequest.mPath == "/fail") {
            throw std::runtime_error("the store is closed");
        }
        if (acrRequest.mPath == "/stream") {
            return {.mType = "text/event-stream", .mBody = ": begin\n\n", .mIsStream = true};
        }
        if (acrRequest.mPath == "/large") {
            return {.mBody = std::string(8 * 1024 * 1024, 'x')};
        }
        std::string lBody = acrRequest.mPath;
        for (const auto& [lName, lValue] : acrRequest.mParameters) {
            lBody += " " + lName + "=[" + lValue + "]";
        }
        return {.mBody = lBody};
    }

    ZTCWebServer& start(const ZTSWebOptions& acrOptions = {.mListen = "127.0.0.1:0", .mHosts = {}}) {
        mpServer = std::make_unique<ZTCWebServer>(acrOptions, &answer);
        return *mpServer;
    }
    ZTCWebServer& start(const ZTSWebLimits& acrLimits) {
        return start({.mListen = "127.0.0.1:0", .mHosts = {}, .mLimits = acrLimits});
    }

    std::unique_ptr<ZTCWebServer> mpServer;
};

static std::string sBody(const std::string& acrAnswer) {
    return acrAnswer.substr(acrAnswer.find("\r\n\r\n") + 4);
}

TEST_F(WebServer, AnswersWithPathAndParametersDecodedInOrder) {
    const unsigned lPort = start().getPort();
    EXPECT_EQ(sBody(ZTCHttpClient::get(lPort, "/a%20b?kind=rscn&kind=link&x=1%262&empty=&flag")),
              "/a b kind=[rscn] kind=[link] x=[1&2] empty=[] flag=[]");
}

TEST_F(WebServer, HeadHasTheHeadersOfGetAndNoBody) {
    const unsigned lPort = start().getPort();
    const std::string lAnswer =
        ZTCHttpClient::ask(lPort, "HEAD /path HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n");
    EXPECT_THAT(lAnswer, AllOf(StartsWith("HTTP/1.1 200 "), HasSubstr("Content-Length: 5\r\n"), EndsWith("\r\n\r\n")));
}

TEST_F(WebServer, EveryAnswerForbidsForeignContent) {
    const unsigned lPort = start().getPort();
    for (const char* lpTarget : {"/", "/fail"}) {
        EXPECT_THAT(ZTCHttpClient::get(lPort, lpTarget),
                    AllOf(HasSubstr("Content-Security-Policy: default-src 'none';"),
                          HasSubstr("X-Content-Type-Options: nosniff\r\n"), HasSubstr("Cache-Control: no-store\r\n")));
    }
}

TEST_F(WebServer, OtherMethodsAreRefusedWhateverTheirBody) {
    const unsigned lPort = start().getPort();
    for (const char* lpMethod : {"POST", "PUT", "DELETE", "OPTIONS", "TRACE"}) {
        EXPECT_THAT(
            ZTCHttpClient::ask(lPort, std::string(lpMethod) + " / HTTP/1.1\r\nHost: localhost\r\nContent-Length: 5\r\n"
                                                              "Connection: close\r\n\r\nhello"),
            AllOf(StartsWith("HTTP/1.1 405 "), HasSubstr("Allow: GET, HEAD\r\n")));
    }
}

TEST_F(WebServer, AForeignHostNameIsRefused) {
    const unsigned lPort = start({.mListen = "127.0.0.1:0", .mHosts = {"db07.example"}}).getPort();
    for (const char* lpHost :
         {"localhost", "LocalHost:9632", "127.0.0.1:1", "[::1]", "[::1]:80", "DB07.example:9632"}) {
        EXPECT_THAT(ZTCHttpClient::get(lPort, "/", lpHost), StartsWith("HTTP/1.1 200 ")) << lpHost;
    }
    for (const char* lpHost : {"evil.example", "localhost.evil.example", "127.0.0.1.evil.example", "localhost:80:80",
                               "[::2]", "[::1", "localhost:x", ""}) {
        EXPECT_THAT(ZTCHttpClient::get(lPort, "/", lpHost), Not(StartsWith("HTTP/1.1 200 "))) << lpHost;
    }
    EXPECT_THAT(ZTCHttpClient::ask(lPort, "GET / HTTP/1.0\r\n\r\n"), Not(HasSubstr(" 200 ")));
}

TEST_F(WebServer, AnExceptionOfTheHandlerIsStatus500AndTheNextRequestIsServed) {
    const unsigned lPort = start().getPort();
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/fail"),
                AllOf(StartsWith("HTTP/1.1 500 "), HasSubstr("the store is closed")));
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/next"), EndsWith("/next"));
}

TEST_F(WebServer, ATargetOrAHeaderThatIsTooLongIsRefusedAndTheNextRequestIsServed) {
    const unsigned lPort = start().getPort();
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/" + std::string(100000, 'a')), Not(HasSubstr(" 200 ")));
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/", "localhost\r\nX-Long: " + std::string(100000, 'a')),
                Not(HasSubstr(" 200 ")));
    EXPECT_THAT(ZTCHttpClient::ask(lPort, "\x01\x02 nonsense\r\n\r\n"), Not(HasSubstr(" 200 ")));
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/next"), EndsWith("/next"));
}

TEST_F(WebServer, ARequestBelowTheBoundOf16KiBIsServedAndOneAboveItRefused) {
    const unsigned lPort = start().getPort();
    const std::string lAllowed(12000, 'a');
    const std::string lTooLong(16384, 'a');
    const auto lAskWithHeader = [lPort](const std::string& acrValue) {
        return ZTCHttpClient::get(lPort, "/", "localhost\r\nX-Long: " + acrValue);
    };
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/" + lAllowed), EndsWith("\r\n\r\n/" + lAllowed));
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/" + lTooLong), StartsWith("HTTP/1.1 414 "));
    EXPECT_THAT(lAskWithHeader(lAllowed), StartsWith("HTTP/1.1 200 "));
    EXPECT_THAT(lAskWithHeader(lTooLong), StartsWith("HTTP/1.1 431 "));
}

TEST_F(WebServer, ARequestWithABodyWithoutEndIsHungUpOn) {
    const unsigned lPort = start(ZTSWebLimits{.mRequestTime = milliseconds(300)}).getPort();
    ZTCHttpClient lEndless(lPort);
    ASSERT_TRUE(lEndless.send("GET / HTTP/1.1\r\nHost: localhost\r\nContent-Length: 1000000000000\r\n\r\n"));
    waitUntil([&] { return !lEndless.send(std::string(1000, 'b')); }, "the end of the connection");
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/next"), EndsWith("/next"));
}

TEST_F(WebServer, AClientThatSendsItsRequestByteByByteIsHungUpOn) {
    const unsigned lPort = start(ZTSWebLimits{.mRequestTime = milliseconds(300)}).getPort();
    ZTCHttpClient lSlow(lPort);
    ZTCHttpClient lSilent(lPort);
    // Never silent for long, and never done.
    waitUntil([&] { return !lSlow.send("G"); }, "the end of the connection");
    EXPECT_EQ(lSilent.readToEnd(), "");
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/next"), EndsWith("/next"));
}

TEST_F(WebServer, AClientThatDoesNotReadItsAnswerIsHungUpOn) {
    const unsigned lPort = start(ZTSWebLimits{.mResponseTime = milliseconds(300)}).getPort();
    ZTCHttpClient lSlow(lPort);
    ASSERT_TRUE(lSlow.send("GET /large HTTP/1.1\r\nHost: localhost\r\n\r\n"));
    waitUntil([&] { return !lSlow.send("G"); }, "the end of the connection");
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/next"), EndsWith("/next"));
}

TEST_F(WebServer, ConnectionsBeyondTheLimitWaitAndAreServedLater) {
    const unsigned lPort = start(ZTSWebLimits{.mConnections = 4, .mRequestTime = milliseconds(300)}).getPort();
    std::vector<std::unique_ptr<ZTCHttpClient>> lIdle;
    for (int i = 0; i < 12; ++i) {
        lIdle.push_back(std::make_unique<ZTCHttpClient>(lPort));
    }
    // Those who ask for nothing lose their places.
    waitUntil(
        [&] {
            ZTCHttpClient lClient(lPort);
            lClient.send("GET /served HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n");
            return lClient.readToEnd().ends_with("/served");
        },
        "a free place");
}

TEST_F(WebServer, ASecondRequestIsServedOnTheSameConnection) {
    const unsigned lPort = start().getPort();
    ZTCHttpClient lClient(lPort);
    for (const char* lpPath : {"/one", "/two"}) {
        ASSERT_TRUE(lClient.send("GET " + std::string(lpPath) + " HTTP/1.1\r\nHost: localhost\r\n\r\n"));
        EXPECT_THAT(lClient.readUntil(lpPath), HasSubstr("200 OK"));
    }
}

TEST_F(WebServer, AConnectionThatAsksForNothingMoreIsHungUpOnAsOneThatNeverAsked) {
    const unsigned lPort =
        start(ZTSWebLimits{.mRequestTime = std::chrono::seconds(1), .mResponseTime = std::chrono::hours(1)}).getPort();
    ZTCHttpClient lClient(lPort);
    ASSERT_TRUE(lClient.send("GET /one HTTP/1.1\r\nHost: localhost\r\n\r\n"));
    lClient.readUntil("/one");
    waitUntil([&] { return lClient.isHungUpOn(); }, "the end of the connection");
}

// ---- the stream ----

static const char* const scStreamRequest = "GET /stream HTTP/1.1\r\nHost: localhost\r\n\r\n";

TEST_F(WebServer, AStreamGetsItsBeginningAndThenEveryEvent) {
    ZTCWebServer& lrServer = start();
    ZTCHttpClient lOne(lrServer.getPort());
    ZTCHttpClient lOther(lrServer.getPort());
    for (ZTCHttpClient* lpClient : {&lOne, &lOther}) {
        ASSERT_TRUE(lpClient->send(scStreamRequest));
        EXPECT_THAT(lpClient->readUntil(": begin\n\n"), HasSubstr("text/event-stream"));
    }
    EXPECT_TRUE(lrServer.hasStreams());
    for (int i = 0; i < 100; ++i) {
        lrServer.publish("episode", "{\"seq\":" + std::to_string(i) + "}");
    }
    for (ZTCHttpClient* lpClient : {&lOne, &lOther}) {
        for (int i = 0; i < 100; ++i) {
            EXPECT_THAT(lpClient->readUntil("}\n\n"),
                        HasSubstr("event: episode\ndata: {\"seq\":" + std::to_string(i) + "}\n\n"));
        }
    }
}

TEST_F(WebServer, AStreamStaysWhenTheTimeOfAnAnswerIsLongOver) {
    ZTCWebServer& lrServer = start(ZTSWebLimits{.mResponseTime = milliseconds(300)});
    ZTCHttpClient lStream(lrServer.getPort());
    ASSERT_TRUE(lStream.send(scStreamRequest));
    lStream.readUntil(": begin\n\n");
    // Two answers that nobody reads, one after the other, show that the time has passed.
    for (int i = 0; i < 2; ++i) {
        ZTCHttpClient lSlow(lrServer.getPort());
        ASSERT_TRUE(lSlow.send("GET /large HTTP/1.1\r\nHost: localhost\r\n\r\n"));
        waitUntil([&] { return !lSlow.send("G"); }, "the end of an answer that nobody reads");
    }
    EXPECT_FALSE(lStream.isHungUpOn());
    lrServer.publish("episode", "{}");
    EXPECT_THAT(lStream.readUntil("{}\n\n"), HasSubstr("event: episode\n"));
}

TEST_F(WebServer, TheNinthStreamGets503AndAPlaceThatIsFreeAgainIsGiven) {
    ZTCWebServer& lrServer = start();
    std::vector<std::unique_ptr<ZTCHttpClient>> lReaders;
    for (int i = 0; i < 8; ++i) {
        lReaders.push_back(std::make_unique<ZTCHttpClient>(lrServer.getPort()));
        ASSERT_TRUE(lReaders.back()->send(scStreamRequest));
        lReaders.back()->readUntil(": begin\n\n");
    }
    EXPECT_THAT(ZTCHttpClient::get(lrServer.getPort(), "/stream"), StartsWith("HTTP/1.1 503 "));
    lReaders.front().reset();
    waitUntil(
        [&] {
            lrServer.publish("tick", "{}");
            ZTCHttpClient lNinth(lrServer.getPort());
            lNinth.send(scStreamRequest);
            return lNinth.readUntil("\r\n").find(" 200 ") != std::string::npos;
        },
        "the place of the client that has gone");
}

TEST_F(WebServer, TheStreamOfAPageThatWasLeftIsFreeAtOnce) {
    ZTCWebServer& lrServer = start(ZTSWebLimits{.mStreams = 1});
    // A page that is loaded again and again: each time the one place is free, though nothing was sent meanwhile.
    for (int i = 0; i < 20; ++i) {
        ZTCHttpClient lClient(lrServer.getPort());
        ASSERT_TRUE(lClient.send(scStreamRequest));
        EXPECT_THAT(lClient.readUntil(": begin\n\n"), HasSubstr(" 200 OK")) << i;
    }
    waitUntil([&] { return !lrServer.hasStreams(); }, "the end of the last stream");
}

TEST_F(WebServer, AReaderOfTheStreamThatStopsReadingIsDroppedAndHoldsNobodyUp) {
    ZTCWebServer& lrServer = start(ZTSWebLimits{.mStreamBytes = 65536});
    ZTCHttpClient lStuck(lrServer.getPort());
    ASSERT_TRUE(lStuck.send(scStreamRequest));
    lStuck.readUntil(": begin\n\n");
    const std::string lData(30000, 'x');
    waitUntil(
        [&] {
            lrServer.publish("episode", lData);
            return !lrServer.hasStreams();
        },
        "the reader to be dropped");
    EXPECT_THAT(ZTCHttpClient::get(lrServer.getPort(), "/next"), EndsWith("/next"));
}

TEST_F(WebServer, EndingItEndsOpenStreamsAndIdleConnections) {
    ZTCWebServer& lrServer = start();
    ZTCHttpClient lStream(lrServer.getPort());
    ASSERT_TRUE(lStream.send(scStreamRequest));
    lStream.readUntil(": begin\n\n");
    ZTCHttpClient lIdle(lrServer.getPort());
    mpServer.reset();
    lStream.readToEnd();
    EXPECT_EQ(lIdle.readToEnd(), "");
}

// ---- where it listens ----

TEST_F(WebServer, LocalhostIsTheLoopback) {
    const unsigned lPort = start({.mListen = "localhost:0", .mHosts = {}}).getPort();
    EXPECT_THAT(ZTCHttpClient::get(lPort, "/path"), EndsWith("/path"));
}

TEST_F(WebServer, AUnixSocketIsForItsGroupAndTakesAnyHostName) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("http");
    start({.mListen = "unix:" + lPath, .mHosts = {}});
    struct stat lStatus {};
    ASSERT_EQ(stat(lPath.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode & 0777U, 0660U);
    ZTCHttpClient lClient(lPath);
    ASSERT_TRUE(lClient.send("GET /path HTTP/1.1\r\nHost: whatever\r\nConnection: close\r\n\r\n"));
    EXPECT_THAT(lClient.readToEnd(), EndsWith("/path"));
    mpServer.reset();
    EXPECT_FALSE(exists(lPath));
}

TEST_F(WebServer, ASocketThatWasLeftBehindIsReplacedAndOneThatIsServedIsNot) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("http");
    {
        const ZTCFileDescriptor lLeft(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
        sockaddr_un lAddress{};
        lAddress.sun_family = AF_UNIX;
        std::strncpy(lAddress.sun_path, lPath.c_str(), sizeof lAddress.sun_path - 1);
        ASSERT_EQ(bind(lLeft.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress), 0);
    }
    start({.mListen = "unix:" + lPath, .mHosts = {}});
    EXPECT_THROW(ZTCWebServer({.mListen = "unix:" + lPath, .mHosts = {}}, &answer), ZTCSystemCallEx);
    ZTCHttpClient lClient(lPath);
    ASSERT_TRUE(lClient.send("GET /still HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n"));
    EXPECT_THAT(lClient.readToEnd(), EndsWith("/still"));
}

TEST_F(WebServer, APortThatIsInUseIsNamed) {
    const std::string lListen = "127.0.0.1:" + std::to_string(start().getPort());
    try {
        const ZTCWebServer lSecond({.mListen = lListen, .mHosts = {}}, &answer);
        FAIL() << "two servers on one port";
    } catch (const ZTCSystemCallEx& lrEx) {
        EXPECT_THAT(lrEx.what(), AllOf(HasSubstr(lListen), HasSubstr("http.listen")));
    }
}

TEST_F(WebServer, TextsThatAreNoAddressAreNamed) {
    for (const std::string& lrListen :
         {std::string("localhost"), std::string("127.0.0.1"), std::string("127.0.0.1:"), std::string("127.0.0.1:65536"),
          std::string("::1:80"), std::string("[::1]"), std::string("unix:"), "unix:" + std::string(200, 'x')}) {
        try {
            const ZTCWebServer lServer({.mListen = lrListen, .mHosts = {}}, &answer);
            FAIL() << lrListen;
        } catch (const ZTCBadInputEx& lrEx) {
            EXPECT_THAT(lrEx.what(), HasSubstr(lrListen));
        }
    }
}
