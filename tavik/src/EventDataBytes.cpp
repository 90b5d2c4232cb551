#include "tavik/include/EventDataBytes.h"

#include <algorithm>
#include <cstring>

void TavikSet_BitField(unsigned char* apField, unsigned int aBit) {
    apField[aBit / 8] = static_cast<unsigned char>(apField[aBit / 8] | 1U << aBit % 8);
}

void TavikSet_AllBitField(unsigned char* apField, unsigned int aBytes) {
    std::memset(apField, 0xFF, aBytes);
}

bool TavikIsLittleEndian() {
    static const bool sIsLittleEndian = [] {
        const unsigned int lProbe = 0x12345678;
        unsigned char lFirstByte;
        std::memcpy(&lFirstByte, &lProbe, sizeof lFirstByte);
        return lFirstByte == 0x78;
    }();
    return sIsLittleEndian;
}

void TavikReverseBytes(unsigned char* apBytes, unsigned int aCount) {
    if (aCount >= 2) {
        std::reverse(apBytes, apBytes + aCount);
    }
}

void TavikStore32(unsigned char* apField, unsigned int aValue) {
    std::memcpy(apField, &aValue, sizeof aValue);
    if (!TavikIsLittleEndian()) {
        TavikReverseBytes(apField, sizeof aValue);
    }
}
