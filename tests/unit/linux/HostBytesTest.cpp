#include "libkpm/linux/src/HostBytes.h"

#include <gtest/gtest.h>

#include <limits>

static constexpr std::uint8_t scBytes[] = {0xF1, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08, 0x09};

TEST(HostBytes, EverySizeIsReadInEitherOrderAtAnyAddress) {
    const auto lLittle = [](std::size_t aOffset, std::size_t aSize) {
        return loadUnsigned(scBytes, aOffset, aSize, std::endian::little);
    };
    EXPECT_EQ(lLittle(0, 1), 0xF1u);
    EXPECT_EQ(lLittle(1, 2), 0x0302u);
    EXPECT_EQ(lLittle(0, 4), 0x040302F1u);
    EXPECT_EQ(lLittle(1, 8), 0x0908070605040302u);
    const auto lBig = [](std::size_t aOffset, std::size_t aSize) {
        return loadUnsigned(scBytes, aOffset, aSize, std::endian::big);
    };
    EXPECT_EQ(lBig(0, 1), 0xF1u);
    EXPECT_EQ(lBig(1, 2), 0x0203u);
    EXPECT_EQ(lBig(0, 4), 0xF1020304u);
    EXPECT_EQ(lBig(1, 8), 0x0203040506070809u);
}

TEST(HostBytes, WhatIsNotAllInsideIsNone) {
    EXPECT_EQ(loadUnsigned(scBytes, 8, 1, std::endian::little), 9u);
    EXPECT_FALSE(loadUnsigned(scBytes, 9, 1, std::endian::little).has_value());
    EXPECT_FALSE(loadUnsigned(scBytes, 2, 8, std::endian::little).has_value());
    EXPECT_FALSE(loadUnsigned(scBytes, std::numeric_limits<std::size_t>::max(), 1, std::endian::big).has_value());
    EXPECT_FALSE(loadUnsigned(scBytes, std::numeric_limits<std::size_t>::max() - 3, 4, std::endian::big).has_value());
    EXPECT_FALSE(loadUnsigned({}, 0, 1, std::endian::big).has_value());
}

TEST(HostBytes, OtherSizesAreNone) {
    for (const std::size_t lSize : {0u, 3u, 5u, 6u, 7u, 9u}) {
        EXPECT_FALSE(loadUnsigned(scBytes, 0, lSize, std::endian::little).has_value()) << lSize;
    }
}
