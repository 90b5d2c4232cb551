// The shared library as a program loads it.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstdlib>

#include "libkpm/include/libkpm.h"
#include "tests/unit/linux/FakeKernel.h"

static KPM_GetFunctionListType sFind(void* apLibrary) {
    return reinterpret_cast<KPM_GetFunctionListType>(::dlsym(apLibrary, "KPM_GetFunctionList"));
}

TEST(LinuxLibrary, IsLoadedOpenedClosedAndUnloadedAgainAndAgain) {
    ZTCFakeKernel lKernel;
    lKernel.addHost(0);
    lKernel.addHost(1);
    ::setenv("KPM_LINUX_SYSFS", lKernel.sysfs().c_str(), 1);
    ::setenv("KPM_LINUX_TRACEFS", (lKernel.tracefs() + "/nowhere").c_str(), 1);
    for (int lRound = 0; lRound < 2; ++lRound) {
        void* lpLibrary = ::dlopen(TAVIK_LINUX_LIBRARY, RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(lpLibrary, nullptr) << ::dlerror();
        const KPM_GetFunctionListType lpGet = sFind(lpLibrary);
        ASSERT_NE(lpGet, nullptr);
        const KPM_FunctionList* lpList = nullptr;
        ASSERT_EQ(lpGet(KPM_INTERFACE_VERSION, &lpList), 0u);
        EXPECT_EQ(lpList->Init(), 0u);
        EXPECT_EQ(lpList->GetNumberOfAdapters(), 2u);
        lpList->Close();
        EXPECT_EQ(::dlclose(lpLibrary), 0);
        EXPECT_EQ(::dlopen(TAVIK_LINUX_LIBRARY, RTLD_NOW | RTLD_NOLOAD), nullptr) << "it stays loaded";
    }
}

TEST(LinuxLibrary, SpeaksOneVersionOnlyAndExportsOneSymbol) {
    void* lpLibrary = ::dlopen(TAVIK_LINUX_LIBRARY, RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(lpLibrary, nullptr) << ::dlerror();
    const KPM_GetFunctionListType lpGet = sFind(lpLibrary);
    ASSERT_NE(lpGet, nullptr);
    const KPM_FunctionList* lpList = nullptr;
    EXPECT_NE(lpGet(0, &lpList), 0u);
    EXPECT_NE(lpGet(2, &lpList), 0u);
    EXPECT_EQ(lpList, nullptr);
    EXPECT_NE(lpGet(1, nullptr), 0u);
    EXPECT_EQ(::dlsym(lpLibrary, "_Z20getLinuxFunctionListv"), nullptr);
    ::dlclose(lpLibrary);
}
