#include "sensor/client/include/FcName.h"

#include <string>

#include "sensor/client/include/ClientErrors.h"

static int sHexDigit(char aDigit) {
    if (aDigit >= '0' && aDigit <= '9') {
        return aDigit - '0';
    }
    if (aDigit >= 'a' && aDigit <= 'f') {
        return aDigit - 'a' + 10;
    }
    if (aDigit >= 'A' && aDigit <= 'F') {
        return aDigit - 'A' + 10;
    }
    return -1;
}

std::string ZTSFcName::toText() const {
    static constexpr char scDigits[] = "0123456789abcdef";
    std::string lText;
    for (const std::uint8_t lByte : mBytes) {
        if (!lText.empty()) {
            lText += ':';
        }
        lText += scDigits[lByte >> 4];
        lText += scDigits[lByte & 0x0F];
    }
    return lText;
}

ZTSFcName ZTSFcName::fromText(std::string_view aText) {
    const bool lHasColons = aText.size() == 23;
    std::string_view lDigits = aText;
    if (!lHasColons && (lDigits.starts_with("0x") || lDigits.starts_with("0X"))) {
        lDigits.remove_prefix(2);
    }
    ZTSFcName lName;
    bool lIsValid = lHasColons || lDigits.size() == 16;
    const std::size_t lStep = lHasColons ? 3 : 2;
    for (std::size_t i = 0; lIsValid && i < lName.mBytes.size(); ++i) {
        const int lHigh = sHexDigit(lDigits[i * lStep]);
        const int lLow = sHexDigit(lDigits[i * lStep + 1]);
        lIsValid = lHigh >= 0 && lLow >= 0 && (!lHasColons || i == 7 || lDigits[i * lStep + 2] == ':');
        lName.mBytes[i] = static_cast<std::uint8_t>(lHigh << 4 | lLow);
    }
    if (!lIsValid) {
        throw ZTCBadInputEx(
            "\"" + std::string(aText) +
            "\" is not a world wide name: wanted 8 hex pairs with colons, such as 50:06:01:60:3b:a0:12:34");
    }
    return lName;
}
