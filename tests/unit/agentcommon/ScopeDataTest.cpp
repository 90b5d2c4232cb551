#include "sensor/agentcommon/include/ScopeData.h"

#include <gtest/gtest.h>

#include "tests/unit/agentcommon/support/BufferBytes.h"

static ZTCPointer<ZTCScopeEvent> sMakeEvent(unsigned char aCategory, unsigned char aSubcategory) {
    return ZTCPointer<ZTCScopeEvent>(new ZTCScopeEvent(aCategory, aSubcategory));
}

static ZTCPointer<ZTCWorldWideName> sMakeName(std::uint64_t aValue) {
    return ZTCPointer<ZTCWorldWideName>(new ZTCWorldWideName(makeWwn(aValue).mBytes.data()));
}

static std::string sDataHex(ZTCScopeData& arData) {
    return hexOf(ZTCBytes(arData.getEventData(), arData.getEventData() + arData.getEventDataSize()));
}

TEST(ScopeData, EncodesWithoutNamesByteForByte) {
    const ZTCBytes lBytes = bytesOf("01000000 aabb");
    const ZTCScopeData lData(sMakeEvent(4, 0x10), lBytes.data(), 6, 900);
    EXPECT_EQ(hexOf(bytesOf("04 10 00  00000006 01000000aabb")), hexOf(encodingOf(lData)));
}

TEST(ScopeData, EncodesPortNameBeforeNodeNameByteForByte) {
    const ZTCBytes lBytes = bytesOf("01000000");
    const ZTCScopeData lData(sMakeEvent(1, 0x20), lBytes.data(), 4, 900, sMakeName(0x500601603ba01234),
                             sMakeName(0x200000000000beef));
    EXPECT_EQ(hexOf(bytesOf("01 20 01  500601603ba01234 200000000000beef  00000004 01000000")),
              hexOf(encodingOf(lData)));
}

TEST(ScopeData, CopiesTheFirstData) {
    ZTCBytes lBytes = bytesOf("0102030405");
    ZTCScopeData lData(sMakeEvent(1, 1), lBytes.data(), 5, 900);
    lBytes.assign(5, 0xEE);
    EXPECT_EQ("0102030405", sDataHex(lData));
}

TEST(ScopeData, CopiesTheNames) {
    const ZTCPointer<ZTCWorldWideName> lPort = sMakeName(1);
    const ZTCPointer<ZTCWorldWideName> lNode = sMakeName(2);
    const unsigned char lByte = 7;
    const ZTCScopeData lData(sMakeEvent(1, 1), &lByte, 1, 900, lPort, lNode);
    *lPort = ZTCWorldWideName();
    *lNode = ZTCWorldWideName();
    EXPECT_EQ(hexOf(bytesOf("01 01 01 0000000000000001 0000000000000002 00000001 07")), hexOf(encodingOf(lData)));
}

TEST(ScopeData, AcceptsACapacityOfZeroAndKeepsTheFirstData) {
    const ZTCBytes lBytes(128, 0x5A);
    ZTCScopeData lData(sMakeEvent(4, 4), lBytes.data(), 128, 0);
    EXPECT_EQ(0u, lData.getCapacity());
    EXPECT_EQ(128u, lData.getEventDataSize());
    EXPECT_EQ(hexOf(lBytes), sDataHex(lData));
}

TEST(ScopeData, TakesTheLargestCapacityAsABoundAndReservesNothing) {
    const unsigned char lByte = 1;
    const ZTCScopeData lData(sMakeEvent(1, 1), &lByte, 1, 0xFFFFFFFF);
    EXPECT_EQ(0xFFFFFFFFu, lData.getCapacity());
    EXPECT_EQ(1u, lData.getEventDataSize());
}

TEST(ScopeData, AppendsBehindWhatIsThereAlsoPastItsCapacity) {
    const ZTCBytes lBytes = bytesOf("01000000");
    ZTCScopeData lData(sMakeEvent(1, 8), lBytes.data(), 4, 4);
    const ZTCBytes lMore = bytesOf("a1a2a3");
    for (unsigned lRound = 0; lRound < 1000; ++lRound) {
        lData.appendEventData(lMore.data(), 3);
    }
    ASSERT_EQ(3004u, lData.getEventDataSize());
    std::string lExpected = "01000000";
    for (unsigned lRound = 0; lRound < 1000; ++lRound) {
        lExpected += "a1a2a3";
    }
    EXPECT_EQ(lExpected, sDataHex(lData));
    EXPECT_EQ("01080000000bbc" + lExpected, hexOf(encodingOf(lData)));
}

TEST(ScopeData, AppendingNothingChangesNothing) {
    const ZTCBytes lBytes = bytesOf("01020304");
    ZTCScopeData lData(sMakeEvent(1, 8), lBytes.data(), 4, 4);
    lData.appendEventData(lBytes.data(), 0);
    EXPECT_EQ("01020304", sDataHex(lData));
}

TEST(ScopeData, HandsItsBytesOutForChangesInPlace) {
    const ZTCBytes lBytes(48, 0);
    ZTCScopeData lData(sMakeEvent(4, 1), lBytes.data(), 48, 4096);
    lData.getEventData()[17] = 0x80;
    ZTCBytes lExpected(48, 0);
    lExpected[17] = 0x80;
    EXPECT_EQ(hexOf(lExpected), sDataHex(lData));
}

TEST(ScopeData, AnswersTheKindOfItsEvent) {
    const unsigned char lByte = 1;
    const ZTCScopeData lData(sMakeEvent(255, 254), &lByte, 1, 0);
    EXPECT_EQ(255, lData.getCategory());
    EXPECT_EQ(254, lData.getSubcategory());
}
