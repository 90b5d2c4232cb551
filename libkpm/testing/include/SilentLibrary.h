/// What the adapters' libraries of the benchmarks and the fuzzers have in common: nothing to open, adapters named by
/// their number, no event. Their modules add how many adapters there are and what becomes of registrations.
#ifndef LIBKPM_TESTING_INCLUDE_SILENTLIBRARY_H
#define LIBKPM_TESTING_INCLUDE_SILENTLIBRARY_H

#include <cstdint>

#include "libkpm/include/libkpm.h"

constexpr HBA_wwn makeSilentName(std::uint64_t aValue) {
    HBA_wwn lName{};
    for (unsigned i = 0; i < sizeof lName.wwn; ++i) {
        lName.wwn[i] = static_cast<std::uint8_t>(aValue >> 8 * (7 - i));
    }
    return lName;
}

constexpr KPM_FunctionList makeSilentLibrary(std::uint32_t (*apGetNumberOfAdapters)(),
                                             decltype(KPM_FunctionList::ZtapiRegEvent) apZtapiRegEvent,
                                             decltype(KPM_FunctionList::KpmRegEvent) apKpmRegEvent) {
    return {.version = KPM_INTERFACE_VERSION,
            .size = sizeof(KPM_FunctionList),
            .Init = []() -> std::uint32_t { return 0; },
            .Close = [] {},
            .GetNumberOfAdapters = apGetNumberOfAdapters,
            .IsZtapiSupported = []() -> std::uint32_t { return 1; },
            .GetAdapterInfo = [](std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) -> std::uint32_t {
                *apNodeName = makeSilentName(0x20000000c9000000 + aIndex);
                *apPortName = makeSilentName(0x10000000c9000000 + aIndex);
                return 0;
            },
            .ZtapiRegEvent = apZtapiRegEvent,
            .ZtapiUnregEvent = [](std::uint32_t, HBA_wwn, std::uint32_t) -> std::uint32_t { return 0; },
            .KpmRegEvent = apKpmRegEvent,
            .KpmUnregEvent = [](std::uint32_t, std::uint32_t) -> std::uint32_t { return 0; },
            .SetLog = nullptr,
            .SetReport = nullptr};
}

#endif
