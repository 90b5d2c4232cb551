#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <sstream>

#include "tests/unit/client/TavikctlFixture.h"

using testing::HasSubstr;

using TavikctlWatch = ZTCTavikctlFixture;

/// Answers requests for records with nothing new, everything else with success.
static ZTCFakeAgent::ZTCStep sServing() {
    return [](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
        arAgent.sendFrame(acrRequest[0] == 1 ? makeSampleResponse(0, {}) : gcSuccess);
    };
}

TEST_F(TavikctlWatch, PlaysTheSensorUntilItsLastRetrieval) {
    std::atomic<bool> lHadPidFile{true};
    const ZTCFakeAgent lAgent(dir(), {[&](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
                                  lHadPidFile = lHadPidFile && exists(dir() + "/qrv-sn.pid");
                                  arAgent.sendFrame(acrRequest[0] == 1 ? makeFullSampleResponse() : gcSuccess);
                              }});
    const ZTSFinishedRun lRun = run({"watch", "--interval", "0.05", "--count", "3", "--targets", gcTarget, "--json"});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    EXPECT_TRUE(lHadPidFile);
    EXPECT_FALSE(exists(dir() + "/qrv-sn.pid"));
    std::vector<int> lCodes;
    for (const ZTCWireBytes& lrRequest : lAgent.getRequests()) {
        lCodes.push_back(lrRequest[0]);
    }
    EXPECT_EQ(lCodes, (std::vector<int>{3, 0, 1, 1, 1}));
    std::istringstream lLines(lRun.mOutput);
    std::string lLine;
    int lCount = 0;
    while (std::getline(lLines, lLine)) {
        const nlohmann::json lDocument = parseJson(lLine);
        EXPECT_EQ(lDocument["retrieval"], ++lCount);
        EXPECT_EQ(lDocument["totals"]["records"], 20);
    }
    EXPECT_EQ(lCount, 3);
}

TEST_F(TavikctlWatch, GoesOnThroughAMissingAgentAndStartsItsSuccessor) {
    ZTCChildProcess lWatch(setup({"watch", "--interval", "0.05", "--timeout", "0.2"}));
    waitUntil([&] { return lWatch.standardError().find("no agent") != std::string::npos; }, "the message");
    EXPECT_EQ(readFile(dir() + "/qrv-sn.pid"), std::to_string(lWatch.getPid()) + "\n");
    for (const char* lpPid : {"1001\n", "1002\n"}) {
        writeFile(dir() + "/qrv-tvk.pid", lpPid);
        const ZTCFakeAgent lAgent(dir(), {sServing()});
        waitUntil([&] { return lAgent.getRequests().size() >= 2; }, "a retrieval");
        EXPECT_EQ(lAgent.getRequests()[0], encodeStartScope(900));
        EXPECT_EQ(lAgent.getRequests()[1], encodeGetScopeData());
    }
    lWatch.sendSignal(SIGTERM);
    EXPECT_EQ(lWatch.waitForExit(), 0) << lWatch.standardError();
    EXPECT_FALSE(exists(dir() + "/qrv-sn.pid"));
    EXPECT_THAT(lWatch.standardOutput(), HasSubstr("-- retrieval 2\n"));
}

TEST_F(TavikctlWatch, AnAgentThatComesLateIsStartedAndAskedOnlyAfterAnInterval) {
    ZTCChildProcess lWatch(setup({"watch", "--interval", "3600", "--timeout", "0.2"}));
    waitUntil([&] { return lWatch.standardError().find("no agent") != std::string::npos; }, "the message");
    writeFile(dir() + "/qrv-tvk.pid", "1001\n");
    const ZTCFakeAgent lAgent(dir(), {sServing()});
    waitUntil([&] { return lWatch.standardError().find("answers") != std::string::npos; }, "the end of the outage");
    EXPECT_EQ(lAgent.getRequests(), std::vector<ZTCWireBytes>{encodeStartScope(900)});
    lWatch.sendSignal(SIGTERM);
    EXPECT_EQ(lWatch.waitForExit(), 0) << lWatch.standardError();
}

TEST_F(TavikctlWatch, BytesThatWereThrownAwayAreReportedOnce) {
    ZTCFakeAgent lAgent(dir(), {sServing()});
    lAgent.refusePeriodOfZero();
    // Bytes stay in a FIFO as long as somebody has it open.
    const ZTCFileDescriptor lReader =
        ZTCFileDescriptor::open((dir() + "/qrvtvkout.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    const ZTCFileDescriptor lWriter =
        ZTCFileDescriptor::open((dir() + "/qrvtvkout.fifo").c_str(), O_WRONLY | O_NONBLOCK);
    ASSERT_EQ(write(lWriter.get(), "stale", 5), 5);
    const ZTSFinishedRun lRun = run({"watch", "--interval", "0.05", "--count", "3"});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    const std::size_t lFirst = lRun.mErrors.find("threw away 5 bytes");
    ASSERT_NE(lFirst, std::string::npos) << lRun.mErrors;
    EXPECT_EQ(lRun.mErrors.find("threw away", lFirst + 1), std::string::npos) << lRun.mErrors;
}

TEST_F(TavikctlWatch, ASecondOneIsRefused) {
    ZTCChildProcess lWatch(setup({"watch"}));
    waitUntil([&] { return readFile(dir() + "/qrv-sn.pid") == std::to_string(lWatch.getPid()) + "\n"; },
              "the pid file");
    const ZTSFinishedRun lSecond = run({"watch"});
    EXPECT_EQ(lSecond.mStatus, 2);
    expectOneLine(lSecond.mErrors);
    EXPECT_THAT(lSecond.mErrors, HasSubstr(std::to_string(lWatch.getPid())));
    lWatch.sendSignal(SIGINT);
    EXPECT_EQ(lWatch.waitForExit(), 0);
}

TEST_F(TavikctlWatch, AGetBesideItIsServed) {
    const ZTCFakeAgent lAgent(dir(), {sServing()});
    ZTCChildProcess lWatch(setup({"watch", "--interval", "3600"}));
    waitUntil([&] { return !lAgent.getRequests().empty(); }, "the watch's start command");
    const ZTSFinishedRun lGet = run({"get"});
    EXPECT_EQ(lGet.mStatus, 0) << lGet.mErrors;
    lWatch.sendSignal(SIGTERM);
    EXPECT_EQ(lWatch.waitForExit(), 0) << lWatch.standardError();
}

/// The pid file's modification time is put into the past; it has to move within the watch's long interval.
static void sExpectTouch(const std::string& acrPath) {
    const timespec lLongAgo[2] = {{1000, 0}, {1000, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, acrPath.c_str(), lLongAgo, 0), 0);
    waitUntil(
        [&] {
            struct stat lStatus {};
            return stat(acrPath.c_str(), &lStatus) == 0 && lStatus.st_mtime > 1000;
        },
        "a touch of the pid file");
}

TEST_F(TavikctlWatch, ThePidFileIsTouchedAgainAndAgainWithinAnInterval) {
    const ZTCFakeAgent lAgent(dir(), {sServing()});
    ZTCChildProcess lWatch(setup({"watch", "--interval", "3600"}));
    waitUntil([&] { return !lAgent.getRequests().empty(); }, "the watch's start command");
    sExpectTouch(dir() + "/qrv-sn.pid");
    sExpectTouch(dir() + "/qrv-sn.pid");
    lWatch.sendSignal(SIGTERM);
    EXPECT_EQ(lWatch.waitForExit(), 0) << lWatch.standardError();
}

TEST_F(TavikctlWatch, AReaderThatStopsKeepsNeitherThePidFileNorASignalWaiting) {
    const ZTCFakeAgent lAgent(dir(), {servingMoreThanAPipeTakes()});
    ZTCChildProcess lWatch(setupUnread("watch --interval 0.05"));
    waitUntil([&] { return lAgent.getRequests().size() >= 2; }, "a retrieval");
    sExpectTouch(dir() + "/qrv-sn.pid");
    sExpectTouch(dir() + "/qrv-sn.pid");
    lWatch.sendSignal(SIGTERM);
    EXPECT_EQ(lWatch.waitForExit(), 4);
    EXPECT_THAT(lWatch.standardError(), HasSubstr("2000 records were taken from the agent"));
    EXPECT_FALSE(exists(dir() + "/qrv-sn.pid"));
}
