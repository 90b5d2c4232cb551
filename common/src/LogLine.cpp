#include "common/include/LogLine.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

/// Text of a bounded length that is being made. It is not terminated.
class ZTCShortText {
public:
    ZTCShortText(char* apText, std::size_t aCapacity) noexcept : mpText(apText), mCapacity(aCapacity) {}

    bool add(const char* apBytes, std::size_t aCount) noexcept {
        if (aCount > mCapacity - mLength) {
            return false;
        }
        std::memcpy(mpText + mLength, apBytes, aCount);
        mLength += aCount;
        return true;
    }

    bool addNumber(unsigned long aNumber, bool aIsNegative = false) noexcept {
        char lDigits[24];
        char* lpBegin = lDigits + sizeof(lDigits);
        do {
            *--lpBegin = static_cast<char>('0' + aNumber % 10);
            aNumber /= 10;
        } while (aNumber != 0);
        if (aIsNegative) {
            *--lpBegin = '-';
        }
        return add(lpBegin, static_cast<std::size_t>(lDigits + sizeof(lDigits) - lpBegin));
    }

    bool addNumber(long aNumber) noexcept {
        const auto lNumber = static_cast<unsigned long>(aNumber);
        return aNumber < 0 ? addNumber(0 - lNumber, true) : addNumber(lNumber);
    }

    std::size_t getLength() const noexcept { return mLength; }

private:
    char* mpText;
    std::size_t mCapacity;
    std::size_t mLength = 0;
};

/// Formats what nearly all lines consist of: text, %s, and %d and %u of int and long, without flags and widths. False
/// where the format asks for more or the text does not fit; the C library is left to do it then.
bool sFormatSimply(ZTCShortText& arText, const char* apFormat, std::va_list aArguments) noexcept {
    while (true) {
        const std::size_t lPlain = std::strcspn(apFormat, "%");
        if (!arText.add(apFormat, lPlain)) {
            return false;
        }
        apFormat += lPlain;
        if (*apFormat == '\0') {
            return true;
        }
        ++apFormat;
        const bool lIsLong = *apFormat == 'l';
        if (lIsLong) {
            ++apFormat;
        }
        bool lIsDone = false;
        switch (*apFormat) {
            case 's': {
                const char* const lpArgument = lIsLong ? nullptr : va_arg(aArguments, const char*);
                lIsDone = lpArgument != nullptr && arText.add(lpArgument, std::strlen(lpArgument));
                break;
            }
            case 'u':
                lIsDone = arText.addNumber(lIsLong ? va_arg(aArguments, unsigned long)
                                                   : static_cast<unsigned long>(va_arg(aArguments, unsigned)));
                break;
            case 'd':
                lIsDone =
                    arText.addNumber(lIsLong ? va_arg(aArguments, long) : static_cast<long>(va_arg(aArguments, int)));
                break;
            default:
                break;
        }
        if (!lIsDone) {
            return false;
        }
        ++apFormat;
    }
}

/// Whether one of eight bytes is a control character.
bool sHasControl(std::uint64_t aBytes) noexcept {
    constexpr std::uint64_t lcOnes = 0x0101010101010101;
    constexpr std::uint64_t lcHighs = 0x8080808080808080;
    const std::uint64_t lBelowBlank = (aBytes - lcOnes * 0x20) & ~aBytes;
    const std::uint64_t lDeletes = aBytes ^ lcOnes * 0x7f;
    return ((lBelowBlank | ((lDeletes - lcOnes) & ~lDeletes)) & lcHighs) != 0;
}

/// How many bytes come before the first control character, or a few fewer.
std::size_t sSkipPlain(const char* apText, std::size_t aLength) noexcept {
    std::size_t lSkipped = 0;
    while (aLength - lSkipped >= sizeof(std::uint64_t)) {
        std::uint64_t lBytes;
        std::memcpy(&lBytes, apText + lSkipped, sizeof(lBytes));
        if (sHasControl(lBytes)) {
            break;
        }
        lSkipped += sizeof(lBytes);
    }
    return lSkipped;
}

constexpr char scCutMark[] = "...";
constexpr std::size_t scEndingSize = sizeof(scCutMark);  // the cut mark and the line break

}  // namespace

ZTCLogLine::ZTCLogLine(const char* apMark) noexcept {
    add(apMark, std::strlen(apMark));
    add(" ", 1);
}

ZTCLogLine::ZTCLogLine(const char* apMark, unsigned aLine, const char* apFunction, const char* apFile) noexcept
    : mLength(gcStampLength), mIsStamped(true) {
    std::memset(mInline, ' ', gcStampLength);
    char lNumber[16];
    ZTCShortText lNumberText(lNumber, sizeof(lNumber));
    lNumberText.addNumber(static_cast<unsigned long>(aLine));

    add(" ", 1);
    add(apMark, std::strlen(apMark));
    add(" ", 1);
    add(apFile, std::strlen(apFile));
    add(":", 1);
    add(lNumber, lNumberText.getLength());
    add(" ", 1);
    add(apFunction, std::strlen(apFunction));
    add(": ", 2);
}

ZTCLogLine::~ZTCLogLine() {
    if (mpData != mInline) {
        std::free(mpData);
    }
}

void ZTCLogLine::finish(const char* apFormat, std::va_list aArguments) noexcept {
    std::va_list lSimple;
    va_copy(lSimple, aArguments);
    char lShort[1024];
    ZTCShortText lText(lShort, sizeof(lShort));
    if (sFormatSimply(lText, apFormat, lSimple)) {
        addEscaped(lShort, lText.getLength());
    } else {
        formatAtLength(lShort, sizeof(lShort), apFormat, aArguments);
    }
    va_end(lSimple);

    if (mIsCut) {
        std::memcpy(mpData + mLength, scCutMark, sizeof(scCutMark) - 1);
        mLength += sizeof(scCutMark) - 1;
    }
    mpData[mLength++] = '\n';
}

/// Formats by the C library, into the buffer where the text fits.
void ZTCLogLine::formatAtLength(char* apShort, std::size_t aSize, const char* apFormat,
                                std::va_list aArguments) noexcept {
    std::va_list lAgain;
    va_copy(lAgain, aArguments);

    char* lpText = apShort;
    char* lpLong = nullptr;
    std::size_t lLength = 0;
    const int lWanted = std::vsnprintf(apShort, aSize, apFormat, aArguments);
    if (lWanted < 0) {
        addEscaped(apFormat, std::strlen(apFormat));
    } else {
        lLength = static_cast<std::size_t>(lWanted);
        if (lLength >= aSize) {
            lpLong = static_cast<char*>(std::malloc(lLength + 1));
            if (lpLong == nullptr) {
                lLength = aSize - 1;
                mIsCut = true;
            } else {
                std::vsnprintf(lpLong, lLength + 1, apFormat, lAgain);
                lpText = lpLong;
            }
        }
        addEscaped(lpText, lLength);
    }
    std::free(lpLong);
    va_end(lAgain);
}

void ZTCLogLine::addEscaped(const char* apText, std::size_t aLength) noexcept {
    static constexpr char lcHexDigits[] = "0123456789abcdef";

    if (aLength > 0 && apText[aLength - 1] == '\n') {
        --aLength;
    }
    std::size_t lDone = 0;
    for (std::size_t i = sSkipPlain(apText, aLength); i < aLength; ++i) {
        const unsigned char lByte = static_cast<unsigned char>(apText[i]);
        if (lByte >= 0x20 && lByte != 0x7f) {
            continue;
        }
        add(apText + lDone, i - lDone);
        lDone = i + 1;
        switch (lByte) {
            case '\n':
                add("\\n", 2);
                break;
            case '\r':
                add("\\r", 2);
                break;
            case '\t':
                add("\\t", 2);
                break;
            default: {
                const char lEscape[] = {'\\', 'x', lcHexDigits[lByte >> 4], lcHexDigits[lByte & 0xf]};
                add(lEscape, sizeof(lEscape));
                break;
            }
        }
    }
    add(apText + lDone, aLength - lDone);
}

void ZTCLogLine::add(const char* apBytes, std::size_t aCount) noexcept {
    if (!makeRoomFor(aCount)) {
        aCount = mCapacity - scEndingSize - mLength;
        mIsCut = true;
    }
    std::memcpy(mpData + mLength, apBytes, aCount);
    mLength += aCount;
}

bool ZTCLogLine::makeRoomFor(std::size_t aCount) noexcept {
    const std::size_t lNeeded = mLength + aCount + scEndingSize;
    if (lNeeded <= mCapacity) {
        return true;
    }
    const std::size_t lCapacity = lNeeded < mCapacity * 2 ? mCapacity * 2 : lNeeded;
    char* const lpData = static_cast<char*>(std::malloc(lCapacity));
    if (lpData == nullptr) {
        return false;
    }
    std::memcpy(lpData, mpData, mLength);
    if (mpData != mInline) {
        std::free(mpData);
    }
    mpData = lpData;
    mCapacity = lCapacity;
    return true;
}
