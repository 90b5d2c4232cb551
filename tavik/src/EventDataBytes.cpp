#include "tavik/include/EventDataBytes.h"

#include <algorithm>
#include <cstring>

void TavikSet_AllBitField(unsigned char* apField, unsigned int aBytes) {
    ZT_ENTRY();
    std::memset(apField, 0xFF, aBytes);
    ZT_EXIT();
}

bool TavikIsLittleEndian() {
    ZT_ENTRY();
    static const bool sIsLittleEndian = [] {
        const unsigned int lProbe = 0x12345678;
        unsigned char lFirstByte;
        std::memcpy(&lFirstByte, &lProbe, sizeof lFirstByte);
        return lFirstByte == 0x78;
    }();
    ZT_EXIT();
    return sIsLittleEndian;
}

void TavikReverseBytes(unsigned char* apBytes, unsigned int aCount) {
    ZT_ENTRY();
    if (aCount >= 2) {
        std::reverse(apBytes, apBytes + aCount);
    }
    ZT_EXIT();
}
