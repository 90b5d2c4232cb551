// The adapters' library of the benchmarks: as many adapters as TAVIK_BENCH_ADAPTERS says (1 where it is not set), no
// threads, no events of its own.

#include <cstdint>
#include <cstdlib>

#include "libkpm/testing/include/TestLibrary.h"

namespace {

class ZTCBenchLibkpm : public ZTCTestLibrary {
public:
    std::uint32_t getNumberOfAdapters() override {
        const char* const lpNumber = std::getenv("TAVIK_BENCH_ADAPTERS");
        return lpNumber == nullptr ? 1 : static_cast<std::uint32_t>(std::strtoul(lpNumber, nullptr, 10));
    }
};

ZTCBenchLibkpm sLibrary;

ZTCTestLibrary& sGet() {
    return sLibrary;
}

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    return sGet().getFunctionList(aVersion, gcTestLibraryList<sGet>, appList);
}
