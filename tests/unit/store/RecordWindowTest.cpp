#include "sensor/store/src/RecordWindow.h"

#include <gtest/gtest.h>

#include <map>

#include "tests/support/Seed.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

/// Bytes of a row beyond which SQLite gives the rest a page of its own.
constexpr std::size_t scMostRowBytes = 1002;

/// A window whose rows are kept here instead of in a database.
class RecordWindowTest : public testing::Test {
protected:
    void add() {
        const std::int64_t lTime = gcBase + static_cast<std::int64_t>(mCount);
        const auto lOccurrences = static_cast<std::uint32_t>(1 + mCount % 7);
        const ZTCBytes lBytes = encodeRecord(makeQueueFull(gcPortA, lTime, lTime, lOccurrences));
        mWindow.add(mCount, scFirstSeq + mCount, lBytes, mLimit);
        ++mCount;
    }
    void flush() {
        mWindow.flush(
            mCount, mLimit,
            [this](std::uint64_t aOrdinal, std::size_t aCount, const ZTCStoreBytes& acrChunk) {
                EXPECT_TRUE(mRows.emplace(aOrdinal, std::pair(aCount, acrChunk)).second) << aOrdinal;
                EXPECT_LT(acrChunk.size(), scMostRowBytes);
            },
            [this](std::uint64_t aOrdinal) { EXPECT_EQ(mRows.erase(aOrdinal), 1U) << aOrdinal; });
    }
    /// The first and the last records are there, and of the others none that a whole row could have been without.
    void expectBothEnds() const {
        std::map<std::uint64_t, std::uint32_t> lKept;
        for (const auto& [lrOrdinal, lrRow] : mRows) {
            std::uint64_t lOrdinal = lrOrdinal;
            visitChunk(lrRow.second, [&](std::uint64_t aSeq, const ZTSRecordView& acrRecord) {
                EXPECT_EQ(aSeq, scFirstSeq + lOrdinal);
                lKept[lOrdinal++] = acrRecord.mOccurrences;
            });
            EXPECT_EQ(lOrdinal, lrOrdinal + lrRow.first);
            const bool lIsHead = lrOrdinal < mLimit;
            EXPECT_TRUE(lIsHead || lOrdinal + mLimit > mCount) << "a row that is needed no more: " << lrOrdinal;
        }
        for (std::uint64_t i = 0; i < mCount; ++i) {
            if (i < mLimit || i + mLimit >= mCount) {
                ASSERT_TRUE(lKept.contains(i)) << i << " of " << mCount;
                EXPECT_EQ(lKept.at(i), 1 + i % 7);
            }
        }
    }

    static constexpr std::uint64_t scFirstSeq = 1000;
    ZTCRecordWindow mWindow;
    std::map<std::uint64_t, std::pair<std::size_t, ZTCStoreBytes>> mRows;
    std::uint64_t mCount = 0;
    std::uint64_t mLimit = 100;
};

}  // namespace

TEST_F(RecordWindowTest, KeepsBothEndsOfARunThatComesInOneTransaction) {
    for (unsigned i = 0; i < 5000; ++i) {
        add();
    }
    flush();
    expectBothEnds();
    EXPECT_LT(mRows.size(), 20U);
}

TEST_F(RecordWindowTest, KeepsBothEndsHoweverTheRecordsAreSharedOutToTransactions) {
    ZTCTestSeed lSeed;
    for (const std::uint64_t lLimit : {1U, 2U, 7U, 100U}) {
        SCOPED_TRACE("limit " + std::to_string(lLimit));
        mWindow = {};
        mRows.clear();
        mCount = 0;
        mLimit = lLimit;
        for (unsigned lTransaction = 0; lTransaction < 60; ++lTransaction) {
            for (unsigned i = lSeed.below(lTransaction % 5 == 0 ? 400 : 12); i > 0; --i) {
                add();
            }
            flush();
            expectBothEnds();
        }
    }
}

TEST_F(RecordWindowTest, KeepsNothingWhereTheLimitIsNone) {
    mLimit = 0;
    add();
    flush();
    EXPECT_TRUE(mRows.empty());
}
