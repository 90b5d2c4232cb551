#include "common/include/Vector.h"

#include <gtest/gtest.h>

#include <string>

#include "common/include/Pointer.h"
#include "tests/support/FailingAllocation.h"

namespace {

template <typename Call>
std::string sInvalid(Call aCall) {
    try {
        aCall();
    } catch (const ZTCInvalidEx& lrException) {
        return std::string(lrException.what()) + "|" + std::to_string(lrException.getError());
    }
    return "nothing thrown";
}

}  // namespace

TEST(Vector, AnIndexAtOrPastTheEndIsInvalid) {
    ZTCVector<int> lVector;
    lVector.add(10);
    lVector.add(11);
    const ZTCVector<int>& lrConst = lVector;
    const std::string lExpected = "Vector out of bounds access|6";
    EXPECT_EQ(lExpected, sInvalid([&] { lVector.get(2); }));
    EXPECT_EQ(lExpected, sInvalid([&] { lrConst.get(2); }));
    EXPECT_EQ(lExpected, sInvalid([&] { static_cast<void>(lVector[2]); }));
    EXPECT_EQ(lExpected, sInvalid([&] { static_cast<void>(lrConst[4294967295u]); }));
    EXPECT_EQ(lExpected, sInvalid([] { ZTCVector<int>().get(0); }));
}

TEST(Vector, KeepsTheOrderOfAdding) {
    ZTCVector<int> lVector(2);
    EXPECT_EQ(0u, lVector.numberOfElements());
    for (int i = 0; i < 5; ++i) {
        lVector.add(i);
    }
    EXPECT_EQ(5u, lVector.numberOfElements());
    for (unsigned i = 0; i < 5; ++i) {
        EXPECT_EQ(static_cast<int>(i), lVector[i]);
    }
    lVector[3] = 33;
    EXPECT_EQ(33, lVector.get(3));
}

TEST(Vector, CapacityIsReservedAtOnce) {
    ZTCVector<int> lVector(3);
    ZTCFailingAllocation lFailure(1);
    lVector.add(1);
    lVector.add(2);
    lVector.add(3);
    EXPECT_FALSE(lFailure.hasFailed());
}

TEST(Vector, ACapacityPastAnyVectorIsInvalid) {
    struct ZTSHuge {
        char mBytes[0x7fffffff];
        char mMore[0x7fffffff];
    };
    EXPECT_EQ("Cannot reserve space for Vector|6", sInvalid([] { ZTCVector<ZTSHuge> lVector(4294967295u); }));
}

TEST(Vector, AFailedAllocationIsOutOfMemoryAndLeavesTheVectorAlone) {
    ZTCVector<ZTCPointer<int>> lVector;
    const ZTCPointer<int> lElement(new int(1));
    const unsigned lFailures = failEachAllocation(
        [&] {
            try {
                ZTCVector<int> lReserved(8);
                lVector.add(lElement);
            } catch (const ZTCNoMemoryEx& lrException) {
                EXPECT_STREQ("Out of Memory", lrException.what());
                EXPECT_EQ(2u, lrException.getError());
            }
        },
        [&] { EXPECT_EQ(0u, lVector.numberOfElements()); });
    EXPECT_EQ(2u, lFailures);
    EXPECT_EQ(1u, lVector.numberOfElements());
}
