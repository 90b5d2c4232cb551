#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"

static const char* const scHelp =
    "qrv-tvk -[hvsDldc] VALUE\n"
    "  -h             : Shows this help\n"
    "  -v             : Prints version\n"
    "  -s             : Shut down running Tavik\n"
    "  -D true|false  : Run as daemon (default: true)\n"
    "  -d {number}    : Debug level - OR of numbers from 0-7 (default: 63)\n"
    "  -c {filename}  : Specify config file (default: )\n"
    "  -S             : Run Tavik in Sniffer Mode\n"
    "  -b {number}    : Heartbeat Timeout (default: 240)\n";

static void sExpectNothingMade(const ZTCAgentProcess& acrAgent) {
    EXPECT_FALSE(exists(acrAgent.pidFilePath()));
    EXPECT_FALSE(exists(acrAgent.commandFifoPath()));
    EXPECT_FALSE(exists(acrAgent.responseFifoPath()));
}

TEST(CommandLine, HelpIsExact) {
    ZTCAgentProcess lAgent;
    const ZTSRunResult lResult = lAgent.run({"-h"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mOutput, scHelp);
    EXPECT_EQ(lResult.mError, "");
    sExpectNothingMade(lAgent);
}

TEST(CommandLine, VersionIsExact) {
    ZTCAgentProcess lAgent;
    const ZTSRunResult lResult = lAgent.run({"-v"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mOutput, "qrv-tvk v3.0.1.2\n");
    EXPECT_EQ(lResult.mError, "");
    sExpectNothingMade(lAgent);
}

TEST(CommandLine, HelpWinsThenVersionThenConfigurationThenShutDown) {
    ZTCAgentProcess lAgent;
    EXPECT_EQ(lAgent.run({"-s", "-c", "file", "-v", "-h"}).mOutput, scHelp);
    EXPECT_EQ(lAgent.run({"-s", "-c", "file", "-v"}).mOutput, "qrv-tvk v3.0.1.2\n");
    const ZTSRunResult lConfigured = lAgent.run({"-s", "-c", "file"});
    EXPECT_EQ(lConfigured.mStatus, 0);
    EXPECT_EQ(lConfigured.mOutput, "");
    EXPECT_NE(lAgent.run({"-s"}).mOutput, "");
    sExpectNothingMade(lAgent);
}

TEST(CommandLine, AConfigurationFileIsNotImplemented) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.workingDirectory() + "/tavik.conf", "");
    const ZTSRunResult lResult = lAgent.run(lAgent.defaultArguments({"-c", lAgent.workingDirectory() + "/tavik.conf"}));
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mError, "qrv-tvk ends: Not Implemented\n");
    EXPECT_TRUE(lAgent.log().has("Failed with error - Not Implemented, exiting abruptly", "-I-"))
        << "-l and -d are applied before -c";
    EXPECT_EQ(lAgent.log().lines().back().mFunction, "main");
    EXPECT_EQ(lAgent.log().lines().back().mText, "Left");
    EXPECT_FALSE(lAgent.defaultLog().has("Tavik System exiting"));
    EXPECT_TRUE(lAgent.library().calls().empty());
    sExpectNothingMade(lAgent);
}

TEST(CommandLine, ABadLineIsReportedOnceNamesItsFaultAndCreatesNothing) {
    struct ZTSBadLine {
        std::vector<std::string> mArguments;
        const char* mpFault;
    };
    for (const ZTSBadLine& lcrLine : {ZTSBadLine{{"-x"}, "-x"},
                                      ZTSBadLine{{"-H"}, "-H"},
                                      ZTSBadLine{{"--help"}, "--help"},
                                      ZTSBadLine{{"-hv"}, "-hv"},
                                      ZTSBadLine{{"stray"}, "stray"},
                                      ZTSBadLine{{"-D", "false", "stray"}, "stray"},
                                      ZTSBadLine{{"-D"}, "-D"},
                                      ZTSBadLine{{"-d"}, "-d"},
                                      ZTSBadLine{{"-l"}, "-l"},
                                      ZTSBadLine{{"-c"}, "-c"},
                                      ZTSBadLine{{"-b"}, "-b"},
                                      ZTSBadLine{{"-D", "yes"}, "yes"},
                                      ZTSBadLine{{"-D", "True"}, "True"},
                                      ZTSBadLine{{"-D", "true "}, "-D"},
                                      ZTSBadLine{{"-D", ""}, "-D"},
                                      ZTSBadLine{{"-d", "256"}, "256"},
                                      ZTSBadLine{{"-d", "0x100"}, "0x100"},
                                      ZTSBadLine{{"-d", "-1"}, "-1"},
                                      ZTSBadLine{{"-d", "+1"}, "+1"},
                                      ZTSBadLine{{"-d", " 1"}, "-d"},
                                      ZTSBadLine{{"-d", "1 "}, "-d"},
                                      ZTSBadLine{{"-d", "0x"}, "0x"},
                                      ZTSBadLine{{"-d", "0xg"}, "0xg"},
                                      ZTSBadLine{{"-d", "12a"}, "12a"},
                                      ZTSBadLine{{"-d", ""}, "-d"},
                                      ZTSBadLine{{"-d", "99999999999999999999999"}, "99999999999999999999999"},
                                      ZTSBadLine{{"-b", "0"}, "-b"},
                                      ZTSBadLine{{"-b", "-5"}, "-5"},
                                      ZTSBadLine{{"-b", "4294967296"}, "4294967296"},
                                      ZTSBadLine{{"-b", "18446744073709551617"}, "18446744073709551617"},
                                      ZTSBadLine{{"-b", "1.5"}, "1.5"},
                                      ZTSBadLine{{"-b", "ten"}, "ten"},
                                      ZTSBadLine{{"-h", "-x"}, "-x"},
                                      ZTSBadLine{{"-v", "-d", "256"}, "256"},
                                      ZTSBadLine{{"-s", "-b", "0"}, "-b"}}) {
        std::string lWhole;
        for (const std::string& lcrArgument : lcrLine.mArguments) {
            lWhole += "[" + lcrArgument + "]";
        }
        SCOPED_TRACE(lWhole);
        ZTCAgentProcess lAgent;
        const ZTSRunResult lResult = lAgent.run(lcrLine.mArguments);
        EXPECT_EQ(lResult.mStatus, 0);
        EXPECT_EQ(lResult.mOutput, "");
        EXPECT_EQ(std::count(lResult.mError.begin(), lResult.mError.end(), '\n'), 1) << lResult.mError;
        EXPECT_NE(lResult.mError.find(lcrLine.mpFault), std::string::npos) << lResult.mError;
        std::size_t lErrors = 0;
        for (const ZTSLogLine& lcrLogged : lAgent.defaultLog().lines()) {
            if (lcrLogged.mMark == "-E-") {
                EXPECT_NE(lcrLogged.mText.find(lcrLine.mpFault), std::string::npos) << lcrLogged.mText;
                ++lErrors;
            }
        }
        EXPECT_EQ(lErrors, 1u);
        EXPECT_TRUE(lAgent.library().calls().empty());
        sExpectNothingMade(lAgent);
    }
}

TEST(CommandLine, NothingOfABadLineIsApplied) {
    ZTCAgentProcess lAgent;
    const ZTSRunResult lResult = lAgent.run(lAgent.defaultArguments({"-b", "0"}));
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_FALSE(exists(lAgent.agentLogPath()));
    for (const ZTSLogLine& lcrLine : lAgent.defaultLog().lines()) {
        EXPECT_TRUE(lcrLine.mMark != "-T-" && lcrLine.mMark != "-I-") << lcrLine.mText;
    }
}

TEST(CommandLine, DebugLevelsMayBeDecimalOrHexadecimal) {
    for (const char* lpLevel : {"255", "0xff", "0xFF"}) {
        SCOPED_TRACE(lpLevel);
        ZTCAgentProcess lAgent;
        lAgent.start({"-D", "false", "-d", lpLevel, "-l", lAgent.agentLogPath()});
        lAgent.pipes().open();
        EXPECT_TRUE(lAgent.ping());
        EXPECT_TRUE(lAgent.log().has("Creating Failed Response...", "-T-"));
    }
}

TEST(CommandLine, ADebugLevelIsAMaskOfLevels) {
    // Errors, notices and traces only.
    ZTCAgentProcess lAgent;
    lAgent.start({"-D", "false", "-d", "168", "-l", lAgent.agentLogPath()});
    lAgent.pipes().open();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_EQ(lAgent.stop(), 0);
    const auto lLines = lAgent.log().lines();
    EXPECT_FALSE(lLines.empty());
    for (const ZTSLogLine& lcrLine : lLines) {
        EXPECT_TRUE(lcrLine.mMark == "-E-" || lcrLine.mMark == "-N-" || lcrLine.mMark == "-T-") << lcrLine.mMark;
    }
    EXPECT_TRUE(lAgent.log().has("Stopping Scope Data Collection."));
}

TEST(CommandLine, ADebugLevelOfZeroSilencesEvenAnAssertion) {
    ZTCAgentProcess lAgent;
    lAgent.start({"-D", "false", "-d", "0", "-l", lAgent.agentLogPath()});
    lAgent.pipes().open();
    lAgent.pipes().sendRequest(bytesOf("06"));
    EXPECT_EQ(lAgent.waitForExit(), 1);
    EXPECT_EQ(readFile(lAgent.agentLogPath()), "");
}

TEST(CommandLine, TheDefaultLevelsAreHaltToNotice) {
    ZTCAgentProcess lAgent;
    lAgent.start({"-D", "false"});
    lAgent.pipes().open();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_TRUE(lAgent.defaultLog().has("Starting the Tavik", "-N-"));
    EXPECT_TRUE(lAgent.defaultLog().has("Stopping Scope Data Collection.", "-N-"));
    EXPECT_TRUE(lAgent.defaultLog().has("Tavik System exiting", "-H-"));
    for (const ZTSLogLine& lcrLine : lAgent.defaultLog().lines()) {
        EXPECT_TRUE(lcrLine.mMark != "-I-" && lcrLine.mMark != "-T-") << lcrLine.mText;
    }
}

TEST(CommandLine, TheHeartbeatTimeoutReachesTheHeartbeatHandler) {
    ZTCAgentProcess lAgent;
    lAgent.start(lAgent.defaultArguments({"-b", "77"}));
    lAgent.pipes().open();
    lAgent.log().waitFor("Creating the Heartbeat Handler Thread object...Timeout = 77");
    EXPECT_TRUE(lAgent.ping());
}

TEST(CommandLine, OptionsMayStandInAnyOrder) {
    ZTCAgentProcess lAgent;
    lAgent.start({"-b", "9", "-l", lAgent.agentLogPath(), "-S", "-d", "255", "-D", "false"});
    lAgent.pipes().open();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_TRUE(lAgent.log().has("Creating the Heartbeat Handler Thread object...Timeout = 9"));
}
