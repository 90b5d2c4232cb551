#include "libkpm/common/include/Registry.h"

#include <gtest/gtest.h>

static void sOnScope(unsigned, HBA_wwn, unsigned, unsigned, void*, ZT_event*) {}

static ZTSLibraryRegistration sRegistration() {
    ZTSLibraryRegistration lRegistration;
    lRegistration.mpScopeCallback = &sOnScope;
    return lRegistration;
}

class LibraryRegistry : public testing::Test {
protected:
    ZTCLibraryRegistry mRegistry{3};
};

TEST_F(LibraryRegistry, EveryRegistrationHasAHandleOfItsOwnAndNeverZero) {
    const std::uint32_t lFirst = mRegistry.put(0, 0, sRegistration());
    const std::uint32_t lSecond = mRegistry.put(5, 2, sRegistration());
    EXPECT_NE(lFirst, 0u);
    EXPECT_NE(lSecond, 0u);
    EXPECT_NE(lFirst, lSecond);
    EXPECT_EQ(mRegistry.size(), 2u);
    EXPECT_EQ(mRegistry.findKind(5, lSecond), 2u);
    EXPECT_FALSE(mRegistry.findKind(0, lSecond).has_value()) << "another board's";
}

TEST_F(LibraryRegistry, TheNewestRegistrationOfAKindReplacesTheOlder) {
    const std::uint32_t lOld = mRegistry.put(0, 1, sRegistration());
    const std::uint32_t lNew = mRegistry.put(0, 1, sRegistration());
    EXPECT_EQ(mRegistry.size(), 1u);
    EXPECT_EQ(mRegistry.find(0, 1)->mHandle, lNew);
    EXPECT_FALSE(mRegistry.findKind(0, lOld).has_value());
    EXPECT_FALSE(mRegistry.remove(0, 1, lOld));
    EXPECT_TRUE(mRegistry.remove(0, 1, lNew));
    EXPECT_FALSE(mRegistry.remove(0, 1, lNew));
    EXPECT_FALSE(mRegistry.find(0, 1).has_value());
}

TEST_F(LibraryRegistry, AHandleThatIsGivenIsUsed) {
    EXPECT_EQ(mRegistry.put(0, 1, sRegistration(), 4711), 4711u);
    EXPECT_EQ(mRegistry.findKind(0, 4711), 1u);
}

TEST_F(LibraryRegistry, ABoardThatNobodyHasRegisteredForHasNothing) {
    EXPECT_FALSE(mRegistry.find(9, 0).has_value());
    EXPECT_FALSE(mRegistry.findKind(9, 1).has_value());
    EXPECT_FALSE(mRegistry.remove(9, 0, 1));
    EXPECT_THROW(
        {
            mRegistry.put(0, 0, sRegistration());
            mRegistry.find(0, 3);
        },
        std::out_of_range);
}
