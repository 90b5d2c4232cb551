#include "common/include/Exception.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>
#include <type_traits>

#include "tests/support/FailingAllocation.h"

namespace {

template <typename Base, typename Thrown>
testing::AssertionResult sIsCaughtAs(const char* apMessage, ZTError aError) {
    try {
        throw Thrown();
    } catch (const Base& lrException) {
        if (std::string(apMessage) == lrException.what() && aError == lrException.getError()) {
            return testing::AssertionSuccess();
        }
        return testing::AssertionFailure() << "caught with '" << lrException.what() << "', " << lrException.getError();
    } catch (...) {
        return testing::AssertionFailure() << "not caught";
    }
}

ZT_CLIB_EXCEPTION(ZTCSampleClibEx, ZTCExistsEx, "Sample exists", 161);
ZT_EXCEPTION(ZTCSampleDeeperEx, ZTCNoMemoryEx, "Sample deeper", 99);

}  // namespace

TEST(Exception, NoMemoryIsCaughtAsGenericAsHaltAndAsRoot) {
    EXPECT_TRUE((sIsCaughtAs<ZTCNoMemoryEx, ZTCNoMemoryEx>("Out of Memory", 2)));
    EXPECT_TRUE((sIsCaughtAs<ZTCGenericException, ZTCNoMemoryEx>("Out of Memory", 2)));
    EXPECT_TRUE((sIsCaughtAs<ZTCHaltEx, ZTCNoMemoryEx>("Out of Memory", 2)));
    EXPECT_TRUE((sIsCaughtAs<ZTCException, ZTCNoMemoryEx>("Out of Memory", 2)));
}

TEST(Exception, AnEmptyMessageStaysEmpty) {
    EXPECT_TRUE((sIsCaughtAs<ZTCHeartbeatFailedEx, ZTCHeartbeatFailedEx>("", 492)));
    EXPECT_TRUE((sIsCaughtAs<ZTCOpsException, ZTCHeartbeatFailedEx>("", 492)));
    EXPECT_STREQ("", ZTCHeartbeatFailedEx("", 492).what());
    EXPECT_STREQ("", ZTCException(nullptr, 1).what());
}

TEST(Exception, DefaultsAreThoseOfTheClass) {
    EXPECT_TRUE((sIsCaughtAs<ZTCGenericException, ZTCNotImplementedEx>("Not Implemented", 13)));
    EXPECT_TRUE((sIsCaughtAs<ZTCHaltEx, ZTCShutDownEx>("Shutting down Tavik", 19)));
    EXPECT_EQ(6u, ZTCInvalidEx().getError());
    EXPECT_EQ(8u, ZTCNotFoundEx().getError());
    EXPECT_EQ(10u, ZTCExistsEx().getError());
    EXPECT_EQ(19u, ZTCExitConditionEx().getError());
}

/// Whether Base is a virtual base: only from such a one no static_cast leads back.
template <typename Base, typename Derived>
concept ZTCIsVirtualBase = std::is_base_of_v<Base, Derived> && !requires(Base * apBase) {
    static_cast<Derived*>(apBase);
};

/// The bases of a class, each as "v" for a virtual one, "d" for a direct one, "-" for none: root, generic, halt,
/// operating system, operation, C library.
template <typename Class>
std::string sBasesOf() {
    const auto lSort = [](bool aIsBase, bool aIsVirtual) { return aIsVirtual ? 'v' : aIsBase ? 'd' : '-'; };
    return {lSort(std::is_base_of_v<ZTCException, Class>, ZTCIsVirtualBase<ZTCException, Class>),
            lSort(std::is_base_of_v<ZTCGenericException, Class>, ZTCIsVirtualBase<ZTCGenericException, Class>),
            lSort(std::is_base_of_v<ZTCHaltEx, Class>, ZTCIsVirtualBase<ZTCHaltEx, Class>),
            lSort(std::is_base_of_v<ZTCOsException, Class>, ZTCIsVirtualBase<ZTCOsException, Class>),
            lSort(std::is_base_of_v<ZTCOpsException, Class>, ZTCIsVirtualBase<ZTCOpsException, Class>),
            lSort(std::is_base_of_v<ZTCClibEx, Class>, ZTCIsVirtualBase<ZTCClibEx, Class>)};
}

TEST(Exception, EachClassHasItsBasesAndAllOfThemAreVirtual) {
    for (const std::string& lcrOfFirstRow :
         {sBasesOf<ZTCGenericException>(), sBasesOf<ZTCHaltEx>(), sBasesOf<ZTCOsException>(),
          sBasesOf<ZTCOpsException>(), sBasesOf<ZTCClibEx>()}) {
        EXPECT_EQ('v', lcrOfFirstRow.front());
        EXPECT_EQ(4, std::count(lcrOfFirstRow.begin(), lcrOfFirstRow.end(), '-')) << "no other base of the row";
    }
    // Root, generic, halt, operating system, operation, C library.
    EXPECT_EQ("vvv---", sBasesOf<ZTCNoMemoryEx>());
    EXPECT_EQ("vv----", sBasesOf<ZTCInvalidEx>());
    EXPECT_EQ("vv----", sBasesOf<ZTCNotFoundEx>());
    EXPECT_EQ("vv----", sBasesOf<ZTCExistsEx>());
    EXPECT_EQ("vv----", sBasesOf<ZTCNotImplementedEx>());
    EXPECT_EQ("vvv---", sBasesOf<ZTCExitConditionEx>());
    EXPECT_EQ("vvv---", sBasesOf<ZTCShutDownEx>());
    EXPECT_EQ("vvv---", sBasesOf<ZTCQuitThreadEx>());
    EXPECT_EQ("v--v--", sBasesOf<ZTCTimeOutEx>());
    EXPECT_EQ("v---v-", sBasesOf<ZTCHeartbeatFailedEx>());
    EXPECT_EQ("v----v", sBasesOf<ZTCClibStatFailedEx>());
    EXPECT_EQ("v----v", sBasesOf<ZTCClibUtimeFailedEx>());
    EXPECT_EQ("v----v", sBasesOf<ZTCClibGetProcStatusFailedEx>());
}

TEST(Exception, FrameworkClassesCarryTheirSegment) {
    EXPECT_EQ(1u, ZT_ERRCODE_SEGMENT(ZTCClibOpenFailedEx().getError()));
    EXPECT_EQ(1u, ZT_ERRCODE_SEGMENT(ZTCClibStatFailedEx().getError()));
    EXPECT_EQ(2u, ZT_ERRCODE_SEGMENT(ZTCTimeOutEx().getError()));
    EXPECT_EQ(2u, ZT_ERRCODE_SEGMENT(ZTCOsMutexEx().getError()));
    EXPECT_EQ(3u, ZT_ERRCODE_SEGMENT(ZTCHeartbeatFailedEx().getError()));
}

TEST(Exception, EveryClibExceptionSaysWhatFailedUnderACodeOfItsOwn) {
    const ZTCClibEx lcExceptions[] = {
        ZTCClibStatFailedEx(),  ZTCClibUtimeFailedEx(),    ZTCClibGetProcStatusFailedEx(), ZTCClibOpenFailedEx(),
        ZTCClibCloseFailedEx(), ZTCClibReadFailedEx(),     ZTCClibWriteFailedEx(),         ZTCClibMkfifoFailedEx(),
        ZTCClibMkdirFailedEx(), ZTCClibUnlinkFailedEx(),   ZTCClibLockFailedEx(),          ZTCClibForkFailedEx(),
        ZTCClibPollFailedEx(),  ZTCClibSignalFailedEx(),   ZTCClibKillFailedEx(),          ZTCClibEventFailedEx(),
        ZTCClibDupFailedEx(),   ZTCClibTruncateFailedEx(), ZTCClibSessionFailedEx()};
    std::set<unsigned> lCodes;
    for (const ZTCClibEx& lcrException : lcExceptions) {
        EXPECT_THAT(lcrException.what(), testing::HasSubstr(" failed"));
        EXPECT_EQ(1u, ZT_ERRCODE_SEGMENT(lcrException.getError())) << lcrException.what();
        EXPECT_TRUE(lCodes.insert(lcrException.getError()).second) << lcrException.what();
    }
}

TEST(Exception, AClibExceptionHasBothBasesAndOneText) {
    EXPECT_TRUE((sIsCaughtAs<ZTCExistsEx, ZTCSampleClibEx>("Sample exists", 161)));
    EXPECT_TRUE((sIsCaughtAs<ZTCGenericException, ZTCSampleClibEx>("Sample exists", 161)));
    EXPECT_TRUE((sIsCaughtAs<ZTCClibEx, ZTCSampleClibEx>("Sample exists", 161)));
    EXPECT_TRUE((sIsCaughtAs<ZTCException, ZTCSampleClibEx>("Sample exists", 161)));
}

TEST(Exception, DeeperDerivationStillHasOneText) {
    EXPECT_TRUE((sIsCaughtAs<ZTCHaltEx, ZTCSampleDeeperEx>("Sample deeper", 99)));
    EXPECT_TRUE((sIsCaughtAs<ZTCException, ZTCSampleDeeperEx>("Sample deeper", 99)));
}

TEST(Exception, OwnsItsText) {
    char lText[] = "first";
    const ZTCInvalidEx lException(lText, 7);
    lText[0] = 'X';
    EXPECT_STREQ("first", lException.what());
    EXPECT_EQ(7u, lException.getError());
}

TEST(Exception, HoldsAtLeast255CharactersAndCutsLongerTexts) {
    EXPECT_EQ(std::string(255, 'a'), ZTCInvalidEx(std::string(255, 'a').c_str()).what());

    const std::size_t lCapacity = ZTCException::gcMessageCapacity;
    EXPECT_EQ(std::string(lCapacity - 1, 'b'), ZTCInvalidEx(std::string(lCapacity - 1, 'b').c_str()).what());
    EXPECT_EQ(std::string(lCapacity - 1, 'c'), ZTCInvalidEx(std::string(lCapacity, 'c').c_str()).what());
    EXPECT_EQ(std::string(lCapacity - 1, 'd'), ZTCInvalidEx(std::string(lCapacity * 3, 'd').c_str()).what());
}

TEST(Exception, CopiesCarryTextAndCode) {
    ZTCNotFoundEx lFirst("first", 1);
    const ZTCNotFoundEx lCopy(lFirst);
    EXPECT_STREQ("first", lCopy.what());
    EXPECT_EQ(1u, lCopy.getError());
    lFirst = ZTCNotFoundEx("second", 2);
    EXPECT_STREQ("second", lFirst.what());
    EXPECT_EQ(2u, lFirst.getError());
    EXPECT_STREQ("first", lCopy.what());
}

TEST(Exception, AskingNeitherThrowsNorAllocates) {
    const ZTCException* lpException = nullptr;
    ZTCFailingAllocation lFailure(1);
    const ZTCNoMemoryEx lException("Out of Memory", 2);
    const ZTCNoMemoryEx lCopy(lException);
    lpException = &lCopy;
    const char* const lpText = lpException->what();
    EXPECT_FALSE(lFailure.hasFailed());
    EXPECT_STREQ("Out of Memory", lpText);
    EXPECT_TRUE(noexcept(lpException->what()));
    EXPECT_TRUE(noexcept(lpException->getError()));
}
