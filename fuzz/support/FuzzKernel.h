/// What two kernels said of themselves (tests/vm/captures), for fuzzers of what reads it.
#ifndef FUZZ_SUPPORT_FUZZKERNEL_H
#define FUZZ_SUPPORT_FUZZKERNEL_H

#include <bit>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "libkpm/linux/src/HostBytes.h"
#include "libkpm/linux/src/TraceFormat.h"

struct ZTSFuzzKernel {
    const char* mpName;
    ZTSTracePageLayout mPageLayout;
    ZTSScsiDoneLayout mDoneLayout;
};

/// Kernel 6.1 (0) or 6.12 (1), its descriptions read by the library's own reader, which must take them.
const ZTSFuzzKernel& getFuzzKernel(std::size_t aKernel);
inline constexpr std::size_t gcFuzzKernels = 2;

/// The number at a place that is known to be inside, by the definition: each byte times its weight.
std::uint64_t fuzzNumber(ZTCByteSpan aBytes, std::size_t aOffset, std::size_t aSize, std::endian aOrder);

inline bool isInside(ZTCByteSpan aBytes, std::size_t aOffset, std::size_t aSize) {
    return aOffset <= aBytes.size() && aSize <= aBytes.size() - aOffset;
}

#endif
