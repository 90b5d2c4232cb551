#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <vector>

#include "common/include/Memory.h"
#include "tests/unit/interposed/support/Replaced.h"

TEST(WipedMemory, FreeArrSetsTheBytesToZeroBeforeItFreesThem) {
    constexpr std::size_t lcSize = 32;
    unsigned char* lpBlock = nullptr;
    ZT_MALLOCARR(lpBlock, unsigned char, lcSize);
    std::memset(lpBlock, 0xA5, lcSize);
    const void* const lpFreed = lpBlock;
    std::vector<unsigned char> lSeen(lcSize, 0xFF);
    {
        const ZTCReplacement lFree(gReplaced.mBeforeFree, [&](const void* apBlock) {
            if (apBlock == lpFreed) {
                std::memcpy(lSeen.data(), apBlock, lcSize);
            }
        });
        ZT_FREEARR(lpBlock, lcSize - 1);
    }
    EXPECT_EQ(nullptr, lpBlock);
    std::vector<unsigned char> lExpected(lcSize, 0);
    lExpected.back() = 0xA5;
    EXPECT_EQ(lExpected, lSeen) << "so many bytes, and no more";
}
