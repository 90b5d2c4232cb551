#include "sensor/warnings/include/WarnBook.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/unit/store/Frames.h"

using std::chrono::hours;
using std::chrono::minutes;
using std::chrono::seconds;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

/// A book over a clock that the test moves.
class WarnBook : public testing::Test {
protected:
    static ZTSWarnRule rule(const std::string& acrKind, std::uint64_t aCount = 1, seconds aWithin = seconds(60),
                            const std::string& acrPer = "port") {
        return {.mKind = acrKind,
                .mCount = aCount,
                .mWithin = aWithin,
                .mPer = acrPer,
                .mRun = {"/bin/true"},
                .mTimeout = seconds(30)};
    }
    ZTSWarnOccurrence event(std::uint64_t aPort, std::uint64_t aCount = 1, const std::string& acrKind = "queue-full") {
        ZTSWarnOccurrence lEvent = state(acrKind);
        lEvent.mInitiator.mWwpn = makeName(gcLocalPort);
        lEvent.mRemotePort = ZTSRemotePort{.mWwpn = makeName(aPort), .mWwnn = {}, .mFcId = {}};
        lEvent.mCount = aCount;
        lEvent.mText.clear();
        return lEvent;
    }
    ZTSWarnOccurrence state(const std::string& acrKind) {
        ZTSWarnOccurrence lState;
        lState.mKind = acrKind;
        lState.mTime = mNow;
        lState.mText = "why";
        return lState;
    }
    /// Subjects of the warnings that are due now.
    std::vector<std::string> due(ZTCWarnBook& arBook, std::size_t aMost = 100) {
        arBook.judge(
            mNow, [this](const std::string&) { return mIsKnown; }, mLines);
        std::vector<std::string> lSubjects;
        for (const ZTSTrouble& lrTrouble : arBook.takeDue(mNow, aMost)) {
            lSubjects.push_back(lrTrouble.mSubject);
            mLast = lrTrouble;
        }
        return lSubjects;
    }
    void pass(std::chrono::seconds aTime) { mNow += aTime; }

    ZTCHistoryTime mNow = fromMicroseconds(gcBase);
    bool mIsKnown = true;
    std::vector<std::string> mLines;
    ZTSTrouble mLast;
    const std::string mPortA = makeName(gcPortA).toText();
    const std::string mPortB = makeName(gcPortB).toText();
};

TEST_F(WarnBook, WarnsWhenExactlyAsManyCameWithinTheTime) {
    ZTCWarnBook lBook({rule("queue-full", 3)});
    lBook.note(event(gcPortA, 2));
    EXPECT_THAT(due(lBook), IsEmpty());
    pass(seconds(59));
    lBook.note(event(gcPortA, 1));
    EXPECT_THAT(due(lBook), ElementsAre(mPortA));
    EXPECT_EQ(mLast.mCount, 3U);
    EXPECT_EQ(mLast.mWarnings, 0U);
}

TEST_F(WarnBook, ForgetsWhatIsOlderThanTheTime) {
    ZTCWarnBook lBook({rule("queue-full", 3)});
    lBook.note(event(gcPortA, 2));
    pass(seconds(61));
    lBook.note(event(gcPortA, 2));
    EXPECT_THAT(due(lBook), IsEmpty());
}

TEST_F(WarnBook, CountsByPortByInitiatorAndByHost) {
    const auto lCount = [this](const std::string& acrPer) {
        ZTCWarnBook lBook({rule("queue-full", 2, seconds(60), acrPer)});
        lBook.note(event(gcPortA));
        lBook.note(event(gcPortB));
        return due(lBook);
    };
    EXPECT_THAT(lCount("port"), IsEmpty());
    EXPECT_THAT(lCount("initiator"), ElementsAre(makeName(gcLocalPort).toText()));
    EXPECT_THAT(lCount("host"), ElementsAre(""));
}

TEST_F(WarnBook, CountsOnlyItsKind) {
    ZTCWarnBook lBook({rule("link"), rule("queue-full")});
    lBook.note(event(gcPortA));
    EXPECT_THAT(due(lBook), ElementsAre(mPortA));
    EXPECT_EQ(mLast.mRule, 1U);
}

TEST_F(WarnBook, DoublesThePauseUpToADayWhileTheTroubleGoesOn) {
    ZTCWarnBook lBook({rule("queue-full")});
    std::vector<long> lPauses;
    ZTCHistoryTime lWarned = mNow;
    for (int i = 0; lPauses.size() < 14 && i < 30 * 24 * 60; ++i) {
        lBook.note(event(gcPortA));
        if (!due(lBook).empty()) {
            EXPECT_EQ(mLast.mWarnings, lPauses.size());
            EXPECT_EQ(mLast.mFirst, fromMicroseconds(gcBase));
            lPauses.push_back(std::chrono::duration_cast<minutes>(mNow - lWarned).count());
            EXPECT_EQ(std::chrono::duration_cast<minutes>(mLast.mNext - mNow).count(),
                      std::min(1L << (lPauses.size() - 1), 1440L));
            lWarned = mNow;
        }
        pass(seconds(60));
    }
    EXPECT_THAT(lPauses, ElementsAre(0, 1, 2, 4, 8, 16, 32, 64, 128, 256, 512, 1024, 1440, 1440));
}

TEST_F(WarnBook, BeginsAnewBehindTheEndOfTheTrouble) {
    ZTCWarnBook lBook({rule("queue-full")});
    for (int i = 0; i < 4; ++i) {
        lBook.note(event(gcPortA));
        due(lBook);
        pass(seconds(60));
    }
    EXPECT_EQ(mLast.mWarnings, 2U);
    pass(seconds(60));
    EXPECT_THAT(due(lBook), IsEmpty());
    EXPECT_THAT(mLines, ElementsAre("the trouble is over: queue-full of " + mPortA));
    EXPECT_TRUE(lBook.isEmpty());
    lBook.note(event(gcPortA));
    EXPECT_THAT(due(lBook), ElementsAre(mPortA));
    EXPECT_EQ(mLast.mWarnings, 0U);
    EXPECT_EQ(mLast.mFirst, mNow);
}

TEST_F(WarnBook, AStateIsWarnedOfWhileItHoldsAndEndsWithIt) {
    ZTCWarnBook lBook({rule("disk-full")});
    lBook.setHolding({state("disk-full")});
    EXPECT_THAT(due(lBook), ElementsAre(""));
    EXPECT_EQ(mLast.mText, "why");
    pass(seconds(59));
    lBook.setHolding({state("disk-full")});
    EXPECT_THAT(due(lBook), IsEmpty());
    pass(seconds(3600));
    lBook.setHolding({state("disk-full")});
    EXPECT_THAT(due(lBook), ElementsAre(""));
    lBook.setHolding({});
    EXPECT_THAT(due(lBook), IsEmpty());
    EXPECT_EQ(mLines.size(), 1U);
}

TEST_F(WarnBook, AStateThatComesAndGoesIsOneTroubleAndCounts) {
    ZTCWarnBook lBook({rule("agent-down", 3, seconds(600), "host")});
    for (int i = 0; i < 2; ++i) {
        lBook.setHolding({state("agent-down")});
        EXPECT_THAT(due(lBook), IsEmpty());
        lBook.setHolding({});
        pass(seconds(10));
    }
    lBook.setHolding({state("agent-down")});
    EXPECT_THAT(due(lBook), ElementsAre(""));
    EXPECT_EQ(mLast.mCount, 3U);
}

TEST_F(WarnBook, ATroubleOfWhichNothingIsKnownDoesNotEnd) {
    ZTCWarnBook lBook({rule("deaf")});
    lBook.setHolding({state("deaf")});
    due(lBook);
    pass(hours(1));
    lBook.setHolding({});
    mIsKnown = false;
    due(lBook);
    EXPECT_EQ(lBook.getOpen().size(), 1U);
}

TEST_F(WarnBook, TheNextProcessGoesOnWithTheSamePauses) {
    const std::vector<ZTSWarnRule> lRules{rule("queue-full"), rule("disk-full")};
    ZTCWarnBook lBook(lRules);
    lBook.note(event(gcPortA));
    lBook.setHolding({state("disk-full")});
    EXPECT_EQ(due(lBook).size(), 2U);
    pass(seconds(70));
    lBook.note(event(gcPortA));
    EXPECT_EQ(due(lBook).size(), 2U);
    ZTCWarnBook lNext(lRules);
    EXPECT_TRUE(lNext.load(lBook.toText()));
    EXPECT_EQ(lNext.toText(), lBook.toText());
    pass(seconds(100));  // of 120
    lNext.note(event(gcPortA));
    lNext.setHolding({state("disk-full")});
    EXPECT_THAT(due(lNext), IsEmpty());
    pass(seconds(20));
    EXPECT_EQ(due(lNext).size(), 2U);
    EXPECT_EQ(mLast.mWarnings, 2U);
    EXPECT_EQ(mLast.mFirst, fromMicroseconds(gcBase));
}

TEST_F(WarnBook, AStateThatHeldBeforeTheRestartDoesNotBeginAnewAndEndsWhenItHoldsNoMore) {
    const std::vector<ZTSWarnRule> lRules{rule("disk-full", 1, seconds(600), "host")};
    ZTCWarnBook lBook(lRules);
    lBook.setHolding({state("disk-full")});
    EXPECT_EQ(due(lBook).size(), 1U);
    pass(hours(1));
    ZTCWarnBook lNext(lRules);
    EXPECT_TRUE(lNext.load(lBook.toText()));
    lNext.setHolding({state("disk-full")});
    due(lNext);
    EXPECT_EQ(lNext.getOpen().size(), 1U);
    pass(seconds(1));
    lNext.setHolding({});
    due(lNext);
    EXPECT_EQ(lNext.getOpen().size(), 0U);
}

TEST_F(WarnBook, AfterTheEndOfATroubleThatAnEarlierProcessHasFoundNewOnesAreWarnedOf) {
    ZTCWarnBook lBook({rule("queue-full")});
    lBook.note(event(gcPortA));
    EXPECT_THAT(due(lBook), ElementsAre(mPortA));
    ZTCWarnBook lNext({rule("queue-full")});
    EXPECT_TRUE(lNext.load(lBook.toText()));
    pass(seconds(61));
    EXPECT_THAT(due(lNext), IsEmpty());
    ASSERT_THAT(lNext.getOpen(), IsEmpty());
    lNext.note(event(gcPortB));
    EXPECT_THAT(due(lNext), ElementsAre(mPortB));
}

TEST_F(WarnBook, ARuleThatIsGoneLosesItsTroublesAndARestKeepsThem) {
    ZTCWarnBook lBook({rule("queue-full"), rule("link")});
    lBook.note(event(gcPortA));
    lBook.note(event(gcPortB, 1, "link"));
    EXPECT_EQ(due(lBook).size(), 2U);
    ZTCWarnBook lNext({rule("link")});
    EXPECT_TRUE(lNext.load(lBook.toText()));
    ASSERT_EQ(lNext.getOpen().size(), 1U);
    EXPECT_EQ(lNext.getOpen().front().mSubject, mPortB);
}

TEST_F(WarnBook, ATextThatCannotBeReadIsPassedOver) {
    for (const char* const lpText : {"{", "7", "[1]", "[{\"rule\": 5}]", "{\"a\": {}}"}) {
        ZTCWarnBook lBook({rule("queue-full")});
        EXPECT_FALSE(lBook.load(lpText)) << lpText;
        EXPECT_TRUE(lBook.isEmpty());
    }
    EXPECT_TRUE(ZTCWarnBook({}).load(""));
}

TEST_F(WarnBook, OfTooManyTroublesTheRestIsReportedOnce) {
    ZTCWarnBook lBook({rule("queue-full")});
    for (std::uint64_t i = 0; i < gcMostWarnings + 10; ++i) {
        lBook.note(event(gcPortA + i));
    }
    EXPECT_EQ(due(lBook, 1000).size(), gcMostWarnings);
    due(lBook);
    ASSERT_EQ(mLines.size(), 1U);
    EXPECT_THAT(mLines.front(), HasSubstr(std::to_string(gcMostWarnings)));
}

TEST_F(WarnBook, WhatIsDueBeyondTheRoomStaysDue) {
    ZTCWarnBook lBook({rule("queue-full")});
    lBook.note(event(gcPortA));
    lBook.note(event(gcPortB));
    EXPECT_EQ(due(lBook, 1).size(), 1U);
    EXPECT_EQ(due(lBook, 1).size(), 1U);
    EXPECT_EQ(due(lBook, 1).size(), 0U);
}

TEST_F(WarnBook, AClockThatIsSetBackDelaysAWarningByNoMoreThanItsPause) {
    ZTCWarnBook lBook({rule("disk-full")});
    lBook.setHolding({state("disk-full")});
    EXPECT_EQ(due(lBook).size(), 1U);
    mNow -= hours(24 * 365);
    lBook.setHolding({state("disk-full")});
    EXPECT_THAT(due(lBook), IsEmpty());
    pass(seconds(60));
    lBook.setHolding({state("disk-full")});
    EXPECT_EQ(due(lBook).size(), 1U);
}
