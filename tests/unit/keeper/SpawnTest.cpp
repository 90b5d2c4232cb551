#include "sensor/keeper/include/Spawn.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"

using testing::HasSubstr;

class Spawn : public testing::Test {
protected:
    /// Runs a line of shell. Its output goes to a file, by a descriptor that is handed on.
    std::string runShell(const std::string& acrLine, ZTEPrivilege aPrivilege = ZTPV_None) {
        const std::string lPath = mDirectory.path("output");
        const ZTCFileDescriptor lOutput = ZTCFileDescriptor::open(lPath.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0600);
        ZTSSpawn lSpawn;
        lSpawn.mProgram = "/bin/sh";
        lSpawn.mArguments = {"-c", "exec >&" + std::to_string(lOutput.get()) + "; " + acrLine};
        lSpawn.mEnvironment = {"PATH=/usr/bin:/bin", "GREETING=hello"};
        lSpawn.mDescriptors = {lOutput.get()};
        lSpawn.mPrivilege = aPrivilege;
        mStatus = waitFor(spawn(lSpawn));
        return readFile(lPath);
    }
    static int waitFor(const ZTSProcess& acrProcess) {
        pollfd lEnd{.fd = acrProcess.mPidFd.get(), .events = POLLIN, .revents = 0};
        EXPECT_EQ(poll(&lEnd, 1, 20000), 1);
        return reap(acrProcess);
    }

    const ZTCTemporaryDirectory mDirectory;
    int mStatus = -1;
};

TEST_F(Spawn, RunsTheProgramWithThisEnvironmentAndTellsItsEnd) {
    EXPECT_EQ(runShell("echo $GREETING $HOME; exit 3"), "hello\n");
    EXPECT_EQ(WEXITSTATUS(mStatus), 3);
}

TEST_F(Spawn, TheProcessHasAGroupOfItsOwnAndNoBlockedSignals) {
    sigset_t lTerm;
    sigemptyset(&lTerm);
    sigaddset(&lTerm, SIGTERM);
    sigset_t lBefore;
    sigprocmask(SIG_BLOCK, &lTerm, &lBefore);
    const std::string lText = runShell("cut -d' ' -f1,5 /proc/$$/stat; exec grep SigBlk /proc/self/status");
    sigprocmask(SIG_SETMASK, &lBefore, nullptr);
    const std::string lPid = lText.substr(0, lText.find(' '));
    EXPECT_EQ(lText, lPid + " " + lPid + "\nSigBlk:\t0000000000000000\n");
}

TEST_F(Spawn, WithoutPrivilegesTheProcessHasNoCapabilityAndGetsNone) {
    const std::string lText = runShell("grep -E 'Cap(Inh|Prm|Eff|Amb)|NoNewPrivs' /proc/$$/status");
    EXPECT_EQ(lText,
              "CapInh:\t0000000000000000\nCapPrm:\t0000000000000000\nCapEff:\t0000000000000000\n"
              "CapAmb:\t0000000000000000\nNoNewPrivs:\t1\n");
}

TEST_F(Spawn, PassingOnGivesTheCapabilitiesThatThisProcessHas) {
    const std::string lOwn = readFile("/proc/self/status");
    const std::size_t lPosition = lOwn.find("CapPrm:");
    EXPECT_EQ(runShell("grep CapPrm /proc/$$/status", ZTPV_PassOn),
              lOwn.substr(lPosition, lOwn.find('\n', lPosition) + 1 - lPosition));
}

TEST_F(Spawn, OnlyTheStandardStreamsAndWhatIsHandedOnAreOpen) {
    const ZTCFileDescriptor lOwn = ZTCFileDescriptor::open("/dev/zero", O_RDONLY);
    EXPECT_THAT(runShell("ls -l /proc/$$/fd"), testing::Not(HasSubstr("/dev/zero")));
}

TEST_F(Spawn, AProgramThatCannotBeExecutedIsNamedAndLeavesNoProcess) {
    ZTSSpawn lSpawn;
    lSpawn.mProgram = mDirectory.path("missing");
    try {
        spawn(lSpawn);
        ADD_FAILURE();
    } catch (const ZTCSystemCallEx& lcrEx) {
        EXPECT_EQ(lcrEx.getErrno(), ENOENT);
        EXPECT_THAT(lcrEx.what(), HasSubstr(lSpawn.mProgram));
    }
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
    EXPECT_EQ(errno, ECHILD);
}

TEST_F(Spawn, ASignalReachesTheProcessAndNoneThatHasTakenItsPid) {
    ZTSSpawn lSpawn;
    lSpawn.mProgram = "/bin/sleep";
    lSpawn.mArguments = {"60"};
    const ZTSProcess lProcess = spawn(lSpawn);
    sendSignal(lProcess.mPidFd, SIGKILL);
    EXPECT_EQ(waitFor(lProcess), SIGKILL);
    sendSignal(lProcess.mPidFd, SIGKILL);
    sendSignal(ZTCFileDescriptor(), SIGKILL);
}
