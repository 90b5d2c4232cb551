#include <gtest/gtest.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <iostream>
#include <string>

#include "tests/support/Waiting.h"
#include "tests/unit/system/SystemMainTesting.h"

namespace {

using SystemDaemon = ZTCSystemMainFixture;

}  // namespace

TEST_F(SystemDaemon, ADaemonKeepsItsDirectoryAndLeavesItsStartersStreamsAlone) {
    ASSERT_EQ(prctl(PR_SET_CHILD_SUBREAPER, 1), 0);
    ZTCForkedProcess lChild(
        [&](ZTCForkedProcess& arSelf) {
            setLogFilePath(mLogFile.c_str());
            if (chdir(mDirectory.path().c_str()) != 0) {
                return 1;
            }
            ZTCTestSystem lSystem(mPidFile);
            lSystem.addConditional();
            lSystem.addComponent(
                NEW ZTCFunctionComponent(lSystem, "a thread", [&](ZTCFunctionComponent&, ZTCSystem& arSystem) {
                    std::cout << "not to be seen" << std::endl;
                    arSelf.tellParent();
                    arSystem.wait(0);
                }));
            runSystemMain(&lSystem, {});
            return 0;
        },
        mDirectory.path("child"));
    EXPECT_EQ(lChild.waitForExit(), 0);
    lChild.waitForChild();
    const std::string lPidText = readFile(mPidFile);
    ASSERT_FALSE(lPidText.empty());
    const pid_t lDaemon = std::stoi(lPidText);
    EXPECT_NE(lDaemon, lChild.getPid());
    EXPECT_EQ(getsid(lDaemon), lDaemon);

    const std::string lProcess = "/proc/" + std::to_string(lDaemon);
    EXPECT_EQ(std::filesystem::read_symlink(lProcess + "/cwd"), std::filesystem::canonical(mDirectory.path()));
    for (const char* lpStream : {"/fd/0", "/fd/1", "/fd/2"}) {
        EXPECT_EQ(std::filesystem::read_symlink(lProcess + lpStream), "/dev/null");
    }
    EXPECT_EQ(readFile(mDirectory.path("child.out")), "");
    EXPECT_EQ(readFile(mDirectory.path("child.err")), "");

    ASSERT_EQ(kill(lDaemon, SIGTERM), 0);
    int lStatus = -1;
    waitUntil([&] { return waitpid(lDaemon, &lStatus, WNOHANG) == lDaemon; }, "the daemon's end");
    EXPECT_EQ(lStatus, 0);
    EXPECT_FALSE(exists(mPidFile));
}

/// A system that gets a stop signal at the last moment before it daemonises.
class ZTCSystemStoppedEarly : public ZTCTestSystem {
public:
    ZTCSystemStoppedEarly(const std::string& acrPidFilePath, int aSignal)
        : ZTCTestSystem(acrPidFilePath), mSignal(aSignal) {}
    void systemDaemonize(ZTCString aDirectory, ZTCString aInput, ZTCString aOutput, ZTCString aError) override {
        kill(getpid(), mSignal);
        ZTCTestSystem::systemDaemonize(aDirectory, aInput, aOutput, aError);
    }

private:
    const int mSignal;
};

TEST_F(SystemDaemon, AStopSignalFromBeforeTheForkStopsTheDaemon) {
    ASSERT_EQ(prctl(PR_SET_CHILD_SUBREAPER, 1), 0);
    for (const int lSignal : {SIGTERM, SIGINT}) {
        ZTCForkedProcess lChild(
            [&](ZTCForkedProcess& arSelf) {
                setLogFilePath(mLogFile.c_str());
                ZTCSystemStoppedEarly lSystem(mPidFile, lSignal);
                lSystem.addConditional();
                lSystem.addComponent(
                    NEW ZTCFunctionComponent(lSystem, "a thread", [&](ZTCFunctionComponent&, ZTCSystem& arSystem) {
                        // A daemon that was not told goes on until the test ends.
                        arSystem.wait(0);
                        arSelf.tellParent();
                    }));
                alarm(static_cast<unsigned>(gcTestPatience.count()));
                runSystemMain(&lSystem, {});
                return 0;
            },
            mDirectory.path("child"));
        EXPECT_EQ(lChild.waitForExit(), 0) << "the process that was started";
        lChild.waitForChild();
        int lStatus = -1;
        waitUntil([&] { return waitpid(-1, &lStatus, WNOHANG) > 0; }, "the daemon's end");
        EXPECT_EQ(lStatus, 0);
        EXPECT_FALSE(exists(mPidFile));
    }
}
