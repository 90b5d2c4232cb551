#include "sensor/web/src/HostCheck.h"

#include <algorithm>
#include <array>

static bool sIsSame(std::string_view aOne, std::string_view aOther) {
    const auto lLower = [](char aCharacter) {
        return aCharacter >= 'A' && aCharacter <= 'Z' ? static_cast<char>(aCharacter - 'A' + 'a') : aCharacter;
    };
    return std::ranges::equal(aOne, aOther, {}, lLower, lLower);
}

bool isHostAccepted(std::string_view aHeader, const std::vector<std::string>& acrNames) {
    // "NAME", "NAME:PORT", "[ADDRESS]" or "[ADDRESS]:PORT"
    const std::size_t lBracket = aHeader.starts_with('[') ? aHeader.find(']') : 0;
    const std::size_t lColon = lBracket == std::string_view::npos ? lBracket : aHeader.find(':', lBracket);
    std::string_view lName = aHeader.substr(0, lColon);
    if (lColon != std::string_view::npos) {
        const std::string_view lPort = aHeader.substr(lColon + 1);
        if (lPort.size() > 5 ||
            !std::ranges::all_of(lPort, [](char aDigit) { return aDigit >= '0' && aDigit <= '9'; })) {
            return false;
        }
    }
    static constexpr std::array<std::string_view, 3> scOwn{"localhost", "127.0.0.1", "[::1]"};
    const auto lIsIt = [lName](std::string_view aName) { return sIsSame(lName, aName); };
    return std::ranges::any_of(scOwn, lIsIt) || std::ranges::any_of(acrNames, lIsIt);
}
