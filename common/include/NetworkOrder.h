/// Numbers as bytes in network byte order, at any address.

#ifndef COMMON_INCLUDE_NETWORKORDER_H
#define COMMON_INCLUDE_NETWORKORDER_H

#include <bit>
#include <cstdint>
#include <cstring>
#include <type_traits>

/// The number with its bytes in network order, and back.
template <typename Number>
requires(std::is_unsigned_v<Number>) constexpr Number toNetworkOrder(Number aNumber) noexcept {
    if constexpr (std::endian::native == std::endian::big || sizeof(Number) == 1) {
        return aNumber;
    } else if constexpr (sizeof(Number) == 2) {
        return __builtin_bswap16(aNumber);
    } else if constexpr (sizeof(Number) == 4) {
        return __builtin_bswap32(aNumber);
    } else {
        static_assert(sizeof(Number) == 8);
        return __builtin_bswap64(aNumber);
    }
}

/// Stores the number's bytes and returns the address behind them.
template <typename Number>
unsigned char* storeInNetworkOrder(unsigned char* apBytes, Number aNumber) noexcept {
    const auto lBytes = toNetworkOrder(aNumber);
    std::memcpy(apBytes, &lBytes, sizeof(lBytes));
    return apBytes + sizeof(lBytes);
}

/// Loads a number from its bytes.
template <typename Number>
Number loadFromNetworkOrder(const unsigned char* apBytes) noexcept {
    Number lBytes;
    std::memcpy(&lBytes, apBytes, sizeof(lBytes));
    return toNetworkOrder(lBytes);
}

#endif
