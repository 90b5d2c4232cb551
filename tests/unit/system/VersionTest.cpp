#include "system/include/Version.h"

#include <gtest/gtest.h>

TEST(Version, TheTextIsTheFourNumbersWithDotsBetween) {
    EXPECT_STREQ(ZTCVersion(3, 0, 1, 2).getVersion().get(), "3.0.1.2");
    EXPECT_STREQ(ZTCVersion(4294967295u, 4294967295u, 4294967295u, 4294967295u).getVersion().get(),
                 "4294967295.4294967295.4294967295.4294967295");
}

TEST(Version, TheAgentHasItsOwn) {
    const ZTCVersion lcVersion(ZT_MAJOR_VERSION, ZT_MINOR_VERSION, ZT_REVISION_NO, ZT_BUILD_NO);
    EXPECT_STREQ(lcVersion.getVersion().get(), "3.0.1.2");
}
