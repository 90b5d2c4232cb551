#include "libkpm/common/include/PortName.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <iterator>

bool isSameName(const HBA_wwn& acrOne, const HBA_wwn& acrOther) {
    return std::memcmp(acrOne.wwn, acrOther.wwn, sizeof acrOne.wwn) == 0;
}

static bool sIsAll(const HBA_wwn& acrName, std::uint8_t aByte) {
    return std::all_of(std::begin(acrName.wwn), std::end(acrName.wwn),
                       [aByte](std::uint8_t aOther) { return aOther == aByte; });
}

bool isZeroName(const HBA_wwn& acrName) {
    return sIsAll(acrName, 0);
}

bool isName(const HBA_wwn& acrName) {
    return !sIsAll(acrName, 0) && !sIsAll(acrName, 0xFF);
}

std::string formatName(const HBA_wwn& acrName) {
    static constexpr char scDigits[] = "0123456789abcdef";
    std::string lText;
    for (const std::uint8_t lByte : acrName.wwn) {
        lText += lText.empty() ? "" : ":";
        lText += scDigits[lByte >> 4];
        lText += scDigits[lByte & 15];
    }
    return lText;
}
