#include "tavik/include/EventDataBytes.h"

#include <algorithm>
#include <cstring>

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
