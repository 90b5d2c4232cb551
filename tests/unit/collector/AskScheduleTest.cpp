#include "sensor/collector/include/AskSchedule.h"

#include <gtest/gtest.h>

#include "tests/support/Seed.h"

using std::chrono::milliseconds;
using std::chrono::seconds;

class AskScheduleTest : public testing::Test {
protected:
    /// Lets time pass until a look is due; fails where that is later than allowed.
    void passUntilDue(milliseconds aAtMost) {
        ASSERT_LE(mSchedule.getNextLook(), mNow + aAtMost);
        mNow = std::max(mNow, mSchedule.getNextLook());
        ASSERT_TRUE(mSchedule.isDue(mNow));
    }
    bool look(std::optional<bool> aIsHolding) { return mSchedule.look(mNow, aIsHolding); }
    void answerAfter(milliseconds aTime) {
        mNow += aTime;
        mSchedule.noteAnswer(mNow);
    }

    ZTCAskSchedule::ZTCTime mNow{seconds(1000)};
    ZTCAskSchedule mSchedule{seconds(5), mNow};
};

TEST_F(AskScheduleTest, TheFirstLookAsksAtOnceWhateverThePageShows) {
    EXPECT_TRUE(mSchedule.isDue(mNow));
    EXPECT_TRUE(look(false));
}

TEST_F(AskScheduleTest, ANewAgentIsAskedAtOnce) {
    look(false);
    EXPECT_FALSE(mSchedule.isDue(mNow));
    mSchedule.noteStart(mNow);
    EXPECT_TRUE(mSchedule.isDue(mNow));
    EXPECT_TRUE(look(false));
}

TEST_F(AskScheduleTest, WhereNothingIsHeldNothingIsAsked) {
    look(false);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(mSchedule.getNextLook(), mNow + seconds(5));
        passUntilDue(seconds(5));
        EXPECT_FALSE(look(false));
    }
}

TEST_F(AskScheduleTest, WhereSomethingIsHeldItIsAskedForEveryPeriod) {
    look(false);
    passUntilDue(seconds(5));
    EXPECT_TRUE(look(true));
    answerAfter(milliseconds(3));
    EXPECT_FALSE(mSchedule.isDue(mNow));
    EXPECT_FALSE(mSchedule.isUrgent());
}

TEST_F(AskScheduleTest, WithoutAPageItIsAskedEveryPeriod) {
    look({});
    passUntilDue(seconds(5));
    EXPECT_TRUE(look({}));
    mSchedule.noteBell(mNow);
    EXPECT_TRUE(look({}));
    EXPECT_EQ(mSchedule.getNextLook(), mNow + seconds(5));
}

TEST_F(AskScheduleTest, ABellIsHeardAtOnce) {
    look(false);
    mSchedule.noteBell(mNow);
    EXPECT_TRUE(mSchedule.isDue(mNow));
    EXPECT_TRUE(look(true));
}

TEST_F(AskScheduleTest, AfterABellItAsksAtLeastEverySecondUntilNothingIsHeld) {
    look(false);
    mSchedule.noteBell(mNow);
    look(true);
    for (int i = 0; i < 10; ++i) {
        answerAfter(milliseconds(20));
        passUntilDue(milliseconds(980));
        EXPECT_TRUE(look(true));
    }
    answerAfter(milliseconds(20));
    passUntilDue(milliseconds(980));
    EXPECT_FALSE(look(false));
    EXPECT_EQ(mSchedule.getNextLook(), mNow + seconds(5));
}

TEST_F(AskScheduleTest, AfterABellAQuickAnswerIsNotFollowedByARequestAtOnce) {
    look(false);
    mSchedule.noteBell(mNow);
    look(true);
    answerAfter(milliseconds(20));
    EXPECT_EQ(mSchedule.getNextLook(), mNow + milliseconds(480));
}

TEST_F(AskScheduleTest, ABellDuringAnAnswerIsHeardAfterIt) {
    look(false);
    mSchedule.noteBell(mNow);
    look(true);
    mNow += milliseconds(10);
    mSchedule.noteBell(mNow);
    answerAfter(milliseconds(10));
    EXPECT_TRUE(mSchedule.isDue(mNow));
}

TEST_F(AskScheduleTest, AnAnswerLaterThanThePauseIsFollowedByALookAtOnce) {
    look(false);
    mSchedule.noteBell(mNow);
    look(true);
    answerAfter(seconds(7));
    EXPECT_TRUE(mSchedule.isDue(mNow));
}

TEST_F(AskScheduleTest, AnAskThatWasNotPossibleIsTriedAgainWithinASecond) {
    look(true);
    mSchedule.notePostponed(mNow);
    passUntilDue(seconds(1));
    EXPECT_TRUE(look(true));
}

TEST_F(AskScheduleTest, AShortPeriodHoldsAlsoAfterABell) {
    mSchedule.setPeriod(milliseconds(100));
    look(true);
    mSchedule.noteBell(mNow);
    look(true);
    answerAfter(milliseconds(1));
    passUntilDue(milliseconds(100));
}

TEST_F(AskScheduleTest, WhateverHappensALookComesWithinThePeriodAndWithinASecondAfterABell) {
    ZTCTestSeed lSeed;
    for (int i = 0; i < 20000; ++i) {
        mNow += milliseconds(lSeed.below(300));
        switch (lSeed.below(5)) {
            case 0:
                mSchedule.noteBell(mNow);
                break;
            case 1:
                mSchedule.noteAnswer(mNow);
                break;
            case 2:
                mSchedule.notePostponed(mNow);
                break;
            default:
                if (mSchedule.isDue(mNow)) {
                    look(lSeed.below(2) == 0);
                }
        }
        ASSERT_LE(mSchedule.getNextLook(), mNow + (mSchedule.isUrgent() ? seconds(1) : seconds(5)));
    }
}
