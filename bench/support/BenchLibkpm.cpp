// The adapters' library of the benchmarks: as many adapters as TAVIK_BENCH_ADAPTERS says (1 where it is not set), no
// threads, no events of its own.

#include <cstdint>
#include <cstdlib>

#include "libkpm/include/libkpm.h"

namespace {

HBA_wwn sMakeName(std::uint64_t aValue) {
    HBA_wwn lName;
    for (unsigned i = 0; i < sizeof lName.wwn; ++i) {
        lName.wwn[i] = static_cast<std::uint8_t>(aValue >> 8 * (7 - i));
    }
    return lName;
}

std::uint32_t sInit() {
    return 0;
}

void sClose() {}

std::uint32_t sGetNumberOfAdapters() {
    const char* const lpNumber = std::getenv("TAVIK_BENCH_ADAPTERS");
    return lpNumber == nullptr ? 1 : static_cast<std::uint32_t>(std::strtoul(lpNumber, nullptr, 10));
}

std::uint32_t sIsZtapiSupported() {
    return 1;
}

std::uint32_t sGetAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    *apNodeName = sMakeName(0x20000000c9000000 + aIndex);
    *apPortName = sMakeName(0x10000000c9000000 + aIndex);
    return 0;
}

std::uint32_t sZtapiRegEvent(std::uint32_t, HBA_wwn, std::uint32_t, std::uint32_t, void*, std::uint32_t* apHandle,
                             KPM_ScopeCallback) {
    *apHandle = 1;
    return KPM_STATUS_SUCCESS;
}

std::uint32_t sZtapiUnregEvent(std::uint32_t, HBA_wwn, std::uint32_t) {
    return 0;
}

std::uint32_t sKpmRegEvent(std::uint32_t, std::uint32_t, void*, std::uint32_t, KPM_EventCallback) {
    return 1;
}

std::uint32_t sKpmUnregEvent(std::uint32_t, std::uint32_t) {
    return 0;
}

const KPM_FunctionList gcFunctions = {KPM_INTERFACE_VERSION,
                                      sizeof(KPM_FunctionList),
                                      sInit,
                                      sClose,
                                      sGetNumberOfAdapters,
                                      sIsZtapiSupported,
                                      sGetAdapterInfo,
                                      sZtapiRegEvent,
                                      sZtapiUnregEvent,
                                      sKpmRegEvent,
                                      sKpmUnregEvent,
                                      nullptr};

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    if (aVersion != KPM_INTERFACE_VERSION) {
        return 1;
    }
    *appList = &gcFunctions;
    return 0;
}
