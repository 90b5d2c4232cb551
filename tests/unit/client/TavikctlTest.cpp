#include <fcntl.h>
#include <unistd.h>

#include "tests/unit/client/TavikctlFixture.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

using Tavikctl = ZTCTavikctlFixture;

TEST_F(Tavikctl, EachCommandSendsItsRequestAndEndsWith0) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(gcSuccess)});
    const std::pair<std::vector<std::string>, ZTCWireBytes> lCommands[] = {
        {{"start"}, bytesOf("0000000384")},
        {{"start", "--max-record-bytes", "4096"}, bytesOf("0000001000")},
        {{"stop"}, bytesOf("02")},
        {{"targets", gcTarget}, bytesOf("03 00000001 50060160bba01234 500601603ba01234 00010203")},
        {{"period", "3600"}, bytesOf("0500000e10")},
        {{"shutdown"}, bytesOf("04")},
    };
    for (const auto& [lArguments, lRequest] : lCommands) {
        const ZTSFinishedRun lRun = run(lArguments);
        EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
        EXPECT_EQ(lRun.mOutput, lArguments[0] + ": done\n");
        EXPECT_EQ(lRun.mErrors, "");
        EXPECT_EQ(hexOf(lAgent.getRequests().back()), hexOf(lRequest));
    }
}

TEST_F(Tavikctl, AGetThatNobodyReadsKeepsNobodyElseFromTheAgent) {
    const ZTCFakeAgent lAgent(dir(), {servingMoreThanAPipeTakes()});
    ZTCChildProcess lGet(setupUnread("get"));  // stops while it prints
    waitUntil([&] { return !lAgent.getRequests().empty(); }, "the request for records");
    const ZTSFinishedRun lOther = run({"--timeout", "20", "period", "3600"});
    EXPECT_EQ(lOther.mStatus, 0) << lOther.mErrors;
    EXPECT_FALSE(lGet.hasEnded());
}

TEST_F(Tavikctl, ARefusalEndsWith1AndNamesTheStatus) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(gcInvalid)});
    const ZTSFinishedRun lRun = run({"period", "0"});
    EXPECT_EQ(lRun.mStatus, 1);
    EXPECT_EQ(lRun.mOutput, "");
    expectOneLine(lRun.mErrors);
    EXPECT_THAT(lRun.mErrors,
                AllOf(HasSubstr("refused period"), HasSubstr("status 6 ZTSAPS_Invalid"), HasSubstr(dir())));

    const ZTSFinishedRun lJsonRun = run({"--json", "period", "0"});
    EXPECT_EQ(lJsonRun.mStatus, 1);
    EXPECT_EQ(parseJson(lJsonRun.mOutput), parseJson(R"({"command":"period","outcome":"failed","lateAnswers":[],
                                                  "status":{"code":6,"name":"ZTSAPS_Invalid"}})"));
}

TEST_F(Tavikctl, WrongUseEndsWith2AndSendsNothing) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(gcSuccess)});
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
        const ZTSFinishedRun lRun = run(lrLine);
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

TEST_F(Tavikctl, WhereNobodyHoldsThePidFileItAnswersAtOnceAndSaysWhatToDo) {
    const std::vector<std::string> lCommands[] = {{"start"}, {"get"}, {"targets", gcTarget}, {"shutdown"}};
    for (const std::vector<std::string>& lrCommand : lCommands) {
        std::vector<std::string> lArguments = lrCommand;
        lArguments.insert(lArguments.end(), {"--timeout", "3600"});
        const ZTSFinishedRun lRun = run(lArguments);  // waiting out the time limit would fail the test
        EXPECT_EQ(lRun.mStatus, 3);
        EXPECT_EQ(lRun.mOutput, "");
        expectOneLine(lRun.mErrors);
        EXPECT_THAT(lRun.mErrors, AllOf(HasSubstr("no agent in " + dir()), HasSubstr(dir() + "/qrv-tvk.pid"),
                                        HasSubstr("qrv-tvk"), HasSubstr("--wait")));
    }
}

TEST_F(Tavikctl, ToldToWaitItWaitsForAnAgentUntilTheTimeLimit) {
    const ZTSFinishedRun lRun = run({"--timeout", "0.05", "get", "--wait"});
    EXPECT_EQ(lRun.mStatus, 3);
    EXPECT_EQ(lRun.mOutput, "");
    expectOneLine(lRun.mErrors);
    EXPECT_THAT(lRun.mErrors, AllOf(HasSubstr("no agent in " + dir()), HasSubstr("0.05 s")));

    ZTCChildProcess lWaiting(setup({"get", "--wait"}));
    waitUntil([&] { return exists(dir() + "/qrv-sn.lock") || !lWaiting.hasEnded(); }, "the tool to run");
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    EXPECT_EQ(lWaiting.waitForExit(), 0) << lWaiting.standardError();
    EXPECT_THAT(lWaiting.standardOutput(), HasSubstr("20 records"));
}

TEST_F(Tavikctl, NoAnswerInTimeEndsWith3) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::silent()});
    const ZTSFinishedRun lRun = run({"stop", "--timeout", "0.3"});
    EXPECT_EQ(lRun.mStatus, 3);
    expectOneLine(lRun.mErrors);
}

TEST_F(Tavikctl, AnAnswerThatIsNoneEndsWith3) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering({77, 1})});
    for (const char* lpCommand : {"get", "stop"}) {
        const ZTSFinishedRun lRun = run({lpCommand});
        EXPECT_EQ(lRun.mStatus, 3);
        EXPECT_THAT(lRun.mErrors, AllOf(HasSubstr("outcome 77"), HasSubstr("offset 0")));
    }
}

TEST_F(Tavikctl, GetPrintsATableForPeople) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSFinishedRun lRun = run({"get"});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    EXPECT_THAT(lRun.mOutput, StartsWith("INITIATOR "));
    for (const ZTSSampleKind& lrKind : makeSampleKinds()) {
        EXPECT_THAT(lRun.mOutput, HasSubstr(std::string("  ") + lrKind.mpName + "  "));
    }
    EXPECT_THAT(lRun.mOutput, HasSubstr("20 records, 20 occurrences from 2 initiators\n"));
}

TEST_F(Tavikctl, GetPrintsJsonForPrograms) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSFinishedRun lRun = run({"get", "--json"});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    const nlohmann::json lDocument = parseJson(lRun.mOutput);
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
    const ZTSFinishedRun lRun = run({"get", "--json"});
    EXPECT_EQ(lRun.mStatus, 3);
    expectOneLine(lRun.mErrors);
    const nlohmann::json lDocument = parseJson(lRun.mOutput);
    EXPECT_EQ(lDocument["totals"]["records"], 19);
    EXPECT_THAT(lDocument["problem"].get<std::string>(), HasSubstr("offset"));
}

TEST_F(Tavikctl, GetSaysThatListsAreMissing) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeSampleResponse(2, {makeSampleList("k", {})}))});
    const ZTSFinishedRun lRun = run({"get"});
    EXPECT_EQ(lRun.mStatus, 0);
    EXPECT_THAT(lRun.mErrors, HasSubstr("announced 2 lists and sent 1"));
}

TEST_F(Tavikctl, GetSavesTheBytesAndDecodeReadsThem) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const std::string lRaw = mOther.path("answer.bin");
    writeFile(lRaw, std::string(100000, 'x'));  // an older answer, and a longer one
    const ZTSFinishedRun lRun = run({"get", "--raw", lRaw});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    const ZTCBytes lBytes = makeFullSampleResponse();
    EXPECT_EQ(readFile(lRaw), std::string(lBytes.begin(), lBytes.end()));
    const ZTSFinishedRun lDecoded = run({"decode", lRaw});
    EXPECT_EQ(lDecoded.mStatus, 0) << lDecoded.mErrors;
    EXPECT_EQ(lDecoded.mOutput, lRun.mOutput);
}

TEST_F(Tavikctl, RecordsThatCannotBePrintedAreSavedAllTheSame) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const std::string lRaw = mOther.path("answer.bin");
    EXPECT_EQ(runShell("\"$0\" get --raw " + lRaw + " >/dev/full").mStatus, 4);
    const ZTCBytes lBytes = makeFullSampleResponse();
    EXPECT_EQ(readFile(lRaw), std::string(lBytes.begin(), lBytes.end()));
}

TEST_F(Tavikctl, MessagesNeverGoIntoAFileThatWasOpenedInPlaceOfAClosedStream) {
    const ZTCBytes lBytes = makeSampleResponse(2, {makeSampleList("k", {})});  // one list is missing: worth a message
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(lBytes)});
    const std::string lRaw = mOther.path("answer.bin");
    for (const char* lpClosed : {"<&-", "2>&-", "<&- 2>&-"}) {
        SCOPED_TRACE(lpClosed);
        EXPECT_EQ(runShell("\"$0\" get --raw " + lRaw + " " + lpClosed).mStatus, 0);
        EXPECT_EQ(readFile(lRaw), std::string(lBytes.begin(), lBytes.end()));
    }
}

TEST_F(Tavikctl, GetAsksNothingWhereTheRawFileCannotBeOpened) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSFinishedRun lRun = run({"get", "--raw", mOther.path("missing/file")});
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
    const ZTSFinishedRun lFull = runShell("\"$0\" get >/dev/full");
    EXPECT_EQ(lFull.mStatus, 4);
    EXPECT_THAT(lFull.mErrors, AllOf(HasSubstr("20 records"), HasSubstr("No space left")));
}

TEST_F(Tavikctl, AClosedStandardOutputIsNoticedBeforeAnythingIsAsked) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(makeFullSampleResponse())});
    const ZTSFinishedRun lRun = runShell("\"$0\" get >&-");
    EXPECT_EQ(lRun.mStatus, 4);
    EXPECT_TRUE(lAgent.getRequests().empty());
}

TEST_F(Tavikctl, TargetsComeFromArgumentsFilesAndStandardInput) {
    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(gcSuccess)});
    writeFile(mOther.path("ports"),
              "# two\n1000000000000001 2000000000000001 1\n1000000000000002,2000000000000002,2\n");
    const std::string lHex =
        "03 00000003 50060160bba01234 500601603ba01234 00010203"
        "1000000000000001 2000000000000001 00000001 1000000000000002 2000000000000002 00000002";
    EXPECT_EQ(run({"targets", gcTarget, mOther.path("ports")}).mStatus, 0);
    EXPECT_EQ(hexOf(lAgent.getRequests().back()), hexOf(bytesOf(lHex)));
    EXPECT_EQ(runShell("\"$0\" targets " + std::string(gcTarget) + " - <" + mOther.path("ports")).mStatus, 0);
    EXPECT_EQ(lAgent.getRequests().size(), 2U);
    EXPECT_EQ(hexOf(lAgent.getRequests().back()), hexOf(bytesOf(lHex)));
}

TEST_F(Tavikctl, ALateAnswersRecordsAreNotLost) {
    const ZTCFakeAgent lAgent(dir(), {[](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
                                  arAgent.sendFrame(makeFullSampleResponse());
                                  arAgent.sendFrame(gcSuccess);
                              }});
    const ZTSFinishedRun lTable = run({"stop"});
    EXPECT_EQ(lTable.mStatus, 0);
    EXPECT_THAT(lTable.mOutput, HasSubstr("20 records"));
    EXPECT_THAT(lTable.mErrors, HasSubstr("late answer"));
    const ZTSFinishedRun lJson = run({"stop", "--json"});
    EXPECT_EQ(lJson.mStatus, 0);
    EXPECT_EQ(parseJson(lJson.mOutput)["lateAnswers"][0]["totals"]["records"], 20);
}

TEST_F(Tavikctl, StatusTellsWhetherAnAgentRunsAndAnswers) {
    const ZTSFinishedRun lNone = run({"status", "--json"});
    EXPECT_EQ(lNone.mStatus, 3);
    EXPECT_EQ(parseJson(lNone.mOutput)["agent"]["state"], "none");

    const ZTCFakeAgent lAgent(dir(), {ZTCFakeAgent::answering(gcSuccess)});
    const ZTSFinishedRun lRunning = run({"status", "--json"});
    EXPECT_EQ(lRunning.mStatus, 0) << lRunning.mErrors;
    const nlohmann::json lDocument = parseJson(lRunning.mOutput);
    EXPECT_EQ(lDocument["agent"]["state"], "running");
    EXPECT_EQ(lDocument["agent"]["pid"], getpid());
    EXPECT_EQ(lDocument["agent"]["answers"], true);
    EXPECT_THAT(run({"status"}).mOutput, HasSubstr("running, process " + std::to_string(getpid())));
}

TEST_F(Tavikctl, HelpAndVersionGoToStandardOutput) {
    const ZTSFinishedRun lHelp = run({"--help"});
    EXPECT_EQ(lHelp.mStatus, 0);
    EXPECT_THAT(lHelp.mOutput, AllOf(HasSubstr("watch"), HasSubstr("Exit status")));
    EXPECT_THAT(run({"get", "--help"}).mOutput, HasSubstr("tavikctl get"));
    EXPECT_THAT(run({"--version"}).mOutput, StartsWith("tavikctl v"));
}
