#include "libkpm/sim/src/Engine.h"

#include <gtest/gtest.h>
#include <signal.h>

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/sim/Recorder.h"

static void sWaitForSchedule(const ZTCSimEngine& acrEngine) {
    waitUntil([&] { return acrEngine.getStatus().mSchedule == ZTSSC_Done; }, "the end of the schedule");
}

TEST(Engine, DeliversOnlyWhatIsRegistered) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    lRecorder.registerKind(lEngine, 0, "queue-full");
    lRecorder.registerKind(lEngine, 1, "rscn");
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        const std::string lName = lrKind.mpName;
        const std::uint64_t lExpected = lName == "queue-full" || lName == "rscn" ? 1 : 0;
        EXPECT_EQ(injectLine(lEngine, lName + " board=all"), lExpected) << lName;
    }
    EXPECT_EQ(lRecorder.getCount(), 2u);
    EXPECT_EQ(lEngine.getStatus().mDelivered, 2u);
    EXPECT_EQ(lEngine.getStatus().mDropped, 38u);
}

TEST(Engine, DeliversEveryKindOnItsOwnCallback) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    lRecorder.registerAll(lEngine, 0);
    lRecorder.registerAll(lEngine, 1);
    EXPECT_EQ(lEngine.getStatus().mRegistered, 40u);
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        EXPECT_EQ(injectLine(lEngine, std::string(lrKind.mpName) + " board=1"), 1u);
        const ZTSRecordedEvent lEvent = lRecorder.getEvents().back();
        EXPECT_EQ(lEvent.mBoard, 1u);
        EXPECT_EQ(lEvent.mCategory, lrKind.mRegisteredCategory) << lrKind.mpName;
        EXPECT_EQ(lEvent.mSubcategory, lrKind.mRegisteredSubcategory) << lrKind.mpName;
        if (lrKind.mRegisteredCategory != 0) {
            EXPECT_EQ(lEvent.mLocal.wwn[7], 2);
            EXPECT_EQ(lEvent.mpContext, &lRecorder);
        }
    }
    for (const std::uint64_t lDelivered : lEngine.getStatus().mDeliveredByKind) {
        EXPECT_EQ(lDelivered, 1u);
    }
}

TEST(Engine, HandsOutOddAddressesUnlessToldOtherwise) {
    for (const bool lIsOdd : {true, false}) {
        ZTCRecorder lRecorder;
        ZTCSimEngine lEngine(readTwoAdapters(lIsOdd ? "" : "addresses aligned\n"));
        lRecorder.registerKind(lEngine, 0, "plogi");
        injectLine(lEngine, "plogi");
        EXPECT_EQ(lRecorder.getEvents().at(0).mAddress % 2, lIsOdd ? 1u : 0u);
    }
}

TEST(Engine, NullPayloadsAndNullDataReachTheCallback) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    lRecorder.registerKind(lEngine, 0, "plogi");
    injectLine(lEngine, "plogi payload=null");
    injectLine(lEngine, "plogi data=null");
    EXPECT_FALSE(lRecorder.getEvents().at(0).mHasPayload);
    EXPECT_TRUE(lRecorder.getEvents().at(1).mHasPayload);
    EXPECT_FALSE(lRecorder.getEvents().at(1).mHasData);
}

TEST(Engine, ACallbackCanBeToldABoardThatDoesNotExist) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    lRecorder.registerKind(lEngine, 0, "temperature");
    EXPECT_EQ(injectLine(lEngine, "temperature as=4000000000"), 1u);
    EXPECT_EQ(lRecorder.getEvents().at(0).mBoard, 4000000000u);
}

TEST(Engine, TheScheduleStartsWithTheLastKindOfTheLastBoard) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("plogi board=all at=0\nlink board=1 at=0\n"));
    lEngine.start();
    lRecorder.registerAll(lEngine, 0);
    for (std::size_t lKind = 0; lKind < gcSimLastKind; ++lKind) {
        lRecorder.registerKind(lEngine, 1, getSimKind(lKind).mpName);
        EXPECT_EQ(lEngine.getStatus().mSchedule, ZTSSC_Waiting);
    }
    lRecorder.registerKind(lEngine, 1, getSimKind(gcSimLastKind).mpName);
    sWaitForSchedule(lEngine);
    EXPECT_EQ(lRecorder.getCount(), 3u);
    EXPECT_EQ(lRecorder.getThreads().count(std::this_thread::get_id()), 0u);
}

TEST(Engine, TheScheduleCanStartWithTheFirstRegistrationOrAtOnce) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lFirst(readTwoAdapters("start first\nplogi at=0\n"));
    lFirst.start();
    lRecorder.registerKind(lFirst, 0, "plogi");
    sWaitForSchedule(lFirst);
    EXPECT_EQ(lRecorder.getCount(), 1u);
    ZTCSimEngine lAtOnce(readTwoAdapters("start init\nplogi at=0\n"));
    lAtOnce.start();
    sWaitForSchedule(lAtOnce);
    EXPECT_EQ(lAtOnce.getStatus().mDropped, 1u);
}

TEST(Engine, EventsOfOneThreadComeInTheOrderOfTheirTimes) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters(
        "start first\nqueue-full at=4 every=4 times=3 lun=1,3,5\nqueue-full at=2 every=4 times=3 lun=0,2,4\n"));
    lEngine.start();
    lRecorder.registerKind(lEngine, 0, "queue-full");
    sWaitForSchedule(lEngine);
    const std::vector<ZTSRecordedEvent> lEvents = lRecorder.getEvents();
    ASSERT_EQ(lEvents.size(), 6u);
    for (std::size_t lEvent = 0; lEvent < lEvents.size(); ++lEvent) {
        EXPECT_EQ(lEvents[lEvent].mData.at(12), lEvent);
    }
}

TEST(Engine, ThreadsOfALineShareItsOccurrences) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("start first\nqueue-full times=203 threads=4 lun=0-202\n"));
    std::mutex lLock;
    std::condition_variable lAllThere;
    std::size_t lArrived = 0;
    // The first four callbacks wait for each other: they can only return if they run at the same time.
    lRecorder.setHook([&] {
        std::unique_lock<std::mutex> lGuard(lLock);
        ++lArrived;
        lAllThere.notify_all();
        lAllThere.wait_for(lGuard, gcTestPatience, [&] { return lArrived >= 4; });
    });
    lEngine.start();
    lRecorder.registerKind(lEngine, 0, "queue-full");
    sWaitForSchedule(lEngine);
    EXPECT_EQ(lRecorder.getCount(), 203u);
    EXPECT_EQ(lRecorder.getDescriptions(), [] {
        std::multiset<std::string> lExpected;
        ZTCRecorder lOther;
        ZTCSimEngine lAgain(readTwoAdapters());
        lOther.registerKind(lAgain, 0, "queue-full");
        injectLine(lAgain, "queue-full times=203 lun=0-202");
        return lOther.getDescriptions();
    }());
    EXPECT_EQ(lRecorder.getThreads().size(), 4u);
}

static std::multiset<std::string> sStormOf(const std::string& acrFields) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("storm count=3000 " + acrFields + "\n"));
    lEngine.start();
    lRecorder.registerAll(lEngine, 0);
    lRecorder.registerAll(lEngine, 1);
    sWaitForSchedule(lEngine);
    EXPECT_EQ(lEngine.getStatus().mDelivered, 3000u);
    EXPECT_EQ(lEngine.getStatus().mDropped, 0u);
    return lRecorder.getDescriptions();
}

TEST(Engine, AStormIsTheSameForItsSeedOnAnyNumberOfThreads) {
    const std::multiset<std::string> lOne = sStormOf("seed=3 threads=1");
    EXPECT_EQ(lOne.size(), 3000u);
    EXPECT_EQ(sStormOf("seed=3 threads=7"), lOne);
    EXPECT_NE(sStormOf("seed=4 threads=7"), lOne);
}

TEST(Engine, AStormCanBeSpreadOverTime) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("start first\nstorm count=50 threads=2 over=50 board=0 kind=plogi\n"));
    lEngine.start();
    lRecorder.registerKind(lEngine, 0, "plogi");
    sWaitForSchedule(lEngine);
    EXPECT_EQ(lRecorder.getCount(), 50u);
}

TEST(Engine, AnInjectedStormIsDeliveredWhenItReturns) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    lRecorder.registerAll(lEngine, 0);
    EXPECT_EQ(injectLine(lEngine, "storm count=500 threads=5 board=0"), 500u);
    EXPECT_EQ(lRecorder.getCount(), 500u);
    EXPECT_EQ(injectLine(lEngine, "queue-full times=3 threads=8"), 3u);
}

TEST(Engine, CountsThePagesOfRscns) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    lRecorder.registerKind(lEngine, 0, "rscn");
    injectLine(lEngine, "rscn pages=fabric,fabric,fabric times=2");
    injectLine(lEngine, "rscn pages=none");
    EXPECT_EQ(lEngine.getStatus().mPages, 6u);
}

TEST(Engine, AdaptersComeAndGo) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("start first\ncount 1\ncount 2 at=1\nplogi board=all at=2\n"));
    EXPECT_EQ(lEngine.getNumberOfAdapters(), 1u);
    EXPECT_EQ(lRecorder.registerKind(lEngine, 1, "plogi"), 0u);
    lEngine.start();
    lRecorder.registerKind(lEngine, 0, "plogi");
    sWaitForSchedule(lEngine);
    EXPECT_EQ(lEngine.getNumberOfAdapters(), 2u);
    EXPECT_EQ(lEngine.getStatus().mDelivered, 1u);
    EXPECT_EQ(lEngine.getStatus().mDropped, 1u);
    EXPECT_NE(lRecorder.registerKind(lEngine, 1, "plogi"), 0u);
}

TEST(Engine, StopEndsASchedulesThatIsWaitingOrWithoutEnd) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lNeverStarted(readTwoAdapters("plogi at=0\nstorm count=10\n"));
    lNeverStarted.start();
    lNeverStarted.stop();
    ZTCSimEngine lEngine(
        readTwoAdapters("start first\nplogi every=1 times=forever\nprlo every=1 times=forever threads=3\n"
                        "adisc at=86400000\nstorm count=1000000000 threads=2\n"));
    lEngine.start();
    lRecorder.registerAll(lEngine, 0);
    lRecorder.waitForCount(50);
    lEngine.stop();
    const std::size_t lCount = lRecorder.getCount();
    EXPECT_EQ(lEngine.getStatus().mDelivered, lCount);
    EXPECT_EQ(lEngine.getStatus().mSchedule, ZTSSC_Running);
    EXPECT_EQ(lRecorder.getCount(), lCount);
}

TEST(Engine, StopReturnsWhenNoCallbackRuns) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(
        readTwoAdapters("start first\nplogi every=1 times=forever\nprlo every=1 times=forever threads=2\n"));
    std::atomic<int> lRunning{0};
    std::atomic<bool> lMayReturn{false};
    std::atomic<bool> lIsStopped{false};
    std::atomic<bool> lWasLate{false};
    lRecorder.setHook([&] {
        ++lRunning;
        while (!lMayReturn) {
            std::this_thread::yield();
        }
        lWasLate = lWasLate || lIsStopped;
        --lRunning;
    });
    lEngine.start();
    lRecorder.registerAll(lEngine, 0);
    waitUntil([&] { return lRunning > 0; }, "a callback");
    ZTCTestThread lStopper([&] {
        lEngine.stop();
        lIsStopped = true;
    });
    // The number of boards can be asked for while a callback runs and the engine stops.
    EXPECT_EQ(lEngine.getNumberOfAdapters(), 2u);
    lMayReturn = true;
    lStopper.join();
    EXPECT_EQ(lRunning, 0);
    EXPECT_FALSE(lWasLate);
}

TEST(Engine, CallbacksRunWithSignalsBlocked) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("start first\nplogi at=0\n"));
    std::atomic<bool> lIsBlocked{false};
    lRecorder.setHook([&] {
        sigset_t lMask;
        pthread_sigmask(SIG_BLOCK, nullptr, &lMask);
        lIsBlocked = sigismember(&lMask, SIGTERM) == 1 && sigismember(&lMask, SIGHUP) == 1;
    });
    lEngine.start();
    lRecorder.registerKind(lEngine, 0, "plogi");
    sWaitForSchedule(lEngine);
    EXPECT_TRUE(lIsBlocked);
    sigset_t lMask;
    pthread_sigmask(SIG_BLOCK, nullptr, &lMask);
    EXPECT_EQ(sigismember(&lMask, SIGTERM), 0);
}

TEST(Engine, RegistrationsMayComeWhileEventsAreDelivered) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("start first\nstorm count=1000000000 threads=3 kind=plogi,link board=0\n"));
    lEngine.start();
    std::uint32_t lLink = 0;
    for (int lRound = 0; lRound < 200; ++lRound) {
        const std::uint32_t lPlogi = lRecorder.registerKind(lEngine, 0, "plogi");
        lLink = lRecorder.registerKind(lEngine, 0, "link");
        EXPECT_EQ(lEngine.unregisterForPort(0, lEngine.getScenario().mAdapters[0].mWwpn, lPlogi), 0u);
    }
    EXPECT_EQ(lEngine.unregisterForBoard(0, lLink), 0u);
    lEngine.stop();
    EXPECT_EQ(lEngine.getStatus().mDelivered, lRecorder.getCount());
}
