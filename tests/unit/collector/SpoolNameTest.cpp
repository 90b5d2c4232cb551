#include "sensor/collector/include/SpoolName.h"

#include <gtest/gtest.h>

TEST(SpoolName, TextAndBackIsTheSame) {
    for (const ZTESpoolState lState : {ZTSPS_Part, ZTSPS_Frame, ZTSPS_Torn}) {
        const ZTSSpoolName lName{.mNumber = 18446744073709551615U, .mGeneration = "00ff9a", .mState = lState};
        EXPECT_EQ(parseSpoolName(lName.toText()), lName);
    }
    EXPECT_EQ((ZTSSpoolName{.mNumber = 7, .mGeneration = "ab", .mState = ZTSPS_Torn}.toText()), "7.ab.torn");
}

TEST(SpoolName, OtherNamesAreNotTaken) {
    for (const char* lpText : {"",
                               ".",
                               "..",
                               "7",
                               "7.ab",
                               "7.ab.",
                               "7.ab.frames",
                               "7.ab.FRAME",
                               "7.ab.frame.part",
                               ".ab.frame",
                               "7..frame",
                               "07.ab.frame",
                               "+7.ab.frame",
                               "-7.ab.frame",
                               "7x.ab.frame",
                               "7.AB.frame",
                               "7.xy.frame",
                               "7.a/b.frame",
                               "18446744073709551616.ab.frame",
                               " 7.ab.frame"}) {
        EXPECT_FALSE(parseSpoolName(lpText)) << lpText;
    }
}

TEST(SpoolName, AGenerationHasAtMost64Digits) {
    EXPECT_TRUE(parseSpoolName("1." + std::string(64, 'a') + ".part"));
    EXPECT_FALSE(parseSpoolName("1." + std::string(65, 'a') + ".part"));
}
