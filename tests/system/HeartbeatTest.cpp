#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstddef>
#include <ctime>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"

// The agent's period is one second, the least there is; these tests wait for the lines of its cycles.

static const char* const scChecking = "Checking the status of the actual sensor process/service";
static const char* const scAlive = "Sensor process still running, but not updating the heartbeat";
static const char* const scGone = "Failed in getting the status of Sensor";
static const char* const scUpdating = "Updating the status";

static void sStart(ZTCAgentProcess& arAgent) {
    arAgent.startAndConnect({"-b", "1"});
}

static std::string sUnchanged(const ZTCAgentProcess& acrAgent) {
    return "Modfication time of the " + acrAgent.sensorPidFilePath() + " hasn't changed";
}

static std::string sUnreadable(const ZTCAgentProcess& acrAgent) {
    return "Failed in stat on " + acrAgent.sensorPidFilePath() + " file";
}

static void sExpectEnded(ZTCAgentProcess& arAgent) {
    EXPECT_EQ(arAgent.waitForExit(), 0);
    EXPECT_TRUE(arAgent.log().has("Tavik System exiting", "-H-"));
    EXPECT_FALSE(exists(arAgent.pidFilePath()));
    EXPECT_FALSE(exists(arAgent.commandFifoPath()));
    EXPECT_TRUE(arAgent.library().callsOf("Close").empty());
}

TEST(Heartbeat, ASilentSensorThatLivesOnlyEarnsNotices) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    sStart(lAgent);
    lAgent.log().waitFor(scAlive, 2);
    // First look: the time is noted. Second: counted. Third: the query. From then on: the query every time.
    EXPECT_GE(lAgent.log().count(scUpdating, "-T-"), 4u);
    EXPECT_EQ(lAgent.log().count(sUnchanged(lAgent), "-W-"), lAgent.log().count(scChecking, "-N-"));
    const std::size_t lFirstQuery = *lAgent.log().find(scChecking);
    std::size_t lCycles = 0;
    const auto lLines = lAgent.log().lines();
    for (std::size_t i = 0; i < lFirstQuery; ++i) {
        lCycles += lLines[i].mText == scUpdating ? 1 : 0;
    }
    EXPECT_EQ(lCycles, 3u);
    EXPECT_TRUE(lAgent.ping());
}

TEST(Heartbeat, ASensorThatLivesAndTouchesItsFileAgainIsForgiven) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    sStart(lAgent);
    lAgent.log().waitFor(scAlive, 1);
    const std::size_t lQueries = lAgent.log().count(scChecking);
    // An earlier time is a change like any other.
    const timespec lTimes[2] = {{1000000, 0}, {1000000, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, lAgent.sensorPidFilePath().c_str(), lTimes, 0), 0);
    const std::size_t lCycles = lAgent.log().count(scUpdating);
    lAgent.log().waitFor(scUpdating, lCycles + 2);
    EXPECT_LE(lAgent.log().count(scChecking), lQueries + 1);
    lAgent.log().waitFor(scAlive, lQueries + 1);
}

TEST(Heartbeat, ASensorThatTouchesItsFileIsNeverQueried) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.sensorPidFilePath(), "999999999\n");
    sStart(lAgent);
    for (std::size_t lCycle = 1; lCycle <= 4; ++lCycle) {
        lAgent.log().waitFor("Going to wait for 1 seconds", lCycle);
        const timespec lTimes[2] = {{static_cast<time_t>(1000000 + lCycle), 0},
                                    {static_cast<time_t>(1000000 + lCycle), 0}};
        ASSERT_EQ(utimensat(AT_FDCWD, lAgent.sensorPidFilePath().c_str(), lTimes, 0), 0);
    }
    EXPECT_FALSE(lAgent.log().has(scChecking));
    EXPECT_FALSE(lAgent.log().has(sUnchanged(lAgent)));
}

TEST(Heartbeat, ASilentSensorThatIsGoneEndsTheAgent) {
    ZTCAgentProcess lAgent;
    {
        ZTSChildProcessSetup lSetup;
        lSetup.mProgram = "/bin/true";
        lSetup.mWorkingDirectory = lAgent.workingDirectory();
        lSetup.mOutputPrefix = lAgent.workingDirectory() + "/sensor";
        ZTCChildProcess lSensor(lSetup);
        writeFile(lAgent.sensorPidFilePath(), std::to_string(lSensor.getPid()) + "\n");
        EXPECT_EQ(lSensor.waitForExit(), 0);
    }
    sStart(lAgent);
    sExpectEnded(lAgent);
    EXPECT_EQ(lAgent.log().count(sUnchanged(lAgent), "-W-"), 1u);
    EXPECT_EQ(lAgent.log().count(scChecking, "-N-"), 1u);
    EXPECT_EQ(lAgent.log().count(scGone, "-H-"), 1u);
    EXPECT_EQ(lAgent.log().count(scUpdating), 3u);
}

TEST(Heartbeat, ASensorThatIsAZombieIsGone) {
    ZTCAgentProcess lAgent;
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = "/bin/true";
    lSetup.mWorkingDirectory = lAgent.workingDirectory();
    lSetup.mOutputPrefix = lAgent.workingDirectory() + "/sensor";
    ZTCChildProcess lSensor(lSetup);
    waitUntil(
        [&] {
            const std::string lStat = readFile("/proc/" + std::to_string(lSensor.getPid()) + "/stat");
            return lStat.find(") Z ") != std::string::npos;
        },
        "a zombie");
    writeFile(lAgent.sensorPidFilePath(), std::to_string(lSensor.getPid()) + "\n");
    sStart(lAgent);
    sExpectEnded(lAgent);
    EXPECT_EQ(lAgent.log().count(scGone, "-H-"), 1u);
}

TEST(Heartbeat, AMissingSensorFileCountsAsSilenceAndEndsTheAgent) {
    ZTCAgentProcess lAgent;
    sStart(lAgent);
    sExpectEnded(lAgent);
    EXPECT_EQ(lAgent.log().count(sUnreadable(lAgent), "-W-"), 2u);
    EXPECT_EQ(lAgent.log().count(scUpdating), 2u);
    EXPECT_EQ(lAgent.log().count(scChecking, "-N-"), 1u);
    EXPECT_EQ(lAgent.log().count(scGone, "-H-"), 1u);
}

TEST(Heartbeat, ASensorFileWithoutAPidEndsTheAgentOnceItIsSilent) {
    std::vector<std::unique_ptr<ZTCAgentProcess>> lAgents;
    for (const char* lpContent : {"", "sensor\n", "0\n", "-1\n"}) {
        lAgents.push_back(std::make_unique<ZTCAgentProcess>());
        writeFile(lAgents.back()->sensorPidFilePath(), lpContent);
        sStart(*lAgents.back());
    }
    for (const auto& lcrpAgent : lAgents) {
        SCOPED_TRACE(readFile(lcrpAgent->sensorPidFilePath()));
        sExpectEnded(*lcrpAgent);
        EXPECT_EQ(lcrpAgent->log().count(scGone, "-H-"), 1u);
    }
}

TEST(Heartbeat, AnAgentThatCannotTouchItsOwnFileEnds) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    sStart(lAgent);
    EXPECT_TRUE(lAgent.ping());
    std::filesystem::remove(lAgent.pidFilePath());
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.log().count("Failed in updating the status", "-H-"), 1u);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));
}

TEST(Heartbeat, TheOwnFileIsTouchedOnceACycleBeforeTheSensorIsLookedAt) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    sStart(lAgent);
    lAgent.log().waitFor("Going to wait for 1 seconds");
    const timespec lTimes[2] = {{1000000, 0}, {1000000, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, lAgent.pidFilePath().c_str(), lTimes, 0), 0);
    waitUntil(
        [&] {
            struct stat lStatus {};
            return stat(lAgent.pidFilePath().c_str(), &lStatus) == 0 && lStatus.st_mtim.tv_sec > 1000000;
        },
        "the agent to touch its own file");
    const std::string lSetting = "Setting the mod time of " + lAgent.pidFilePath();
    const std::string lLooking = "Checking the status of Sensor";
    lAgent.log().waitFor("Going to wait for 1 seconds", 3);
    const auto lLines = lAgent.log().lines();
    std::string lSequence;
    for (const ZTSLogLine& lcrLine : lLines) {
        lSequence += lcrLine.mText == "Going to wait for 1 seconds" ? "w" : "";
        lSequence += lcrLine.mText == scUpdating ? "u" : "";
        lSequence += lcrLine.mText == lSetting ? "s" : "";
        lSequence += lcrLine.mText == lLooking ? "c" : "";
    }
    EXPECT_TRUE(lSequence.starts_with("wuscwusc")) << lSequence;
}

TEST(Heartbeat, AnExitCutsTheWaitShortWithoutAnotherTouch) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.waitForIdleHeartbeatThread();
    EXPECT_EQ(lAgent.request(gcShutDownHex), gcSuccessHex);
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.log().count("Exiting Heartbeat Handler Thread as it is marked for exit.", "-H-"), 1u);
    EXPECT_FALSE(lAgent.log().has(scUpdating));
}
