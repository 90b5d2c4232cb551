#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

#include "common/include/Exception.h"
#include "os/common/include/Conditional.h"
#include "system/include/SynchList.h"
#include "tests/unit/interposed/support/Replaced.h"

namespace {

constexpr unsigned scMost = std::numeric_limits<unsigned>::max();

/// The deadline of the wait that something makes at the time 1000.
template <typename Wait>
std::int64_t sDeadlineOf(Wait aWait) {
    std::int64_t lDeadline = 0;
    const ZTCReplacement lClock(gReplaced.mMonotonicMilliseconds, [] { return std::int64_t{1000}; });
    const ZTCReplacement lWait(gReplaced.mTimedWait, [&](std::int64_t aDeadline) {
        lDeadline = aDeadline;
        return false;
    });
    EXPECT_THROW(aWait(), ZTCTimeOutEx);
    return lDeadline;
}

}  // namespace

TEST(ConditionalTime, TheLongestWaitIsThatLong) {
    ZTCConditional lConditional;
    EXPECT_EQ(1000 + 1000, sDeadlineOf([&] { lConditional.timedWait(1u); }));
    EXPECT_EQ(1000 + std::int64_t{2147484} * 1000, sDeadlineOf([&] { lConditional.timedWait(2147484u); }));
    EXPECT_EQ(1000 + std::int64_t{scMost} * 1000, sDeadlineOf([&] { lConditional.timedWait(scMost); }));
}

TEST(ConditionalTime, TheLongestWaitOnAnEmptyListIsThatLong) {
    ZTCSynchList lList;
    EXPECT_EQ(1000 + std::int64_t{scMost} * 1000, sDeadlineOf([&] { lList.waitWhileEmpty(scMost); }));
}
