#include "sensor/views/include/KindTexts.h"

#include "sensor/views/src/EventsPage.h"

/// Without the marks of emphasis and of code.
static std::string sPlain(std::string_view aText) {
    std::string lText;
    for (const char lChar : aText) {
        if (lChar != '*' && lChar != '`') {
            lText += lChar;
        }
    }
    return lText;
}

/// Cuts the part in front of the separator off.
static std::string_view sCutOff(std::string_view& arRest, std::string_view aSeparator) {
    const std::size_t lEnd = arRest.find(aSeparator);
    const std::string_view lPart = arRest.substr(0, lEnd);
    arRest.remove_prefix(lEnd == std::string_view::npos ? arRest.size() : lEnd + aSeparator.size());
    return lPart;
}

/// Where a paragraph belongs, by its beginning.
struct ZTSParagraphRule {
    std::string_view mBeginning;
    std::string ZTSKindText::*mpMember;
    bool mKeepsBeginning;
};

static constexpr ZTSParagraphRule scParagraphs[] = {
    {"*Usual causes.* ", &ZTSKindText::mCauses, false},
    {"*Look at.* ", &ZTSKindText::mLookAt, false},
    {"*The next event of the kind is* ", &ZTSKindText::mConsolidation, true},
};

static void sReadParagraph(std::string_view aParagraph, ZTSKindText& arText) {
    for (const ZTSParagraphRule& lrRule : scParagraphs) {
        if (aParagraph.starts_with(lrRule.mBeginning)) {
            arText.*lrRule.mpMember = sPlain(aParagraph.substr(lrRule.mKeepsBeginning ? 0 : lrRule.mBeginning.size()));
            return;
        }
    }
    const bool lIsOther = aParagraph.empty() || aParagraph.starts_with("Category") || aParagraph.starts_with("|");
    if (!lIsOther && arText.mMeans.empty()) {
        arText.mMeans = sPlain(aParagraph);
    }
}

std::vector<ZTSKindText> parseKindTexts(std::string_view aPage) {
    std::vector<ZTSKindText> lTexts;
    sCutOff(aPage, "\n## ");
    while (!aPage.empty()) {
        std::string_view lSection = sCutOff(aPage, "\n## ");
        std::string_view lHeading = sCutOff(lSection, "\n");
        ZTSKindText lText;
        lText.mTitle = sCutOff(lHeading, " (`");
        lText.mKind = sCutOff(lHeading, "`)");
        if (lText.mKind.empty()) {
            continue;
        }
        while (!lSection.empty()) {
            std::string_view lParagraph = sCutOff(lSection, "\n\n");
            while (lParagraph.starts_with('\n')) {
                lParagraph.remove_prefix(1);
            }
            while (lParagraph.ends_with('\n')) {
                lParagraph.remove_suffix(1);
            }
            sReadParagraph(lParagraph, lText);
        }
        lTexts.push_back(std::move(lText));
    }
    return lTexts;
}

const std::vector<ZTSKindText>& getKindTexts() {
    // Never destroyed: other exit-time code may ask.
    static const auto* const spTexts = new std::vector<ZTSKindText>(parseKindTexts(gcEventsPage));
    return *spTexts;
}

const ZTSKindText* findKindText(std::string_view aKind) {
    for (const ZTSKindText& lrText : getKindTexts()) {
        if (lrText.mKind == aKind) {
            return &lrText;
        }
    }
    return nullptr;
}
