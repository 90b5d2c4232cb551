#include "common/include/String.h"

#include <gtest/gtest.h>

#include <map>
#include <string>

#include "tests/support/FailingAllocation.h"

TEST(String, EqualTextsAreEqualStrings) {
    EXPECT_TRUE(ZTCString("abc") == ZTCString("abc"));
    EXPECT_FALSE(ZTCString("abc") == ZTCString("abd"));
    EXPECT_FALSE(ZTCString("abc") == ZTCString("ab"));
    EXPECT_TRUE(ZTCString("") == ZTCString());
}

TEST(String, EqualityEndsAtTheFirstZeroByteAndOrderDoesNot) {
    const ZTCString lFirst("ab\0c", 4);
    const ZTCString lSecond("ab\0d", 4);
    EXPECT_TRUE(lFirst == lSecond);
    EXPECT_TRUE(lFirst < lSecond);
    EXPECT_EQ(4u, lFirst.length());
}

TEST(String, AssignedTextsAreNotShared) {
    ZTCString lSource("old");
    ZTCString lTarget("other");
    lTarget = lSource;
    lSource = ZTCString("new");
    EXPECT_STREQ("old", lTarget.get());
    EXPECT_STREQ("new", lSource.get());
}

TEST(String, CopiedTextsAreNotShared) {
    ZTCString lSource("old");
    const ZTCString lCopy(lSource);
    lSource.get()[0] = 'X';
    EXPECT_STREQ("Xld", lSource.get());
    EXPECT_STREQ("old", lCopy.get());
    EXPECT_NE(static_cast<const ZTCString&>(lSource).get(), lCopy.get());
}

TEST(String, AssigningToItselfKeepsTheText) {
    ZTCString lString("same");
    const char* const lpBefore = lString.get();
    const ZTCString& lrSame = lString;
    lString = lrSame;
    EXPECT_EQ(lpBefore, lString.get());
    EXPECT_STREQ("same", lString.get());
}

TEST(String, OrdersLexicographically) {
    EXPECT_TRUE(ZTCString("a") < ZTCString("b"));
    EXPECT_TRUE(ZTCString("a") < ZTCString("aa"));
    EXPECT_FALSE(ZTCString("a") < ZTCString("a"));
    EXPECT_FALSE(ZTCString("b") < ZTCString("a"));
    std::map<ZTCString, int> lMap{{"b", 2}, {"a", 1}};
    EXPECT_EQ(1, lMap.begin()->second);
}

TEST(String, AddingJoinsTheTexts) {
    const ZTCString lDirectory("/var/sensor");
    EXPECT_STREQ("/var/sensor/qrv-sn.pid", (lDirectory + "/qrv-sn.pid").get());
    EXPECT_STREQ("/var/sensor", lDirectory.get());
    const ZTCString lZeros("a\0", 2);
    EXPECT_EQ(4u, (lZeros + lZeros).length());
}

TEST(String, ANullTextIsInvalid) {
    const char* const lpNull = nullptr;
    EXPECT_THROW(ZTCString{lpNull}, ZTCInvalidEx);
    EXPECT_THROW(ZTCString(lpNull, 3), ZTCInvalidEx);
    EXPECT_STREQ("", ZTCString(lpNull, 0).get());
}

TEST(String, EveryFailedAllocationIsOutOfMemoryAndLeavesTheStringAlone) {
    const std::string lLong(100, 'x');
    const ZTCString lSource(lLong.c_str());
    ZTCString lTarget("target");
    bool lIsDone = false;
    const unsigned lFailures = failEachAllocation(
        [&] {
            try {
                ZTCString lMade(lLong.c_str());
                ZTCString lCopy(lMade);
                ZTCString lSum(lCopy + lMade);
                lTarget = lSource;
                lIsDone = true;
            } catch (const ZTCNoMemoryEx&) {
            }
        },
        [&] {
            EXPECT_FALSE(lIsDone);
            EXPECT_STREQ("target", lTarget.get());
        });
    EXPECT_TRUE(lIsDone);
    EXPECT_TRUE(lTarget == lSource);
    EXPECT_GE(lFailures, 12u) << "object, text and count of each string";
}
