#include "common/include/LogLine.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>

static constexpr char gcCutMark[] = "...";
static constexpr std::size_t gcEndingSize = sizeof(gcCutMark);  // the cut mark and the line break

ZTCLogLine::ZTCLogLine(const char* apMark) noexcept {
    add(apMark, std::strlen(apMark));
    add(" ", 1);
}

ZTCLogLine::ZTCLogLine(const char* apMark, unsigned aLine, const char* apFunction, const char* apFile) noexcept
    : mLength(gcStampLength), mIsStamped(true) {
    std::memset(mInline, ' ', gcStampLength);
    char lNumber[16];
    const int lNumberLength = std::snprintf(lNumber, sizeof(lNumber), "%u", aLine);

    add(" ", 1);
    add(apMark, std::strlen(apMark));
    add(" ", 1);
    add(apFile, std::strlen(apFile));
    add(":", 1);
    add(lNumber, static_cast<std::size_t>(lNumberLength));
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
    std::va_list lAgain;
    va_copy(lAgain, aArguments);

    char lShort[1024];
    char* lpText = lShort;
    char* lpLong = nullptr;
    std::size_t lLength = 0;
    const int lWanted = std::vsnprintf(lShort, sizeof(lShort), apFormat, aArguments);
    if (lWanted < 0) {
        addEscaped(apFormat, std::strlen(apFormat));
    } else {
        lLength = static_cast<std::size_t>(lWanted);
        if (lLength >= sizeof(lShort)) {
            lpLong = static_cast<char*>(std::malloc(lLength + 1));
            if (nullptr == lpLong) {
                lLength = sizeof(lShort) - 1;
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

    if (mIsCut) {
        std::memcpy(mpData + mLength, gcCutMark, sizeof(gcCutMark) - 1);
        mLength += sizeof(gcCutMark) - 1;
    }
    mpData[mLength++] = '\n';
}

void ZTCLogLine::addEscaped(const char* apText, std::size_t aLength) noexcept {
    static constexpr char lcHexDigits[] = "0123456789abcdef";

    if (aLength > 0 && '\n' == apText[aLength - 1]) {
        --aLength;
    }
    std::size_t lDone = 0;
    for (std::size_t i = 0; i < aLength; ++i) {
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
        aCount = mCapacity - gcEndingSize - mLength;
        mIsCut = true;
    }
    std::memcpy(mpData + mLength, apBytes, aCount);
    mLength += aCount;
}

bool ZTCLogLine::makeRoomFor(std::size_t aCount) noexcept {
    const std::size_t lNeeded = mLength + aCount + gcEndingSize;
    if (lNeeded <= mCapacity) {
        return true;
    }
    const std::size_t lCapacity = lNeeded < mCapacity * 2 ? mCapacity * 2 : lNeeded;
    char* const lpData = static_cast<char*>(std::malloc(lCapacity));
    if (nullptr == lpData) {
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
