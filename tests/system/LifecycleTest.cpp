#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstddef>
#include <filesystem>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

/// Expects the texts as lines of the log, in this order, other lines between them.
static void sExpectInOrder(const ZTCAgentLog& acrLog, const std::vector<std::string>& acrTexts) {
    std::size_t lFrom = 0;
    for (const std::string& lcrText : acrTexts) {
        const auto lFound = acrLog.find(lcrText, lFrom);
        ASSERT_TRUE(lFound.has_value()) << "missing, or not in its place: " << lcrText;
        lFrom = *lFound + 1;
    }
}

static void sExpectNothingLeft(const ZTCAgentProcess& acrAgent) {
    EXPECT_FALSE(exists(acrAgent.commandFifoPath()));
    EXPECT_FALSE(exists(acrAgent.responseFifoPath()));
    EXPECT_FALSE(exists(acrAgent.pidFilePath()));
}

TEST(Lifecycle, AnUnsetInstallDirectoryIsAnAssertion) {
    ZTCAgentProcess lAgent;
    lAgent.unsetEnvironment("ZT_QRV_SENSOR_DIR");
    for (const char* lpOption : {"-h", "-v", "-S"}) {
        EXPECT_EQ(lAgent.run({lpOption}).mStatus, 1);
    }
    const auto lLines = lAgent.defaultLog().containing("Assertion [ pQrvSensorDir!=NULL ] failed");
    ASSERT_EQ(lLines.size(), 3u);
    EXPECT_EQ(lLines[0].mMark, "-H-");
    EXPECT_EQ(lLines[0].mLabel, ".//TavikSystem");
    EXPECT_EQ(lLines[0].mFunction, "preInit");
}

TEST(Lifecycle, AnEmptyInstallDirectoryIsAccepted) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_QRV_SENSOR_DIR", "");
    const ZTSRunResult lResult = lAgent.run({"-v"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mOutput, "qrv-tvk v3.0.1.2\n");
}

TEST(Lifecycle, PathsAreTheInstallDirectoryWithTheNamesAppendedUnchanged) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_QRV_SENSOR_DIR", lAgent.sensorDirectory() + "/");
    writeFile(lAgent.commandFifoPath(), "no FIFO");
    lAgent.start();
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_FALSE(lAgent.log().containing(lAgent.sensorDirectory() + "//qrvtvkcmd.fifo").empty());
}

TEST(Lifecycle, ATrailingSlashLeadsToTheSameFiles) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_QRV_SENSOR_DIR", lAgent.sensorDirectory() + "/");
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_TRUE(exists(lAgent.pidFilePath()));
    EXPECT_EQ(lAgent.stop(), 0);
    sExpectNothingLeft(lAgent);
}

TEST(Lifecycle, AnInstallDirectoryThatDoesNotExistEndsTheRunWithAClearError) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_QRV_SENSOR_DIR", lAgent.sensorDirectory() + "/missing");
    lAgent.start();
    EXPECT_EQ(lAgent.waitForExit(), 0);
    const auto lLines = lAgent.log().containing("Failed with error - ");
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_NE(lLines[0].mText.find("missing/qrv-tvk.pid"), std::string::npos) << lLines[0].mText;
}

TEST(Lifecycle, StartAndStopGoThroughTheirStepsInOrder) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_EQ(lAgent.stop(), 0);

    // Before the command line is applied only the default levels are logged, to the default file.
    sExpectInOrder(lAgent.defaultLog(), {"Starting the Tavik", "'/tmp' already exists... continuing"});
    EXPECT_EQ(lAgent.defaultLog().count("Starting the Tavik", "-N-"), 1u);
    EXPECT_EQ(lAgent.defaultLog().count("'/tmp' already exists... continuing", "-W-"), 1u);
    EXPECT_FALSE(lAgent.defaultLog().has("Performing Tavik system initialization"));

    std::vector<std::string> lTexts{"Performing Tavik system data initialization"};
    lTexts.push_back("Discovered QRV initiator <" + wwnText(ZTCScriptedLibrary::nodeName(0)) + ", " +
                     wwnText(ZTCScriptedLibrary::portName(0)) + ">");
    for (const char* lpText : {"Creating HeartbeatHandler Conditional...", "Creating CommandHandler Conditional...",
                               "Creating Tavik Command Reader IPC...", "Opening Tavik Command Reader IPC...",
                               "Creating Output IPC...", "Opening Response Pipe Writer Server...",
                               "Creating Tavik Protocol Handler...", "Creating Scope Event Catalogue..."}) {
        lTexts.push_back(lpText);
    }
    for (const char* lpKind : {"ElsPlogi",          "ElsPrlo",       "ElsAdisc",         "ElsLsrjt",
                               "ElsLogo",           "ElsRscn",       "FabricFbsy",       "FabricPbsy",
                               "FabricFcprdchkerr", "ScsiQfull",     "ScsiDevbsy",       "ScsiCheckcondition",
                               "ScsiLunreset",      "ScsiTgtreset",  "ScsiBusreset",     "ScsiVarquedepth",
                               "BoardPortinterr",   "BoardLinkatte", "BoardTemperature", "AdapterArrival"}) {
        lTexts.push_back(std::string("Inserting ") + lpKind + " ScopeEvent into Events Catalogue");
    }
    for (const char* lpText :
         {"Creating the Heartbeat Handler Thread object...Timeout = 240", "Creating Command Handler Thread object...",
          "Waiting for control availability...", "Command to handle: 5", "Closing and Destroying Command Pipe...",
          "Closing and Destroying Output Pipe...", "Performing common system data destruction",
          "Performing common system destruction", "Tavik System exiting", "Left"}) {
        lTexts.push_back(lpText);
    }
    sExpectInOrder(lAgent.log(), lTexts);
    EXPECT_EQ(lAgent.log().count("Creating the Heartbeat Handler Thread object...Timeout = 240", "-N-"), 1u);
    EXPECT_EQ(lAgent.log().count("Tavik System exiting", "-H-"), 1u);
    EXPECT_EQ(lAgent.log().count("Closing and Destroying Command Pipe...", "-I-"), 1u);

    const auto lLines = lAgent.log().lines();
    EXPECT_EQ(lLines.back().mText, "Left");
    EXPECT_EQ(lLines.back().mLabel, ".//TavikMain");
    EXPECT_EQ(lLines.back().mFunction, "main");
}

TEST(Lifecycle, TermAndIntStopTheAgentInOrder) {
    for (int lSignal : {SIGTERM, SIGINT}) {
        SCOPED_TRACE(lSignal);
        ZTCAgentProcess lAgent;
        lAgent.startAndConnect();
        lAgent.startScope();
        lAgent.waitForIdleCommandThread();
        lAgent.waitForIdleHeartbeatThread();
        lAgent.process().sendSignal(lSignal);
        EXPECT_EQ(lAgent.waitForExit(), 0);
        EXPECT_EQ(lAgent.log().count("Tavik System exiting", "-H-"), 1u);
        EXPECT_EQ(lAgent.log().count("Exiting Heartbeat Handler Thread as it is marked for exit.", "-H-"), 1u);
        EXPECT_EQ(lAgent.log().count("Command handler thread is set for exit ...", "-I-"), 1u);
        EXPECT_TRUE(lAgent.pipes().isAtEnd());
        sExpectNothingLeft(lAgent);
    }
}

TEST(Lifecycle, AStopThatIsAskedForManyTimesIsOneStop) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    for (int i = 0; i < 20 && !lAgent.process().hasEnded(); ++i) {
        lAgent.process().sendSignal(i % 2 == 0 ? SIGTERM : SIGINT);
    }
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.log().count("Tavik System exiting", "-H-"), 1u);
    sExpectNothingLeft(lAgent);
}

TEST(Lifecycle, ASignalAtAnyMomentOfTheStartEndsTheAgentWithStatusZero) {
    // The signal comes as soon as the n-th of these lines is in the log.
    for (const char* lpLine :
         {"Performing Tavik system data initialization", "Creating HeartbeatHandler Conditional...",
          "Creating Tavik Command Reader IPC...", "Creating Output IPC...", "Opening Response Pipe Writer Server..."}) {
        SCOPED_TRACE(lpLine);
        ZTCAgentProcess lAgent;
        lAgent.start();
        lAgent.log().waitFor(lpLine);
        EXPECT_EQ(lAgent.stop(), 0);
        EXPECT_FALSE(exists(lAgent.pidFilePath()));
    }
}

TEST(Lifecycle, TheNextStartTakesOverWhatAKilledAgentLeft) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.kill();
    EXPECT_TRUE(isFifo(lAgent.commandFifoPath()));
    EXPECT_TRUE(isFifo(lAgent.responseFifoPath()));
    EXPECT_TRUE(exists(lAgent.pidFilePath()));
    lAgent.pipes().close();
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_EQ(lAgent.stop(), 0);
    sExpectNothingLeft(lAgent);
}

static mode_t sModeOf(const std::string& acrPath) {
    struct stat lStatus {};
    EXPECT_EQ(lstat(acrPath.c_str(), &lStatus), 0) << acrPath;
    return lStatus.st_mode & 07777;
}

TEST(Lifecycle, TheFifosBelongToTheirUserAlone) {
    ZTCAgentProcess lAgent;
    lAgent.setUmask(0);
    lAgent.startAndConnect();
    EXPECT_TRUE(isFifo(lAgent.commandFifoPath()));
    EXPECT_TRUE(isFifo(lAgent.responseFifoPath()));
    EXPECT_EQ(sModeOf(lAgent.commandFifoPath()), 0600u);
    EXPECT_EQ(sModeOf(lAgent.responseFifoPath()), 0600u);
}

TEST(Lifecycle, APathThatIsNoFifoIsRefusedAndLeftUntouched) {
    for (const bool lIsCommand : {true, false}) {
        ZTCAgentProcess lAgent;
        const std::string lPath = lIsCommand ? lAgent.commandFifoPath() : lAgent.responseFifoPath();
        SCOPED_TRACE(lPath);
        writeFile(lPath, "precious");
        lAgent.start();
        EXPECT_EQ(lAgent.waitForExit(), 0);
        const auto lLines = lAgent.log().containing("Failed with error - ");
        ASSERT_EQ(lLines.size(), 1u);
        EXPECT_NE(lLines[0].mText.find(lPath), std::string::npos) << lLines[0].mText;
        EXPECT_EQ(readFile(lPath), "precious");
        EXPECT_FALSE(exists(lAgent.pidFilePath()));
    }
}

TEST(Lifecycle, ARefusedStartSaysWhyInTheLogAndOnStandardErrorWhateverTheLogCode) {
    const auto lStart = [](ZTCAgentProcess& lrAgent, const std::string& acrReason) {
        const ZTSRunResult lResult = lrAgent.run({"-D", "false"});
        EXPECT_EQ(lResult.mStatus, 0);
        EXPECT_EQ(lResult.mError.find("qrv-tvk ends: "), 0u) << lResult.mError;
        EXPECT_NE(lResult.mError.find(acrReason), std::string::npos) << lResult.mError;
        const auto lLines = lrAgent.defaultLog().containing("qrv-tvk ends: ");
        ASSERT_EQ(lLines.size(), 1u);
        EXPECT_EQ(lLines[0].mMark, "-E-");
        EXPECT_NE(lLines[0].mText.find(acrReason), std::string::npos) << lLines[0].mText;
    };
    ZTCAgentProcess lFileAgent;
    writeFile(lFileAgent.commandFifoPath(), "precious");
    lStart(lFileAgent, lFileAgent.commandFifoPath());
    ZTCAgentProcess lDirectoryAgent;
    lDirectoryAgent.setEnvironment("ZT_QRV_SENSOR_DIR", lDirectoryAgent.sensorDirectory() + "/missing");
    lStart(lDirectoryAgent, "missing/qrv-tvk.pid");
    ZTCAgentProcess lLibraryAgent;
    lLibraryAgent.library().configure("init-status 3");
    lStart(lLibraryAgent, "3");
}

TEST(Lifecycle, AStartByHandOnAHostWithoutAdaptersSaysOnStandardErrorWhyItEnded) {
    ZTCAgentProcess lAgent(0);
    const ZTSRunResult lResult = lAgent.run({"-D", "false"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mError, "qrv-tvk ends: No QRV Adapters found.. Tavik would exit\n");
    EXPECT_TRUE(lAgent.defaultLog().has("No QRV Adapters found.. Tavik would exit", "-N-"));

    ZTCAgentProcess lWithoutLibrary;
    lWithoutLibrary.setEnvironment("ZT_LIBKPM_PATH", "");
    EXPECT_EQ(lWithoutLibrary.run({"-D", "false"}).mError, "qrv-tvk ends: No Libkpm found\n");
}

TEST(Lifecycle, AnOrdinaryEndSaysNothingOnStandardError) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly();
    EXPECT_EQ(lAgent.request(gcShutDownHex), gcSuccessHex);
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.process().standardError(), "");
}

TEST(Lifecycle, ADirectoryInAFifosPlaceIsRefused) {
    ZTCAgentProcess lAgent;
    std::filesystem::create_directory(lAgent.commandFifoPath());
    lAgent.start();
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.log().containing("Failed with error - ").size(), 1u);
    EXPECT_TRUE(std::filesystem::is_directory(lAgent.commandFifoPath()));
}

TEST(Lifecycle, NoDescriptorOfTheAgentIsInheritedByAnything) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
    const std::string lBase = "/proc/" + std::to_string(lAgent.process().getPid());
    int lSeen = 0;
    for (const auto& lcrEntry : std::filesystem::directory_iterator(lBase + "/fd")) {
        const std::string lName = lcrEntry.path().filename().string();
        if (std::stoi(lName) < 3) {
            continue;
        }
        const std::string lInfo = readFile(lBase + "/fdinfo/" + lName);
        const std::size_t lFlags = lInfo.find("flags:");
        ASSERT_NE(lFlags, std::string::npos);
        const unsigned long lValue = std::stoul(lInfo.substr(lFlags + 6), nullptr, 8);
        EXPECT_NE(lValue & 02000000ul, 0u) << "descriptor " << lName << " would survive an exec";
        ++lSeen;
    }
    EXPECT_GE(lSeen, 3);
}

TEST(Lifecycle, AHangupReopensTheLog) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    const std::string lMoved = lAgent.agentLogPath() + ".moved";
    std::filesystem::rename(lAgent.agentLogPath(), lMoved);
    lAgent.process().sendSignal(SIGHUP);
    waitUntil([&] { return exists(lAgent.agentLogPath()); }, "the log to be reopened");
    const std::string lOld = readFile(lMoved);
    EXPECT_EQ(lAgent.request(periodHex(7)), gcSuccessHex);
    EXPECT_TRUE(lAgent.log().has("The limit set is 262144"));
    EXPECT_EQ(readFile(lMoved), lOld);
    EXPECT_EQ(lAgent.stop(), 0);
}

TEST(Lifecycle, HangupsChangeNothingElse) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (int i = 0; i < 50; ++i) {
        lAgent.process().sendSignal(SIGHUP);
        lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    }
    EXPECT_EQ(lAgent.retrieve().occurrences(2, 1), 50u);
}

TEST(Lifecycle, AStopIsPromptWhateverTheHeartbeatPeriod) {
    ZTCAgentProcess lAgent;
    lAgent.start(lAgent.defaultArguments({"-b", "4294967295"}));
    lAgent.pipes().open();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_EQ(lAgent.log().count("Creating the Heartbeat Handler Thread object...Timeout = 4294967295", "-N-"), 1u);
    EXPECT_EQ(lAgent.stop(), 0);
}
