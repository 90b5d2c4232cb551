#include "system/include/ThreadPool.h"

#include <gtest/gtest.h>

TEST(ThreadPool, ItHoldsTheSlotsOfItsComponents) {
    ZTCThreadPool lPool{ZTCString("workers")};
    EXPECT_STREQ(lPool.getName().get(), "workers");
    EXPECT_EQ(lPool.getThreadComponents().size(), 0u);
    lPool.getThreadComponents().push_back(3);
    EXPECT_EQ(*lPool.getThreadComponents().begin(), 3u);
}
