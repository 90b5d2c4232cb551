#include "sensor/warnings/include/WarnSource.h"

#include <algorithm>
#include <array>
#include <limits>
#include <nlohmann/json.hpp>
#include <sstream>

#include "sensor/client/include/RecordJson.h"
#include "sensor/views/include/NameBook.h"

using std::chrono::minutes;

static constexpr std::array<const char*, 4> scStates{"deaf", "agent-down", "disk-full", "path-lost"};
/// The number of a gap before all gaps: their numbers begin with 1.
static constexpr std::uint64_t scNoGap = 0;

ZTCWarnSource::ZTCWarnSource(const std::vector<ZTSWarnRule>& acrRules) {
    for (const ZTSWarnRule& lrRule : acrRules) {
        if (const std::optional<ZTCKindKey> lKind = findKind(lrRule.mKind)) {
            mKinds.push_back(*lKind);
        }
        mHasGapRule = mHasGapRule || lrRule.mKind == "gap";
        mHasRefusedRule = mHasRefusedRule || lrRule.mKind == "refused";
        mLongest = std::max(mLongest, lrRule.mWithin);
    }
}

static ZTSWarnOccurrence sMake(const std::string& acrKind, const ZTSInitiator& acrInitiator, std::uint64_t aCount,
                               ZTCHistoryTime aTime, const std::string& acrText = "") {
    ZTSWarnOccurrence lOccurrence;
    lOccurrence.mKind = acrKind;
    lOccurrence.mInitiator = acrInitiator;
    lOccurrence.mCount = aCount;
    lOccurrence.mTime = aTime;
    lOccurrence.mText = acrText;
    return lOccurrence;
}

/// The name of a row of `total`; rows of one kind have different ones.
static std::string sTotalName(const ZTSTotal& acrTotal) {
    return (acrTotal.mInitiator.mWwpn ? acrTotal.mInitiator.mWwpn->toText() : std::string()) +
           (acrTotal.mRemotePort ? acrTotal.mRemotePort->mWwpn.toText() : std::string());
}

static std::map<std::string, std::uint64_t> sReadNumbers(const std::string& acrText) {
    const nlohmann::json lJson = nlohmann::json::parse(acrText, nullptr, false);
    std::map<std::string, std::uint64_t> lNumbers;
    for (const auto& [lName, lValue] : lJson.items()) {
        if (lJson.is_object() && lValue.is_number_unsigned()) {
            lNumbers[lName] = lValue.get<std::uint64_t>();
        }
    }
    return lNumbers;
}

void ZTCWarnSource::readTotals(const ZTCHistory& acrHistory) {
    for (const ZTSTotal& lrTotal : acrHistory.readTotals()) {
        mTotals[{sTotalName(lrTotal), lrTotal.mKind}] = lrTotal.mOccurrences;
    }
}

void ZTCWarnSource::readMinutes(const ZTCHistory& acrHistory, ZTCHistoryTime aNow,
                                std::vector<ZTSWarnOccurrence>& arFound) const {
    ZTSHistoryFilter lLately;
    lLately.mSince = aNow - mLongest;
    lLately.mKinds = mKinds;
    acrHistory.visitMinutes(lLately, [&](const ZTSBucket& acrBucket) {
        arFound.push_back(sMake(getKindName(acrBucket.mKind), acrBucket.mInitiator, acrBucket.mOccurrences,
                                std::min(aNow, acrBucket.mFrom + minutes(1))));
        arFound.back().mRemotePort = acrBucket.mRemotePort;
        return true;
    });
}

/// The history is new to this object: what happened lately counts, by the minute.
void ZTCWarnSource::begin(const ZTCHistory& acrHistory, ZTCHistoryTime aNow, std::vector<ZTSWarnOccurrence>& arFound) {
    mTotals.clear();
    mOccurrences = mGaps = 0;
    if (!mKinds.empty()) {
        // An event that is stored between the two reads would count twice: in the minutes, and as growth of the totals.
        acrHistory.readAsOne([&] {
            readTotals(acrHistory);
            readMinutes(acrHistory, aNow, arFound);
        });
    }
    const std::string lGap = acrHistory.getValue(gcWarnGapValue);
    if (lGap.empty()) {
        for (const ZTSGap& lrGap : acrHistory.readGaps()) {
            mGapSeq = lrGap.mTo < aNow - mLongest ? std::max(mGapSeq, lrGap.mSeq) : mGapSeq;
        }
    } else {
        mGapSeq = scNoGap;
        std::istringstream(lGap) >> mGapSeq;
    }
    const std::string lRefused = acrHistory.getValue(gcWarnRefusedValue);
    mRefused = sReadNumbers(lRefused.empty() ? "{}" : lRefused);
    if (mHasRefusedRule && lRefused.empty()) {
        std::vector<ZTSWarnOccurrence> lOld;
        readRefusals(acrHistory, aNow, lOld);
    }
    mStoreId = acrHistory.getStoreId();
}

std::vector<ZTSWarnOccurrence> ZTCWarnSource::read(const ZTCHistory& acrHistory, ZTCHistoryTime aNow) {
    std::vector<ZTSWarnOccurrence> lFound;
    if (mStoreId != acrHistory.getStoreId()) {
        begin(acrHistory, aNow, lFound);
    }
    const ZTSRetrievalTotals lTotals = acrHistory.readRetrievalTotals();
    if (!mKinds.empty() && lTotals.mOccurrences != std::exchange(mOccurrences, lTotals.mOccurrences)) {
        readEvents(acrHistory, aNow, lFound);
    }
    if (mHasGapRule && lTotals.mGaps != std::exchange(mGaps, lTotals.mGaps)) {
        readGaps(acrHistory, aNow, lFound);
    }
    if (mHasRefusedRule) {
        readRefusals(acrHistory, aNow, lFound);
    }
    return lFound;
}

void ZTCWarnSource::readEvents(const ZTCHistory& acrHistory, ZTCHistoryTime aNow,
                               std::vector<ZTSWarnOccurrence>& arFound) {
    for (const ZTSTotal& lrTotal : acrHistory.readTotals()) {
        std::uint64_t& lrLast = mTotals[{sTotalName(lrTotal), lrTotal.mKind}];
        if (lrTotal.mOccurrences > lrLast && std::ranges::find(mKinds, lrTotal.mKind) != mKinds.end()) {
            arFound.push_back(
                sMake(getKindName(lrTotal.mKind), lrTotal.mInitiator, lrTotal.mOccurrences - lrLast, aNow));
            arFound.back().mRemotePort = lrTotal.mRemotePort;
        }
        lrLast = lrTotal.mOccurrences;
    }
}

void ZTCWarnSource::readGaps(const ZTCHistory& acrHistory, ZTCHistoryTime aNow,
                             std::vector<ZTSWarnOccurrence>& arFound) {
    std::uint64_t lLast = mGapSeq;
    for (const ZTSGap& lrGap : acrHistory.readGaps()) {
        if (lrGap.mSeq <= mGapSeq) {
            continue;
        }
        lLast = std::max(lLast, lrGap.mSeq);
        const std::uint64_t lCount = lrGap.getOccurrences();
        const std::string lLost = !lrGap.mIsCountKnown && lCount == 0
                                      ? "unknown how many events are lost: "
                                      : (lrGap.mIsCountKnown ? "" : "at least ") + std::to_string(lCount) +
                                            (lCount == 1 ? " event lost: " : " events lost: ");
        arFound.push_back(sMake("gap", lrGap.mCounts.empty() ? ZTSInitiator() : lrGap.mCounts.front().mInitiator, 1,
                                aNow, lLost + lrGap.mReason));
    }
    if (lLast != std::exchange(mGapSeq, lLast)) {
        mValues[gcWarnGapValue] = std::to_string(mGapSeq);
    }
}

void ZTCWarnSource::readRefusals(const ZTCHistory& acrHistory, ZTCHistoryTime aNow,
                                 std::vector<ZTSWarnOccurrence>& arFound) {
    std::map<std::string, std::pair<ZTSInitiator, std::uint64_t>> lNow;
    for (const ZTSLedgerRow& lrRow : acrHistory.readLedger()) {
        auto& [lrInitiator, lrCount] = lNow[lrRow.mInitiator.mWwpn ? lrRow.mInitiator.mWwpn->toText() : "unknown"];
        lrInitiator = lrRow.mInitiator;
        lrCount += lrRow.getRefusedTotal();
    }
    nlohmann::ordered_json lNumbers = nlohmann::ordered_json::object();
    bool lIsChanged = false;
    for (const auto& [lName, lEntry] : lNow) {
        std::uint64_t& lrLast = mRefused[lName];
        if (lEntry.second > lrLast) {
            arFound.push_back(sMake("refused", lEntry.first, lEntry.second - lrLast, aNow,
                                    "the agent refused " + std::to_string(lEntry.second - lrLast) + " events"));
        }
        lIsChanged = lIsChanged || lEntry.second != lrLast;
        lrLast = lEntry.second;
        lNumbers[lName] = lrLast;
    }
    if (lIsChanged) {
        mValues[gcWarnRefusedValue] = dumpJson(lNumbers, -1);
    }
}

// ---- states ----

bool ZTCWarnSource::isState(const std::string& acrKind) {
    return std::ranges::find(scStates, acrKind) != scStates.end();
}

bool ZTCWarnSource::isKnown(const ZTSLiveState& acrLive, const ZTSSanFacts* apSan, const std::string& acrKind) {
    return (acrKind == "deaf" && acrLive.mKinds) || (acrKind == "agent-down" && acrLive.mKeeper.mState) ||
           (acrKind == "disk-full" && acrLive.mCollector.mDisk) || (acrKind == "path-lost" && apSan != nullptr);
}

static std::optional<ZTSWarnOccurrence> sFindDeaf(const ZTSLiveKinds& acrKinds, ZTCHistoryTime aNow) {
    std::string lText;
    for (const auto& [lKind, lState] : acrKinds.getOrdered()) {
        if (lState == "failed" || lState == "no_rights") {
            lText += (lText.empty() ? "" : ", ") + lKind + " " + lState;
        }
    }
    if (lText.empty()) {
        return std::nullopt;
    }
    return sMake("deaf", acrKinds.mInitiator, 1, aNow, "events of these kinds do not reach the agent: " + lText);
}

/// A host without adapters needs no agent; one without the adapters' library does.
static bool sIsAgentDown(const ZTSLiveState& acrLive) {
    return acrLive.mKeeper.mState == ZTKP_WaitingToRestart ||
           (acrLive.mKeeper.mState == ZTKP_WaitingForAdapters && acrLive.mAgent.mEndReason != "no-adapters");
}

/// "Not Present, from host7 and host8": what is known of a lost port or link.
static std::string sDescribeLost(const ZTSSanTrouble& acrTrouble) {
    std::string lHosts;
    for (const ZTSInitiator& lrInitiator : acrTrouble.mInitiators) {
        lHosts += (lHosts.empty() ? "" : " and ") + lrInitiator.mHost;
    }
    const std::string lState = acrTrouble.mState.empty() ? "not Online" : acrTrouble.mState;
    return acrTrouble.mRemotePorts.empty()
               ? "the link of " + lHosts + ": " + lState
               : acrTrouble.mRemotePorts.front().mWwpn.toText() + " from " + lHosts + ": " + lState;
}

std::vector<ZTSWarnOccurrence> ZTCWarnSource::findHolding(const ZTSLiveState& acrLive, const ZTSSanFacts* apSan,
                                                          ZTCHistoryTime aNow) {
    std::vector<ZTSWarnOccurrence> lHolding;
    const auto lAdd = [&](const char* apKind, const std::string& acrText) -> ZTSWarnOccurrence& {
        return lHolding.emplace_back(sMake(apKind, ZTSInitiator(), 1, aNow, acrText));
    };
    for (const ZTSLiveKinds& lrKinds : acrLive.mKinds.value_or(std::vector<ZTSLiveKinds>())) {
        if (std::optional<ZTSWarnOccurrence> lDeaf = sFindDeaf(lrKinds, aNow)) {
            lHolding.push_back(std::move(*lDeaf));
        }
    }
    if (sIsAgentDown(acrLive)) {
        lAdd("agent-down", acrLive.mAgent.mProblem.empty() ? "the agent does not run" : acrLive.mAgent.mProblem);
    }
    if (acrLive.mCollector.mDisk && *acrLive.mCollector.mDisk != ZTDK_Ok) {
        lAdd("disk-full", acrLive.mCollector.mDiskProblem);
    }
    for (const ZTSSanTrouble& lrTrouble : apSan != nullptr ? apSan->mTroubles : std::vector<ZTSSanTrouble>()) {
        const bool lIsLost = lrTrouble.mKind == ZTST_PathLost || lrTrouble.mKind == ZTST_LinkDown;
        if (lIsLost && lrTrouble.mSeverity >= ZTSS_Warning) {
            ZTSWarnOccurrence& lrHolding = lAdd("path-lost", sDescribeLost(lrTrouble));
            lrHolding.mInitiator = lrTrouble.mInitiators.empty() ? ZTSInitiator() : lrTrouble.mInitiators.front();
            if (!lrTrouble.mRemotePorts.empty()) {
                lrHolding.mRemotePort = lrTrouble.mRemotePorts.front();
            }
        }
    }
    return lHolding;
}
