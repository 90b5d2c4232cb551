// The journal's size, and operations that take long.
#include <algorithm>

#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

class UpkeepTest : public ZTCStoreTest {
protected:
    /// A frame that writes about half a megabyte: every record begins an episode.
    void takeMuch() {
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = 0; i < 1000; ++i) {
            lRecords.push_back(makeQueueFull(gcPortA + mNext++, gcBase, gcBase));
        }
        take(lRecords);
    }
    std::uint64_t mNext = 0;
};

constexpr std::uint64_t scLimit = 4 * 1024 * 1024;

}  // namespace

TEST_F(UpkeepTest, TheJournalStaysNearItsLimitWhileMuchIsTakenIn) {
    std::uint64_t lMost = 0;
    std::uint64_t lLargestFrame = 0;
    for (int i = 0; i < 40; ++i) {
        const std::uint64_t lBefore = store().getJournalBytes();
        takeMuch();
        const std::uint64_t lAfter = store().getJournalBytes();
        lLargestFrame = std::max(lLargestFrame, lAfter > lBefore ? lAfter - lBefore : 0);
        lMost = std::max(lMost, lAfter);
        store().checkpoint();
    }
    EXPECT_GT(lMost, scLimit) << "the limit was reached";
    EXPECT_LE(lMost, scLimit + 2 * lLargestFrame);
    EXPECT_GT(store().getDatabaseBytes(), scLimit);
    expectIntegrity(path());
}

TEST_F(UpkeepTest, ASmallJournalIsLeftAlone) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    const std::uint64_t lBytes = store().getDatabaseBytes();
    store().checkpoint();
    EXPECT_EQ(store().getDatabaseBytes(), lBytes);
}

TEST_F(UpkeepTest, AnOperationThatTakesLongIsReportedWithItsNameAndDuration) {
    mLimits.mReportAfter = std::chrono::hours(1);
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    EXPECT_TRUE(mReports.empty());
    mLimits.mReportAfter = std::chrono::milliseconds(0);
    store().setLimits(mLimits);
    mReports.clear();
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    const auto lIsReported = [&](const std::string& acrStart) {
        return std::ranges::any_of(mReports, [&](const std::string& acrLine) { return acrLine.starts_with(acrStart); });
    };
    EXPECT_TRUE(lIsReported("history: takeIn took "));
    EXPECT_TRUE(lIsReported("history: commit took "));
}
