#include <signal.h>

#include <atomic>
#include <chrono>
#include <thread>

#include "tests/support/ResourceLimit.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/linux/EngineFixture.h"

TEST_F(LinuxEngine, StoppingWaitsForTheCallbackAndRemovesTheInstance) {
    mKernel.addHost(0);
    std::atomic<bool> lIsIn{false};
    std::atomic<bool> lMayReturn{false};
    mRecorder.setHook([&] {
        lIsIn = true;
        while (!lMayReturn) {
            std::this_thread::yield();
        }
    });
    start();
    mKernel.sendDone({.mResult = 0x28});
    mKernel.sendDone({.mResult = 0x28});
    waitUntil([&] { return lIsIn.load(); }, "the callback");
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 1u) << "answered while a callback is held up";
    EXPECT_EQ(registerPort(0, portName(1), 4, 0x08), KPM_STATUS_NO_SOURCE);
    ZTCTestThread lStopper([&] { mpEngine->stop(); });
    EXPECT_TRUE(lStopper.isRunning());
    lMayReturn = true;
    lStopper.join();
    const std::size_t lCount = mRecorder.count();
    EXPECT_TRUE(mKernel.instances().empty());
    mpEngine->stop();
    EXPECT_EQ(mRecorder.count(), lCount);
}

TEST_F(LinuxEngine, CallbacksRunWithAllSignalsBlocked) {
    mKernel.addHost(0);
    std::atomic<bool> lIsBlocked{false};
    mRecorder.setHook([&] {
        sigset_t lSignals;
        pthread_sigmask(SIG_BLOCK, nullptr, &lSignals);
        lIsBlocked = sigismember(&lSignals, SIGTERM) == 1 && sigismember(&lSignals, SIGHUP) == 1 &&
                     sigismember(&lSignals, SIGINT) == 1;
    });
    start();
    mKernel.sendDone({.mResult = 0x28});
    mRecorder.waitFor(1);
    mpEngine->stop();
    EXPECT_TRUE(lIsBlocked.load());
    sigset_t lSignals;
    pthread_sigmask(SIG_BLOCK, nullptr, &lSignals);
    EXPECT_EQ(sigismember(&lSignals, SIGTERM), 0) << "the caller's own mask is as it was";
}

TEST_F(LinuxEngine, WhatIsLostAtTheEndIsStillTold) {
    mKernel.addHost(0);
    start();
    for (int lTimes = 0; lTimes < 10; ++lTimes) {
        mKernel.sendFc(ZTLR_Foreign);
    }
    waitUntil([&] { return mKernel.isFcDrained(); }, "all messages to be read");
    mpEngine->stop();
    EXPECT_EQ(mLog.count("the kernel did not send them (10 since the start)"), 1u) << mLog.all();
}

TEST_F(LinuxEngine, AnOverrunThatNoLookHasFoundIsToldAtTheEnd) {
    mKernel.addHost(0);
    startWithoutLooks();
    writeFile(mKernel.instance() + "/per_cpu/cpu0/stats", "overrun: 7\n");
    mKernel.sendDone({.mResult = 0x28});
    mRecorder.waitFor(1);
    EXPECT_EQ(mLog.count("a trace buffer overran"), 0u);
    mpEngine->stop();
    EXPECT_EQ(mLog.count("2 7 SCSI outcomes are lost: a trace buffer overran (7 since the start)"), 1u) << mLog.all();
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST_F(LinuxEngine, WherePollFailsItWaitsForTheNextLookAndDoesNotSpin) {
    mKernel.addHost(0);
    start();
    const auto lBegin = std::chrono::steady_clock::now();
    {
        const ZTCResourceLimit lLimit(RLIMIT_NOFILE, 1);
        waitUntil([&] { return mLog.loss("other").value_or(0) >= 4; }, "some failures");
    }
    mpEngine->stop();
    const auto lTime = std::chrono::steady_clock::now() - lBegin;
    // One for poll and one for the look, every 20 ms. Without the pause there would be thousands.
    const auto lMost = 2 * (lTime / mKernel.options().mPollInterval + 2);
    EXPECT_LE(mLog.loss("other").value_or(0), static_cast<std::uint64_t>(lMost));
}
#endif
