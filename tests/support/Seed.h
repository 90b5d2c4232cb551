/// The seed of a test with random choices: drawn anew in each run, or that of the environment variable ZT_TEST_SEED,
/// and printed where the test fails.
#ifndef TESTS_SUPPORT_SEED_H
#define TESTS_SUPPORT_SEED_H

#include <gtest/gtest.h>

#include <cstdlib>
#include <random>
#include <string>

class ZTCTestSeed {
public:
    ZTCTestSeed()
        : mSeed(drawSeed()),
          mEngine(mSeed),
          mTrace(__FILE__, __LINE__, "to repeat this: ZT_TEST_SEED=" + std::to_string(mSeed)) {}

    unsigned seed() const { return mSeed; }
    std::mt19937& engine() { return mEngine; }
    /// A number from 0 to `aBound` - 1.
    unsigned below(unsigned aBound) { return std::uniform_int_distribution<unsigned>(0, aBound - 1)(mEngine); }

private:
    static unsigned drawSeed() {
        const char* const lpGiven = std::getenv("ZT_TEST_SEED");
        return lpGiven != nullptr ? static_cast<unsigned>(std::strtoul(lpGiven, nullptr, 10)) : std::random_device()();
    }

    unsigned mSeed;
    std::mt19937 mEngine;
    testing::ScopedTrace mTrace;
};

#endif
