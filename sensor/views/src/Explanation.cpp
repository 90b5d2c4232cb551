#include "sensor/views/include/Explanation.h"

#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>
#include <sstream>

#include "sensor/views/include/DiagnosisView.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/EpisodePlace.h"
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

/// The rule's steps, with words where a finding has names.
static std::vector<std::string> sStepsOf(const ZTSRule& acrRule) {
    static constexpr std::array<std::array<const char*, 2>, 4> scPlaces{
        {{"{port}", "the port"}, {"{wwpn}", "WWPN"}, {"{initiator}", "INITIATOR"}, {"{host}", "hostN"}}};
    std::vector<std::string> lSteps;
    std::istringstream lLines(acrRule.mpNext);
    for (std::string lLine; std::getline(lLines, lLine);) {
        for (const auto& [lpPlace, lpWord] : scPlaces) {
            for (std::size_t lAt = lLine.find(lpPlace); lAt != std::string::npos; lAt = lLine.find(lpPlace)) {
                lLine.replace(lAt, std::string_view(lpPlace).size(), lpWord);
            }
        }
        lSteps.push_back(std::move(lLine));
    }
    return lSteps;
}

static ZTSExplanation sExplainRule(const ZTSRule& acrRule) {
    ZTSExplanation lExplanation;
    lExplanation.mSubject = "rule";
    lExplanation.mId = acrRule.mpId;
    lExplanation.mTitle = acrRule.mpTitle;
    lExplanation.mParts = {
        {"looks for", {acrRule.mpWanted}}, {"means", {acrRule.mpMeans}},
        {"unless", {acrRule.mpAgainst}},   {"look at", sStepsOf(acrRule)},
        {"kinds", {acrRule.mpKinds}},      {"severity", {getFindingSeverityName(acrRule.mSeverity)}}};
    return lExplanation;
}

static ZTSExplanation sExplainTopics() {
    ZTSExplanation lExplanation;
    lExplanation.mSubject = "topics";
    lExplanation.mTitle = "tavik explain KIND, STATE, TROUBLE, RULE or EPISODE (a number of tavik events)";
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
    ZTSExplainedPart lRules{"rules", {}};
    for (const ZTSRule& lrRule : getRules()) {
        lRules.mTexts.emplace_back(lrRule.mpId);
    }
    lExplanation.mParts = {std::move(lStates), std::move(lTroubles), std::move(lKinds), std::move(lRules)};
    return lExplanation;
}

std::optional<ZTSExplanation> explainTopic(std::string_view aText) {
    if (aText == "topics") {
        return sExplainTopics();
    }
    if (const ZTSStateRow* const lpRow = findState(aText)) {
        return sExplainState(*lpRow);
    }
    if (const ZTSSanTroubleRow* const lpRow = findSanTrouble(aText)) {
        return sExplainTrouble(*lpRow);
    }
    if (const ZTSRule* const lpRule = findRule(aText)) {
        return sExplainRule(*lpRule);
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

/// "LUN 12: mpatha (sdc), ACME ARRAY-9, on /srv/data.", a line each.
static void sAddDevices(const std::vector<ZTSPlaceDevice>& acrDevices, std::vector<std::string>& arFacts) {
    static constexpr std::size_t scMostDevices = 8;
    for (std::size_t i = 0; i < std::min(acrDevices.size(), scMostDevices); ++i) {
        const ZTSPlaceDevice& lrDevice = acrDevices[i];
        const std::string lDisk = lrDevice.mDisk.value_or("no disk");
        std::string lText = "LUN " + std::to_string(lrDevice.mLun) + ": ";
        lText += lrDevice.mMultipath ? *lrDevice.mMultipath + " (" + lDisk + ")" : lDisk;
        lText += lrDevice.mVendor || lrDevice.mModel ? "," : "";
        lText += (lrDevice.mVendor ? " " + *lrDevice.mVendor : "") + (lrDevice.mModel ? " " + *lrDevice.mModel : "");
        for (std::size_t j = 0; j < lrDevice.mMounts.size(); ++j) {
            lText += (j == 0 ? ", on " : " and ") + lrDevice.mMounts[j];
        }
        arFacts.push_back(lText + ".");
    }
    if (acrDevices.size() > scMostDevices) {
        arFacts.push_back("And " + formatCount(acrDevices.size() - scMostDevices, "more LUN") +
                          ": tavik --json events.");
    }
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
    sAddDevices(findPlace(acrEpisode, acrNames).mDevices, lFacts);
    const std::string lCounters = formatCounters(countersBeside(acrEpisode, acrNames));
    if (!lCounters.empty()) {
        lFacts.push_back("Counters that rose in the same minutes: " + lCounters + ".");
    }
    return lFacts;
}

ZTSExplanation explainEpisode(const ZTSEpisode& acrEpisode, std::vector<std::uint64_t> aEvidence,
                              std::vector<ZTSFinding> aFindings, const ZTCNameBook& acrNames, ZTCHistoryTime aNow) {
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
    lExplanation.mFindings = std::move(aFindings);
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

std::string formatExplanation(const ZTSExplanation& acrExplanation, const ZTSTextStyle& acrStyle, ZTCHistoryTime aNow) {
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
    if (!acrExplanation.mFindings.empty()) {
        lText += "\n" + lPaint("part of") + "\n";
    }
    for (std::size_t i = 0; i < acrExplanation.mFindings.size(); ++i) {
        lText += formatFinding(acrExplanation.mFindings[i], i + 1, acrStyle, aNow).substr(i == 0 ? 1 : 0);
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
    lDocument["findings"] = ZTCJson::array();
    for (const ZTSFinding& lrFinding : acrExplanation.mFindings) {
        lDocument["findings"].push_back(toJson(lrFinding, acrNames));
    }
    return lDocument;
}
