#include "common/include/Memory.h"

#include <cstring>
#include <limits>

#include "common/include/Exception.h"

void* allocateZeroed(std::size_t aBytes) {
    // An empty block may be null, which would look like a failure.
    void* const lpBlock = std::malloc(ZT_MAX(aBytes, std::size_t{1}));
    if (lpBlock == nullptr) {
        throw ZTCNoMemoryEx();
    }
    std::memset(lpBlock, 0, aBytes);
    return lpBlock;
}

void* allocateZeroed(std::size_t aCount, std::size_t aElementBytes) {
    if (aElementBytes != 0 && aCount > std::numeric_limits<std::size_t>::max() / aElementBytes) {
        throw ZTCNoMemoryEx();
    }
    return allocateZeroed(aCount * aElementBytes);
}

void wipeMemory(void* apBlock, std::size_t aBytes) noexcept {
    explicit_bzero(apBlock, aBytes);
}
