#include "libkpm/sim/src/Registry.h"

#include <gtest/gtest.h>

TEST(Registry, FindsWhatWasPutForThatKindOfThatBoardAlone) {
    ZTCSimRegistry lRegistry(2);
    int lContext = 0;
    ZTSSimRegistration lRegistration;
    lRegistration.mpContext = &lContext;
    const std::uint32_t lHandle = lRegistry.put(1, 3, lRegistration, std::nullopt);
    EXPECT_NE(lHandle, 0u);
    ASSERT_TRUE(lRegistry.find(1, 3).has_value());
    EXPECT_EQ(lRegistry.find(1, 3)->mHandle, lHandle);
    EXPECT_EQ(lRegistry.find(1, 3)->mpContext, &lContext);
    EXPECT_FALSE(lRegistry.find(0, 3).has_value());
    EXPECT_FALSE(lRegistry.find(1, 4).has_value());
    EXPECT_FALSE(lRegistry.find(2, 3).has_value());
    EXPECT_EQ(lRegistry.size(), 1u);
}

TEST(Registry, TheNewestRegistrationCounts) {
    ZTCSimRegistry lRegistry(1);
    const std::uint32_t lOld = lRegistry.put(0, 0, {}, std::nullopt);
    const std::uint32_t lNew = lRegistry.put(0, 0, {}, std::nullopt);
    EXPECT_NE(lOld, lNew);
    EXPECT_EQ(lRegistry.size(), 1u);
    EXPECT_EQ(lRegistry.findKind(0, lOld), std::nullopt);
    EXPECT_EQ(lRegistry.findKind(0, lNew), 0u);
}

TEST(Registry, AnOldHandleEndsNothing) {
    ZTCSimRegistry lRegistry(1);
    const std::uint32_t lOld = lRegistry.put(0, 0, {}, std::nullopt);
    const std::uint32_t lNew = lRegistry.put(0, 0, {}, std::nullopt);
    lRegistry.remove(0, 0, lOld);
    EXPECT_EQ(lRegistry.size(), 1u);
    lRegistry.remove(0, 0, lNew);
    EXPECT_EQ(lRegistry.size(), 0u);
}

TEST(Registry, AHandleOfOnesChoiceIsKept) {
    ZTCSimRegistry lRegistry(1);
    EXPECT_EQ(lRegistry.put(0, 0, {}, 0), 0u);
    EXPECT_EQ(lRegistry.put(0, 1, {}, 77), 77u);
    EXPECT_EQ(lRegistry.findKind(0, 77), 1u);
}
