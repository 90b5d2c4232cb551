// The shared library as a program loads it.
#include <gtest/gtest.h>

#include <cstdlib>

#include "tests/unit/libkpm/LibraryModule.h"

TEST(Library, IsLoadedOpenedClosedAndUnloadedAgainAndAgain) {
    ::unsetenv("KPM_SIM_SCENARIO");
    ::unsetenv("KPM_SIM_SOCKET");
    expectLoadsAgainAndAgain(TAVIK_SIM_LIBRARY, 2);
}

TEST(Library, SpeaksOneVersionOnly) {
    expectSpeaksOneVersion(ZTCLibraryModule(TAVIK_SIM_LIBRARY));
}
