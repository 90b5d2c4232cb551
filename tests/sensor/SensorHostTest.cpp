// The real sensor on a host without adapters, without their library, and with a history that it cannot use.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>

#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/sensor/TavikRun.h"

using testing::HasSubstr;

TEST(SensorHost, WithoutAdaptersItWaitsAndCollectsFromTwoWhenTheyCome) {
    ZTCSensorProcess lSensor("collect.period = 0.1\nagent.heartbeat = 1\n");
    lSensor.setScenario("count 0\n");
    lSensor.launch();
    const auto lWaitForState = [&](const std::string& acrState) {
        waitUntil(
            [&] {
                try {
                    return lSensor.status()["keeper"]["state"] == acrState;
                } catch (const std::exception&) {
                    return false;  // nobody answers yet
                }
            },
            "the state " + acrState);
    };
    lWaitForState("waiting-for-adapters");
    EXPECT_EQ(lSensor.status()["agent"]["running"], false);
    EXPECT_EQ(lSensor.status()["agent"]["problem"], "ended: no-adapters");
    lSensor.setScenario(
        "adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80\n"
        "adapter hba1 wwpn=30:00:00:00:00:01:00:01 wwnn=30:00:00:00:00:01:00:81\n");
    std::filesystem::create_directory(lSensor.sysfs() + "/class/fc_host/host7");
    std::filesystem::create_directory(lSensor.sysfs() + "/class/fc_host/host8");
    lWaitForState("running");
    lSensor.waitUntilListening();
    EXPECT_EQ(lSensor.status()["adapters"].size(), 2U);
    lSensor.simulate("queue-full board=hba0 times=2");
    lSensor.simulate("queue-full board=hba1 times=3");
    lSensor.waitUntilAllIsStored();
    EXPECT_EQ(lSensor.stop(), 0);
    EXPECT_EQ(countStored(lSensor.stateDirectory()), 5U);
    EXPECT_TRUE(ZTCHistory(lSensor.stateDirectory()).readGaps().empty()) << "having no adapters is no loss";
    expectSoundHistory(lSensor.stateDirectory());
}

TEST(SensorHost, ALibraryThatCannotBeLoadedIsNamedAndWaitedFor) {
    ZTCSensorProcess lSensor("agent.heartbeat = 1\n");
    lSensor.setLibrary(lSensor.path("no-such-library.so"));
    lSensor.launch();
    waitUntil(
        [&] {
            try {
                return lSensor.status()["agent"]["problem"] == "ended: no-library";
            } catch (const std::exception&) {
                return false;  // nobody answers yet
            }
        },
        "the library's absence in the live state");
    EXPECT_EQ(lSensor.status()["keeper"]["state"], "waiting-for-adapters");
    EXPECT_THAT(lSensor.standardError(), HasSubstr("agent: ended: no-library"));
    EXPECT_EQ(lSensor.stop(), 0);
    EXPECT_TRUE(ZTCHistory(lSensor.stateDirectory()).readGaps().empty());
}

TEST(SensorHost, AHistoryOfANewerVersionEndsItWithStatus2AndStaysAsItIs) {
    ZTCSensorProcess lSensor;
    lSensor.start();
    ASSERT_EQ(lSensor.stop(), 0);
    setSchemaVersion(lSensor.stateDirectory(), 99);
    const std::string lBefore = readFile(lSensor.stateDirectory() + "/history.db");
    lSensor.launch();
    EXPECT_EQ(lSensor.waitForExit(), 2);
    EXPECT_THAT(lSensor.standardError(), HasSubstr("its schema has version 99"));
    EXPECT_EQ(readFile(lSensor.stateDirectory() + "/history.db"), lBefore);
}

TEST(SensorHost, ADamagedHistoryIsSetAsideAndCollectingGoesOn) {
    ZTCSensorProcess lSensor;
    lSensor.start();
    lSensor.simulate("queue-full board=hba0 times=2");
    lSensor.waitUntilAllIsStored();
    ASSERT_EQ(lSensor.stop(), 0);
    std::string lContent = readFile(lSensor.stateDirectory() + "/history.db");
    std::fill(lContent.begin() + 4096 * 2, lContent.end(), '\x55');
    writeFile(lSensor.stateDirectory() + "/history.db", lContent);
    lSensor.start();
    EXPECT_THAT(lSensor.standardError(), HasSubstr("the database is damaged"));
    EXPECT_THAT(lSensor.standardError(), HasSubstr("history.damaged-"));
    EXPECT_THAT(runTavik(lSensor, {"status"}).mOutput, HasSubstr("a damaged history was set aside as"));
    lSensor.simulate("queue-full board=hba0 times=3");
    lSensor.waitUntilAllIsStored();
    EXPECT_EQ(lSensor.stop(), 0);
    EXPECT_EQ(countStored(lSensor.stateDirectory()), 3U);
    expectSoundHistory(lSensor.stateDirectory());
}
