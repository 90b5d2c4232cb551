#include <gtest/gtest.h>

#include <atomic>
#include <stdexcept>
#include <string>

#include "common/include/Exception.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/os/LogCapture.h"
#include "tests/unit/system/TestSystem.h"

static void sRunThreads(ZTCSystem& arSystem) {
    arSystem.createThreads();
    arSystem.startThreads();
    arSystem.waitForThreads();
}

TEST(SystemThreads, EachComponentsThreadRunsItsProcedureAndThenFinish) {
    ZTCTestSystem lSystem;
    std::atomic<int> lRuns{0};
    auto* lpFirst = NEW ZTCFunctionComponent(lSystem, "first", [&](ZTCFunctionComponent& arComponent, ZTCSystem&) {
        EXPECT_EQ(arComponent.numberOfFinishes(), 0);
        ++lRuns;
    });
    auto* lpSecond = NEW ZTCFunctionComponent(lSystem, "second", [&](ZTCFunctionComponent&, ZTCSystem&) { ++lRuns; });
    lSystem.addComponent(lpFirst);
    lSystem.addComponent(lpSecond);
    lSystem.createThreads();
    EXPECT_FALSE(lSystem.isInited(0));
    lSystem.startThreads();
    EXPECT_TRUE(lSystem.isInited(0));
    EXPECT_TRUE(lSystem.isInited(1));
    EXPECT_FALSE(lSystem.isInited(2));
    EXPECT_THROW(lSystem.startThread(1), ZTCInvalidEx);
    lSystem.waitForThreads();
    EXPECT_EQ(lRuns, 2);
    EXPECT_EQ(lpFirst->numberOfFinishes(), 1);
    EXPECT_EQ(lpSecond->numberOfFinishes(), 1);
    EXPECT_FALSE(lSystem.isSetForExit()) << "threads that end on their own are no reason to exit";
}

TEST(SystemThreads, WithoutThreadsThereIsNothingToWaitFor) {
    ZTCTestSystem lSystem;
    lSystem.waitForThreads();
    lSystem.destroyThreads();
    sRunThreads(lSystem);
}

TEST(SystemThreads, AnExitRequestMarksEveryComponentAndEndsEveryWait) {
    ZTCTestSystem lSystem;
    lSystem.addConditional();
    lSystem.addConditional();
    lSystem.addQueue();
    lSystem.addList();
    const std::vector<std::function<void()>> lcWaits = {[&] { lSystem.wait(0); }, [&] { lSystem.timedWait(1, 3600); },
                                                        [&] { lSystem.waitOnEmptyQueue(0, 3600); },
                                                        [&] { lSystem.waitOnEmptyList(0, 3600); }};
    std::atomic<unsigned> lMarked{0};
    for (const std::function<void()>& lcrWait : lcWaits) {
        lSystem.addComponent(
            NEW ZTCFunctionComponent(lSystem, "waiting", [&](ZTCFunctionComponent& arSelf, ZTCSystem&) {
                lcrWait();
                lMarked += arSelf.isSetForExit() ? 1 : 0;
            }));
    }
    lSystem.addComponent(NEW ZTCFunctionComponent(
        lSystem, "asking", [](ZTCFunctionComponent&, ZTCSystem& arSystem) { arSystem.makeThreadsToExit(); }));
    sRunThreads(lSystem);
    EXPECT_EQ(lMarked, lcWaits.size());
    EXPECT_TRUE(lSystem.isSetForExit());
    EXPECT_TRUE(getExitEvent().isRaised());
    lSystem.makeThreadsToExit();
    EXPECT_NO_THROW(lSystem.wait(0)) << "later waits return at once";
}

TEST(SystemThreads, TheStopEventMakesTheThreadsExit) {
    ZTCTestSystem lSystem;
    lSystem.addConditional();
    lSystem.addComponent(
        NEW ZTCFunctionComponent(lSystem, "waiting", [](ZTCFunctionComponent& arSelf, ZTCSystem& arSystem) {
            arSystem.wait(0);
            EXPECT_TRUE(arSelf.isSetForExit());
        }));
    lSystem.createThreads();
    lSystem.startThreads();
    const ZTCTestThread lStopper([&] {
        waitUntil([&] { return lSystem.conditional(0).getNumberOfWaiters() == 1; }, "the thread's wait");
        getStopEvent().raise();
    });
    lSystem.waitForThreads();
    EXPECT_TRUE(lSystem.isSetForExit());
}

TEST(SystemThreads, AThreadsEntryLetsNothingEscape) {
    const struct {
        std::function<void()> mThrow;
        const char* mpShown;
    } lcRows[] = {
        {[] { throw ZTCInvalidEx("an agent's exception"); }, "an agent's exception"},
        {[] { throw std::runtime_error("a library's exception"); }, "a library's exception"},
        {[] { throw 7; }, "unknown"},
    };
    for (const auto& lcrRow : lcRows) {
        ZTCLogCapture lLog(63);
        ZTCTestSystem lSystem;
        lSystem.addConditional();
        auto* lpThrowing = NEW ZTCFunctionComponent(lSystem, "the-thrower",
                                                    [&](ZTCFunctionComponent&, ZTCSystem&) { lcrRow.mThrow(); });
        lSystem.addComponent(lpThrowing);
        lSystem.addComponent(NEW ZTCFunctionComponent(
            lSystem, "waiting", [](ZTCFunctionComponent&, ZTCSystem& arSystem) { arSystem.wait(0); }));
        sRunThreads(lSystem);
        EXPECT_EQ(lpThrowing->numberOfFinishes(), 1);
        EXPECT_TRUE(lSystem.isSetForExit());
        const auto lLines = lLog.file().lines();
        ASSERT_EQ(lLines.size(), 1u);
        EXPECT_EQ(lLines[0].mMark, "-H-");
        EXPECT_NE(lLines[0].mText.find(lcrRow.mpShown), std::string::npos) << lLines[0].mText;
        EXPECT_NE(lLines[0].mText.find("the-thrower"), std::string::npos) << lLines[0].mText;
    }
}

class ZTCThrowingFinishComponent : public ZTCFunctionComponent {
public:
    using ZTCFunctionComponent::ZTCFunctionComponent;
    void finish() override { throw ZTCInvalidEx("finish failed"); }
};

TEST(SystemThreads, AnExceptionOutOfFinishDoesNotEscapeEither) {
    ZTCLogCapture lLog(63);
    ZTCTestSystem lSystem;
    lSystem.addComponent(NEW ZTCThrowingFinishComponent(lSystem, "failing", [](ZTCFunctionComponent&, ZTCSystem&) {}));
    sRunThreads(lSystem);
    EXPECT_TRUE(lSystem.isSetForExit());
    EXPECT_EQ(lLog.countMark("-H-"), 1u);
}

/// A system that cannot start its second thread.
class ZTCHalfStartingSystem : public ZTCTestSystem {
public:
    void startThread(unsigned aThreadComponent) override {
        if (aThreadComponent == 1) {
            throw ZTCOsThreadEx("no more threads");
        }
        ZTCTestSystem::startThread(aThreadComponent);
    }
};

TEST(SystemThreads, ThreadsThatRunAreStoppedAndJoinedWhereOneCannotBeStarted) {
    ZTCLogCapture lLog(63);
    ZTCHalfStartingSystem lSystem;
    lSystem.addConditional();
    std::atomic<bool> lHasEnded{false};
    lSystem.addComponent(NEW ZTCFunctionComponent(lSystem, "first", [&](ZTCFunctionComponent&, ZTCSystem& arSystem) {
        arSystem.wait(0);
        lHasEnded = true;
    }));
    lSystem.addComponent(NEW ZTCFunctionComponent(lSystem, "second", [](ZTCFunctionComponent&, ZTCSystem&) {}));
    lSystem.createThreads();
    EXPECT_THROW(lSystem.startThreads(), ZTCOsThreadEx);
    EXPECT_TRUE(lHasEnded);
    EXPECT_FALSE(lSystem.isInited(1));
}
