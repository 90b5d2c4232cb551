#include "common/include/Buffer.h"

#include <gtest/gtest.h>

#include <cstring>

#include <string>

#include "common/include/Exception.h"
#include "tests/support/FailingAllocation.h"

namespace {

std::string sText(const ZTCBuffer& acrBuffer) {
    return {reinterpret_cast<const char*>(acrBuffer.getData()), acrBuffer.getSize()};
}

}  // namespace

TEST(Buffer, BeginsEmpty) {
    ZTCBuffer lBuffer;
    EXPECT_EQ(0u, lBuffer.getSize());
    EXPECT_EQ(0u, lBuffer.getCapacity());
    ZTCBuffer lRoomy(100);
    EXPECT_EQ(0u, lRoomy.getSize());
    EXPECT_EQ(100u, lRoomy.getCapacity());
}

TEST(Buffer, AppendingAddsAtTheEnd) {
    ZTCBuffer lBuffer;
    lBuffer.append("abc", 3);
    lBuffer.append(nullptr, 0);
    lBuffer.append("de", 2);
    EXPECT_EQ("abcde", sText(lBuffer));
}

TEST(Buffer, AppendingWithinTheCapacityDoesNotAllocate) {
    ZTCBuffer lBuffer(4);
    ZTCFailingAllocation lFailure(1);
    lBuffer.append("abcd", 4);
    EXPECT_FALSE(lFailure.hasFailed());
}

TEST(Buffer, GrowsGeometrically) {
    ZTCBuffer lBuffer;
    unsigned lGrowths = 0;
    Size lCapacity = 0;
    for (int i = 0; i < 100000; ++i) {
        lBuffer.append("x", 1);
        if (lBuffer.getCapacity() != lCapacity) {
            lCapacity = lBuffer.getCapacity();
            ++lGrowths;
        }
    }
    EXPECT_EQ(100000u, lBuffer.getSize());
    EXPECT_LE(lGrowths, 20u);
}

TEST(Buffer, MayAppendItsOwnBytes) {
    ZTCBuffer lBuffer;
    lBuffer.append(std::string(64, 'a').c_str(), 63);
    lBuffer.append("b", 1);
    ASSERT_EQ(lBuffer.getSize(), lBuffer.getCapacity());
    lBuffer.append(lBuffer.getData() + 1, 63);
    EXPECT_EQ(std::string(63, 'a') + "b" + std::string(62, 'a') + "b", sText(lBuffer));
}

TEST(Buffer, ResizingCutsOrFillsUpWithZeros) {
    ZTCBuffer lBuffer;
    lBuffer.append("abcd", 4);
    lBuffer.resize(2);
    EXPECT_EQ("ab", sText(lBuffer));
    lBuffer.resize(4);
    EXPECT_EQ(std::string("ab\0\0", 4), sText(lBuffer));
    lBuffer.resize(0);
    EXPECT_EQ(0u, lBuffer.getSize());
}

TEST(Buffer, ClearingKeepsTheRoom) {
    ZTCBuffer lBuffer;
    lBuffer.append("abcd", 4);
    const Size lCapacity = lBuffer.getCapacity();
    lBuffer.clear();
    EXPECT_EQ(0u, lBuffer.getSize());
    EXPECT_EQ(lCapacity, lBuffer.getCapacity());
}

TEST(Buffer, ReservingNeverShrinks) {
    ZTCBuffer lBuffer(10);
    lBuffer.reserve(5);
    EXPECT_EQ(10u, lBuffer.getCapacity());
    lBuffer.reserve(11);
    EXPECT_EQ(11u, lBuffer.getCapacity());
}

TEST(Buffer, ASizePastFourGigabytesIsInvalidAndChangesNothing) {
    ZTCBuffer lBuffer;
    lBuffer.append("ab", 2);
    // The length is compared with the limit before any byte is touched.
    EXPECT_THROW(lBuffer.append("x", 4294967294u), ZTCInvalidEx);
    EXPECT_EQ("ab", sText(lBuffer));
}

TEST(Buffer, EveryFailedAllocationIsOutOfMemoryAndChangesNothing) {
    ZTCBuffer lBuffer;
    lBuffer.append("ab", 2);
    lBuffer.reserve(64);
    const std::string lLong(1000, 'x');
    bool lIsDone = false;
    const unsigned lFailures = failEachAllocation(
        [&] {
            try {
                ZTCBuffer lOther(10);
                lOther.append(lLong.c_str(), 1000);
                lBuffer.append(lLong.c_str(), 1000);
                lIsDone = true;
            } catch (const ZTCNoMemoryEx& lrException) {
                EXPECT_EQ(2u, lrException.getError());
            }
        },
        [&] { EXPECT_EQ("ab", sText(lBuffer)); });
    EXPECT_EQ(3u, lFailures);
    EXPECT_TRUE(lIsDone);
    EXPECT_EQ("ab" + lLong, sText(lBuffer));

    ZTCFailingAllocation lFailure(1);
    EXPECT_THROW(lBuffer.resize(100000), ZTCNoMemoryEx);
    EXPECT_EQ(1002u, lBuffer.getSize());
}

TEST(Buffer, ExtendingGivesBytesToWriteAndGrowsAsAppendDoes) {
    ZTCBuffer lBuffer;
    std::memcpy(lBuffer.extend(2), "ab", 2);
    const Size lCapacity = lBuffer.getCapacity();
    std::memcpy(lBuffer.extend(lCapacity), std::string(lCapacity, 'x').c_str(), lCapacity);
    EXPECT_EQ("ab" + std::string(lCapacity, 'x'), sText(lBuffer));
    EXPECT_EQ(2 * lCapacity, lBuffer.getCapacity());
    EXPECT_THROW(lBuffer.extend(0xFFFFFFFF), ZTCInvalidEx);
    ZTCFailingAllocation lFailure(1);
    EXPECT_THROW(lBuffer.extend(100000), ZTCNoMemoryEx);
    EXPECT_EQ(2 + lCapacity, lBuffer.getSize());
}
