#include "common/include/ReferenceCount.h"

#include <gtest/gtest.h>

#include <atomic>

#include "tests/support/TestThreads.h"

TEST(ReferenceCount, CountsUpAndReturnsTheNewCountOnTheWayDown) {
    ZTCReferenceCount lCount(1);
    lCount.increment();
    lCount.increment();
    EXPECT_EQ(2u, lCount.decrement());
    EXPECT_EQ(1u, lCount.decrement());
    EXPECT_EQ(0u, lCount.decrement());
}

TEST(ReferenceCount, IsOneMachineWord) {
    EXPECT_EQ(sizeof(void*), sizeof(ZTCReferenceCount));
}

TEST(ReferenceCount, ExactlyOneThreadGetsToZero) {
    constexpr unsigned lcThreads = 4;
    constexpr unsigned lcRounds = 2000;
    ZTCReferenceCount lCount(lcThreads);
    std::atomic<unsigned> lZeros{0};
    runOnThreads(lcThreads, [&lCount, &lZeros](unsigned) {
        for (unsigned lRound = 0; lRound < lcRounds; ++lRound) {
            lCount.increment();
            if (lCount.decrement() == 0) {
                ++lZeros;
            }
        }
        if (lCount.decrement() == 0) {
            ++lZeros;
        }
    });
    EXPECT_EQ(1u, lZeros.load());
}
