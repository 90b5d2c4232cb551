/// An adapters' library as a program loads it, for tests of the shared libraries that are built here.
#ifndef TESTS_UNIT_LIBKPM_LIBRARYMODULE_H
#define TESTS_UNIT_LIBKPM_LIBRARYMODULE_H

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstdint>

#include "libkpm/include/libkpm.h"

class ZTCLibraryModule {
public:
    explicit ZTCLibraryModule(const char* apPath) : mpLibrary(::dlopen(apPath, RTLD_NOW | RTLD_LOCAL)) {
        EXPECT_NE(mpLibrary, nullptr) << ::dlerror();
    }
    ~ZTCLibraryModule() {
        if (mpLibrary != nullptr) {
            EXPECT_EQ(::dlclose(mpLibrary), 0);
        }
    }
    ZTCLibraryModule(const ZTCLibraryModule&) = delete;
    ZTCLibraryModule& operator=(const ZTCLibraryModule&) = delete;

    /// Null: the library does not export it.
    void* find(const char* apSymbol) const { return mpLibrary != nullptr ? ::dlsym(mpLibrary, apSymbol) : nullptr; }
    KPM_GetFunctionListType getEntry() const {
        return reinterpret_cast<KPM_GetFunctionListType>(find("KPM_GetFunctionList"));
    }

private:
    void* const mpLibrary;
};

/// Loads, opens, closes and unloads the library twice. It has so many adapters.
inline void expectLoadsAgainAndAgain(const char* apPath, std::uint32_t aAdapters) {
    for (int lRound = 0; lRound < 2; ++lRound) {
        {
            const ZTCLibraryModule lModule(apPath);
            ASSERT_NE(lModule.getEntry(), nullptr);
            const KPM_FunctionList* lpList = nullptr;
            ASSERT_EQ(lModule.getEntry()(KPM_INTERFACE_VERSION, &lpList), 0u);
            EXPECT_EQ(lpList->Init(), 0u);
            EXPECT_EQ(lpList->GetNumberOfAdapters(), aAdapters);
            lpList->Close();
        }
        EXPECT_EQ(::dlopen(apPath, RTLD_NOW | RTLD_NOLOAD), nullptr) << "it stays loaded";
    }
}

inline void expectSpeaksOneVersion(const ZTCLibraryModule& acrModule) {
    ASSERT_NE(acrModule.getEntry(), nullptr);
    const KPM_FunctionList* lpList = nullptr;
    EXPECT_NE(acrModule.getEntry()(0, &lpList), 0u);
    EXPECT_NE(acrModule.getEntry()(2, &lpList), 0u);
    EXPECT_EQ(lpList, nullptr);
    EXPECT_NE(acrModule.getEntry()(1, nullptr), 0u);
}

#endif
