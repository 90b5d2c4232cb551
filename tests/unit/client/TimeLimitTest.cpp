#include "sensor/client/include/TimeLimit.h"

#include <gtest/gtest.h>

#include <climits>

using std::chrono::milliseconds;

TEST(TimeLimit, NothingIsLeftOfAnEmptySpan) {
    const ZTCTimeLimit lLimit(milliseconds(0));
    EXPECT_TRUE(lLimit.hasPassed());
    EXPECT_EQ(lLimit.remainingMilliseconds(), 0);
}

TEST(TimeLimit, ALongSpanIsHeldWithinWhatPollTakes) {
    const ZTCTimeLimit lLimit(milliseconds(1LL << 40));
    EXPECT_FALSE(lLimit.hasPassed());
    EXPECT_EQ(lLimit.remainingMilliseconds(), INT_MAX);
}

TEST(TimeLimit, DescribesItsSpanInSeconds) {
    EXPECT_EQ(ZTCTimeLimit(milliseconds(5000)).describeSpan(), "5 s");
    EXPECT_EQ(ZTCTimeLimit(milliseconds(250)).describeSpan(), "0.25 s");
    EXPECT_EQ(ZTCTimeLimit(milliseconds(1001)).describeSpan(), "1.001 s");
}
