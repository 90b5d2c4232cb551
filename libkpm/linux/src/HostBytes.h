/// Unsigned integers out of bytes that the kernel wrote: of any size it uses, at any address, in a byte order that is
/// named, so that bytes of one machine can be read on another.
#ifndef LIBKPM_LINUX_SRC_HOSTBYTES_H
#define LIBKPM_LINUX_SRC_HOSTBYTES_H

#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <optional>
#include <span>

using ZTCByteSpan = std::span<const std::uint8_t>;

/// Reads a number of the type's size at this place, in this byte order.
template <class Number>
std::uint64_t loadNumber(const std::uint8_t* apPlace, std::endian aOrder) {
    Number lNumber = 0;
    std::memcpy(&lNumber, apPlace, sizeof lNumber);
    if (aOrder == std::endian::native) {
        return lNumber;
    }
    std::uint64_t lSwapped = 0;
    for (std::size_t lByte = 0; lByte < sizeof lNumber; ++lByte) {
        lSwapped = lSwapped << 8 | (std::uint64_t{lNumber} >> (8 * lByte) & 0xFF);
    }
    return lSwapped;
}

/// The `aSize` bytes (1, 2, 4 or 8) from `aOffset` on as a number; nothing where they are not all inside, or of another
/// size.
inline std::optional<std::uint64_t> loadUnsigned(ZTCByteSpan aBytes, std::size_t aOffset, std::size_t aSize,
                                                 std::endian aOrder) {
    if (aOffset > aBytes.size() || aSize > aBytes.size() - aOffset) {
        return std::nullopt;
    }
    const std::uint8_t* lpPlace = aBytes.data() + aOffset;
    switch (aSize) {
        case 1:
            return *lpPlace;
        case 2:
            return loadNumber<std::uint16_t>(lpPlace, aOrder);
        case 4:
            return loadNumber<std::uint32_t>(lpPlace, aOrder);
        case 8:
            return loadNumber<std::uint64_t>(lpPlace, aOrder);
        default:
            return std::nullopt;
    }
}

#endif
