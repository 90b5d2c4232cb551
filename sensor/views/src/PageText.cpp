#include "sensor/views/src/PageText.h"

#include <algorithm>
#include <utility>

#include "sensor/views/include/TextTable.h"

static constexpr const char* scBold = "1";

ZTCPageText::ZTCPageText(const ZTSTextStyle& acrStyle)
    : mHasColor(acrStyle.mHasColor),
      mLineWidth(std::max(acrStyle.mWidth, scTextColumn + scRightMargin + 20) - scRightMargin) {}

std::string ZTCPageText::paint(const std::string& acrText, const char* apColor) const {
    return mHasColor ? "\x1b[" + std::string(apColor) + "m" + acrText + "\x1b[0m" : acrText;
}

void ZTCPageText::addRaw(const std::string& acrLabel, const std::string& acrText) {
    const std::string lPadding(scLabelWidth - std::min(scLabelWidth, acrLabel.size()), ' ');
    mText += (acrLabel.empty() ? std::string(scTextColumn, ' ') : lPadding + acrLabel + ": ") + acrText + "\n";
}

/// Where the text of a line begins whose first word is a narrow column of its own, followed by two blanks or more; 0:
/// it has none.
static std::size_t sFindSecondColumn(std::string_view aText) {
    static constexpr std::size_t scWidest = 12;
    const std::size_t lEnd = aText.find(' ');
    const std::size_t lNext = lEnd == std::string_view::npos ? lEnd : aText.find_first_not_of(' ', lEnd);
    return lNext == std::string_view::npos || lNext - lEnd < 2 || lNext > scWidest ? 0 : lNext;
}

void ZTCPageText::add(const std::string& acrLabel, const std::string& acrText) {
    const std::string lText = escapeControls(acrText);
    const std::size_t lRoom = mLineWidth - scTextColumn;
    if (countCharacters(lText) <= lRoom) {
        addRaw(acrLabel, lText);
        return;
    }
    const std::size_t lColumn = sFindSecondColumn(lText);
    std::string lLabel = acrLabel;
    std::string lFront = lText.substr(0, lColumn);
    for (const std::string& lrLine : wrapText(std::string_view(lText).substr(lColumn), lRoom - lColumn)) {
        addRaw(std::exchange(lLabel, ""), lFront + lrLine);
        lFront.assign(lColumn, ' ');
    }
}

void ZTCPageText::addParagraphs(const std::string& acrLabel, const std::vector<std::string>& acrTexts) {
    for (std::size_t i = 0; i < acrTexts.size(); ++i) {
        add(i == 0 ? acrLabel : "", acrTexts[i]);
    }
}

void ZTCPageText::addTrouble(const ZTSTroubleText& acrTrouble) {
    addParagraphs("status", acrTrouble.mStatus);
    addParagraphs("action", acrTrouble.mAction);
    add("see", acrTrouble.mSee);
}

void ZTCPageText::addNumbered(const std::vector<ZTSTroubleText>& acrTroubles, std::size_t aMost) {
    const std::size_t lShown = aMost == 0 || acrTroubles.size() <= aMost ? acrTroubles.size() : aMost - 1;
    for (std::size_t i = 0; i < lShown; ++i) {
        const std::string lNumber = "[" + std::to_string(i + 1) + "] ";
        const std::string lTitle = cutText(escapeControls(acrTroubles[i].mTitle), mLineWidth - lNumber.size());
        const std::string lSubject = "   " + escapeControls(acrTroubles[i].mSubject);
        mText += lNumber + paint(lTitle, scBold);
        mText += cutText(lSubject, mLineWidth - std::min(mLineWidth, lNumber.size() + countCharacters(lTitle)));
        mText += "\n";
        addTrouble(acrTroubles[i]);
    }
    if (lShown < acrTroubles.size()) {
        mText += "and " + formatNumber(acrTroubles.size() - lShown) + " more: tavik paths --trouble\n";
    }
}
