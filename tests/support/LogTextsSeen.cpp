#include "tests/support/LogTextsSeen.h"

#include <cctype>
#include <map>
#include <tuple>

static bool sFits(const std::string& acrText, std::size_t aFrom, const std::string& acrFormat, std::size_t aFormatFrom);

/// Whether the rest fits behind any text of at most `aMost` characters.
static bool sFitsAfter(const std::string& acrText, std::size_t aFrom, std::size_t aMost, const std::string& acrFormat,
                       std::size_t aFormatFrom) {
    for (std::size_t lLength = aMost + 1; lLength-- > 0;) {
        if (sFits(acrText, aFrom + lLength, acrFormat, aFormatFrom)) {
            return true;
        }
    }
    return false;
}

/// Whether the text from here on is of the format from there on.
static bool sFits(const std::string& acrText, std::size_t aFrom, const std::string& acrFormat,
                  std::size_t aFormatFrom) {
    while (aFormatFrom < acrFormat.size() && acrFormat[aFormatFrom] != '%') {
        if (aFrom == acrText.size() || acrText[aFrom] != acrFormat[aFormatFrom]) {
            return false;
        }
        ++aFrom;
        ++aFormatFrom;
    }
    if (aFormatFrom == acrFormat.size()) {
        return aFrom == acrText.size();
    }
    const std::size_t lConversion = acrFormat.find_first_of("sudp", aFormatFrom);
    const std::size_t lNext = lConversion + 1;
    if (acrFormat[lConversion] == 's') {
        return sFitsAfter(acrText, aFrom, acrText.size() - aFrom, acrFormat, lNext);
    }
    std::size_t lEnd = aFrom;
    if (acrFormat[lConversion] == 'p') {
        lEnd = acrText.find_first_of(" ,;", aFrom);
        lEnd = lEnd == std::string::npos ? acrText.size() : lEnd;
        return lEnd != aFrom && sFits(acrText, lEnd, acrFormat, lNext);
    }
    if (acrFormat[lConversion] == 'd' && lEnd < acrText.size() && acrText[lEnd] == '-') {
        ++lEnd;
    }
    const std::size_t lDigits = lEnd;
    while (lEnd < acrText.size() && std::isdigit(static_cast<unsigned char>(acrText[lEnd])) != 0) {
        ++lEnd;
    }
    return lEnd != lDigits && sFits(acrText, lEnd, acrFormat, lNext);
}

bool isOfFormat(const std::string& acrText, const std::string& acrFormat) {
    return sFits(acrText, 0, acrFormat, 0);
}

void ZTCLogTextsSeen::add(const std::vector<std::string>& acrRawLines) {
    using ZTCPlace = std::tuple<std::string, std::string, std::string>;
    static const auto& srByPlace = *[] {
        auto* const lpByPlace = new std::multimap<ZTCPlace, std::size_t>;
        for (std::size_t lRow = 0; lRow < logTexts().size(); ++lRow) {
            const ZTSLogText& lcrRow = logTexts()[lRow];
            lpByPlace->emplace(ZTCPlace(lcrRow.mpMark, lcrRow.mpLabel, lcrRow.mpFunction), lRow);
        }
        return lpByPlace;
    }();
    for (const std::string& lcrRawLine : acrRawLines) {
        ZTSLogLine lLine;
        if (const auto lParsed = parseLogLine(lcrRawLine)) {
            lLine = *lParsed;
        } else {
            const std::size_t lBlank = lcrRawLine.find(' ');
            lLine.mMark = lcrRawLine.substr(0, lBlank);
            lLine.mText = lBlank == std::string::npos ? "" : lcrRawLine.substr(lBlank + 1);
        }
        bool lIsKnown = lLine.mMark == "-T-" && (lLine.mText == "Entered" || lLine.mText == "Left");
        const auto [lBegin, lEnd] = srByPlace.equal_range(ZTCPlace(lLine.mMark, lLine.mLabel, lLine.mFunction));
        for (auto lRow = lBegin; lRow != lEnd; ++lRow) {
            if (isOfFormat(lLine.mText, logTexts()[lRow->second].mpFormat)) {
                mSeen.insert(lRow->second);
                lIsKnown = true;
            }
        }
        if (!lIsKnown) {
            mStrangers.insert(lLine.mMark + " " + lLine.mLabel + " " + lLine.mFunction + ": " + lLine.mText);
        }
    }
}

std::vector<std::string> ZTCLogTextsSeen::unseen(ZTELogTextPath aPath) const {
    std::vector<std::string> lUnseen;
    for (std::size_t lRow = 0; lRow < logTexts().size(); ++lRow) {
        const ZTSLogText& lcrRow = logTexts()[lRow];
        if (lcrRow.mPath == aPath && mSeen.count(lRow) == 0) {
            lUnseen.push_back(std::string(lcrRow.mpMark) + " " + lcrRow.mpLabel + " " + lcrRow.mpFunction + ": " +
                              lcrRow.mpFormat);
        }
    }
    return lUnseen;
}
