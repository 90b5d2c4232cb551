/// The border between a fuzzer and the module libkpm-fuzz: what the module answers stands in one structure, to which
/// its second symbol gives the way.
#ifndef FUZZ_SUPPORT_FUZZLIBKPM_H
#define FUZZ_SUPPORT_FUZZLIBKPM_H

#include <cstdint>

struct ZTSFuzzLibkpm {
    std::uint32_t mAdapters = 1;
    /// Statuses of the registrations, taken in turn and over again; 0 everywhere where there are none. For a
    /// registration without a status every other one than 0 is a failure.
    const std::uint8_t* mpStatuses = nullptr;
    std::uint32_t mStatusCount = 0;
    std::uint32_t mRegistrations = 0;  ///< how many there were
};

inline constexpr const char* gcFuzzLibkpmSymbol = "FuzzLibkpm_get";
using ZTPFuzzLibkpm = ZTSFuzzLibkpm* (*)();

#endif
