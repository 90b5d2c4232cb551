/// A fuzzer's input taken apart, and what its properties are checked with.
#ifndef FUZZ_SUPPORT_FUZZINPUT_H
#define FUZZ_SUPPORT_FUZZINPUT_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>

/// Ends the process with a trap, which libFuzzer reports and keeps the input of.
[[noreturn]] void failFuzzing(const char* apCondition, const char* apFile, int aLine, const std::string& acrText);

/// A property that must hold; the text, evaluated on failure alone, says what was found.
#define ZT_FUZZ_REQUIRE(aCondition, aText)                         \
    do {                                                           \
        if (!(aCondition)) {                                       \
            failFuzzing(#aCondition, __FILE__, __LINE__, (aText)); \
        }                                                          \
    } while (false)

/// Takes the input from its beginning on. Where it has ended, numbers are 0 and bytes are none.
class ZTCFuzzInput {
public:
    ZTCFuzzInput(const std::uint8_t* apData, std::size_t aSize) : mRest(apData, aSize) {}

    bool isAtEnd() const { return mRest.empty(); }
    std::uint8_t takeByte();
    std::uint16_t takeShort();
    std::uint32_t takeWord();
    std::uint64_t takeLong();
    /// At most so many bytes.
    std::span<const std::uint8_t> take(std::size_t aCount);
    std::span<const std::uint8_t> takeRest() { return take(mRest.size()); }

private:
    std::span<const std::uint8_t> mRest;
};

/// A copy of bytes in a heap block of exactly their size behind an offset, so that a sanitizer sees each byte that is
/// read beside them.
class ZTCExactBlock {
public:
    ZTCExactBlock(std::span<const std::uint8_t> aBytes, std::size_t aOffset);

    std::uint8_t* get() const { return mpBlock.get() + mOffset; }

private:
    std::size_t mOffset;
    std::unique_ptr<std::uint8_t[]> mpBlock;
};

#endif
