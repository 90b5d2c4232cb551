#include "sensor/views/include/Judgement.h"

#include <algorithm>
#include <string_view>

#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/src/StateTexts.h"

ZTSJudgement judge(const ZTSStatusFacts& acrFacts) {
    ZTSJudgement lJudgement;
    for (const ZTSStateRow& lrRow : getStateTable()) {
        const bool lIsExcluded = lrRow.mVerdict <= ZTVD_NotKnown && !lJudgement.mStates.empty();
        const bool lIsNeedless = lrRow.mVerdict == ZTVD_Collecting && !lJudgement.mStates.empty();
        if (!lIsExcluded && !lIsNeedless && lrRow.mpHolds(acrFacts)) {
            lJudgement.mStates.push_back(&lrRow);
        }
    }
    return lJudgement;
}

static std::string sLossHeadline(const ZTSStatusFacts& acrFacts) {
    const ZTSLossSum lSum = sumLosses(acrFacts);
    const std::string lSpan = formatLossSpan(acrFacts);
    if (lSum.getTotal() == 0) {
        return lSum.mIsAtLeast ? "unknown how much was lost" + lSpan : "a gap" + lSpan + ", nothing lost";
    }
    return (lSum.mIsAtLeast ? "at least " : "") + formatCount(lSum.getTotal(), "event") + " lost" + lSpan;
}

std::string formatHeadline(const ZTSStatusFacts& acrFacts, const ZTSJudgement& acrJudgement, bool aHasSince) {
    const ZTSStateRow& lrWorst = acrJudgement.getWorst();
    std::string lText = getVerdictWord(lrWorst.mVerdict);
    if (aHasSince && lrWorst.mVerdict == ZTVD_Collecting && acrFacts.mLive) {
        lText += formatSince(acrFacts.mLive->mAgent.mSince, acrFacts);
    }
    return lText + "; " + (lrWorst.mpHeadline != nullptr ? lrWorst.mpHeadline : sLossHeadline(acrFacts));
}

/// The table's action with the configured files and folders in place of the default ones.
static std::string sWithPlaces(std::string_view aAction, const ZTSStatusPlaces& acrPlaces) {
    const ZTSStatusPlaces lDefaults;
    const std::pair<const std::string&, const std::string&> lPlaces[] = {
        {lDefaults.mSettingsFile, acrPlaces.mSettingsFile},
        {lDefaults.mStateDirectory, acrPlaces.mStateDirectory},
        {lDefaults.mAgentLog, acrPlaces.mAgentLog}};
    std::string lText;
    while (!aAction.empty()) {
        const auto* const lpPlace =
            std::ranges::find_if(lPlaces, [&](const auto& acrPlace) { return aAction.starts_with(acrPlace.first); });
        const bool lIsPlace = lpPlace != std::end(lPlaces);
        lText += lIsPlace ? lpPlace->second : std::string(1, aAction.front());
        aAction.remove_prefix(lIsPlace ? lpPlace->first.size() : 1);
    }
    return lText;
}

static std::vector<std::string> sSplitLines(std::string_view aText) {
    std::vector<std::string> lLines;
    while (!aText.empty()) {
        const std::size_t lEnd = std::min(aText.find('\n'), aText.size());
        lLines.emplace_back(aText.substr(0, lEnd));
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
    }
    return lLines;
}

std::vector<ZTSTroubleText> describeSanTroubles(const ZTSStatusFacts& acrFacts) {
    if (!acrFacts.mHistory || !acrFacts.mHistory->mSan) {
        return {};
    }
    return describeSanTroubles(acrFacts.mHistory->mSan->mFacts, acrFacts.mNames, acrFacts.mNow, ZTSS_Warning);
}

std::vector<ZTSTroubleText> describeTroubles(const ZTSStatusFacts& acrFacts, const ZTSJudgement& acrJudgement) {
    std::vector<ZTSTroubleText> lTroubles;
    for (const ZTSStateRow* lpRow : acrJudgement.mStates) {
        if (lpRow->mVerdict != ZTVD_Collecting) {
            lTroubles.push_back({.mId = lpRow->mpId,
                                 .mTitle = "",
                                 .mSubject = "",
                                 .mStatus = lpRow->mpStatus(acrFacts),
                                 .mAction = sSplitLines(sWithPlaces(lpRow->mpAction, acrFacts.mPlaces)),
                                 .mSee = lpRow->mpSee});
        }
    }
    return lTroubles;
}
