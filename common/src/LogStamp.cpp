#include "common/include/LogStamp.h"

#include <cstddef>

#include "common/include/LogLine.h"

namespace {

/// Writes a number with leading zeros. Returns the address behind it.
char* sPutNumber(char* apText, std::size_t aDigits, unsigned aNumber) noexcept {
    for (std::size_t lDigit = aDigits; lDigit > 0; --lDigit) {
        apText[lDigit - 1] = static_cast<char>('0' + aNumber % 10);
        aNumber /= 10;
    }
    return apText + aDigits;
}

/// The same for two digits, with a character in front of them.
char* sPutPair(char* apText, char aBefore, unsigned aNumber) noexcept {
    *apText = aBefore;
    return sPutNumber(apText + 1, 2, aNumber);
}

}  // namespace

void storeLogStamp(char* apStamp, const ZTCDateTime& acrTime) noexcept {
    static_assert(ZTCLogLine::gcStampLength == sizeof("YYYY-MM-DD HH:MM:SS.uuuuuu") - 1);
    apStamp = sPutNumber(apStamp, 4, acrTime.getYear());
    apStamp = sPutPair(apStamp, '-', acrTime.getMonth());
    apStamp = sPutPair(apStamp, '-', acrTime.getDay());
    apStamp = sPutPair(apStamp, ' ', acrTime.getHour());
    apStamp = sPutPair(apStamp, ':', acrTime.getMinute());
    apStamp = sPutPair(apStamp, ':', acrTime.getSecond());
    *apStamp = '.';
    sPutNumber(apStamp + 1, 6, acrTime.getMilliSeconds() * 1000u + acrTime.getMicroSeconds());
}
