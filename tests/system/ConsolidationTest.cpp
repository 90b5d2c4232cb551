#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"
#include "tests/system/RecordTexts.h"

TEST(Consolidation, EveryKindWithDataIsRecordedByteForByte) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(eventOf(lcrKind, lcrKind.mData));
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 1, lcrKind.mRecordHex)});
        EXPECT_EQ(lAgent.log().count(lcrKind.notice(), "-N-"), 1u);
    }
}

TEST(Consolidation, EveryKindWithoutDataIsRecordedAsItsVersionAlone) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSBareKind& lcrKind : bareKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(lcrKind.mEvent);
        EXPECT_EQ(lAgent.retrieve().texts(),
                  ZTCTexts{recordText(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")});
        EXPECT_EQ(lAgent.log().count(lcrKind.notice(), "-N-"), 1u);
    }
}

TEST(Consolidation, EventsWithoutDataOfOneKindAndBoardAreCounted) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSBareKind& lcrKind : bareKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        ZTSLibraryEvent lElsewhere = lcrKind.mEvent;
        lElsewhere.mBoard = 1;
        lAgent.library().deliverAll({lcrKind.mEvent, lcrKind.mEvent, lcrKind.mEvent, lElsewhere, lcrKind.mEvent});
        const ZTSScopeDataResponse lResponse = lAgent.retrieve();
        EXPECT_EQ(lResponse.texts(0), (ZTCTexts{recordText(lcrKind.mCategory, lcrKind.mSubcategory, 3, "01000000"),
                                                recordText(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")}));
        EXPECT_EQ(lResponse.texts(1), ZTCTexts{recordText(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")});
    }
}

TEST(Consolidation, AnEventOfTheSameIdentityContinuesThePendingRecord) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliverAll({eventOf(lcrKind, lcrKind.mData), eventOf(lcrKind, lcrKind.mSameIdentity)});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 2, lcrKind.mContinuedHex)});
    }
}

TEST(Consolidation, EveryPartOfAnIdentityTellsRecordsApart) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        for (const ZTCBytes& lcrOther : lcrKind.mOthers) {
            SCOPED_TRACE(std::string(lcrKind.mpName) + " " + hexOf(lcrOther));
            lAgent.library().deliverAll(
                {eventOf(lcrKind, lcrKind.mData), eventOf(lcrKind, lcrOther), eventOf(lcrKind, lcrKind.mData)});
            const ZTCTexts lTexts = lAgent.retrieve().texts();
            ASSERT_EQ(lTexts.size(), 3u);
            EXPECT_EQ(lTexts[0], recordText(lcrKind, 1, lcrKind.mRecordHex));
            EXPECT_NE(lTexts[1], lTexts[0]);
            EXPECT_EQ(lTexts[2], lTexts[0]);
        }
    }
}

TEST(Consolidation, AnotherKindInBetweenEndsARecord) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliverAll(
            {eventOf(lcrKind, lcrKind.mData), ZTSLibraryEvent::bare(0, 2, 0x01), eventOf(lcrKind, lcrKind.mData)});
        EXPECT_EQ(lAgent.retrieve().texts(),
                  (ZTCTexts{recordText(lcrKind, 1, lcrKind.mRecordHex), recordText(2, 1, 1, "01000000"),
                            recordText(lcrKind, 1, lcrKind.mRecordHex)}));
    }
}

TEST(Consolidation, TheSameEventOnAnotherBoardInBetweenGivesThreeRecords) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lOne = recordText(lcrKind, 1, lcrKind.mRecordHex);
        lAgent.library().deliverAll({eventOf(lcrKind, lcrKind.mData, 0), eventOf(lcrKind, lcrKind.mData, 1),
                                     eventOf(lcrKind, lcrKind.mData, 0)});
        const ZTSScopeDataResponse lResponse = lAgent.retrieve();
        EXPECT_EQ(lResponse.texts(0), (ZTCTexts{lOne, lOne}));
        EXPECT_EQ(lResponse.texts(1), ZTCTexts{lOne});
    }
}

TEST(Consolidation, AfterARetrievalTheSameEventStartsARecordOfItsOwn) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        for (int i = 0; i < 2; ++i) {
            lAgent.library().deliver(eventOf(lcrKind, lcrKind.mData));
            EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 1, lcrKind.mRecordHex)});
        }
    }
}

TEST(Consolidation, ARegisteredTargetGivesItsNamesToEveryKind) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTSWwn lTargetNode = makeWwn(0x5006016f3ba0ffff);
    lAgent.registerTargets({{lTargetNode, makeWwn(gcRemotePort), 0x010203}});
    lAgent.startScope();
    const std::string lNames = "names " + wwnText(makeWwn(gcRemotePort)) + " " + wwnText(lTargetNode) + " ";
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliverAll({eventOf(lcrKind, lcrKind.mData), eventOf(lcrKind, lcrKind.mSameIdentity)});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 2, lcrKind.mContinuedHex, lNames)});
    }
    for (const ZTSBareKind& lcrKind : bareKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(lcrKind.mEvent);
        EXPECT_EQ(lAgent.retrieve().texts(),
                  ZTCTexts{recordText(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")});
    }
}

TEST(Consolidation, QueueFullAndDeviceBusyKeepOneBitPerLun) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (unsigned lSubcategory : {0x01u, 0x02u}) {
        const auto lDeliver = [&](std::uint32_t aLun) {
            lAgent.library().deliver(ZTSLibraryEvent::scope(0, 4, lSubcategory, scsiData(gcRemotePort, aLun)));
        };
        for (std::uint32_t lLun : {3u, 9u, 300u}) {
            lDeliver(lLun);
        }
        EXPECT_EQ(lAgent.retrieve().texts(),
                  ZTCTexts{recordText(4, lSubcategory, 3, qFullRecord(gcRemotePort, {3, 9}))});

        for (std::uint32_t lLun : {0u, 7u, 8u, 255u, 256u, 0xFFFFFFFEu, 255u}) {
            lDeliver(lLun);
        }
        EXPECT_EQ(lAgent.retrieve().texts(),
                  ZTCTexts{recordText(4, lSubcategory, 7, qFullRecord(gcRemotePort, {0, 7, 8, 255}))});

        lDeliver(300);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(4, lSubcategory, 1, qFullRecord(gcRemotePort, {}))});

        lDeliver(4);
        lDeliver(0xFFFFFFFF);
        lDeliver(5);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(4, lSubcategory, 3, allLunsRecord(gcRemotePort))});

        lDeliver(0xFFFFFFFF);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(4, lSubcategory, 1, allLunsRecord(gcRemotePort))});
    }
}

TEST(Consolidation, CheckConditionsKeepLunsCommandsAndQualifiersBelow256) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    const auto lDeliver = [&](std::uint32_t aLun, std::uint32_t aCommand, std::uint32_t aAscq) {
        lAgent.library().deliver(
            ZTSLibraryEvent::scope(0, 4, 0x04, checkConditionData(gcRemotePort, aLun, aCommand, 5, 0x24, aAscq)));
    };
    lDeliver(0, 0, 0);
    lDeliver(255, 255, 255);
    lDeliver(256, 256, 256);
    lDeliver(0xFFFFFFFE, 0xFFFFFFFE, 0xFFFFFFFE);
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{recordText(4, 4, 4, checkConditionRecord(gcRemotePort, 5, 0x24, {0, 255}, {0, 255}, {0, 255}))});

    std::vector<unsigned> lAll;
    for (unsigned i = 0; i < 256; ++i) {
        lAll.push_back(i);
    }
    lDeliver(3, 0x28, 1);
    lDeliver(0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF);
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{recordText(4, 4, 2, checkConditionRecord(gcRemotePort, 5, 0x24, lAll, {0x28}, {1}))});

    lDeliver(0xFFFFFFFF, 1000, 1000);
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{recordText(4, 4, 1, checkConditionRecord(gcRemotePort, 5, 0x24, lAll, {}, {}))});
}

TEST(Consolidation, ACheckConditionWithUnknownSenseDataIsARecordOfItsOwn) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(
        0, 4, 0x04, checkConditionData(gcRemotePort, 1, 0x12, 0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF)));
    EXPECT_EQ(
        lAgent.retrieve().texts(),
        ZTCTexts{recordText(4, 4, 1, checkConditionRecord(gcRemotePort, 0xFFFFFFFF, 0xFFFFFFFF, {1}, {0x12}, {}))});
}

TEST(Consolidation, ARecordGrowsOnlyWhileItStaysBelowTheLimit) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        if (lcrKind.mContinuation != ZTEContinuation::Appends) {
            continue;
        }
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lTail = lcrKind.mContinuedHex.substr(lcrKind.mRecordHex.size());
        const unsigned lFirst = static_cast<unsigned>(lcrKind.mRecordHex.size() / 2);
        const unsigned lMore = static_cast<unsigned>(lTail.size() / 2);
        const std::vector<ZTSLibraryEvent> lEvents{eventOf(lcrKind, lcrKind.mData),
                                                   eventOf(lcrKind, lcrKind.mSameIdentity),
                                                   eventOf(lcrKind, lcrKind.mSameIdentity)};
        // A new record from the second event's data: its head is the first record's, with the appended part's values.
        lAgent.startScope(lFirst + 2 * lMore + 1);
        lAgent.library().deliverAll(lEvents);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 3, lcrKind.mRecordHex + lTail + lTail)});

        lAgent.startScope(lFirst + 2 * lMore);
        lAgent.library().deliverAll(lEvents);
        ZTCTexts lTexts = lAgent.retrieve().texts();
        ASSERT_EQ(lTexts.size(), 2u);
        EXPECT_EQ(lTexts[0], recordText(lcrKind, 2, lcrKind.mContinuedHex));
        EXPECT_EQ(lTexts[1].size(), recordText(lcrKind, 1, lcrKind.mRecordHex).size());

        lAgent.startScope(lFirst + lMore);
        lAgent.library().deliverAll(lEvents);
        EXPECT_EQ(lAgent.retrieve().texts().size(), 3u);

        lAgent.startScope(0);
        lAgent.library().deliverAll(lEvents);
        EXPECT_EQ(lAgent.retrieve().texts().size(), 3u);
    }
}

TEST(Consolidation, ALimitOfZeroLeavesCountingKindsAlone) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope(0);
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        if (lcrKind.mContinuation != ZTEContinuation::Counts) {
            continue;
        }
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliverAll({eventOf(lcrKind, lcrKind.mData), eventOf(lcrKind, lcrKind.mSameIdentity)});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 2, lcrKind.mContinuedHex)});
    }
}

TEST(Consolidation, ARecordStartedForLackOfRoomIsTheOneThatGrowsFromThenOn) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope(24 + 8 + 1);
    const auto lRjt = [](std::uint32_t aReason) {
        return ZTSLibraryEvent::scope(0, 1, 0x08, lsRjtData(gcRemotePort, 0x03, aReason, aReason + 100));
    };
    lAgent.library().deliverAll({lRjt(1), lRjt(2), lRjt(3), lRjt(4), lRjt(5)});
    const auto lHead = [](std::uint32_t aReason) {
        return ZTCByteWriter().le32(1).wwn(makeWwn(gcRemotePort)).le32(0x03).le32(aReason).le32(aReason + 100).hex();
    };
    EXPECT_EQ(lAgent.retrieve().texts(),
              (ZTCTexts{recordText(1, 8, 2, lHead(1) + ZTCByteWriter().le32(2).le32(102).hex()),
                        recordText(1, 8, 2, lHead(3) + ZTCByteWriter().le32(4).le32(104).hex()),
                        recordText(1, 8, 1, lHead(5))}));
}
