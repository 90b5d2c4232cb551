#include "libkpm/common/include/PortName.h"

#include <gtest/gtest.h>

static constexpr HBA_wwn scName{{0x10, 0, 0, 0, 0xC9, 0, 0xAB, 0x0B}};
static constexpr HBA_wwn scOnes{{0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF}};

TEST(PortName, NamesAreTheSameWhereAllEightBytesAre) {
    for (unsigned lByte = 0; lByte < sizeof scName.wwn; ++lByte) {
        HBA_wwn lOther = scName;
        EXPECT_TRUE(isSameName(scName, lOther));
        lOther.wwn[lByte] ^= 1;
        EXPECT_FALSE(isSameName(scName, lOther)) << lByte;
    }
}

TEST(PortName, AllZerosAndAllOnesAreNoName) {
    EXPECT_TRUE(isName(scName));
    EXPECT_FALSE(isName(HBA_wwn{}));
    EXPECT_FALSE(isName(scOnes));
    EXPECT_TRUE(isZeroName(HBA_wwn{}));
    EXPECT_FALSE(isZeroName(scOnes));
    for (unsigned lByte = 0; lByte < sizeof scName.wwn; ++lByte) {
        HBA_wwn lOther = scOnes;
        lOther.wwn[lByte] = 0xFE;
        EXPECT_TRUE(isName(lOther)) << lByte;
        lOther = HBA_wwn{};
        lOther.wwn[lByte] = 1;
        EXPECT_TRUE(isName(lOther)) << lByte;
        EXPECT_FALSE(isZeroName(lOther)) << lByte;
    }
}

TEST(PortName, IsPrintedInTheUsualForm) {
    EXPECT_EQ(formatName(scName), "10:00:00:00:c9:00:ab:0b");
}
