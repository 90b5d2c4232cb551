#include "sensor/views/src/PageText.h"

#include <algorithm>

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

void ZTCPageText::add(const std::string& acrLabel, const std::string& acrText) {
    const std::string lText = escapeControls(acrText);
    const std::size_t lRoom = mLineWidth - scTextColumn;
    const bool lFits = countCharacters(lText) <= lRoom;
    bool lIsFirst = true;
    for (const std::string& lrLine : lFits ? std::vector<std::string>{lText} : wrapText(lText, lRoom)) {
        addRaw(lIsFirst ? acrLabel : "", lrLine);
        lIsFirst = false;
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
