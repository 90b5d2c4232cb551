#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

using ZTCTexts = std::vector<std::string>;

static const char* const scSwitchedOff = "Ignoring the event as Scope data Collection is not enabled.";
static const char* const scLimitReached = "Ignoring the event as the limit on the total Event Data";

/// One event through each of the four callbacks.
static std::vector<ZTSLibraryEvent> sOneOfEach(unsigned aBoard = 0) {
    return {ZTSLibraryEvent::scope(aBoard, 4, 0x01, scsiData(gcRemotePort, 3)),
            ZTSLibraryEvent::link(aBoard, ZTCScriptedLibrary::portName(0)),
            ZTSLibraryEvent::rscn(aBoard, rscnPayload({0x00010203})), ZTSLibraryEvent::temperature(aBoard)};
}

TEST(Admission, EveryCallbackDropsItsEventWhileCollectionIsOff) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    lAgent.library().deliverAll(sOneOfEach());
    EXPECT_EQ(lAgent.log().count(scSwitchedOff, "-N-"), 4u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Admission, EveryCallbackTellsWhatItWasCalledWith) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliverAll(sOneOfEach());
    for (const std::string& lcrText :
         {"Invoking Generic callback with boardId: 0, hba wwn: " + wwnText(ZTCScriptedLibrary::portName(0)) +
              ", Cat: 4, subCat: 1",
          std::string("Invoking LINK callback with boardId: 0"), std::string("Invoking RSCN callback with boardId: 0"),
          std::string("Invoking TEMPERATURE callback with boardId: 0")}) {
        EXPECT_EQ(lAgent.log().count(lcrText, "-T-"), 1u) << lcrText;
    }
    EXPECT_EQ(lAgent.log().containing("Data = ").size(), 1u);
}

TEST(Admission, AnEventOfAnUnknownBoardIsReportedAndDropped) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliverAll(sOneOfEach(7));
    EXPECT_EQ(lAgent.log().count("Ignoring the KpmLink event callback as boardid 7 is bad", "-N-"), 2u);
    EXPECT_EQ(lAgent.log().count("Ignoring the KpmRscn event callback as boardid 7 is bad", "-N-"), 1u);
    EXPECT_EQ(lAgent.log().count("Ignoring the KpmTemp event callback as boardid 7 is bad", "-N-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Admission, ABoardWithoutARecordListIsReportedWithItsPortAndDropped) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().configure("adapters 1");
    EXPECT_EQ(lAgent.retrieve().mLists.size(), 2u);
    const ZTSWwn lLinkPort = makeWwn(0x1122334455667788);
    lAgent.library().deliverAll({ZTSLibraryEvent::scope(1, 4, 0x01, scsiData(gcRemotePort, 3)),
                                 ZTSLibraryEvent::link(1, lLinkPort),
                                 ZTSLibraryEvent::rscn(1, rscnPayload({0x00010203})), ZTSLibraryEvent::temperature(1)});
    const std::string lOwn = wwnText(ZTCScriptedLibrary::portName(1));
    const auto lCount = [&](const std::string& acrWwn, unsigned aCategory, unsigned aSubcategory) {
        return lAgent.log().count("Bad boardid 1 in event has been recieved. Event: wwn " + acrWwn + "; cat " +
                                      std::to_string(aCategory) + "; subcat " + std::to_string(aSubcategory) +
                                      ".  Skip event!",
                                  "-E-");
    };
    EXPECT_EQ(lCount(lOwn, 4, 1), 1u);
    EXPECT_EQ(lCount(wwnText(lLinkPort), 8, 2), 1u);
    EXPECT_EQ(lCount(lOwn, 1, 32), 1u);
    EXPECT_EQ(lCount(lOwn, 8, 4), 1u);
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.retrieve().texts(0), ZTCTexts{"2/1 x1 01000000"});
}

/// Events whose records hold 262140 bytes together: 2047 check conditions of 128 that take turns, and 124 more.
static std::vector<ZTSLibraryEvent> sFourBytesBelowTheLimit() {
    std::vector<ZTSLibraryEvent> lEvents;
    for (int i = 0; i < 2047; ++i) {
        lEvents.push_back(ZTSLibraryEvent::scope(
            0, 4, 0x04, checkConditionData(i % 2 == 0 ? gcRemotePort : gcOtherPort, 1, 2, 3, 4, 5)));
    }
    lEvents.push_back(ZTSLibraryEvent::scope(0, 4, 0x01, scsiData(gcRemotePort, 1)));
    lEvents.push_back(ZTSLibraryEvent::scope(0, 4, 0x02, scsiData(gcRemotePort, 1)));
    lEvents.push_back(ZTSLibraryEvent::scope(0, 1, 0x01, plogiData(gcRemotePort, gcRemoteNode)));
    lEvents.push_back(ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203})));
    return lEvents;
}

TEST(Admission, TheEventThatReachesTheTotalLimitIsTheLastOneAdmitted) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(32);
    lAgent.startScope();
    lAgent.library().deliverAll(sFourBytesBelowTheLimit());
    EXPECT_TRUE(lAgent.log().containing("Current size = ").empty());

    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_TRUE(lAgent.log().containing("Current size = ").empty());

    lAgent.library().deliverAll(sOneOfEach());
    EXPECT_EQ(lAgent.log().count("Current size = 262144", "-N-"), 4u);
    EXPECT_EQ(lAgent.log().count(scLimitReached, "-N-"), 4u);

    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.texts().size(), 2052u);
    EXPECT_EQ(lResponse.texts().back(), "2/1 x1 01000000");
    EXPECT_EQ(lResponse.occurrences(4, 4), 2047u);

    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"2/1 x1 01000000"});
}

TEST(Admission, OneAdmittedEventMayCarryTheTotalPastItsLimit) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(32);
    lAgent.startScope();
    lAgent.library().deliverAll(sFourBytesBelowTheLimit());
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 4, 0x04, checkConditionData(gcRemotePort, 1, 2, 3, 4, 5)));
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.log().count("Current size = 262268", "-N-"), 1u);
    EXPECT_EQ(lAgent.log().count(scLimitReached, "-N-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts().size(), 2052u);
}

TEST(Admission, AppendedBytesCountTowardsTheTotalAndMereOccurrencesDoNot) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(32);
    lAgent.startScope(0xFFFFFFFF);
    // 16 bytes at first, then 4 for each of the rest: 262144 with 65533 events.
    lAgent.library().startStorm(1, 65533, {ZTSLibraryEvent::scope(0, 4, 0x08, scsiData(gcRemotePort, 3))});
    lAgent.library().waitForStorm();
    EXPECT_TRUE(lAgent.log().containing("Current size = ").empty());
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.log().count("Current size = 262144", "-N-"), 1u);
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    ASSERT_EQ(lResponse.texts().size(), 1u);
    EXPECT_EQ(lResponse.mLists[0].mRecords[0].mOccurrences, 65533u);
    EXPECT_EQ(lResponse.mLists[0].mRecords[0].mData.size(), 262144u);
    EXPECT_EQ(lResponse.mListCount, 1u);

    lAgent.library().deliverAll(std::vector<ZTSLibraryEvent>(100, ZTSLibraryEvent::bare(0, 2, 1)));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"2/1 x100 01000000"});
}

TEST(Admission, StoppingAndStartingAgainKeepsWhatWasCollected) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    const ZTSLibraryEvent lEvent = ZTSLibraryEvent::scope(0, 4, 0x01, scsiData(gcRemotePort, 3));
    lAgent.library().deliver(lEvent);
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    lAgent.library().deliver(lEvent);
    lAgent.startScope();
    lAgent.library().deliver(lEvent);
    EXPECT_EQ(lAgent.log().count(scSwitchedOff, "-N-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"4/1 x2 " + qFullRecord(gcRemotePort, {3})});
}
