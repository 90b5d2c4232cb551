#include "sensor/client/include/FcName.h"

#include <gtest/gtest.h>

#include "sensor/client/include/ClientErrors.h"

TEST(FcName, PrintsAsLowerCasePairsWithColons) {
    const ZTSFcName lName{{0x50, 0x06, 0x01, 0x60, 0x3B, 0xA0, 0x12, 0x34}};
    EXPECT_EQ(lName.toText(), "50:06:01:60:3b:a0:12:34");
}

TEST(FcName, ReadsPairsInEitherCaseAndPlainDigits) {
    const ZTSFcName lName{{0x50, 0x06, 0x01, 0x60, 0x3B, 0xA0, 0x12, 0x34}};
    for (const char* lpText :
         {"50:06:01:60:3b:a0:12:34", "50:06:01:60:3B:A0:12:34", "500601603ba01234", "0x500601603BA01234"}) {
        EXPECT_EQ(ZTSFcName::fromText(lpText), lName) << lpText;
    }
}

TEST(FcName, RefusesWhateverIsNoName) {
    for (const char* lpText : {"", "50", "50:06:01:60:3b:a0:12", "50:06:01:60:3b:a0:12:3",
                               "50:06:01:60:3b:a0:12:34:", "50-06-01-60-3b-a0-12-34", "5g:06:01:60:3b:a0:12:34",
                               "500601603ba0123", "0x500601603ba012345", "0x:06:01:60:3b:a0:12:34", "0x",
                               "50:06:01:60:3b:a0:1234:", "50:06:01:603b::a0:12:34"}) {
        EXPECT_THROW(ZTSFcName::fromText(lpText), ZTCBadInputEx) << lpText;
    }
}
