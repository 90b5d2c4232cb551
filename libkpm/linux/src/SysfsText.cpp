#include "libkpm/linux/src/SysfsText.h"

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <limits>

static std::string_view sTrimmed(std::string_view aText) {
    static constexpr std::string_view scBlank(" \t\r\n");
    const std::size_t lFirst = aText.find_first_not_of(scBlank);
    if (lFirst == std::string_view::npos) {
        return {};
    }
    return aText.substr(lFirst, aText.find_last_not_of(scBlank) - lFirst + 1);
}

template <class Number>
static std::optional<Number> sNumber(std::string_view aText, int aBase) {
    Number lNumber = 0;
    const auto [lpEnd, lError] = std::from_chars(aText.data(), aText.data() + aText.size(), lNumber, aBase);
    if (lError != std::errc() || lpEnd != aText.data() + aText.size()) {
        return std::nullopt;
    }
    return lNumber;
}

static std::optional<std::uint64_t> sHexNumber(std::string_view aText) {
    aText = sTrimmed(aText);
    if (!aText.starts_with("0x")) {
        return std::nullopt;
    }
    return sNumber<std::uint64_t>(aText.substr(2), 16);
}

std::optional<HBA_wwn> parseSysfsWwn(std::string_view aText) {
    const std::optional<std::uint64_t> lNumber = sHexNumber(aText);
    if (!lNumber || *lNumber == std::numeric_limits<std::uint64_t>::max()) {
        return std::nullopt;
    }
    HBA_wwn lName;
    for (unsigned lByte = 0; lByte < sizeof lName.wwn; ++lByte) {
        lName.wwn[lByte] = static_cast<std::uint8_t>(*lNumber >> (56 - 8 * lByte));
    }
    return lName;
}

std::optional<std::uint32_t> parseSysfsFcId(std::string_view aText) {
    const std::optional<std::uint64_t> lNumber = sHexNumber(aText);
    if (!lNumber || *lNumber > 0xFFFFFF) {
        return std::nullopt;
    }
    return static_cast<std::uint32_t>(*lNumber);
}

std::optional<std::int64_t> parseSysfsNumber(std::string_view aText) {
    return sNumber<std::int64_t>(sTrimmed(aText), 10);
}

ZTELinuxLink parseSysfsPortState(std::string_view aText) {
    static constexpr std::string_view scDownStates[] = {"Not Present", "Offline", "Blocked",  "Bypassed", "Diagnostics",
                                                        "Linkdown",    "Error",   "Loopback", "Deleted"};
    const std::string_view lState = sTrimmed(aText);
    if (lState == "Online" || lState == "Marginal") {
        return ZTLK_Up;
    }
    const bool lIsDown = std::find(std::begin(scDownStates), std::end(scDownStates), lState) != std::end(scDownStates);
    return lIsDown ? ZTLK_Down : ZTLK_Unknown;
}

std::optional<std::uint32_t> parseSysfsHostName(std::string_view aName) {
    static constexpr std::string_view scPrefix("host");
    if (!aName.starts_with(scPrefix)) {
        return std::nullopt;
    }
    return sNumber<std::uint32_t>(aName.substr(scPrefix.size()), 10);
}

std::optional<ZTSLinuxRportName> parseSysfsRportName(std::string_view aName) {
    static constexpr std::string_view scPrefix("rport-");
    const std::size_t lColon = aName.find(':');
    const std::size_t lDash = aName.rfind('-');
    if (!aName.starts_with(scPrefix) || lColon == std::string_view::npos || lColon < scPrefix.size() ||
        lDash < lColon) {
        return std::nullopt;
    }
    const auto lHost = sNumber<std::uint32_t>(aName.substr(scPrefix.size(), lColon - scPrefix.size()), 10);
    const auto lChannel = sNumber<std::uint32_t>(aName.substr(lColon + 1, lDash - lColon - 1), 10);
    const auto lNumber = sNumber<std::uint32_t>(aName.substr(lDash + 1), 10);
    if (!lHost || !lChannel || !lNumber) {
        return std::nullopt;
    }
    return ZTSLinuxRportName{*lHost, *lChannel};
}

std::optional<ZTSLinuxLunName> parseSysfsLunName(std::string_view aName) {
    std::uint64_t lParts[4];
    for (std::size_t lPart = 0; lPart < 4; ++lPart) {
        const std::size_t lEnd = lPart == 3 ? aName.size() : aName.find(':');
        if (lEnd == std::string_view::npos) {
            return std::nullopt;
        }
        const std::optional<std::uint64_t> lNumber = sNumber<std::uint64_t>(aName.substr(0, lEnd), 10);
        if (!lNumber || (lPart != 3 && *lNumber > std::numeric_limits<std::uint32_t>::max())) {
            return std::nullopt;
        }
        lParts[lPart] = *lNumber;
        aName.remove_prefix(std::min(lEnd + 1, aName.size()));
    }
    return ZTSLinuxLunName{static_cast<std::uint32_t>(lParts[0]), static_cast<std::uint32_t>(lParts[1]),
                           static_cast<std::uint32_t>(lParts[2]), lParts[3]};
}

std::string formatSysfsLunName(const ZTSLinuxLunName& acrName) {
    return std::to_string(acrName.mHost) + ":" + std::to_string(acrName.mChannel) + ":" +
           std::to_string(acrName.mTarget) + ":" + std::to_string(acrName.mLun);
}

std::optional<std::uint64_t> parseTraceLosses(std::string_view aText) {
    static constexpr std::string_view scCounts[] = {"overrun", "commit overrun", "dropped events"};
    static constexpr std::uint64_t scAllOnes = std::numeric_limits<std::uint64_t>::max();
    std::optional<std::uint64_t> lLosses;
    while (!aText.empty()) {
        const std::size_t lEnd = std::min(aText.find('\n'), aText.size());
        const std::string_view lLine = aText.substr(0, lEnd);
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
        const std::size_t lColon = lLine.find(':');
        if (lColon == std::string_view::npos || std::find(std::begin(scCounts), std::end(scCounts),
                                                          sTrimmed(lLine.substr(0, lColon))) == std::end(scCounts)) {
            continue;
        }
        const std::optional<std::uint64_t> lCount = sNumber<std::uint64_t>(sTrimmed(lLine.substr(lColon + 1)), 10);
        if (!lCount || *lCount == scAllOnes || *lCount > scAllOnes - lLosses.value_or(0)) {
            return std::nullopt;
        }
        lLosses = lLosses.value_or(0) + *lCount;
    }
    return lLosses;
}
