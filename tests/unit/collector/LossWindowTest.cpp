#include "sensor/collector/include/LossWindow.h"

#include <gtest/gtest.h>

using std::chrono::hours;
using std::chrono::minutes;

class LossWindowTest : public testing::Test {
protected:
    ZTSStatusSnapshot page(const std::string& acrStartId, std::uint64_t aRefused, ZTCHistoryTime aStarted) {
        ZTSStatusSnapshot lPage;
        lPage.mStartId = acrStartId;
        lPage.mStartTime = toMicroseconds(aStarted);
        lPage.mBoards.resize(1);
        lPage.mBoards[0].mRows[3].mRefused[ZTSR_TotalLimit] = aRefused;
        lPage.mBoards[0].mRows[4].mDropped = aRefused / 10;
        lPage.mUnknownBoards.mRefused[ZTSR_UnknownBoard] = 1;
        lPage.mLosses.push_back({.mName = "ring", .mTotal = 2 * aRefused});
        return lPage;
    }
    std::uint64_t refused(ZTCHistoryTime aNow) { return mWindow.get(aNow).mRefused.at("total-limit"); }

    const ZTCHistoryTime mBegin{hours(1000)};
    ZTCLossWindow mWindow{mBegin};
};

TEST_F(LossWindowTest, CountsWhatGrows) {
    mWindow.note(page("a", 10, mBegin + minutes(1)), mBegin + minutes(2));
    mWindow.note(page("a", 30, mBegin + minutes(1)), mBegin + minutes(3));
    const ZTSLosses lLosses = mWindow.get(mBegin + minutes(3));
    EXPECT_EQ(lLosses.mRefused.at("total-limit"), 30U);
    EXPECT_EQ(lLosses.mRefused.at("unknown-board"), 1U);
    EXPECT_EQ(lLosses.mRefused.at("failed"), 0U);
    EXPECT_EQ(lLosses.mDropped, 3U);
    EXPECT_EQ(lLosses.mLibrary.at("ring"), 60U);
    EXPECT_EQ(lLosses.mSince, mBegin);
}

TEST_F(LossWindowTest, AnotherStartBeginsAtZero) {
    mWindow.note(page("a", 10, mBegin + minutes(1)), mBegin + minutes(2));
    mWindow.note(page("b", 4, mBegin + minutes(5)), mBegin + minutes(6));
    EXPECT_EQ(refused(mBegin + minutes(6)), 14U);
}

TEST_F(LossWindowTest, WhatAnAgentLostBeforeThisProcessBeganIsNotKnown) {
    mWindow.note(page("a", 10, mBegin - hours(1)), mBegin + minutes(2));
    EXPECT_EQ(refused(mBegin + minutes(2)), 0U);
    mWindow.note(page("a", 12, mBegin - hours(1)), mBegin + minutes(3));
    EXPECT_EQ(refused(mBegin + minutes(3)), 2U);
}

TEST_F(LossWindowTest, WhatIsOlderThanADayIsForgotten) {
    mWindow.note(page("a", 10, mBegin), mBegin + minutes(2));
    mWindow.note(page("a", 11, mBegin), mBegin + hours(20));
    EXPECT_EQ(refused(mBegin + hours(20)), 11U);
    EXPECT_EQ(refused(mBegin + hours(26)), 1U);
    EXPECT_EQ(mWindow.get(mBegin + hours(26)).mSince, mBegin + hours(2));
    EXPECT_EQ(refused(mBegin + hours(50)), 0U);
}

TEST_F(LossWindowTest, WhatWasLostLateInAnHourIsNotForgottenWithTheHoursBegin) {
    mWindow.note(page("a", 10, mBegin), mBegin + minutes(2));
    mWindow.note(page("a", 15, mBegin), mBegin + minutes(50));
    EXPECT_EQ(refused(mBegin + hours(24) + minutes(30)), 15U);
    EXPECT_EQ(refused(mBegin + hours(25) + minutes(3)), 0U);
}
