/// The framework's plain number types.

#ifndef COMMON_INCLUDE_TYPES_H
#define COMMON_INCLUDE_TYPES_H

#include <cstdint>

/// A count of bytes or elements: 32 bits everywhere, so that it fits the fields on the wire.
using Size = std::uint32_t;

#endif
