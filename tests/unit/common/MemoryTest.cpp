#include "common/include/Memory.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

#include "common/include/Exception.h"
#include "tests/support/FailingAllocation.h"

namespace {

struct ZTSSample {
    int mNumber;
    char mText[60];
};

template <typename Call>
unsigned sCodeOfNoMemory(Call aCall) {
    try {
        aCall();
    } catch (const ZTCNoMemoryEx& lrException) {
        EXPECT_STREQ("Out of Memory", lrException.what());
        return lrException.getError();
    }
    return 0;
}

}  // namespace

TEST(Memory, BlocksComeZeroFilled) {
    ZTSSample* lpOne = nullptr;
    ZTSSample* lpMany = nullptr;
    unsigned char* lpBytes = nullptr;
    ZT_MALLOC(lpOne, ZTSSample);
    ZT_MALLOCARR(lpMany, ZTSSample, 3);
    ZT_MALLOCSIZE(lpBytes, unsigned char, 100);
    ASSERT_NE(nullptr, lpOne);
    EXPECT_EQ(0, lpOne->mNumber);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(0, lpMany[i].mNumber);
        EXPECT_EQ(0, lpMany[i].mText[59]);
    }
    for (int i = 0; i < 100; ++i) {
        EXPECT_EQ(0, lpBytes[i]);
    }
    ZT_FREE(lpOne);
    ZT_FREE(lpMany);
    ZT_FREEARR(lpBytes, 100);
    EXPECT_EQ(nullptr, lpOne);
    EXPECT_EQ(nullptr, lpMany);
    EXPECT_EQ(nullptr, lpBytes);
}

TEST(Memory, AnEmptyBlockIsNoFailure) {
    unsigned char* lpBytes = nullptr;
    ZT_MALLOCSIZE(lpBytes, unsigned char, 0);
    EXPECT_NE(nullptr, lpBytes);
    ZT_FREE(lpBytes);
}

TEST(Memory, AFailedAllocationIsOutOfMemory) {
    ZTSSample* lpSample = nullptr;
    unsigned lCodes[3] = {};
    {
        ZTCFailingAllocation lFailure(1);
        lCodes[0] = sCodeOfNoMemory([&] { ZT_MALLOC(lpSample, ZTSSample); });
    }
    {
        ZTCFailingAllocation lFailure(1);
        lCodes[1] = sCodeOfNoMemory([&] { ZT_MALLOCARR(lpSample, ZTSSample, 2); });
    }
    {
        ZTCFailingAllocation lFailure(1);
        lCodes[2] = sCodeOfNoMemory([&] { ZT_MALLOCSIZE(lpSample, ZTSSample, 64); });
    }
    for (const unsigned lCode : lCodes) {
        EXPECT_EQ(2u, lCode);
    }
    EXPECT_EQ(nullptr, lpSample);
}

TEST(Memory, AProductPastTheAddressSpaceIsOutOfMemory) {
    ZTSSample* lpSample = nullptr;
    EXPECT_EQ(2u, sCodeOfNoMemory([&] {
                  ZT_MALLOCARR(lpSample, ZTSSample, std::numeric_limits<std::size_t>::max() / sizeof(ZTSSample) + 1);
              }));
    EXPECT_EQ(nullptr, lpSample);
}

TEST(Memory, FreeingAndDeletingNothingIsHarmless) {
    int* lpNothing = nullptr;
    ZT_FREE(lpNothing);
    ZT_FREEARR(lpNothing, 4);
    ZT_DELETE(lpNothing);
    ZT_DELETEARR(lpNothing);
    EXPECT_EQ(nullptr, lpNothing);
}

TEST(Memory, DeletingDestroysAndSetsToNull) {
    struct ZTSCounted {
        ~ZTSCounted() { ++*mpDestroyed; }
        int* mpDestroyed = nullptr;
    };
    int lDestroyed = 0;
    ZTSCounted* lpOne = NEW ZTSCounted{&lDestroyed};
    ZTSCounted* lpTwo = NEW ZTSCounted[2]{{&lDestroyed}, {&lDestroyed}};
    ZT_DELETE(lpOne);
    EXPECT_EQ(1, lDestroyed);
    ZT_DELETEARR(lpTwo);
    EXPECT_EQ(3, lDestroyed);
    EXPECT_EQ(nullptr, lpOne);
    EXPECT_EQ(nullptr, lpTwo);
}

TEST(Memory, NewYieldsNullWhereMemoryIsOut) {
    ZTCFailingAllocation lFailure(1);
    int* const lpNothing = NEW int(1);
    EXPECT_EQ(nullptr, lpNothing);
}

TEST(Memory, WipingSetsEveryByteToZero) {
    unsigned char lBytes[5] = {1, 2, 3, 4, 5};
    wipeMemory(lBytes, 4);
    EXPECT_EQ(0, lBytes[0]);
    EXPECT_EQ(0, lBytes[3]);
    EXPECT_EQ(5, lBytes[4]);
}

TEST(Memory, SelectionEvaluatesEachArgumentOnce) {
    int lCount = 0;
    EXPECT_EQ(1, ZT_MIN(++lCount, 5));
    EXPECT_EQ(1, lCount);
    EXPECT_EQ(5, ZT_MAX(5, ++lCount));
    EXPECT_EQ(2, lCount);
    EXPECT_EQ(3u, ZT_MIN(std::uint64_t{3}, 4u));
    EXPECT_EQ(-1, ZT_MIN(-1, 1));
    EXPECT_EQ(1, ZT_MAX(-1, 1));
}
