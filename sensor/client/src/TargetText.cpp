#include "sensor/client/include/TargetText.h"

#include <charconv>

#include "sensor/client/include/ClientErrors.h"

static std::vector<std::string_view> sSplit(std::string_view aText, std::string_view aSeparators) {
    std::vector<std::string_view> lParts;
    while (true) {
        const std::size_t lBegin = aText.find_first_not_of(aSeparators);
        if (lBegin == std::string_view::npos) {
            return lParts;
        }
        aText.remove_prefix(lBegin);
        const std::size_t lEnd = aText.find_first_of(aSeparators);
        lParts.push_back(aText.substr(0, lEnd));
        aText.remove_prefix(lParts.back().size());
    }
}

std::uint32_t parseNumber(std::string_view aText, std::uint32_t aMax, const std::string& acrWhat) {
    std::string_view lDigits = aText;
    int lBase = 10;
    if (lDigits.starts_with("0x") || lDigits.starts_with("0X")) {
        lDigits.remove_prefix(2);
        lBase = 16;
    }
    std::uint32_t lValue = 0;
    const char* lpEnd = lDigits.data() + lDigits.size();
    const auto [lpStop, lError] = std::from_chars(lDigits.data(), lpEnd, lValue, lBase);
    if (lError == std::errc::result_out_of_range || (lError == std::errc() && lpStop == lpEnd && lValue > aMax)) {
        throw ZTCBadInputEx(acrWhat + " \"" + std::string(aText) + "\" is above the largest value " +
                            std::to_string(aMax));
    }
    if (lError != std::errc() || lpStop != lpEnd) {
        throw ZTCBadInputEx(acrWhat + " \"" + std::string(aText) + "\" is not a decimal or 0x-hexadecimal number");
    }
    return lValue;
}

ZTSTargetPort parseTarget(std::string_view aText) {
    const std::vector<std::string_view> lParts = sSplit(aText, ", \t\r");
    if (lParts.size() != 3) {
        throw ZTCBadInputEx("target \"" + std::string(aText) + "\" has " + std::to_string(lParts.size()) +
                            " parts, wanted 3: WWNN,WWPN,FCID");
    }
    return {ZTSFcName::fromText(lParts[0]), ZTSFcName::fromText(lParts[1]),
            parseNumber(lParts[2], gcMaxFcAddress, "FC id")};
}

std::vector<ZTSTargetPort> readTargets(std::istream& arStream, const std::string& acrName) {
    std::vector<ZTSTargetPort> lTargets;
    std::string lLine;
    for (std::size_t lNumber = 1; std::getline(arStream, lLine); ++lNumber) {
        const std::string_view lContent = std::string_view(lLine).substr(0, lLine.find('#'));
        if (sSplit(lContent, ", \t\r").empty()) {
            continue;
        }
        try {
            lTargets.push_back(parseTarget(lContent));
        } catch (const ZTCBadInputEx& lrEx) {
            throw ZTCBadInputEx(acrName + ":" + std::to_string(lNumber) + ": " + lrEx.what());
        }
    }
    if (arStream.bad()) {
        throw ZTCBadInputEx(acrName + ": cannot be read to its end");
    }
    return lTargets;
}
