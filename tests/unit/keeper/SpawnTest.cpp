#include "sensor/keeper/include/Spawn.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
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
    const std::string lGroup = runShell("cut -d' ' -f1,5 /proc/$$/stat");
    // A shell that waits for a child unblocks the signals itself.
    const std::string lSignals = runShell("exec grep SigBlk /proc/self/status");
    sigprocmask(SIG_SETMASK, &lBefore, nullptr);
    const std::string lPid = lGroup.substr(0, lGroup.find(' '));
    EXPECT_EQ(lGroup, lPid + " " + lPid + "\n");
    EXPECT_EQ(lSignals, "SigBlk:\t0000000000000000\n");
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

/// In a new process: what root leaves an ordinary user, all of it effective.
static bool sBecomeOrdinaryUser() {
    if (geteuid() != 0) {
        return true;
    }
    __user_cap_header_struct lHeader{.version = _LINUX_CAPABILITY_VERSION_3, .pid = 0};
    __user_cap_data_struct lData[_LINUX_CAPABILITY_U32S_3] = {};
    if (prctl(PR_SET_KEEPCAPS, 1, 0, 0, 0) != 0 || setresuid(65534, 65534, 65534) != 0 ||
        syscall(SYS_capget, &lHeader, lData) != 0) {
        return false;
    }
    for (__user_cap_data_struct& lrWord : lData) {
        lrWord.effective = lrWord.permitted;
    }
    return syscall(SYS_capset, &lHeader, lData) == 0 &&
           readFile("/proc/self/status").find("CapEff:\t0000000000000000") == std::string::npos;
}

TEST_F(Spawn, CapabilitiesThatAreKeptForOthersArePermittedAndNotEffective) {
    const pid_t lChild = fork();
    if (lChild == 0) {
        if (!sBecomeOrdinaryUser()) {
            _exit(2);
        }
        const std::string lBefore = readFile("/proc/self/status");
        keepCapabilitiesForOthers();
        const std::string lAfter = readFile("/proc/self/status");
        const std::string lPermitted = lBefore.substr(lBefore.find("CapPrm:"), 24);
        const bool lIsDone = lAfter.find(lPermitted) != std::string::npos &&
                             lAfter.find("CapEff:\t0000000000000000") != std::string::npos &&
                             lAfter.find("CapAmb:\t0000000000000000") != std::string::npos;
        _exit(lIsDone ? 0 : 1);
    }
    int lStatus = -1;
    ASSERT_EQ(waitpid(lChild, &lStatus, 0), lChild);
    EXPECT_EQ(lStatus, 0);
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
