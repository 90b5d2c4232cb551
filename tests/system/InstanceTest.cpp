#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <memory>
#include <string>

#include "tests/support/AgentProcess.h"

static pid_t sRecordedPid(const ZTCAgentProcess& acrAgent) {
    const std::string lText = readFile(acrAgent.pidFilePath());
    return lText.empty() ? 0 : static_cast<pid_t>(std::stol(lText));
}

/// A lock on the pid file, as another agent would hold it.
class ZTCPidFileLock {
public:
    explicit ZTCPidFileLock(const std::string& acrPath)
        : mDescriptor(open(acrPath.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644)) {
        EXPECT_EQ(flock(mDescriptor, LOCK_EX | LOCK_NB), 0);
    }
    ~ZTCPidFileLock() { release(); }
    ZTCPidFileLock(const ZTCPidFileLock&) = delete;
    ZTCPidFileLock& operator=(const ZTCPidFileLock&) = delete;

    void release() {
        if (mDescriptor >= 0) {
            close(mDescriptor);
            mDescriptor = -1;
        }
    }

private:
    int mDescriptor;
};

/// A process that does nothing, to stand for one that a pid file names.
static std::unique_ptr<ZTCChildProcess> sBystander(const ZTCAgentProcess& acrAgent) {
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = "/bin/sleep";
    lSetup.mArguments = {"1000"};
    lSetup.mWorkingDirectory = acrAgent.workingDirectory();
    lSetup.mOutputPrefix = acrAgent.workingDirectory() + "/bystander";
    return std::make_unique<ZTCChildProcess>(lSetup);
}

TEST(Instance, ThePidFileNamesTheRunningAgent) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(sRecordedPid(lAgent), lAgent.process().getPid());
}

TEST(Instance, ASecondStartSaysSoAndChangesNothingOfTheFirst) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    const std::string lPidFile = readFile(lAgent.pidFilePath());
    const auto lCalls = lAgent.library().calls();
    const std::string lSecondLog = lAgent.workingDirectory() + "/second.log";
    const ZTSRunResult lResult = lAgent.run({"-D", "false", "-d", "255", "-l", lSecondLog});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mOutput, "");
    EXPECT_NE(lResult.mError.find(std::to_string(lAgent.process().getPid())), std::string::npos) << lResult.mError;
    const ZTCAgentLog lLog(lSecondLog);
    EXPECT_EQ(lLog.count("Exit condition", "-I-"), 1u);
    EXPECT_FALSE(lLog.has("Tavik System exiting"));
    EXPECT_EQ(readFile(lAgent.pidFilePath()), lPidFile);
    EXPECT_EQ(lAgent.library().calls(), lCalls);
    EXPECT_TRUE(lAgent.ping());
    EXPECT_TRUE(isFifo(lAgent.commandFifoPath()));
}

TEST(Instance, ASecondStartAsADaemonIsRefusedBeforeItForks) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTSRunResult lResult = lAgent.run({"-D", "true"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_NE(lResult.mError, "");
    EXPECT_TRUE(lAgent.ping());
}

TEST(Instance, AgentsOfTwoDirectoriesRunSideBySide) {
    ZTCAgentProcess lFirst;
    ZTCAgentProcess lSecond;
    lFirst.startAndConnect();
    lSecond.startAndConnect();
    EXPECT_TRUE(lFirst.ping());
    EXPECT_TRUE(lSecond.ping());
}

TEST(Instance, APidFileOfADeadProcessIsTakenOver) {
    ZTCAgentProcess lAgent;
    const auto lpGone = sBystander(lAgent);
    const pid_t lPid = lpGone->getPid();
    lpGone->kill();
    writeFile(lAgent.pidFilePath(), std::to_string(lPid) + "\n");
    lAgent.startAndConnect();
    EXPECT_EQ(sRecordedPid(lAgent), lAgent.process().getPid());
}

TEST(Instance, APidFileThatNamesALivingStrangerIsTakenOver) {
    ZTCAgentProcess lAgent;
    const auto lpStranger = sBystander(lAgent);
    writeFile(lAgent.pidFilePath(), std::to_string(lpStranger->getPid()) + "\n");
    lAgent.startAndConnect();
    EXPECT_EQ(sRecordedPid(lAgent), lAgent.process().getPid());
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_FALSE(lpStranger->hasEnded());
}

TEST(Instance, APidFileOfNonsenseIsTakenOver) {
    for (const char* lpContent : {"", "nonsense", "-1", "99999999999999999999", "0\n"}) {
        SCOPED_TRACE(lpContent);
        ZTCAgentProcess lAgent;
        writeFile(lAgent.pidFilePath(), lpContent);
        lAgent.startAndConnect();
        EXPECT_EQ(sRecordedPid(lAgent), lAgent.process().getPid());
    }
}

TEST(Instance, AHeldLockRefusesAStartWhateverTheFileSays) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.pidFilePath(), "1234567\n");
    ZTCPidFileLock lLock(lAgent.pidFilePath());
    const ZTSRunResult lResult = lAgent.run(lAgent.defaultArguments());
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_NE(lResult.mError, "");
    EXPECT_EQ(readFile(lAgent.pidFilePath()), "1234567\n");
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));
}

TEST(Instance, OnlyItsOwnPidFileIsRemoved) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const std::string lOther = lAgent.pidFilePath() + ".other";
    writeFile(lOther, "4711\n");
    std::filesystem::rename(lOther, lAgent.pidFilePath());
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_EQ(readFile(lAgent.pidFilePath()), "4711\n");
}

TEST(Instance, ShutDownOptionStopsTheRunningAgentAndWaitsForIt) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    const ZTSRunResult lResult = lAgent.run({"-s"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_NE(lResult.mOutput, "");
    EXPECT_EQ(lResult.mError, "");
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
    EXPECT_FALSE(exists(lAgent.pidFilePath()));
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));
}

TEST(Instance, ShutDownOptionSaysThatNoneIsRunning) {
    ZTCAgentProcess lAgent;
    const ZTSRunResult lNone = lAgent.run({"-s"});
    EXPECT_EQ(lNone.mStatus, 0);
    EXPECT_NE(lNone.mOutput, "");
    EXPECT_FALSE(exists(lAgent.commandFifoPath()));

    lAgent.startAndConnect();
    const ZTSRunResult lStopped = lAgent.run({"-s"});
    EXPECT_EQ(lStopped.mStatus, 0);
    EXPECT_NE(lStopped.mOutput, lNone.mOutput);
    EXPECT_EQ(lAgent.waitForExit(), 0);

    EXPECT_EQ(lAgent.run({"-s"}).mOutput, lNone.mOutput);
}

TEST(Instance, ShutDownOptionSaysWhyItCannotStopTheAgent) {
    ZTCAgentProcess lAgent;
    std::filesystem::create_directory(lAgent.pidFilePath());
    const ZTSRunResult lResult = lAgent.run({"-s"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mOutput.find("The running instance cannot be stopped: "), 0u) << lResult.mOutput;
    EXPECT_NE(lResult.mOutput.find(lAgent.pidFilePath()), std::string::npos) << lResult.mOutput;
    EXPECT_EQ(lAgent.defaultLog().containing("The running instance cannot be stopped: ").size(), 1u);
}

TEST(Instance, ShutDownOptionLeavesAStrangerAlone) {
    ZTCAgentProcess lAgent;
    const auto lpStranger = sBystander(lAgent);
    writeFile(lAgent.pidFilePath(), std::to_string(lpStranger->getPid()) + "\n");
    const ZTSRunResult lResult = lAgent.run({"-s"});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_NE(lResult.mOutput, "");
    EXPECT_FALSE(lpStranger->hasEnded());
}

TEST(Instance, ShutDownOptionStopsAnAgentThatStillWaitsForItsSensor) {
    ZTCAgentProcess lAgent;
    lAgent.start();
    waitUntil([&] { return isFifo(lAgent.responseFifoPath()); }, "the response FIFO");
    EXPECT_EQ(lAgent.run({"-s"}).mStatus, 0);
    EXPECT_EQ(lAgent.waitForExit(), 0);
}

TEST(Instance, ShutDownOptionWaitsForAnAgentThatIsStarting) {
    ZTCAgentProcess lAgent;
    const auto lpStarting = sBystander(lAgent);
    ZTCPidFileLock lLock(lAgent.pidFilePath());
    const auto lpShutDown = lAgent.launch({"-s", "-d", "255"});
    lAgent.defaultLog().waitFor("'/tmp' already exists... continuing");
    EXPECT_FALSE(lpShutDown->hasEnded());
    writeFile(lAgent.pidFilePath(), std::to_string(lpStarting->getPid()) + "\n");
    EXPECT_EQ(lpStarting->waitForExit(), 1000 + SIGTERM);
    lLock.release();
    EXPECT_EQ(lpShutDown->waitForExit(), 0);
    EXPECT_NE(lpShutDown->standardOutput(), "");
}

static pid_t sWaitForDaemon(const ZTCAgentProcess& acrAgent) {
    waitUntil([&] { return sRecordedPid(acrAgent) > 0; }, "the daemon's pid file");
    return sRecordedPid(acrAgent);
}

static std::string sLinkOf(pid_t aPid, const std::string& acrName) {
    return std::filesystem::read_symlink("/proc/" + std::to_string(aPid) + "/" + acrName).string();
}

TEST(Instance, AStartBesideOneThatHasNotWrittenItsNumberYetSaysSo) {
    ZTCAgentProcess lAgent;
    const ZTCPidFileLock lLock(lAgent.pidFilePath());
    const ZTSRunResult lResult = lAgent.run(lAgent.defaultArguments());
    EXPECT_EQ(lResult.mStatus, 0);
    const std::string lText =
        "qrv-tvk is being started already by a process that holds the pid file '" + lAgent.pidFilePath() + "'";
    EXPECT_NE(lResult.mError.find(lText), std::string::npos) << lResult.mError;
    EXPECT_TRUE(lAgent.log().has(lText, "-E-"));
    EXPECT_TRUE(exists(lAgent.pidFilePath()));
}

TEST(Instance, ADaemonKeepsItsDirectoryAndHasLeftItsTerminal) {
    ZTCChildProcess::becomeReaper();
    ZTCAgentProcess lAgent;
    const ZTSRunResult lResult = lAgent.run({"-D", "true", "-d", "255", "-l", lAgent.agentLogPath()});
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(lResult.mOutput, "");
    EXPECT_EQ(lResult.mError, "");
    const pid_t lPid = sWaitForDaemon(lAgent);
    lAgent.adopt(lPid);
    lAgent.pipes().open();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_EQ(sLinkOf(lPid, "cwd"), std::filesystem::canonical(lAgent.workingDirectory()).string());
    for (const char* lpDescriptor : {"fd/0", "fd/1", "fd/2"}) {
        EXPECT_EQ(sLinkOf(lPid, lpDescriptor), "/dev/null");
    }
    EXPECT_NE(getsid(lPid), getsid(0));
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
    EXPECT_FALSE(exists(lAgent.pidFilePath()));
}

TEST(Instance, WithoutTheOptionTheAgentIsADaemon) {
    ZTCChildProcess::becomeReaper();
    ZTCAgentProcess lAgent;
    EXPECT_EQ(lAgent.run({}).mStatus, 0);
    lAgent.adopt(sWaitForDaemon(lAgent));
    lAgent.pipes().open();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_FALSE(lAgent.defaultLog().lines().empty());
}

TEST(Instance, ADaemonIsStoppedByTheShutDownOptionAndRefusesASecondStart) {
    ZTCChildProcess::becomeReaper();
    ZTCAgentProcess lAgent;
    EXPECT_EQ(lAgent.run({"-D", "true"}).mStatus, 0);
    lAgent.adopt(sWaitForDaemon(lAgent));
    lAgent.pipes().open();
    EXPECT_NE(lAgent.run({"-D", "true"}).mError, "");
    EXPECT_EQ(lAgent.run({"-s"}).mStatus, 0);
    EXPECT_EQ(lAgent.waitForExit(), 0);
}
