#include "system/include/System.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <iostream>
#include <stdexcept>
#include <string>
#include <thread>

#include "common/include/Exception.h"
#include "system/include/SystemGlobals.h"
#include "tests/unit/os/LogCapture.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/TestSystem.h"

class ZTCEchoReader : public ZTCReader {
public:
    void read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) override {
        arBuffer = ZTCPointer<ZTCBuffer>(NEW ZTCBuffer());
        arBuffer->append("echo", 4);
        arCount = 4;
    }
    void waitForActivity(unsigned aSeconds) override { mSeconds = aSeconds; }
    unsigned mSeconds = 0;
};

class ZTCCountingWriter : public ZTCWriter {
public:
    void write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) override { arCount = acrBuffer->getSize(); }
};

class ZTCItem : public ZTCQueueable {};

static ZTCPointer<ZTCQueueable> sItem() {
    return ZTCPointer<ZTCQueueable>(NEW ZTCItem());
}

// ---- State ----

TEST(System, ConstructionIsTracedFromItsHeader) {
    ZTCLogCapture lLog;
    const ZTCSystem lSystem{ZTCString("a name")};
    const auto lLines = lLog.file().lines();
    ASSERT_EQ(lLines.size(), 2u);
    for (const ZTSLogLine& lcrLine : lLines) {
        EXPECT_EQ(lcrLine.mMark, "-T-");
        EXPECT_EQ(lcrLine.mLabel, "system/include/System");
        EXPECT_EQ(lcrLine.mFunction, "ZTCSystem");
    }
    EXPECT_EQ(lLines[0].mText, "Entered");
    EXPECT_EQ(lLines[1].mText, "Left");
}

TEST(System, AfterConstructionItsStateIsAtItsDefaults) {
    ZTCSystem lSystem{ZTCString("a name")};
    EXPECT_STREQ(lSystem.getName().get(), "a name");
    EXPECT_STREQ(lSystem.getHostName().get(), "localhost");
    EXPECT_STREQ(lSystem.getConfFilePathStr().get(), "");
    EXPECT_FALSE(lSystem.isSetForExit());
    EXPECT_FALSE(lSystem.isInited(0));
    EXPECT_TRUE(lSystem.isToRunAsDaemon());
    EXPECT_STREQ(lSystem.getOs().get(), "Linux");
    EXPECT_STRNE(lSystem.getOsVariant().get(), "");
}

TEST(System, OnceSetForExitItStaysSo) {
    ZTCSystem lSystem{ZTCString("a name")};
    lSystem.setForExit();
    EXPECT_TRUE(lSystem.isSetForExit());
    lSystem.setForExit();
    EXPECT_TRUE(lSystem.isSetForExit());
}

TEST(System, AnIndexPastTheReadersOrWritersEndsTheProcess) {
    const struct {
        std::function<void(ZTCSystem&)> mUse;
        const char* mpText;
    } lcRows[] = {
        {[](ZTCSystem& arSystem) { arSystem.getReader(0); },
         "Assertion [ acReaderNo < this->mReaders.numberOfElements() ] failed"},
        {[](ZTCSystem& arSystem) { arSystem.getWriter(0); },
         "Assertion [ acWriterNo < this->mWriters.numberOfElements() ] failed"},
    };
    for (const auto& lcrRow : lcRows) {
        ZTCLogCapture lLog(63);
        ZTCForkedProcess lChild([&](ZTCForkedProcess&) {
            ZTCSystem lSystem{ZTCString("a name")};
            lcrRow.mUse(lSystem);
            return 0;
        });
        EXPECT_EQ(lChild.waitForExit(), 1);
        const auto lLines = lLog.file().lines();
        ASSERT_EQ(lLines.size(), 1u);
        EXPECT_EQ(lLines[0].mMark, "-H-");
        EXPECT_EQ(lLines[0].mLabel, "system/include/System");
        EXPECT_EQ(lLines[0].mText, lcrRow.mpText);
    }
}

TEST(System, ReadersAndWritersAreReachedByTheirSlots) {
    ZTCTestSystem lSystem;
    auto* lpReader = NEW ZTCEchoReader();
    auto* lpWriter = NEW ZTCCountingWriter();
    lSystem.addReader(lpReader);
    lSystem.addWriter(lpWriter);
    EXPECT_EQ(lSystem.getReader(0).get(), lpReader);
    EXPECT_EQ(lSystem.getWriter(0).get(), lpWriter);
    lSystem.waitForActivity(0, 3);
    EXPECT_EQ(lpReader->mSeconds, 3u);
    ZTCPointer<ZTCBuffer> lBuffer;
    unsigned lCount = 0;
    lSystem.receive(0, lBuffer, lCount);
    EXPECT_EQ(lCount, 4u);
    lCount = 0;
    lSystem.send(0, lBuffer, lCount);
    EXPECT_EQ(lCount, 4u);
}

TEST(System, InitMakesTheProtocolHelperAndTheBuffers) {
    ZTCTestSystem lSystem;
    lSystem.init();
    EXPECT_TRUE(lSystem.getProtocolHelper() != nullptr);
    ZTCPointer<ZTCBuffer> lBuffer;
    lSystem.getBuffer(10, lBuffer);
    lBuffer->append("x", 1);
    lSystem.clearBuffer(lBuffer);
    EXPECT_EQ(lBuffer->getSize(), 0u);
    lSystem.reuseBuffer(lBuffer);
}

TEST(System, NumbersAreGivenOutOnceUntilTheyComeBack) {
    ZTCTestSystem lSystem;
    unsigned lFirst = 0;
    unsigned lSecond = 0;
    unsigned lThird = 0;
    lSystem.generateNumericId(lFirst);
    lSystem.generateNumericId(lSecond);
    EXPECT_NE(lFirst, lSecond);
    lSystem.returnNumericId(lFirst);
    EXPECT_THROW(lSystem.returnNumericId(lFirst), ZTCNotFoundEx);
    lSystem.generateNumericId(lThird);
    EXPECT_EQ(lThird, lFirst);
}

TEST(System, SettingsFollowTheRulesOfTheMap) {
    ZTCTestSystem lSystem;
    lSystem.addSetting(ZTCString("key"), ZTCPointer<ZTCMultiType>(NEW ZTCMultiType(7)));
    ZTCPointer<ZTCMultiType> lValue;
    lSystem.getSetting(ZTCString("key"), lValue);
    EXPECT_EQ(lValue->getNumber(), 7u);
    EXPECT_THROW(lSystem.addSetting(ZTCString("key"), lValue), ZTCExistsEx);
    EXPECT_THROW(lSystem.getSetting(ZTCString("other"), lValue), ZTCNotFoundEx);
    EXPECT_THROW(lSystem.applySettings(), ZTCNotImplementedEx);
}

TEST(System, TheAddressIsTheOneThatWasSet) {
    ZTCTestSystem lSystem;
    lSystem.setAddress(ZTCPointer<ZTCIpAddress>(NEW ZTCIpAddress(ZTCString("192.0.2.1"))));
    EXPECT_STREQ(lSystem.getAddress()->getText().get(), "192.0.2.1");
    EXPECT_STREQ(lSystem.getVersion().get(), "3.0.1.2");
}

TEST(System, QueuesAndListsAreReachedByTheirSlots) {
    ZTCTestSystem lSystem;
    lSystem.addQueue();
    lSystem.addList();
    const ZTCPointer<ZTCQueueable> lcFirst = sItem();
    const ZTCPointer<ZTCQueueable> lcSecond = sItem();

    EXPECT_THROW(lSystem.waitOnEmptyQueue(0, 0), ZTCTimeOutEx);
    lSystem.enqueue(0, lcFirst);
    lSystem.enqueue(0, lcSecond);
    lSystem.waitOnEmptyQueue(0, 60);
    EXPECT_EQ(lSystem.queueFront(0).get(), lcFirst.get());
    EXPECT_EQ(lSystem.dequeue(0).get(), lcFirst.get());
    EXPECT_FALSE(lSystem.isQueueEmpty(0));
    lSystem.queueClear(0);
    EXPECT_TRUE(lSystem.isQueueEmpty(0));
    EXPECT_THROW(lSystem.dequeue(1), ZTCInvalidEx);

    EXPECT_THROW(lSystem.waitOnEmptyList(0, 0), ZTCTimeOutEx);
    lSystem.enlist(0, lcFirst);
    lSystem.enlistFront(0, lcSecond);
    EXPECT_EQ(lSystem.listSize(0), 2u);
    EXPECT_EQ(lSystem.listFront(0).get(), lcSecond.get());
    ZTCSynchList::ZTIterator lPlace = lSystem.listBegin(0);
    lSystem.listErase(0, lPlace);
    EXPECT_EQ(lPlace->get(), lcFirst.get());
    const ZTCTestSystem& lcrSystem = lSystem;
    EXPECT_NE(lcrSystem.listBegin(0), lcrSystem.listEnd(0));
    EXPECT_NE(lSystem.listBegin(0), lSystem.listEnd(0));
    EXPECT_EQ(lSystem.delist(0).get(), lcFirst.get());
    lSystem.enlist(0, lcSecond);
    EXPECT_EQ(lSystem.delistBack(0).get(), lcSecond.get());
    lSystem.enlist(0, lcSecond);
    lSystem.listClear(0);
    EXPECT_TRUE(lSystem.isListEmpty(0));
}

TEST(System, ConditionalsAreReachedByTheirSlots) {
    ZTCTestSystem lSystem;
    lSystem.addConditional();
    lSystem.addConditional();
    lSystem.signal(1);
    lSystem.wait(1);
    EXPECT_THROW(lSystem.timedWait(1, 0), ZTCTimeOutEx);
    EXPECT_THROW(lSystem.signal(2), ZTCInvalidEx);
    EXPECT_THROW(lSystem.timedWait(2, 0), ZTCInvalidEx);
}

// ---- Command line ----

TEST(System, AnErrorOfTheCommandLineIsOneLineOnStandardErrorAndInTheLog) {
    ZTCLogCapture lLog(63);
    ZTCTestSystem lSystem;
    lSystem.setCmdLineArgDescs();
    testing::internal::CaptureStderr();
    EXPECT_THROW(lSystem.readLine({"-b", "77", "-d", "%s256"}), ZTCInvalidEx);
    const std::string lSaid = testing::internal::GetCapturedStderr();
    const auto lLines = lLog.file().lines();
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_EQ(lLines[0].mMark, "-E-");
    EXPECT_EQ(lLines[0].mText + "\n", lSaid);
    EXPECT_NE(lSaid.find("'%s256'"), std::string::npos) << lSaid;
    unsigned lTimeout = 0;
    getHbTimeout(lTimeout);
    EXPECT_EQ(lTimeout, 240u) << "a part of the line was applied";
}

TEST(System, OptionsTakeEffectWhenTheyAreAppliedAndNotBefore) {
    ZTCLogCapture lLog(63);
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("own.log");
    ZTCTestSystem lSystem;
    lSystem.setCmdLineArgDescs();
    lSystem.readLine({"-l", lPath, "-d", "0x21", "-b", "7", "-S", "-D", "false"});
    unsigned lCode = 0;
    unsigned lTimeout = 0;
    getLogCode(lCode);
    getHbTimeout(lTimeout);
    EXPECT_EQ(lCode, 63u);
    EXPECT_EQ(lTimeout, 240u);
    EXPECT_FALSE(ZTCProtocolHelper::isSnifferModeOn());
    EXPECT_TRUE(lSystem.isToRunAsDaemon());

    lSystem.processCommandLineArguments();
    getLogCode(lCode);
    getHbTimeout(lTimeout);
    setHbTimeout(240);
    EXPECT_EQ(lCode, 0x21u);
    EXPECT_EQ(lTimeout, 7u);
    EXPECT_TRUE(ZTCProtocolHelper::isSnifferModeOn());
    EXPECT_FALSE(lSystem.isToRunAsDaemon());
    ZT_LOG_NOTICE("%s", "in the new file");
    EXPECT_EQ(ZTCAgentLog(lPath).count("in the new file"), 1u);
}

TEST(System, HelpVersionConfigurationAndStopWinInThisOrder) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPidFile = lDirectory.path("a.pid");
    const struct {
        std::vector<std::string> mLine;
        int mStatus;
        std::string mOutput;
    } lcRows[] = {
        {{"-s", "-c", "f", "-v", "-h", "-d", "1"}, 0, "the help\n"},
        {{"-s", "-c", "f", "-v"}, 0, "test-system v3.0.1.2\n"},
        {{"-s", "-c", "f"}, 13, ""},
        {{"-b", "9", "-s"}, 0, "No running instance is named by '" + lPidFile + "'\n"},
        {{"-b", "9"}, 50, ""},
    };
    for (const auto& lcrRow : lcRows) {
        ZTCForkedProcess lChild(
            [&](ZTCForkedProcess&) {
                ZTCTestSystem lSystem(lPidFile);
                lSystem.setCmdLineArgDescs();
                try {
                    lSystem.applyLine(lcrRow.mLine);
                } catch (const ZTCNotImplementedEx& acrException) {
                    return std::string(acrException.what()) == "Not Implemented"
                               ? static_cast<int>(acrException.getError())
                               : 97;
                }
                return 50;
            },
            lDirectory.path("child"));
        EXPECT_EQ(lChild.waitForExit(), lcrRow.mStatus);
        EXPECT_EQ(readFile(lDirectory.path("child.out")), lcrRow.mOutput);
        EXPECT_EQ(readFile(lDirectory.path("child.err")), "");
    }
}

TEST(System, ABareSystemKnowsNoOptionAndNoConfigurationAndHasNoHelp) {
    ZTCSystem lSystem(ZTCString("bare"));
    lSystem.setCmdLineArgDescs();
    char lProgram[] = "program";
    char lHelp[] = "-h";
    char* lArguments[] = {lProgram, lHelp, nullptr};
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    EXPECT_NO_THROW(lSystem.processCommandLine(1, lArguments));
    EXPECT_THROW(lSystem.processCommandLine(2, lArguments), ZTCInvalidEx);
    EXPECT_THROW(lSystem.processConfigFile(ZTCString("file")), ZTCNotImplementedEx);
    lSystem.displayHelp();
    lSystem.createStartUpEvent();
    lSystem.createShutDownEvent();
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
    EXPECT_NE(testing::internal::GetCapturedStderr().find("-h"), std::string::npos);
}

TEST(System, ADaemonLeadsASessionInTheDirectoryThatItIsGiven) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lOutput = lDirectory.path("output");
    writeFile(lOutput, "");
    ZTCForkedProcess lChild([&](ZTCForkedProcess&) {
        ZTCTestSystem lSystem;
        lSystem.systemDaemonize(ZTCString(lDirectory.path().c_str()), ZTCString("/dev/null"),
                                ZTCString(lOutput.c_str()), ZTCString("/dev/null"));
        std::cout << (getsid(0) == getpid()) << ' ' << std::filesystem::current_path().string() << std::endl;
        return 7;
    });
    EXPECT_EQ(lChild.waitForExit(), 0) << "the calling process ends silently";
    const std::string lWanted = "1 " + lDirectory.path() + "\n";
    waitUntil([&] { return readFile(lOutput).size() >= lWanted.size(); }, "the daemon's words");
    EXPECT_EQ(readFile(lOutput), lWanted);
}

// ---- Threads ----

static void sRunThreads(ZTCSystem& arSystem) {
    arSystem.createThreads();
    arSystem.startThreads();
    arSystem.waitForThreads();
}

TEST(System, EachComponentsThreadRunsItsProcedureAndThenFinish) {
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

TEST(System, WithoutThreadsThereIsNothingToWaitFor) {
    ZTCTestSystem lSystem;
    lSystem.waitForThreads();
    lSystem.destroyThreads();
    sRunThreads(lSystem);
}

TEST(System, AnExitRequestMarksEveryComponentAndEndsEveryWait) {
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

TEST(System, TheStopEventMakesTheThreadsExit) {
    ZTCTestSystem lSystem;
    lSystem.addConditional();
    lSystem.addComponent(
        NEW ZTCFunctionComponent(lSystem, "waiting", [](ZTCFunctionComponent& arSelf, ZTCSystem& arSystem) {
            arSystem.wait(0);
            EXPECT_TRUE(arSelf.isSetForExit());
        }));
    lSystem.createThreads();
    lSystem.startThreads();
    std::thread lStopper([&] {
        waitUntil([&] { return lSystem.conditional(0).getNumberOfWaiters() == 1; }, "the thread's wait");
        getStopEvent().raise();
    });
    lSystem.waitForThreads();
    lStopper.join();
    EXPECT_TRUE(lSystem.isSetForExit());
}

TEST(System, AThreadsEntryLetsNothingEscape) {
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

TEST(System, AnExceptionOutOfFinishDoesNotEscapeEither) {
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

TEST(System, ThreadsThatRunAreStoppedAndJoinedWhereOneCannotBeStarted) {
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
