// Counts per minute and per day, and what readers make of them.
#include "tests/unit/store/StoreFixture.h"

namespace {

class CountTest : public ZTCStoreTest {
protected:
    std::vector<ZTSBucket> minutes(const ZTSHistoryFilter& acrFilter = {}) {
        std::vector<ZTSBucket> lBuckets;
        history().visitMinutes(acrFilter, [&](const ZTSBucket& acrBucket) {
            lBuckets.push_back(acrBucket);
            return true;
        });
        return lBuckets;
    }
    std::vector<ZTSBucket> days() {
        std::vector<ZTSBucket> lBuckets;
        history().visitDays({}, [&](const ZTSBucket& acrBucket) {
            lBuckets.push_back(acrBucket);
            return true;
        });
        return lBuckets;
    }
};

}  // namespace

TEST_F(CountTest, ARecordWithinOneMinuteCountsThereAndAnyOtherInItsLastMinuteAsSpread) {
    take({makeQueueFull(gcPortA, gcBase, gcBase + gcMinute - 1, 3),
          makeQueueFull(gcPortA, gcBase, gcBase + gcMinute, 4),
          makeQueueFull(gcPortA, gcBase + gcMinute, gcBase + gcMinute, 5)});
    const auto lMinutes = minutes();
    ASSERT_EQ(lMinutes.size(), 2U);
    EXPECT_EQ(toMicroseconds(lMinutes[0].mFrom), gcBase);
    EXPECT_EQ(lMinutes[0].mOccurrences, 3U);
    EXPECT_EQ(lMinutes[0].mSpread, 0U);
    EXPECT_EQ(toMicroseconds(lMinutes[1].mFrom), gcBase + gcMinute);
    EXPECT_EQ(lMinutes[1].mOccurrences, 9U);
    EXPECT_EQ(lMinutes[1].mSpread, 4U);
    EXPECT_EQ(lMinutes[1].mRemotePort->mWwpn, makeName(gcPortA));
    const auto lDays = days();
    ASSERT_EQ(lDays.size(), 1U);
    EXPECT_EQ(lDays[0].mOccurrences, 12U);
    EXPECT_EQ(lDays[0].mSpread, 0U);
}

TEST_F(CountTest, TransactionsOfOneMinuteAddUp) {
    for (const std::uint32_t lOccurrences : {3U, 4U, 5U}) {
        take({makeQueueFull(gcPortA, gcBase, gcBase, lOccurrences)});
    }
    const auto lMinutes = minutes();
    ASSERT_EQ(lMinutes.size(), 1U);
    EXPECT_EQ(lMinutes[0].mOccurrences, 12U);
}

TEST_F(CountTest, ADayCountsLikewise) {
    const std::int64_t lMidnight = gcBase - gcBase % gcDay + gcDay;
    take({makeQueueFull(gcPortA, lMidnight - 1, lMidnight, 4), makeQueueFull(gcPortA, lMidnight, lMidnight, 5)});
    const auto lDays = days();
    ASSERT_EQ(lDays.size(), 1U);
    EXPECT_EQ(toMicroseconds(lDays[0].mFrom), lMidnight);
    EXPECT_EQ(lDays[0].mOccurrences, 9U);
    EXPECT_EQ(lDays[0].mSpread, 4U);
}

TEST_F(CountTest, TotalsAreExactAcrossTransactionsAndRestarts) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 3), makeQueueFull(gcPortB, gcBase, gcBase, 1)});
    closeStore();
    take({makeQueueFull(gcPortA, gcBase + gcDay, gcBase + gcDay, 4)});
    const auto lTotals = history().readTotals();
    ASSERT_EQ(lTotals.size(), 2U);
    EXPECT_EQ(lTotals[0].mOccurrences, 7U);
    EXPECT_EQ(toMicroseconds(lTotals[0].mLastEvent), gcBase + gcDay);
    EXPECT_EQ(lTotals[1].mOccurrences, 1U);
}

TEST_F(CountTest, PortsAreSummedOverWholeDaysAndTheMinutesAtTheirEnds) {
    // One event an hour for four days, from two ports in turn.
    std::vector<ZTSTestRecord> lRecords;
    for (int i = 0; i < 96; ++i) {
        const std::int64_t lTime = gcBase + i * 60 * gcMinute;
        lRecords.push_back(makeQueueFull(i % 2 == 0 ? gcPortA : gcPortB, lTime, lTime, 1));
    }
    lRecords.push_back({.mKind = gcPortBusy, .mData = makePortData(gcPortB), .mOccurrences = 1000, .mPortName = {}});
    take(lRecords);
    const auto lAll = history().readPorts({});
    ASSERT_EQ(lAll.size(), 2U);
    EXPECT_EQ(lAll[0].mPort.mWwpn, makeName(gcPortB)) << "most occurrences first";
    EXPECT_EQ(lAll[0].mOccurrences, 1048U);
    ASSERT_EQ(lAll[0].mCounts.size(), 2U);
    EXPECT_EQ(lAll[0].mCounts[0].mKind, gcPortBusy);
    EXPECT_EQ(lAll[0].mCounts[0].mOccurrences, 1000U);
    EXPECT_EQ(lAll[0].mInitiators.size(), 1U);
    EXPECT_EQ(toMicroseconds(lAll[0].mLastEvent), gcBase + 95 * 60 * gcMinute);
    for (const int lFrom : {0, 1, 13, 50, 95}) {
        for (const int lTo : {0, 2, 20, 60, 95}) {
            ZTSHistoryFilter lFilter;
            lFilter.mKinds = {gcQueueFull};
            lFilter.mSince = fromMicroseconds(gcBase + lFrom * 60 * gcMinute);
            lFilter.mUntil = fromMicroseconds(gcBase + lTo * 60 * gcMinute);
            std::uint64_t lSum = 0;
            for (const ZTSPortSummary& lrPort : history().readPorts(lFilter)) {
                lSum += lrPort.mOccurrences;
            }
            EXPECT_EQ(lSum, lTo < lFrom ? 0U : static_cast<unsigned>(lTo - lFrom + 1)) << lFrom << " " << lTo;
        }
    }
    ZTSHistoryFilter lPort;
    lPort.mPorts = {makeName(gcPortA)};
    ASSERT_EQ(history().readPorts(lPort).size(), 1U);
    EXPECT_EQ(history().readPorts(lPort)[0].mOccurrences, 48U);
    lPort.mPorts = {makeName(gcNode)};
    EXPECT_TRUE(history().readPorts(lPort).empty());
}

TEST_F(CountTest, ATimelineCanBeCutAndFiltered) {
    take({makeQueueFull(gcPortA, gcBase, gcBase), makeQueueFull(gcPortB, gcBase + gcMinute, gcBase + gcMinute),
          makeQueueFull(gcPortA, gcBase + 2 * gcMinute, gcBase + 2 * gcMinute)});
    ZTSHistoryFilter lFilter;
    lFilter.mSince = fromMicroseconds(gcBase + gcMinute + 5);
    EXPECT_EQ(minutes(lFilter).size(), 2U);
    lFilter.mPorts = {makeName(gcPortA)};
    EXPECT_EQ(minutes(lFilter).size(), 1U);
}
