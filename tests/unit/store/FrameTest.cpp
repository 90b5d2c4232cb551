// Frames: taken in once, torn ones as far as they are whole, and their raw records.
#include "tests/unit/store/StoreFixture.h"

using FrameTest = ZTCStoreTest;

static std::uint64_t sSum(const std::vector<ZTSEpisode>& acrEpisodes) {
    std::uint64_t lSum = 0;
    for (const ZTSEpisode& lrEpisode : acrEpisodes) {
        lSum += lrEpisode.mCount;
    }
    return lSum;
}

TEST_F(FrameTest, AFrameThatTheDatabaseHasCountsNothingTwice) {
    const ZTCBytes lBody = makeBody({makeQueueFull(gcPortA, gcBase, gcBase, 5)});
    EXPECT_FALSE(store().hasFrame(7));
    for (int i = 0; i < 2; ++i) {
        inTransaction([&] {
            const ZTSTakenIn lTaken = store().takeIn(7, gcGeneration, lBody, false, fromMicroseconds(gcBase));
            EXPECT_EQ(lTaken.mOccurrences, i == 0 ? 5U : 0U);
            EXPECT_EQ(lTaken.mProblem, i == 0 ? "" : "frame 7 was taken in before");
        });
        EXPECT_TRUE(store().hasFrame(7));
        EXPECT_EQ(store().getLastFrame(), 7U);
        closeStore();
    }
    EXPECT_EQ(sSum(episodes()), 5U);
    EXPECT_EQ(history().readRetrievalTotals().mRetrievals, 1U);
    EXPECT_EQ(history().readRetrievalTotals().mBytes, lBody.size());
}

TEST_F(FrameTest, ABodyCutAnywhereGivesItsWholeRecords) {
    const std::vector<ZTSTestRecord> lRecords = {makeQueueFull(gcPortA, gcBase, gcBase, 1),
                                                 makeQueueFull(gcPortB, gcBase, gcBase, 10),
                                                 makeQueueFull(gcPortA, gcBase, gcBase, 100)};
    const ZTCBytes lBody = makeBody(lRecords);
    std::vector<std::size_t> lEnds;
    for (std::size_t i = 0; i <= lRecords.size(); ++i) {
        lEnds.push_back(lBody.size());
        for (std::size_t k = i; k < lRecords.size(); ++k) {
            lEnds.back() -= encodeRecord(lRecords[k]).size();
        }
    }
    std::uint64_t lExpected = 0;
    std::uint64_t lTorn = 0;
    for (std::size_t lSize = 0; lSize <= lBody.size(); ++lSize) {
        const bool lIsTorn = lSize < lBody.size();
        const ZTSTakenIn lTaken = takeBody(ZTCBytes(lBody.begin(), lBody.begin() + static_cast<long>(lSize)), lIsTorn);
        const std::uint64_t lWanted = lSize >= lEnds[3] ? 111 : lSize >= lEnds[2] ? 11 : lSize >= lEnds[1] ? 1 : 0;
        ASSERT_EQ(lTaken.mOccurrences, lWanted) << lSize;
        ASSERT_EQ(lTaken.mProblem.empty(), !lIsTorn || lSize == 5) << lSize << " " << lTaken.mProblem;
        lExpected += lWanted;
        lTorn += lIsTorn ? 1 : 0;
    }
    EXPECT_EQ(sSum(episodes()), lExpected);
    EXPECT_EQ(history().readRetrievalTotals().mTornFrames, lTorn);
}

TEST_F(FrameTest, AnAnswerWithoutScopeDataIsRememberedAndHoldsNothing) {
    const ZTSTakenIn lTaken = takeBody({0, 0, 0, 0, 0});
    EXPECT_EQ(lTaken.mRecords, 0U);
    EXPECT_EQ(lTaken.mProblem, "frame 1: the response holds no scope data");
    EXPECT_TRUE(store().hasFrame(1));
}

TEST_F(FrameTest, AListWithAKeyThatHoldsNoNamesIsKept) {
    const ZTCBytes lRecord = encodeRecord(makeQueueFull(gcPortA, gcBase, gcBase, 3));
    ZTCByteWriter lWriter;
    lWriter.u8(2).u32(1).u32(3).raw({'x', 0, 0xFF}).u32(1).raw(lRecord);
    EXPECT_EQ(takeBody(lWriter.bytes()).mOccurrences, 3U);
    EXPECT_EQ(takeBody(lWriter.bytes()).mOccurrences, 3U);
    ASSERT_EQ(episodes().size(), 1U);
    EXPECT_EQ(episodes()[0].mInitiator, ZTSInitiator{});
}

TEST_F(FrameTest, WithoutACommitNothingIsStoredAndTheEpisodesAreAsBefore) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 5)});
    {
        const ZTCStoreTransaction lTransaction = store().begin();
        store().takeIn(2, gcGeneration, makeBody({makeQueueFull(gcPortA, gcBase, gcBase, 7)}), false,
                       fromMicroseconds(gcBase));
    }
    EXPECT_FALSE(store().hasFrame(2));
    EXPECT_EQ(sSum(episodes()), 5U);
    take({makeQueueFull(gcPortA, gcBase, gcBase, 1)});
    EXPECT_EQ(sSum(episodes()), 6U);
}

TEST_F(FrameTest, ChangesNeedATransactionAndUpkeepNeedsNone) {
    EXPECT_THROW(store().noteRunning(getHistoryTime()), std::logic_error);
    ZTCStoreTransaction lTransaction = store().begin();
    EXPECT_THROW(static_cast<void>(store().begin()), std::logic_error);
    EXPECT_THROW(store().retireStep(getHistoryTime(), {}), std::logic_error);
    lTransaction.commit();
    EXPECT_THROW(lTransaction.commit(), std::logic_error);
}

TEST_F(FrameTest, TheFirstAndTheLastRecordsOfAnEpisodeAreKeptAsReceived) {
    mLimits.mRecordsPerEnd = 3;
    std::vector<ZTSTestRecord> lAll;
    // Frames of every size around the limit, so that chunks begin and end everywhere.
    for (std::uint32_t lFrame = 1; lFrame <= 9; ++lFrame) {
        std::vector<ZTSTestRecord> lRecords;
        for (std::uint32_t i = 0; i < lFrame; ++i) {
            const auto lNumber = static_cast<std::uint32_t>(lAll.size());
            lRecords.push_back(makeQueueFull(gcPortA, gcBase + lNumber, gcBase + lNumber + 1, lNumber + 1, lNumber));
            lAll.push_back(lRecords.back());
        }
        take(lRecords);
        if (lFrame == 4) {
            closeStore();
        }
        const auto lKept = records();
        ASSERT_EQ(lKept.size(), std::min<std::size_t>(6, lAll.size()));
        for (std::size_t i = 0; i < lKept.size(); ++i) {
            const std::size_t lPlace = i < 3 ? i : lAll.size() - lKept.size() + i;
            EXPECT_EQ(lKept[i].mOrdinal, lPlace);
            EXPECT_EQ(lKept[i].mRecord.mOccurrences, lPlace + 1);
            EXPECT_EQ(lKept[i].mRecord.mEventData, lAll[lPlace].mData);
            EXPECT_EQ(lKept[i].mRecord.mEnd.mMicroseconds, lPlace + 1);
            EXPECT_TRUE(i == 0 || lKept[i].mSeq > lKept[i - 1].mSeq);
        }
    }
}

TEST_F(FrameTest, NoRawRecordsAreKeptWhereNoneAreWanted) {
    mLimits.mRecordsPerEnd = 0;
    take({makeQueueFull(gcPortA, gcBase, gcBase, 5), makeQueueFull(gcPortA, gcBase, gcBase, 5)});
    EXPECT_TRUE(records().empty());
    EXPECT_EQ(sSum(episodes()), 10U);
}

TEST_F(FrameTest, ThousandsOfRecordsOfOneEpisodeKeepTheirEnds) {
    std::vector<ZTSTestRecord> lRecords;
    for (std::uint32_t i = 0; i < 5000; ++i) {
        lRecords.push_back(makeQueueFull(gcPortA, gcBase, gcBase, i));
    }
    take(lRecords);
    const auto lKept = records();
    ASSERT_EQ(lKept.size(), 200U);
    EXPECT_EQ(lKept[99].mRecord.mOccurrences, 99U);
    EXPECT_EQ(lKept[100].mRecord.mOccurrences, 4900U);
    EXPECT_EQ(lKept[199].mRecord.mOccurrences, 4999U);
    ZTSHistoryFilter lFilter;
    lFilter.mLimit = 2;
    const auto lNewest = records(lFilter);
    ASSERT_EQ(lNewest.size(), 2U);
    EXPECT_EQ(lNewest[0].mOrdinal, 4998U);
    EXPECT_EQ(lNewest[1].mOrdinal, 4999U);
}
