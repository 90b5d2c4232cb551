// Questions to the history: filters, limits, pages, and readers beside the writer.
#include "sensor/store/include/History.h"

#include <set>

#include "sensor/store/src/RecordWindow.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

class HistoryTest : public ZTCStoreTest {
protected:
    /// Eight closed or open episodes, a day apart; their LUNs are their numbers.
    void SetUp() override {
        for (int i = 0; i < 8; ++i) {
            const std::int64_t lTime = gcBase + i * gcDay;
            ZTSTestRecord lRecord =
                makeQueueFull(i % 2 == 0 ? gcPortA : gcPortB, lTime, lTime + gcSecond, 1, static_cast<unsigned>(i));
            if (i == 5) {
                lRecord = {
                    .mKind = gcLink, .mData = makeGenericData(), .mBegin = lTime, .mEnd = lTime, .mPortName = {}};
            } else if (i == 6) {
                lRecord.mData = makeAllLunsBusyData(gcPortA);
            }
            take({lRecord}, lTime, i == 3 ? gcOtherLocalPort : gcLocalPort);
        }
        closeAt(gcBase + 7 * gcDay);
    }
    /// Numbers of the matching episodes: 0 is the first of SetUp().
    std::vector<int> find(const ZTSHistoryFilter& acrFilter) {
        std::vector<int> lFound;
        for (const ZTSEpisode& lrEpisode : episodes(acrFilter)) {
            lFound.push_back(static_cast<int>((toMicroseconds(lrEpisode.mFirst) - gcBase) / gcDay));
        }
        return lFound;
    }
    static ZTSHistoryFilter filter(const std::function<void(ZTSHistoryFilter&)>& acrSet) {
        ZTSHistoryFilter lFilter;
        acrSet(lFilter);
        return lFilter;
    }
};

using Found = std::vector<int>;

}  // namespace

TEST_F(HistoryTest, EveryFieldOfTheFilterChooses) {
    EXPECT_EQ(find({}), (Found{0, 1, 2, 3, 4, 5, 6, 7}));
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mKinds = {gcLink}; })), (Found{5}));
    EXPECT_EQ(find(filter([](auto& arFilter) {
                  arFilter.mKinds = {gcLink, gcQueueFull};
              })),
              (Found{0, 1, 2, 3, 4, 5, 6, 7}));
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mPorts = {makeName(gcPortB)}; })), (Found{1, 3, 7}));
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mPorts = {makeName(gcNode)}; })), (Found{}));
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mInitiators = {makeName(gcOtherLocalPort)}; })), (Found{3}));
    EXPECT_EQ(find(filter([](auto& arFilter) {
                  arFilter.mLuns = {2, 4};
              })),
              (Found{2, 4, 6}))
        << "an episode of all LUNs matches every number";
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mIsAllLuns = true; })), (Found{6}));
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mIsOpenOnly = true; })), (Found{7}));
    EXPECT_EQ(find(filter([](auto& arFilter) {
                  arFilter.mPorts = {makeName(gcPortA)};
                  arFilter.mLuns = {0};
              })),
              (Found{0, 6}));
}

TEST_F(HistoryTest, TimesChooseEpisodesThatOverlapThem) {
    const auto lAt = [](std::int64_t aTime) { return fromMicroseconds(gcBase + aTime); };
    EXPECT_EQ(find(filter([&](auto& arFilter) { arFilter.mSince = lAt(6 * gcDay + gcSecond); })), (Found{6, 7}));
    EXPECT_EQ(find(filter([&](auto& arFilter) { arFilter.mSince = lAt(6 * gcDay + gcSecond + 1); })), (Found{7}));
    EXPECT_EQ(find(filter([&](auto& arFilter) { arFilter.mUntil = lAt(gcDay); })), (Found{0, 1}));
    EXPECT_EQ(find(filter([&](auto& arFilter) { arFilter.mUntil = lAt(gcDay - 1); })), (Found{0}));
    EXPECT_EQ(find(filter([&](auto& arFilter) {
                  arFilter.mSince = lAt(2 * gcDay);
                  arFilter.mUntil = lAt(3 * gcDay);
              })),
              (Found{2, 3}));
    EXPECT_EQ(find(filter([&](auto& arFilter) { arFilter.mSince = lAt(100 * gcDay); })), (Found{}));
}

TEST_F(HistoryTest, ALimitGivesTheNewestInTheOrderOfTheirArrival) {
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mLimit = 3; })), (Found{5, 6, 7}));
    EXPECT_EQ(find(filter([](auto& arFilter) {
                  arFilter.mLimit = 2;
                  arFilter.mPorts = {makeName(gcPortB)};
              })),
              (Found{3, 7}));
}

TEST_F(HistoryTest, WhatChangedBehindANumberCanBeFollowed) {
    const std::uint64_t lLast = history().getLastSeq();
    EXPECT_TRUE(changes(filter([&](auto& arFilter) { arFilter.mAfterSeq = lLast; })).empty());
    take({makeQueueFull(gcPortB, gcBase + 7 * gcDay + gcSecond, gcBase + 7 * gcDay + gcSecond)},
         gcBase + 7 * gcDay + 60 * gcSecond);
    take({makeQueueFull(gcPortA, gcBase + 8 * gcDay, gcBase + 8 * gcDay)});
    const auto lChanges = changes(filter([&](auto& arFilter) { arFilter.mAfterSeq = lLast; }));
    ASSERT_EQ(lChanges.size(), 2U);
    EXPECT_EQ(lChanges[0].mPhase, ZTP_Update);
    EXPECT_EQ(lChanges[1].mPhase, ZTP_Open);
    EXPECT_EQ(find(filter([&](auto& arFilter) { arFilter.mAfterSeq = lLast; })), (Found{7, 8}));
    EXPECT_EQ(changes(filter([&](auto& arFilter) { arFilter.mLimit = 1; })).size(), 1U);
    EXPECT_EQ(records(filter([&](auto& arFilter) { arFilter.mAfterSeq = lLast; })).size(), 2U);
}

TEST_F(HistoryTest, AnEpisodeIsFoundByItsNumberAndByAnyOfItsChanges) {
    for (const ZTSEpisode& lrChange : changes()) {
        ASSERT_TRUE(history().findEpisodeBySeq(lrChange.mSeq).has_value());
        EXPECT_EQ(history().findEpisodeBySeq(lrChange.mSeq)->mEpisode, lrChange.mEpisode);
        EXPECT_EQ(history().findEpisode(lrChange.mEpisode)->mCount, lrChange.mCount);
    }
    EXPECT_EQ(history().findEpisode(999), std::nullopt);
    EXPECT_EQ(history().findEpisodeBySeq(history().getLastSeq() + 1), std::nullopt);
}

TEST_F(HistoryTest, RecordsAreChosenEachByItself) {
    EXPECT_EQ(records().size(), 8U);
    EXPECT_EQ(records(filter([](auto& arFilter) { arFilter.mLimit = 3; })).front().mRecord.mEventData,
              makeGenericData());
    EXPECT_EQ(records(filter([](auto& arFilter) { arFilter.mLuns = {1}; })).size(), 2U);
    take({makeQueueFull(gcPortB, gcBase + 7 * gcDay + 50 * gcSecond, gcBase + 7 * gcDay + 50 * gcSecond, 1, 1)});
    EXPECT_EQ(records(filter([](auto& arFilter) {
                  arFilter.mSince = fromMicroseconds(gcBase + 7 * gcDay + 10 * gcSecond);
              })).size(),
              1U);
    EXPECT_EQ(records(filter([](auto& arFilter) {
                  arFilter.mSince = fromMicroseconds(gcBase + 7 * gcDay);
                  arFilter.mLuns = {1};
              })).size(),
              1U);
}

TEST_F(HistoryTest, AVisitorEndsAVisitWhenItReturnsFalse) {
    for (const std::uint64_t lLimit : std::initializer_list<std::uint64_t>{0, 5}) {
        int lVisited = 0;
        ZTSHistoryFilter lFilter;
        lFilter.mLimit = lLimit;
        history().visitEpisodes(lFilter, [&](const ZTSEpisode&) { return ++lVisited < 2; });
        EXPECT_EQ(lVisited, 2);
        history().visitRecords(lFilter, [&](const ZTSStoredRecord&) { return ++lVisited < 4; });
        EXPECT_EQ(lVisited, 4);
    }
    int lVisited = 0;
    history().visitMinutes({}, [&](const ZTSBucket&) { return ++lVisited < 2; });
    EXPECT_EQ(lVisited, 2);
}

TEST_F(HistoryTest, MoreEpisodesThanAPageHoldsComeOnceEachAndInOrder) {
    static constexpr unsigned scCount = 40000;
    std::vector<ZTSTestRecord> lRecords;
    for (unsigned i = 0; i < scCount; ++i) {
        lRecords.push_back(makeQueueFull(gcPortA + 1000 + i, gcBase + 9 * gcDay, gcBase + 9 * gcDay));
    }
    take(lRecords);
    std::uint64_t lBefore = 0;
    std::uint64_t lCount = 0;
    history().visitEpisodes({}, [&](const ZTSEpisode& acrEpisode) {
        EXPECT_GT(acrEpisode.mEpisode, lBefore);
        lBefore = acrEpisode.mEpisode;
        return ++lCount != 0;
    });
    EXPECT_EQ(lCount, scCount + 8);
    ZTSHistoryFilter lFilter;
    lFilter.mLimit = scCount - 10;
    EXPECT_EQ(episodes(lFilter).size(), scCount - 10);
    EXPECT_EQ(find(filter([](auto& arFilter) { arFilter.mKinds = {gcLink}; })), (Found{5}));
    lFilter.mLimit = 0;
    EXPECT_EQ(history().readPorts(lFilter).size(), scCount + 2);
    EXPECT_EQ(changes().size(), 8U + 7U + scCount);
}

TEST_F(HistoryTest, AReaderSeesCommitsAndNothingElse) {
    EXPECT_EQ(episodes().size(), 8U);
    ZTCStoreTransaction lTransaction = store().begin();
    store().takeIn(100, gcGeneration, makeBody({makeQueueFull(gcPortA, gcBase + 9 * gcDay, gcBase + 9 * gcDay)}), false,
                   fromMicroseconds(gcBase));
    EXPECT_EQ(episodes().size(), 8U);
    lTransaction.commit();
    EXPECT_EQ(episodes().size(), 9U);
}

TEST_F(HistoryTest, AChunkThatIsDamagedIsNoRecordAndNoCrash) {
    ZTCPendingRecords lPending;
    for (unsigned i = 0; i < 3; ++i) {
        lPending.add(7 + i, encodeRecord(makeQueueFull(gcPortA, gcBase, gcBase + i, i + 1)));
    }
    const ZTCStoreBytes lChunk = lPending.getChunk();
    EXPECT_LT(lChunk.size(), 150U) << "like records are stored as their differences";
    std::vector<std::uint32_t> lOccurrences;
    visitChunk(lChunk, [&](std::uint64_t aSeq, const ZTSRecordView& acrRecord) {
        EXPECT_EQ(aSeq, 7 + lOccurrences.size());
        lOccurrences.push_back(acrRecord.mOccurrences);
    });
    EXPECT_EQ(lOccurrences, (std::vector<std::uint32_t>{1, 2, 3}));
    const auto lRead = [](const ZTCStoreBytes& acrChunk) {
        std::size_t lCount = 0;
        try {
            visitChunk(acrChunk, [&](std::uint64_t, const ZTSRecordView&) { ++lCount; });
        } catch (const ZTCStoreDamagedEx&) {
            return std::pair(lCount, false);
        }
        return std::pair(lCount, true);
    };
    std::size_t lWhole = 0;
    for (std::size_t i = 0; i < lChunk.size(); ++i) {
        const auto [lCount, lIsWhole] = lRead(ZTCStoreBytes(lChunk.begin(), lChunk.begin() + static_cast<long>(i)));
        EXPECT_LT(lCount, 3U) << i;
        lWhole += lIsWhole ? 1 : 0;
        ZTCStoreBytes lChanged = lChunk;
        lChanged[i] ^= 0xFF;
        EXPECT_LE(lRead(lChanged).first, 100U);
    }
    EXPECT_EQ(lWhole, 3U) << "only at the ends of records, the empty chunk included";
}
