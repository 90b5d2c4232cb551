/// The frame of a message on the FIFOs.

#ifndef COMMON_INCLUDE_FRAMING_H
#define COMMON_INCLUDE_FRAMING_H

#include <cstdint>

/// Bytes of the length field in front of every frame. The length does not count them.
inline constexpr std::uint32_t gcFrameHeaderSize = 4;

/// Largest body of a request frame in bytes; the least is 1. A response frame has no bound but its 32-bit length.
inline constexpr std::uint32_t gcMaxRequestSize = 1048576;

#endif
