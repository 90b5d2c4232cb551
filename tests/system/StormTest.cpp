#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/support/TestThreads.h"
#include "tests/system/AdapterEvents.h"

// What a storm of events from many threads must never do: lose or double an event, hold up an exit, crash or hang.

using ZTCKind = std::pair<unsigned, unsigned>;

/// One event of every kind, those with data in two identities, spread over two boards.
static std::vector<ZTSLibraryEvent> sMixture() {
    std::vector<ZTSLibraryEvent> lEvents;
    unsigned lBoard = 0;
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        for (const ZTCBytes& lcrData : {lcrKind.mData, lcrKind.mSameIdentity, lcrKind.mOthers.front()}) {
            lEvents.push_back(ZTSLibraryEvent::scope(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, lcrData));
            lBoard = 1 - lBoard;
        }
    }
    for (const ZTSBareKind& lcrKind : bareKinds(1)) {
        lEvents.push_back(lcrKind.mEvent);
    }
    lEvents.push_back(ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203, 0x00010204, 0x00010204})));
    return lEvents;
}

/// The occurrences that the mixture makes, kind by kind.
static std::map<ZTCKind, std::uint64_t> sOccurrencesOfMixture() {
    std::map<ZTCKind, std::uint64_t> lCounts;
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        lCounts[{lcrKind.mCategory, lcrKind.mSubcategory}] += 3;
    }
    for (const ZTSBareKind& lcrKind : bareKinds(1)) {
        lCounts[{lcrKind.mCategory, lcrKind.mSubcategory}] += 1;
    }
    lCounts[{1, 0x20}] += 3;
    return lCounts;
}

static void sAdd(std::map<ZTCKind, std::uint64_t>& arCounts, const ZTSScopeDataResponse& acrResponse) {
    for (const ZTSEncodedRecordList& lcrList : acrResponse.mLists) {
        for (const ZTSEncodedRecord& lcrRecord : lcrList.mRecords) {
            arCounts[{lcrRecord.mCategory, lcrRecord.mSubcategory}] += lcrRecord.mOccurrences;
        }
    }
}

TEST(Storm, EveryEventOfEightThreadsIsDeliveredExactlyOnceWhileItIsRetrieved) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    // One round makes at most 1272 bytes of event data a thread: a burst stays below the total limit even if no
    // retrieval comes in between, so that every event is admitted.
    constexpr std::uint64_t lcThreads = 8;
    constexpr std::uint64_t lcRounds = 25;
    constexpr std::uint64_t lcBursts = 8;
    const std::vector<ZTSLibraryEvent> lMixture = sMixture();
    std::map<ZTCKind, std::uint64_t> lCounts;
    for (std::uint64_t lBurst = 0; lBurst < lcBursts; ++lBurst) {
        lAgent.library().startStorm(lcThreads, lcRounds, lMixture);
        std::uint64_t lDelivered = 0;
        ZTCTestThread lWaiter([&] { lDelivered = lAgent.library().waitForStorm(); });
        do {
            sAdd(lCounts, lAgent.retrieve());
        } while (lWaiter.isRunning());
        sAdd(lCounts, lAgent.retrieve());
        lWaiter.join();
        ASSERT_EQ(lDelivered, lcThreads * lcRounds * lMixture.size());
    }
    for (const auto& [lKind, lOne] : sOccurrencesOfMixture()) {
        EXPECT_EQ(lCounts[lKind], lOne * lcThreads * lcRounds * lcBursts) << lKind.first << "/" << lKind.second;
    }
    EXPECT_EQ(lCounts.size(), 20u);
}

TEST(Storm, StopsAndStartsInAStormLoseNothingThatWasAdmitted) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly(32);
    lAgent.startScope();
    const std::string lRefused = "Ignoring the event as Scope data Collection is not enabled.";
    lAgent.library().startStorm(4, 2000, {ZTSLibraryEvent::bare(0, 2, 1), ZTSLibraryEvent::bare(1, 8, 1)});
    std::map<ZTCKind, std::uint64_t> lCounts;
    for (int i = 0; i < 25; ++i) {
        EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
        lAgent.startScope();
        sAdd(lCounts, lAgent.retrieve());
    }
    EXPECT_EQ(lAgent.library().waitForStorm(), 16000u);
    sAdd(lCounts, lAgent.retrieve());
    std::uint64_t lSum = 0;
    for (const auto& [lKind, lCount] : lCounts) {
        lSum += lCount;
    }
    EXPECT_EQ(lSum + lAgent.log().count(lRefused), 16000u);
}

TEST(Storm, AStopSignalAmongCommandsInAStormEndsTheAgentInOrder) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().startStorm(4, 0, sMixture());
    ZTCByteWriter lFrames;
    for (int i = 0; i < 50; ++i) {
        lFrames.raw(ZTCSensorPipes::frame({1}));
    }
    lAgent.pipes().sendRaw(lFrames.bytes());
    lAgent.pipes().readResponse();
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));
}

TEST(Storm, AStormAgainstAFullAgentEndsWithARetrieval) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope(0);
    lAgent.library().startStorm(4, 500, sMixture());
    EXPECT_EQ(lAgent.library().waitForStorm(), 4u * 500u * sMixture().size());
    std::map<ZTCKind, std::uint64_t> lCounts;
    sAdd(lCounts, lAgent.retrieve());
    EXPECT_FALSE(lCounts.empty());
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.occurrences(2, 1), 1u);
}

TEST(Storm, TargetsMayBeRegisteredWhileEventsLookThemUp) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().startStorm(4, 0, sMixture());
    for (unsigned i = 0; i < 200; ++i) {
        lAgent.registerTargets({{makeWwn(0x2000000000000000 + i), makeWwn(0x1000000000000000 + i), i + 1}});
        if (i % 20 == 0) {
            lAgent.retrieve();
        }
    }
    lAgent.registerTargets({{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0x010203}});
    EXPECT_GT(lAgent.library().stopStorm(), 0u);
    lAgent.retrieve();
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 1, 2, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.retrieve().mLists.at(0).mRecords.at(0).mNodeName, makeWwn(gcRemoteNode));
}

TEST(Storm, AdaptersMayComeAndGoInAStorm) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().startStorm(4, 0, sMixture());
    for (unsigned i = 0; i < 60; ++i) {
        lAgent.library().configure("adapters " + std::to_string(i % 4));
        lAgent.retrieve();
    }
    lAgent.library().configure("adapters 2");
    lAgent.retrieve();
    EXPECT_GT(lAgent.library().stopStorm(), 0u);
    lAgent.retrieve();
    lAgent.library().deliver(ZTSLibraryEvent::bare(1, 2, 1));
    EXPECT_EQ(lAgent.retrieve().texts(1), std::vector<std::string>{"2/1 x1 01000000"});
}
