/// A host without adapters, or without a library.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <filesystem>

#include "tests/sensor/KeeperProcess.h"

using testing::HasSubstr;

static constexpr const char* scTwoAdapters =
    "adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80\n"
    "adapter hba1 wwpn=30:00:00:00:00:01:00:01 wwnn=30:00:00:00:00:01:00:81\n";

TEST(KeeperWaits, NoAdaptersIsAStateThatEndsWhenTheHostHasAdapters) {
    ZTCKeeperProcess lSensor;
    lSensor.setScenario("count 0\n");
    lSensor.launch();
    lSensor.waitFor("KeeperState waiting-for-adapters ended: no-adapters");
    lSensor.setScenario(scTwoAdapters);
    std::filesystem::create_directory(lSensor.sysfs() + "/class/fc_host/host7");
    std::filesystem::create_directory(lSensor.sysfs() + "/class/fc_host/host8");
    lSensor.waitFor("StartAnswered 2");
    EXPECT_THAT(lSensor.standardError(), HasSubstr("the names in /sys/class/fc_host have changed"));
    lSensor.waitFor("KeeperState running");
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperWaits, ALibraryThatCannotBeLoadedIsAState) {
    ZTCKeeperProcess lSensor;
    lSensor.setLibrary(lSensor.path("no-such-library.so"));
    lSensor.launch();
    lSensor.waitFor("KeeperState waiting-for-adapters ended: no-library");
    EXPECT_EQ(lSensor.count("AgentEnded 1 status=0"), 1U);
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
    EXPECT_EQ(lSensor.count("Finished"), 1U);
}
