#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"

static constexpr const char* scBegin = "The sensor directory '";

/// The warnings about its directory of an agent that has started and ended, at the log levels of a start without -d.
static std::vector<ZTSLogLine> sWarnings(ZTCAgentProcess& arAgent) {
    arAgent.startAndConnectQuietly(63);
    EXPECT_EQ(arAgent.stop(), 0);
    return arAgent.log().containing(scBegin);
}

TEST(SensorDirectory, OneThatItsGroupOrEverybodyMayWriteInDrawsOneWarningWithTheRemedy) {
    for (const auto& [lMode, lWho] : {std::pair<mode_t, std::string>{0770, "its group"},
                                      {0707, "everybody"},
                                      {0775, "its group"},
                                      {01777, "everybody"}}) {
        SCOPED_TRACE(lMode);
        ZTCAgentProcess lAgent;
        ASSERT_EQ(chmod(lAgent.sensorDirectory().c_str(), lMode), 0);
        const std::vector<ZTSLogLine> lWarnings = sWarnings(lAgent);
        ASSERT_EQ(lWarnings.size(), 1u);
        EXPECT_EQ(lWarnings[0].mMark, "-W-");
        EXPECT_NE(lWarnings[0].mText.find("' can be written by " + lWho + ", "), std::string::npos)
            << lWarnings[0].mText;
        EXPECT_TRUE(lWarnings[0].mText.ends_with("chmod go-w '" + lAgent.sensorDirectory() + "'"))
            << lWarnings[0].mText;
    }
}

TEST(SensorDirectory, OneThatItsOwnerAloneMayWriteInDrawsNoWarning) {
    for (const mode_t lMode : {0700u, 0755u}) {
        SCOPED_TRACE(lMode);
        ZTCAgentProcess lAgent;
        ASSERT_EQ(chmod(lAgent.sensorDirectory().c_str(), lMode), 0);
        EXPECT_TRUE(sWarnings(lAgent).empty());
    }
}

TEST(SensorDirectory, OneOfAnotherUserDrawsAWarning) {
    // Only root can give it away; anybody else sees that one's own draws none.
    const bool lIsRoot = geteuid() == 0;
    ZTCAgentProcess lAgent;
    if (lIsRoot) {
        ASSERT_EQ(chown(lAgent.sensorDirectory().c_str(), 65534, 65534), 0);
    }
    const std::vector<ZTSLogLine> lWarnings = sWarnings(lAgent);
    ASSERT_EQ(lWarnings.size(), lIsRoot ? 1u : 0u);
    if (lIsRoot) {
        EXPECT_NE(lWarnings[0].mText.find("' can be written by user 65534, "), std::string::npos) << lWarnings[0].mText;
    }
}

TEST(SensorDirectory, TheWarningStandsBehindTheInstanceCheckAndInFrontOfTheFifos) {
    ZTCAgentProcess lAgent;
    ASSERT_EQ(chmod(lAgent.sensorDirectory().c_str(), 0777), 0);
    lAgent.startAndConnect();
    const std::string lText = lAgent.log().containing(scBegin).at(0).mText;
    const auto lWarning = lAgent.log().find(lText);
    const auto lFifo = lAgent.log().find("Creating Tavik Command Reader IPC...");
    ASSERT_TRUE(lWarning && lFifo);
    EXPECT_LT(*lWarning, *lFifo);
    // A second start ends at the instance check, and says nothing of the directory.
    const std::string lSecondLog = lAgent.workingDirectory() + "/second.log";
    EXPECT_EQ(lAgent.run({"-D", "false", "-d", "255", "-l", lSecondLog}).mStatus, 0);
    EXPECT_TRUE(ZTCAgentLog(lSecondLog).containing(scBegin).empty());
    EXPECT_EQ(lAgent.log().containing(scBegin).size(), 1u);
}
