#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <iostream>

#include "tests/collector/PagedAgent.h"
#include "tests/support/Seed.h"

// The real collector is killed at its system calls, exactly before or exactly after them. ZT_SENSOR_KILL_RUNS is the
// number of kills; with ZT_SENSOR_KILL_EVERY there is one at each call of a whole run. See scripts/check-sensor-kills.

static unsigned sRuns() {
    const char* const lpRuns = std::getenv("ZT_SENSOR_KILL_RUNS");
    return lpRuns != nullptr ? static_cast<unsigned>(std::strtoul(lpRuns, nullptr, 10)) : 30;
}

/// Each stop of a whole run, in parts that go on beside each other: part 2 of 3 has the stops 2, 5, 8 ... "2/3".
struct ZTSPart {
    unsigned mFirst = 0;  ///< 0: not each stop
    unsigned mStep = 1;

    ZTSPart() {
        if (const char* const lpPart = std::getenv("ZT_SENSOR_KILL_EVERY")) {
            std::sscanf(lpPart, "%u/%u", &mFirst, &mStep);
        }
    }
};

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
        try {
            mStage.waitFor([this] { return isAllStored(); }, "all that happened in the history");
        } catch (const std::runtime_error& lrEx) {
            FAIL() << lrEx.what() << ": " << mAgent->getHappened() << " happened, " << mAgent->getHandedOver()
                   << " were handed over, " << mStage.countStored() << " are stored; the collector "
                   << (mStage.isRunning() ? "runs: " + mStage.status().dump(2) : "has ended");
        }
    }
    ZTSKilledRun runAndKill(unsigned aStop) {
        return mStage.runAndKillCollector(aStop, [this] { return isAllStored() && mStage.spoolFiles().empty(); });
    }
    /// After a kill: the next collector stores all of it, each once.
    void expectNothingLost() {
        mStage.startCollector();
        ASSERT_NO_FATAL_FAILURE(waitUntilStored());
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

    /// Random ones of the stops of a whole run. Runs differ: the shortest one says how many there are.
    void killAtSomeStops(unsigned aStops) {
        ZTCTestSeed lSeed;
        unsigned lKilled = 0;
        for (unsigned lRun = 0; lRun < sRuns(); ++lRun) {
            const unsigned lStop = 1 + lSeed.below(aStops);
            SCOPED_TRACE("killed at stop " + std::to_string(lStop));
            mAgent->happen(1 + lSeed.below(300), 1 + lSeed.below(5));
            const ZTSKilledRun lKill = runAndKill(lStop);
            lKilled += lKill.mIsKilled ? 1 : 0;
            aStops = std::min(aStops, lKill.mIsKilled ? aStops : lKill.mStops);
            ASSERT_NO_FATAL_FAILURE(expectNothingLost());
        }
        std::cout << lKilled << " collectors killed, at some of the " << aStops << " stops of a whole run\n";
        EXPECT_GT(lKilled, sRuns() / 4);
    }
    /// The first, the second, the third ... Runs differ by a few stops: it is over when three in a row have come to
    /// their end before their stop.
    void killAtEachStop(const ZTSPart& acrPart, unsigned aStops) {
        unsigned lKilled = 0;
        unsigned lLast = 0;
        unsigned lEnded = 0;
        for (unsigned lStop = acrPart.mFirst; lEnded < 3 && !HasFailure(); lStop += acrPart.mStep) {
            SCOPED_TRACE("killed at stop " + std::to_string(lStop));
            mAgent->happen(100, 3);
            const bool lIsKilled = runAndKill(lStop).mIsKilled;
            lEnded = lIsKilled ? 0 : lEnded + 1;
            if (lIsKilled) {
                ++lKilled;
                lLast = lStop;
            }
            ASSERT_NO_FATAL_FAILURE(expectNothingLost());
        }
        std::cout << lKilled << " collectors killed, at the stops " << acrPart.mFirst << ", "
                  << acrPart.mFirst + acrPart.mStep << " ... " << lLast << "; a whole run had " << aStops << std::endl;
        EXPECT_GT(lKilled, aStops / acrPart.mStep / 2);
    }

    ZTCCollectorStage mStage{"collect.period = 60\n"};
    std::unique_ptr<ZTCPagedAgent> mAgent;
};

TEST_F(CollectorKillTest, KilledAtASystemCallNothingIsLostAndNothingCountsTwice) {
    mAgent->happen(100);
    const ZTSKilledRun lWhole = runAndKill(~0U);
    if (!lWhole.mIsTraced) {
        GTEST_SKIP() << "processes cannot be traced here";
    }
    ASSERT_FALSE(lWhole.mIsKilled);
    const ZTSPart lPart;
    lPart.mFirst != 0 ? killAtEachStop(lPart, lWhole.mStops) : killAtSomeStops(lWhole.mStops);
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
