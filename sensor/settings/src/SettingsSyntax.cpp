#include "sensor/settings/src/SettingsSyntax.h"

#include <algorithm>

static constexpr std::string_view scByteOrderMark = "\xEF\xBB\xBF";

/// Where the text in quotes that begins at this place ends: behind its last quote, or at the end of its line where that
/// is missing.
static std::size_t sFindEndOfQuotes(std::string_view aText, std::size_t aBegin) {
    const char lQuote = aText[aBegin];
    const bool lHasEscapes = lQuote == '"';
    const std::string_view lThree = lHasEscapes ? R"(""")" : "'''";
    const bool lIsLong = aText.substr(aBegin, lThree.size()) == lThree;
    std::size_t lPlace = aBegin + (lIsLong ? lThree.size() : 1);
    while (lPlace < aText.size()) {
        if (lHasEscapes && aText[lPlace] == '\\') {
            lPlace += 2;
        } else if (!lIsLong && (aText[lPlace] == lQuote || aText[lPlace] == '\n')) {
            return aText[lPlace] == lQuote ? lPlace + 1 : lPlace;
        } else if (lIsLong && aText.substr(lPlace, lThree.size()) == lThree) {
            // Up to two quotes more belong to the text.
            const std::size_t lMost = std::min(lPlace + lThree.size() + 2, aText.size());
            for (lPlace += lThree.size(); lPlace < lMost && aText[lPlace] == lQuote;) {
                ++lPlace;
            }
            return lPlace;
        } else {
            ++lPlace;
        }
    }
    return aText.size();
}

std::optional<unsigned> findLineWithBareCharacter(std::string_view aText) {
    std::size_t lPlace = aText.starts_with(scByteOrderMark) ? scByteOrderMark.size() : 0;
    while (lPlace < aText.size()) {
        const char lCharacter = aText[lPlace];
        if (static_cast<unsigned char>(lCharacter) >= 0x80) {
            const std::string_view lBefore = aText.substr(0, lPlace);
            return static_cast<unsigned>(std::count(lBefore.begin(), lBefore.end(), '\n')) + 1;
        }
        if (lCharacter == '#') {
            lPlace = std::min(aText.find('\n', lPlace), aText.size());
        } else if (lCharacter == '"' || lCharacter == '\'') {
            lPlace = sFindEndOfQuotes(aText, lPlace);
        } else {
            ++lPlace;
        }
    }
    return std::nullopt;
}
