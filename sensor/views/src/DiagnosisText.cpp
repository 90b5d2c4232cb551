#include <algorithm>
#include <map>
#include <set>

#include "sensor/views/include/DiagnosisView.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

/// Labels stand at the right edge of a column of this width, followed by ": ".
static constexpr std::size_t scLabelWidth = 8;
static constexpr std::size_t scTextColumn = scLabelWidth + 2;
static constexpr std::size_t scLeastWidth = 40;
static constexpr std::size_t scMostWidth = 100;
/// Numbers that are printed of one finding.
static constexpr std::size_t scMostNumbers = 12;

static constexpr const char* scBold = "1";
static constexpr const char* scYellow = "1;33";
static constexpr const char* scRed = "1;31";

static std::string sPaint(const std::string& acrText, const char* apColor, const ZTSTextStyle& acrStyle) {
    return acrStyle.mHasColor ? "\x1b[" + std::string(apColor) + "m" + acrText + "\x1b[0m" : acrText;
}

static std::size_t sWidth(const ZTSTextStyle& acrStyle) {
    return std::clamp(acrStyle.mWidth, scLeastWidth, scMostWidth);
}

/// A paragraph, wrapped; what fits keeps its blanks: a command may have columns.
static void sAdd(std::string& arText, const std::string& acrIndent, const std::string& acrParagraph,
                 const ZTSTextStyle& acrStyle) {
    const std::string lParagraph = escapeControls(acrParagraph);
    const std::size_t lRoom = sWidth(acrStyle) - scTextColumn;
    const bool lFits = countCharacters(lParagraph) <= lRoom;
    std::string lIndent = acrIndent;
    for (const std::string& lrLine : lFits ? std::vector<std::string>{lParagraph} : wrapText(lParagraph, lRoom)) {
        arText += lIndent + lrLine + "\n";
        lIndent.assign(scTextColumn, ' ');
    }
}

static void sAddLabelled(std::string& arText, const std::string& acrLabel, const std::vector<std::string>& acrTexts,
                         const ZTSTextStyle& acrStyle) {
    std::string lIndent = std::string(scLabelWidth - acrLabel.size(), ' ') + acrLabel + ": ";
    for (const std::string& lrText : acrTexts) {
        sAdd(arText, lIndent, lrText, acrStyle);
        lIndent.assign(scTextColumn, ' ');
    }
}

static std::string sNumbers(const std::vector<std::uint64_t>& acrNumbers) {
    std::string lText;
    for (std::size_t i = 0; i < std::min(acrNumbers.size(), scMostNumbers); ++i) {
        lText += (i == 0 ? "" : ", ") + std::to_string(acrNumbers[i]);
    }
    return acrNumbers.size() > scMostNumbers
               ? lText + " and " + formatNumber(acrNumbers.size() - scMostNumbers) + " more"
               : lText;
}

/// "no source", "no rights", "failed".
static std::string sStateText(ZTEKindState aState) {
    std::string lText = getKindStateName(aState);
    std::ranges::replace(lText, '_', ' ');
    return lText;
}

/// "port-busy (no source), queue-depth (no rights)", each kind once.
static std::string sUnobserved(const std::vector<ZTSUnobserved>& acrUnobserved) {
    std::map<ZTEKindState, std::set<std::string>> lByState;
    for (const ZTSUnobserved& lrUnobserved : acrUnobserved) {
        lByState[lrUnobserved.mState].insert(getKindName(lrUnobserved.mKind));
    }
    std::string lText;
    for (const auto& [lState, lrKinds] : lByState) {
        lText += lText.empty() ? "" : "; ";
        std::string lList;
        for (const std::string& lrKind : lrKinds) {
            lList += (lList.empty() ? "" : ", ") + lrKind;
        }
        lText += lList + " (" + sStateText(lState) + ")";
    }
    return lText;
}

/// "at 09:58:03", "from 09:58:03 to 10:02:11".
static std::string sTimes(const ZTSFinding& acrFinding, ZTCHistoryTime aNow) {
    const std::string lFirst = formatShortTime(acrFinding.mFirst, aNow);
    const std::string lLast = formatShortTime(acrFinding.mLast, aNow);
    return lFirst == lLast ? lFirst : lFirst + " to " + lLast;
}

std::string formatFinding(const ZTSFinding& acrFinding, std::size_t aNumber, const ZTSTextStyle& acrStyle,
                          ZTCHistoryTime aNow) {
    const ZTSRule& lrRule = *acrFinding.mpRule;
    const char* const lpColor = acrFinding.mSeverity == ZTSV_Problem   ? scRed
                                : acrFinding.mSeverity == ZTSV_Warning ? scYellow
                                                                       : scBold;
    std::string lText = "\n[" + std::to_string(aNumber) + "] " + sPaint(lrRule.mpTitle, lpColor, acrStyle) + "\n";
    sAddLabelled(lText, "where", {acrFinding.mSubject}, acrStyle);
    sAddLabelled(lText, "when", {sTimes(acrFinding, aNow)}, acrStyle);
    sAddLabelled(lText, "seen", acrFinding.mSeen, acrStyle);
    sAddLabelled(lText, "means", {lrRule.mpMeans}, acrStyle);
    if (acrFinding.mAgainst.empty()) {
        sAddLabelled(lText, "unless", {lrRule.mpAgainst}, acrStyle);
    } else {
        sAddLabelled(lText, "against", acrFinding.mAgainst, acrStyle);
    }
    sAddLabelled(lText, "next", acrFinding.mNext, acrStyle);
    sAddLabelled(lText, "evidence",
                 {(acrFinding.mEpisodes.size() == 1 ? "episode " : "episodes ") + sNumbers(acrFinding.mEpisodes) +
                  " (seq " + sNumbers(acrFinding.mSeqs) + ")"},
                 acrStyle);
    if (!acrFinding.mUnobserved.empty()) {
        sAddLabelled(lText, "unheard", {sUnobserved(acrFinding.mUnobserved)}, acrStyle);
    }
    sAddLabelled(lText, "see", {"tavik explain " + std::string(lrRule.mpId)}, acrStyle);
    return lText;
}

static std::string sHeadline(const ZTSDiagnosis& acrDiagnosis, ZTCHistoryTime aNow) {
    const std::string lTime =
        formatShortTime(acrDiagnosis.mFrom, aNow) + " to " + formatShortTime(acrDiagnosis.mTo, aNow);
    const std::size_t lShown = acrDiagnosis.countShown();
    if (acrDiagnosis.mEpisodes == 0) {
        return "Nothing: no event from " + lTime + ".";
    }
    const std::string lEvents = formatCount(acrDiagnosis.mOccurrences, "event") + " in " +
                                formatCount(acrDiagnosis.mEpisodes, "episode") + " from " + lTime + ".";
    return (lShown == 0 ? "Nothing: no rule sees trouble. " : formatCount(lShown, "finding") + ". ") + lEvents;
}

/// Rules that need one of these kinds: without it they see less, or nothing.
static std::string sConcernedRules(const std::vector<ZTSUnobserved>& acrUnobserved) {
    std::string lText;
    for (const ZTSRule& lrRule : getRules()) {
        const std::string lKinds = " " + std::string(lrRule.mpKinds) + " ";
        const bool lIsConcerned = std::ranges::any_of(acrUnobserved, [&lKinds](const ZTSUnobserved& acrKind) {
            return lKinds.find(" " + getKindName(acrKind.mKind) + " ") != std::string::npos;
        });
        lText += lIsConcerned ? (lText.empty() ? "" : ", ") + std::string(lrRule.mpId) : "";
    }
    return lText;
}

/// What limits the answer.
static std::vector<std::string> sLimits(const ZTSDiagnosis& acrDiagnosis) {
    std::vector<std::string> lTexts;
    // The collector notes every minute that it runs.
    if (acrDiagnosis.mNotRunning > std::chrono::minutes(2)) {
        lTexts.push_back("Tavik did not run for " + formatSpan(acrDiagnosis.mNotRunning) +
                         " of this time. Nothing is known of what happened then.");
    }
    if (acrDiagnosis.mGaps != 0) {
        lTexts.push_back("Events are missing: " + formatCount(acrDiagnosis.mGaps, "gap") + ", see tavik explain gap.");
    }
    if (acrDiagnosis.mIsCut) {
        lTexts.push_back("There were more episodes: only the newest " + formatNumber(acrDiagnosis.mEpisodes) +
                         " were looked at. Give --since and --until.");
    }
    if (!acrDiagnosis.mUnobserved.empty()) {
        lTexts.push_back("Not heard on all ports: " + sUnobserved(acrDiagnosis.mUnobserved) + ".");
        const std::string lRules = sConcernedRules(acrDiagnosis.mUnobserved);
        if (!lRules.empty()) {
            lTexts.push_back("These rules see less or nothing for it: " + lRules + ".");
        }
    }
    if (!acrDiagnosis.mTopologyScanned) {
        lTexts.emplace_back("What hangs on the ports at that time is not known: rules that compare ports see less.");
    } else if (acrDiagnosis.mIsTopologyStale) {
        lTexts.emplace_back("Names and states of ports are old: some files of the kernel do not answer.");
    }
    return lTexts;
}

std::string formatDiagnosis(const ZTSDiagnosis& acrDiagnosis, const ZTSTextStyle& acrStyle, bool aIsAll,
                            ZTCHistoryTime aNow) {
    std::string lText;
    for (const std::string& lrLine : wrapText(sHeadline(acrDiagnosis, aNow), sWidth(acrStyle))) {
        lText += lrLine + "\n";
    }
    std::size_t lNumber = 0;
    std::vector<std::string> lHidden;
    for (const ZTSFinding& lrFinding : acrDiagnosis.mFindings) {
        if (lrFinding.mSeverity == ZTSV_Noise && !aIsAll) {
            lHidden.push_back(formatCount(lrFinding.mOccurrences, "event") + " in " +
                              formatCount(lrFinding.mEpisodes.size(), "episode") + ", " + lrFinding.mpRule->mpId +
                              ". Harmless; tavik explain --all shows them.");
        } else {
            lText += formatFinding(lrFinding, ++lNumber, acrStyle, aNow);
        }
    }
    std::vector<std::string> lUnexplained;
    if (!acrDiagnosis.mUnexplained.empty()) {
        std::string lList;
        for (const ZTSUnexplained& lrKind : acrDiagnosis.mUnexplained) {
            lList += (lList.empty() ? "" : ", ") + formatNumber(lrKind.mOccurrences) + " " + getKindName(lrKind.mKind);
        }
        lUnexplained.push_back("No rule explains " + lList + ". See tavik events, and tavik explain KIND.");
    }
    const std::vector<std::string> lLimits = sLimits(acrDiagnosis);
    if (!lHidden.empty() || !lUnexplained.empty() || !lLimits.empty()) {
        lText += "\n";
    }
    sAddLabelled(lText, "hidden", lHidden, acrStyle);
    sAddLabelled(lText, "other", lUnexplained, acrStyle);
    sAddLabelled(lText, "limits", lLimits, acrStyle);
    return lText;
}
