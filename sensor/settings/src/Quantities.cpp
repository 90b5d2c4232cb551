#include "sensor/settings/include/Quantities.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <limits>
#include <string>

struct ZTSUnit {
    const char* mpName;
    std::uint64_t mFactor;
};

/// In milliseconds; the largest first, the one of a number alone last.
static constexpr ZTSUnit scDurationUnits[] = {{"d", 86400000}, {"h", 3600000}, {"m", 60000}, {"s", 1000}};
static constexpr double scLongestMilliseconds = 36500 * 86400000.0;

/// In bytes, in the same order.
static constexpr ZTSUnit scSizeUnits[] = {
    {"TiB", 1ULL << 40}, {"GiB", 1ULL << 30}, {"MiB", 1ULL << 20}, {"KiB", 1ULL << 10}, {"B", 1}};
static constexpr std::uint64_t scLargestSize = 1ULL << 50;

template <std::size_t tCount>
static const ZTSUnit* sFindUnit(const ZTSUnit (&acrUnits)[tCount], std::string_view aName) {
    if (aName.empty()) {
        return &acrUnits[tCount - 1];
    }
    for (const ZTSUnit& lcrUnit : acrUnits) {
        if (aName == lcrUnit.mpName) {
            return &lcrUnit;
        }
    }
    return nullptr;
}

/// The largest unit of which the value is a whole number.
template <std::size_t tCount>
static const ZTSUnit& sFitUnit(const ZTSUnit (&acrUnits)[tCount], std::uint64_t aValue) {
    for (const ZTSUnit& lcrUnit : acrUnits) {
        if (aValue != 0 && aValue % lcrUnit.mFactor == 0) {
            return lcrUnit;
        }
    }
    return acrUnits[tCount - 1];
}

std::chrono::milliseconds durationFromText(std::string_view aText) {
    double lNumber = 0;
    const char* lpEnd = aText.data() + aText.size();
    const auto [lpStop, lError] = std::from_chars(aText.data(), lpEnd, lNumber, std::chars_format::fixed);
    if (lError == std::errc::result_out_of_range) {  // hundreds of digits, or a fraction that is as good as 0
        lNumber = aText[aText.find_first_not_of('0')] == '.' ? 0 : std::numeric_limits<double>::infinity();
    }
    // Neither a sign, nor "inf", nor "nan".
    const bool lIsNumber = lError != std::errc::invalid_argument && aText.find_first_of(".0123456789") == 0;
    const ZTSUnit* lpUnit =
        lIsNumber ? sFindUnit(scDurationUnits, {lpStop, static_cast<std::size_t>(lpEnd - lpStop)}) : nullptr;
    if (lpUnit == nullptr) {
        throw ZTCBadInputEx("\"" + std::string(aText) +
                            "\" is not a duration: wanted a number and s, m, h or d, at most 36500d");
    }
    const double lMilliseconds = lNumber * static_cast<double>(lpUnit->mFactor);
    if (lMilliseconds > scLongestMilliseconds) {
        throw ZTCTooLargeEx("\"" + std::string(aText) + "\" is too long: a duration is at most 36500d");
    }
    return std::chrono::milliseconds(std::llround(lMilliseconds));
}

std::string durationText(std::chrono::milliseconds aDuration) {
    const auto lMilliseconds = static_cast<std::uint64_t>(std::max<std::int64_t>(aDuration.count(), 0));
    if (lMilliseconds % 1000 != 0) {
        std::string lFraction = std::to_string(1000 + lMilliseconds % 1000).substr(1);
        lFraction.erase(lFraction.find_last_not_of('0') + 1);
        return std::to_string(lMilliseconds / 1000) + "." + lFraction + "s";
    }
    const ZTSUnit& lcrUnit = sFitUnit(scDurationUnits, lMilliseconds);
    return std::to_string(lMilliseconds / lcrUnit.mFactor) + lcrUnit.mpName;
}

std::uint64_t sizeFromText(std::string_view aText) {
    std::uint64_t lNumber = 0;
    const char* lpEnd = aText.data() + aText.size();
    const auto [lpStop, lError] = std::from_chars(aText.data(), lpEnd, lNumber);
    const bool lIsBeyond = lError == std::errc::result_out_of_range;
    const ZTSUnit* lpUnit = lError == std::errc() || lIsBeyond
                                ? sFindUnit(scSizeUnits, {lpStop, static_cast<std::size_t>(lpEnd - lpStop)})
                                : nullptr;
    if (lpUnit == nullptr) {
        throw ZTCBadInputEx("\"" + std::string(aText) +
                            "\" is not a size: wanted a whole number and B, KiB, MiB, GiB or TiB, at most 1024TiB");
    }
    if (lIsBeyond || lNumber > scLargestSize / lpUnit->mFactor) {
        throw ZTCTooLargeEx("\"" + std::string(aText) + "\" is too large: a size is at most 1024TiB");
    }
    return lNumber * lpUnit->mFactor;
}

std::string sizeText(std::uint64_t aBytes) {
    const ZTSUnit& lcrUnit = sFitUnit(scSizeUnits, aBytes);
    return std::to_string(aBytes / lcrUnit.mFactor) + lcrUnit.mpName;
}
