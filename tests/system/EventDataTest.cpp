#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"
#include "tests/system/RecordTexts.h"

// What of an event counts: its kind, its size, and the bytes that its kind needs.

TEST(EventData, DataOneByteTooShortIsReportedWithBothLengthsAndDropped) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lMessage = lcrKind.tooShort(lcrKind.mMinimumLength - 1);
        const std::size_t lBefore = lAgent.log().count(lMessage, "-W-");
        ASSERT_EQ(lcrKind.mData.size(), lcrKind.mMinimumLength);
        lAgent.library().deliver(eventOf(lcrKind, ZTCBytes(lcrKind.mData.begin(), lcrKind.mData.end() - 1)));
        EXPECT_EQ(lAgent.log().count(lMessage, "-W-"), lBefore + 1);
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
    }
}

TEST(EventData, ALunResetOfTwelveBytesReportsTheTargetResetText) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 4, 0x08, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.log().count("Not enough data in SCSI TGTRESET Event 16 12", "-W-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(EventData, AnEventWithoutPayloadObjectHasLengthZeroWhateverItsSize) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lMessage = lcrKind.tooShort(0);
        const std::size_t lBefore = lAgent.log().count(lMessage, "-W-");
        ZTSLibraryEvent lEvent = eventOf(lcrKind, lcrKind.mData);
        lEvent.mPayload = ZTELibraryEventPayload::NullPayload;
        lAgent.library().deliver(lEvent);
        EXPECT_EQ(lAgent.log().count(lMessage, "-W-"), lBefore + 1);
    }
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(EventData, APayloadWithANullDataPointerHasLengthZeroWhateverItsSize) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    ZTSLibraryEvent lEvent = ZTSLibraryEvent::scope(0, 1, 0x01, plogiData(gcRemotePort, gcRemoteNode));
    lEvent.mPayload = ZTELibraryEventPayload::NullData;
    lAgent.library().deliver(lEvent);
    EXPECT_EQ(lAgent.log().count("Not enough data in ELS PLOGI Event 20 0", "-W-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(EventData, ASizeBelowTheHeaderCountsAsNoData) {
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

TEST(EventData, OnlyTheLowHalfOfAnEventsSizeCounts) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    ZTSLibraryEvent lEvent = ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort));
    lEvent.mSize |= 0xABCD000000000000;
    lAgent.library().deliver(lEvent);
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{recordText(1, 2, 1, ZTCByteWriter().le32(1).wwn(makeWwn(gcRemotePort)).hex())});
}

TEST(EventData, BytesBehindAKindsStructureAreIgnored) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(eventOf(lcrKind, ZTCByteWriter().raw(lcrKind.mData).fill(100, 0xDB).bytes()));
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 1, lcrKind.mRecordHex)});
    }
}

TEST(EventData, EventsAtOddAddressesAreRecordedLikeAnyOther) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        ZTSLibraryEvent lFirst = eventOf(lcrKind, lcrKind.mData);
        ZTSLibraryEvent lSecond = eventOf(lcrKind, lcrKind.mSameIdentity);
        lFirst.mIsMisaligned = lSecond.mIsMisaligned = true;
        lAgent.library().deliverAll({lFirst, lSecond});
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{recordText(lcrKind, 2, lcrKind.mContinuedHex)});
    }
    for (ZTSLibraryEvent lEvent : {ZTSLibraryEvent::link(0, ZTCScriptedLibrary::portName(0)),
                                   ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203}))}) {
        lEvent.mIsMisaligned = true;
        lAgent.library().deliver(lEvent);
    }
    EXPECT_EQ(lAgent.retrieve().texts(),
              (ZTCTexts{recordText(8, 2, 1, "01000000"), recordText(1, 0x20, 1, rscnRecord(0x00010203))}));
}

TEST(EventData, UnknownKindsAreReportedAndIgnored) {
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

TEST(EventData, OnlyTheLowEightBitsOfAKindCount) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 0x101, 0x1102, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.retrieve().texts(),
              ZTCTexts{recordText(1, 2, 1, ZTCByteWriter().le32(1).wwn(makeWwn(gcRemotePort)).hex())});
}
