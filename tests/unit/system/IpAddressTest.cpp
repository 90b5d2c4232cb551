#include "system/include/IpAddress.h"

#include <gtest/gtest.h>

TEST(IpAddress, ItKeepsItsText) {
    EXPECT_STREQ(ZTCIpAddress(ZTCString("192.0.2.7")).getText().get(), "192.0.2.7");
}
