// The real sensor, whose agent or keeper is killed in a storm. ZT_SENSOR_KILL_RUNS is the number of kills of each;
// scripts/check-sensor-kills kills many.
#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <functional>
#include <iostream>
#include <thread>

#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/support/Seed.h"
#include "tests/support/TestThreads.h"

static unsigned sRuns() {
    const char* const lpRuns = std::getenv("ZT_SENSOR_KILL_RUNS");
    return lpRuns != nullptr ? static_cast<unsigned>(std::strtoul(lpRuns, nullptr, 10)) : 3;
}

class SensorKillTest : public testing::Test {
protected:
    std::size_t countGaps() const {
        try {
            return ZTCHistory(mSensor.stateDirectory()).readGaps().size();
        } catch (const ZTCNoHistoryEx&) {
            return 0;
        }
    }
    /// Storms that follow each other, also while no agent is there that takes them.
    void deliverStorms(const std::stop_token& acrStop) {
        for (unsigned lRound = 0; !acrStop.stop_requested(); ++lRound) {
            try {
                // An agent that has not registered for all kinds yet gets a part of it.
                mDelivered += std::stoull(mSensor.simulate("storm count=500 threads=2 seed=" + std::to_string(lRound)));
            } catch (const std::runtime_error&) {
                std::this_thread::yield();  // there is no agent just now
            }
        }
    }
    /// Kills so many times, each at a random moment of a storm. After each kill, and at the end: all that there is, is
    /// in the history; the kill is one gap; the equations hold.
    void killInStorms(const std::function<void()>& acrKill) {
        ZTCTestSeed lSeed;
        mSensor.start();
        for (unsigned lRun = 1; lRun <= sRuns() && !HasFailure(); ++lRun) {
            SCOPED_TRACE("kill " + std::to_string(lRun));
            {
                const ZTCTestThread lStorm([this](const std::stop_token& acrStop) { deliverStorms(acrStop); });
                const ZTCDeadline lMoment(std::chrono::milliseconds(lSeed.below(400)));
                waitUntil([&] { return lMoment.isOver(); }, "the moment of the kill");
                acrKill();
            }
            mSensor.waitUntilListening();
            waitUntil([&] { return countGaps() >= lRun; }, "the gap", ZTCDeadline(3 * gcTestPatience));
            mSensor.waitUntilAllIsStored();
            EXPECT_EQ(countGaps(), lRun);
            waitForSoundHistory(mSensor.stateDirectory());
        }
        EXPECT_EQ(mSensor.stop(), 0);
        EXPECT_EQ(countGaps(), sRuns());
        expectSoundHistory(mSensor.stateDirectory());
        std::uint64_t lLost = 0;
        const ZTCHistory lHistory(mSensor.stateDirectory());
        for (const ZTSGap& lrGap : lHistory.readGaps()) {
            lLost += lrGap.getOccurrences();
        }
        // An RSCN has one page or more, and counts in pages.
        EXPECT_GE(countStored(mSensor.stateDirectory()) + countRefused(mSensor.stateDirectory()) + lLost, mDelivered)
            << "what agents had taken is missing, and no gap knows of it";
        std::cout << sRuns() << " killed, " << lLost << " events known to be lost with them, "
                  << countStored(mSensor.stateDirectory()) << " stored\n";
    }

    /// Callbacks of the storms that came to their end.
    std::uint64_t mDelivered = 0;
    ZTCSensorProcess mSensor{"agent.log_level = 1\nagent.heartbeat = 1\n"};
};

TEST_F(SensorKillTest, EachKilledAgentIsOneGapWithWhatItHeldAndTheNextOneWorks) {
    killInStorms([this] {
        const pid_t lAgent = mSensor.findAgent();
        ASSERT_NE(lAgent, 0);
        ASSERT_EQ(kill(lAgent, SIGKILL), 0);
        waitUntil([&] { return mSensor.findAgent() != 0 && mSensor.findAgent() != lAgent; }, "the next agent",
                  ZTCDeadline(3 * gcTestPatience));
    });
}

TEST_F(SensorKillTest, EachKilledKeeperIsOneGapAndTheNextOneWorks) {
    killInStorms([this] {
        const pid_t lAgent = mSensor.findAgent();
        mSensor.process().kill();
        mSensor.launch();
        waitForEnd(lAgent);
        waitUntil([&] { return mSensor.findAgent() != 0; }, "the next agent", ZTCDeadline(3 * gcTestPatience));
    });
}
