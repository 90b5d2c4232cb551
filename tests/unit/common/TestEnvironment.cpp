// Settings of the whole test program.

#include <gtest/gtest.h>

namespace {

class ZTCDeathTestStyle : public testing::Environment {
public:
    // Death tests run in a process of their own from its start on, so that other threads do not matter.
    void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

[[maybe_unused]] const testing::Environment* const gcpStyle = testing::AddGlobalTestEnvironment(new ZTCDeathTestStyle);

}  // namespace
