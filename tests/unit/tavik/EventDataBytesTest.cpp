#include "tavik/include/EventDataBytes.h"

#include <gtest/gtest.h>

#include <bit>

#include "tests/support/Bytes.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"

TEST(EventDataBytes, EachBitLivesInItsByteCountedFromTheLeastSignificantBit) {
    for (unsigned lBit = 0; lBit < 256; ++lBit) {
        ZTCBytes lField(32, 0);
        TavikSet_BitField(lField.data(), lBit);
        ASSERT_EQ(bitFieldHex({lBit}), hexOf(lField)) << lBit;
    }
}

TEST(EventDataBytes, SettingABitLeavesTheOthers) {
    ZTCBytes lField(32, 0);
    TavikSet_BitField(lField.data(), 3);
    TavikSet_BitField(lField.data(), 9);
    TavikSet_BitField(lField.data(), 9);
    TavikSet_BitField(lField.data(), 255);
    EXPECT_EQ(bitFieldHex({3, 9, 255}), hexOf(lField));
}

TEST(EventDataBytes, SettingAllBitsStopsAtTheCount) {
    ZTCBytes lField(34, 0);
    TavikSet_AllBitField(lField.data(), 32);
    EXPECT_EQ(std::string(64, 'f') + "0000", hexOf(lField));
}

TEST(EventDataBytes, TellsTheHostsByteOrder) {
    EXPECT_EQ(std::endian::native == std::endian::little, TavikIsLittleEndian());
}

TEST(EventDataBytes, ReversesInPlaceAndLeavesFewerThanTwoBytes) {
    const char* const lExpected[] = {"0102030405", "0102030405", "0201030405",
                                     "0302010405", "0403020105", "0504030201"};
    for (unsigned lCount = 0; lCount <= 5; ++lCount) {
        ZTCBytes lBytes = bytesOf("0102030405");
        TavikReverseBytes(lBytes.data(), lCount);
        EXPECT_EQ(lExpected[lCount], hexOf(lBytes));
    }
}

TEST(EventDataBytes, StoresIntegersLittleEndianAtAnyAddress) {
    ZTCBytes lBytes(6, 0xEE);
    TavikStore32(lBytes.data() + 1, 0x01020304);
    EXPECT_EQ("ee04030201ee", hexOf(lBytes));
}
