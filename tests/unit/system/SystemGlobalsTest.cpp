#include "system/include/SystemGlobals.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "tests/support/AgentLog.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/SystemMainTesting.h"
#include "tests/unit/system/TestSystem.h"

using Calls = std::vector<std::string>;

/// Records the driver's calls, and throws out of one of them if it is told to.
class ZTCRecordingSystem : public ZTCTestSystem {
public:
    explicit ZTCRecordingSystem(const std::string& acrPidFilePath, std::string aFailing = "")
        : ZTCTestSystem(acrPidFilePath), mFailing(std::move(aFailing)) {}

    void preInit() override { record("preInit"), ZTCTestSystem::preInit(); }
    void setCmdLineArgDescs() override { record("setCmdLineArgDescs"), ZTCTestSystem::setCmdLineArgDescs(); }
    void processCommandLine(int aArgc, char** apArgv) override {
        record("processCommandLine"), ZTCTestSystem::processCommandLine(aArgc, apArgv);
    }
    void processCommandLineArguments() override {
        record("processCommandLineArguments"), ZTCTestSystem::processCommandLineArguments();
    }
    bool isAnInstanceRunning() override {
        record("isAnInstanceRunning");
        return ZTCTestSystem::isAnInstanceRunning();
    }
    void systemDaemonize(ZTCString, ZTCString, ZTCString, ZTCString) override { record("systemDaemonize"); }
    void markAsRunning() override {
        record("markAsRunning"), ZTCTestSystem::markAsRunning();
        allowLogRotation(false);
    }
    void init() override { record("init"), ZTCTestSystem::init(); }
    void createThreads() override { record("createThreads"), ZTCTestSystem::createThreads(); }
    void startThreads() override { record("startThreads"), ZTCTestSystem::startThreads(); }
    void postThreadsInit() override { record("postThreadsInit"), ZTCTestSystem::postThreadsInit(); }
    void waitForThreads() override { record("waitForThreads"), ZTCTestSystem::waitForThreads(); }
    void destroyThreads() override { record("destroyThreads"), ZTCTestSystem::destroyThreads(); }
    void destroy() override { record("destroy"), ZTCTestSystem::destroy(); }
    void exitInstanceManagement() override {
        record("exitInstanceManagement"), ZTCTestSystem::exitInstanceManagement();
    }
    void postDestroy() override { record("postDestroy"), ZTCTestSystem::postDestroy(); }

    const Calls& calls() const { return mCalls; }

private:
    void record(const std::string& acrCall) {
        mCalls.push_back(acrCall);
        if (acrCall == mFailing) {
            throw ZTCOpsException("told to fail", 77);
        }
    }

    const std::string mFailing;
    Calls mCalls;
};

/// Those that the kernel knows: one that was joined may still be there for a moment. A sanitizer's own comes with the
/// first thread that is started, which sNumberOfThreadsToEndWith does.
static unsigned sNumberOfThreads() {
    unsigned lCount = 0;
    for ([[maybe_unused]] const auto& lcrTask : std::filesystem::directory_iterator("/proc/self/task")) {
        ++lCount;
    }
    return lCount;
}

static unsigned sNumberOfThreadsToEndWith() {
    runOnThreads(1, [](unsigned) {});
    return sNumberOfThreads();
}

using SystemMainTest = ZTCSystemMainFixture;

TEST(SystemGlobals, TheHeartbeatTimeoutIsTwoHundredAndFortySecondsUntilItIsSet) {
    unsigned lSeconds = 0;
    getHbTimeout(lSeconds);
    EXPECT_EQ(lSeconds, 240u);
    setHbTimeout(5);
    getHbTimeout(lSeconds);
    EXPECT_EQ(lSeconds, 5u);
    setHbTimeout(240);
}

TEST(SystemGlobals, TheSystemObjectIsTheOneThatWasSet) {
    ZTCSystem lSystem{ZTCString("a name")};
    setSystemObject(&lSystem);
    EXPECT_EQ(getSystemObject(), &lSystem);
    setSystemObject(nullptr);
    EXPECT_EQ(getSystemObject(), nullptr);
}

TEST_F(SystemMainTest, WithoutASystemObjectMemoryRanOut) {
    runInChild([](ZTCForkedProcess&) {
        EXPECT_THROW(runSystemMain(nullptr, {}), ZTCNoMemoryEx);
        return testing::Test::HasFailure() ? 1 : 0;
    });
}

static const Calls& sOrder() {
    static const Calls& srcOrder = *new Calls{"preInit",
                                              "setCmdLineArgDescs",
                                              "processCommandLine",
                                              "processCommandLineArguments",
                                              "isAnInstanceRunning",
                                              "systemDaemonize",
                                              "markAsRunning",
                                              "init",
                                              "createThreads",
                                              "startThreads",
                                              "postThreadsInit",
                                              "waitForThreads",
                                              "destroy",
                                              "exitInstanceManagement",
                                              "postDestroy"};
    return srcOrder;
}

TEST_F(SystemMainTest, TheOperationsAreCalledInTheirOrder) {
    runInChild([this](ZTCForkedProcess&) {
        const unsigned lThreads = sNumberOfThreadsToEndWith();
        ZTCRecordingSystem lSystem(mPidFile);
        lSystem.addComponent(NEW ZTCFunctionComponent(lSystem, "a thread", [&](ZTCFunctionComponent&, ZTCSystem&) {
            EXPECT_EQ(readFile(mPidFile), std::to_string(getpid()) + "\n");
        }));
        runSystemMain(&lSystem, {});
        EXPECT_EQ(lSystem.calls(), sOrder());
        EXPECT_FALSE(exists(mPidFile));
        EXPECT_NO_THROW(waitUntil([&] { return sNumberOfThreads() <= lThreads; }, "the threads' end"));
        return testing::Test::HasFailure() ? 1 : 0;
    });
}

TEST_F(SystemMainTest, WithoutTheDaemonNothingDaemonises) {
    runInChild([this](ZTCForkedProcess&) {
        ZTCRecordingSystem lSystem(mPidFile);
        runSystemMain(&lSystem, {"-D", "false"});
        Calls lExpected = sOrder();
        lExpected.erase(lExpected.begin() + 5);
        EXPECT_EQ(lSystem.calls(), lExpected);
        return testing::Test::HasFailure() ? 1 : 0;
    });
}

TEST_F(SystemMainTest, AnExceptionOutOfAnyOperationGivesUpTheRecordAndTheThreads) {
    for (const std::string& lcrFailing : sOrder()) {
        SCOPED_TRACE(lcrFailing);
        runInChild([&](ZTCForkedProcess&) {
            const unsigned lThreads = sNumberOfThreadsToEndWith();
            ZTCRecordingSystem lSystem(mPidFile, lcrFailing);
            lSystem.addConditional();
            std::atomic<bool> lIsRunning{false};
            lSystem.addComponent(
                NEW ZTCFunctionComponent(lSystem, "a thread", [&](ZTCFunctionComponent&, ZTCSystem& arSystem) {
                    lIsRunning = true;
                    // Only the order is of interest where the threads are waited for.
                    if (lcrFailing != "destroy" && lcrFailing != "exitInstanceManagement" &&
                        lcrFailing != "postDestroy") {
                        arSystem.wait(0);
                    }
                    lIsRunning = false;
                }));
            try {
                runSystemMain(&lSystem, {});
                ADD_FAILURE() << "the exception was swallowed";
            } catch (const ZTCOpsException& acrException) {
                EXPECT_EQ(acrException.getError(), 77u);
            }
            EXPECT_FALSE(lIsRunning);
            EXPECT_NO_THROW(waitUntil([&] { return sNumberOfThreads() <= lThreads; }, "the threads' end"));
            // The operation itself could not give the record up.
            EXPECT_EQ(exists(mPidFile), lcrFailing == "exitInstanceManagement");
            unlink(mPidFile.c_str());
            return testing::Test::HasFailure() ? 1 : 0;
        });
    }
}

TEST_F(SystemMainTest, AnExceptionOutOfPreInitIsSaidLikeThatOfEveryOtherStep) {
    for (const char* lpFailing : {"preInit", "init"}) {
        SCOPED_TRACE(lpFailing);
        unlink(mLogFile.c_str());
        runInChild([&](ZTCForkedProcess&) {
            ZTCRecordingSystem lSystem(mPidFile, lpFailing);
            EXPECT_THROW(runSystemMain(&lSystem, {}), ZTCOpsException);
            return testing::Test::HasFailure() ? 1 : 0;
        });
        EXPECT_EQ(readFile(mDirectory.path("child.err")), "test-system ends: told to fail\n");
        const auto lLines = ZTCAgentLog(mLogFile).containing("test-system ends: told to fail");
        ASSERT_EQ(lLines.size(), 1u);
        EXPECT_EQ(lLines[0].mMark, "-E-");
    }
}

/// A system whose start is refused.
class ZTCRefusedSystem : public ZTCTestSystem {
public:
    using ZTCTestSystem::ZTCTestSystem;
    void init() override { throw ZTCExitConditionEx("no use to go on", gcErrStop); }
};

TEST_F(SystemMainTest, AnExitConditionIsSaidOnStandardErrorAlone) {
    runInChild([&](ZTCForkedProcess&) {
        ZTCRefusedSystem lSystem(mPidFile);
        EXPECT_THROW(runSystemMain(&lSystem, {"-D", "false"}), ZTCExitConditionEx);
        return testing::Test::HasFailure() ? 1 : 0;
    });
    EXPECT_EQ(readFile(mDirectory.path("child.err")), "test-system ends: no use to go on\n");
    EXPECT_TRUE(ZTCAgentLog(mLogFile).containing("no use to go on").empty()) << "who refuses has said it there";
}

TEST_F(SystemMainTest, AnErrorOfTheCommandLineCreatesNothing) {
    runInChild([this](ZTCForkedProcess&) {
        ZTCRecordingSystem lSystem(mPidFile);
        EXPECT_THROW(runSystemMain(&lSystem, {"-h", "-b", "0"}), ZTCInvalidEx);
        EXPECT_EQ(lSystem.calls(), (Calls{"preInit", "setCmdLineArgDescs", "processCommandLine"}));
        EXPECT_FALSE(exists(mPidFile));
        return testing::Test::HasFailure() ? 1 : 0;
    });
    EXPECT_NE(readFile(mDirectory.path("child.err")).find("-b"), std::string::npos);
}

TEST_F(SystemMainTest, ASecondStartSaysSoAndIsAnExitCondition) {
    ZTCForkedProcess lFirst([this](ZTCForkedProcess& arSelf) {
        ZTCProcessInstanceManager lManager{ZTCString(mPidFile.c_str())};
        lManager.markAsRunning();
        arSelf.tellParent();
        arSelf.waitForParent();
        return 0;
    });
    lFirst.waitForChild();
    runInChild([this](ZTCForkedProcess&) {
        ZTCRecordingSystem lSystem(mPidFile);
        try {
            runSystemMain(&lSystem, {"-D", "false"});
            ADD_FAILURE() << "two run at once";
        } catch (const ZTCExitConditionEx& acrException) {
            EXPECT_EQ(acrException.getError(), 19u);
        }
        EXPECT_EQ(lSystem.calls().back(), "isAnInstanceRunning");
        return testing::Test::HasFailure() ? 1 : 0;
    });
    const std::string lPid = std::to_string(lFirst.getPid());
    EXPECT_EQ(readFile(mPidFile), lPid + "\n");
    const std::string lSaid = readFile(mDirectory.path("child.err"));
    for (const std::string& lcrText : {lSaid, readFile(mLogFile)}) {
        EXPECT_NE(lcrText.find(mPidFile), std::string::npos) << lcrText;
        EXPECT_NE(lcrText.find(lPid), std::string::npos) << lcrText;
    }
    EXPECT_EQ(lSaid.find('\n'), lSaid.size() - 1) << "one line";
}

TEST_F(SystemMainTest, ATermSignalStopsTheRunInOrder) {
    for (const int lSignal : {SIGTERM, SIGINT}) {
        ZTCForkedProcess lChild(
            [&](ZTCForkedProcess& arSelf) {
                setLogFilePath(mLogFile.c_str());
                ZTCRecordingSystem lSystem(mPidFile);
                lSystem.addConditional();
                lSystem.addComponent(
                    NEW ZTCFunctionComponent(lSystem, "a thread", [&](ZTCFunctionComponent&, ZTCSystem& arSystem) {
                        arSelf.tellParent();
                        arSystem.timedWait(0, 3600);
                    }));
                runSystemMain(&lSystem, {});
                return lSystem.calls() == sOrder() && !exists(mPidFile) ? 0 : 1;
            },
            mDirectory.path("child"));
        lChild.waitForChild();
        lChild.sendSignal(lSignal);
        EXPECT_EQ(lChild.waitForExit(), 0);
    }
}
