#include "libkpm/common/include/LibraryThread.h"

#include <gtest/gtest.h>
#include <signal.h>

TEST(LibraryThread, RunsItsBodyWithAllSignalsBlockedAndLeavesTheCallersAlone) {
    sigset_t lBefore;
    pthread_sigmask(SIG_BLOCK, nullptr, &lBefore);
    sigset_t lInside;
    sigemptyset(&lInside);
    startLibraryThread([&] { pthread_sigmask(SIG_BLOCK, nullptr, &lInside); }).join();
    for (const int lSignal : {SIGTERM, SIGHUP, SIGINT, SIGUSR1, SIGCHLD, SIGPIPE}) {
        EXPECT_EQ(sigismember(&lInside, lSignal), 1) << lSignal;
    }
    sigset_t lAfter;
    pthread_sigmask(SIG_BLOCK, nullptr, &lAfter);
    for (int lSignal = 1; lSignal < SIGRTMIN; ++lSignal) {
        EXPECT_EQ(sigismember(&lAfter, lSignal), sigismember(&lBefore, lSignal)) << lSignal;
    }
}
