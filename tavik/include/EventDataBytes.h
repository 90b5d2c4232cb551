/// Writing the fields of event-data records: little-endian integers and bit fields.
#ifndef TAVIK_INCLUDE_EVENTDATABYTES_H
#define TAVIK_INCLUDE_EVENTDATABYTES_H

#include <bit>
#include <cstring>

#include "common/include/Log.h"

/// Sets one bit: bit n lives in byte n / 8 at position n mod 8. The field is long enough for it.
inline void TavikSet_BitField(unsigned char* apField, unsigned int aBit) {
    ZT_ENTRY();
    apField[aBit / 8] = static_cast<unsigned char>(apField[aBit / 8] | 1U << aBit % 8);
    ZT_EXIT();
}

/// Sets every bit of so many bytes.
void TavikSet_AllBitField(unsigned char* apField, unsigned int aBytes);

/// Whether this host stores the least significant byte first. Any thread.
bool TavikIsLittleEndian();

/// Reverses so many bytes in place; nothing for fewer than 2.
void TavikReverseBytes(unsigned char* apBytes, unsigned int aCount);

/// Stores a 32-bit integer little-endian in four bytes.
inline void TavikStore32(unsigned char* apField, unsigned int aValue) {
    ZT_ENTRY();
    std::memcpy(apField, &aValue, sizeof aValue);
    if constexpr (std::endian::native != std::endian::little) {
        TavikReverseBytes(apField, sizeof aValue);
    }
    ZT_EXIT();
}

#endif
