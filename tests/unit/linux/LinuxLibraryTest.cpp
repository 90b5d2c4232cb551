// The shared library as a program loads it.
#include <gtest/gtest.h>

#include <cstdlib>

#include "tests/unit/libkpm/LibraryModule.h"
#include "tests/unit/linux/FakeKernel.h"

TEST(LinuxLibrary, IsLoadedOpenedClosedAndUnloadedAgainAndAgain) {
    ZTCFakeKernel lKernel;
    lKernel.addHost(0);
    lKernel.addHost(1);
    ::setenv("KPM_LINUX_SYSFS", lKernel.sysfs().c_str(), 1);
    ::setenv("KPM_LINUX_TRACEFS", (lKernel.tracefs() + "/nowhere").c_str(), 1);
    expectLoadsAgainAndAgain(TAVIK_LINUX_LIBRARY, 2);
}

TEST(LinuxLibrary, SpeaksOneVersionOnlyAndExportsOneSymbol) {
    const ZTCLibraryModule lModule(TAVIK_LINUX_LIBRARY);
    expectSpeaksOneVersion(lModule);
    EXPECT_EQ(lModule.find("_Z20getLinuxFunctionListv"), nullptr);
}
