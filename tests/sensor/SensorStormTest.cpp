#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <iostream>

#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/support/Seed.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"

// The real sensor in storms. ZT_SENSOR_KILL_RUNS is the number of collectors that are killed;
// scripts/check-sensor-kills kills many.

static unsigned sRuns() {
    const char* const lpRuns = std::getenv("ZT_SENSOR_KILL_RUNS");
    return lpRuns != nullptr ? static_cast<unsigned>(std::strtoul(lpRuns, nullptr, 10)) : 6;
}

/// WWPN, and kind's name.
using ZTCCounts = std::map<std::pair<std::string, std::string>, std::uint64_t>;

/// A storm draws RSCNs of one to four pages, and one that is refused unread counts as one page: they come on their own,
/// with a page each, so that the counts are exact.
static constexpr const char* scStormOfOthers =
    "storm kind=plogi,prlo,adisc,lsrjt,logo,fabric-busy,port-busy,fcp-read-check,queue-full,device-busy,"
    "check-condition,lun-reset,target-reset,bus-reset,queue-depth,port-interrupt,link,temperature,adapter-arrival ";

static constexpr const char* scBoards[] = {"hba0", "hba1"};

class SensorStormTest : public testing::Test {
protected:
    /// Events on one board: they count for it.
    void deliver(std::size_t aBoard, const std::string& acrLine) {
        const std::map<std::string, std::uint64_t> lBefore = mSensor.countDelivered();
        mSensor.simulate(acrLine + " board=" + scBoards[aBoard]);
        for (const auto& [lrKind, lCount] : mSensor.countDelivered()) {
            mDelivered[aBoard][lrKind] += lCount - lBefore.at(lrKind);
        }
    }
    /// The one that runs, at this moment. False: it had just ended by itself.
    bool killCollector(std::chrono::milliseconds aMoment) const {
        pid_t lCollector = 0;
        waitUntil([&] { return (lCollector = mSensor.findCollector()) != 0; }, "a collector",
                  ZTCDeadline(6 * gcTestPatience));
        const ZTCDeadline lMoment(aMoment);
        waitUntil([&] { return lMoment.isOver(); }, "the moment of the kill");
        const bool lIsKilled = kill(lCollector, SIGKILL) == 0;
        waitUntil([&] { return mSensor.findCollector() != lCollector; }, "the collector's end");
        return lIsKilled;
    }
    /// For each board and kind: what the library delivered = stored + refused.
    void expectAllAccountedFor() {
        const ZTCHistory lHistory(mSensor.stateDirectory());
        std::map<std::string, std::map<std::string, std::uint64_t>> lAccounted;
        for (const ZTSLedgerRow& lrRow : lHistory.readLedger()) {
            ASSERT_TRUE(lrRow.mInitiator.mWwpn);
            lAccounted[lrRow.mInitiator.mWwpn->toText()][getKindName(lrRow.mKind)] +=
                lrRow.mStored + lrRow.mRetired + lrRow.getRefusedTotal();
            mRefused += lrRow.getRefusedTotal();
            EXPECT_EQ(lrRow.mHeld, 0U);
        }
        ASSERT_EQ(lAccounted.size(), 2U);
        std::size_t lBoard = 0;
        for (const auto& [lrWwpn, lrKinds] : lAccounted) {  // rising names are rising boards
            for (const auto& [lrKind, lCount] : mDelivered[lBoard]) {
                const auto lpAccounted = lrKinds.find(lrKind);
                EXPECT_EQ(lpAccounted == lrKinds.end() ? 0 : lpAccounted->second, lCount) << lrWwpn << " " << lrKind;
            }
            ++lBoard;
        }
        EXPECT_TRUE(lHistory.readGaps().empty());
    }

    ZTCSensorProcess mSensor{"agent.log_level = 1\n"};
    std::map<std::string, std::uint64_t> mDelivered[2];
    std::uint64_t mRefused = 0;
};

TEST_F(SensorStormTest, OfAMillionEventsEachIsStoredOrRefusedForEachBoardAndKind) {
    mSensor.start();
    deliver(0, scStormOfOthers + std::string("count=400000 threads=4 seed=1"));
    deliver(1, "storm kind=queue-full,check-condition,lsrjt count=250000 threads=2 seed=2");
    deliver(1, "rscn times=100000 threads=2");
    deliver(0, "rscn times=50000");
    deliver(0, "storm kind=link,queue-full count=200000 threads=3 seed=3");
    mSensor.waitUntilAllIsStored();
    EXPECT_EQ(mSensor.stop(), 0);
    expectAllAccountedFor();
    expectSoundHistory(mSensor.stateDirectory());
    std::cout << mRefused << " refused\n";
}

TEST_F(SensorStormTest, CollectorsThatAreKilledInAStormLoseNothing) {
    ZTCTestSeed lSeed;
    mSensor.start();
    const pid_t lAgent = mSensor.findAgent();
    ASSERT_NE(lAgent, 0);
    unsigned lKilled = 0;
    for (unsigned lRun = 0; lRun < sRuns() && !HasFailure();) {
        // One in a storm, or up to three in a row: a collector may be killed while it takes in what another one left.
        const unsigned lInThisStorm = std::min(1 + lSeed.below(3), sRuns() - lRun);
        SCOPED_TRACE("kills " + std::to_string(lRun + 1) + " to " + std::to_string(lRun + lInThisStorm));
        ZTCTestThread lStorm([this, lRun](const std::stop_token& acrStop) {
            for (unsigned lRound = 1000 * lRun; !acrStop.stop_requested(); ++lRound) {
                deliver(lRound % 2, scStormOfOthers + ("count=2000 threads=2 seed=" + std::to_string(lRound)));
                deliver(lRound % 2, "rscn times=200");
            }
        });
        for (unsigned i = 0; i < lInThisStorm; ++i, ++lRun) {
            lKilled += killCollector(std::chrono::milliseconds(lSeed.below(400))) ? 1 : 0;
        }
        lStorm.stop();
        mSensor.waitUntilAllIsStored();
        waitForSoundHistory(mSensor.stateDirectory());
        EXPECT_EQ(mSensor.findAgent(), lAgent) << "the agent's process is the same";
    }
    EXPECT_EQ(mSensor.stop(), 0);
    expectAllAccountedFor();
    expectSoundHistory(mSensor.stateDirectory());
    std::cout << lKilled << " collectors killed, " << mRefused << " events refused meanwhile\n";
}

/// Mixed events for four seconds, in all more than the agent can hold: 5,000 a second, 50 at once.
static void sStormAtAPace(const ZTCSensorProcess& acrSensor) {
    for (unsigned i = 0; i < 400; ++i) {
        const ZTCDeadline lNext(std::chrono::milliseconds(10));
        acrSensor.simulate("storm count=50 threads=2 seed=" + std::to_string(i));
        waitUntil([&] { return lNext.isOver(); }, "the next turn");
    }
}

TEST_F(SensorStormTest, AnInterleavedStormAtAPaceIsStoredWhole) {
    mSensor.start();
    sStormAtAPace(mSensor);
    EXPECT_EQ(mSensor.stop(), 0);
    EXPECT_EQ(countRefused(mSensor.stateDirectory()), 0U);
    expectSoundHistory(mSensor.stateDirectory());
}

TEST_F(SensorStormTest, TheSameStormIsRefusedInPartWhereTheSensorAsksEvery60SecondsAndNoBellRings) {
    mSensor.configure("agent.log_level = 1\ncollect.period = 60\n");
    std::string lSettings = readFile(mSensor.configPath());
    const std::string lKey = "agent.program = \"";
    const std::size_t lFirst = lSettings.find(lKey) + lKey.size();
    const std::string lProgram = lSettings.substr(lFirst, lSettings.find('"', lFirst) - lFirst);
    const std::string lWithoutBell = mSensor.path("agent-without-bell");
    writeFile(lWithoutBell, "#!/bin/sh\nunset ZT_TVK_BELL_FD\nexec '" + lProgram + "' \"$@\"\n");
    ASSERT_EQ(chmod(lWithoutBell.c_str(), 0700), 0);
    writeFile(mSensor.configPath(), lSettings.replace(lFirst, lProgram.size(), lWithoutBell));
    mSensor.start();
    sStormAtAPace(mSensor);
    EXPECT_EQ(mSensor.stop(), 0);
    EXPECT_GT(countRefused(mSensor.stateDirectory()), 5000U);
    expectSoundHistory(mSensor.stateDirectory());
}
