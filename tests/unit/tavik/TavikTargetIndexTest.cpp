#include "tavik/include/TavikTargetIndex.h"

#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "tests/support/Bytes.h"
#include "tests/support/FailingAllocation.h"

static ZTCWorldWideName sName(std::uint64_t aValue) {
    return ZTCWorldWideName(makeWwn(aValue).mBytes.data());
}

static void sAdd(ZTCTavikTargetIndex& arIndex, std::uint64_t aPort, std::uint64_t aNode) {
    arIndex.reserveOne();
    arIndex.insert({sName(aPort), sName(aNode)});
}

/// Whether the index has exactly these names under the port's.
static bool sHas(const ZTCTavikTargetIndex& acrIndex, std::uint64_t aPort, std::uint64_t aNode) {
    const ZTSRemotePortNames* lpNames = acrIndex.find(sName(aPort).getKey());
    return lpNames != nullptr && lpNames->mWwpn == sName(aPort) && lpNames->mWwnn == sName(aNode);
}

TEST(TavikTargetIndex, AnEmptyOneHasNoPort) {
    const ZTCTavikTargetIndex lIndex;
    EXPECT_EQ(nullptr, lIndex.find(0));
    EXPECT_EQ(nullptr, lIndex.find(sName(0x500601603ba01234).getKey()));
}

TEST(TavikTargetIndex, FindsEveryPortWhileItGrowsAndNoOther) {
    constexpr std::uint64_t lcPorts = 3000;
    for (const std::uint64_t lStride : {0x1ul, 0x100ul, 0x0100000000000000ul / lcPorts}) {
        ZTCTavikTargetIndex lIndex;
        for (std::uint64_t i = 1; i <= lcPorts; ++i) {
            sAdd(lIndex, i * lStride, i);
            ASSERT_TRUE(sHas(lIndex, i * lStride, i));
            ASSERT_TRUE(sHas(lIndex, (i / 2 + 1) * lStride, i / 2 + 1));
            ASSERT_EQ(nullptr, lIndex.find(sName((i + 1) * lStride).getKey()));
        }
        for (std::uint64_t i = 1; i <= lcPorts; ++i) {
            EXPECT_TRUE(sHas(lIndex, i * lStride, i));
        }
    }
}

TEST(TavikTargetIndex, TheNameOfNoPortIsANameLikeAnyOther) {
    ZTCTavikTargetIndex lIndex;
    sAdd(lIndex, 5, 6);
    EXPECT_EQ(nullptr, lIndex.find(0));
    sAdd(lIndex, 0, 7);
    EXPECT_TRUE(sHas(lIndex, 0, 7));
    EXPECT_TRUE(sHas(lIndex, 5, 6));
}

TEST(TavikTargetIndex, AFailedAllocationIsOutOfMemoryAndChangesNothing) {
    ZTCTavikTargetIndex lIndex;
    unsigned lFailures = 0;
    for (std::uint64_t i = 1; i <= 100; ++i) {
        lFailures += failEachAllocation(
            [&lIndex] {
                try {
                    lIndex.reserveOne();
                } catch (const ZTCNoMemoryEx& lrException) {
                    EXPECT_EQ(2u, lrException.getError());
                }
            },
            [&lIndex, i] {
                EXPECT_TRUE(i == 1 || sHas(lIndex, i - 1, i - 1));
                EXPECT_EQ(nullptr, lIndex.find(sName(i).getKey()));
            });
        lIndex.insert({sName(i), sName(i)});
    }
    EXPECT_EQ(5u, lFailures) << "16, 32, 64, 128 and 256 slots";
    EXPECT_TRUE(sHas(lIndex, 1, 1));
    EXPECT_TRUE(sHas(lIndex, 100, 100));
}
