// The one symbol of libkpm-scripted.so, and the end of its library.
#include "tests/support/ScriptedLibkpm.h"

static ZTCScriptedLibkpm* spLibrary = nullptr;

static ZTCTestLibrary& sGetLibrary() {
    return *spLibrary;
}

// Runs when the library is unloaded, and when the process exits. In the second case threads may be running: nothing is
// joined, nothing is freed.
__attribute__((destructor)) static void sUnload() {
    if (spLibrary != nullptr && !spLibrary->isOpen()) {
        spLibrary->record("Unloaded");
        delete spLibrary;
        spLibrary = nullptr;
    }
}

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    constexpr const KPM_FunctionList& lcrList = gcTestLibraryList<sGetLibrary>;
    if (spLibrary == nullptr) {
        spLibrary = new ZTCScriptedLibkpm(lcrList);
    }
    return spLibrary->getFunctionList(aVersion, lcrList, appList);
}
