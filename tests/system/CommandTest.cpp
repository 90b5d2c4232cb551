#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

using ZTCTexts = std::vector<std::string>;

TEST(Command, ACollectionPeriodOfZeroIsInvalid) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("0500000000"), "010006");
    EXPECT_TRUE(lAgent.log().has("Creating Failed Response...", "-T-"));
    EXPECT_TRUE(lAgent.log().containing("The limit set is").empty());
}

TEST(Command, AnyOtherCollectionPeriodSucceedsAndReportsTheTotalLimit) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("050000001e"), "0000000000");
    EXPECT_EQ(lAgent.request("0500000001"), "0000000000");
    EXPECT_EQ(lAgent.request("05ffffffff"), "0000000000");
    EXPECT_EQ(lAgent.log().count("The limit set is 262144", "-N-"), 3u);
}

TEST(Command, EveryCommandIsLoggedByItsCode) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.request("02");
    EXPECT_EQ(lAgent.log().count("Command to handle: 2", "-T-"), 1u);
    const auto lLines = lAgent.log().containing("Command to handle: 2");
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_EQ(lLines[0].mLabel, ".//TavikProtocolHandler");
    EXPECT_EQ(lLines[0].mFunction, "process");
}

TEST(Command, AStopSucceedsAndLeavesTheRegistrationsInPlace) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("02"), "0000000000");
    lAgent.startScope();
    const auto lCalls = lAgent.library().calls();
    EXPECT_EQ(lAgent.request("02"), "0000000000");
    EXPECT_EQ(lAgent.request("02"), "0000000000");
    EXPECT_EQ(lAgent.log().count("Stopping Scope Data Collection.", "-N-"), 3u);
    EXPECT_EQ(lAgent.library().calls(), lCalls);
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Command, AShutDownIsAnsweredAndTheLibraryClosedBeforeTheAgentEnds) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.waitForIdleHeartbeatThread();
    EXPECT_EQ(lAgent.request("04"), "0000000000");
    EXPECT_EQ(lAgent.library().callsOf("Close").size(), 1u);
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_TRUE(lAgent.pipes().isAtEnd());
    EXPECT_EQ(lAgent.log().count("Exiting TavikCommandHandler thread with error : Shutting down Tavik", "-H-"), 1u);
    EXPECT_EQ(lAgent.log().count("Exiting Heartbeat Handler Thread as it is marked for exit.", "-H-"), 1u);
    EXPECT_EQ(lAgent.log().count("Tavik System exiting", "-H-"), 1u);
    const auto lCalls = lAgent.library().calls();
    ASSERT_GE(lCalls.size(), 2u);
    EXPECT_EQ(lCalls[lCalls.size() - 2], "Close");
    EXPECT_EQ(lCalls.back(), "Unloaded");
    EXPECT_TRUE(lAgent.library().callsOf("ZtapiUnregEvent").empty());
}

TEST(Command, AShutDownNeedsNoStart) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("04"), "0000000000");
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_FALSE(exists(lAgent.pidFilePath()));
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));
    EXPECT_FALSE(exists(lAgent.responseFifoPath()));
}

TEST(Command, ACommandBehindAShutDownIsNotAnswered) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().sendRaw(ZTCByteWriter().raw(ZTCSensorPipes::frame({4})).raw(ZTCSensorPipes::frame({2})).bytes());
    EXPECT_EQ(hexOf(lAgent.pipes().readResponse()), gcSuccessHex);
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_TRUE(lAgent.pipes().isAtEnd());
    EXPECT_FALSE(lAgent.log().has("Stopping Scope Data Collection."));
}

TEST(Command, AnUnknownCodeEndsTheProcessWithStatusOneAndNoResponse) {
    for (const char* lpRequest : {"06", "ff", "0600000000"}) {
        SCOPED_TRACE(lpRequest);
        ZTCAgentProcess lAgent;
        lAgent.startAndConnect();
        lAgent.pipes().sendRequest(bytesOf(lpRequest));
        EXPECT_EQ(lAgent.waitForExit(), 1);
        EXPECT_TRUE(lAgent.pipes().isAtEnd());
        const auto lLines = lAgent.log().containing("Assertion [ false ] failed");
        ASSERT_EQ(lLines.size(), 1u);
        EXPECT_EQ(lLines[0].mMark, "-H-");
        EXPECT_EQ(lLines[0].mLabel, ".//TavikProtocolHandler");
        EXPECT_FALSE(lAgent.log().has("Tavik System exiting"));
    }
}

TEST(Command, AnAssertionEndsTheProcessQuietlyInAStormOfEvents) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().startStorm(4, 0, {ZTSLibraryEvent::bare(0, 2, 1), ZTSLibraryEvent::bare(0, 8, 1)});
    lAgent.pipes().sendRequest(bytesOf("06"));
    EXPECT_EQ(lAgent.waitForExit(), 1);
}

TEST(Command, TargetsOfZeroAreInvalid) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("0300000000"), "010006");
    EXPECT_TRUE(lAgent.log().containing("Registered Target").empty());
}

static std::string sRegistered(const ZTSTarget& acrTarget) {
    return "Registered Target <" + wwnText(acrTarget.mNodeName) + ", " + wwnText(acrTarget.mPortName) + ", " +
           std::to_string(acrTarget.mFcId) + ">";
}

static std::string sAdded(const ZTSTarget& acrTarget) {
    return "Added Target <" + wwnText(acrTarget.mNodeName) + ", " + wwnText(acrTarget.mPortName) + ", " +
           std::to_string(acrTarget.mFcId) + "> to Wwpn Target Map";
}

TEST(Command, ATargetIsAddedByItsFcIdAndByItsPortName) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTSTarget lTarget{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0xFF0203};
    lAgent.registerTargets({lTarget});
    EXPECT_EQ(lAgent.log().count(sRegistered(lTarget), "-N-"), 1u);
    EXPECT_EQ(lAgent.log().count(sAdded(lTarget), "-N-"), 1u);
}

TEST(Command, ATargetRegisteredAgainChangesNothingAndLogsNothing) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTSTarget lTarget{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0x010203};
    lAgent.registerTargets({lTarget, lTarget});
    lAgent.registerTargets({lTarget});
    EXPECT_EQ(lAgent.log().count(sRegistered(lTarget)), 1u);
    EXPECT_EQ(lAgent.log().count(sAdded(lTarget)), 1u);
}

TEST(Command, OfTwoTargetsWithOneFcIdTheFirstKeepsItAndBothKeepTheirPortNames) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTSTarget lFirst{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0x010203};
    const ZTSTarget lSecond{makeWwn(gcOtherNode), makeWwn(gcOtherPort), 0x010203};
    lAgent.registerTargets({lFirst, lSecond});
    EXPECT_EQ(lAgent.log().count(sRegistered(lFirst)), 1u);
    EXPECT_EQ(lAgent.log().count(sRegistered(lSecond)), 0u);
    EXPECT_EQ(lAgent.log().count(sAdded(lFirst)), 1u);
    EXPECT_EQ(lAgent.log().count(sAdded(lSecond)), 1u);

    lAgent.startScope();
    lAgent.library().deliverAll({ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203})),
                                 ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort)),
                                 ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcOtherPort))});
    const auto lRecords = lAgent.retrieve().mLists.at(0).mRecords;
    ASSERT_EQ(lRecords.size(), 3u);
    EXPECT_EQ(lRecords[0].mPortName, lFirst.mPortName);
    EXPECT_EQ(lRecords[0].mNodeName, lFirst.mNodeName);
    EXPECT_EQ(lRecords[1].mNodeName, lFirst.mNodeName);
    EXPECT_EQ(lRecords[2].mPortName, lSecond.mPortName);
    EXPECT_EQ(lRecords[2].mNodeName, lSecond.mNodeName);
}

TEST(Command, OfTwoTargetsWithOnePortNameTheFirstGivesItsNames) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTSTarget lFirst{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0x010203};
    const ZTSTarget lSecond{makeWwn(gcOtherNode), makeWwn(gcRemotePort), 0x010204};
    lAgent.registerTargets({lFirst});
    lAgent.registerTargets({lSecond});
    EXPECT_EQ(lAgent.log().count(sRegistered(lSecond)), 1u);
    EXPECT_EQ(lAgent.log().count(sAdded(lSecond)), 0u);
    lAgent.startScope();
    lAgent.library().deliverAll({ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort)),
                                 ZTSLibraryEvent::rscn(0, rscnPayload({0x00010204}))});
    const auto lRecords = lAgent.retrieve().mLists.at(0).mRecords;
    ASSERT_EQ(lRecords.size(), 2u);
    EXPECT_EQ(lRecords[0].mNodeName, lFirst.mNodeName);
    EXPECT_EQ(lRecords[1].mNodeName, lSecond.mNodeName);
}

TEST(Command, ThousandsOfTargetsFitIntoOneCommand) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    std::vector<ZTSTarget> lTargets;
    for (unsigned i = 0; i < 5000; ++i) {
        lTargets.push_back({makeWwn(0x2000000000000000 + i), makeWwn(0x1000000000000000 + i), i + 1});
    }
    lAgent.registerTargets(lTargets);
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload({5000})));
    EXPECT_EQ(lAgent.retrieve().mLists.at(0).mRecords.at(0).mPortName, makeWwn(0x1000000000000000 + 4999));
}
