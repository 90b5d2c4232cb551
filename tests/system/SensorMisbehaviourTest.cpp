#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/support/Seed.h"

// Whatever a sensor does, the agent stays, or ends in order where its answer cannot be delivered; and the next sensor,
// or the next start, is served.

static const char* const scIdle = "Waiting for control availability...";

/// Waits until what came so far is served, refused or given up as a part of a message.
static void sWaitUntilSettled(const ZTCAgentProcess& acrAgent, ZTCSensorPipes& arPipes) {
    waitUntil(
        [&arPipes] {
            arPipes.discardResponses();
            return arPipes.hasNothingToTake();
        },
        "the agent to empty its command FIFO");
    const std::size_t lWaits = acrAgent.log().count(scIdle);
    acrAgent.log().waitFor(scIdle, lWaits + 1);
}

static void sExpectServed(ZTCAgentProcess& arAgent) {
    EXPECT_TRUE(arAgent.ping());
    EXPECT_EQ(arAgent.request(gcStopScopeHex), gcSuccessHex);
}

/// Another sensor, after the first has gone: it throws away what it finds.
static void sExpectNextSensorServed(ZTCAgentProcess& arAgent) {
    arAgent.pipes().close();
    arAgent.pipes().open();
    arAgent.pipes().discardResponses();
    sExpectServed(arAgent);
}

static void sExpectNextStartServed(ZTCAgentProcess& arAgent) {
    EXPECT_FALSE(exists(arAgent.pidFilePath()));
    EXPECT_FALSE(exists(arAgent.commandFifoPath()));
    EXPECT_FALSE(exists(arAgent.responseFifoPath()));
    arAgent.pipes().close();
    arAgent.startAndConnectQuietly();
    sExpectServed(arAgent);
}

/// The agent waits for room in the response FIFO, most of its response still to be written.
static void sHangInALargeResponse(ZTCAgentProcess& arAgent) {
    arAgent.startScope();
    arAgent.library().startStorm(1, 1500, {ZTSLibraryEvent::bare(0, 2, 1), ZTSLibraryEvent::bare(0, 8, 1)});
    EXPECT_EQ(arAgent.library().waitForStorm(), 3000u);
    arAgent.pipes().sendRequest({1});
    waitUntil([&arAgent] { return arAgent.pipes().waitingResponseBytes() >= 60000; }, "a full response FIFO");
}

TEST(SensorMisbehaviour, OneThatNeverReadsHoldsNobodyElseUpAndFindsEveryAnswerWhenItReadsAtLast) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    // Nine bytes an answer: the FIFO is full long before the last.
    constexpr std::size_t lcRequests = 9000;
    ZTCByteWriter lFrames;
    for (std::size_t i = 0; i < lcRequests; ++i) {
        lFrames.raw(ZTCSensorPipes::frame(ZTCAgentProcess::startScopeRequest(4096)));
    }
    lFrames.raw(ZTCSensorPipes::frame({1}));
    std::size_t lSent = 0;
    waitUntil(
        [&] {
            lSent += lAgent.pipes().sendSome(lFrames.bytes(), lSent);
            return lAgent.pipes().waitingResponseBytes() >= 65520;
        },
        "a full response FIFO");
    lAgent.library().deliverAll(std::vector<ZTSLibraryEvent>(100, ZTSLibraryEvent::bare(0, 2, 1)));

    for (std::size_t i = 0; i < lcRequests; ++i) {
        lSent += lAgent.pipes().sendSome(lFrames.bytes(), lSent);
        ASSERT_EQ(hexOf(lAgent.pipes().readResponse()), gcSuccessHex) << i;
    }
    waitUntil(
        [&] {
            lSent += lAgent.pipes().sendSome(lFrames.bytes(), lSent);
            return lSent == lFrames.bytes().size();
        },
        "the last request to be taken");
    EXPECT_EQ(ZTSScopeDataResponse::decode(lAgent.pipes().readResponse()).occurrences(2, 1), 100u);
}

TEST(SensorMisbehaviour, OneThatReadsByteByByteGetsAllOfALargeResponseWhileEventsGoOn) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    sHangInALargeResponse(lAgent);
    ZTCBytes lBytes;
    std::size_t lWanted = 4;
    std::uint64_t lDelivered = 0;
    while (lBytes.size() < lWanted) {
        lBytes.push_back(lAgent.pipes().readByte());
        if (lBytes.size() == 4) {
            lWanted += ZTCByteReader(lBytes).u32();
        }
        if (lBytes.size() % 1000 == 0) {
            lAgent.library().deliver(ZTSLibraryEvent::bare(0, 4, 0x20));
            ++lDelivered;
        }
    }
    const ZTSScopeDataResponse lResponse = ZTSScopeDataResponse::decode(ZTCBytes(lBytes.begin() + 4, lBytes.end()));
    EXPECT_EQ(lResponse.occurrences(2, 1), 1500u);
    EXPECT_EQ(lResponse.occurrences(8, 1), 1500u);
    EXPECT_GT(lDelivered, 50u);
    EXPECT_EQ(lAgent.retrieve().occurrences(4, 0x20), lDelivered);
}

TEST(SensorMisbehaviour, GarbageThatIsNoMessageIsThrownAwayForAsLongAsItComes) {
    ZTCTestSeed lSeed;
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    // However it is cut, no four of these bytes are a length that is allowed.
    std::uniform_int_distribution<unsigned> lByte(0x11, 0xFF);
    const ZTCDeadline lEnd(std::chrono::seconds(2));
    while (!lEnd.isOver()) {
        ZTCBytes lGarbage(lSeed.below(20000) + 1);
        std::generate(lGarbage.begin(), lGarbage.end(),
                      [&] { return static_cast<unsigned char>(lByte(lSeed.engine())); });
        lAgent.pipes().sendRaw(lGarbage);
    }
    sWaitUntilSettled(lAgent, lAgent.pipes());
    EXPECT_EQ(lAgent.pipes().waitingResponseBytes(), 0u);
    sExpectServed(lAgent);
    sExpectNextSensorServed(lAgent);
}

TEST(SensorMisbehaviour, GarbageThatMayBeMessagesIsServedOrEndsTheAgentInItsOrder) {
    ZTCTestSeed lSeed;
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTCDeadline lEnd(std::chrono::seconds(2));
    unsigned lEnds = 0;
    while (!lEnd.isOver()) {
        ZTCBytes lGarbage;
        for (unsigned i = 0; i < 100; ++i) {
            // Frames of up to twelve bytes, most of them with a command that there is; a few with a wrong length.
            ZTCBytes lBody(lSeed.below(12) + 1);
            std::generate(lBody.begin(), lBody.end(), [&] { return static_cast<unsigned char>(lSeed.below(256)); });
            lBody[0] = static_cast<unsigned char>(lSeed.below(50) == 0 ? lSeed.below(256) : lSeed.below(6));
            ZTCBytes lFrame = ZTCSensorPipes::frame(lBody);
            if (lSeed.below(20) == 0) {
                lFrame[lSeed.below(4)] = static_cast<unsigned char>(lSeed.below(256));
            }
            lGarbage.insert(lGarbage.end(), lFrame.begin(), lFrame.end());
        }
        try {
            for (std::size_t lSent = 0; lSent < lGarbage.size();) {
                lSent += lAgent.pipes().sendSome(lGarbage, lSent);
                lAgent.pipes().discardResponses();
            }
        } catch (const std::runtime_error&) {
            // Too short a request, an unknown command or a shut-down command was among it.
            const int lStatus = lAgent.waitForExit();
            EXPECT_TRUE(lStatus == 0 || lStatus == 1) << lStatus;
            EXPECT_EQ(lStatus == 1, lAgent.log().has("Assertion [ false ] failed", "-H-"));
            lAgent.pipes().close();
            std::filesystem::remove(lAgent.agentLogPath());
            lAgent.startAndConnect();
            ++lEnds;
        }
    }
    EXPECT_GT(lEnds, 0u);
    lAgent.pipes().close();
    if (!lAgent.process().hasEnded()) {
        lAgent.kill();
    }
    lAgent.startAndConnectQuietly();
    lAgent.pipes().discardResponses();
    sExpectServed(lAgent);
}

TEST(SensorMisbehaviour, OneThatComesAndGoesWithoutAWordLeavesTheNextOneServed) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    for (unsigned i = 0; i < 500; ++i) {
        lAgent.pipes().closeCommand();
        if (i % 3 == 0) {
            lAgent.pipes().closeResponse();
            lAgent.pipes().openResponse();
        }
        lAgent.pipes().openCommand();
        if (i % 50 == 0) {
            sExpectServed(lAgent);
        }
    }
    sExpectNextSensorServed(lAgent);
}

TEST(SensorMisbehaviour, ARequestOneByteAboveTheLimitIsRefusedWithAllItsBytes) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    ZTCBytes lBody(1048576, 0x77);
    lBody[0] = 2;
    EXPECT_EQ(hexOf(lAgent.pipes().request(lBody)), gcSuccessHex);
    lBody.push_back(0x77);
    lAgent.pipes().sendRequest(lBody);
    sWaitUntilSettled(lAgent, lAgent.pipes());
    EXPECT_FALSE(lAgent.log().containing("1048577 bytes").empty());
    EXPECT_EQ(lAgent.log().count("Stopping Scope Data Collection."), 1u);
    sExpectServed(lAgent);
}

TEST(SensorMisbehaviour, TenThousandRetrievalsInARowAreAnsweredOneByOne) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().startStorm(2, 1000, {ZTSLibraryEvent::bare(0, 2, 1), ZTSLibraryEvent::bare(1, 8, 1)});
    constexpr std::size_t lcRequests = 10000;
    ZTCByteWriter lFrames;
    for (std::size_t i = 0; i < lcRequests; ++i) {
        lFrames.raw(ZTCSensorPipes::frame({1}));
    }
    std::size_t lSent = 0;
    std::uint64_t lOccurrences = 0;
    for (std::size_t i = 0; i < lcRequests; ++i) {
        lSent += lAgent.pipes().sendSome(lFrames.bytes(), lSent);
        const ZTSScopeDataResponse lResponse = ZTSScopeDataResponse::decode(lAgent.pipes().readResponse());
        ASSERT_EQ(lResponse.mLists.size(), 2u) << i;
        lOccurrences += lResponse.occurrences(2, 1) + lResponse.occurrences(8, 1);
    }
    EXPECT_EQ(lAgent.library().waitForStorm(), 4000u);
    EXPECT_EQ(lAgent.pipes().waitingResponseBytes(), 0u);
    const ZTSScopeDataResponse lRest = lAgent.retrieve();
    EXPECT_EQ(lOccurrences + lRest.occurrences(2, 1) + lRest.occurrences(8, 1), 4000u);
}

TEST(SensorMisbehaviour, OneThatDiesInTheMiddleOfARequestLeavesTheNextOneServed) {
    // Side by side, so that the wait for the rest passes once.
    std::vector<std::unique_ptr<ZTCAgentProcess>> lAgents;
    for (const char* lpPart : {"00", "000000", "00000005", "0000000505", "001000000277"}) {
        lAgents.push_back(std::make_unique<ZTCAgentProcess>());
        lAgents.back()->startAndConnect();
        lAgents.back()->pipes().sendRaw(bytesOf(lpPart));
        lAgents.back()->pipes().waitUntilTaken();
        lAgents.back()->pipes().close();
    }
    for (const auto& lcrpAgent : lAgents) {
        lcrpAgent->log().waitForLine([](const ZTSLogLine& acrLine) { return acrLine.mMark == "-E-"; }, "an error");
        lcrpAgent->pipes().open();
        sExpectServed(*lcrpAgent);
    }
}

TEST(SensorMisbehaviour, OneThatDiesInTheMiddleOfAResponseEndsTheAgentInOrderAndTheNextStartIsServed) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    sHangInALargeResponse(lAgent);
    lAgent.pipes().close();
    EXPECT_EQ(lAgent.waitForExit(), 0);
    const auto lLines = lAgent.log().containing("Exiting TavikCommandHandler thread with error : Writing to '");
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_TRUE(lLines[0].mText.ends_with("its reader has gone")) << lLines[0].mText;
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
    sExpectNextStartServed(lAgent);
}

TEST(SensorMisbehaviour, OneThatDiesBeforeItsResponseEndsTheAgentInOrderAndTheNextStartIsServed) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    lAgent.library().configure("hold ZtapiRegEvent");
    lAgent.pipes().sendRequest(ZTCAgentProcess::startScopeRequest(4096));
    lAgent.library().waitForCall("ZtapiRegEvent held");
    lAgent.pipes().close();
    lAgent.library().letGo();
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
    sExpectNextStartServed(lAgent);
}
