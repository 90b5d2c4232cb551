#include "sensor/agentcommon/include/WorldWideName.h"

ZTCString ZTCWorldWideName::getString() const {
    static constexpr char lcDigits[] = "0123456789abcdef";
    char lText[3 * gcLength];
    for (std::size_t lByte = 0; lByte < gcLength; ++lByte) {
        lText[3 * lByte] = lcDigits[mBytes[lByte] >> 4];
        lText[3 * lByte + 1] = lcDigits[mBytes[lByte] & 0x0F];
        lText[3 * lByte + 2] = lByte + 1 < gcLength ? ':' : '\0';
    }
    return ZTCString(lText);
}
