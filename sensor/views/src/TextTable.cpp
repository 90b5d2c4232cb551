#include "sensor/views/include/TextTable.h"

#include <algorithm>
#include <array>
#include <cstdio>

static constexpr std::string_view scBetween = "  ";
static constexpr std::string_view scCut = "..";

/// Bytes of the well-formed UTF-8 character at the front; 0: there is none.
static std::size_t sCharacterSize(std::string_view aText) {
    const auto lByte = [&](std::size_t aPlace) { return static_cast<unsigned char>(aText[aPlace]); };
    const unsigned char lFirst = lByte(0);
    const std::size_t lSize = lFirst < 0x80                     ? 1
                              : lFirst >= 0xC2 && lFirst < 0xE0 ? 2
                              : lFirst >= 0xE0 && lFirst < 0xF0 ? 3
                              : lFirst >= 0xF0 && lFirst < 0xF5 ? 4
                                                                : 0;
    if (lSize == 0 || lSize > aText.size()) {
        return 0;
    }
    for (std::size_t i = 1; i < lSize; ++i) {
        if ((lByte(i) & 0xC0) != 0x80) {
            return 0;
        }
    }
    const bool lIsOverlong = (lFirst == 0xE0 && lByte(1) < 0xA0) || (lFirst == 0xF0 && lByte(1) < 0x90);
    const bool lIsBeyond = (lFirst == 0xED && lByte(1) >= 0xA0) || (lFirst == 0xF4 && lByte(1) >= 0x90);
    return lIsOverlong || lIsBeyond ? 0 : lSize;
}

static std::size_t sStep(std::string_view aText) {
    return std::max<std::size_t>(sCharacterSize(aText), 1);
}

std::size_t countCharacters(std::string_view aText) {
    std::size_t lCount = 0;
    for (; !aText.empty(); ++lCount) {
        aText.remove_prefix(sStep(aText));
    }
    return lCount;
}

std::string cutText(const std::string& acrText, std::size_t aCharacters) {
    if (countCharacters(acrText) <= aCharacters) {
        return acrText;
    }
    const std::size_t lKept = aCharacters > scCut.size() ? aCharacters - scCut.size() : 0;
    std::size_t lBytes = 0;
    for (std::size_t i = 0; i < lKept; ++i) {
        lBytes += sStep(std::string_view(acrText).substr(lBytes));
    }
    return acrText.substr(0, lBytes) + std::string(scCut.substr(0, aCharacters - lKept));
}

std::string escapeControls(std::string_view aText) {
    std::string lText;
    while (!aText.empty()) {
        const std::size_t lSize = sCharacterSize(aText);
        const auto lByte = static_cast<unsigned char>(aText.front());
        // U+0080 to U+009F are control characters too: terminals obey them.
        const bool lIsControl = lByte < 0x20 || lByte == 0x7F ||
                                (lSize == 2 && lByte == 0xC2 && static_cast<unsigned char>(aText[1]) < 0xA0);
        if (lSize == 0 || lIsControl) {
            for (std::size_t i = 0; i < std::max<std::size_t>(lSize, 1); ++i) {
                std::array<char, 8> lEscape{};
                std::snprintf(lEscape.data(), lEscape.size(), "\\x%02x",
                              static_cast<unsigned>(static_cast<unsigned char>(aText[i])));
                lText += lEscape.data();
            }
        } else {
            lText += aText.substr(0, lSize);
        }
        aText.remove_prefix(std::max<std::size_t>(lSize, 1));
    }
    return lText;
}

std::string formatBytes(std::uint64_t aBytes) {
    static constexpr std::array<const char*, 5> scUnits{" B", " KiB", " MiB", " GiB", " TiB"};
    auto lValue = static_cast<double>(aBytes);
    std::size_t lUnit = 0;
    for (; lValue >= 1024 && lUnit + 1 < scUnits.size(); ++lUnit) {
        lValue /= 1024;
    }
    std::array<char, 32> lText{};
    const bool lIsWhole = lValue == static_cast<double>(static_cast<std::uint64_t>(lValue)) || lValue >= 100;
    std::snprintf(lText.data(), lText.size(), lIsWhole ? "%.0f" : "%.1f", lValue);
    return lText.data() + std::string(scUnits.at(lUnit));
}

std::vector<std::string> wrapText(std::string_view aText, std::size_t aCharacters) {
    std::vector<std::string> lLines;
    std::string lLine;
    while (!aText.empty()) {
        const std::size_t lEnd = std::min(aText.find(' '), aText.size());
        const std::string_view lWord = aText.substr(0, lEnd);
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
        if (lWord.empty()) {
            continue;
        }
        if (!lLine.empty() && aCharacters != 0 && countCharacters(lLine) + 1 + countCharacters(lWord) > aCharacters) {
            lLines.push_back(std::move(lLine));
            lLine.clear();
        }
        lLine += (lLine.empty() ? "" : " ") + std::string(lWord);
    }
    if (!lLine.empty()) {
        lLines.push_back(std::move(lLine));
    }
    return lLines;
}

ZTCTextTable::ZTCTextTable(std::vector<ZTSTextColumn> aColumns, std::size_t aWidth)
    : mColumns(std::move(aColumns)), mWidth(aWidth), mWanted(mColumns.size()), mGranted(mColumns.size()) {
    for (std::size_t i = 0; i < mColumns.size(); ++i) {
        mWanted[i] = std::max(countCharacters(mColumns[i].mpTitle), mColumns[i].mReserved);
    }
}

void ZTCTextTable::addRow(std::vector<std::string> aCells) {
    aCells.resize(mColumns.size());
    for (std::string& lrCell : aCells) {
        lrCell = escapeControls(lrCell);
    }
    growWidths(aCells);
    mRows.push_back(std::move(aCells));
}

void ZTCTextTable::growWidths(const std::vector<std::string>& acrCells) {
    for (std::size_t i = 0; i < mColumns.size(); ++i) {
        mWanted[i] = std::max(mWanted[i], countCharacters(acrCells[i]));
    }
}

void ZTCTextTable::setWidth(std::size_t aWidth) {
    mWidth = aWidth;
}

void ZTCTextTable::fit() {
    mGranted = mWanted;
    if (mWidth == 0) {
        return;
    }
    const auto lTotal = [this] {
        std::size_t lSum = 0;
        for (const std::size_t lWidth : mGranted) {
            lSum += lWidth == 0 ? 0 : lWidth + (lSum == 0 ? 0 : scBetween.size());
        }
        return lSum;
    };
    const auto lCut = [&] {
        for (std::size_t i = mColumns.size(); i-- > 0 && lTotal() > mWidth;) {
            const std::size_t lLeast = mColumns[i].mLeastWidth;
            if (mGranted[i] != 0 && lLeast != 0 && mGranted[i] > lLeast) {
                mGranted[i] = std::max(lLeast, mGranted[i] - std::min(mGranted[i], lTotal() - mWidth));
            }
        }
    };
    lCut();
    while (lTotal() > mWidth) {
        std::size_t lDropped = mColumns.size();
        for (std::size_t i = 0; i < mColumns.size(); ++i) {
            const bool lMayGo = mGranted[i] != 0 && mColumns[i].mDropOrder != 0;
            if (lMayGo && (lDropped == mColumns.size() || mColumns[i].mDropOrder > mColumns[lDropped].mDropOrder)) {
                lDropped = i;
            }
        }
        if (lDropped == mColumns.size()) {
            return;
        }
        // With a column less the others may have their whole widths again.
        mGranted[lDropped] = 0;
        for (std::size_t i = 0; i < mColumns.size(); ++i) {
            mGranted[i] = mGranted[i] == 0 ? 0 : mWanted[i];
        }
        lCut();
    }
}

std::string ZTCTextTable::formatLine(const std::vector<std::string>& acrCells) const {
    std::string lLine;
    bool lIsFirst = true;
    for (std::size_t i = 0; i < mColumns.size(); ++i) {
        if (mGranted[i] == 0) {
            continue;
        }
        const std::string lCell = cutText(acrCells[i], mGranted[i]);
        const std::string lPadding(mGranted[i] - std::min(mGranted[i], countCharacters(lCell)), ' ');
        lLine += lIsFirst ? "" : scBetween;
        lLine += mColumns[i].mIsRight ? lPadding + lCell : lCell + lPadding;
        lIsFirst = false;
    }
    lLine.erase(lLine.find_last_not_of(' ') + 1);
    return lLine + "\n";
}

std::string ZTCTextTable::takeText() {
    fit();
    std::string lText;
    if (!mHasHeading) {
        std::vector<std::string> lTitles;
        for (const ZTSTextColumn& lrColumn : mColumns) {
            lTitles.emplace_back(lrColumn.mpTitle);
        }
        lText += formatLine(lTitles);
        mHasHeading = true;
    }
    for (const std::vector<std::string>& lrRow : mRows) {
        lText += formatLine(lrRow);
    }
    mRows.clear();
    return lText;
}
