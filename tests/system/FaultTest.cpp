#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "tests/faults/FaultInjection.h"
#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

using ZTCTexts = std::vector<std::string>;

static ZTSLibraryEvent sQueueFull(std::uint64_t aPort, unsigned aLun) {
    return ZTSLibraryEvent::scope(0, 4, 0x01, scsiData(aPort, aLun));
}

/// Runs the agent with a failure from its start on, until it has ended.
static int sStatusOfStartWith(ZTCAgentProcess& arAgent, ZTCFaultInjection& arFaults, const ZTSFaultPlan& acrPlan) {
    arFaults.arm(acrPlan);
    arAgent.start();
    const int lStatus = arAgent.waitForExit();
    arFaults.disarm();
    EXPECT_TRUE(arFaults.hasFired()) << acrPlan.mCall;
    return lStatus;
}

static void sExpectToServe(ZTCAgentProcess& arAgent) {
    arAgent.startAndConnectQuietly();
    EXPECT_EQ(arAgent.stop(), 0);
    EXPECT_FALSE(exists(arAgent.commandFifoPath()));
    EXPECT_FALSE(exists(arAgent.responseFifoPath()));
    EXPECT_FALSE(exists(arAgent.pidFilePath()));
}

TEST(Fault, AStartThatCannotMakeTheCommandFifoEndsInOrderAndTheNextOneServes) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    EXPECT_EQ(sStatusOfStartWith(lAgent, lFaults, {"mkfifo", 1, ENOSPC}), 0);
    EXPECT_EQ(lAgent.log().containing("No space left on device, exiting abruptly").size(), 1u);
    sExpectToServe(lAgent);
}

TEST(Fault, AStartWhoseSecondThreadCannotBeMadeStopsTheFirst) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lFaults.arm({"pthread_create", 3, EAGAIN});
    lAgent.start();
    lAgent.pipes().openResponse();
    EXPECT_EQ(lAgent.waitForExit(), 0);
    lFaults.disarm();
    EXPECT_TRUE(lFaults.hasFired());
    EXPECT_EQ(lAgent.log().containing("Starting the threads failed").size(), 1u);
    const std::vector<ZTSLogLine> lLeft = lAgent.log().containing("Left");
    EXPECT_EQ(std::count_if(lLeft.begin(), lLeft.end(),
                            [](const ZTSLogLine& lcrLine) { return lcrLine.mFunction == "TavikHeartbeatThread"; }),
              1);
    lAgent.pipes().close();
    sExpectToServe(lAgent);
}

TEST(Fault, WhateverIsInterruptedInAStartIsDoneAgainAndTheAgentServes) {
    for (const char* lpCall : {"open", "flock", "ftruncate", "pwrite", "write", "poll"}) {
        for (unsigned lNth = 1; lNth <= 4; ++lNth) {
            SCOPED_TRACE(lpCall + std::string(" number ") + std::to_string(lNth));
            ZTCAgentProcess lAgent;
            ZTCFaultInjection lFaults(lAgent);
            lFaults.arm({lpCall, lNth, EINTR});
            lAgent.startAndConnectQuietly();
            EXPECT_TRUE(lFaults.hasFired() || lNth > 1);
            lFaults.disarm();
            EXPECT_EQ(lAgent.stop(), 0);
        }
    }
}

TEST(Fault, AStartThatCannotTakeSignalsSaysWhyAndEndsInOrder) {
    const struct {
        ZTSFaultPlan mPlan;
        const char* mpText;
    } lcRows[] = {
        {{"signalfd", 1, EMFILE}, "qrv-tvk ends: signalfd failed: Too many open files"},
        {{"pthread_create", 1, EAGAIN}, "qrv-tvk ends: pthread_create failed: Resource temporarily unavailable"},
    };
    for (const auto& lcrRow : lcRows) {
        ZTCAgentProcess lAgent;
        ZTCFaultInjection lFaults(lAgent);
        EXPECT_EQ(sStatusOfStartWith(lAgent, lFaults, lcrRow.mPlan), 0);
        EXPECT_TRUE(lAgent.log().has(lcrRow.mpText, "-E-")) << lcrRow.mpText;
        sExpectToServe(lAgent);
    }
}

TEST(Fault, ADaemonThatCannotBeMadeSaysWhyAndLeavesNothing) {
    for (const char* lpCall : {"fork", "setsid"}) {
        ZTCChildProcess::becomeReaper();
        ZTCAgentProcess lAgent;
        ZTCFaultInjection lFaults(lAgent);
        lFaults.arm({lpCall, 1, EAGAIN});
        EXPECT_EQ(lAgent.run({"-D", "true", "-l", lAgent.agentLogPath()}).mStatus, 0);
        const std::string lcEnd = " failed: Resource temporarily unavailable";
        lAgent.log().waitForLine([&](const ZTSLogLine& acrLine) { return acrLine.mText.ends_with(lcEnd); }, lpCall);
        lFaults.disarm();
        waitUntil([&] { return !exists(lAgent.pidFilePath()); }, "the pid file to be removed");
        sExpectToServe(lAgent);
    }
}

TEST(Fault, ACommandFifoThatEndsAndAResponseFifoThatTakesNothingEndTheAgentInOrder) {
    const std::pair<const char*, const char*> lcRows[] = {{"read", "unexpected end of file"},
                                                          {"writev", "it takes nothing"}};
    for (const auto& [lpCall, lpText] : lcRows) {
        ZTCAgentProcess lAgent;
        ZTCFaultInjection lFaults(lAgent);
        lAgent.startAndConnect();
        lFaults.arm({lpCall, 1, 0, 0, true});
        lAgent.pipes().sendRequest(bytesOf("0500000001"));
        EXPECT_EQ(lAgent.waitForExit(), 0);
        lFaults.disarm();
        EXPECT_TRUE(lFaults.hasFired());
        EXPECT_GE(lAgent.log().containing(lpText).size(), 1u) << lpText;
        lAgent.pipes().close();
        sExpectToServe(lAgent);
    }
}

TEST(Fault, AnAnswerThatIsInterruptedIsWhole) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lAgent.startAndConnectQuietly();
    for (const int lErrno : {EINTR, EAGAIN}) {
        lFaults.arm({"writev", 1, lErrno});
        EXPECT_EQ(lAgent.request(periodHex(1)), gcSuccessHex);
        EXPECT_TRUE(lFaults.hasFired());
    }
    lFaults.disarm();
}

TEST(Fault, ACommandThatArrivesByteByByteAndIsInterruptedIsAnswered) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lAgent.startAndConnectQuietly();
    lFaults.arm({"read", 1, 0, 1, true});
    EXPECT_EQ(lAgent.request(periodHex(1)), gcSuccessHex);
    EXPECT_TRUE(lFaults.hasFired());
    for (const char* lpCall : {"read", "poll"}) {
        for (unsigned lNth = 1; lNth <= 2; ++lNth) {
            lFaults.arm({lpCall, lNth, EINTR});
            // The agent may be in the call already when it is told: the second one may belong to the next request.
            for (int i = 0; i < 3 && !lFaults.hasFired(); ++i) {
                EXPECT_EQ(lAgent.request(periodHex(1)), gcSuccessHex);
            }
            EXPECT_TRUE(lFaults.hasFired()) << lpCall;
        }
    }
    lFaults.disarm();
}

TEST(Fault, AResponseThatLeavesByteByByteIsWholeAndHasEveryRecordOnce) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().deliverAll({sQueueFull(gcRemotePort, 3), sQueueFull(gcOtherPort, 4)});
    lFaults.arm({"writev", 1, 0, 1, true});
    const ZTCTexts lTexts = lAgent.retrieve().texts();
    lFaults.disarm();
    EXPECT_TRUE(lFaults.hasFired());
    EXPECT_EQ(lTexts,
              (ZTCTexts{"4/1 x1 " + qFullRecord(gcRemotePort, {3}), "4/1 x1 " + qFullRecord(gcOtherPort, {4})}));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Fault, ACommandWhoseAnswerCannotBeWrittenEndsTheAgentInOrder) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lAgent.startAndConnect();
    lFaults.arm({"writev", 1, EIO});
    EXPECT_THROW(lAgent.request(periodHex(1)), std::runtime_error);
    EXPECT_EQ(lAgent.waitForExit(), 0);
    lFaults.disarm();
    EXPECT_TRUE(lFaults.hasFired());
    EXPECT_EQ(lAgent.log().containing("Exiting TavikCommandHandler thread with error").size(), 1u);
    lAgent.pipes().close();
    sExpectToServe(lAgent);
}

TEST(Fault, ALogThatCannotBeWrittenKeepsNothingFromHappeningAndTellsOfItsLoss) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lAgent.startAndConnect();
    lAgent.startScope();
    lFaults.arm({"write", 1, ENOSPC, 0, true});
    lAgent.library().deliver(sQueueFull(gcRemotePort, 3));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"4/1 x1 " + qFullRecord(gcRemotePort, {3})});
    lFaults.disarm();
    EXPECT_TRUE(lFaults.hasFired());
    EXPECT_EQ(lAgent.request(periodHex(1)), gcSuccessHex);
    EXPECT_EQ(lAgent.log().containing("could not be written").size(), 1u);
}

TEST(Fault, ASensorsFileThatCannotBeLookedAtCountsAsALookWithoutProgress) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lAgent.startAndConnect({"-b", "1"});
    lFaults.arm({"stat", 1, EACCES, 0, true});
    EXPECT_EQ(lAgent.waitForExit(), 0);
    lFaults.disarm();
    EXPECT_EQ(lAgent.log().containing("Failed in stat on").size(), 2u);
    EXPECT_TRUE(lAgent.log().has("Failed in getting the status of Sensor", "-H-"));
}

TEST(Fault, TheOwnPidFileThatCannotBeTouchedEndsTheAgentInOrder) {
    ZTCAgentProcess lAgent;
    ZTCFaultInjection lFaults(lAgent);
    lAgent.startAndConnect({"-b", "1"});
    lFaults.arm({"utimensat", 1, EACCES});
    EXPECT_EQ(lAgent.waitForExit(), 0);
    lFaults.disarm();
    EXPECT_TRUE(lAgent.log().has("Failed in updating the status", "-H-"));
    lAgent.pipes().close();
    sExpectToServe(lAgent);
}
