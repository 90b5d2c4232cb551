#include "common/include/Types.h"

#include <gtest/gtest.h>

#include <limits>
#include <type_traits>

TEST(Types, ASizeFitsTheLengthFieldOnTheWire) {
    EXPECT_TRUE(std::is_unsigned_v<Size>);
    EXPECT_EQ(4294967295u, std::numeric_limits<Size>::max());
}
