#include "common/include/Map.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "common/include/Pointer.h"
#include "common/include/String.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/common/LogTesting.h"

namespace {

/// The log goes into a file of the test's own.
class Map : public testing::Test {
protected:
    Map() {
        getLogCode(mFormerCode);
        setLogCode(gcDefaultLogCode);
        setLogFilePath(mLogPath.c_str());
    }
    ~Map() override {
        setLogCode(mFormerCode);
        setLogFilePath("/dev/null");
    }

    ZTCTemporaryDirectory mDirectory;
    std::string mLogPath = mDirectory.path("log");
    unsigned mFormerCode = 0;
};

}  // namespace

TEST_F(Map, InsertingAKeyTwiceKeepsTheFirstValueAndThrows) {
    ZTCMap<int, ZTCString> lMap;
    lMap.insert(1, "first");
    try {
        lMap.insert(1, "second");
        FAIL() << "nothing thrown";
    } catch (const ZTCExistsEx& lrException) {
        EXPECT_STREQ("Element already exists in map.. can't insert", lrException.what());
        EXPECT_EQ(10u, lrException.getError());
    }
    EXPECT_STREQ("first", lMap.get(1).get());
    EXPECT_EQ(1u, lMap.size());
    const std::vector<std::string> lLines = linesOfFile(mLogPath);
    ASSERT_EQ(1u, lLines.size());
    EXPECT_EQ("-E- common/include/Map:# insert: Element already existed in the map",
              withoutLineNumber(withoutStamp(lLines[0])));
}

TEST_F(Map, GettingAMissingKeyThrowsAndLogsOnlyAtInfoLevel) {
    const ZTCMap<int, int> lMap;
    try {
        static_cast<void>(lMap.get(1));
        FAIL() << "nothing thrown";
    } catch (const ZTCNotFoundEx& lrException) {
        EXPECT_STREQ("No element for the key exists in map", lrException.what());
        EXPECT_EQ(8u, lrException.getError());
    }
    EXPECT_TRUE(linesOfFile(mLogPath).empty());

    setLogCode(gcDefaultLogCode | ZTLL_Info);
    EXPECT_THROW(static_cast<void>(lMap.get(1)), ZTCNotFoundEx);
    const std::vector<std::string> lLines = linesOfFile(mLogPath);
    ASSERT_EQ(1u, lLines.size());
    EXPECT_EQ("-I- common/include/Map:# get: Element does not exist in the map",
              withoutLineNumber(withoutStamp(lLines[0])));
}

TEST_F(Map, GettingWithoutThrowingYieldsNullAndTheSameLine) {
    ZTCMap<int, int> lMap;
    lMap.insert(1, 10);
    ASSERT_NE(nullptr, lMap.get(1, std::nothrow));
    EXPECT_EQ(10, *lMap.get(1, std::nothrow));
    setLogCode(gcDefaultLogCode | ZTLL_Info);
    EXPECT_EQ(nullptr, lMap.get(2, std::nothrow));
    EXPECT_THROW(static_cast<void>(lMap.get(2)), ZTCNotFoundEx);
    const std::vector<std::string> lLines = linesOfFile(mLogPath);
    ASSERT_EQ(2u, lLines.size());
    EXPECT_EQ(withoutStamp(lLines[0]), withoutStamp(lLines[1]));
}

TEST_F(Map, GetYieldsTheStoredValueItself) {
    ZTCMap<int, int> lMap;
    lMap.insert(1, 10);
    lMap.get(1) = 11;
    const ZTCMap<int, int>& lrConst = lMap;
    EXPECT_EQ(11, lrConst.get(1));
}

TEST_F(Map, HasKeyAndFindAnswerWithoutThrowing) {
    ZTCMap<ZTCString, int> lMap;
    lMap.insert("a", 1);
    EXPECT_TRUE(lMap.hasKey("a"));
    EXPECT_FALSE(lMap.hasKey("b"));
    EXPECT_EQ(1, lMap.find("a")->second);
    EXPECT_TRUE(lMap.end() == lMap.find("b"));
    EXPECT_TRUE(linesOfFile(mLogPath).empty());
}

TEST_F(Map, WalksInAscendingOrderOfTheKeys) {
    ZTCMap<int, int> lMap;
    for (int lKey : {3, 1, 2}) {
        lMap.insert(lKey, lKey * 10);
    }
    std::vector<int> lKeys;
    for (const auto& [lrKey, lrValue] : lMap) {
        EXPECT_EQ(lrKey * 10, lrValue);
        lKeys.push_back(lrKey);
    }
    EXPECT_EQ((std::vector<int>{1, 2, 3}), lKeys);
}

TEST_F(Map, ClearingReleasesThePointers) {
    ZTCPointer<int> lPointer(new int(1));
    std::vector<ZTCMap<int, ZTCPointer<int>>> lMaps(1);
    lMaps[0].insert(1, lPointer);
    EXPECT_EQ(lPointer.get(), lMaps[0].get(1).get());
    lMaps[0].clear();
    EXPECT_EQ(0u, lMaps[0].size());
    EXPECT_FALSE(lMaps[0].hasKey(1));
}

TEST_F(Map, SwapExchangesTheContentsWithoutAThrow) {
    ZTCMap<int, int> lFirst;
    ZTCMap<int, int> lSecond;
    lFirst.insert(1, 10);
    lSecond.insert(2, 20);
    lSecond.insert(3, 30);
    EXPECT_TRUE(noexcept(lFirst.swap(lSecond)));
    lFirst.swap(lSecond);
    EXPECT_EQ(2u, lFirst.size());
    EXPECT_EQ(10, lSecond.get(1));
}

TEST_F(Map, CopiesShareTheObjectsBehindThePointers) {
    ZTCMap<int, ZTCPointer<int>> lMap;
    lMap.insert(1, ZTCPointer<int>(new int(1)));
    ZTCMap<int, ZTCPointer<int>> lCopy(lMap);
    EXPECT_EQ(lMap.get(1).get(), lCopy.get(1).get());
}

TEST_F(Map, AFailedAllocationIsOutOfMemoryAndLeavesTheMapAlone) {
    ZTCMap<int, ZTCString> lMap;
    const ZTCString lValue("value");
    const unsigned lFailures = failEachAllocation(
        [&] {
            try {
                lMap.insert(1, lValue);
            } catch (const ZTCNoMemoryEx& lrException) {
                EXPECT_EQ(2u, lrException.getError());
            }
        },
        [&] { EXPECT_EQ(0u, lMap.size()); });
    EXPECT_EQ(1u, lMap.size());
    EXPECT_GE(lFailures, 2u) << "the map's own and the value's";
}
