/// Numbers in as few bytes as they need: seven bits a byte, the lowest first, the high bit set in all but the last.
#ifndef SENSOR_STORE_SRC_VARINT_H
#define SENSOR_STORE_SRC_VARINT_H

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "sensor/store/include/StoreErrors.h"

using ZTCStoreBytes = std::vector<std::uint8_t>;

/// Bytes of the largest number.
inline constexpr std::size_t gcMostVarintBytes = 10;

constexpr std::size_t countVarintBytes(std::uint64_t aValue) {
    std::size_t lBytes = 1;
    while (aValue >= 0x80) {
        aValue >>= 7;
        ++lBytes;
    }
    return lBytes;
}

/// There is room for it. Returns the place behind it.
inline std::uint8_t* writeVarint(std::uint8_t* apTo, std::uint64_t aValue) {
    while (aValue >= 0x80) {
        *apTo++ = static_cast<std::uint8_t>(aValue | 0x80);
        aValue >>= 7;
    }
    *apTo++ = static_cast<std::uint8_t>(aValue);
    return apTo;
}

inline void appendVarint(ZTCStoreBytes& arBytes, std::uint64_t aValue) {
    std::uint8_t lBytes[gcMostVarintBytes];
    arBytes.insert(arBytes.end(), lBytes, writeVarint(lBytes, aValue));
}

/// Takes a number off the front. Throws ZTCStoreDamagedEx where there is none.
inline std::uint64_t takeVarint(std::span<const std::uint8_t>& arBytes) {
    std::uint64_t lValue = 0;
    for (unsigned lShift = 0; lShift < 64 && !arBytes.empty(); lShift += 7) {
        const std::uint8_t lByte = arBytes.front();
        arBytes = arBytes.subspan(1);
        lValue |= static_cast<std::uint64_t>(lByte & 0x7F) << lShift;
        if (lByte < 0x80) {
            return lValue;
        }
    }
    throw ZTCStoreDamagedEx("history: a stored number ends early");
}

#endif
