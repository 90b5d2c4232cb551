#include "tests/support/Seed.h"

#include <gtest/gtest-spi.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <set>

class SeedTest : public testing::Test {
protected:
    void SetUp() override { unsetenv("ZT_TEST_SEED"); }
    void TearDown() override { unsetenv("ZT_TEST_SEED"); }
};

TEST_F(SeedTest, IsTheOneThatATestWantsAndOtherwiseAnotherInEachRun) {
    EXPECT_EQ(ZTCTestSeed(7).seed(), 7U);
    std::set<unsigned> lDrawn;
    for (int i = 0; i < 5; ++i) {
        lDrawn.insert(ZTCTestSeed().seed());
    }
    EXPECT_GT(lDrawn.size(), 1U);
}

TEST_F(SeedTest, TheEnvironmentRepeatsARun) {
    setenv("ZT_TEST_SEED", "4711", 1);
    ZTCTestSeed lFirst;
    ZTCTestSeed lSecond(7);
    EXPECT_EQ(lFirst.seed(), 4711U);
    EXPECT_EQ(chooseSeed(gcPictureSeed), 4711U);
    for (int i = 0; i < 100; ++i) {
        EXPECT_EQ(lFirst.below(1000), lSecond.below(1000));
    }
}

static void sFail() {
    const ZTCTestSeed lSeed(815);
    ADD_FAILURE() << "a failure";
}

TEST_F(SeedTest, AFailureSaysHowToRepeatTheRun) {
    EXPECT_NONFATAL_FAILURE(sFail(), "ZT_TEST_SEED=815");
}
