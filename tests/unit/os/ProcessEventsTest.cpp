#include "os/common/include/ProcessEvents.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <signal.h>

#include <atomic>
#include <new>
#include <string>
#include <thread>

#include "tests/support/FailingAllocation.h"

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
    std::thread lThread([&] { EXPECT_TRUE(lEvent.waitFor(20000)); });
    lEvent.raise();
    lThread.join();
}

static std::atomic<int> sSignals{0};

TEST(ProcessEvents, ASignalToTheThreadEndsNoWaitBeforeItsTime) {
    struct sigaction lAction {};
    lAction.sa_handler = [](int) { ++sSignals; };
    ASSERT_EQ(sigaction(SIGUSR1, &lAction, nullptr), 0);
    for (const int lMilliseconds : {-1, 20000}) {
        ZTCProcessEvent lEvent;
        std::atomic<bool> lHasReturned{false};
        std::thread lThread([&] {
            EXPECT_TRUE(lEvent.waitFor(lMilliseconds));
            lHasReturned = true;
        });
        for (const int lWanted = sSignals + 20; sSignals < lWanted;) {
            ASSERT_EQ(pthread_kill(lThread.native_handle(), SIGUSR1), 0);
            std::this_thread::yield();
        }
        EXPECT_FALSE(lHasReturned);
        lEvent.raise();
        lThread.join();
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
