#include <gtest/gtest.h>
#include <poll.h>

#include <atomic>
#include <vector>

#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/system/TestSystem.h"

TEST(ThreadsEnd, WhileTheThreadsEndNothingSpins) {
    ZTCTestSystem lSystem;
    lSystem.addConditional();
    std::atomic<bool> lMayEnd{false};
    lSystem.addComponent(NEW ZTCFunctionComponent(lSystem, "slow", [&](ZTCFunctionComponent&, ZTCSystem& arSystem) {
        arSystem.wait(0);
        lMayEnd.wait(false);
    }));
    lSystem.createThreads();
    lSystem.startThreads();
    getStopEvent().raise();

    // The wait that follows the request to exit is a real one: nothing is ready as long as the thread runs.
    unsigned lPolls = 0;
    int lReady = -1;
    const ZTCReplacement lPoll(gReplaced.mBeforePoll, [&](const struct pollfd* apDescriptors, unsigned aCount, int) {
        if (aCount == 2 && ++lPolls == 2) {
            std::vector<struct pollfd> lDescriptors(apDescriptors, apDescriptors + aCount);
            lReady = poll(lDescriptors.data(), aCount, 0);
            lMayEnd = true;
            lMayEnd.notify_all();
        }
    });
    lSystem.waitForThreads();
    EXPECT_EQ(0, lReady);
    EXPECT_TRUE(lSystem.isSetForExit());
}

TEST(ThreadsEnd, AThreadThatEndedBeforeTheOthersMakesNothingSpin) {
    ZTCTestSystem lSystem;
    std::atomic<bool> lMayEnd{false};
    lSystem.addComponent(NEW ZTCFunctionComponent(lSystem, "quick", [](ZTCFunctionComponent&, ZTCSystem&) {}));
    lSystem.addComponent(
        NEW ZTCFunctionComponent(lSystem, "slow", [&](ZTCFunctionComponent&, ZTCSystem&) { lMayEnd.wait(false); }));

    // The first wait ends with the quick thread. The next one finds nothing ready as long as the other runs.
    unsigned lPolls = 0;
    int lReady = -1;
    const ZTCReplacement lPoll(gReplaced.mBeforePoll, [&](const struct pollfd* apDescriptors, unsigned aCount, int) {
        if (aCount != 2) {
            return;
        }
        std::vector<struct pollfd> lDescriptors(apDescriptors, apDescriptors + aCount);
        if (++lPolls == 1) {
            poll(lDescriptors.data(), aCount, -1);
        } else if (lPolls == 2) {
            lReady = poll(lDescriptors.data(), aCount, 0);
            lMayEnd = true;
            lMayEnd.notify_all();
        }
    });
    lSystem.createThreads();
    lSystem.startThreads();
    lSystem.waitForThreads();
    EXPECT_EQ(0, lReady);
}
