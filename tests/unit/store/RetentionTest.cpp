// Retention: bounded steps, at most one stored day an hour, and nothing goes without being counted.
#include "tests/unit/store/StoreFixture.h"

namespace {

using std::chrono::hours;

class RetentionTest : public ZTCStoreTest {
protected:
    /// One closed episode a day, of two records, for each of the ports.
    void fill(int aDays, int aPorts = 1) {
        for (int lDay = 0; lDay < aDays; ++lDay) {
            std::vector<ZTSTestRecord> lRecords;
            for (int lPort = 0; lPort < aPorts; ++lPort) {
                const std::int64_t lTime = gcBase + lDay * gcDay;
                const std::uint64_t lName = gcPortA + static_cast<unsigned>(lPort);
                lRecords.push_back(makeQueueFull(lName, lTime, lTime, 3));
                lRecords.push_back(makeQueueFull(lName, lTime, lTime, 4));
            }
            take(lRecords, gcBase + lDay * gcDay);
        }
        closeAt(gcBase + aDays * gcDay);
    }
    /// Steps until there is nothing to do at once. Returns the number of steps.
    int retire(std::int64_t aNow) {
        int lSteps = 1;
        while (store().retireStep(fromMicroseconds(aNow), mSteady)) {
            ++lSteps;
        }
        return lSteps;
    }
    std::uint64_t rows() { return episodes().size() + changes().size() + records().size(); }
    std::uint64_t storedAndRetired() {
        std::uint64_t lStored = 0;
        for (const ZTSEpisode& lrEpisode : episodes()) {
            lStored += lrEpisode.mCount;
        }
        std::uint64_t lSum = 0;
        for (const ZTSLedgerRow& lrRow : history().readLedger()) {
            EXPECT_EQ(lrRow.mStored, lStored);
            lSum += lrRow.mStored + lrRow.mRetired;
        }
        return lSum;
    }

    std::chrono::steady_clock::time_point mSteady{hours(1000)};
};

}  // namespace

TEST_F(RetentionTest, DaysThatAreOldEnoughGoOneAnHourAndAreCountedAsRetired) {
    mLimits.mDays = 3;
    fill(6);
    const std::int64_t lNow = gcBase + 6 * gcDay;
    EXPECT_EQ(storedAndRetired(), 42U);
    retire(lNow);
    EXPECT_EQ(episodes().size(), 5U);
    EXPECT_EQ(storedAndRetired(), 42U);
    mSteady += std::chrono::minutes(59);
    retire(lNow + 59 * gcMinute);
    EXPECT_EQ(episodes().size(), 5U) << "the next day only after an hour";
    mSteady += std::chrono::minutes(1);
    retire(lNow + 60 * gcMinute);
    EXPECT_EQ(episodes().size(), 4U);
    for (int i = 2; i < 10; ++i) {
        mSteady += hours(1);
        retire(lNow + i * 60 * gcMinute);
    }
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 3U) << "the days within the limit stay";
    EXPECT_EQ(toMicroseconds(lEpisodes[0].mFirst), gcBase + 3 * gcDay);
    EXPECT_EQ(storedAndRetired(), 42U);
    EXPECT_EQ(history().readTotals()[0].mRetired, 21U);
    EXPECT_EQ(records().size(), 6U);
    EXPECT_EQ(changes().size(), 6U);
    std::size_t lDays = 0;
    history().visitDays({}, [&](const ZTSBucket&) { return ++lDays != 0; });
    EXPECT_EQ(lDays, 3U);
}

TEST_F(RetentionTest, AClockThatJumpedTakesOneDayAnHourAlsoAcrossRestarts) {
    mLimits.mDays = 3;
    fill(6);
    for (int i = 0; i < 5; ++i) {
        retire(gcBase + 4000 * gcDay + i * gcMinute);
        closeStore();
    }
    EXPECT_EQ(episodes().size(), 5U);
}

TEST_F(RetentionTest, AClockThatWasAheadOnceDoesNotStopTheRetentionThatFollows) {
    mLimits.mDays = 3;
    fill(6);
    retire(gcBase + 4000 * gcDay);
    ASSERT_EQ(episodes().size(), 5U);
    closeStore();
    retire(gcBase + 10 * gcDay);
    EXPECT_EQ(episodes().size(), 4U);
}

TEST_F(RetentionTest, AStepDeletesAtMostAsManyRowsAsTheLimitSays) {
    mLimits.mDays = 1;
    mLimits.mStepRows = 10;
    fill(1, 40);
    const std::int64_t lNow = gcBase + 10 * gcDay;
    std::uint64_t lBefore = rows();
    int lSteps = 0;
    while (store().retireStep(fromMicroseconds(lNow), mSteady)) {
        const std::uint64_t lAfter = rows();
        ASSERT_LE(lBefore - lAfter, 10U + 10U) << "ten rows, of which a chunk holds two records";
        lBefore = lAfter;
        ++lSteps;
        ASSERT_LT(lSteps, 1000);
    }
    EXPECT_GT(lSteps, 10);
    EXPECT_EQ(episodes().size(), 0U);
    EXPECT_EQ(rows(), 0U);
    EXPECT_EQ(storedAndRetired(), 280U);
}

TEST_F(RetentionTest, WhatAnOutputMissesAddsUpFromDayToDay) {
    mLimits.mDays = 1;
    fill(3);
    inTransaction([&] { store().setValue("outlet.test.seq", "1"); });
    retire(gcBase + 3 * gcDay);
    const int lFirst = std::stoi(history().getValue("outlet.test.missed"));
    EXPECT_GT(lFirst, 0);
    const std::size_t lBefore = changes().size();
    mSteady += hours(1);
    retire(gcBase + 3 * gcDay + 60 * gcMinute);
    const std::size_t lGone = lBefore - changes().size();
    ASSERT_GT(lGone, 0U);
    EXPECT_EQ(std::stoul(history().getValue("outlet.test.missed")), static_cast<std::size_t>(lFirst) + lGone);
}

TEST_F(RetentionTest, OpenEpisodesStay) {
    mLimits.mDays = 1;
    fill(1);
    take({makeQueueFull(gcPortB, gcBase, gcBase, 5)});
    retire(gcBase + 10 * gcDay);
    ASSERT_EQ(episodes().size(), 1U);
    EXPECT_EQ(episodes()[0].mPhase, ZTP_Open);
    EXPECT_EQ(storedAndRetired(), 12U);
}

TEST_F(RetentionTest, ADatabaseThatIsTooBigLosesItsOldestEpisodesAndShrinks) {
    mLimits.mDays = 0;
    fill(40, 50);
    const std::uint64_t lCount = storedAndRetired();
    store().checkpoint();
    mLimits.mBytes = 512 * 1024;
    store().setLimits(mLimits);
    for (int i = 0; i < 2; ++i) {
        retire(gcBase + 40 * gcDay);
    }
    EXPECT_EQ(storedAndRetired(), lCount);
    const auto lEpisodes = episodes();
    ASSERT_FALSE(lEpisodes.empty()) << "no more than needed";
    EXPECT_LT(lEpisodes.size(), 40U * 50U);
    EXPECT_GT(toMicroseconds(lEpisodes[0].mFirst), gcBase) << "the oldest go first";
    closeStore();
    mHistory.reset();
    EXPECT_LE(store().getDatabaseBytes(), 2 * mLimits.mBytes);
}

TEST_F(RetentionTest, OldCoverageRunsAndGapsGoWithTheirDays) {
    mLimits.mDays = 1;
    fill(3);
    for (int lDay = 0; lDay < 3; ++lDay) {
        inTransaction([&] {
            store().beginRun(fromMicroseconds(gcBase + lDay * gcDay));
            const ZTSKindStateNow lState = {
                .mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mKind = gcLink, .mState = ZTKST_Off};
            store().noteCoverage(fromMicroseconds(gcBase + lDay * gcDay), std::span(&lState, 1));
            ZTSGap lGap;
            lGap.mFrom = lGap.mTo = fromMicroseconds(gcBase + lDay * gcDay);
            lGap.mReason = "a test";
            lGap.mCounts = {{.mInitiator = {}, .mKind = gcLink, .mHeld = 1, .mHandedOver = 0}};
            store().noteGap(lGap);
            store().endRun(fromMicroseconds(gcBase + lDay * gcDay + 1));
        });
    }
    retire(gcBase + 3 * gcDay);
    EXPECT_EQ(history().readGaps().size(), 2U);
    EXPECT_EQ(history().readCoverage().size(), 2U);
    EXPECT_EQ(history().readRuns().size(), 2U);
    EXPECT_EQ(history().readRetrievalTotals().mGaps, 3U) << "the count of gaps is never deleted";
}
