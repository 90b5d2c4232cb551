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

TEST_F(LossWindowTest, LossesOfTheLastHourAreToldApartByTheMinute) {
    mWindow.note(page("a", 10, mBegin), mBegin + minutes(2));
    mWindow.note(page("a", 15, mBegin), mBegin + minutes(20));
    const ZTCHistoryTime lNow = mBegin + minutes(25);
    EXPECT_EQ(mWindow.get(lNow, lNow - minutes(10)).mRefused.at("total-limit"), 5U);
    EXPECT_EQ(mWindow.get(lNow, lNow - minutes(10)).mSince, lNow - minutes(10));
    EXPECT_EQ(mWindow.get(lNow, lNow - minutes(4)).mRefused.at("total-limit"), 0U);
    EXPECT_EQ(mWindow.get(lNow, lNow - hours(1)).mRefused.at("total-limit"), 15U);
    EXPECT_EQ(mWindow.get(lNow, lNow - hours(1)).mSince, mBegin);
}

TEST_F(LossWindowTest, TheNextProcessGoesOnFromTheText) {
    mWindow.note(page("a", 10, mBegin), mBegin + minutes(2));
    ZTCLossWindow lNext(mBegin + minutes(9));
    ASSERT_TRUE(lNext.restore(mWindow.toText()));
    // The same start goes on: what was counted is not counted again.
    EXPECT_TRUE(lNext.note(page("a", 12, mBegin), mBegin + minutes(10)));
    const ZTSLosses lLosses = lNext.get(mBegin + minutes(10));
    EXPECT_EQ(lLosses.mRefused.at("total-limit"), 12U);
    EXPECT_EQ(lLosses.mRefused.at("unknown-board"), 1U);
    EXPECT_EQ(lLosses.mLibrary.at("ring"), 24U);
    EXPECT_EQ(lLosses.mSince, mBegin);
    // An agent that began between the two is counted from its begin.
    EXPECT_TRUE(lNext.note(page("b", 3, mBegin + minutes(5)), mBegin + minutes(11)));
    EXPECT_EQ(lNext.get(mBegin + minutes(11)).mRefused.at("total-limit"), 15U);
}

TEST_F(LossWindowTest, OtherTextsChangeNothing) {
    mWindow.note(page("a", 10, mBegin), mBegin + minutes(2));
    const std::string lText = mWindow.toText();
    for (const std::string& lrText : {std::string(), std::string("{}"), std::string("[1]"), lText.substr(1),
                                      lText.substr(0, lText.size() / 2), std::string(R"({"begin":"soon"})")}) {
        EXPECT_FALSE(mWindow.restore(lrText)) << lrText;
        EXPECT_EQ(mWindow.toText(), lText);
    }
}

TEST_F(LossWindowTest, ItsTextChangesOnlyWhereSomethingWasLost) {
    EXPECT_TRUE(mWindow.note(page("a", 10, mBegin), mBegin + minutes(2)));
    const std::string lText = mWindow.toText();
    EXPECT_FALSE(mWindow.note(page("a", 10, mBegin), mBegin + minutes(9)));
    EXPECT_EQ(mWindow.toText(), lText);
}

TEST_F(LossWindowTest, ADayOfConstantLossesStaysSmall) {
    for (unsigned i = 1; i <= 24 * 60; ++i) {
        mWindow.note(page("a", i, mBegin), mBegin + minutes(i));
    }
    EXPECT_EQ(refused(mBegin + hours(24)), 24U * 60);
    EXPECT_LT(mWindow.toText().size(), 32U * 1024);
}

TEST_F(LossWindowTest, AClockThatWasSetBackKeepsTheLosses) {
    mWindow.note(page("a", 10, mBegin), mBegin + hours(24 * 30));
    const ZTCHistoryTime lNow = mBegin + minutes(5);
    EXPECT_EQ(refused(lNow), 10U);
    EXPECT_EQ(refused(lNow + hours(25)), 0U);
}
