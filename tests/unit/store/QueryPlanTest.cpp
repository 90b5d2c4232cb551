// The plan of each statement that the store and the history run: none scans a table that grows.
#include <sqlite3.h>

#include <algorithm>
#include <set>

#include "sensor/store/src/Database.h"
#include "tests/unit/store/FullStore.h"
#include "tests/unit/store/Integrity.h"

namespace {

/// They grow with the events, the time, or what changes in the SAN.
const std::set<std::string> gcGrowing = {"change", "coverage",    "day",    "episode", "frame", "gap",     "gapCount",
                                         "minute", "portCounter", "record", "run",     "scan",  "topology"};

/// While it lives: each statement that any connection of this process runs, once.
class ZTCStatementLog {
public:
    ZTCStatementLog() {
        gStatements.clear();
        sqlite3_auto_extension(reinterpret_cast<void (*)()>(&watch));
    }
    ~ZTCStatementLog() { sqlite3_cancel_auto_extension(reinterpret_cast<void (*)()>(&watch)); }
    ZTCStatementLog(const ZTCStatementLog&) = delete;
    ZTCStatementLog& operator=(const ZTCStatementLog&) = delete;

    static const std::set<std::string>& getStatements() { return gStatements; }

private:
    static int watch(sqlite3* apHandle, const char**, const void*) {
        return sqlite3_trace_v2(apHandle, SQLITE_TRACE_STMT, &note, nullptr);
    }
    static int note(unsigned, void*, void* apStatement, void*) {
        gStatements.insert(sqlite3_sql(static_cast<sqlite3_stmt*>(apStatement)));
        return 0;
    }
    static inline std::set<std::string> gStatements;
};

bool isPlanned(const std::string& acrSql) {
    return std::ranges::any_of(std::vector{"SELECT", "DELETE", "UPDATE", "INSERT", "WITH"},
                               [&](const char* apVerb) { return acrSql.starts_with(apVerb); });
}

/// The first row of an index or of a table, and nothing else.
bool isOneRow(const std::string& acrSql) {
    return acrSql.ends_with("LIMIT 1") && acrSql.find("WHERE") == std::string::npos;
}

class QueryPlanTest : public ZTCFullStoreTest {
protected:
    void readAll() {
        ZTSHistoryFilter lOnePort;
        lOnePort.mPorts = {makeName(gcPortA)};
        ZTSHistoryFilter lOpen;
        lOpen.mIsOpenOnly = true;
        ZTSHistoryFilter lNewest;
        lNewest.mSince = fromMicroseconds(gcBase);
        lNewest.mUntil = fromMicroseconds(endOf(3));
        lNewest.mAfterSeq = 2;
        lNewest.mLimit = 3;
        episodes(lOpen);
        for (const ZTSHistoryFilter& lrFilter : {ZTSHistoryFilter{}, lOnePort, lNewest}) {
            const auto lAll = [](const auto&) { return true; };
            history().visitChanges(lrFilter, lAll);
            history().visitRecords(lrFilter, lAll);
            history().visitMinutes(lrFilter, lAll);
            history().visitDays(lrFilter, lAll);
            history().readPorts(lrFilter);
            ASSERT_FALSE(episodes(lrFilter).empty());
        }
        const ZTSEpisode lEpisode = episodes().front();
        EXPECT_TRUE(history().findEpisode(lEpisode.mEpisode));
        EXPECT_TRUE(history().findEpisodeBySeq(lEpisode.mSeq));
        EXPECT_FALSE(history().readLedger().empty());
        EXPECT_FALSE(history().readTotals().empty());
        EXPECT_FALSE(history().readGaps(fromMicroseconds(gcBase)).empty());
        EXPECT_FALSE(history().readCoverage(fromMicroseconds(gcBase)).empty());
        EXPECT_FALSE(history().readRuns(fromMicroseconds(gcBase)).empty());
        auto lTopology = history().readTopology(endOf(2));
        ASSERT_TRUE(lTopology);
        history().advanceTopology(*lTopology, endOf(2), endOf(4));
        EXPECT_FALSE(history().readTopologyChanges(gcBase, endOf(4)).empty());
        history().readMostWays(gcBase, endOf(4));
        EXPECT_FALSE(history().readCounters(gcBase, endOf(4), 100).empty());
        EXPECT_FALSE(history().readMarks().empty());
        EXPECT_EQ(history().getValue("outlet.test.seq"), "1");
        EXPECT_FALSE(history().readInitiators().empty());
        EXPECT_FALSE(history().readRemotePorts().empty());
        history().readRetrievalTotals();
    }
    void retireAll() {
        mLimits.mDays = 1;
        mLimits.mBytes = 1;
        for (auto lSteady = std::chrono::steady_clock::time_point(std::chrono::hours(1000)); rows() != 0;
             lSteady += std::chrono::hours(1)) {
            store().retireStep(fromMicroseconds(endOf(100)), lSteady);
        }
    }
    std::size_t rows() { return episodes().size(); }
};

}  // namespace

TEST_F(QueryPlanTest, NoStatementOfAWholeLifeScansATableThatGrows) {
    std::set<std::string> lStatements;
    {
        const ZTCStatementLog lLog;
        liveFor(5);
        EXPECT_FALSE(store().hasFrame(4711));
        EXPECT_TRUE(store().hasEnded("agent1"));
        store().sumCountsOfOthers("agent1");
        ASSERT_NO_FATAL_FAILURE(readAll());
        retireAll();
        mHistory.reset();
        closeStore();
        lStatements = ZTCStatementLog::getStatements();
    }
    ZTCDatabase lDatabase(path(), ZTDA_ReadOnly);
    unsigned lPlanned = 0;
    for (const std::string& lrSql : lStatements) {
        if (!isPlanned(lrSql) || isOneRow(lrSql)) {
            continue;
        }
        ++lPlanned;
        ZTCStatement lPlan(lDatabase, "EXPLAIN QUERY PLAN " + lrSql);
        lPlan.query();
        while (lPlan.step()) {
            const std::string lStep = lPlan.text(3);
            const bool lIsScan = lStep.starts_with("SCAN ");
            const std::string lTable = lIsScan ? lStep.substr(5, lStep.find(' ', 5) - 5) : "";
            EXPECT_FALSE(gcGrowing.contains(lTable)) << lrSql << "\n" << lStep;
        }
    }
    EXPECT_GT(lPlanned, 80U) << "a whole life has more statements";
}
