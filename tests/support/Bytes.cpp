#include "tests/support/Bytes.h"

#include <algorithm>
#include <cstring>
#include <iterator>
#include <stdexcept>

ZTSWwn makeWwn(std::uint64_t aValue) {
    ZTSWwn lName;
    for (std::size_t i = 0; i < lName.mBytes.size(); ++i) {
        lName.mBytes[i] = static_cast<unsigned char>(aValue >> (8 * (7 - i)));
    }
    return lName;
}

static const char* const scHexDigits = "0123456789abcdef";

std::string wwnText(const ZTSWwn& acrName) {
    std::string lText;
    for (unsigned char lByte : acrName.mBytes) {
        if (!lText.empty()) {
            lText += ':';
        }
        lText += scHexDigits[lByte >> 4];
        lText += scHexDigits[lByte & 0x0F];
    }
    return lText;
}

std::string hexOf(const ZTCBytes& acrBytes) {
    std::string lText;
    lText.reserve(acrBytes.size() * 2);
    for (unsigned char lByte : acrBytes) {
        lText += scHexDigits[lByte >> 4];
        lText += scHexDigits[lByte & 0x0F];
    }
    return lText;
}

static unsigned sDigitValue(char aDigit) {
    if (aDigit >= '0' && aDigit <= '9') {
        return static_cast<unsigned>(aDigit - '0');
    }
    if (aDigit >= 'a' && aDigit <= 'f') {
        return static_cast<unsigned>(aDigit - 'a') + 10;
    }
    if (aDigit >= 'A' && aDigit <= 'F') {
        return static_cast<unsigned>(aDigit - 'A') + 10;
    }
    throw std::runtime_error(std::string("not a hex digit: ") + aDigit);
}

ZTCBytes bytesOf(std::string_view aHex) {
    ZTCBytes lBytes;
    bool lIsHigh = true;
    unsigned lHigh = 0;
    for (char lDigit : aHex) {
        if (lDigit == ' ') {
            continue;
        }
        if (lIsHigh) {
            lHigh = sDigitValue(lDigit);
        } else {
            lBytes.push_back(static_cast<unsigned char>(lHigh << 4 | sDigitValue(lDigit)));
        }
        lIsHigh = !lIsHigh;
    }
    if (!lIsHigh) {
        throw std::runtime_error("odd number of hex digits");
    }
    return lBytes;
}

ZTCByteWriter& ZTCByteWriter::u8(unsigned aValue) {
    mBytes.push_back(static_cast<unsigned char>(aValue));
    return *this;
}

ZTCByteWriter& ZTCByteWriter::u16(unsigned aValue) {
    return u8(aValue >> 8 & 0xFF).u8(aValue & 0xFF);
}

ZTCByteWriter& ZTCByteWriter::u32(std::uint64_t aValue) {
    return u16(static_cast<unsigned>(aValue >> 16 & 0xFFFF)).u16(static_cast<unsigned>(aValue & 0xFFFF));
}

ZTCByteWriter& ZTCByteWriter::le32(std::uint64_t aValue) {
    for (unsigned i = 0; i < 4; ++i) {
        u8(static_cast<unsigned>(aValue >> (8 * i) & 0xFF));
    }
    return *this;
}

ZTCByteWriter& ZTCByteWriter::host32(std::uint64_t aValue) {
    const auto lValue = static_cast<std::uint32_t>(aValue);
    unsigned char lBytes[sizeof(lValue)];
    std::memcpy(lBytes, &lValue, sizeof(lValue));
    mBytes.insert(mBytes.end(), std::begin(lBytes), std::end(lBytes));
    return *this;
}

ZTCByteWriter& ZTCByteWriter::wwn(const ZTSWwn& acrName) {
    mBytes.insert(mBytes.end(), acrName.mBytes.begin(), acrName.mBytes.end());
    return *this;
}

ZTCByteWriter& ZTCByteWriter::raw(const ZTCBytes& acrBytes) {
    mBytes.insert(mBytes.end(), acrBytes.begin(), acrBytes.end());
    return *this;
}

ZTCByteWriter& ZTCByteWriter::fill(std::size_t aCount, unsigned char aByte) {
    mBytes.insert(mBytes.end(), aCount, aByte);
    return *this;
}

ZTCByteWriter& ZTCByteWriter::bitField(const std::vector<unsigned>& acrBits) {
    ZTCBytes lField(32, 0);
    for (const unsigned lBit : acrBits) {
        lField.at(lBit / 8) = static_cast<unsigned char>(lField.at(lBit / 8) | 1u << lBit % 8);
    }
    return raw(lField);
}

std::uint64_t ZTCByteReader::number(std::size_t aCount) {
    std::uint64_t lValue = 0;
    for (unsigned char lByte : raw(aCount)) {
        lValue = lValue << 8 | lByte;
    }
    return lValue;
}

ZTCBytes ZTCByteReader::raw(std::size_t aCount) {
    if (remaining() < aCount) {
        throw std::runtime_error("message ends " + std::to_string(aCount - remaining()) + " bytes early, at offset " +
                                 std::to_string(mPosition));
    }
    const auto lBegin = mBytes.begin() + static_cast<std::ptrdiff_t>(mPosition);
    mPosition += aCount;
    return ZTCBytes(lBegin, lBegin + static_cast<std::ptrdiff_t>(aCount));
}

ZTSWwn ZTCByteReader::wwn() {
    const ZTCBytes lBytes = raw(8);
    ZTSWwn lName;
    std::copy(lBytes.begin(), lBytes.end(), lName.mBytes.begin());
    return lName;
}

std::string ZTCByteReader::string() {
    const ZTCBytes lBytes = raw(u32());
    return std::string(lBytes.begin(), lBytes.end());
}
