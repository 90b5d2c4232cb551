#include "os/common/include/ProcessEvents.h"

#include <gtest/gtest.h>
#include <signal.h>

#include <atomic>
#include <new>
#include <string>
#include <thread>

#include "tests/support/FailingAllocation.h"
#include "tests/support/TestThreads.h"

TEST(ProcessEvents, AnEventStaysRaised) {
    ZTCProcessEvent lEvent;
    EXPECT_FALSE(lEvent.isRaised());
    EXPECT_FALSE(lEvent.waitFor(1));
    lEvent.raise();
    lEvent.raise();
    EXPECT_TRUE(lEvent.isRaised());
    EXPECT_TRUE(lEvent.isRaised());
    EXPECT_TRUE(lEvent.waitFor(-1));
}

TEST(ProcessEvents, AnEventCanBeTakenBack) {
    ZTCProcessEvent lEvent;
    lEvent.raise();
    lEvent.raise();
    lEvent.reset();
    EXPECT_FALSE(lEvent.isRaised());
    lEvent.reset();
    EXPECT_FALSE(lEvent.isRaised());
}

TEST(ProcessEvents, RaisingWakesWhoWaits) {
    ZTCProcessEvent lEvent;
    const ZTCTestThread lThread([&] { EXPECT_TRUE(lEvent.waitFor(20000)); });
    lEvent.raise();
}

static std::atomic<int> sSignals{0};

TEST(ProcessEvents, ASignalToTheThreadEndsNoWaitBeforeItsTime) {
    struct sigaction lAction {};
    lAction.sa_handler = [](int) { ++sSignals; };
    ASSERT_EQ(sigaction(SIGUSR1, &lAction, nullptr), 0);
    for (const int lMilliseconds : {-1, 20000}) {
        ZTCProcessEvent lEvent;
        ZTCTestThread lThread([&] { EXPECT_TRUE(lEvent.waitFor(lMilliseconds)); });
        for (const int lWanted = sSignals + 20; sSignals < lWanted && lThread.isRunning();) {
            lThread.sendSignal(SIGUSR1);
            std::this_thread::yield();
        }
        EXPECT_TRUE(lThread.isRunning());
        lEvent.raise();
    }
}

TEST(ProcessEvents, TheEventsOfTheProcessTakeNoMemory) {
    EXPECT_FALSE(failAllocation(1, [] { getStopEvent(); }));
    EXPECT_FALSE(failAllocation(1, [] { getExitEvent(); }));
    EXPECT_TRUE(failAllocation(1, [] { EXPECT_THROW(std::string(100, 'x'), std::bad_alloc); }));
}

TEST(ProcessEvents, TheProcessHasOneStopEventAndOneExitEvent) {
    EXPECT_EQ(&getStopEvent(), &getStopEvent());
    EXPECT_EQ(&getExitEvent(), &getExitEvent());
    EXPECT_NE(&getStopEvent(), &getExitEvent());
    getStopEvent().raise();
    EXPECT_FALSE(getExitEvent().isRaised());
    getStopEvent().reset();
}
