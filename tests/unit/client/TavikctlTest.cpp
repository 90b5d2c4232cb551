#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/file.h>
#include <unistd.h>

#include <atomic>
#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/client/FakeAgent.h"
#include "tests/unit/client/WireSamples.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

static const ZTCWireBytes scSuccess{0, 0, 0, 0, 0};
static const ZTCWireBytes scInvalid{1, 0, 6};
static const char* const scTarget = "50:06:01:60:bb:a0:12:34,50:06:01:60:3b:a0:12:34,0x010203";

/// One run of the tool in a directory of its own.
class Tavikctl : public testing::Test {
protected:
    struct ZTSRun {
        int mStatus;
        std::string mOutput;
        std::string mErrors;
    };

    std::string dir() const { return mDirectory.path(); }

    ZTSChildProcessSetup setup(const std::vector<std::string>& acrArguments) {
        return {.mProgram = TAVIKCTL_PROGRAM,
                .mArguments = acrArguments,
                .mEnvironment = {{"ZT_QRV_SENSOR_DIR", dir()}},
                .mWorkingDirectory = mOther.path(),
                .mOutputPrefix = mOther.path("run" + std::to_string(++mRuns))};
    }

    ZTSRun run(const std::vector<std::string>& acrArguments) {
        ZTCChildProcess lProcess(setup(acrArguments));
        const int lStatus = lProcess.waitForExit();
        return {lStatus, lProcess.standardOutput(), lProcess.standardError()};
    }

    /// The tool behind a shell, for what only a shell can do to its standard streams.
    ZTSRun runShell(const std::string& acrScript) {
        ZTSChildProcessSetup lSetup = setup({"-c", acrScript, TAVIKCTL_PROGRAM});
        lSetup.mProgram = "/bin/sh";
        lSetup.mEnvironment["PATH"] = "/usr/bin:/bin";
        ZTCChildProcess lProcess(lSetup);
        const int lStatus = lProcess.waitForExit();
        return {lStatus, lProcess.standardOutput(), lProcess.standardError()};
    }

    static void expectOneLine(const std::string& acrErrors) {
        EXPECT_THAT(acrErrors, StartsWith("tavikctl: "));
        EXPECT_EQ(std::count(acrErrors.begin(), acrErrors.end(), '\n'), 1) << acrErrors;
    }

    const ZTCTemporaryDirectory mDirectory;
    const ZTCTemporaryDirectory mOther;
    int mRuns = 0;
};

static nlohmann::json sParse(const std::string& acrText) {
    return nlohmann::json::parse(acrText);
}

TEST_F(Tavikctl, EachCommandSendsItsRequestAndEndsWith0) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(scSuccess)});
    const std::pair<std::vector<std::string>, ZTCWireBytes> lCommands[] = {
        {{"start"}, bytesOf("0000000384")},
        {{"start", "--max-record-bytes", "4096"}, bytesOf("0000001000")},
        {{"stop"}, bytesOf("02")},
        {{"targets", scTarget}, bytesOf("03 00000001 50060160bba01234 500601603ba01234 00010203")},
        {{"period", "3600"}, bytesOf("0500000e10")},
        {{"shutdown"}, bytesOf("04")},
    };
    for (const auto& [lArguments, lRequest] : lCommands) {
        const ZTSRun lRun = run(lArguments);
        EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
        EXPECT_EQ(lRun.mOutput, lArguments[0] + ": done\n");
        EXPECT_EQ(lRun.mErrors, "");
        EXPECT_EQ(hexOf(lAgent.getRequests().back()), hexOf(lRequest));
    }
}

TEST_F(Tavikctl, ARefusalEndsWith1AndNamesTheStatus) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(scInvalid)});
    const ZTSRun lRun = run({"period", "0"});
    EXPECT_EQ(lRun.mStatus, 1);
    EXPECT_EQ(lRun.mOutput, "");
    expectOneLine(lRun.mErrors);
    EXPECT_THAT(lRun.mErrors,
                AllOf(HasSubstr("refused period"), HasSubstr("status 6 ZTSAPS_Invalid"), HasSubstr(dir())));

    const ZTSRun lJsonRun = run({"--json", "period", "0"});
    EXPECT_EQ(lJsonRun.mStatus, 1);
    EXPECT_EQ(sParse(lJsonRun.mOutput), sParse(R"({"command":"period","outcome":"failed","lateAnswers":[],
                                                  "status":{"code":6,"name":"ZTSAPS_Invalid"}})"));
}

TEST_F(Tavikctl, WrongUseEndsWith2AndSendsNothing) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(scSuccess)});
    const std::vector<std::string> lLines[] = {
        {},
        {"frobnicate"},
        {"stop", "extra"},
        {"--unknown", "stop"},
        {"period"},
        {"period", "soon"},
        {"period", "4294967296"},
        {"start", "--max-record-bytes", "-1"},
        {"targets"},
        {"targets", "1,2,3"},
        {"targets", mOther.path("missing")},
        {"targets", mOther.path()},
        {"--timeout", "0", "stop"},
        {"--timeout", "x", "stop"},
        {"--dir", mOther.path("missing"), "stop"},
        {"watch", "--interval", "0"},
        {"decode", mOther.path("missing")},
    };
    for (const std::vector<std::string>& lrLine : lLines) {
        SCOPED_TRACE(testing::PrintToString(lrLine));
        const ZTSRun lRun = run(lrLine);
        EXPECT_EQ(lRun.mStatus, 2);
        EXPECT_EQ(lRun.mOutput, "");
        expectOneLine(lRun.mErrors);
    }
    EXPECT_TRUE(lAgent.getRequests().empty());
}

TEST_F(Tavikctl, WithoutADirectoryItNamesTheVariable) {
    ZTSChildProcessSetup lSetup = setup({"stop"});
    lSetup.mEnvironment.clear();
    ZTCChildProcess lProcess(lSetup);
    EXPECT_EQ(lProcess.waitForExit(), 2);
    EXPECT_THAT(lProcess.standardError(), HasSubstr("ZT_QRV_SENSOR_DIR"));
}

TEST_F(Tavikctl, NoAgentEndsWith3) {
    const ZTSRun lRun = run({"--timeout", "0.05", "get"});
    EXPECT_EQ(lRun.mStatus, 3);
    EXPECT_EQ(lRun.mOutput, "");
    expectOneLine(lRun.mErrors);
    EXPECT_THAT(lRun.mErrors, AllOf(HasSubstr("no agent in " + dir()), HasSubstr("0.05 s")));
}

TEST_F(Tavikctl, NoAnswerInTimeEndsWith3) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::silent()});
    const ZTSRun lRun = run({"stop", "--timeout", "0.3"});
    EXPECT_EQ(lRun.mStatus, 3);
    expectOneLine(lRun.mErrors);
}

TEST_F(Tavikctl, AnAnswerThatIsNoneEndsWith3) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering({77, 1})});
    for (const char* lpCommand : {"get", "stop"}) {
        const ZTSRun lRun = run({lpCommand});
        EXPECT_EQ(lRun.mStatus, 3);
        EXPECT_THAT(lRun.mErrors, AllOf(HasSubstr("outcome 77"), HasSubstr("offset 0")));
    }
}

TEST_F(Tavikctl, GetPrintsATableForPeople) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSRun lRun = run({"get"});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    EXPECT_THAT(lRun.mOutput, StartsWith("INITIATOR "));
    for (const ZTSSampleKind& lrKind : makeSampleKinds()) {
        EXPECT_THAT(lRun.mOutput, HasSubstr("  " + lrKind.mName + "  "));
    }
    EXPECT_THAT(lRun.mOutput, HasSubstr("20 records, 20 occurrences from 2 initiators\n"));
}

TEST_F(Tavikctl, GetPrintsJsonForPrograms) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSRun lRun = run({"get", "--json"});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    const nlohmann::json lDocument = sParse(lRun.mOutput);
    EXPECT_EQ(lDocument["command"], "get");
    EXPECT_EQ(lDocument["outcome"], "scope-data");
    EXPECT_EQ(lDocument["totals"]["records"], 20);
    EXPECT_EQ(lDocument["lists"][0]["records"][19]["kind"], "adapter-arrival");
    EXPECT_TRUE(lDocument["problem"].is_null());
}

TEST_F(Tavikctl, GetPrintsWhatStandsInFrontOfAProblem) {
    ZTCBytes lCut = makeFullSampleResponse();
    lCut.resize(lCut.size() - 20);
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(lCut)});
    const ZTSRun lRun = run({"get", "--json"});
    EXPECT_EQ(lRun.mStatus, 3);
    expectOneLine(lRun.mErrors);
    const nlohmann::json lDocument = sParse(lRun.mOutput);
    EXPECT_EQ(lDocument["totals"]["records"], 19);
    EXPECT_THAT(lDocument["problem"].get<std::string>(), HasSubstr("offset"));
}

TEST_F(Tavikctl, GetSaysThatListsAreMissing) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeSampleResponse(2, {makeSampleList("k", {})}))});
    const ZTSRun lRun = run({"get"});
    EXPECT_EQ(lRun.mStatus, 0);
    EXPECT_THAT(lRun.mErrors, HasSubstr("announced 2 lists and sent 1"));
}

TEST_F(Tavikctl, GetSavesTheBytesAndDecodeReadsThem) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const std::string lRaw = mOther.path("answer.bin");
    const ZTSRun lRun = run({"get", "--raw", lRaw});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    const ZTCBytes lBytes = makeFullSampleResponse();
    EXPECT_EQ(readFile(lRaw), std::string(lBytes.begin(), lBytes.end()));
    const ZTSRun lDecoded = run({"decode", lRaw});
    EXPECT_EQ(lDecoded.mStatus, 0) << lDecoded.mErrors;
    EXPECT_EQ(lDecoded.mOutput, lRun.mOutput);
}

TEST_F(Tavikctl, GetAsksNothingWhereTheRawFileCannotBeOpened) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSRun lRun = run({"get", "--raw", mOther.path("missing/file")});
    EXPECT_EQ(lRun.mStatus, 4);
    expectOneLine(lRun.mErrors);
    EXPECT_TRUE(lAgent.getRequests().empty());
}

TEST_F(Tavikctl, GetWithoutAnAgentLeavesTheRawFileAsItWas) {
    writeFile(mOther.path("old"), "precious");
    EXPECT_EQ(run({"get", "--raw", mOther.path("old"), "--timeout", "0.05"}).mStatus, 3);
    EXPECT_EQ(readFile(mOther.path("old")), "precious");
}

TEST_F(Tavikctl, RecordsThatCannotBePrintedAreReported) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSRun lFull = runShell("\"$0\" get >/dev/full");
    EXPECT_EQ(lFull.mStatus, 4);
    EXPECT_THAT(lFull.mErrors, AllOf(HasSubstr("20 records"), HasSubstr("No space left")));
}

TEST_F(Tavikctl, AClosedStandardOutputIsNoticedBeforeAnythingIsAsked) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSRun lRun = runShell("\"$0\" get >&-");
    EXPECT_EQ(lRun.mStatus, 4);
    EXPECT_TRUE(lAgent.getRequests().empty());
}

TEST_F(Tavikctl, TargetsComeFromArgumentsFilesAndStandardInput) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(scSuccess)});
    writeFile(mOther.path("ports"),
              "# two\n1000000000000001 2000000000000001 1\n1000000000000002,2000000000000002,2\n");
    const std::string lHex =
        "03 00000003 50060160bba01234 500601603ba01234 00010203"
        "1000000000000001 2000000000000001 00000001 1000000000000002 2000000000000002 00000002";
    EXPECT_EQ(run({"targets", scTarget, mOther.path("ports")}).mStatus, 0);
    EXPECT_EQ(hexOf(lAgent.getRequests().back()), hexOf(bytesOf(lHex)));
    EXPECT_EQ(runShell("\"$0\" targets " + std::string(scTarget) + " - <" + mOther.path("ports")).mStatus, 0);
    EXPECT_EQ(lAgent.getRequests().size(), 2U);
    EXPECT_EQ(hexOf(lAgent.getRequests().back()), hexOf(bytesOf(lHex)));
}

TEST_F(Tavikctl, ALateAnswersRecordsAreNotLost) {
    const ZTCFakeAgent lAgent(dir(), {[](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
                                  arAgent.sendFrame(makeFullSampleResponse());
                                  arAgent.sendFrame(scSuccess);
                              }});
    const ZTSRun lTable = run({"stop"});
    EXPECT_EQ(lTable.mStatus, 0);
    EXPECT_THAT(lTable.mOutput, HasSubstr("20 records"));
    EXPECT_THAT(lTable.mErrors, HasSubstr("late answer"));
    const ZTSRun lJson = run({"stop", "--json"});
    EXPECT_EQ(lJson.mStatus, 0);
    EXPECT_EQ(sParse(lJson.mOutput)["lateAnswers"][0]["totals"]["records"], 20);
}

TEST_F(Tavikctl, StatusTellsWhetherAnAgentRunsAndAnswers) {
    const ZTSRun lNone = run({"status", "--json"});
    EXPECT_EQ(lNone.mStatus, 3);
    EXPECT_EQ(sParse(lNone.mOutput)["agent"]["state"], "none");

    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(scSuccess)});
    writeFile(dir() + "/qrv-tvk.pid", std::to_string(getpid()) + "\n");
    const ZTCFileDescriptor lPidFile = ZTCFileDescriptor::open((dir() + "/qrv-tvk.pid").c_str(), O_RDWR);
    ASSERT_EQ(flock(lPidFile.get(), LOCK_EX | LOCK_NB), 0);
    const ZTSRun lRunning = run({"status", "--json"});
    EXPECT_EQ(lRunning.mStatus, 0) << lRunning.mErrors;
    const nlohmann::json lDocument = sParse(lRunning.mOutput);
    EXPECT_EQ(lDocument["agent"]["state"], "running");
    EXPECT_EQ(lDocument["agent"]["pid"], getpid());
    EXPECT_EQ(lDocument["agent"]["answers"], true);
    EXPECT_THAT(run({"status"}).mOutput, HasSubstr("running, process " + std::to_string(getpid())));
}

TEST_F(Tavikctl, WatchPlaysTheSensorUntilItsLastRetrieval) {
    std::atomic<bool> lHadPidFile{true};
    const ZTCFakeAgent lAgent(dir(), {[&](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
                                  lHadPidFile = lHadPidFile && exists(dir() + "/qrv-sn.pid");
                                  arAgent.sendFrame(acrRequest[0] == 1 ? makeFullSampleResponse() : scSuccess);
                              }});
    const ZTSRun lRun = run({"watch", "--interval", "0.05", "--count", "3", "--targets", scTarget, "--json"});
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
        const nlohmann::json lDocument = sParse(lLine);
        EXPECT_EQ(lDocument["retrieval"], ++lCount);
        EXPECT_EQ(lDocument["totals"]["records"], 20);
    }
    EXPECT_EQ(lCount, 3);
}

TEST_F(Tavikctl, WatchGoesOnThroughAMissingAgentAndStartsItsSuccessor) {
    ZTCChildProcess lWatch(setup({"watch", "--interval", "0.05", "--timeout", "0.2"}));
    waitUntil([&] { return lWatch.standardError().find("no agent") != std::string::npos; }, "the message");
    EXPECT_EQ(readFile(dir() + "/qrv-sn.pid"), std::to_string(lWatch.getPid()) + "\n");
    const auto lServe = [](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
        arAgent.sendFrame(acrRequest[0] == 1 ? makeSampleResponse(0, {}) : scSuccess);
    };
    for (const char* lpPid : {"1001\n", "1002\n"}) {
        writeFile(dir() + "/qrv-tvk.pid", lpPid);
        const ZTCFakeAgent lAgent(dir(), {lServe});
        waitUntil([&] { return lAgent.getRequests().size() >= 2; }, "a retrieval");
        EXPECT_EQ(lAgent.getRequests()[0], encodeStartScope(900));
        EXPECT_EQ(lAgent.getRequests()[1], encodeGetScopeData());
    }
    lWatch.sendSignal(SIGTERM);
    EXPECT_EQ(lWatch.waitForExit(), 0) << lWatch.standardError();
    EXPECT_FALSE(exists(dir() + "/qrv-sn.pid"));
    EXPECT_THAT(lWatch.standardOutput(), HasSubstr("-- retrieval 2\n"));
}

TEST_F(Tavikctl, ASecondWatchIsRefused) {
    ZTCChildProcess lWatch(setup({"watch"}));
    waitUntil([&] { return readFile(dir() + "/qrv-sn.pid") == std::to_string(lWatch.getPid()) + "\n"; },
              "the pid file");
    const ZTSRun lSecond = run({"watch"});
    EXPECT_EQ(lSecond.mStatus, 2);
    expectOneLine(lSecond.mErrors);
    EXPECT_THAT(lSecond.mErrors, HasSubstr(std::to_string(lWatch.getPid())));
    lWatch.sendSignal(SIGINT);
    EXPECT_EQ(lWatch.waitForExit(), 0);
}

TEST_F(Tavikctl, HelpAndVersionGoToStandardOutput) {
    const ZTSRun lHelp = run({"--help"});
    EXPECT_EQ(lHelp.mStatus, 0);
    EXPECT_THAT(lHelp.mOutput, AllOf(HasSubstr("watch"), HasSubstr("Exit status")));
    EXPECT_THAT(run({"get", "--help"}).mOutput, HasSubstr("tavikctl get"));
    EXPECT_THAT(run({"--version"}).mOutput, StartsWith("tavikctl v"));
}
