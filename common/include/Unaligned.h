/// Values at any address.

#ifndef COMMON_INCLUDE_UNALIGNED_H
#define COMMON_INCLUDE_UNALIGNED_H

#include <cstring>
#include <type_traits>

/// The value whose bytes begin at the address, in the byte order of this host. The address need not be aligned.
template <typename Value>
requires(std::is_trivially_copyable_v<Value>) Value loadUnaligned(const void* apBytes)
noexcept {
    Value lValue;
    std::memcpy(&lValue, apBytes, sizeof lValue);
    return lValue;
}

#endif
