#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/support/TestThreads.h"

/// Waits for an error line that contains each of these numbers as a word of its own.
static ZTSLogLine sWaitForError(const ZTCAgentProcess& acrAgent, const std::vector<std::string>& acrNumbers) {
    return acrAgent.log().waitForLine(
        [&](const ZTSLogLine& acrLine) {
            if (acrLine.mMark != "-E-") {
                return false;
            }
            std::string lText = " " + acrLine.mText + " ";
            for (char& lrChar : lText) {
                lrChar = lrChar >= '0' && lrChar <= '9' ? lrChar : ' ';
            }
            for (const std::string& lcrNumber : acrNumbers) {
                if (lText.find(" " + lcrNumber + " ") == std::string::npos) {
                    return false;
                }
            }
            return true;
        },
        "an error with " + acrNumbers.front());
}

static std::size_t sErrors(const ZTCAgentProcess& acrAgent) {
    std::size_t lCount = 0;
    for (const ZTSLogLine& lcrLine : acrAgent.log().lines()) {
        lCount += lcrLine.mMark == "-E-" ? 1 : 0;
    }
    return lCount;
}

static ZTCBytes sFrame(const char* apBodyHex) {
    return ZTCSensorPipes::frame(bytesOf(apBodyHex));
}

TEST(Framing, AForbiddenLengthIsReportedOnceAndEverythingThatWaitsIsThrownAway) {
    for (std::uint32_t lLength : {0u, 1048577u, 0x7FFFFFFFu, 0xFFFFFFFFu}) {
        SCOPED_TRACE(lLength);
        ZTCAgentProcess lAgent;
        lAgent.startAndConnect();
        lAgent.pipes().sendRaw(ZTCByteWriter().u32(lLength).raw(sFrame("02")).raw(sFrame("02")).bytes());
        sWaitForError(lAgent, {std::to_string(lLength)});
        lAgent.pipes().waitUntilTaken();
        EXPECT_TRUE(lAgent.ping());
        EXPECT_EQ(sErrors(lAgent), 1u);
        EXPECT_FALSE(lAgent.log().has("Stopping Scope Data Collection."));
        EXPECT_EQ(lAgent.pipes().waitingResponseBytes(), 0u);
    }
}

TEST(Framing, ARequestThatIsTooLongIsThrownAwayToItsEndAndNothingOfItIsServed) {
    for (const char* lpPart : {"0000000102", "00", "ff"}) {
        SCOPED_TRACE(lpPart);
        ZTCAgentProcess lAgent;
        lAgent.startAndConnectQuietly(63);
        const ZTCBytes lPart = bytesOf(lpPart);
        ZTCByteWriter lRequest;
        lRequest.u32(1048577);
        for (std::size_t lSize = 0; lSize < 1048577; lSize += lPart.size()) {
            lRequest.raw(lPart);
        }
        lAgent.pipes().sendRaw(lRequest.bytes());
        lAgent.pipes().waitUntilTaken();
        sWaitForError(lAgent, {"1048577"});
        EXPECT_TRUE(lAgent.ping());
        EXPECT_EQ(sErrors(lAgent), 1u);
        EXPECT_FALSE(lAgent.log().has("Stopping Scope Data Collection."));
        EXPECT_EQ(lAgent.pipes().waitingResponseBytes(), 0u);
    }
}

TEST(Framing, TheLargestFrameIsServedAndTheBytesBehindItsFieldsAreIgnored) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    ZTCBytes lBody(1048576, 0x77);
    lBody[0] = 2;
    EXPECT_EQ(hexOf(lAgent.pipes().request(lBody)), gcSuccessHex);
    lBody[0] = 5;
    std::fill(lBody.begin() + 1, lBody.begin() + 5, static_cast<unsigned char>(0));
    EXPECT_EQ(hexOf(lAgent.pipes().request(lBody)), gcInvalidHex);
    EXPECT_EQ(sErrors(lAgent), 0u);
}

TEST(Framing, AFrameMayBeCutAnywhere) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTCBytes lFrame = sFrame("050000001e");
    for (std::size_t lCut = 1; lCut < lFrame.size(); ++lCut) {
        SCOPED_TRACE(lCut);
        const auto lMiddle = lFrame.begin() + static_cast<std::ptrdiff_t>(lCut);
        lAgent.pipes().sendRaw(ZTCBytes(lFrame.begin(), lMiddle));
        lAgent.pipes().waitUntilTaken();
        lAgent.pipes().sendRaw(ZTCBytes(lMiddle, lFrame.end()));
        EXPECT_EQ(hexOf(lAgent.pipes().readResponse()), gcSuccessHex);
    }
    EXPECT_EQ(sErrors(lAgent), 0u);
}

TEST(Framing, AFrameMayComeByteByByte) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    for (unsigned char lByte : sFrame(gcPingHex)) {
        lAgent.pipes().sendRaw({lByte});
        lAgent.pipes().waitUntilTaken();
    }
    EXPECT_EQ(hexOf(lAgent.pipes().readResponse()), gcInvalidHex);
}

TEST(Framing, SeveralFramesThatWaitAreAnsweredInOrder) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    ZTCByteWriter lFrames;
    const std::vector<std::pair<const char*, const char*>> lCases{
        {gcPingHex, gcInvalidHex},    {"02", gcSuccessHex},      {"0300000000", gcInvalidHex},
        {"050000001e", gcSuccessHex}, {gcPingHex, gcInvalidHex}, {"00000003e8", gcSuccessHex}};
    for (int i = 0; i < 20; ++i) {
        for (const auto& [lpRequest, lpResponse] : lCases) {
            lFrames.raw(sFrame(lpRequest));
        }
    }
    // A part of one more, which stays behind until its rest comes.
    lFrames.raw(bytesOf("00000005 0500"));
    lAgent.pipes().sendRaw(lFrames.bytes());
    for (int i = 0; i < 20; ++i) {
        for (const auto& [lpRequest, lpResponse] : lCases) {
            EXPECT_EQ(hexOf(lAgent.pipes().readResponse()), lpResponse);
        }
    }
    lAgent.pipes().sendRaw(bytesOf("000001"));
    EXPECT_EQ(hexOf(lAgent.pipes().readResponse()), gcSuccessHex);
    EXPECT_EQ(sErrors(lAgent), 0u);
}

TEST(Framing, AFrameWhoseRestDoesNotComeIsThrownAwayAndTheNextOneServed) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().sendRaw(bytesOf("00000005 0500"));
    sWaitForError(lAgent, {"6", "9"});
    EXPECT_TRUE(lAgent.ping());
    EXPECT_EQ(sErrors(lAgent), 1u);
}

TEST(Framing, AHeaderWhoseRestDoesNotComeIsThrownAwayAndTheNextFrameServed) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().sendRaw(bytesOf("000000"));
    lAgent.log().waitForLine([](const ZTSLogLine& acrLine) { return acrLine.mMark == "-E-"; }, "an error");
    EXPECT_TRUE(lAgent.ping());
    EXPECT_EQ(sErrors(lAgent), 1u);
}

TEST(Framing, ASensorThatLeavesInTheMiddleOfAFrameDoesNotSpoilTheNextOne) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().sendRaw(bytesOf("00000005 0500"));
    lAgent.pipes().waitUntilTaken();
    lAgent.pipes().closeCommand();
    sWaitForError(lAgent, {"6", "9"});
    lAgent.pipes().openCommand();
    EXPECT_TRUE(lAgent.ping());
}

TEST(Framing, SensorsMayComeAndGo) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    for (int i = 0; i < 20; ++i) {
        EXPECT_TRUE(lAgent.ping());
        lAgent.pipes().closeCommand();
        lAgent.pipes().openCommand();
    }
    EXPECT_EQ(sErrors(lAgent), 0u);
}

/// The processor time that the process has used, in clock ticks.
static long sProcessorTicks(pid_t aPid) {
    std::string lText = readFile("/proc/" + std::to_string(aPid) + "/stat");
    std::istringstream lFields(lText.substr(lText.rfind(')') + 2));
    std::string lSkipped;
    for (int i = 0; i < 11; ++i) {
        lFields >> lSkipped;
    }
    long lUser = 0;
    long lKernel = 0;
    lFields >> lUser >> lKernel;
    return lUser + lKernel;
}

TEST(Framing, TheAgentIsQuietWhileNoSensorHasTheCommandPipeOpen) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
    lAgent.pipes().closeCommand();
    const char* const lpIdle = "Waiting for control availability...";
    const std::size_t lSeen = lAgent.log().count(lpIdle);
    lAgent.log().waitFor(lpIdle, lSeen + 1);
    const long lTicks = sProcessorTicks(lAgent.process().getPid());
    const std::size_t lLines = lAgent.log().rawLines().size();
    lAgent.log().waitFor(lpIdle, lSeen + 2);
    // One whole wait time has passed: an agent that spins has burnt most of it.
    EXPECT_LT(sProcessorTicks(lAgent.process().getPid()) - lTicks, sysconf(_SC_CLK_TCK));
    EXPECT_LT(lAgent.log().rawLines().size() - lLines, 20u);
}

TEST(Framing, AnIdleWaitEndsWithoutALineAboutItsTimeOut) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const char* const lpIdle = "Waiting for control availability...";
    lAgent.log().waitFor(lpIdle, 2);
    const auto lLines = lAgent.log().lines();
    const std::size_t lFirst = *lAgent.log().find(lpIdle);
    const std::size_t lSecond = *lAgent.log().find(lpIdle, lFirst + 1);
    for (std::size_t i = lFirst + 1; i < lSecond; ++i) {
        EXPECT_TRUE(lLines[i].mMark == "-T-") << lLines[i].mText;
    }
    EXPECT_TRUE(lAgent.ping());
}

TEST(Framing, ATrickleOfBytesDoesNotHoldUpAnExit) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().sendRaw(bytesOf("00100000"));
    const ZTCTestThread lTrickle([&](const std::stop_token& acrStop) {
        while (!acrStop.stop_requested()) {
            try {
                lAgent.pipes().sendRaw({0x02});
            } catch (const std::runtime_error&) {
                return;  // the agent has closed the pipe
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
        }
    });
    lAgent.pipes().waitUntilTaken();
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
}

TEST(Framing, ARequestShorterThanItsFieldsEndsTheAgentWithoutAResponse) {
    for (const char* lpRequest : {"00", "00000000", "03", "03000000", "0300000001", "030000000150060160", "05",
                                  "05000000", "03FFFFFFFF5006016f3ba0ffff500601603ba0123400010203"}) {
        SCOPED_TRACE(lpRequest);
        ZTCAgentProcess lAgent;
        lAgent.startAndConnect();
        lAgent.pipes().sendRequest(bytesOf(lpRequest));
        EXPECT_EQ(lAgent.waitForExit(), 0);
        EXPECT_TRUE(lAgent.pipes().isAtEnd());
        EXPECT_EQ(
            lAgent.log().count("Exiting TavikCommandHandler thread with error : Not enough data in stream", "-H-"), 1u);
        EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
        EXPECT_FALSE(exists(lAgent.pidFilePath()));
    }
}

TEST(Framing, AResponseThatNobodyReadsEndsTheAgent) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().closeResponse();
    lAgent.pipes().sendRequest(bytesOf(gcStopScopeHex));
    EXPECT_EQ(lAgent.waitForExit(), 0);
    const auto lLines = lAgent.log().containing("Exiting TavikCommandHandler thread with error : ");
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_EQ(lLines[0].mMark, "-H-");
    EXPECT_TRUE(lAgent.log().has("Stopping Scope Data Collection."));
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));
    EXPECT_FALSE(exists(lAgent.responseFifoPath()));
}

TEST(Framing, AReaderOfResponsesMayGoAndComeBackBetweenCommands) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    for (int i = 0; i < 5; ++i) {
        EXPECT_TRUE(lAgent.ping());
        lAgent.pipes().closeResponse();
        lAgent.pipes().openResponse();
    }
}
