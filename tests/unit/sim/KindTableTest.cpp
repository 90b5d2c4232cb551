#include "libkpm/sim/src/KindTable.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <set>
#include <string>
#include <vector>

TEST(KindTable, NoFieldNameOfAKindStandsTwice) {
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        std::set<std::string> lNames;
        for (const ZTSSimField& lrField : getSimKind(lKind).mFields) {
            EXPECT_TRUE(lNames.insert(lrField.mpName).second) << getSimKind(lKind).mpName << ' ' << lrField.mpName;
        }
    }
}

TEST(KindTable, NumbersAreStoredInTheOrderOfTheirForm) {
    const ZTSSimField lHost{"h", ZTSFF_Number, 0, 4, ZTSDF_Constant, 0, 0, ""};
    const ZTSSimField lNetwork{"n", ZTSFF_BigEndian, 0, 2, ZTSDF_Constant, 0, 0, ""};
    std::uint32_t lNumber = 0;
    storeSimNumber(lHost, 0x01020304, reinterpret_cast<std::uint8_t*>(&lNumber));
    EXPECT_EQ(lNumber, 0x01020304u);
    std::vector<std::uint8_t> lBytes(2);
    storeSimNumber(lNetwork, 0x0102, lBytes.data());
    EXPECT_EQ(lBytes, (std::vector<std::uint8_t>{1, 2}));
}
