#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

// An adapters' library that calls back when it is least expected, from wherever it likes, and takes its time: the agent
// neither waits for it with a lock held nor loses what it delivers.

/// One event of every kind on this board.
static std::vector<ZTSLibraryEvent> sOneOfEachKind(unsigned aBoard) {
    std::vector<ZTSLibraryEvent> lEvents;
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        lEvents.push_back(ZTSLibraryEvent::scope(aBoard, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData));
    }
    for (const ZTSBareKind& lcrKind : bareKinds(aBoard)) {
        lEvents.push_back(lcrKind.mEvent);
    }
    lEvents.push_back(ZTSLibraryEvent::rscn(aBoard, rscnPayload({0x00010203})));
    return lEvents;
}

static std::uint64_t sOccurrences(const ZTSScopeDataResponse& acrResponse) {
    std::uint64_t lSum = 0;
    for (const ZTSEncodedRecordList& lcrList : acrResponse.mLists) {
        for (const ZTSEncodedRecord& lcrRecord : lcrList.mRecords) {
            lSum += lcrRecord.mOccurrences;
        }
    }
    return lSum;
}

/// "BOARD CATEGORY SUBCATEGORY" of the registration that an event belongs to.
static std::string sRegistrationOf(const ZTSLibraryEvent& acrEvent) {
    const std::string lBoard = std::to_string(acrEvent.mBoard);
    switch (acrEvent.mType) {
        case ZTELibraryEventType::Link:
            return lBoard + " 0 1";
        case ZTELibraryEventType::Rscn:
            return lBoard + " 0 2";
        case ZTELibraryEventType::Temperature:
            return lBoard + " 0 32";
        default:
            return lBoard + " " + std::to_string(acrEvent.mCategory) + " " + std::to_string(acrEvent.mSubcategory);
    }
}

TEST(LibraryMisbehaviour, EventsOnTheVeryThreadThatRegistersAreCollected) {
    ZTCAgentProcess lAgent;
    const std::vector<ZTSLibraryEvent> lEvents = sOneOfEachKind(0);
    for (const ZTSLibraryEvent& lcrEvent : lEvents) {
        lAgent.library().configure("deliver-in-register " + sRegistrationOf(lcrEvent) + " " + lcrEvent.text());
    }
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    EXPECT_EQ(lAgent.library().callsOf("deliver-in-register returned").size(), lEvents.size());
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.texts().size(), lEvents.size());
    EXPECT_EQ(sOccurrences(lResponse), lEvents.size());
}

TEST(LibraryMisbehaviour, ACloseThatDeliversOnManyThreadsAndWaitsForThemEnds) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    for (const ZTSLibraryEvent& lcrEvent : sOneOfEachKind(1)) {
        lAgent.library().configure("deliver-in-close 16 " + lcrEvent.text());
    }
    lAgent.library().startStorm(8, 0, sOneOfEachKind(0));
    lAgent.retrieve();
    EXPECT_EQ(lAgent.request(gcShutDownHex), gcSuccessHex);
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.library().callsOf("deliver-in-close returned").size(), 1u);
    EXPECT_TRUE(lAgent.library().callsOf("deliver-in-close failed").empty());
    EXPECT_EQ(lAgent.library().callsOf("Close").size(), 1u);
}

TEST(LibraryMisbehaviour, ARetrievalThatWaitsForTheLibraryHoldsNoEventUp) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().configure("hold GetNumberOfAdapters");
    lAgent.pipes().sendRequest({1});
    lAgent.library().waitForCall("GetNumberOfAdapters held");
    lAgent.library().startStorm(8, 10, sOneOfEachKind(0));
    const std::uint64_t lDelivered = lAgent.library().waitForStorm();
    EXPECT_EQ(lAgent.pipes().waitingResponseBytes(), 0u);
    lAgent.library().letGo();
    const std::uint64_t lTaken = sOccurrences(ZTSScopeDataResponse::decode(lAgent.pipes().readResponse()));
    EXPECT_EQ(lTaken + sOccurrences(lAgent.retrieve()), lDelivered);
}

TEST(LibraryMisbehaviour, EventsAfterAFailedStartAreCollectedAndTheNextStartRegistersAnew) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    // The second board refuses RSCNs; the first one's registrations stand.
    lAgent.library().configure("register-handle 1 0 2 0");
    EXPECT_EQ(hexOf(lAgent.pipes().request(ZTCAgentProcess::startScopeRequest(4096))), gcNotAllowedHex);
    lAgent.library().startStorm(8, 10, sOneOfEachKind(0));
    std::uint64_t lDelivered = lAgent.library().waitForStorm();
    EXPECT_EQ(sOccurrences(lAgent.retrieve()), lDelivered);

    lAgent.library().configure("register-handle 1 0 2 7");
    lAgent.library().configure("hold ZtapiRegEvent");
    lAgent.pipes().sendRequest(ZTCAgentProcess::startScopeRequest(4096));
    lAgent.library().waitForCall("ZtapiRegEvent held");
    lAgent.library().startStorm(8, 10, sOneOfEachKind(0));
    lDelivered = lAgent.library().waitForStorm();
    lAgent.library().letGo();
    EXPECT_EQ(hexOf(lAgent.pipes().readResponse()), gcSuccessHex);
    EXPECT_EQ(sOccurrences(lAgent.retrieve()), lDelivered);

    lAgent.library().deliverAll(sOneOfEachKind(1));
    EXPECT_EQ(sOccurrences(lAgent.retrieve()), sOneOfEachKind(1).size());
}

TEST(LibraryMisbehaviour, ThirtyTwoThreadsWithEverythingAtOddAddressesLoseNothing) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    std::vector<ZTSLibraryEvent> lEvents = sOneOfEachKind(0);
    const std::vector<ZTSLibraryEvent> lOthers = sOneOfEachKind(1);
    lEvents.insert(lEvents.end(), lOthers.begin(), lOthers.end());
    for (ZTSLibraryEvent& lrEvent : lEvents) {
        lrEvent.mIsMisaligned = true;
    }
    constexpr std::uint64_t lcThreads = 32;
    constexpr std::uint64_t lcRounds = 5;
    for (unsigned i = 0; i < 3; ++i) {
        lAgent.library().startStorm(lcThreads, lcRounds, lEvents);
        std::uint64_t lTaken = sOccurrences(lAgent.retrieve());
        EXPECT_EQ(lAgent.library().waitForStorm(), lcThreads * lcRounds * lEvents.size());
        const ZTSScopeDataResponse lRest = lAgent.retrieve();
        lTaken += sOccurrences(lRest);
        EXPECT_EQ(lTaken, lcThreads * lcRounds * lEvents.size());
    }
}
