// The adapters' library of the benchmarks: as many adapters as TAVIK_BENCH_ADAPTERS says (1 where it is not set), no
// threads, no events of its own.

#include <cstdint>
#include <cstdlib>

#include "libkpm/testing/include/SilentLibrary.h"

namespace {

std::uint32_t sGetNumberOfAdapters() {
    const char* const lpNumber = std::getenv("TAVIK_BENCH_ADAPTERS");
    return lpNumber == nullptr ? 1 : static_cast<std::uint32_t>(std::strtoul(lpNumber, nullptr, 10));
}

std::uint32_t sZtapiRegEvent(std::uint32_t, HBA_wwn, std::uint32_t, std::uint32_t, void*, std::uint32_t* apHandle,
                             KPM_ScopeCallback) {
    *apHandle = 1;
    return KPM_STATUS_SUCCESS;
}

std::uint32_t sKpmRegEvent(std::uint32_t, std::uint32_t, void*, std::uint32_t, KPM_EventCallback) {
    return 1;
}

constexpr KPM_FunctionList gcFunctions = makeSilentLibrary(sGetNumberOfAdapters, sZtapiRegEvent, sKpmRegEvent);

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    if (aVersion != KPM_INTERFACE_VERSION) {
        return 1;
    }
    *appList = &gcFunctions;
    return 0;
}
