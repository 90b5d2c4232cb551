#include "libkpm/linux/src/SenseMatcher.h"

#include <gtest/gtest.h>

#include <string>

class SenseMatcher : public testing::Test {
protected:
    static ZTSCommandName command(std::uint32_t aTag) { return {1, 0, 2, 3, 0x28, aTag, 79}; }

    void outcome(std::uint32_t aTag, std::uint64_t aTime) {
        ZTSScsiOutcome lOutcome;
        static_cast<ZTSCommandName&>(lOutcome) = command(aTag);
        lOutcome.mStatus = ZTLSS_CheckCondition;
        mMatcher.addOutcome(lOutcome, aTime, mNow);
    }
    void sense(std::uint32_t aTag, std::uint64_t aTime, std::uint32_t aAsc) {
        mMatcher.addSense({command(aTag), {5, aAsc, 0}}, aTime, mNow);
    }

    /// "TAG:ASC" of each outcome that is ready, "TAG:-" without sense data.
    std::string take(std::chrono::milliseconds aLater = std::chrono::milliseconds(0)) {
        mNow += aLater;
        std::string lText;
        for (const ZTSScsiOutcome& lrOutcome : mMatcher.take(mNow)) {
            lText += (lText.empty() ? "" : " ") + std::to_string(lrOutcome.mDriverTag) + ":" +
                     (lrOutcome.mSenseKey == gcUnknownSense ? "-" : std::to_string(lrOutcome.mAsc));
        }
        return lText;
    }

    ZTCSenseMatcher mMatcher;
    ZTCSenseMatcher::Clock::time_point mNow{};
};

TEST_F(SenseMatcher, AnOutcomeAndItsSenseDataAreOneWhicheverIsReadFirst) {
    outcome(1, 100);
    EXPECT_EQ(take(), "");
    sense(1, 110, 33);
    EXPECT_EQ(take(), "1:33");
    sense(2, 210, 34);
    EXPECT_EQ(take(), "");
    outcome(2, 200);
    EXPECT_EQ(take(), "2:34");
    EXPECT_FALSE(mMatcher.getNextTime().has_value());
    EXPECT_EQ(take(ZTCSenseMatcher::scWait), "") << "each once";
}

TEST_F(SenseMatcher, WithoutSenseDataAnOutcomeIsHandedOnAfterTheWait) {
    outcome(1, 100);
    EXPECT_EQ(mMatcher.getNextTime(), mNow + ZTCSenseMatcher::scWait);
    EXPECT_EQ(take(ZTCSenseMatcher::scWait - std::chrono::milliseconds(1)), "");
    EXPECT_EQ(take(std::chrono::milliseconds(1)), "1:-");
    sense(1, 110, 33);
    EXPECT_EQ(take(), "") << "too late";
}

TEST_F(SenseMatcher, CommandsThatDifferInAnythingAreNotTakenForEachOther) {
    outcome(1, 100);
    for (unsigned lField = 0; lField < 7; ++lField) {
        ZTSCommandName lOther = command(1);
        std::uint32_t* const lpNumbers[] = {&lOther.mHost, &lOther.mChannel,   &lOther.mTarget,
                                            &lOther.mLun,  &lOther.mDriverTag, &lOther.mSchedulerTag};
        if (lField == 6) {
            ++lOther.mOpcode;
        } else {
            ++*lpNumbers[lField];
        }
        mMatcher.addSense({lOther, {5, 33, 0}}, 110, mNow);
        EXPECT_EQ(take(), "") << lField;
    }
    EXPECT_EQ(take(ZTCSenseMatcher::scWait), "1:-");
}

TEST_F(SenseMatcher, OfCommandsWithTheSameTagEachGetsTheSenseDataWrittenAfterIt) {
    // Two buffers, read one after the other.
    outcome(1, 100);
    outcome(1, 200);
    outcome(1, 300);
    sense(1, 110, 11);
    sense(1, 310, 31);
    EXPECT_EQ(take(), "1:11 1:31") << "those of the second have not come";
    sense(1, 210, 21);
    EXPECT_EQ(take(), "1:21");
}

TEST_F(SenseMatcher, SenseDataWrittenBeforeAnOutcomeAreNotItsOwn) {
    sense(1, 90, 9);
    outcome(1, 100);
    EXPECT_EQ(take(), "");
    sense(1, 100, 10);
    EXPECT_EQ(take(), "1:10") << "the same time is not before";
}

TEST_F(SenseMatcher, SenseDataOfTheTimeOfTheNextOutcomeAreThatOnes) {
    const std::chrono::milliseconds lBetween(100);
    outcome(1, 100);
    EXPECT_EQ(take(lBetween), "");
    outcome(1, 200);
    sense(1, 200, 20);
    EXPECT_EQ(take(), "1:20");
    EXPECT_EQ(take(ZTCSenseMatcher::scWait - lBetween), "1:-") << "the first one is left, which has waited longer";
}

TEST_F(SenseMatcher, SenseDataOfNoOutcomeAreForgotten) {
    sense(1, 90, 9);
    EXPECT_FALSE(mMatcher.getNextTime().has_value()) << "nobody waits for it";
    EXPECT_EQ(take(ZTCSenseMatcher::scWait), "");
    outcome(1, 80);
    EXPECT_EQ(take(), "");
    EXPECT_EQ(take(ZTCSenseMatcher::scWait), "1:-");
}

TEST_F(SenseMatcher, TakingNeedsNoMemoryHoweverManyAreHeld) {
    static_assert(noexcept(mMatcher.take(mNow))&& noexcept(mMatcher.takeAll()));
    const ZTSScsiOutcome* lpFirst = nullptr;
    for (std::uint32_t lTag = 0; lTag < 1000; ++lTag) {
        outcome(lTag, 100);
        outcome(lTag, 200);
        sense(lTag, 210, lTag);
    }
    const std::vector<ZTSScsiOutcome>& lrSome = mMatcher.take(mNow);
    lpFirst = lrSome.data();
    EXPECT_EQ(lrSome.size(), 1000u);
    EXPECT_GE(lrSome.capacity(), 2000u);
    const std::vector<ZTSScsiOutcome>& lrRest = mMatcher.takeAll();
    EXPECT_EQ(lrRest.size(), 1000u);
    EXPECT_EQ(lrRest.data(), lpFirst) << "the same memory serves again";
}

TEST_F(SenseMatcher, AtTheEndAllAreHandedOnWithWhatHasCome) {
    outcome(1, 100);
    outcome(2, 100);
    sense(2, 101, 7);
    const auto lAll = mMatcher.takeAll();
    ASSERT_EQ(lAll.size(), 2u);
    EXPECT_EQ(lAll[0].mAsc, gcUnknownSense);
    EXPECT_EQ(lAll[1].mAsc, 7u);
    EXPECT_TRUE(mMatcher.takeAll().empty());
}

TEST_F(SenseMatcher, WithTooManyHeldNoneWaitsAnyLonger) {
    for (std::uint32_t lTag = 0; lTag <= ZTCSenseMatcher::scMostHeld; ++lTag) {
        outcome(lTag, 100);
    }
    EXPECT_EQ(mMatcher.take(mNow).size(), ZTCSenseMatcher::scMostHeld + 1);
}
