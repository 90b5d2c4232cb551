#include "libkpm/linux/src/Losses.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

class Losses : public testing::Test {
protected:
    std::vector<std::string> mLines;
    ZTCLinuxLosses mLosses{[this](const std::string& acrText) { mLines.push_back(acrText); }};
    ZTCLinuxLosses::Clock::time_point mNow{};
};

TEST_F(Losses, NothingLostIsNothingSaid) {
    mLosses.count(ZTLO_TraceOverrun, 0);
    mLosses.tell(mNow);
    mLosses.tellAll();
    EXPECT_TRUE(mLines.empty());
}

TEST_F(Losses, EachKindIsSaidAtMostOnceASecondWithItsTotal) {
    mLosses.count(ZTLO_TraceOverrun, 5);
    mLosses.tell(mNow);
    mLosses.count(ZTLO_TraceOverrun, 2);
    mLosses.tell(mNow + std::chrono::milliseconds(999));
    EXPECT_EQ(mLines, std::vector<std::string>{"5 SCSI outcomes are lost: a trace buffer overran (5 since the start)"});
    mLosses.tell(mNow + std::chrono::milliseconds(1000));
    EXPECT_EQ(mLines.back(), "2 SCSI outcomes are lost: a trace buffer overran (7 since the start)");
    mLosses.tell(mNow + std::chrono::milliseconds(5000));
    EXPECT_EQ(mLines.size(), 2u);
}

TEST_F(Losses, OneKindDoesNotSilenceAnother) {
    for (std::size_t lKind = 0; lKind < gcLinuxLossCount; ++lKind) {
        mLosses.count(static_cast<ZTELinuxLoss>(lKind));
        mLosses.tell(mNow);
        EXPECT_EQ(mLines.size(), lKind + 1);
    }
}

TEST_F(Losses, WhatIsLeftIsSaidAtTheEnd) {
    mLosses.count(ZTLO_ForeignMessage);
    mLosses.tell(mNow);
    mLosses.count(ZTLO_ForeignMessage, 41);
    mLosses.tell(mNow);
    mLosses.tellAll();
    ASSERT_EQ(mLines.size(), 2u);
    EXPECT_EQ(mLines[1], "41 FC messages are dropped: the kernel did not send them (42 since the start)");
    mLosses.tellAll();
    EXPECT_EQ(mLines.size(), 2u);
}
