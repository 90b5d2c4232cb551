/// The seed of a test with random choices. It is that of the environment variable ZT_TEST_SEED, else the one that the
/// test asks for, else drawn anew in each run. It is printed where the test fails.
#ifndef TESTS_SUPPORT_SEED_H
#define TESTS_SUPPORT_SEED_H

#include <gtest/gtest.h>

#include <optional>
#include <random>
#include <string>

#include "tests/support/SeedChoice.h"

class ZTCTestSeed {
public:
    explicit ZTCTestSeed(std::optional<unsigned> aWanted = std::nullopt)
        : mSeed(chooseSeed(aWanted)),
          mEngine(mSeed),
          mTrace(__FILE__, __LINE__, "to repeat this: ZT_TEST_SEED=" + std::to_string(mSeed)) {}

    unsigned seed() const { return mSeed; }
    std::mt19937& engine() { return mEngine; }
    /// A number from 0 to `aBound` - 1.
    unsigned below(unsigned aBound) { return std::uniform_int_distribution<unsigned>(0, aBound - 1)(mEngine); }

private:
    unsigned mSeed;
    std::mt19937 mEngine;
    testing::ScopedTrace mTrace;
};

#endif
