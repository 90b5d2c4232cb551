#include "sensor/views/include/Explanation.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/EpisodeText.h"
#include "sensor/views/include/KindTexts.h"
#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::ordered_json;

static std::vector<ZTSExplainedPart> sPartsOfKind(const ZTSKindText& acrText) {
    return {{"means", {acrText.mMeans}}, {"usual causes", {acrText.mCauses}}, {"look at", {acrText.mLookAt}}};
}

static ZTSExplanation sExplainState(const ZTSStateRow& acrRow) {
    ZTSExplanation lExplanation;
    lExplanation.mSubject = "state";
    lExplanation.mId = acrRow.mpId;
    lExplanation.mTitle = getVerdictWord(acrRow.mVerdict);
    lExplanation.mTitle += acrRow.mpHeadline != nullptr ? std::string("; ") + acrRow.mpHeadline : "; events were lost";
    lExplanation.mParts = {
        {"means", {acrRow.mpMeans}}, {"usual causes", {acrRow.mpCauses}}, {"look at", {acrRow.mpLookAt}}};
    if (*acrRow.mpAction != '\0') {
        lExplanation.mParts.push_back({"action", {acrRow.mpAction}});
    }
    return lExplanation;
}

static ZTSExplanation sExplainTrouble(const ZTSSanTroubleRow& acrRow) {
    ZTSExplanation lExplanation;
    lExplanation.mSubject = "trouble";
    lExplanation.mId = acrRow.mpId;
    lExplanation.mTitle = acrRow.mpTitle;
    lExplanation.mParts = {{"means", {acrRow.mpMeans}},
                           {"usual causes", {acrRow.mpCauses}},
                           {"look at", {acrRow.mpLookAt}},
                           {"action", {getSanAction(acrRow)}}};
    return lExplanation;
}

std::optional<ZTSExplanation> explainTopic(std::string_view aText) {
    if (const ZTSStateRow* const lpRow = findState(aText)) {
        return sExplainState(*lpRow);
    }
    if (const ZTSSanTroubleRow* const lpRow = findSanTrouble(aText)) {
        return sExplainTrouble(*lpRow);
    }
    if (const ZTSKindText* const lpText = findKindText(aText)) {
        ZTSExplanation lExplanation;
        lExplanation.mSubject = "kind";
        lExplanation.mId = lpText->mKind;
        lExplanation.mTitle = lpText->mTitle;
        lExplanation.mParts = sPartsOfKind(*lpText);
        lExplanation.mParts.push_back({"counting", {lpText->mConsolidation}});
        return lExplanation;
    }
    return std::nullopt;
}

ZTSExplanation explainTopics() {
    ZTSExplanation lExplanation;
    lExplanation.mSubject = "topics";
    lExplanation.mTitle = "tavik explain KIND, STATE, TROUBLE or EPISODE (a number of tavik events)";
    ZTSExplainedPart lStates{"states", {}};
    for (const ZTSStateRow& lrRow : getStateTable()) {
        lStates.mTexts.emplace_back(lrRow.mpId);
    }
    ZTSExplainedPart lTroubles{"troubles", {}};
    for (const ZTSSanTroubleRow& lrRow : getSanTroubleTable()) {
        lTroubles.mTexts.emplace_back(lrRow.mpId);
    }
    ZTSExplainedPart lKinds{"kinds", {}};
    for (const ZTSKindText& lrText : getKindTexts()) {
        lKinds.mTexts.push_back(lrText.mKind);
    }
    lExplanation.mParts = {std::move(lStates), std::move(lTroubles), std::move(lKinds)};
    return lExplanation;
}

static std::vector<std::string> sFactsOf(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames,
                                         ZTCHistoryTime aNow) {
    std::vector<std::string> lFacts;
    lFacts.push_back(formatCount(acrEpisode.mCount, "event") + " in " + formatCount(acrEpisode.mRecords, "record") +
                     ", from " + formatShortTime(acrEpisode.mFirst, aNow) + " to " +
                     formatShortTime(acrEpisode.mLast, aNow) + "; " + (acrEpisode.isOpen() ? "still open" : "closed") +
                     ".");
    lFacts.push_back("Initiator: " + acrNames.describe(acrEpisode.mInitiator) + ".");
    if (acrEpisode.mRemotePort) {
        const std::string lName = acrNames.findName(acrEpisode.mRemotePort->mWwpn, acrEpisode.mRemotePort->mWwnn);
        lFacts.push_back("Remote port: " + acrEpisode.mRemotePort->mWwpn.toText() +
                         (lName.empty() ? "" : " (" + lName + ")") + ".");
    } else {
        lFacts.emplace_back("Remote port: not known, or the kind names none.");
    }
    const std::string lDetail = formatDetail(acrEpisode);
    if (!lDetail.empty()) {
        lFacts.push_back(lDetail + ".");
    }
    return lFacts;
}

ZTSExplanation explainEpisode(const ZTSEpisode& acrEpisode, std::vector<std::uint64_t> aEvidence,
                              const ZTCNameBook& acrNames, ZTCHistoryTime aNow) {
    const ZTSKindText* const lpText = findKindText(getKindName(acrEpisode.mKind));
    ZTSExplanation lExplanation;
    lExplanation.mSubject = "episode";
    lExplanation.mId = std::to_string(acrEpisode.mEpisode);
    lExplanation.mTitle =
        "Episode " + lExplanation.mId + ": " + (lpText != nullptr ? lpText->mTitle : getKindName(acrEpisode.mKind));
    lExplanation.mParts.push_back({"facts", sFactsOf(acrEpisode, acrNames, aNow)});
    if (lpText != nullptr) {
        const std::vector<ZTSExplainedPart> lParts = sPartsOfKind(*lpText);
        lExplanation.mParts.insert(lExplanation.mParts.end(), lParts.begin(), lParts.end());
    }
    lExplanation.mEvidence = std::move(aEvidence);
    lExplanation.mEpisode = acrEpisode;
    return lExplanation;
}

static void sAddLines(std::string& arText, const std::string& acrIndent, const std::string& acrParagraph,
                      std::size_t aWidth) {
    const std::string lParagraph = escapeControls(acrParagraph);
    const std::size_t lRoom = aWidth - acrIndent.size();
    // What fits keeps its blanks: a command may have columns.
    const bool lFits = !lParagraph.empty() && countCharacters(lParagraph) <= lRoom;
    for (const std::string& lrLine : lFits ? std::vector<std::string>{lParagraph} : wrapText(lParagraph, lRoom)) {
        arText += acrIndent + lrLine + "\n";
    }
}

std::string formatExplanation(const ZTSExplanation& acrExplanation, const ZTSTextStyle& acrStyle) {
    static constexpr std::size_t scLeastWidth = 24;
    static constexpr std::size_t scMostWidth = 100;
    static constexpr std::size_t scMostEvidence = 20;
    const std::size_t lWidth = std::clamp(acrStyle.mWidth, scLeastWidth, scMostWidth);
    const auto lPaint = [&acrStyle](const std::string& acrText) {
        return acrStyle.mHasColor ? "\x1b[1m" + acrText + "\x1b[0m" : acrText;
    };
    std::string lText = lPaint(escapeControls(acrExplanation.mTitle)) + "\n";
    const bool lIsList = acrExplanation.mSubject == "topics";
    for (const ZTSExplainedPart& lrPart : acrExplanation.mParts) {
        lText += "\n" + lPaint(lrPart.mLabel) + "\n";
        std::string lList;
        for (const std::string& lrParagraph : lrPart.mTexts) {
            if (lIsList) {
                lList += (lList.empty() ? "" : ", ") + lrParagraph;
            } else {
                sAddLines(lText, "  ", lrParagraph, lWidth);
            }
        }
        sAddLines(lText, "  ", lList, lWidth);
    }
    if (!acrExplanation.mEvidence.empty()) {
        std::string lNumbers;
        const std::size_t lCount = acrExplanation.mEvidence.size();
        for (std::size_t i = 0; i < std::min(lCount, scMostEvidence); ++i) {
            lNumbers += (i == 0 ? "" : ", ") + std::to_string(acrExplanation.mEvidence[i]);
        }
        lNumbers += lCount > scMostEvidence ? ", and " + std::to_string(lCount - scMostEvidence) + " more" : "";
        lText += "\n" + lPaint("evidence") + "\n";
        sAddLines(lText, "  ", "Records " + lNumbers + ": tavik events --records", lWidth);
    }
    return lText;
}

ZTCJson makeExplainDocument(const ZTSExplanation& acrExplanation, const std::string& acrHost,
                            const std::string& acrStoreId, const ZTCNameBook& acrNames) {
    ZTCJson lDocument = beginDocument("explain", acrHost, acrStoreId);
    lDocument["subject"] = acrExplanation.mSubject;
    lDocument["id"] = acrExplanation.mId.empty() ? ZTCJson(nullptr) : ZTCJson(acrExplanation.mId);
    lDocument["title"] = acrExplanation.mTitle;
    lDocument["parts"] = ZTCJson::array();
    for (const ZTSExplainedPart& lrPart : acrExplanation.mParts) {
        lDocument["parts"].push_back({{"label", lrPart.mLabel}, {"texts", lrPart.mTexts}});
    }
    lDocument["evidence"] = acrExplanation.mEvidence;
    lDocument["episode"] = acrExplanation.mEpisode ? toJson(*acrExplanation.mEpisode, acrNames) : ZTCJson(nullptr);
    return lDocument;
}
