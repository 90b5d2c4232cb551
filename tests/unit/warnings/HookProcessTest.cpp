#include "sensor/warnings/include/HookProcess.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <fstream>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

using std::chrono::milliseconds;
using std::chrono::seconds;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

/// Hooks in a folder of their own: small scripts, made here.
class HookProcess : public testing::Test {
protected:
    std::string script(const std::string& acrText) {
        const std::string lPath = mDirectory.path("hook" + std::to_string(++mCount));
        std::ofstream(lPath) << "#!/bin/sh\n" << acrText << "\n";
        chmod(lPath.c_str(), 0700);
        return lPath;
    }
    ZTSHookCall call(const std::string& acrText) {
        return {.mRun = {script(acrText), "first argument", "$HOME; second"},
                .mEnvironment = {"TAVIK_KIND=queue-full"},
                .mInput = "{\"kind\":\"queue-full\"}\n",
                .mTimeout = seconds(3600)};
    }
    /// What came of it, where it is so late all the time. The poll is what the real loop does.
    static std::string finish(ZTCHookProcess& arProcess, milliseconds aLater = {}) {
        const ZTCDeadline lDeadline;
        while (!lDeadline.isOver()) {
            std::vector<pollfd> lFds;
            arProcess.addTo(lFds);
            poll(lFds.data(), static_cast<nfds_t>(lFds.size()), 50);
            if (const auto lEnd = arProcess.step(std::chrono::steady_clock::now() + aLater)) {
                return *lEnd;
            }
        }
        throw std::runtime_error("the hook has not ended in time");
    }
    std::string run(const ZTSHookCall& acrCall) {
        ZTCHookProcess lProcess(acrCall, std::chrono::steady_clock::now());
        return finish(lProcess);
    }
    std::string read(const std::string& acrName) const { return readFile(mDirectory.path(acrName)); }
    std::string out(const std::string& acrName) const { return " > " + mDirectory.path(acrName); }
    /// A script's line: a process number in a file that then appears whole.
    std::string keepPid(const std::string& acrPid, const std::string& acrName) const {
        return "\necho " + acrPid + out(acrName + ".part") + "\nmv " + mDirectory.path(acrName + ".part") + " " +
               mDirectory.path(acrName);
    }
    static bool isGone(const std::string& acrPid) { return kill(std::stoi(acrPid), 0) != 0 && errno == ESRCH; }

    ZTCTemporaryDirectory mDirectory;
    int mCount = 0;
};

TEST_F(HookProcess, GetsItsInputItsArgumentsAndItsVariablesWithoutAShellBetween) {
    setenv("TAVIK_LINK_FD", "9", 1);
    const std::string lEnd =
        run(call("cat" + out("input") + "\nprintf '%s|' \"$@\"" + out("arguments") + "\nenv" + out("variables")));
    unsetenv("TAVIK_LINK_FD");
    EXPECT_EQ(lEnd, "");
    EXPECT_EQ(read("input"), "{\"kind\":\"queue-full\"}\n");
    EXPECT_EQ(read("arguments"), "first argument|$HOME; second|");
    EXPECT_THAT(read("variables"),
                AllOf(HasSubstr("TAVIK_KIND=queue-full\n"), HasSubstr("PATH="), Not(HasSubstr("TAVIK_LINK_FD"))));
}

TEST_F(HookProcess, NeedNotReadItsInputHoweverLarge) {
    ZTSHookCall lCall = call("exit 0");
    lCall.mInput.assign(4 << 20, 'x');
    EXPECT_EQ(run(lCall), "");
}

TEST_F(HookProcess, InheritsNoDescriptorAndNoIgnoredSignal) {
    const int lPipe = dup(0);
    ASSERT_GT(lPipe, 2);
    signal(SIGTERM, SIG_IGN);
    const std::string lEnd = run(call("ls /proc/self/fd" + out("descriptors") + "\nkill -TERM $$\nsleep 100"));
    signal(SIGTERM, SIG_DFL);
    close(lPipe);
    EXPECT_THAT(lEnd, HasSubstr("signal 15"));
    EXPECT_EQ(read("descriptors"), "0\n1\n2\n3\n");  // 3 is the folder that ls reads
}

TEST_F(HookProcess, ThatIsMissingIsAnErrorWithItsName) {
    ZTSHookCall lCall = call("");
    lCall.mRun.front() = mDirectory.path("nothing");
    try {
        run(lCall);
        FAIL() << "it was run";
    } catch (const ZTCSystemCallEx& lrEx) {
        EXPECT_EQ(lrEx.getErrno(), ENOENT);
        EXPECT_THAT(lrEx.what(), HasSubstr(lCall.mRun.front()));
    }
}

TEST_F(HookProcess, ThatMayNotBeRunIsAnError) {
    ZTSHookCall lCall = call("");
    chmod(lCall.mRun.front().c_str(), 0600);
    EXPECT_THROW(run(lCall), ZTCSystemCallEx);
}

TEST_F(HookProcess, ThatFailsSaysItsStatusAndWhatItPrintedLast) {
    EXPECT_EQ(run(call("seq 1 20000\necho 'no mail server' >&2\nexit 3")).substr(0, 24), "it ended with status 3: ");
    EXPECT_THAT(run(call("seq 1 20000\necho 'no mail server' >&2\nexit 3")), HasSubstr("20000 no mail server"));
}

TEST_F(HookProcess, ThatIsKilledSaysTheSignal) {
    EXPECT_THAT(run(call("kill -KILL $$")), StartsWith("it was ended by signal 9"));
}

TEST_F(HookProcess, ThatHangsIsEndedWithAllItsProcessesAtItsTimeout) {
    ZTSHookCall lCall = call("sleep 1000 &" + keepPid("$!", "child") + "\nsleep 1000");
    const auto lNow = std::chrono::steady_clock::now();
    ZTCHookProcess lProcess(lCall, lNow);
    waitUntil([&] { return exists(mDirectory.path("child")); }, "the hook's child");
    EXPECT_EQ(lProcess.step(lNow + seconds(3599)), std::nullopt);
    EXPECT_THAT(finish(lProcess, seconds(3600)), HasSubstr("after 3600 s, its timeout: it was ended"));
    EXPECT_TRUE(isGone(read("child")));
}

TEST_F(HookProcess, ThatHangsInASessionOfItsOwnIsEndedAtItsTimeout) {
    ZTSHookCall lCall = call("setsid sh -c 'sleep 1000 &" + keepPid("$!", "child") + "\nsleep 1000' &\nsleep 1000");
    ZTCHookProcess lProcess(lCall, std::chrono::steady_clock::now());
    waitUntil([&] { return exists(mDirectory.path("child")); }, "the hook's child");
    EXPECT_THAT(finish(lProcess, seconds(3600)), HasSubstr("after 3600 s"));
    EXPECT_TRUE(isGone(read("child")));
}

TEST_F(HookProcess, ThatLeavesAProcessBehindIsReportedAndItIsEnded) {
    EXPECT_THAT(run(call("sleep 1000 &\necho $!" + out("child"))), HasSubstr("left processes behind"));
    EXPECT_TRUE(isGone(read("child")));
}

TEST_F(HookProcess, ThatLeavesADaemonOfItsOwnSessionIsReportedAndItIsEnded) {
    const std::string lDaemon = "setsid sh -c 'setsid sleep 1000 &" + keepPid("$!", "child") + "'";
    EXPECT_THAT(run(call(lDaemon)), HasSubstr("left processes behind"));
    EXPECT_TRUE(isGone(read("child")));
}

TEST_F(HookProcess, ThatForksWithoutEndIsEndedAtItsTimeout) {
    // Each process starts the next one and ends.
    const std::string lNext = mDirectory.path("next");
    ZTSHookCall lCall = call(lNext + "\nsleep 1000");
    std::ofstream(lNext) << "#!/bin/sh\ntest -e " << mDirectory.path("stop") << " || setsid " << lNext << " &\n: > "
                         << mDirectory.path("runs") << "\n";
    chmod(lNext.c_str(), 0700);
    ZTCHookProcess lProcess(lCall, std::chrono::steady_clock::now());
    waitUntil([&] { return exists(mDirectory.path("runs")); }, "the chain of processes");
    EXPECT_THAT(finish(lProcess, seconds(3600)), HasSubstr("it was ended"));
    writeFile(mDirectory.path("stop"), "");
}

TEST_F(HookProcess, WhoseWatchingProcessIsKilledHasFailed) {
    ZTCHookProcess lProcess(call(keepPid("$$", "hook") + keepPid("$PPID", "parent") + "\nsleep 1000"),
                            std::chrono::steady_clock::now());
    waitUntil([&] { return exists(mDirectory.path("parent")); }, "the hook");
    const std::string lHook = read("hook");
    ASSERT_EQ(kill(std::stoi(read("parent")), SIGKILL), 0);
    EXPECT_THAT(finish(lProcess), HasSubstr("watches it was killed"));
    waitUntil([&] { return isGone(lHook); }, "the end of the hook");
}

TEST_F(HookProcess, ThatPrintsWithoutEndStillMeetsItsTimeout) {
    const ZTSHookCall lCall = call("yes");
    const auto lNow = std::chrono::steady_clock::now();
    ZTCHookProcess lProcess(lCall, lNow);
    EXPECT_EQ(lProcess.step(lNow + seconds(1)), std::nullopt);
    EXPECT_THAT(finish(lProcess, seconds(3600)), HasSubstr("still ran"));
}

TEST_F(HookProcess, IsEndedWithAllItsProcessesWhereItsOwnerEnds) {
    {
        ZTCHookProcess lProcess(call(keepPid("$$", "pid") + "\nsleep 1000"), std::chrono::steady_clock::now());
        waitUntil([&] { return exists(mDirectory.path("pid")); }, "the hook");
    }
    EXPECT_TRUE(isGone(read("pid")));
}

TEST_F(HookProcess, IsEndedWhereItsOwnerIsKilled) {
    const ZTSHookCall lCall = call("setsid sleep 1000 &" + keepPid("$!", "child") + "\nsleep 1000");
    const pid_t lOwner = fork();
    if (lOwner == 0) {
        const ZTCHookProcess lProcess(lCall, std::chrono::steady_clock::now());
        pause();
    }
    waitUntil([&] { return exists(mDirectory.path("child")); }, "the hook");
    kill(lOwner, SIGKILL);
    waitpid(lOwner, nullptr, 0);
    waitUntil([&] { return isGone(read("child")); }, "the end of the hook's child");
}
