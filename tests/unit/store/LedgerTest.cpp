// What the agent counted, what was stored, what was lost: the equations, across agents, restarts and repetitions.
#include "sensor/store/include/Ledger.h"

#include "tests/unit/store/StoreFixture.h"

namespace {

class LedgerTest : public ZTCStoreTest {
protected:
    static ZTSPageCounts counts(std::uint64_t aReceived, std::uint64_t aRefused, std::uint64_t aHandedOver,
                                std::uint64_t aHeld) {
        ZTSPageCounts lCounts;
        lCounts.mWwpn = makeName(gcLocalPort);
        lCounts.mWwnn = makeName(gcLocalNode);
        lCounts.mKind = gcQueueFull;
        lCounts.mReceived = aReceived;
        lCounts.mRefused[ZTRF_TotalLimit] = aRefused;
        lCounts.mConsolidated = aReceived - aRefused;
        lCounts.mHandedOver = aHandedOver;
        lCounts.mHeld = aHeld;
        lCounts.mDropped = aReceived - aRefused - aHandedOver - aHeld;
        return lCounts;
    }
    void note(const std::string& acrGeneration, const ZTSPageCounts& acrCounts) {
        inTransaction([&] { store().noteLedger(acrGeneration, std::span(&acrCounts, 1)); });
    }
    bool endAgent(const std::string& acrGeneration, bool aIsVanished = false) {
        bool lIsGap = false;
        inTransaction([&] {
            lIsGap = store().endAgent(acrGeneration, fromMicroseconds(gcBase), fromMicroseconds(gcBase + gcSecond),
                                      aIsVanished, "the agent was killed");
        });
        return lIsGap;
    }
    ZTSLedgerRow row() {
        const auto lRows = history().readLedger();
        EXPECT_EQ(lRows.size(), 1U);
        return lRows.empty() ? ZTSLedgerRow{} : lRows[0];
    }
};

}  // namespace

TEST_F(LedgerTest, ItShowsWhatThePageCountedAndWhatIsStored) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 60), makeQueueFull(gcPortB, gcBase, gcBase, 20)});
    note(gcGeneration, counts(110, 10, 80, 15));
    const ZTSLedgerRow lRow = row();
    EXPECT_EQ(lRow.mInitiator.mWwpn, makeName(gcLocalPort));
    EXPECT_EQ(lRow.mKind, gcQueueFull);
    EXPECT_EQ(lRow.mReceived, 110U);
    EXPECT_EQ(lRow.mRefused[ZTRF_TotalLimit], 10U);
    EXPECT_EQ(lRow.getRefusedTotal(), 10U);
    EXPECT_EQ(lRow.mConsolidated, 100U);
    EXPECT_EQ(lRow.mHandedOver, 80U);
    EXPECT_EQ(lRow.mStored, 80U);
    EXPECT_EQ(lRow.mHeld, 15U);
    EXPECT_EQ(lRow.mDropped, 5U);
    EXPECT_EQ(lRow.mRetired + lRow.mLost, 0U);
}

TEST_F(LedgerTest, ALaterPageReplacesAnEarlierOneAlsoAfterARestart) {
    note(gcGeneration, counts(10, 0, 5, 5));
    note(gcGeneration, counts(20, 1, 10, 9));
    EXPECT_EQ(row().mReceived, 20U);
    closeStore();
    note(gcGeneration, counts(30, 1, 20, 9));
    note(gcGeneration, counts(30, 1, 20, 9));
    EXPECT_EQ(row().mReceived, 30U);
    EXPECT_EQ(row().mHeld, 9U);
}

TEST_F(LedgerTest, WhateverHasChangedOnThePageIsStored) {
    ZTSPageCounts lCounts = counts(10, 1, 5, 4);
    note(gcGeneration, lCounts);
    lCounts.mDropped = 2;
    note(gcGeneration, lCounts);
    EXPECT_EQ(row().mDropped, 2U);
    lCounts.mHeld = 3;
    note(gcGeneration, lCounts);
    EXPECT_EQ(row().mHeld, 3U);
    lCounts.mRefused[ZTRF_Failed] = 7;
    note(gcGeneration, lCounts);
    EXPECT_EQ(row().mRefused[ZTRF_Failed], 7U);
}

TEST_F(LedgerTest, AnAgentThatEndsInOrderWithNothingMissingLeavesNoGap) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 10)});
    note(gcGeneration, counts(10, 0, 10, 0));
    EXPECT_FALSE(endAgent(gcGeneration));
    EXPECT_TRUE(store().hasEnded(gcGeneration));
    EXPECT_TRUE(history().readGaps().empty());
    EXPECT_EQ(row().mHandedOver, 10U);
}

TEST_F(LedgerTest, WhatAKilledAgentHeldAndWhatNeverArrivedIsOneGap) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 70)});
    note(gcGeneration, counts(150, 10, 100, 40));
    EXPECT_TRUE(endAgent(gcGeneration, true));
    EXPECT_FALSE(endAgent(gcGeneration, true)) << "a page that is read again";
    note(gcGeneration, counts(150, 10, 100, 40));
    closeStore();
    EXPECT_FALSE(endAgent(gcGeneration, true));
    const auto lGaps = history().readGaps();
    ASSERT_EQ(lGaps.size(), 1U);
    EXPECT_EQ(lGaps[0].mReason, "the agent was killed");
    EXPECT_EQ(lGaps[0].mGeneration, gcGeneration);
    EXPECT_TRUE(lGaps[0].mIsCountKnown);
    EXPECT_EQ(toMicroseconds(lGaps[0].mFrom), gcBase);
    ASSERT_EQ(lGaps[0].mCounts.size(), 1U);
    EXPECT_EQ(lGaps[0].mCounts[0].mHeld, 40U);
    EXPECT_EQ(lGaps[0].mCounts[0].mHandedOver, 30U);
    EXPECT_EQ(lGaps[0].getOccurrences(), 70U);
    const ZTSLedgerRow lRow = row();
    EXPECT_EQ(lRow.mStored + lRow.mRetired + lRow.mLost, lRow.mHandedOver);
    EXPECT_EQ(lRow.mLost, 30U);
    EXPECT_EQ(lRow.mHeld, 0U) << "only the running agent holds";
    EXPECT_EQ(history().readRetrievalTotals().mGaps, 1U);
}

TEST_F(LedgerTest, WhatWasTakenBehindTheLastKnownPageWasHandedOverAndIsInNoGap) {
    note(gcGeneration, counts(100, 10, 60, 30));
    take({makeQueueFull(gcPortA, gcBase, gcBase, 70)});
    EXPECT_TRUE(endAgent(gcGeneration, true));
    EXPECT_EQ(history().readGaps()[0].getOccurrences(), 20U) << "of the 30 that were held, 10 came";
    EXPECT_EQ(row().mReceived, 100U);
    EXPECT_EQ(row().mConsolidated, 90U);
    EXPECT_EQ(row().mHandedOver, 70U);
    EXPECT_EQ(row().mStored, 70U);
    EXPECT_EQ(row().mLost, 0U);
}

TEST_F(LedgerTest, WhatWasTakenFromAnAgentWithoutAPageCountsAsReceived) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 70)});
    EXPECT_TRUE(endAgent(gcGeneration, true));
    EXPECT_EQ(history().readGaps()[0].getOccurrences(), 0U);
    EXPECT_EQ(row().mReceived, 70U);
    EXPECT_EQ(row().mConsolidated, 70U);
    EXPECT_EQ(row().mHandedOver, 70U);
    EXPECT_EQ(row().mStored, 70U);
}

TEST_F(LedgerTest, AVanishedAgentIsAGapEvenWhereNothingIsMissing) {
    EXPECT_TRUE(endAgent(gcGeneration, true));
    ASSERT_EQ(history().readGaps().size(), 1U);
    EXPECT_EQ(history().readGaps()[0].getOccurrences(), 0U);
}

TEST_F(LedgerTest, TotalsOfManyAgentsAddUp) {
    std::uint64_t lFrame = 0;
    for (int i = 0; i < 20; ++i) {
        const std::string lGeneration = "agent" + std::to_string(i);
        inTransaction([&] {
            store().takeIn(++lFrame, lGeneration, makeBody({makeQueueFull(gcPortA, gcBase, gcBase, 8)}), false,
                           fromMicroseconds(gcBase));
        });
        note(lGeneration, counts(12, 1, 10, 1));
        EXPECT_TRUE(endAgent(lGeneration, false)) << "two that were handed over never arrived";
    }
    note("running", counts(5, 0, 0, 5));
    const ZTSLedgerRow lRow = row();
    EXPECT_EQ(lRow.mReceived, 245U);
    EXPECT_EQ(lRow.mRefused[ZTRF_TotalLimit], 20U);
    EXPECT_EQ(lRow.mHandedOver, 200U);
    EXPECT_EQ(lRow.mStored, 160U);
    EXPECT_EQ(lRow.mLost, 40U);
    EXPECT_EQ(lRow.mHeld, 5U);
}

TEST_F(LedgerTest, EachCountOfEndedAgentsAddsUp) {
    ZTSPageCounts lCounts = counts(100, 0, 0, 0);
    for (std::size_t i = 0; i < lCounts.mRefused.size(); ++i) {
        lCounts.mRefused[i] = i + 1;
    }
    lCounts.mConsolidated = 60;
    lCounts.mDropped = 50;
    for (const char* const lpGeneration : {"one", "another", "a third"}) {
        note(lpGeneration, lCounts);
        EXPECT_FALSE(endAgent(lpGeneration));
    }
    const ZTSLedgerRow lRow = row();
    EXPECT_EQ(lRow.mReceived, 300U);
    EXPECT_EQ(lRow.mConsolidated, 180U);
    EXPECT_EQ(lRow.mDropped, 150U);
    for (std::size_t i = 0; i < lCounts.mRefused.size(); ++i) {
        EXPECT_EQ(lRow.mRefused[i], 3 * (i + 1)) << i;
    }
}

TEST_F(LedgerTest, AKnownLossOnTheWayIsNotCountedAgainWhenTheAgentEnds) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 90)});
    note(gcGeneration, counts(100, 0, 100, 0));
    ZTSGap lGap;
    lGap.mReason = "frame 2 could not be decoded";
    lGap.mGeneration = gcGeneration;
    lGap.mCounts = {{.mInitiator = {.mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mHost = {}},
                     .mKind = gcQueueFull,
                     .mHeld = 0,
                     .mHandedOver = 10}};
    inTransaction([&] {
        EXPECT_TRUE(store().noteGap(lGap));
        EXPECT_FALSE(store().noteGap(lGap));
    });
    EXPECT_EQ(row().mLost, 10U);
    EXPECT_FALSE(endAgent(gcGeneration));
    EXPECT_EQ(row().mLost, 10U);
    EXPECT_EQ(history().readGaps().size(), 1U);
}

TEST_F(LedgerTest, GapsWithoutAnAgentMayRepeatAndAreFoundByTheirEnd) {
    for (int i = 0; i < 3; ++i) {
        ZTSGap lGap;
        lGap.mFrom = fromMicroseconds(gcBase + i * gcDay);
        lGap.mTo = fromMicroseconds(gcBase + i * gcDay + gcSecond);
        lGap.mReason = "no sensor ran";
        inTransaction([&] { EXPECT_TRUE(store().noteGap(lGap)); });
    }
    EXPECT_EQ(history().readGaps().size(), 3U);
    const auto lLater = history().readGaps(fromMicroseconds(gcBase + gcDay + gcSecond));
    ASSERT_EQ(lLater.size(), 2U);
    EXPECT_FALSE(lLater[0].mIsCountKnown);
}

TEST_F(LedgerTest, TheRowForUnknownBoardsHasNoName) {
    ZTSPageCounts lCounts;
    lCounts.mReceived = 4;
    lCounts.mRefused[ZTRF_UnknownBoard] = 4;
    note(gcGeneration, lCounts);
    EXPECT_EQ(row().mInitiator, ZTSInitiator{});
    EXPECT_EQ(row().mKind, 0U);
    EXPECT_STREQ(getRefusalName(ZTRF_UnknownBoard), "unknown-board");
}
