#include <algorithm>
#include <nlohmann/json.hpp>

#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::ordered_json;

static ZTCJson sText(const std::string& acrText) {
    return acrText.empty() ? ZTCJson(nullptr) : ZTCJson(acrText);
}

static ZTCJson sTime(const std::optional<ZTCHistoryTime>& acrTime) {
    return acrTime ? ZTCJson(toRfc3339(*acrTime)) : ZTCJson(nullptr);
}

template <class ZTCValue>
static ZTCJson sValue(const std::optional<ZTCValue>& acrValue) {
    return acrValue ? ZTCJson(*acrValue) : ZTCJson(nullptr);
}

ZTCJson beginDocument(const std::string& acrCommand, const std::string& acrHost, const std::string& acrStoreId) {
    return {{"schema", "tavik." + acrCommand + "/1"}, {"host", acrHost}, {"storeId", sText(acrStoreId)}};
}

ZTCJson toJson(const ZTSGap& acrGap) {
    ZTCJson lCounts = ZTCJson::array();
    for (const ZTSGapCount& lrCount : acrGap.mCounts) {
        lCounts.push_back({{"initiator", toJson(lrCount.mInitiator)},
                           {"kind", getKindName(lrCount.mKind)},
                           {"held", lrCount.mHeld},
                           {"handedOver", lrCount.mHandedOver}});
    }
    return {{"seq", acrGap.mSeq},
            {"from", toRfc3339(acrGap.mFrom)},
            {"to", toRfc3339(acrGap.mTo)},
            {"reason", sText(acrGap.mReason)},
            {"generation", sText(acrGap.mGeneration)},
            {"countKnown", acrGap.mIsCountKnown},
            {"count", acrGap.mIsCountKnown || acrGap.getOccurrences() != 0 ? ZTCJson(acrGap.getOccurrences())
                                                                           : ZTCJson(nullptr)},
            {"counts", std::move(lCounts)}};
}

ZTCJson toJson(const ZTSTroubleText& acrTrouble) {
    ZTCJson lTrouble{
        {"id", acrTrouble.mId}, {"title", sText(acrTrouble.mTitle)}, {"subject", sText(acrTrouble.mSubject)}};
    if (!acrTrouble.mSeverity.empty()) {
        lTrouble["severity"] = acrTrouble.mSeverity;
    }
    lTrouble["status"] = acrTrouble.mStatus;
    lTrouble["action"] = acrTrouble.mAction;
    lTrouble["see"] = sText(acrTrouble.mSee);
    return lTrouble;
}

static ZTCJson sTroubles(const std::vector<ZTSTroubleText>& acrTroubles) {
    ZTCJson lTroubles = ZTCJson::array();
    for (const ZTSTroubleText& lrTrouble : acrTroubles) {
        lTroubles.push_back(toJson(lrTrouble));
    }
    return lTroubles;
}

static ZTCJson sKeeper(const ZTSLiveKeeper& acrKeeper) {
    return {{"pid", sValue(acrKeeper.mPid)},
            {"state", acrKeeper.mState ? ZTCJson(getLiveKeeperStateName(*acrKeeper.mState)) : ZTCJson(nullptr)},
            {"since", sTime(acrKeeper.mSince)},
            {"nextStart", sTime(acrKeeper.mNextStart)}};
}

static ZTCJson sAgent(const ZTSLiveAgent& acrAgent) {
    return {{"running", sValue(acrAgent.mIsRunning)},
            {"pid", sValue(acrAgent.mPid)},
            {"generation", sText(acrAgent.mGeneration)},
            {"since", sTime(acrAgent.mSince)},
            {"restarts", sValue(acrAgent.mRestarts)},
            {"endReason", sText(acrAgent.mEndReason)},
            {"problem", sText(acrAgent.mProblem)},
            {"adapters", sValue(acrAgent.mAdapters)},
            {"adaptersAtStart", sValue(acrAgent.mAdaptersAtStart)},
            {"heldBytes", sValue(acrAgent.mHeldBytes)},
            {"heldRecords", sValue(acrAgent.mHeldRecords)},
            {"limitBytes", sValue(acrAgent.mLimitBytes)}};
}

static ZTCJson sCollector(const ZTSLiveCollector& acrCollector) {
    return {{"pid", sValue(acrCollector.mPid)},
            {"since", sTime(acrCollector.mSince)},
            {"lastAsked", sTime(acrCollector.mLastAsked)},
            {"lastRetrieval", sTime(acrCollector.mLastRetrieval)},
            {"lastEvent", sTime(acrCollector.mLastEvent)},
            {"lastEventKind", sText(acrCollector.mLastEventKind)},
            {"disk", acrCollector.mDisk ? ZTCJson(getDiskStateName(*acrCollector.mDisk)) : ZTCJson(nullptr)},
            {"diskProblem", sText(acrCollector.mDiskProblem)},
            {"waitingFrames", sValue(acrCollector.mWaitingFrames)},
            {"waitingBytes", sValue(acrCollector.mWaitingBytes)}};
}

static ZTCJson sAdapters(const std::optional<std::vector<ZTSLiveAdapter>>& acrAdapters) {
    if (!acrAdapters) {
        return nullptr;
    }
    ZTCJson lAdapters = ZTCJson::array();
    for (const ZTSLiveAdapter& lrAdapter : *acrAdapters) {
        ZTCJson lOne = toJson(lrAdapter.mInitiator);
        lOne["portState"] = sText(lrAdapter.mPortState);
        lOne["speed"] = sText(lrAdapter.mSpeed);
        lAdapters.push_back(std::move(lOne));
    }
    return lAdapters;
}

static ZTCJson sKinds(const std::optional<std::vector<ZTSLiveKinds>>& acrKinds) {
    if (!acrKinds) {
        return nullptr;
    }
    ZTCJson lKinds = ZTCJson::array();
    for (const ZTSLiveKinds& lrKinds : *acrKinds) {
        ZTCJson lStates = ZTCJson::object();
        for (const auto& [lKind, lState] : lrKinds.getOrdered()) {
            lStates[lKind] = lState;
        }
        lKinds.push_back({{"initiator", toJson(lrKinds.mInitiator)},
                          {"kinds", std::move(lStates)},
                          {"words", ZTCJson(lrKinds.mWords)}});
    }
    return lKinds;
}

static bool sIsOf(const ZTSLiveLedgerRow& acrLive, const ZTSLedgerRow& acrRow) {
    return acrLive.mInitiator.mWwpn == acrRow.mInitiator.mWwpn && acrLive.mKind == getKindName(acrRow.mKind);
}

/// The running sensor's row of the same initiator and kind, or null.
static const ZTSLiveLedgerRow* sFindLiveRow(const ZTSStatusFacts& acrFacts, const ZTSLedgerRow& acrRow) {
    if (!acrFacts.mLive || !acrFacts.mLive->mLedger) {
        return nullptr;
    }
    for (const ZTSLiveLedgerRow& lrRow : *acrFacts.mLive->mLedger) {
        if (sIsOf(lrRow, acrRow)) {
            return &lrRow;
        }
    }
    return nullptr;
}

static ZTCJson sLedgerRow(const ZTSLedgerRow& acrRow, const ZTSLiveLedgerRow* apLive) {
    const auto lNewer = [apLive](std::optional<std::uint64_t> ZTSLiveLedgerRow::*apMember, std::uint64_t aStored) {
        return apLive != nullptr ? (apLive->*apMember).value_or(aStored) : aStored;
    };
    ZTCJson lRefused = ZTCJson::object();
    for (std::size_t i = 0; i < acrRow.mRefused.size(); ++i) {
        const char* const lpReason = getRefusalName(static_cast<ZTERefusal>(i));
        lRefused[lpReason] = acrRow.mRefused[i];
        if (apLive != nullptr && apLive->mRefused.contains(lpReason)) {
            lRefused[lpReason] = apLive->mRefused.at(lpReason);
        }
    }
    return {{"initiator", toJson(acrRow.mInitiator)},
            {"kind", getKindName(acrRow.mKind)},
            {"received", lNewer(&ZTSLiveLedgerRow::mReceived, acrRow.mReceived)},
            {"refused", std::move(lRefused)},
            {"consolidated", lNewer(&ZTSLiveLedgerRow::mConsolidated, acrRow.mConsolidated)},
            {"handedOver", lNewer(&ZTSLiveLedgerRow::mHandedOver, acrRow.mHandedOver)},
            {"stored", acrRow.mStored},
            {"retired", acrRow.mRetired},
            {"lost", acrRow.mLost},
            {"held", lNewer(&ZTSLiveLedgerRow::mHeld, acrRow.mHeld)},
            {"dropped", lNewer(&ZTSLiveLedgerRow::mDropped, acrRow.mDropped)}};
}

/// Rows of the running sensor that the history does not have yet: of a kind that came for the first time just now.
static void sAddLiveRows(const ZTSStatusFacts& acrFacts, ZTCJson& arLedger) {
    if (!acrFacts.mLive || !acrFacts.mLive->mLedger) {
        return;
    }
    for (const ZTSLiveLedgerRow& lrLive : *acrFacts.mLive->mLedger) {
        const auto lIsOf = [&lrLive](const ZTSLedgerRow& acrRow) { return sIsOf(lrLive, acrRow); };
        if (std::ranges::none_of(acrFacts.mHistory->mLedger, lIsOf)) {
            ZTSLedgerRow lNone;
            lNone.mInitiator = lrLive.mInitiator;
            arLedger.push_back(sLedgerRow(lNone, &lrLive));
            arLedger.back()["kind"] = lrLive.mKind;
        }
    }
}

static ZTCJson sTopology(const ZTSStatusFacts& acrFacts) {
    if (!acrFacts.mLive || !acrFacts.mLive->mTopology) {
        return nullptr;
    }
    const ZTSLiveTopology& lrTopology = *acrFacts.mLive->mTopology;
    const std::string lText = describeStaleNames(acrFacts);
    return {{"scanned", sTime(lrTopology.mScanned)},
            {"stale", sValue(lrTopology.mIsStale)},
            {"since", sTime(lrTopology.mStaleSince)},
            {"blocked", lrTopology.mBlocked},
            {"text", sText(lText)},
            {"action", lText.empty() ? ZTCJson(nullptr) : ZTCJson(gcStaleNamesAction)}};
}

static ZTCJson sLosses(const ZTSStatusFacts& acrFacts) {
    const ZTSLossSum lSum = sumLosses(acrFacts);
    ZTCJson lLosses{{"inGaps", acrFacts.mHistory ? ZTCJson(lSum.mInGaps) : ZTCJson(nullptr)},
                    {"inGapsIsKnown", acrFacts.mHistory && !lSum.mIsAtLeast},
                    {"since", nullptr},
                    {"refused", nullptr},
                    {"dropped", nullptr},
                    {"library", nullptr}};
    if (acrFacts.mLive && acrFacts.mLive->mLosses) {
        const ZTSLiveLosses& lrLive = *acrFacts.mLive->mLosses;
        lLosses["since"] = sTime(lrLive.mSince);
        lLosses["refused"] = ZTCJson(lrLive.mRefused);
        lLosses["dropped"] = sValue(lrLive.mDropped);
        lLosses["library"] = ZTCJson::array();
        for (const ZTSLibraryLoss& lrLoss : lrLive.mLibrary) {
            lLosses["library"].push_back({{"name", lrLoss.mName}, {"count", lrLoss.mCount}});
        }
    }
    return lLosses;
}

static ZTCJson sWarnings(const ZTSStatusFacts& acrFacts) {
    if (!acrFacts.mLive || !acrFacts.mLive->mWarnings) {
        return nullptr;
    }
    ZTCJson lWarnings = ZTCJson::array();
    for (const ZTSLiveWarning& lrWarning : *acrFacts.mLive->mWarnings) {
        lWarnings.push_back({{"kind", lrWarning.mKind},
                             {"text", lrWarning.mText},
                             {"since", sTime(lrWarning.mSince)},
                             {"given", sValue(lrWarning.mGiven)},
                             {"next", sTime(lrWarning.mNext)}});
    }
    return lWarnings;
}

static void sAddHistory(const ZTSStatusFacts& acrFacts, ZTCJson& arDocument) {
    if (!acrFacts.mHistory) {
        arDocument["ledger"] = nullptr;
        arDocument["losses"] = sLosses(acrFacts);
        arDocument["gaps"] = nullptr;
        return;
    }
    const ZTSHistoryFacts& lrHistory = *acrFacts.mHistory;
    arDocument["ledger"] = ZTCJson::array();
    for (const ZTSLedgerRow& lrRow : lrHistory.mLedger) {
        arDocument["ledger"].push_back(sLedgerRow(lrRow, sFindLiveRow(acrFacts, lrRow)));
    }
    sAddLiveRows(acrFacts, arDocument["ledger"]);
    arDocument["losses"] = sLosses(acrFacts);
    arDocument["gaps"] = ZTCJson::array();
    for (const ZTSGap& lrGap : lrHistory.mGaps) {
        arDocument["gaps"].push_back(toJson(lrGap));
    }
}

ZTCJson makeStatusDocument(const ZTSStatusFacts& acrFacts) {
    const ZTSJudgement lJudgement = judge(acrFacts);
    const ZTSStateRow& lrWorst = lJudgement.getWorst();
    const std::string lStoreId = acrFacts.mHistory ? acrFacts.mHistory->mStoreId
                                 : acrFacts.mLive  ? acrFacts.mLive->mStoreId
                                                   : "";
    const ZTSLastEvent lLast = findLastEvent(acrFacts);
    ZTCJson lDocument = beginDocument("status", acrFacts.mHost, lStoreId);
    lDocument["time"] = toRfc3339(acrFacts.mNow);
    lDocument["state"] = lrWorst.mpId;
    lDocument["verdict"] = getVerdictWord(lrWorst.mVerdict);
    lDocument["text"] = formatHeadline(acrFacts, lJudgement, true);
    lDocument["exit"] = lJudgement.getExit();
    lDocument["troubles"] = sTroubles(describeTroubles(acrFacts, lJudgement));
    const bool lIsLive = acrFacts.mLive.has_value();
    lDocument["keeper"] = lIsLive ? sKeeper(acrFacts.mLive->mKeeper) : ZTCJson(nullptr);
    lDocument["agent"] = lIsLive ? sAgent(acrFacts.mLive->mAgent) : ZTCJson(nullptr);
    lDocument["collector"] = lIsLive ? sCollector(acrFacts.mLive->mCollector) : ZTCJson(nullptr);
    lDocument["adapters"] = lIsLive ? sAdapters(acrFacts.mLive->mAdapters) : ZTCJson(nullptr);
    lDocument["kinds"] = lIsLive ? sKinds(acrFacts.mLive->mKinds) : ZTCJson(nullptr);
    sAddHistory(acrFacts, lDocument);
    lDocument["warnings"] = sWarnings(acrFacts);
    lDocument["lastEvent"] = {{"time", sTime(lLast.mTime)}, {"kind", sText(lLast.mKind)}};
    const bool lHasSan = acrFacts.mHistory && acrFacts.mHistory->mSan;
    lDocument["paths"] = lHasSan ? ZTCJson(summarizePaths(acrFacts.mHistory->mSan->mFacts)) : ZTCJson(nullptr);
    lDocument["san"] =
        lHasSan ? sTroubles(describeSanTroubles(acrFacts.mHistory->mSan->mFacts, acrFacts.mNames, acrFacts.mNow))
                : ZTCJson(nullptr);
    lDocument["topology"] = sTopology(acrFacts);
    lDocument["damagedHistories"] = sValue(acrFacts.mDamagedHistories);
    lDocument["unknown"] = listUnknown(acrFacts);
    return lDocument;
}
