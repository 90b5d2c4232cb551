#include "libkpm/linux/src/EventSequence.h"

#include <gtest/gtest.h>

#include <initializer_list>

static std::uint64_t sLost(ZTCLinuxEventSequence& arSequence, std::initializer_list<std::uint32_t> aNumbers) {
    for (const std::uint32_t lNumber : aNumbers) {
        arSequence.note(lNumber);
    }
    return arSequence.takeLost();
}

TEST(EventSequence, WithoutAGapNothingIsLostWhereverItBegins) {
    ZTCLinuxEventSequence lSequence;
    EXPECT_EQ(sLost(lSequence, {}), 0u);
    EXPECT_EQ(sLost(lSequence, {4711, 4712, 4713}), 0u);
    EXPECT_EQ(sLost(lSequence, {4714}), 0u);
}

TEST(EventSequence, AGapIsLostOnce) {
    ZTCLinuxEventSequence lSequence;
    EXPECT_EQ(sLost(lSequence, {1, 2, 5, 6, 10}), 5u);
    EXPECT_EQ(lSequence.takeLost(), 0u);
    EXPECT_EQ(sLost(lSequence, {11, 13}), 1u);
}

TEST(EventSequence, TheCountWrapsAround) {
    ZTCLinuxEventSequence lSequence;
    EXPECT_EQ(sLost(lSequence, {0xFFFFFFFE, 0xFFFFFFFF, 0, 1}), 0u);
    ZTCLinuxEventSequence lOther;
    EXPECT_EQ(sLost(lOther, {0xFFFFFFFE, 2}), 3u);
}

TEST(EventSequence, NumbersThatOvertookEachOtherAreNotLost) {
    ZTCLinuxEventSequence lSequence;
    EXPECT_EQ(sLost(lSequence, {1, 3, 2, 4}), 0u);
    EXPECT_EQ(sLost(lSequence, {9, 5, 8, 6, 7, 10}), 0u);
    EXPECT_EQ(sLost(lSequence, {15, 13}), 3u);
}

TEST(EventSequence, ANumberThatCameTwiceChangesNothing) {
    ZTCLinuxEventSequence lSequence;
    EXPECT_EQ(sLost(lSequence, {1, 2, 2, 1, 3}), 0u);
}

TEST(EventSequence, ANumberFarBehindBeginsTheCountAnew) {
    ZTCLinuxEventSequence lSequence;
    EXPECT_EQ(sLost(lSequence, {1000000, 1, 2, 3}), 0u);
    EXPECT_EQ(sLost(lSequence, {5}), 1u);
}

TEST(EventSequence, AnyNumberOfGapsIsCounted) {
    ZTCLinuxEventSequence lSequence;
    for (std::uint32_t lNumber = 0; lNumber <= 2000; lNumber += 2) {
        lSequence.note(lNumber);
    }
    EXPECT_EQ(lSequence.takeLost(), 1000u);
}
