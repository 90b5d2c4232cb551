#include "fuzz/support/FuzzInput.h"

#include <algorithm>
#include <cstdio>

void failFuzzing(const char* apCondition, const char* apFile, int aLine, const std::string& acrText) {
    std::fprintf(stderr, "%s:%d: the property does not hold: %s: %s\n", apFile, aLine, apCondition, acrText.c_str());
    __builtin_trap();
}

std::span<const std::uint8_t> ZTCFuzzInput::take(std::size_t aCount) {
    const std::span<const std::uint8_t> lTaken = mRest.first(std::min(aCount, mRest.size()));
    mRest = mRest.subspan(lTaken.size());
    return lTaken;
}

std::uint8_t ZTCFuzzInput::takeByte() {
    const std::span<const std::uint8_t> lByte = take(1);
    return lByte.empty() ? std::uint8_t{0} : lByte[0];
}

std::uint16_t ZTCFuzzInput::takeShort() {
    const std::uint8_t lHigh = takeByte();
    return static_cast<std::uint16_t>(lHigh << 8 | takeByte());
}

std::uint32_t ZTCFuzzInput::takeWord() {
    const std::uint32_t lHigh = takeShort();
    return lHigh << 16 | takeShort();
}

std::uint64_t ZTCFuzzInput::takeLong() {
    const std::uint64_t lHigh = takeWord();
    return lHigh << 32 | takeWord();
}

ZTCExactBlock::ZTCExactBlock(std::span<const std::uint8_t> aBytes, std::size_t aOffset)
    : mOffset(aOffset), mpBlock(new std::uint8_t[aOffset + aBytes.size()]) {
    std::copy(aBytes.begin(), aBytes.end(), get());
}
