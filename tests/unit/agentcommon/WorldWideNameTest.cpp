#include "sensor/agentcommon/include/WorldWideName.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "common/include/Exception.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"

static const unsigned char scBytes[] = {0x50, 0x06, 0x01, 0x60, 0x3b, 0xa0, 0x12, 0x34};

TEST(WorldWideName, IsTheZeroNameUntilItIsGivenBytes) {
    EXPECT_STREQ("00:00:00:00:00:00:00:00", ZTCWorldWideName().getString().get());
    EXPECT_EQ(0u, ZTCWorldWideName().getKey());
}

TEST(WorldWideName, PrintsAsLowerCaseHexPairsWithColons) {
    EXPECT_STREQ("50:06:01:60:3b:a0:12:34", ZTCWorldWideName(scBytes).getString().get());
    const unsigned char lHigh[] = {0xff, 0xfe, 0x0a, 0xa0, 0x09, 0x90, 0xbc, 0xde};
    EXPECT_STREQ("ff:fe:0a:a0:09:90:bc:de", ZTCWorldWideName(lHigh).getString().get());
}

TEST(WorldWideName, StoresItsTextWithoutAnEnd) {
    char lText[ZTCWorldWideName::gcStringLength + 1];
    std::memset(lText, '#', sizeof lText);
    EXPECT_EQ(lText + ZTCWorldWideName::gcStringLength, ZTCWorldWideName(scBytes).storeString(lText));
    EXPECT_EQ("50:06:01:60:3b:a0:12:34#", std::string(lText, sizeof lText));
}

TEST(WorldWideName, KeyIsTheEightBytesCopiedInHostOrder) {
    unsigned long lExpected = 0;
    std::memcpy(&lExpected, scBytes, sizeof lExpected);
    EXPECT_EQ(lExpected, ZTCWorldWideName(scBytes).getKey());
    if constexpr (__BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__) {
        EXPECT_EQ(0x3412a03b60010650ul, ZTCWorldWideName(scBytes).getKey());
    }
}

TEST(WorldWideName, OwnsItsBytes) {
    unsigned char lBytes[8];
    std::memcpy(lBytes, scBytes, sizeof lBytes);
    const ZTCWorldWideName lName(lBytes);
    std::memset(lBytes, 0xEE, sizeof lBytes);
    EXPECT_EQ(0, std::memcmp(lName.getBytes(), scBytes, sizeof scBytes));
}

TEST(WorldWideName, ComparesByValueInEveryByte) {
    for (unsigned lByte = 0; lByte < sizeof scBytes; ++lByte) {
        unsigned char lOther[8];
        std::memcpy(lOther, scBytes, sizeof lOther);
        EXPECT_TRUE(ZTCWorldWideName(scBytes) == ZTCWorldWideName(lOther));
        lOther[lByte] ^= 0x80;
        EXPECT_FALSE(ZTCWorldWideName(scBytes) == ZTCWorldWideName(lOther)) << "byte " << lByte;
    }
}

TEST(WorldWideName, EncodesAsItsEightBytesInWireOrder) {
    EXPECT_EQ("500601603ba01234", hexOf(encodingOf(ZTCWorldWideName(scBytes))));
}

TEST(WorldWideName, DecodesEightBytesAndLeavesTheRest) {
    ZTCEncodableInStream lStream(makeBuffer(bytesOf("500601603ba01234 2000000000000001 77")));
    ZTCWorldWideName lFirst;
    ZTCWorldWideName lSecond;
    lFirst.decode(lStream);
    lSecond.decode(lStream);
    EXPECT_STREQ("50:06:01:60:3b:a0:12:34", lFirst.getString().get());
    EXPECT_STREQ("20:00:00:00:00:00:00:01", lSecond.getString().get());
    EXPECT_EQ(1u, lStream.remaining());
}

TEST(WorldWideName, DecodingPastTheEndThrowsAndLeavesTheNameAndTheStream) {
    for (std::size_t lLength = 0; lLength < 8; ++lLength) {
        ZTCEncodableInStream lStream(makeBuffer(ZTCBytes(lLength, 0xAA)));
        ZTCWorldWideName lName(scBytes);
        try {
            lName.decode(lStream);
            ADD_FAILURE() << "no exception for " << lLength << " bytes";
        } catch (const ZTCInvalidEx& lcrException) {
            EXPECT_STREQ("Not enough data in stream", lcrException.what());
            EXPECT_EQ(6u, lcrException.getError());
        }
        EXPECT_TRUE(lName == ZTCWorldWideName(scBytes));
        EXPECT_EQ(lLength, lStream.remaining());
    }
}
