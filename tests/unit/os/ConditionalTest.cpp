#include "os/common/include/Conditional.h"

#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "common/include/Exception.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/os/LogCapture.h"

using std::chrono::milliseconds;

/// Lets a test disturb the conditional underneath.
class ZTCDisturbedConditional : public ZTCConditional {
public:
    void wakeForNoReason() { OsBroadcastConditional(getOsConditional()); }
    void breakDestruction() { OsDestroyConditional(getOsConditional()); }
};

static void sWaitForWaiters(ZTCConditional& arConditional, unsigned aNumber) {
    waitUntil([&] { return arConditional.getNumberOfWaiters() == aNumber; }, "threads that wait");
}

TEST(Conditional, ASignalThatFindsNobodyIsKeptForTheNextWait) {
    ZTCConditional lConditional;
    lConditional.signal();
    lConditional.wait();
    lConditional.signal();
    EXPECT_NO_THROW(lConditional.timedWait(milliseconds(0)));
}

TEST(Conditional, OneSignalIsKeptAndNoMore) {
    ZTCConditional lConditional;
    lConditional.signal();
    lConditional.signal();
    lConditional.wait();
    EXPECT_THROW(lConditional.timedWait(milliseconds(0)), ZTCTimeOutEx);
}

TEST(Conditional, ATimedWaitThrowsWhenItsTimePasses) {
    ZTCConditional lConditional;
    EXPECT_THROW(lConditional.timedWait(milliseconds(10)), ZTCTimeOutEx);
    EXPECT_THROW(lConditional.timedWait(0u), ZTCTimeOutEx);
    EXPECT_EQ(lConditional.getNumberOfWaiters(), 0u);
}

TEST(Conditional, ASignalAfterATimeOutIsKept) {
    ZTCConditional lConditional;
    EXPECT_THROW(lConditional.timedWait(milliseconds(1)), ZTCTimeOutEx);
    lConditional.signal();
    EXPECT_NO_THROW(lConditional.timedWait(milliseconds(0)));
}

TEST(Conditional, ASignalWakesEveryThreadThatWaits) {
    ZTCConditional lConditional;
    ZTCTestThreads lThreads;
    lThreads.start(4, [&lConditional](unsigned aThread) {
        if (aThread % 2 == 0) {
            lConditional.wait();
        } else {
            EXPECT_NO_THROW(lConditional.timedWait(4294967295u));
        }
    });
    sWaitForWaiters(lConditional, 4);
    lConditional.signal();
    lThreads.join();
    EXPECT_THROW(lConditional.timedWait(milliseconds(0)), ZTCTimeOutEx) << "the signal was used up";
}

TEST(Conditional, ASignalBehindTheOneThatWokeIsKept) {
    ZTCConditional lConditional;
    ZTCTestThread lThread([&] { lConditional.wait(); });
    sWaitForWaiters(lConditional, 1);
    lConditional.signal();
    lConditional.signal();
    lThread.join();
    EXPECT_NO_THROW(lConditional.timedWait(milliseconds(0)));
}

TEST(Conditional, AWakeUpForNoReasonIsNoSignal) {
    ZTCDisturbedConditional lConditional;
    const ZTCTestThread lThread([&] { EXPECT_THROW(lConditional.timedWait(milliseconds(50)), ZTCTimeOutEx); });
    while (lThread.isRunning()) {
        lConditional.wakeForNoReason();
        std::this_thread::yield();
    }
}

TEST(Conditional, AnInterruptionEndsThisWaitAndEveryLaterOne) {
    ZTCConditional lConditional;
    ZTCTestThread lFirst([&] { lConditional.wait(); });
    ZTCTestThread lSecond([&] { lConditional.timedWait(4294967295u); });
    sWaitForWaiters(lConditional, 2);
    lConditional.interrupt();
    lFirst.join();
    lSecond.join();
    lConditional.wait();
    EXPECT_NO_THROW(lConditional.timedWait(milliseconds(0)));
    EXPECT_EQ(lConditional.getNumberOfWaiters(), 0u);
}

TEST(Conditional, NoSignalIsMissedBetweenTwoThreadsInTurn) {
    ZTCConditional lPing;
    ZTCConditional lPong;
    const ZTCTestThread lThread([&] {
        for (int lRound = 0; lRound < 2000; ++lRound) {
            lPing.timedWait(20u);
            lPong.signal();
        }
    });
    for (int lRound = 0; lRound < 2000; ++lRound) {
        lPing.signal();
        ASSERT_NO_THROW(lPong.timedWait(20u)) << "in round " << lRound;
    }
}

TEST(Conditional, AFailureOfItsDestructionIsTracedAndIgnored) {
    ZTCLogCapture lLog;
    {
        ZTCDisturbedConditional lConditional;
        lConditional.breakDestruction();
    }
    const auto lLines = lLog.file().containing("Ignoring exceptions while destructing ...");
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_EQ(lLines[0].mMark, "-T-");
    EXPECT_EQ(lLines[0].mLabel, "os/common/include/Conditional");
    EXPECT_EQ(lLines[0].mText, "Ignoring exceptions while destructing ...");
}
