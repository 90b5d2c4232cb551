// What one step of the upkeep does has a bound, whatever there is to do, and is named when it takes long.
#include <algorithm>

#include "sensor/store/src/Database.h"
#include "tests/unit/store/FullStore.h"
#include "tests/unit/store/Integrity.h"

namespace {

/// As Store.h says.
constexpr std::int64_t scPagesPerStep = 256;

class StepTest : public ZTCFullStoreTest {
protected:
    std::vector<std::string> tables() {
        std::vector<std::string> lNames;
        ZTCDatabase lDatabase(path(), ZTDA_ReadOnly);
        ZTCStatement lTables(lDatabase, "SELECT name FROM sqlite_schema WHERE type = 'table'");
        lTables.query();
        while (lTables.step()) {
            lNames.push_back(lTables.text(0));
        }
        return lNames;
    }
    /// Of all tables.
    std::int64_t rows() {
        std::int64_t lRows = 0;
        for (const std::string& lrTable : tables()) {
            lRows += queryNumber(path(), "SELECT count(*) FROM " + lrTable);
        }
        return lRows;
    }
    std::int64_t pages() { return queryNumber(path(), "PRAGMA page_count"); }
    /// One more, an hour after the last one: each may begin a day. Returns whether there is more to do.
    bool step() {
        mSteady += std::chrono::hours(1);
        return store().retireStep(fromMicroseconds(endOf(100)), mSteady);
    }
    /// More than the journal's limit.
    void takeManyEpisodes() {
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = 0; i < 12000; ++i) {
            lRecords.push_back(makeQueueFull(gcPortA + i, gcBase, gcBase));
        }
        take(lRecords);
    }
    bool isReported(const std::string& acrStart) const {
        return std::ranges::any_of(mReports, [&](const std::string& acrLine) { return acrLine.starts_with(acrStart); });
    }

    std::chrono::steady_clock::time_point mSteady{std::chrono::hours(1000)};
};

}  // namespace

TEST_F(StepTest, DeletesAtMostAsManyRowsOfAllTablesAsTheLimitSays) {
    liveFor(6);
    for (const std::string& lrTable : tables()) {
        EXPECT_GT(queryNumber(path(), "SELECT count(*) FROM " + lrTable), 0) << lrTable << " is empty";
    }
    mLimits.mDays = 1;
    mLimits.mStepRows = 10;
    std::int64_t lBefore = rows();
    unsigned lSteps = 0;
    for (unsigned lIdle = 0; lIdle < 2 && lSteps < 1000; ++lSteps) {
        lIdle = step() ? 0 : lIdle + 1;
        const std::int64_t lAfter = rows();
        ASSERT_LE(lBefore - lAfter, 10);
        lBefore = lAfter;
    }
    EXPECT_GT(lSteps, 20U);
    for (const char* const lpTable :
         {"episode", "record", "change", "minute", "day", "portCounter", "coverage", "gap", "gapCount"}) {
        EXPECT_EQ(queryNumber(path(), std::string("SELECT count(*) FROM ") + lpTable), 0) << lpTable;
    }
    expectIntegrity(path());
}

TEST_F(StepTest, GivesBackAtMost256Pages) {
    takeManyEpisodes();
    closeAt(gcBase + gcDay);
    mLimits.mDays = 1;
    mLimits.mStepRows = 1000000;
    store().setLimits(mLimits);
    const std::int64_t lWhole = pages();
    ASSERT_GT(lWhole, 3 * scPagesPerStep);
    std::int64_t lBefore = lWhole;
    bool lHasMore = true;
    while (lHasMore) {
        lHasMore = step();
        const std::int64_t lAfter = pages();
        ASSERT_LE(lBefore - lAfter, scPagesPerStep + 1) << "with a page of SQLite's own map of pages";
        lBefore = lAfter;
    }
    EXPECT_LT(lBefore, lWhole - 2 * scPagesPerStep);
}

TEST_F(StepTest, EachThatTakesLongIsReportedByItsName) {
    mLimits.mReportAfter = std::chrono::milliseconds(0);
    mLimits.mDays = 1;
    takeManyEpisodes();
    closeAt(gcBase + gcDay);
    store().checkpoint();
    while (step()) {
    }
    for (const char* const lpName : {"checkpoint", "retention", "vacuum"}) {
        EXPECT_TRUE(isReported("history: " + std::string(lpName) + " took ")) << lpName;
    }
}
