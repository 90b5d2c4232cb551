#include "tests/support/TestThreads.h"

#include <gtest/gtest-spi.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <atomic>
#include <stdexcept>
#include <string>

TEST(TestThreads, WhatAThreadThrowsFailsTheTestUnderItsName) {
    EXPECT_NONFATAL_FAILURE_ON_ALL_THREADS(
        ZTCTestThread([] { throw std::runtime_error("waited in vain"); }, "the keeper"),
        "the keeper ended with: waited in vain");
    EXPECT_NONFATAL_FAILURE_ON_ALL_THREADS(ZTCTestThread([] { throw 7; }), "an exception of an unknown class");
    EXPECT_NONFATAL_FAILURE_ON_ALL_THREADS(runOnThreads(3,
                                                        [](unsigned aThread) {
                                                            if (aThread == 1) {
                                                                throw std::runtime_error("too late");
                                                            }
                                                        }),
                                           "thread 1 ended with: too late");
}

TEST(TestThreads, AThreadIsJoinedAtTheEndOfItsScope) {
    std::atomic<bool> lMayReturn{false};
    bool lHasReturned = false;
    {
        const ZTCTestThread lThread([&] {
            lMayReturn.wait(false);
            lHasReturned = true;
        });
        EXPECT_TRUE(lThread.isRunning());
        lMayReturn = true;
        lMayReturn.notify_one();
    }
    EXPECT_TRUE(lHasReturned);
}

TEST(TestThreads, AStopAndTheEndOfTheScopeEndWhatGoesOnUntilThen) {
    std::atomic<unsigned> lRounds{0};
    const auto lGoOn = [&lRounds](const std::stop_token& acrStop) {
        while (!acrStop.stop_requested()) {
            ++lRounds;
        }
    };
    const ZTCTestThread lOther(lGoOn);
    ZTCTestThread lThread(lGoOn);
    EXPECT_TRUE(lThread.isRunning());
    lThread.stop();
    EXPECT_FALSE(lThread.isRunning());
    EXPECT_TRUE(lOther.isRunning());
}

static std::atomic<bool> sHasCome{false};

TEST(TestThreads, ASignalReachesTheThread) {
    struct sigaction lAction {};
    lAction.sa_handler = [](int) { sHasCome = true; };
    ASSERT_EQ(sigaction(SIGUSR1, &lAction, nullptr), 0);
    ZTCTestThread lThread([](const std::stop_token& acrStop) {
        sigset_t lSignal;
        sigemptyset(&lSignal);
        sigaddset(&lSignal, SIGUSR1);
        EXPECT_EQ(pthread_sigmask(SIG_UNBLOCK, &lSignal, nullptr), 0);
        while (!sHasCome && !acrStop.stop_requested()) {
            std::this_thread::yield();
        }
        EXPECT_TRUE(sHasCome);
    });
    lThread.sendSignal(SIGUSR1);
    lThread.join();
    EXPECT_FALSE(lThread.isRunning());
}

TEST(TestThreads, ThreadsBeginTogetherAndAreRunningUntilTheLastHasEnded) {
    std::atomic<unsigned> lBegun{0};
    std::atomic<unsigned> lMayEnd{0};
    ZTCTestThreads lThreads;
    lThreads.start(2, [&](unsigned aThread) {
        ++lBegun;
        // Each waits for the other one: alone it would never get further.
        while (lBegun < 2 || lMayEnd <= aThread) {
            std::this_thread::yield();
        }
    });
    EXPECT_TRUE(lThreads.isRunning());
    lMayEnd = 1;
    EXPECT_TRUE(lThreads.isRunning());
    lMayEnd = 2;
    lThreads.join();
    EXPECT_FALSE(lThreads.isRunning());
}
