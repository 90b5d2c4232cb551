#include "sensor/views/src/StateTexts.h"

#include <algorithm>
#include <cctype>

#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

using ZTCLines = std::vector<std::string>;

std::string formatSince(const std::optional<ZTCHistoryTime>& acrTime, const ZTSStatusFacts& acrFacts) {
    return acrTime ? " since " + formatShortTime(*acrTime, acrFacts.mNow) : "";
}

static ZTCLines sOneLine(const std::string& acrText) {
    return acrText.empty() ? ZTCLines() : ZTCLines{acrText};
}

static std::string sNextStart(const ZTSStatusFacts& acrFacts) {
    const auto& lrNext = acrFacts.mLive->mKeeper.mNextStart;
    return lrNext ? " The next start is at " + formatShortTime(*lrNext, acrFacts.mNow) + "." : "";
}

/// Why no agent runs, as a sentence. The sensor's words go on after "agent: ".
static std::string sDescribeProblem(const ZTSLiveAgent& acrAgent) {
    static constexpr std::string_view scEnded = "ended: ";
    std::string lWords = acrAgent.mProblem;
    if (lWords.empty() && !acrAgent.mEndReason.empty()) {
        lWords = std::string(scEnded) + acrAgent.mEndReason;
    }
    if (lWords.empty()) {
        return "Why the last one ended is not known.";
    }
    if (lWords == "ended: other") {
        return "The last one failed; its log has the reason.";
    }
    if (lWords.starts_with(scEnded)) {
        lWords = "The last one " + lWords;
    } else if (lWords.starts_with("cannot")) {
        lWords = "It " + lWords;
    }
    lWords.front() = static_cast<char>(std::toupper(static_cast<unsigned char>(lWords.front())));
    return lWords + (lWords.ends_with('.') ? "" : ".");
}

static std::string sDescribeLeftPage(const ZTSStatusFacts& acrFacts) {
    const ZTSLeftPage& lrPage = *acrFacts.mLeftPage;
    if (lrPage.mIsAgentAlive) {
        return "Its agent runs on and holds " + formatCount(lrPage.mHeld, "event") + ".";
    }
    return lrPage.mHeld == 0
               ? "Its agent held nothing (from the page it left)."
               : "Lost: the " + formatCount(lrPage.mHeld, "event") + " its agent held (from the page it left).";
}

ZTCLines describeNewerHistoryState(const ZTSStatusFacts& acrFacts) {
    return {acrFacts.mHistoryProblem + ". No sensor of this version runs with it, and nothing is collected."};
}

ZTCLines describeNoSensorState(const ZTSStatusFacts& acrFacts) {
    if (!acrFacts.mHistory) {
        return {"Nothing listens on its control socket."};
    }
    if (!acrFacts.mHistory->mLastRun) {
        return {"None has ever run with this history."};
    }
    return {"It was stopped in order at " + formatShortTime(acrFacts.mHistory->mLastRun->mTo, acrFacts.mNow) +
            ". Unseen: all since."};
}

ZTCLines describeVanishedState(const ZTSStatusFacts& acrFacts) {
    const bool lHasRun = acrFacts.mHistory && acrFacts.mHistory->mLastRun;
    std::string lText = "It vanished";
    lText += lHasRun ? " about " + formatShortTime(acrFacts.mHistory->mLastRun->mTo, acrFacts.mNow) : "";
    lText += " without an orderly stop.";
    lText += acrFacts.mLeftPage ? " " + sDescribeLeftPage(acrFacts) : "";
    return {lText + " Unseen: all since."};
}

ZTCLines describeAnswerState(const ZTSStatusFacts& acrFacts) {
    return sOneLine(acrFacts.mAnswerProblem);
}

ZTCLines describeStoppingState(const ZTSStatusFacts& acrFacts) {
    return {"It has been asked to stop" + formatSince(acrFacts.mLive->mKeeper.mSince, acrFacts) +
            ": it takes in what the agent holds, and ends within 20 s."};
}

ZTCLines describeNoAdaptersState(const ZTSStatusFacts& acrFacts) {
    return {"The agent found none" + formatSince(acrFacts.mLive->mKeeper.mSince, acrFacts) +
            ". The sensor looks every 10 s and starts the agent by itself."};
}

ZTCLines describeNoLibraryState(const ZTSStatusFacts& acrFacts) {
    const std::string& lrLibrary = acrFacts.mPlaces.mLibrary;
    return {"The agent could not load " + (lrLibrary.empty() ? "the adapters' library" : lrLibrary) +
            ". Its log has the reason." + sNextStart(acrFacts)};
}

ZTCLines describeNoEventSupportState(const ZTSStatusFacts& acrFacts) {
    return {"The adapters' library says that the driver of this host's adapters reports no events." +
            sNextStart(acrFacts)};
}

static std::string sStartedAt(const ZTSStatusFacts& acrFacts) {
    const auto& lrSince = acrFacts.mLive->mKeeper.mSince;
    return lrSince ? "; it was started at " + formatShortTime(*lrSince, acrFacts.mNow) : "";
}

ZTCLines describeStartingState(const ZTSStatusFacts& acrFacts) {
    return {"Its agent has not begun to listen yet" + sStartedAt(acrFacts) + "."};
}

ZTCLines describeAgentDownState(const ZTSStatusFacts& acrFacts) {
    return {"No agent runs" + formatSince(acrFacts.mLive->mKeeper.mSince, acrFacts) + ". " +
            sDescribeProblem(acrFacts.mLive->mAgent) + sNextStart(acrFacts)};
}

ZTCLines describeDiskState(const ZTSStatusFacts& acrFacts) {
    const ZTSLiveState& lrLive = *acrFacts.mLive;
    const std::string& lrProblem = lrLive.mCollector.mDiskProblem;
    std::string lText = lrProblem.empty() ? "The folder of the history cannot be written" : lrProblem;
    lText += lText.ends_with('.') ? "" : ".";
    if (lrLive.mAgent.mHeldBytes && lrLive.mAgent.mLimitBytes) {
        lText += " The agent holds " + formatBytes(*lrLive.mAgent.mHeldBytes) + " of " +
                 formatBytes(*lrLive.mAgent.mLimitBytes) + "; beyond that it has to refuse.";
    }
    return {lText};
}

bool isDeafState(std::string_view aState) {
    return aState == getKindStateName(ZTKST_Failed) || aState == getKindStateName(ZTKST_NoRights);
}

/// A kind, and the initiators for which it is in one state.
struct ZTSGroupedKind {
    std::string mName;
    ZTCLines mInitiators;
};

/// Kinds in one state, with the same words of the library.
struct ZTSKindGroup {
    std::string mState;
    std::string mWords;
    std::vector<ZTSGroupedKind> mKinds;
};

static std::string sJoin(const ZTCLines& acrTexts, const char* apBetween = ", ") {
    std::string lText;
    for (const std::string& lrText : acrTexts) {
        lText += (lText.empty() ? "" : apBetween) + lrText;
    }
    return lText;
}

/// The kinds; of one that is in this state for some initiators alone, with their names.
static std::string sJoinKinds(const ZTSKindGroup& acrGroup, std::size_t aInitiators) {
    ZTCLines lNames;
    for (const ZTSGroupedKind& lrKind : acrGroup.mKinds) {
        const bool lIsOfAll = lrKind.mInitiators.size() == aInitiators;
        lNames.push_back(lrKind.mName + (lIsOfAll ? "" : " of " + sJoin(lrKind.mInitiators, " and ")));
    }
    return sJoin(lNames);
}

static std::string sNameOf(const ZTSInitiator& acrInitiator) {
    return !acrInitiator.mHost.empty() ? acrInitiator.mHost
           : acrInitiator.mWwpn        ? acrInitiator.mWwpn->toText()
                                       : "an unknown port";
}

/// Kinds of every adapter that are in one of these states, each once, by state and words.
static std::vector<ZTSKindGroup> sGroupKinds(const ZTSStatusFacts& acrFacts, bool aIsWithWords,
                                             bool (*apIsWanted)(std::string_view)) {
    std::vector<ZTSKindGroup> lGroups;
    for (const ZTSLiveKinds& lrKinds : *acrFacts.mLive->mKinds) {
        for (const auto& [lKind, lState] : lrKinds.getOrdered()) {
            if (!apIsWanted(lState)) {
                continue;
            }
            const auto lFound = lrKinds.mWords.find(lKind);
            const std::string lWords = lFound == lrKinds.mWords.end() ? "" : lFound->second;
            const std::string lName = lKind + (aIsWithWords && !lWords.empty() ? " (" + lWords + ")" : "");
            const std::string lKey = aIsWithWords ? "" : lWords;
            const auto lIsGroup = [&lKey, &lrState = lState](const ZTSKindGroup& acrGroup) {
                return acrGroup.mState == lrState && acrGroup.mWords == lKey;
            };
            auto lGroup = std::find_if(lGroups.begin(), lGroups.end(), lIsGroup);
            if (lGroup == lGroups.end()) {
                lGroup = lGroups.insert(lGroups.end(), {lState, lKey, {}});
            }
            auto lGrouped = std::ranges::find(lGroup->mKinds, lName, &ZTSGroupedKind::mName);
            if (lGrouped == lGroup->mKinds.end()) {
                lGrouped = lGroup->mKinds.insert(lGroup->mKinds.end(), {lName, {}});
            }
            lGrouped->mInitiators.push_back(sNameOf(lrKinds.mInitiator));
        }
    }
    return lGroups;
}

/// "no_rights  rscn                (needs CAP_NET_ADMIN)", then what is off, then what is heard.
ZTCLines describeDeafState(const ZTSStatusFacts& acrFacts) {
    static constexpr std::size_t scStateWidth = 11;
    static constexpr std::size_t scKindsWidth = 20;
    const auto lPad = [](std::string aText, std::size_t aWidth) {
        aText.resize(std::max(aText.size() + 1, aWidth), ' ');
        return aText;
    };
    ZTCLines lLines;
    const std::size_t lInitiators = acrFacts.mLive->mKinds->size();
    for (const ZTSKindGroup& lrGroup : sGroupKinds(acrFacts, false, isDeafState)) {
        const std::string lKinds = sJoinKinds(lrGroup, lInitiators);
        lLines.push_back(lPad(lrGroup.mState, scStateWidth) +
                         (lrGroup.mWords.empty() ? lKinds : lPad(lKinds, scKindsWidth) + "(" + lrGroup.mWords + ")"));
    }
    // A registration that was refused leaves those behind it off.
    const auto lIsOff = [](std::string_view aState) { return aState == getKindStateName(ZTKST_Off); };
    const auto lIsHeard = [](std::string_view aState) { return aState == getKindStateName(ZTKST_Listening); };
    for (bool (*lpIsWanted)(std::string_view) : {+lIsOff, +lIsHeard}) {
        for (const ZTSKindGroup& lrGroup : sGroupKinds(acrFacts, true, lpIsWanted)) {
            lLines.push_back(lPad(lrGroup.mState, scStateWidth) + sJoinKinds(lrGroup, lInitiators));
        }
    }
    return lLines;
}

std::string formatLossSpan(const ZTSStatusFacts& acrFacts) {
    return " in the last " + (acrFacts.mLossSpan == gcLossSpan ? "24 h" : formatSpan(acrFacts.mLossSpan));
}

ZTCLines describeGapState(const ZTSStatusFacts& acrFacts) {
    static constexpr std::size_t scMostGaps = 2;
    const std::vector<ZTSGap>& lrGaps = acrFacts.mHistory->mGaps;
    ZTCLines lLines;
    for (std::size_t i = 0; i < std::min(lrGaps.size(), scMostGaps); ++i) {
        const ZTSGap& lrGap = lrGaps[lrGaps.size() - 1 - i];
        const std::uint64_t lCount = lrGap.getOccurrences();
        lLines.push_back(formatShortTime(lrGap.mFrom, acrFacts.mNow) + " to " +
                         formatShortTime(lrGap.mTo, acrFacts.mNow) + ": " +
                         (lrGap.mIsCountKnown && lCount == 0 ? "nothing is known to be lost"
                          : lrGap.mIsCountKnown              ? formatCount(lCount, "event") + " lost"
                          : lCount != 0                      ? "at least " + formatCount(lCount, "event") + " lost"
                                                             : "unknown how many events are lost") +
                         (lrGap.mReason.empty() ? "" : "; " + lrGap.mReason));
    }
    if (lrGaps.size() > scMostGaps) {
        lLines.push_back(formatCount(lrGaps.size() - scMostGaps, "earlier gap") + formatLossSpan(acrFacts) + ".");
    }
    return lLines;
}

ZTCLines describeRefusedState(const ZTSStatusFacts& acrFacts) {
    const ZTSLiveLosses& lrLosses = *acrFacts.mLive->mLosses;
    ZTCLines lParts;
    for (const auto& [lReason, lCount] : lrLosses.mRefused) {
        if (lCount != 0 && lReason != getRefusalName(ZTRF_CollectionOff)) {
            lParts.push_back(formatNumber(lCount) + " refused (" + lReason + ")");
        }
    }
    if (lrLosses.mDropped.value_or(0) != 0) {
        lParts.push_back(formatNumber(*lrLosses.mDropped) + " dropped by the agent");
    }
    for (const ZTSLibraryLoss& lrLoss : lrLosses.mLibrary) {
        if (lrLoss.mCount != 0) {
            lParts.push_back(formatNumber(lrLoss.mCount) + " lost by the adapters' library (" + lrLoss.mName + ")");
        }
    }
    const auto lSince = std::max(lrLosses.mSince.value_or(ZTCHistoryTime()), acrFacts.mNow - acrFacts.mLossSpan);
    return {sJoin(lParts) + "; since " + formatShortTime(lSince, acrFacts.mNow) + "."};
}

ZTCLines describeCollectingState(const ZTSStatusFacts&) {
    return {};
}
