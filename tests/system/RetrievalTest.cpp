#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

using ZTCTexts = std::vector<std::string>;

static std::string sKey(unsigned aBoard) {
    return wwnText(ZTCScriptedLibrary::nodeName(aBoard)) + "." + wwnText(ZTCScriptedLibrary::portName(aBoard));
}

TEST(Retrieval, EmptyListsAreDeliveredByteForByte) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    ZTCByteWriter lExpected;
    lExpected.u8(2).u32(2);
    for (unsigned i = 0; i < 2; ++i) {
        const std::string lKey = sKey(i);
        lExpected.u32(47).raw(ZTCBytes(lKey.begin(), lKey.end())).u32(0);
    }
    EXPECT_EQ(lAgent.request("01"), lExpected.hex());
    EXPECT_EQ(lAgent.log().count("Wrote <0> Scope records from record-list", "-N-"), 2u);
    EXPECT_EQ(lAgent.log().count("Wrote total <0> Scope Events", "-N-"), 1u);
}

TEST(Retrieval, ARecordIsDeliveredByteForByte) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.registerTargets({{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 1}});
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort)));
    ZTCBytes lBody = lAgent.pipes().request(bytesOf("01"));
    const std::string lKey = sKey(0);
    const std::size_t lTimes = 1 + 4 + 4 + lKey.size() + 4 + 4;
    ASSERT_GE(lBody.size(), lTimes + 40);
    const ZTCBytes lTimeBytes(lBody.begin() + static_cast<std::ptrdiff_t>(lTimes),
                              lBody.begin() + static_cast<std::ptrdiff_t>(lTimes) + 40);
    EXPECT_EQ(lTimeBytes[7], 0x2E);
    EXPECT_EQ(lTimeBytes[27], 0x2E);
    const std::string lExpected = ZTCByteWriter()
                                      .u8(2)
                                      .u32(1)
                                      .u32(lKey.size())
                                      .raw(ZTCBytes(lKey.begin(), lKey.end()))
                                      .u32(1)
                                      .u32(1)
                                      .raw(lTimeBytes)
                                      .u8(1)
                                      .u8(2)
                                      .u8(1)
                                      .wwn(makeWwn(gcRemotePort))
                                      .wwn(makeWwn(gcRemoteNode))
                                      .u32(12)
                                      .raw(bytesOf("01000000500601603ba01234"))
                                      .hex();
    EXPECT_EQ(hexOf(lBody), lExpected);
    EXPECT_EQ(lAgent.log().count("Wrote <1> Scope records from record-list", "-N-"), 1u);
    EXPECT_EQ(lAgent.log().count("Wrote total <1> Scope Events", "-N-"), 1u);
}

TEST(Retrieval, EveryBoardComesInOrderWithItsOwnNames) {
    ZTCAgentProcess lAgent(3);
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliverAll(
        {ZTSLibraryEvent::bare(2, 2, 1), ZTSLibraryEvent::bare(0, 8, 1), ZTSLibraryEvent::bare(2, 4, 0x20)});
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.mListCount, 3u);
    ASSERT_EQ(lResponse.mLists.size(), 3u);
    for (unsigned i = 0; i < 3; ++i) {
        EXPECT_EQ(lResponse.mLists[i].mInitiatorKey, sKey(i));
    }
    EXPECT_EQ(lResponse.texts(0), ZTCTexts{"8/1 x1 01000000"});
    EXPECT_EQ(lResponse.texts(1), ZTCTexts{});
    EXPECT_EQ(lResponse.texts(2), (ZTCTexts{"2/1 x1 01000000", "4/32 x1 01000000"}));
    EXPECT_EQ(lAgent.log().count("Wrote total <3> Scope Events", "-N-"), 1u);
}

TEST(Retrieval, NoRecordIsDeliveredTwice) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"2/1 x1 01000000"});
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 8, 1));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"8/1 x1 01000000"});
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Retrieval, RecordsOutliveAStop) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"2/1 x1 01000000"});
}

TEST(Retrieval, ALostAdapterIsStillDeliveredOnceAndThenNoLonger) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliverAll({ZTSLibraryEvent::bare(0, 2, 1), ZTSLibraryEvent::bare(1, 2, 1)});
    lAgent.library().configure("adapters 1");
    const ZTSScopeDataResponse lFirst = lAgent.retrieve();
    EXPECT_EQ(lFirst.mListCount, 2u);
    EXPECT_EQ(lFirst.texts(0), ZTCTexts{"2/1 x1 01000000"});
    EXPECT_EQ(lFirst.texts(1), ZTCTexts{"2/1 x1 01000000"});
    const ZTSScopeDataResponse lSecond = lAgent.retrieve();
    EXPECT_EQ(lSecond.mListCount, 1u);
    EXPECT_EQ(lSecond.mLists.size(), 1u);

    lAgent.library().configure("adapters 2");
    EXPECT_EQ(lAgent.retrieve().mLists.size(), 1u);
    lAgent.library().deliver(ZTSLibraryEvent::bare(1, 2, 1));
    const ZTSScopeDataResponse lBack = lAgent.retrieve();
    EXPECT_EQ(lBack.mLists.size(), 2u);
    EXPECT_EQ(lBack.texts(1), ZTCTexts{"2/1 x1 01000000"});
}

TEST(Retrieval, AGainedAdapterIsCountedButNotDelivered) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().configure("adapters 3");
    EXPECT_EQ(lAgent.retrieve().mListCount, 1u);
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.mListCount, 3u);
    ASSERT_EQ(lResponse.mLists.size(), 1u);
    EXPECT_EQ(lResponse.texts(0), ZTCTexts{"2/1 x1 01000000"});
    for (const char* lpBoard : {"1", "2"}) {
        EXPECT_EQ(
            lAgent.log().count(
                std::string("Bad boardid ") + lpBoard + " detected during handle GetScopeDataCommand command", "-E-"),
            1u);
    }
    EXPECT_EQ(lAgent.log().count("Wrote total <1> Scope Events", "-N-"), 1u);
}

TEST(Retrieval, WithNoAdapterLeftTheResponseIsACountOfZero) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.library().configure("adapters 0");
    EXPECT_EQ(lAgent.retrieve().mListCount, 1u);
    EXPECT_EQ(lAgent.request("01"), "0200000000");
    EXPECT_EQ(lAgent.log().count("Wrote total <0> Scope Events", "-N-"), 2u);
}

/// Enough records for a response of several times what a FIFO holds.
static std::vector<ZTSLibraryEvent> sManyEvents() {
    std::vector<ZTSLibraryEvent> lEvents;
    for (int i = 0; i < 2000; ++i) {
        lEvents.push_back(ZTSLibraryEvent::scope(
            0, 4, 0x04, checkConditionData(i % 2 == 0 ? gcRemotePort : gcOtherPort, 1, 2, 3, 4, 5)));
    }
    return lEvents;
}

TEST(Retrieval, AResponseLargerThanTheFifoArrivesWhole) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(31);
    lAgent.startScope();
    lAgent.library().deliverAll(sManyEvents());
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.texts().size(), 2000u);
    EXPECT_EQ(lResponse.occurrences(4, 4), 2000u);
    EXPECT_TRUE(lAgent.ping());
}

TEST(Retrieval, ASensorThatPausesInTheMiddleOfALargeResponseGetsTheRest) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(31);
    lAgent.startScope();
    lAgent.library().deliverAll(sManyEvents());
    lAgent.pipes().sendRequest(bytesOf("01"));
    waitUntil([&] { return lAgent.pipes().waitingResponseBytes() > 4096; }, "the response FIFO to fill");
    // The command thread is in the middle of its write; events go on being collected.
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(ZTSScopeDataResponse::decode(lAgent.pipes().readResponse()).texts().size(), 2000u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"2/1 x1 01000000"});
}

TEST(Retrieval, ASensorThatStopsReadingALargeResponseDoesNotKeepTheAgentFromExiting) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(31);
    lAgent.startScope();
    lAgent.library().deliverAll(sManyEvents());
    lAgent.pipes().sendRequest(bytesOf("01"));
    waitUntil([&] { return lAgent.pipes().waitingResponseBytes() > 4096; }, "the response FIFO to fill");
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_EQ(lAgent.log().containing("Exiting TavikCommandHandler thread with error : ").size(), 1u);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
    EXPECT_FALSE(exists(lAgent.pidFilePath()));
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));
}

TEST(Retrieval, ASensorThatVanishesInTheMiddleOfALargeResponseEndsTheAgent) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(31);
    lAgent.startScope();
    lAgent.library().deliverAll(sManyEvents());
    lAgent.pipes().sendRequest(bytesOf("01"));
    waitUntil([&] { return lAgent.pipes().waitingResponseBytes() > 4096; }, "the response FIFO to fill");
    lAgent.pipes().closeResponse();
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.log().containing("Exiting TavikCommandHandler thread with error : ").size(), 1u);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
}
