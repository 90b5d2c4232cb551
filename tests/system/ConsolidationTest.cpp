#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <ctime>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

static ZTSLibraryEvent sEvent(const ZTSDataKind& acrKind, const ZTCBytes& acrData, unsigned aBoard = 0) {
    return ZTSLibraryEvent::scope(aBoard, acrKind.mCategory, acrKind.mSubcategory, acrData);
}

static std::string sRecord(unsigned aCategory, unsigned aSubcategory, unsigned aOccurrences, const std::string& acrHex,
                           const std::string& acrNames = "") {
    return std::to_string(aCategory) + "/" + std::to_string(aSubcategory) + " x" + std::to_string(aOccurrences) + " " +
           acrNames + acrHex;
}

static std::string sRecord(const ZTSDataKind& acrKind, unsigned aOccurrences, const std::string& acrHex,
                           const std::string& acrNames = "") {
    return sRecord(acrKind.mCategory, acrKind.mSubcategory, aOccurrences, acrHex, acrNames);
}

using ZTCTexts = std::vector<std::string>;

TEST(Consolidation, EveryKindWithDataIsRecordedByteForByte) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(sEvent(lcrKind, lcrKind.mData));
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 1, lcrKind.mRecordHex)});
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
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")});
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
        EXPECT_EQ(lResponse.texts(0), (ZTCTexts{sRecord(lcrKind.mCategory, lcrKind.mSubcategory, 3, "01000000"),
                                                sRecord(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")}));
        EXPECT_EQ(lResponse.texts(1), ZTCTexts{sRecord(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")});
    }
}

TEST(Consolidation, DataOneByteTooShortIsReportedWithBothLengthsAndDropped) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lMessage = lcrKind.tooShort(lcrKind.mMinimumLength - 1);
        const std::size_t lBefore = lAgent.log().count(lMessage, "-W-");
        ASSERT_EQ(lcrKind.mData.size(), lcrKind.mMinimumLength);
        lAgent.library().deliver(sEvent(lcrKind, ZTCBytes(lcrKind.mData.begin(), lcrKind.mData.end() - 1)));
        EXPECT_EQ(lAgent.log().count(lMessage, "-W-"), lBefore + 1);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
    }
}

TEST(Consolidation, ALunResetOfTwelveBytesReportsTheTargetResetText) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 4, 0x08, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.log().count("Not enough data in SCSI TGTRESET Event 16 12", "-W-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Consolidation, AnEventWithoutPayloadObjectHasLengthZeroWhateverItsSize) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lMessage = lcrKind.tooShort(0);
        const std::size_t lBefore = lAgent.log().count(lMessage, "-W-");
        ZTSLibraryEvent lEvent = sEvent(lcrKind, lcrKind.mData);
        lEvent.mPayload = ZTELibraryEventPayload::NullPayload;
        lAgent.library().deliver(lEvent);
        EXPECT_EQ(lAgent.log().count(lMessage, "-W-"), lBefore + 1);
    }
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Consolidation, APayloadWithANullDataPointerHasLengthZeroWhateverItsSize) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    ZTSLibraryEvent lEvent = ZTSLibraryEvent::scope(0, 1, 0x01, plogiData(gcRemotePort, gcRemoteNode));
    lEvent.mPayload = ZTELibraryEventPayload::NullData;
    lAgent.library().deliver(lEvent);
    EXPECT_EQ(lAgent.log().count("Not enough data in ELS PLOGI Event 20 0", "-W-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Consolidation, ASizeBelowTheHeaderCountsAsNoData) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (std::uint64_t lSize : {std::uint64_t{0}, std::uint64_t{39}, std::uint64_t{0xFFFFFFFF00000000}}) {
        ZTSLibraryEvent lEvent = ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort));
        lEvent.mSize = lSize;
        lAgent.library().deliver(lEvent);
    }
    EXPECT_EQ(lAgent.log().count("Not enough data in ELS PRLO Event 12 0", "-W-"), 3u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Consolidation, OnlyTheLowHalfOfAnEventsSizeCounts) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    ZTSLibraryEvent lEvent = ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort));
    lEvent.mSize |= 0xABCD000000000000;
    lAgent.library().deliver(lEvent);
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{sRecord(1, 2, 1, ZTCByteWriter().le32(1).wwn(makeWwn(gcRemotePort)).hex())});
}

TEST(Consolidation, BytesBehindAKindsStructureAreIgnored) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(sEvent(lcrKind, ZTCByteWriter().raw(lcrKind.mData).fill(100, 0xDB).bytes()));
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 1, lcrKind.mRecordHex)});
    }
}

TEST(Consolidation, EventsAtOddAddressesAreRecordedLikeAnyOther) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        ZTSLibraryEvent lFirst = sEvent(lcrKind, lcrKind.mData);
        ZTSLibraryEvent lSecond = sEvent(lcrKind, lcrKind.mSameIdentity);
        lFirst.mIsMisaligned = lSecond.mIsMisaligned = true;
        lAgent.library().deliverAll({lFirst, lSecond});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 2, lcrKind.mContinuedHex)});
    }
    for (ZTSLibraryEvent lEvent : {ZTSLibraryEvent::link(0, ZTCScriptedLibrary::portName(0)),
                                   ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203}))}) {
        lEvent.mIsMisaligned = true;
        lAgent.library().deliver(lEvent);
    }
    EXPECT_EQ(lAgent.retrieve().texts(),
              (ZTCTexts{sRecord(8, 2, 1, "01000000"), sRecord(1, 0x20, 1, rscnRecord(0x00010203))}));
}

TEST(Consolidation, AnEventOfTheSameIdentityContinuesThePendingRecord) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliverAll({sEvent(lcrKind, lcrKind.mData), sEvent(lcrKind, lcrKind.mSameIdentity)});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 2, lcrKind.mContinuedHex)});
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
                {sEvent(lcrKind, lcrKind.mData), sEvent(lcrKind, lcrOther), sEvent(lcrKind, lcrKind.mData)});
            const ZTCTexts lTexts = lAgent.retrieve().texts();
            ASSERT_EQ(lTexts.size(), 3u);
            EXPECT_EQ(lTexts[0], sRecord(lcrKind, 1, lcrKind.mRecordHex));
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
            {sEvent(lcrKind, lcrKind.mData), ZTSLibraryEvent::bare(0, 2, 0x01), sEvent(lcrKind, lcrKind.mData)});
        EXPECT_EQ(lAgent.retrieve().texts(),
                  (ZTCTexts{sRecord(lcrKind, 1, lcrKind.mRecordHex), sRecord(2, 1, 1, "01000000"),
                            sRecord(lcrKind, 1, lcrKind.mRecordHex)}));
    }
}

TEST(Consolidation, TheSameEventOnAnotherBoardInBetweenGivesThreeRecords) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lOne = sRecord(lcrKind, 1, lcrKind.mRecordHex);
        lAgent.library().deliverAll(
            {sEvent(lcrKind, lcrKind.mData, 0), sEvent(lcrKind, lcrKind.mData, 1), sEvent(lcrKind, lcrKind.mData, 0)});
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
            lAgent.library().deliver(sEvent(lcrKind, lcrKind.mData));
            EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 1, lcrKind.mRecordHex)});
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
        lAgent.library().deliverAll({sEvent(lcrKind, lcrKind.mData), sEvent(lcrKind, lcrKind.mSameIdentity)});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 2, lcrKind.mContinuedHex, lNames)});
    }
    for (const ZTSBareKind& lcrKind : bareKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(lcrKind.mEvent);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind.mCategory, lcrKind.mSubcategory, 1, "01000000")});
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
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(4, lSubcategory, 3, qFullRecord(gcRemotePort, {3, 9}))});

        for (std::uint32_t lLun : {0u, 7u, 8u, 255u, 256u, 0xFFFFFFFEu, 255u}) {
            lDeliver(lLun);
        }
        EXPECT_EQ(lAgent.retrieve().texts(),
                  ZTCTexts{sRecord(4, lSubcategory, 7, qFullRecord(gcRemotePort, {0, 7, 8, 255}))});

        lDeliver(300);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(4, lSubcategory, 1, qFullRecord(gcRemotePort, {}))});

        lDeliver(4);
        lDeliver(0xFFFFFFFF);
        lDeliver(5);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(4, lSubcategory, 3, allLunsRecord(gcRemotePort))});

        lDeliver(0xFFFFFFFF);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(4, lSubcategory, 1, allLunsRecord(gcRemotePort))});
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
              ZTCTexts{sRecord(4, 4, 4, checkConditionRecord(gcRemotePort, 5, 0x24, {0, 255}, {0, 255}, {0, 255}))});

    std::vector<unsigned> lAll;
    for (unsigned i = 0; i < 256; ++i) {
        lAll.push_back(i);
    }
    lDeliver(3, 0x28, 1);
    lDeliver(0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF);
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{sRecord(4, 4, 2, checkConditionRecord(gcRemotePort, 5, 0x24, lAll, {0x28}, {1}))});

    lDeliver(0xFFFFFFFF, 1000, 1000);
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{sRecord(4, 4, 1, checkConditionRecord(gcRemotePort, 5, 0x24, lAll, {}, {}))});
}

TEST(Consolidation, ACheckConditionWithUnknownSenseDataIsARecordOfItsOwn) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(
        0, 4, 0x04, checkConditionData(gcRemotePort, 1, 0x12, 0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF)));
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{sRecord(4, 4, 1, checkConditionRecord(gcRemotePort, 0xFFFFFFFF, 0xFFFFFFFF, {1}, {0x12}, {}))});
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
        const std::vector<ZTSLibraryEvent> lEvents{sEvent(lcrKind, lcrKind.mData),
                                                   sEvent(lcrKind, lcrKind.mSameIdentity),
                                                   sEvent(lcrKind, lcrKind.mSameIdentity)};
        // A new record from the second event's data: its head is the first record's, with the appended part's values.
        lAgent.startScope(lFirst + 2 * lMore + 1);
        lAgent.library().deliverAll(lEvents);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 3, lcrKind.mRecordHex + lTail + lTail)});

        lAgent.startScope(lFirst + 2 * lMore);
        lAgent.library().deliverAll(lEvents);
        ZTCTexts lTexts = lAgent.retrieve().texts();
        ASSERT_EQ(lTexts.size(), 2u);
        EXPECT_EQ(lTexts[0], sRecord(lcrKind, 2, lcrKind.mContinuedHex));
        EXPECT_EQ(lTexts[1].size(), sRecord(lcrKind, 1, lcrKind.mRecordHex).size());

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
        lAgent.library().deliverAll({sEvent(lcrKind, lcrKind.mData), sEvent(lcrKind, lcrKind.mSameIdentity)});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(lcrKind, 2, lcrKind.mContinuedHex)});
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
    EXPECT_EQ(lAgent.retrieve().texts(), (ZTCTexts{sRecord(1, 8, 2, lHead(1) + ZTCByteWriter().le32(2).le32(102).hex()),
                                                   sRecord(1, 8, 2, lHead(3) + ZTCByteWriter().le32(4).le32(104).hex()),
                                                   sRecord(1, 8, 1, lHead(5))}));
}

TEST(Consolidation, UnknownKindsAreReportedAndIgnored) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    struct ZTSUnknown {
        unsigned mCategory;
        unsigned mSubcategory;
        const char* mpText;
    };
    for (const ZTSUnknown& lcrUnknown : {ZTSUnknown{1, 0x40, "Unknown ELS Event subcategory = 64, ignored"},
                                         ZTSUnknown{1, 0x03, "Unknown ELS Event subcategory = 3, ignored"},
                                         ZTSUnknown{2, 0x08, "Unknown Fabric Event subcategory=8, ignored"},
                                         ZTSUnknown{4, 0x80, "Unknown Scsi Event subcategory = 128, ignored"},
                                         ZTSUnknown{8, 0x08, "Unknown Board Evt catgory=8 subcatgory=8 ignored"},
                                         ZTSUnknown{16, 0x02, "Unknown Adapter Evt catgory=16 subcatgory=2 ignored"},
                                         ZTSUnknown{0, 0x02, "Unknown Category = 0 SubCategory = 2, ignored"},
                                         ZTSUnknown{32, 0x01, "Unknown Category = 32 SubCategory = 1, ignored"}}) {
        SCOPED_TRACE(lcrUnknown.mpText);
        lAgent.library().deliver(ZTSLibraryEvent::scope(0, lcrUnknown.mCategory, lcrUnknown.mSubcategory,
                                                        plogiData(gcRemotePort, gcRemoteNode)));
        EXPECT_EQ(lAgent.log().count(lcrUnknown.mpText, "-N-"), 1u);
    }
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Consolidation, OnlyTheLowEightBitsOfAKindCount) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 0x101, 0x1102, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{sRecord(1, 2, 1, ZTCByteWriter().le32(1).wwn(makeWwn(gcRemotePort)).hex())});
}

static std::uint64_t sNowInMicroseconds() {
    return static_cast<std::uint64_t>(
        std::chrono::duration_cast<std::chrono::microseconds>(std::chrono::system_clock::now().time_since_epoch())
            .count());
}

TEST(Consolidation, ANewRecordBeginsAndEndsWhenItsEventCame) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    const std::uint64_t lBefore = sNowInMicroseconds();
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 0x01));
    const std::uint64_t lAfter = sNowInMicroseconds();
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    ASSERT_EQ(lResponse.texts().size(), 1u);
    const ZTSEncodedRecord& lcrRecord = lResponse.mLists[0].mRecords[0];
    EXPECT_LE(lBefore, lcrRecord.mBegin.total());
    EXPECT_LE(lcrRecord.mBegin.total(), lcrRecord.mEnd.total());
    EXPECT_LE(lcrRecord.mEnd.total(), lAfter);

    const auto lSeconds = static_cast<std::time_t>(lcrRecord.mBegin.mEpochSeconds);
    std::tm lLocal{};
    ASSERT_NE(localtime_r(&lSeconds, &lLocal), nullptr);
    EXPECT_EQ(lcrRecord.mBegin.mYear, lLocal.tm_year + 1900);
    EXPECT_EQ(lcrRecord.mBegin.mMonth, lLocal.tm_mon + 1);
    EXPECT_EQ(lcrRecord.mBegin.mDay, lLocal.tm_mday);
    EXPECT_EQ(lcrRecord.mBegin.mHour, lLocal.tm_hour);
    EXPECT_EQ(lcrRecord.mBegin.mMinute, lLocal.tm_min);
    EXPECT_EQ(lcrRecord.mBegin.mSecond, lLocal.tm_sec);
}

TEST(Consolidation, TimesStandInTheAgentsTimeZone) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("TZ", "XYZ-5:30");
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 0x01));
    const ZTSEncodedDateTime lTime = lAgent.retrieve().mLists.at(0).mRecords.at(0).mBegin;
    const auto lShifted = static_cast<std::time_t>(lTime.mEpochSeconds + (5 * 60 + 30) * 60);
    std::tm lLocal{};
    ASSERT_NE(gmtime_r(&lShifted, &lLocal), nullptr);
    EXPECT_EQ(lTime.mDay, lLocal.tm_mday);
    EXPECT_EQ(lTime.mHour, lLocal.tm_hour);
    EXPECT_EQ(lTime.mMinute, lLocal.tm_min);
    EXPECT_EQ(lTime.mSecond, lLocal.tm_sec);
}

TEST(Consolidation, FurtherOccurrencesMoveTheEndTimeAlone) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(sEvent(lcrKind, lcrKind.mData));
        const std::uint64_t lBetween = sNowInMicroseconds();
        lAgent.library().deliver(sEvent(lcrKind, lcrKind.mSameIdentity));
        const ZTSEncodedRecord lRecord = lAgent.retrieve().mLists.at(0).mRecords.at(0);
        EXPECT_EQ(lRecord.mOccurrences, 2u);
        EXPECT_LE(lRecord.mBegin.total(), lBetween);
        EXPECT_GE(lRecord.mEnd.total(), lBetween);
    }
}
