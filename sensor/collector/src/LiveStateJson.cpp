#include "sensor/collector/include/LiveStateJson.h"

#include <algorithm>
#include <map>
#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/collector/include/PageCounts.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::ordered_json;

static ZTCJson sTime(ZTCHistoryTime aTime) {
    return aTime == ZTCHistoryTime{} ? ZTCJson(nullptr) : ZTCJson(toRfc3339(aTime));
}

static ZTCJson sMicroseconds(std::int64_t aMicroseconds) {
    return sTime(fromMicroseconds(aMicroseconds));
}

static ZTCJson sSeconds(std::int64_t aSeconds) {
    return sMicroseconds(aSeconds * 1000000);
}

static ZTCJson sText(const std::string& acrText) {
    return acrText.empty() ? ZTCJson(nullptr) : ZTCJson(acrText);
}

static ZTCJson sKeeper(const ZTSLiveFacts& acrFacts) {
    ZTCJson lKeeper{{"pid", acrFacts.mKeeperPid}, {"state", nullptr}, {"since", nullptr}, {"nextStart", nullptr}};
    if (acrFacts.mpKeeperState != nullptr) {
        lKeeper["state"] = keeperStateName(acrFacts.mpKeeperState->mState);
        lKeeper["since"] = sSeconds(acrFacts.mpKeeperState->mSince);
        lKeeper["nextStart"] = sSeconds(acrFacts.mpKeeperState->mNextStart);
    }
    return lKeeper;
}

static ZTCJson sAgent(const ZTSLiveFacts& acrFacts) {
    ZTCJson lAgent{{"running", acrFacts.mIsAgentRunning},
                   {"pid", acrFacts.mIsAgentRunning ? ZTCJson(acrFacts.mAgentPid) : ZTCJson(nullptr)},
                   {"restarts", acrFacts.mRestarts},
                   {"problem", nullptr}};
    if (!acrFacts.mIsAgentRunning && acrFacts.mpKeeperState != nullptr) {
        lAgent["problem"] = sText(acrFacts.mpKeeperState->mText);
    }
    if (const ZTCPagePointer& lrPage = acrFacts.mpPage) {
        const bool lHasEnded = lrPage->mEndReason != ZTSE_Running;
        lAgent["generation"] = lrPage->mStartId;
        lAgent["since"] = sMicroseconds(lrPage->mStartTime);
        lAgent["endReason"] = lHasEnded ? ZTCJson(gcStatusEndNames.at(lrPage->mEndReason)) : ZTCJson(nullptr);
        lAgent["adapters"] = lrPage->mAdaptersNow;
        lAgent["adaptersAtStart"] = lrPage->mAdaptersAtStart;
        lAgent["heldBytes"] = lrPage->mHeldBytes;
        lAgent["heldRecords"] = lrPage->mHeldRecords;
        lAgent["limitBytes"] = lrPage->mTotalLimit;
        lAgent["collecting"] = lrPage->mIsCollecting;
        lAgent["retrievals"] = lrPage->mRetrievals;
        lAgent["handedOverRecords"] = lrPage->mHandedOverRecords;
        lAgent["handedOverOccurrences"] = lrPage->mHandedOverOccurrences;
    }
    return lAgent;
}

static ZTCJson sCollector(const ZTSLiveFacts& acrFacts) {
    const ZTSHistoryState& lrHistory = acrFacts.mHistory;
    const bool lIsReadOnly = acrFacts.mIsSpoolReadOnly || lrHistory.mIsReadOnly;
    const std::string& lrProblem = acrFacts.mSpoolProblem.empty() ? lrHistory.mProblem : acrFacts.mSpoolProblem;
    ZTCJson lCollector{{"pid", acrFacts.mCollectorPid},
                       {"since", sTime(acrFacts.mSince)},
                       {"lastAsked", acrFacts.mLastAsked ? sTime(*acrFacts.mLastAsked) : ZTCJson(nullptr)},
                       {"lastRetrieval", sTime(lrHistory.mLastTaken)},
                       {"lastEvent", nullptr},
                       {"lastEventKind", nullptr},
                       {"disk", lrProblem.empty() ? "ok"
                                : lIsReadOnly     ? "read-only"
                                                  : "full"},
                       {"diskProblem", sText(lrProblem)},
                       {"waitingFrames", lrHistory.mWaitingFrames},
                       {"waitingBytes", lrHistory.mWaitingBytes},
                       {"takenFrames", lrHistory.mTakenFrames},
                       {"takenRecords", lrHistory.mTakenRecords},
                       {"openEpisodes", lrHistory.mOpenEpisodes}};
    if (acrFacts.mpPage != nullptr) {
        std::int64_t lLast = 0;
        for (const ZTSStatusBoardCopy& lrBoard : acrFacts.mpPage->mBoards) {
            for (std::size_t i = 0; i < lrBoard.mRows.size(); ++i) {
                if (lrBoard.mRows[i].mLastEvent > lLast) {
                    lLast = lrBoard.mRows[i].mLastEvent;
                    lCollector["lastEventKind"] = getStatusRowName(i);
                }
            }
        }
        lCollector["lastEvent"] = sMicroseconds(lLast);
    }
    return lCollector;
}

static ZTCJson sInitiator(const std::array<std::uint8_t, 8>& acrWwpn, const std::array<std::uint8_t, 8>& acrWwnn,
                          const ZTSTopology& acrPorts) {
    const ZTSFcName lWwpn{.mBytes = acrWwpn};
    const auto lpHost = std::ranges::find(acrPorts.mInitiators, lWwpn, &ZTSTopologyInitiator::mWwpn);
    return {{"wwpn", lWwpn.toText()},
            {"wwnn", ZTSFcName{.mBytes = acrWwnn}.toText()},
            {"host", lpHost == acrPorts.mInitiators.end() ? ZTCJson(nullptr) : ZTCJson(lpHost->mHost)}};
}

static ZTCJson sAdapters(const ZTSLiveFacts& acrFacts) {
    ZTCJson lAdapters = ZTCJson::array();
    for (const ZTSStatusBoardCopy& lrBoard : acrFacts.mpPage->mBoards) {
        ZTCJson lAdapter = sInitiator(lrBoard.mWwpn, lrBoard.mWwnn, acrFacts.mPorts);
        const auto lpHost = std::ranges::find(acrFacts.mPorts.mInitiators, ZTSFcName{.mBytes = lrBoard.mWwpn},
                                              &ZTSTopologyInitiator::mWwpn);
        const bool lIsKnown = lpHost != acrFacts.mPorts.mInitiators.end();
        lAdapter["portState"] = lIsKnown ? sText(lpHost->mState.value_or("")) : ZTCJson(nullptr);
        lAdapter["speed"] = lIsKnown ? sText(lpHost->mSpeed.value_or("")) : ZTCJson(nullptr);
        lAdapters.push_back(lAdapter);
    }
    return lAdapters;
}

static ZTCJson sKinds(const ZTSLiveFacts& acrFacts) {
    ZTCJson lList = ZTCJson::array();
    for (const ZTSStatusBoardCopy& lrBoard : acrFacts.mpPage->mBoards) {
        ZTCJson lKinds = ZTCJson::object();
        ZTCJson lWords = ZTCJson::object();
        for (std::size_t i = 0; i < gcStatusKinds; ++i) {
            const ZTSStatusRowCopy& lrRow = lrBoard.mRows[i];
            lKinds[getStatusRowName(i)] = gcStatusStateNames.at(lrRow.mState);
            if (!lrRow.mStateReason.empty()) {
                lWords[getStatusRowName(i)] = lrRow.mStateReason;
            }
        }
        lList.push_back({{"initiator", sInitiator(lrBoard.mWwpn, lrBoard.mWwnn, acrFacts.mPorts)},
                         {"kinds", lKinds},
                         {"words", lWords}});
    }
    return lList;
}

/// The totals of all agents, the running one's up to now. Null where it is not known which of them the history has.
static ZTCJson sLedger(const ZTSLiveFacts& acrFacts) {
    const ZTSHistoryState& lrHistory = acrFacts.mHistory;
    const bool lIsRunning = acrFacts.mpPage != nullptr && acrFacts.mpPage->mStartId == lrHistory.mGeneration;
    if (lrHistory.mpOthers == nullptr || (!lIsRunning && !lrHistory.mGeneration.empty())) {
        return nullptr;
    }
    std::map<std::pair<std::string, ZTCKindKey>, ZTSPageCounts> lRows;
    const auto lAdd = [&lRows](const ZTSPageCounts& acrCounts) {
        ZTSPageCounts& lrRow = lRows[{acrCounts.mWwpn ? acrCounts.mWwpn->toText() : "", acrCounts.mKind}];
        lrRow.mWwpn = acrCounts.mWwpn;
        lrRow.mWwnn = acrCounts.mWwnn ? acrCounts.mWwnn : lrRow.mWwnn;
        lrRow.mKind = acrCounts.mKind;
        lrRow.mReceived += acrCounts.mReceived;
        for (std::size_t i = 0; i < lrRow.mRefused.size(); ++i) {
            lrRow.mRefused[i] += acrCounts.mRefused[i];
        }
        lrRow.mConsolidated += acrCounts.mConsolidated;
        lrRow.mHandedOver += acrCounts.mHandedOver;
        lrRow.mHeld += acrCounts.mHeld;
        lrRow.mDropped += acrCounts.mDropped;
    };
    std::ranges::for_each(*lrHistory.mpOthers, lAdd);
    if (lIsRunning) {
        std::ranges::for_each(toPageCounts(*acrFacts.mpPage), lAdd);
    }
    ZTCJson lLedger = ZTCJson::array();
    for (const auto& [lrKey, lrRow] : lRows) {
        ZTCJson lRefused = ZTCJson::object();
        for (std::size_t i = 0; i < lrRow.mRefused.size(); ++i) {
            lRefused[getRefusalName(static_cast<ZTERefusal>(i))] = lrRow.mRefused[i];
        }
        ZTCJson lInitiator{{"wwpn", nullptr}, {"wwnn", nullptr}, {"host", nullptr}};
        if (lrRow.mWwpn && lrRow.mWwnn) {
            lInitiator = sInitiator(lrRow.mWwpn->mBytes, lrRow.mWwnn->mBytes, acrFacts.mPorts);
        } else if (lrRow.mWwpn) {
            lInitiator["wwpn"] = lrRow.mWwpn->toText();
        }
        lLedger.push_back({{"initiator", lInitiator},
                           {"kind", getKindName(lrRow.mKind)},
                           {"received", lrRow.mReceived},
                           {"refused", lRefused},
                           {"consolidated", lrRow.mConsolidated},
                           {"handedOver", lrRow.mHandedOver},
                           {"held", lrRow.mHeld},
                           {"dropped", lrRow.mDropped}});
    }
    return lLedger;
}

static ZTCJson sLosses(const ZTSLosses& acrLosses) {
    ZTCJson lLibrary = ZTCJson::array();
    for (const auto& [lrName, lCount] : acrLosses.mLibrary) {
        lLibrary.push_back({{"name", lrName}, {"count", lCount}});
    }
    return {{"since", sTime(acrLosses.mSince)},
            {"refused", acrLosses.mRefused},
            {"dropped", acrLosses.mDropped},
            {"library", lLibrary}};
}

static ZTCJson sTopology(const ZTSTopologyState& acrState) {
    return {
        {"scanned", acrState.mScanned ? sTime(*acrState.mScanned) : ZTCJson(nullptr)},
        {"ageSeconds", acrState.mAge ? ZTCJson(static_cast<double>(acrState.mAge->count()) / 1000) : ZTCJson(nullptr)},
        {"stale", acrState.mIsStale},
        {"staleSince", acrState.mStaleSince ? sTime(*acrState.mStaleSince) : ZTCJson(nullptr)},
        {"blocked", acrState.mBlocked}};
}

std::string toLiveStateJson(const ZTSLiveFacts& acrFacts) {
    ZTCJson lState{{"schema", "tavik.live/1"},
                   {"storeId", sText(acrFacts.mHistory.mStoreId)},
                   {"now", sTime(acrFacts.mNow)},
                   {"keeper", sKeeper(acrFacts)},
                   {"agent", sAgent(acrFacts)},
                   {"collector", sCollector(acrFacts)},
                   {"adapters", nullptr},
                   {"kinds", nullptr},
                   {"ledger", sLedger(acrFacts)},
                   {"losses", sLosses(acrFacts.mLosses)},
                   {"topology", sTopology(acrFacts.mTopology)},
                   {"warnings", ZTCJson::parse(acrFacts.mWarnings)}};
    if (acrFacts.mpPage != nullptr) {
        lState["adapters"] = sAdapters(acrFacts);
        lState["kinds"] = sKinds(acrFacts);
    }
    return dumpJson(lState, -1);
}
