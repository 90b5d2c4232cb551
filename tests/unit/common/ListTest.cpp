#include "common/include/List.h"

#include <gtest/gtest.h>

#include <vector>

#include "common/include/Pointer.h"
#include "tests/support/FailingAllocation.h"

TEST(List, WalksInTheOrderOfAppending) {
    ZTCList<int> lList;
    for (int lValue : {3, 1, 2}) {
        lList.push_back(lValue);
    }
    EXPECT_EQ(3u, lList.size());
    const ZTCList<int>& lrConst = lList;
    EXPECT_EQ((std::vector<int>{3, 1, 2}), std::vector<int>(lrConst.begin(), lrConst.end()));
    *lList.begin() = 4;
    EXPECT_EQ(4, *lrConst.begin());
}

TEST(List, ClearingReleasesThePointers) {
    struct ZTSCounted {
        explicit ZTSCounted(int& arAlive) : mrAlive(arAlive) { ++mrAlive; }
        ~ZTSCounted() { --mrAlive; }
        int& mrAlive;
    };
    int lAlive = 0;
    ZTCList<ZTCPointer<ZTSCounted>> lList;
    lList.push_back(ZTCPointer<ZTSCounted>(NEW ZTSCounted(lAlive)));
    EXPECT_EQ(1, lAlive);
    lList.clear();
    EXPECT_EQ(0, lAlive);
    EXPECT_EQ(0u, lList.size());
    EXPECT_TRUE(lList.begin() == lList.end());
}

TEST(List, AFailedAllocationIsOutOfMemoryAndLeavesTheListAlone) {
    ZTCList<int> lList;
    const unsigned lFailures = failEachAllocation(
        [&lList] {
            try {
                lList.push_back(1);
            } catch (const ZTCNoMemoryEx& lrException) {
                EXPECT_STREQ("Out of Memory", lrException.what());
                EXPECT_EQ(2u, lrException.getError());
            }
        },
        [&lList] { EXPECT_EQ(0u, lList.size()); });
    EXPECT_EQ(1u, lFailures);
    EXPECT_EQ(1u, lList.size());
}
