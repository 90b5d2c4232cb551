#include "sensor/collector/include/SpoolName.h"

#include <algorithm>
#include <array>
#include <charconv>

/// By state.
static constexpr std::array<std::string_view, 3> scSuffixes{"part", "frame", "torn"};

std::string ZTSSpoolName::toText() const {
    return std::to_string(mNumber) + "." + mGeneration + "." + std::string(scSuffixes[mState]);
}

ZTSSpoolName ZTSSpoolName::withState(ZTESpoolState aState) const {
    return {.mNumber = mNumber, .mGeneration = mGeneration, .mState = aState};
}

static bool sIsHexDigit(char aCharacter) {
    return (aCharacter >= '0' && aCharacter <= '9') || (aCharacter >= 'a' && aCharacter <= 'f');
}

std::optional<ZTSSpoolName> parseSpoolName(std::string_view aText) {
    const std::size_t lFirst = aText.find('.');
    const std::size_t lSecond = lFirst == std::string_view::npos ? lFirst : aText.find('.', lFirst + 1);
    if (lSecond == std::string_view::npos) {
        return std::nullopt;
    }
    const std::string_view lDigits = aText.substr(0, lFirst);
    const std::string_view lGeneration = aText.substr(lFirst + 1, lSecond - lFirst - 1);
    const auto lpSuffix = std::ranges::find(scSuffixes, aText.substr(lSecond + 1));

    ZTSSpoolName lName;
    const auto [lpEnd, lError] = std::from_chars(lDigits.data(), lDigits.data() + lDigits.size(), lName.mNumber);
    const bool lIsNumber = lError == std::errc() && lpEnd == lDigits.data() + lDigits.size() &&
                           (lDigits.size() == 1 || lDigits.front() != '0');
    const bool lIsGeneration = !lGeneration.empty() && lGeneration.size() <= gcMaxGenerationDigits &&
                               std::ranges::all_of(lGeneration, sIsHexDigit);
    if (!lIsNumber || !lIsGeneration || lpSuffix == scSuffixes.end()) {
        return std::nullopt;
    }
    lName.mGeneration = lGeneration;
    lName.mState = static_cast<ZTESpoolState>(lpSuffix - scSuffixes.begin());
    return lName;
}
