/// Unsigned integers out of bytes that the kernel wrote: of any size it uses, at any address, in a byte order that is
/// named, so that bytes of one machine can be read on another.
#ifndef LIBKPM_LINUX_SRC_HOSTBYTES_H
#define LIBKPM_LINUX_SRC_HOSTBYTES_H

#include <bit>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

using ZTCByteSpan = std::span<const std::uint8_t>;

/// The `aSize` bytes (1, 2, 4 or 8) from `aOffset` on as a number; nothing where they are not all inside, or of another
/// size.
inline std::optional<std::uint64_t> loadUnsigned(ZTCByteSpan aBytes, std::size_t aOffset, std::size_t aSize,
                                                 std::endian aOrder) {
    if (aSize != 1 && aSize != 2 && aSize != 4 && aSize != 8) {
        return std::nullopt;
    }
    if (aOffset > aBytes.size() || aSize > aBytes.size() - aOffset) {
        return std::nullopt;
    }
    std::uint64_t lValue = 0;
    for (std::size_t lByte = 0; lByte < aSize; ++lByte) {
        const std::size_t lPlace = aOrder == std::endian::big ? lByte : aSize - 1 - lByte;
        lValue = lValue << 8 | aBytes[aOffset + lPlace];
    }
    return lValue;
}

#endif
