/// Where the random choices of tests get their seed. Tests use the class in Seed.h, which also prints it. This function
/// is for programs without GoogleTest.
#ifndef TESTS_SUPPORT_SEEDCHOICE_H
#define TESTS_SUPPORT_SEEDCHOICE_H

#include <cstdlib>
#include <optional>
#include <random>

/// Of the history that the check of the page makes its pictures from. It is always the same: a picture that differs
/// from an older one then shows a change of the page, and not other events.
inline constexpr unsigned gcPictureSeed = 20260304;

/// The seed of the environment variable ZT_TEST_SEED, else the wanted one, else one that is drawn anew.
inline unsigned chooseSeed(std::optional<unsigned> aWanted = std::nullopt) {
    if (const char* const lpGiven = std::getenv("ZT_TEST_SEED")) {
        return static_cast<unsigned>(std::strtoul(lpGiven, nullptr, 10));
    }
    return aWanted ? *aWanted : std::random_device()();
}

#endif
