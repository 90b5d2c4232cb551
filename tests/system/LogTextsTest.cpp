#include "tests/support/LogTextsSeen.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

// Every text that a path of the agent leads to is driven on that path and found in the agent's own log. Each function
// here drives one life of an agent, or a few that belong together.

namespace {

void sAddLogs(ZTCLogTextsSeen& arSeen, const ZTCAgentProcess& acrAgent) {
    arSeen.add(acrAgent.log().rawLines());
    arSeen.add(acrAgent.defaultLog().rawLines());
}

/// One event through each of the four callbacks.
std::vector<ZTSLibraryEvent> sOneOfEach(unsigned aBoard) {
    return {ZTSLibraryEvent::scope(aBoard, 4, 0x01, scsiData(gcRemotePort, 3)),
            ZTSLibraryEvent::link(aBoard, ZTCScriptedLibrary::portName(0)),
            ZTSLibraryEvent::rscn(aBoard, rscnPayload({0x00010203})), ZTSLibraryEvent::temperature(aBoard)};
}

/// Refused registrations of every sort, then one that succeeds, and a start that finds everything registered.
void sDriveRegistration(ZTCAgentProcess& arAgent) {
    arAgent.library().configure("register-status 1 1 1 3");
    EXPECT_EQ(gcNotAllowedHex, arAgent.request("0000001000"));
    arAgent.library().configure("register-status 1 1 1 0");
    arAgent.library().configure("register-handle 0 0 2 0");
    EXPECT_EQ(gcNotAllowedHex, arAgent.request("0000001000"));
    arAgent.library().configure("register-handle 0 0 2 77");
    arAgent.library().configure("register-handle 0 0 1 0");
    EXPECT_EQ(gcNotAllowedHex, arAgent.request("0000001000"));
    arAgent.library().configure("register-handle 0 0 1 78");
    arAgent.library().configure("register-handle 0 0 32 0");
    arAgent.startScope();
    arAgent.startScope();
}

/// Every kind, whole and too short; every category with a kind that there is none of; boards that there are not.
void sDriveEvents(ZTCAgentProcess& arAgent) {
    std::vector<ZTSLibraryEvent> lEvents;
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        const ZTCBytes lShort(lcrKind.mMinimumLength - 1, 0);
        lEvents.push_back(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData));
        lEvents.push_back(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lShort));
    }
    for (const ZTSBareKind& lcrKind : bareKinds()) {
        lEvents.push_back(lcrKind.mEvent);
    }
    for (const unsigned lCategory : {1u, 2u, 4u, 8u, 16u, 32u}) {
        lEvents.push_back(ZTSLibraryEvent::bare(0, lCategory, 0x80));
    }
    lEvents.push_back(ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203})));
    lEvents.push_back(ZTSLibraryEvent::rscn(0, ZTCBytes(7, 0)));
    lEvents.push_back(ZTSLibraryEvent::rscn(0, ZTCBytes(8, 0)));
    for (const ZTSLibraryEvent& lcrEvent : sOneOfEach(7)) {
        lEvents.push_back(lcrEvent);
    }
    arAgent.library().deliverAll(lEvents);
}

/// Adapters that go, and adapters that were not there at the start.
void sDriveAdapters(ZTCAgentProcess& arAgent) {
    arAgent.library().configure("adapters 1");
    arAgent.retrieve();
    arAgent.library().deliverAll(sOneOfEach(1));
    arAgent.library().configure("adapters 3");
    arAgent.retrieve();
    arAgent.retrieve();
}

void sDriveBrokenFrames(ZTCAgentProcess& arAgent) {
    arAgent.pipes().sendRaw(bytesOf("00000000"));
    arAgent.pipes().waitUntilTaken();
    EXPECT_TRUE(arAgent.ping());
    arAgent.pipes().sendRaw(bytesOf("00000005 05"));
    arAgent.log().waitForLine(
        [](const ZTSLogLine& acrLine) { return acrLine.mText.find("broke off") != std::string::npos; },
        "of a message that broke off");
}

/// A log that is moved away, and one whose place is taken.
void sDriveLog(ZTCAgentProcess& arAgent, ZTCLogTextsSeen& arSeen) {
    const std::string lMoved = arAgent.workingDirectory() + "/moved.log";
    std::filesystem::rename(arAgent.agentLogPath(), lMoved);
    arAgent.process().sendSignal(SIGHUP);
    arAgent.log().waitFor("The log file was reopened");
    arSeen.add(ZTCAgentLog(lMoved).rawLines());

    const std::string lSecond = arAgent.workingDirectory() + "/second.log";
    std::filesystem::rename(arAgent.agentLogPath(), lSecond);
    std::filesystem::create_directory(arAgent.agentLogPath());
    arAgent.process().sendSignal(SIGHUP);
    ZTCAgentLog(lSecond).waitFor("The log file was reopened", 2);
    std::filesystem::remove(arAgent.agentLogPath());
    arAgent.process().sendSignal(SIGHUP);
    arAgent.log().waitFor("The log file was reopened");
    arSeen.add(ZTCAgentLog(lSecond).rawLines());
}

void sDriveALongLife(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lAgent(2);
    writeFile(lAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    lAgent.startAndConnect({"-b", "1", "-S"});
    EXPECT_EQ(0, lAgent.run(lAgent.defaultArguments()).mStatus) << "a second start";
    lAgent.registerTargets({{makeWwn(gcOtherNode), makeWwn(gcOtherPort), 0x010203}});
    lAgent.library().deliverAll(sOneOfEach(0));
    for (const char* lpLevel : {"1", "2", "3", "4"}) {
        lAgent.library().configure(std::string("log ") + lpLevel + " a line of the library's own");
    }
    sDriveRegistration(lAgent);
    sDriveEvents(lAgent);
    sDriveAdapters(lAgent);
    EXPECT_EQ(gcSuccessHex, lAgent.request(gcStopScopeHex));
    lAgent.library().deliverAll(sOneOfEach(0));
    EXPECT_EQ(gcSuccessHex, lAgent.request(periodHex(1)));
    sDriveBrokenFrames(lAgent);
    sDriveLog(lAgent, arSeen);
    lAgent.log().waitFor("Sensor process still running, but not updating the heartbeat");
    EXPECT_EQ(gcSuccessHex, lAgent.request(gcShutDownHex));
    EXPECT_EQ(0, lAgent.waitForExit());
    sAddLogs(arSeen, lAgent);
}

void sDriveTheTotalLimit(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(63);
    lAgent.startScope();
    std::vector<std::uint32_t> lPages;
    for (std::uint32_t lPage = 0; lPage < 16382; ++lPage) {
        lPages.push_back(lPage);
    }
    // Eight bytes a page: three of them are more than may be held.
    const ZTSLibraryEvent lRscn = ZTSLibraryEvent::rscn(0, rscnPayload(lPages));
    lAgent.library().deliverAll({lRscn, lRscn, lRscn});
    lAgent.library().deliverAll(sOneOfEach(0));
    EXPECT_EQ(0, lAgent.stop());
    sAddLogs(arSeen, lAgent);
}

/// Starts that end before anything runs.
void sDriveRefusedStarts(ZTCLogTextsSeen& arSeen) {
    const auto lDrive = [&arSeen](int aStatus, const std::function<void(ZTCAgentProcess&)>& acrPrepare,
                                  const std::vector<std::string>& acrMore = {}) {
        ZTCAgentProcess lAgent;
        acrPrepare(lAgent);
        EXPECT_EQ(aStatus, lAgent.run(lAgent.defaultArguments(acrMore)).mStatus);
        sAddLogs(arSeen, lAgent);
    };
    lDrive(1, [](ZTCAgentProcess& arAgent) { arAgent.unsetEnvironment("ZT_QRV_SENSOR_DIR"); });
    lDrive(0, [](ZTCAgentProcess& arAgent) { arAgent.setEnvironment("ZT_LIBKPM_PATH", ""); });
    lDrive(0, [](ZTCAgentProcess& arAgent) { arAgent.setEnvironment("ZT_LIBKPM_PATH", "/no/libkpm.so"); });
    lDrive(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("version 2"); });
    lDrive(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("adapters 0"); });
    lDrive(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("ztapi-supported 0"); });
    lDrive(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("init-status 5"); });
    lDrive(0, [](ZTCAgentProcess&) {}, {"-x"});
    lDrive(0, [](ZTCAgentProcess& arAgent) { std::filesystem::create_directory(arAgent.pidFilePath()); }, {"-s"});
}

/// A stop while nobody reads responses, and the start that finds what it left.
void sDriveAWaitForAReader(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lAgent;
    lAgent.start();
    lAgent.log().waitFor("Waiting for a reader of '" + lAgent.responseFifoPath() + "'");
    EXPECT_EQ(0, lAgent.stop());
    lAgent.startAndConnect();
    EXPECT_EQ(0, lAgent.stop());
    sAddLogs(arSeen, lAgent);
}

/// A directory and a FIFO that are open to others; and no place for a status page, and no bell.
void sDriveSharedPlaces(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_TVK_STATUS_PAGE", lAgent.workingDirectory() + "/nowhere/page");
    lAgent.setEnvironment("ZT_TVK_BELL_FD", "1");
    std::filesystem::permissions(lAgent.sensorDirectory(), std::filesystem::perms::all);
    EXPECT_EQ(0, mkfifo(lAgent.commandFifoPath().c_str(), 0600));
    std::filesystem::permissions(lAgent.commandFifoPath(), std::filesystem::perms::all);
    lAgent.startAndConnect();
    EXPECT_EQ(0, lAgent.stop());
    sAddLogs(arSeen, lAgent);
}

/// Files of the agent's that somebody replaces while it runs.
void sDriveReplacedFiles(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    for (const std::string& lcrPath : {lAgent.commandFifoPath(), lAgent.pidFilePath()}) {
        std::filesystem::remove(lcrPath);
        writeFile(lcrPath, "somebody else's\n");
    }
    EXPECT_EQ(0, lAgent.stop());
    sAddLogs(arSeen, lAgent);
}

void sDriveHeartbeatFailures(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lWithoutSensor;
    ZTCAgentProcess lWithoutFile;
    writeFile(lWithoutFile.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    lWithoutSensor.startAndConnect({"-b", "1"});
    lWithoutFile.startAndConnect({"-b", "1"});
    std::filesystem::remove(lWithoutFile.pidFilePath());
    for (ZTCAgentProcess* lpAgent : {&lWithoutFile, &lWithoutSensor}) {
        EXPECT_EQ(0, lpAgent->waitForExit());
        sAddLogs(arSeen, *lpAgent);
    }
}

void sDriveAnUnknownCommand(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().sendRequest({6});
    EXPECT_EQ(1, lAgent.waitForExit());
    sAddLogs(arSeen, lAgent);
}

/// A log whose directory comes only later: until then its lines, and why they are there, go to standard error.
void sDriveLostLines(ZTCLogTextsSeen& arSeen) {
    ZTCAgentProcess lAgent;
    const std::string lDirectory = lAgent.workingDirectory() + "/later";
    const ZTCAgentLog lLater(lDirectory + "/agent.log");
    lAgent.start({"-D", "false", "-d", "63", "-l", lLater.path()});
    lAgent.pipes().open();
    EXPECT_EQ(gcSuccessHex, lAgent.request(gcStopScopeHex));
    std::filesystem::create_directory(lDirectory);
    lAgent.process().sendSignal(SIGHUP);
    waitUntil([&] { return exists(lLater.path()); }, "the log to be made");
    EXPECT_EQ(gcSuccessHex, lAgent.request(periodHex(1)));
    EXPECT_EQ(0, lAgent.stop());
    arSeen.add(lLater.rawLines());
    std::istringstream lError(lAgent.process().standardError());
    for (std::string lLine; std::getline(lError, lLine);) {
        arSeen.add({lLine});
    }
}

}  // namespace

TEST(LogTexts, EveryTextOfARealPathIsFoundInARealLogAndNoOtherOne) {
    ZTCLogTextsSeen lSeen;
    sDriveALongLife(lSeen);
    sDriveTheTotalLimit(lSeen);
    sDriveRefusedStarts(lSeen);
    sDriveAWaitForAReader(lSeen);
    sDriveSharedPlaces(lSeen);
    sDriveReplacedFiles(lSeen);
    sDriveHeartbeatFailures(lSeen);
    sDriveAnUnknownCommand(lSeen);
    sDriveLostLines(lSeen);
    EXPECT_EQ(std::vector<std::string>{}, lSeen.unseen(ZTELogTextPath::Agent));
    EXPECT_EQ(std::set<std::string>{}, lSeen.strangers());
}

TEST(LogTexts, EveryLevelIsSwitchedOnByItsOwnBitAlone) {
    for (unsigned lLevel = 1; lLevel <= 128; lLevel *= 2) {
        ZTCAgentProcess lAgent;
        lAgent.startAndConnectQuietly(lLevel);
        EXPECT_EQ(gcNotAllowedHex, [&] {
            lAgent.library().configure("register-status 0 1 1 3");
            return lAgent.request("0000001000");
        }());
        EXPECT_EQ(0, lAgent.stop());
        const std::vector<ZTSLogLine> lLines = lAgent.log().lines();
        // No path of an agent in good order leads to an alert or to a critical line, nor to a warning behind the start.
        EXPECT_EQ(lLevel == 2 || lLevel == 4 || lLevel == 16, lLines.empty()) << lLevel;
        for (const ZTSLogLine& lcrLine : lLines) {
            for (const ZTSLogText& lcrRow : logTexts()) {
                if (lcrRow.mpMark == lcrLine.mMark) {
                    ASSERT_EQ(lLevel, lcrRow.mLevel) << lcrLine.mText;
                }
            }
        }
    }
}
