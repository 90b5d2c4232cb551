#include "sensor/agentcommon/include/WorldWideName.h"

ZTCString ZTCWorldWideName::getString() const {
    char lText[gcStringLength];
    storeString(lText);
    return ZTCString(lText, sizeof lText);
}

char* ZTCWorldWideName::storeString(char* apText) const noexcept {
    static constexpr char lcDigits[] = "0123456789abcdef";
    for (unsigned lByte = 0; lByte < gcLength; ++lByte) {
        if (lByte != 0) {
            *apText++ = ':';
        }
        *apText++ = lcDigits[mBytes[lByte] >> 4];
        *apText++ = lcDigits[mBytes[lByte] & 0x0F];
    }
    return apText;
}
