#include "sensor/views/include/CheckView.h"

#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>

#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TextTable.h"

static constexpr std::array<const char*, 4> scWords{"OK", "WARNING", "CRITICAL", "UNKNOWN"};

/// The result for each verdict.
static constexpr std::array<ZTECheckResult, ZTVD_Count> scResults{ZTCR_Critical, ZTCR_Unknown, ZTCR_Warning,
                                                                  ZTCR_Warning, ZTCR_Ok};

const char* getCheckWord(ZTECheckResult aResult) {
    return scWords.at(static_cast<std::size_t>(aResult));
}

/// The result for each severity of the SAN's troubles: a notice is only mentioned.
static constexpr std::array<ZTECheckResult, ZTSS_Count> scSanResults{ZTCR_Ok, ZTCR_Warning, ZTCR_Critical};

/// Adds what the SAN's troubles make of the result. Where Tavik itself does not collect it says so alone: what it knows
/// of the SAN is of earlier.
static void sAddSan(const ZTSStatusFacts& acrFacts, ZTSCheck& arCheck) {
    if (!acrFacts.mHistory || !acrFacts.mHistory->mSan || arCheck.mResult > ZTCR_Warning) {
        return;
    }
    const ZTSSanFacts& lrSan = acrFacts.mHistory->mSan->mFacts;
    std::size_t lNotices = 0;
    for (const ZTSSanTrouble& lrTrouble : lrSan.mTroubles) {
        arCheck.mResult = std::max(arCheck.mResult, scSanResults.at(lrTrouble.mSeverity));
        if (lrTrouble.mSeverity == ZTSS_Notice) {
            ++lNotices;
            continue;
        }
        const ZTSTroubleText lText = describeSanTrouble(lrTrouble, lrSan, acrFacts.mNames, acrFacts.mNow);
        arCheck.mText += "; " + lText.mTitle + " " + lText.mSubject;
    }
    arCheck.mText += lNotices == 0 ? "" : "; " + formatCount(lNotices, "notice") + ": tavik paths";
}

/// Adds the open warnings of the configuration's rules.
static void sAddWarnings(const ZTSStatusFacts& acrFacts, ZTSCheck& arCheck) {
    if (!acrFacts.mLive || !acrFacts.mLive->mWarnings || acrFacts.mLive->mWarnings->empty()) {
        return;
    }
    const std::vector<ZTSLiveWarning>& lrWarnings = *acrFacts.mLive->mWarnings;
    arCheck.mResult = arCheck.mResult == ZTCR_Ok ? ZTCR_Warning : arCheck.mResult;
    arCheck.mText += "; open warning: " + lrWarnings.front().mText;
    arCheck.mText += lrWarnings.size() == 1 ? "" : " and " + formatNumber(lrWarnings.size() - 1) + " more";
}

ZTSCheck makeCheck(const ZTSStatusFacts& acrFacts, std::optional<std::uint64_t> aEvents) {
    const ZTSJudgement lJudgement = judge(acrFacts);
    const ZTSStateRow& lrWorst = lJudgement.getWorst();
    ZTSCheck lCheck;
    lCheck.mResult = lrWorst.mIsWithoutFc ? ZTCR_Ok : scResults.at(lrWorst.mVerdict);
    lCheck.mText = formatHeadline(acrFacts, lJudgement, false);
    sAddSan(acrFacts, lCheck);
    sAddWarnings(acrFacts, lCheck);
    lCheck.mEvents = aEvents;
    if (acrFacts.mHistory) {
        lCheck.mOpenEpisodes = acrFacts.mHistory->mOpenEpisodes;
    }
    const ZTSLossSum lLosses = sumLosses(acrFacts);
    if (acrFacts.mHistory && lLosses.mIsRefusedKnown) {
        lCheck.mLost = lLosses.getTotal();
    }
    if (acrFacts.mLive) {
        lCheck.mHeldBytes = acrFacts.mLive->mAgent.mHeldBytes;
        lCheck.mLimitBytes = acrFacts.mLive->mAgent.mLimitBytes;
    }
    return lCheck;
}

std::string formatCheck(const ZTSCheck& acrCheck) {
    std::string lText = escapeControls(acrCheck.mText);
    std::replace(lText.begin(), lText.end(), '|', '/');  // it would begin the performance data
    std::string lData;
    const auto lAdd = [&lData](const char* apLabel, const std::optional<std::uint64_t>& acrValue,
                               const std::string& acrRest) {
        if (acrValue) {
            lData += " " + std::string(apLabel) + "=" + std::to_string(*acrValue) + acrRest;
        }
    };
    lAdd("events", acrCheck.mEvents, "");
    lAdd("open", acrCheck.mOpenEpisodes, "");
    lAdd("lost", acrCheck.mLost, "");
    lAdd("held", acrCheck.mHeldBytes,
         acrCheck.mLimitBytes ? "B;;;0;" + std::to_string(*acrCheck.mLimitBytes) : std::string("B"));
    return "TAVIK " + std::string(getCheckWord(acrCheck.mResult)) + " - " + lText +
           (lData.empty() ? "" : " |" + lData) + "\n";
}

nlohmann::ordered_json makeCheckDocument(const ZTSCheck& acrCheck, const ZTSStatusFacts& acrFacts) {
    using ZTCJson = nlohmann::ordered_json;
    const auto lValue = [](const std::optional<std::uint64_t>& acrValue) {
        return acrValue ? ZTCJson(*acrValue) : ZTCJson(nullptr);
    };
    ZTCJson lDocument = beginDocument("check", acrFacts.mHost, acrFacts.mHistory ? acrFacts.mHistory->mStoreId : "");
    lDocument["result"] = getCheckWord(acrCheck.mResult);
    lDocument["exit"] = static_cast<int>(acrCheck.mResult);
    lDocument["text"] = acrCheck.mText;
    lDocument["events"] = lValue(acrCheck.mEvents);
    lDocument["openEpisodes"] = lValue(acrCheck.mOpenEpisodes);
    lDocument["lost"] = lValue(acrCheck.mLost);
    lDocument["heldBytes"] = lValue(acrCheck.mHeldBytes);
    lDocument["limitBytes"] = lValue(acrCheck.mLimitBytes);
    return lDocument;
}
