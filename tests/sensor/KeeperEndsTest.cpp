/// Processes that end, are killed, or hang.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/sensor/KeeperProcess.h"

using testing::HasSubstr;

TEST(KeeperEnds, AKilledCollectorIsReplacedAtOnceAndTheAgentStays) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    const pid_t lAgent = lSensor.agentPid();
    for (std::size_t i = 1; i <= 3; ++i) {
        const pid_t lCollector = lSensor.collectorPid();
        ASSERT_EQ(kill(lCollector, SIGKILL), 0);
        lSensor.waitFor("Collector ", i + 1);
        lSensor.waitFor("StartAnswered ", i + 1);
        EXPECT_NE(lSensor.collectorPid(), lCollector);
        EXPECT_EQ(lSensor.agentPid(), lAgent);
    }
    EXPECT_EQ(lSensor.count("AgentStarted 1 "), 4U);
    EXPECT_EQ(lSensor.count("AgentStarted 2 "), 0U);
    EXPECT_THAT(lSensor.standardError(), HasSubstr("collector: ended: killed by signal 9"));
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperEnds, AKilledAgentIsReplacedAndTheCollectorHearsOfBoth) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    ASSERT_EQ(kill(lSensor.agentPid(), SIGKILL), 0);
    lSensor.waitFor("StartAnswered 2");
    EXPECT_EQ(lSensor.count("AgentEnded 1 status=9"), 1U);
    EXPECT_THAT(lSensor.waitFor("AgentStarted 2 "), HasSubstr("restarts=1"));
    EXPECT_EQ(lSensor.count("Collector "), 1U);
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperEnds, AKilledKeeperTakesTheCollectorWithItAndTheNextOneReplacesTheAgent) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    const pid_t lAgent = lSensor.agentPid();
    const pid_t lCollector = lSensor.collectorPid();
    lSensor.process().kill();
    lSensor.waitFor("KeeperGone");
    waitForEnd(lCollector);
    lSensor.startAndWait();
    waitForEnd(lAgent);
    EXPECT_NE(lSensor.agentPid(), lAgent);
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperEnds, AStoppedAgentIsTakenForHungAndKilled) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    const pid_t lAgent = lSensor.agentPid();
    ASSERT_EQ(kill(lAgent, SIGSTOP), 0);
    lSensor.waitForMessage("it hangs: its pid file has not been touched for more than 7 s");
    lSensor.waitForMessage("has not ended on SIGTERM: SIGKILL", ZTCDeadline(std::chrono::seconds(40)));
    lSensor.waitFor("StartAnswered 2");
    EXPECT_EQ(lSensor.count("AgentEnded 1 status=9"), 1U);
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperEnds, AnAgentThatTheCollectorCallsSilentIsReplaced) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    lSensor.putFile("silent");
    lSensor.waitForMessage("the collector has waited 60 s for a byte of an answer: SIGTERM");
    lSensor.waitFor("StartAnswered 2");
    EXPECT_EQ(lSensor.count("AgentEnded 1 status=0"), 1U);
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperEnds, AStopWithAHungAgentEndsWithin20SecondsAndWithStatus1) {
    ZTCKeeperProcess lSensor;
    lSensor.configure("agent.heartbeat = 60\n");
    writeFile(lSensor.configPath(), [&] {
        std::string lText = readFile(lSensor.configPath());
        lText.erase(lText.find("agent.heartbeat = 1\n"), 20);
        return lText;
    }());
    lSensor.startAndWait();
    ASSERT_EQ(kill(lSensor.agentPid(), SIGSTOP), 0);
    lSensor.putFile("refuse-finish");
    const auto lBegin = std::chrono::steady_clock::now();
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(ZTCDeadline(std::chrono::seconds(60))), 1);
    EXPECT_LT(std::chrono::steady_clock::now() - lBegin, stretched(std::chrono::seconds(20)));
    EXPECT_THAT(lSensor.standardError(), HasSubstr("has stopped, not in order"));
}

TEST(KeeperEnds, ACollectorThatCannotWorkIsTriedAgainEverMoreSeldom) {
    ZTCKeeperProcess lSensor;
    lSensor.putFile("die");
    lSensor.launch();
    lSensor.waitForMessage("collector: ended: status 3; the next one is started in 1 s");
    lSensor.waitForMessage("collector: ended: status 3; the next one is started in 2 s");
    lSensor.waitForMessage("collector: ended: status 3; the next one is started in 4 s");
    lSensor.removeFile("die");
    lSensor.waitFor("StartAnswered 1");
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperEnds, AProgramThatIsNotThereIsNamedAndTriedAgain) {
    ZTCKeeperProcess lSensor;
    lSensor.setEnvironment("PATH", "/nowhere");
    writeFile(lSensor.configPath(), "agent.program = \"no-such-agent\"\nsensor.directory = \"" + lSensor.path("run") +
                                        "\"\nsensor.state = \"" + lSensor.path("state") + "\"\n");
    lSensor.launch();
    lSensor.waitForMessage("agent: no program no-such-agent in " + lSensor.path("sbin"));
    lSensor.waitForMessage("agent: cannot be started; the next one is started in 2 s");
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}
