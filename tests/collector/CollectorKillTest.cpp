#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <iostream>

#include "tests/collector/PagedAgent.h"
#include "tests/support/Seed.h"

// The real collector is killed at its system calls, exactly before or exactly after them. ZT_SENSOR_KILL_RUNS is the
// number of kills; scripts/check-sensor-kills runs many.

static unsigned sRuns() {
    const char* const lpRuns = std::getenv("ZT_SENSOR_KILL_RUNS");
    return lpRuns != nullptr ? static_cast<unsigned>(std::strtoul(lpRuns, nullptr, 10)) : 30;
}

class CollectorKillTest : public testing::Test {
protected:
    void SetUp() override {
        mAgent = std::make_unique<ZTCPagedAgent>(mStage, mStage.announceStart(4711));
        mStage.startCollector();
        mAgent->happen(5);
        waitUntilStored();
        mStage.killCollector();
    }
    bool isAllStored() const { return mStage.countStored() == mAgent->getHappened(); }
    void waitUntilStored() {
        mStage.waitFor([this] { return isAllStored(); }, "all that happened in the history");
    }
    ZTSKilledRun runAndKill(unsigned aStop) {
        return mStage.runAndKillCollector(aStop, [this] { return isAllStored() && mStage.spoolFiles().empty(); });
    }
    /// After a kill: the next collector stores all of it, each once.
    void expectNothingLost() {
        mStage.startCollector();
        waitUntilStored();
        mStage.waitFor([this] { return mStage.spoolFiles().empty(); }, "an empty spool");
        mStage.killCollector();
        if (!mStage.spoolFiles().empty()) {
            // It was killed while it asked once more.
            mStage.startCollector();
            mStage.waitFor([this] { return mStage.spoolFiles().empty(); }, "an empty spool");
            mStage.killCollector();
        }
        mStage.expectSound();
        EXPECT_TRUE(mStage.history()->readGaps().empty());
    }

    ZTCCollectorStage mStage{"collect.period = 60\n"};
    std::unique_ptr<ZTCPagedAgent> mAgent;
};

TEST_F(CollectorKillTest, KilledAtASystemCallNothingIsLostAndNothingCountsTwice) {
    ZTCTestSeed lSeed;
    mAgent->happen(100);
    const ZTSKilledRun lWhole = runAndKill(~0U);
    if (!lWhole.mIsTraced) {
        GTEST_SKIP() << "processes cannot be traced here";
    }
    ASSERT_FALSE(lWhole.mIsKilled);
    unsigned lKilled = 0;
    for (unsigned lRun = 0; lRun < sRuns(); ++lRun) {
        const unsigned lStop = 1 + lSeed.below(lWhole.mStops);
        SCOPED_TRACE("killed at stop " + std::to_string(lStop));
        mAgent->happen(1 + lSeed.below(300), 1 + lSeed.below(5));
        lKilled += runAndKill(lStop).mIsKilled ? 1 : 0;
        ASSERT_NO_FATAL_FAILURE(expectNothingLost());
    }
    std::cout << lKilled << " collectors killed, at some of the " << lWhole.mStops << " stops of a whole run\n";
    EXPECT_GT(lKilled, sRuns() / 2);
}

TEST_F(CollectorKillTest, KilledInTheMiddleOfALargeResponseTheResponseIsComplete) {
    ZTCTestSeed lSeed;
    mAgent->setPadding(2 << 20);
    for (int i = 0; i < 5; ++i) {
        mStage.startCollector();
        mAgent->happen(64);
        // The answer is larger than the FIFO: somewhere while it comes.
        mStage.waitFor(
            [this] {
                for (const std::string& lrName : mStage.spoolFiles()) {
                    const std::string lPath = mStage.stateDirectory() + "/spool/" + lrName;
                    std::error_code lError;
                    if (lrName.ends_with(".part") && std::filesystem::file_size(lPath, lError) > 4 && !lError) {
                        return true;
                    }
                }
                return isAllStored();
            },
            "a response that comes");
        mStage.killCollector();
        ASSERT_NO_FATAL_FAILURE(expectNothingLost());
    }
}
