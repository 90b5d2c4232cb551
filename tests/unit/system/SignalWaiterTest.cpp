#include "system/include/SignalWaiter.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <ctime>
#include <filesystem>
#include <iterator>
#include <set>

#include "tests/unit/os/LogCapture.h"
#include "tests/unit/system/ForkedProcess.h"

TEST(SignalWaiter, TermAndIntRaiseTheStopEvent) {
    for (const int lSignal : {SIGTERM, SIGINT}) {
        ZTCForkedProcess lChild([lSignal](ZTCForkedProcess&) {
            ZTCSignalWaiter::blockSignals();
            ZTCSignalWaiter lWaiter;
            lWaiter.start();
            kill(getpid(), lSignal);
            const bool lIsRaised = getStopEvent().waitFor(20000);
            lWaiter.stop();
            return lIsRaised && !getExitEvent().isRaised() ? 0 : 1;
        });
        EXPECT_EQ(lChild.waitForExit(), 0) << lSignal;
    }
}

TEST(SignalWaiter, ASignalFromBeforeTheStartIsNotLost) {
    ZTCForkedProcess lChild([](ZTCForkedProcess&) {
        ZTCSignalWaiter::blockSignals();
        kill(getpid(), SIGTERM);
        ZTCSignalWaiter lWaiter;
        lWaiter.start();
        return getStopEvent().waitFor(20000) ? 0 : 1;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST(SignalWaiter, SignalsThatWaitAreHandedOnEachAsItIs) {
    ZTCForkedProcess lChild([](ZTCForkedProcess&) {
        ZTCSignalWaiter::blockSignals();
        kill(getpid(), SIGINT);
        kill(getpid(), SIGHUP);
        const pid_t lHeir = fork();
        if (lHeir == 0) {
            sigset_t lSignals;
            sigemptyset(&lSignals);
            sigaddset(&lSignals, SIGTERM);
            sigaddset(&lSignals, SIGINT);
            sigaddset(&lSignals, SIGHUP);
            const timespec lLong{20, 0};
            std::multiset<int> lGot;
            lGot.insert(sigtimedwait(&lSignals, nullptr, &lLong));
            lGot.insert(sigtimedwait(&lSignals, nullptr, &lLong));
            _exit(lGot == std::multiset<int>{SIGHUP, SIGINT} ? 0 : 1);
        }
        ZTCSignalWaiter::handOnSignals(lHeir);
        int lStatus = -1;
        waitpid(lHeir, &lStatus, 0);
        return WIFEXITED(lStatus) ? WEXITSTATUS(lStatus) : 2;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST(SignalWaiter, HangUpReopensTheLogFileAndStopsNothing) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("child.log");
    ZTCForkedProcess lChild([&](ZTCForkedProcess& arSelf) {
        setLogFilePath(lPath.c_str());
        ZTCSignalWaiter::blockSignals();
        ZTCSignalWaiter lWaiter;
        lWaiter.start();
        ZT_LOG_NOTICE("%s", "before");
        arSelf.tellParent();
        arSelf.waitForParent();
        return getStopEvent().isRaised() ? 1 : 0;
    });
    lChild.waitForChild();
    ASSERT_EQ(rename(lPath.c_str(), (lPath + ".old").c_str()), 0);
    lChild.sendSignal(SIGHUP);
    ZTCAgentLog(lPath).waitFor("The log file was reopened");
    EXPECT_EQ(ZTCAgentLog(lPath + ".old").count("before"), 1u);
    lChild.tellChild();
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST(SignalWaiter, ABrokenPipeIsNoSignal) {
    ZTCForkedProcess lChild([](ZTCForkedProcess&) {
        ZTCSignalWaiter::blockSignals();
        int lPipe[2];
        if (pipe2(lPipe, O_CLOEXEC) != 0) {
            return 2;
        }
        close(lPipe[0]);
        return write(lPipe[1], "x", 1) == -1 && errno == EPIPE ? 0 : 1;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST(SignalWaiter, ALimitOnFileSizesIsNoSignal) {
    ZTCTemporaryDirectory lDirectory;
    ZTCForkedProcess lChild([&](ZTCForkedProcess&) {
        ZTCSignalWaiter::blockSignals();
        const rlimit lNone{0, RLIM_INFINITY};
        const int lFile = open(lDirectory.path("file").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
        if (lFile < 0 || setrlimit(RLIMIT_FSIZE, &lNone) != 0) {
            return 2;
        }
        return write(lFile, "x", 1) == -1 && errno == EFBIG ? 0 : 1;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST(SignalWaiter, ItCanBeStoppedTwiceAndStartedAgain) {
    ZTCForkedProcess lChild([](ZTCForkedProcess&) {
        ZTCSignalWaiter::blockSignals();
        ZTCSignalWaiter lWaiter;
        lWaiter.stop();
        lWaiter.start();
        lWaiter.stop();
        lWaiter.stop();
        lWaiter.start();
        kill(getpid(), SIGINT);
        return getStopEvent().waitFor(20000) ? 0 : 1;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST(SignalWaiter, StoppedItLeavesNoDescriptorBehind) {
    ZTCForkedProcess lChild([](ZTCForkedProcess&) {
        const auto lCountDescriptors = [] {
            return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
        };
        ZTCSignalWaiter::blockSignals();
        ZTCSignalWaiter lWaiter;
        lWaiter.start();
        lWaiter.stop();
        const auto lBefore = lCountDescriptors();
        for (int lRound = 0; lRound < 3; ++lRound) {
            lWaiter.start();
            lWaiter.stop();
        }
        return lCountDescriptors() == lBefore ? 0 : 1;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}
