// The real sensor on a host whose clock jumps.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>

#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/support/SettableClock.h"

static constexpr std::chrono::hours scDay{24};

TEST(SensorClock, AJumpByADayInEitherDirectionLosesNothingAndKeepsTheOrderOfArrival) {
    ZTCSensorProcess lSensor("collect.period = 0.1\n");
    ZTCSettableClock lClock(lSensor.path("clock"));
    for (const auto& [lrName, lrValue] : lClock.getEnvironment()) {
        lSensor.setEnvironment(lrName, lrValue);
    }
    lSensor.start();
    const auto lDeliver = [&](unsigned aTimes) {
        lSensor.simulate("queue-full board=hba0 times=" + std::to_string(aTimes));
        lSensor.waitUntilAllIsStored();
    };
    lDeliver(3);
    lClock.setAhead(scDay);
    lDeliver(5);
    lClock.setAhead(std::chrono::hours(0));
    lDeliver(7);
    lClock.setAhead(-scDay);
    lDeliver(11);
    // One run of like events, with the jump in its middle: its last time lies before its first.
    ASSERT_EQ(kill(lSensor.findCollector(), SIGSTOP), 0);
    lSensor.simulate("queue-full board=hba1 times=2");
    lClock.setAhead(-2 * scDay);
    lSensor.simulate("queue-full board=hba1 times=2");
    ASSERT_EQ(kill(lSensor.findCollector(), SIGCONT), 0);
    lSensor.waitUntilAllIsStored();
    EXPECT_EQ(lSensor.stop(), 0);

    EXPECT_EQ(countStored(lSensor.stateDirectory()), 3U + 5 + 7 + 11 + 4);
    expectSoundHistory(lSensor.stateDirectory());
    const ZTCHistory lHistory(lSensor.stateDirectory());
    EXPECT_TRUE(lHistory.readGaps().empty());
    std::vector<unsigned> lOccurrences;
    bool lHasClockFlag = false;
    std::vector<std::pair<std::uint64_t, unsigned>> lArrivals;
    lHistory.visitRecords({}, [&](const ZTSStoredRecord& acrRecord) {
        lArrivals.emplace_back(acrRecord.mSeq, acrRecord.mRecord.mOccurrences);
        lHasClockFlag = lHasClockFlag || acrRecord.mHasClockFlag;
        return true;
    });
    std::ranges::sort(lArrivals);
    for (const auto& [lSeq, lCount] : lArrivals) {
        lOccurrences.push_back(lCount);
    }
    EXPECT_THAT(lOccurrences, testing::ElementsAre(3, 5, 7, 11, 4)) << "in the order of arrival";
    EXPECT_TRUE(lHasClockFlag);
}
