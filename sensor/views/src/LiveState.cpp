#include "sensor/views/include/LiveState.h"

#include <array>
#include <nlohmann/json.hpp>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::json;

static constexpr std::array<const char*, ZTKP_Count> scKeeperStates{"starting", "running", "waiting-for-adapters",
                                                                    "waiting-to-restart", "stopping"};
static constexpr std::array<const char*, ZTDK_Count> scDiskStates{"ok", "full", "read-only"};

const char* getLiveKeeperStateName(ZTELiveKeeperState aState) {
    return scKeeperStates.at(aState);
}

const char* getDiskStateName(ZTEDiskState aState) {
    return scDiskStates.at(aState);
}

std::vector<std::pair<std::string, std::string>> ZTSLiveKinds::getOrdered() const {
    std::vector<std::pair<std::string, std::string>> lOrdered;
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        const auto lFound = mStates.find(lrKind.mpName);
        if (lFound != mStates.end()) {
            lOrdered.emplace_back(*lFound);
        }
    }
    for (const auto& lrPair : mStates) {
        if (!findKind(lrPair.first)) {
            lOrdered.emplace_back(lrPair);
        }
    }
    return lOrdered;
}

/// One object of the document. What is missing, null or of a wrong type leaves its place as it is; the latter is noted.
class ZTCLiveObject {
public:
    /// @param apJson  null: nothing is known of it
    ZTCLiveObject(const ZTCJson* apJson, std::string aPath, std::vector<std::string>& arProblems)
        : mpJson(apJson), mPath(std::move(aPath)), mrProblems(arProblems) {
        if (mpJson != nullptr && !mpJson->is_object()) {
            complain(mPath.empty() ? "all of it" : mPath, "an object");
            mpJson = nullptr;
        }
    }

    void read(const char* apKey, std::string& arPlace) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_string, "a text")) {
            arPlace = lpValue->get<std::string>();
        }
    }
    void read(const char* apKey, std::optional<std::uint64_t>& arPlace) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_number_integer, "a whole number")) {
            readNumber(mPath + apKey, *lpValue, arPlace);
        }
    }
    void read(const char* apKey, std::optional<bool>& arPlace) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_boolean, "true or false")) {
            arPlace = lpValue->get<bool>();
        }
    }
    void read(const char* apKey, std::optional<ZTCHistoryTime>& arPlace) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_string, "a time")) {
            arPlace = fromRfc3339(lpValue->get_ref<const std::string&>());
            if (!arPlace) {
                complain(mPath + apKey, "a time");
            }
        }
    }
    void read(const char* apKey, std::optional<ZTSFcName>& arPlace) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_string, "a WWN")) {
            arPlace = parseWwn(lpValue->get_ref<const std::string&>());
            if (!arPlace) {
                complain(mPath + apKey, "a WWN");
            }
        }
    }
    template <class ZTCEnum, std::size_t aCount>
    void read(const char* apKey, std::optional<ZTCEnum>& arPlace,
              const std::array<const char*, aCount>& acrNames) const {
        std::string lText;
        read(apKey, lText);
        for (std::size_t i = 0; i < aCount; ++i) {
            if (lText == acrNames[i]) {
                arPlace = static_cast<ZTCEnum>(i);
            }
        }
        if (!lText.empty() && !arPlace) {
            complain(mPath + apKey, "one of its states");
        }
    }
    void read(const char* apKey, std::map<std::string, std::string>& arPlace) const {
        eachMember(apKey, [&](const std::string& acrKey, const ZTCJson& acrValue) {
            if (acrValue.is_string()) {
                arPlace[acrKey] = acrValue.get<std::string>();
            } else if (!acrValue.is_null()) {
                complain(mPath + apKey + "." + acrKey, "a text");
            }
        });
    }
    void read(const char* apKey, std::map<std::string, std::uint64_t>& arPlace) const {
        eachMember(apKey, [&](const std::string& acrKey, const ZTCJson& acrValue) {
            std::optional<std::uint64_t> lNumber;
            if (!acrValue.is_null()) {
                readNumber(mPath + apKey + "." + acrKey, acrValue, lNumber);
            }
            if (lNumber) {
                arPlace[acrKey] = *lNumber;
            }
        });
    }
    void read(const char* apKey, std::vector<std::string>& arPlace) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_array, "a list")) {
            for (const ZTCJson& lrLine : *lpValue) {
                if (lrLine.is_string()) {
                    arPlace.push_back(lrLine.get<std::string>());
                } else {
                    complain(mPath + apKey, "a list of texts");
                }
            }
        }
    }
    ZTCLiveObject object(const char* apKey) const {
        return {find(apKey, &ZTCJson::is_object, "an object"), mPath + apKey + ".", mrProblems};
    }
    bool has(const char* apKey) const { return find(apKey, &ZTCJson::is_object, "an object") != nullptr; }

    /// Reads each entry of a list with the function; leaves the place as it is where there is no list.
    template <class ZTCEntry, class ZTCReader>
    void readList(const char* apKey, std::optional<std::vector<ZTCEntry>>& arPlace, ZTCReader aReader) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_array, "a list")) {
            arPlace.emplace();
            for (const ZTCJson& lrEntry : *lpValue) {
                const std::string lPath = mPath + apKey + "[" + std::to_string(arPlace->size()) + "].";
                arPlace->push_back(aReader(ZTCLiveObject(&lrEntry, lPath, mrProblems)));
            }
        }
    }

private:
    /// Numbers are never negative.
    void readNumber(const std::string& acrWhere, const ZTCJson& acrValue, std::optional<std::uint64_t>& arPlace) const {
        const bool lIsGood =
            acrValue.is_number_unsigned() || (acrValue.is_number_integer() && acrValue.get<std::int64_t>() >= 0);
        if (lIsGood) {
            arPlace = acrValue.get<std::uint64_t>();
        } else {
            complain(acrWhere, "a whole number");
        }
    }
    const ZTCJson* find(const char* apKey, bool (ZTCJson::*apIsRight)() const, const char* apWanted) const {
        if (mpJson == nullptr) {
            return nullptr;
        }
        const auto lFound = mpJson->find(apKey);
        if (lFound == mpJson->end() || lFound->is_null()) {
            return nullptr;
        }
        if (!((*lFound).*apIsRight)()) {
            complain(mPath + apKey, apWanted);
            return nullptr;
        }
        return &*lFound;
    }
    template <class ZTCVisitor>
    void eachMember(const char* apKey, ZTCVisitor aVisitor) const {
        if (const ZTCJson* lpValue = find(apKey, &ZTCJson::is_object, "an object")) {
            for (const auto& [lKey, lValue] : lpValue->items()) {
                aVisitor(lKey, lValue);
            }
        }
    }
    void complain(const std::string& acrWhere, const char* apWanted) const {
        mrProblems.push_back("the sensor's answer: " + acrWhere + " is not " + apWanted);
    }

    const ZTCJson* mpJson;
    std::string mPath;
    std::vector<std::string>& mrProblems;
};

static ZTSInitiator sReadInitiator(const ZTCLiveObject& acrObject) {
    ZTSInitiator lInitiator;
    acrObject.read("wwpn", lInitiator.mWwpn);
    acrObject.read("wwnn", lInitiator.mWwnn);
    acrObject.read("host", lInitiator.mHost);
    return lInitiator;
}

static ZTSLiveAdapter sReadAdapter(const ZTCLiveObject& acrObject) {
    ZTSLiveAdapter lAdapter;
    lAdapter.mInitiator = sReadInitiator(acrObject);
    acrObject.read("portState", lAdapter.mPortState);
    acrObject.read("speed", lAdapter.mSpeed);
    return lAdapter;
}

static ZTSLiveKinds sReadKinds(const ZTCLiveObject& acrObject) {
    ZTSLiveKinds lKinds;
    lKinds.mInitiator = sReadInitiator(acrObject.object("initiator"));
    acrObject.read("kinds", lKinds.mStates);
    acrObject.read("words", lKinds.mWords);
    return lKinds;
}

static ZTSLiveLedgerRow sReadLedgerRow(const ZTCLiveObject& acrObject) {
    ZTSLiveLedgerRow lRow;
    lRow.mInitiator = sReadInitiator(acrObject.object("initiator"));
    acrObject.read("kind", lRow.mKind);
    acrObject.read("received", lRow.mReceived);
    acrObject.read("refused", lRow.mRefused);
    acrObject.read("consolidated", lRow.mConsolidated);
    acrObject.read("handedOver", lRow.mHandedOver);
    acrObject.read("held", lRow.mHeld);
    acrObject.read("dropped", lRow.mDropped);
    return lRow;
}

static ZTSLibraryLoss sReadLibraryLoss(const ZTCLiveObject& acrObject) {
    ZTSLibraryLoss lLoss;
    std::optional<std::uint64_t> lCount;
    acrObject.read("name", lLoss.mName);
    acrObject.read("count", lCount);
    lLoss.mCount = lCount.value_or(0);
    return lLoss;
}

static ZTSLiveLosses sReadLosses(const ZTCLiveObject& acrObject) {
    ZTSLiveLosses lLosses;
    acrObject.read("since", lLosses.mSince);
    acrObject.read("refused", lLosses.mRefused);
    acrObject.read("dropped", lLosses.mDropped);
    std::optional<std::vector<ZTSLibraryLoss>> lLibrary;
    acrObject.readList("library", lLibrary, sReadLibraryLoss);
    lLosses.mLibrary = std::move(lLibrary).value_or(std::vector<ZTSLibraryLoss>());
    return lLosses;
}

static ZTSLiveTopology sReadTopology(const ZTCLiveObject& acrObject) {
    ZTSLiveTopology lTopology;
    acrObject.read("scanned", lTopology.mScanned);
    acrObject.read("stale", lTopology.mIsStale);
    acrObject.read("staleSince", lTopology.mStaleSince);
    acrObject.read("blocked", lTopology.mBlocked);
    return lTopology;
}

static ZTSLiveWarning sReadWarning(const ZTCLiveObject& acrObject) {
    ZTSLiveWarning lWarning;
    acrObject.read("kind", lWarning.mKind);
    acrObject.read("text", lWarning.mText);
    acrObject.read("since", lWarning.mSince);
    acrObject.read("given", lWarning.mGiven);
    acrObject.read("next", lWarning.mNext);
    return lWarning;
}

static void sReadKeeper(const ZTCLiveObject& acrObject, ZTSLiveKeeper& arKeeper) {
    acrObject.read("pid", arKeeper.mPid);
    acrObject.read("state", arKeeper.mState, scKeeperStates);
    acrObject.read("since", arKeeper.mSince);
    acrObject.read("nextStart", arKeeper.mNextStart);
}

static void sReadAgent(const ZTCLiveObject& acrObject, ZTSLiveAgent& arAgent) {
    acrObject.read("running", arAgent.mIsRunning);
    acrObject.read("pid", arAgent.mPid);
    acrObject.read("generation", arAgent.mGeneration);
    acrObject.read("since", arAgent.mSince);
    acrObject.read("restarts", arAgent.mRestarts);
    acrObject.read("endReason", arAgent.mEndReason);
    acrObject.read("problem", arAgent.mProblem);
    acrObject.read("adapters", arAgent.mAdapters);
    acrObject.read("adaptersAtStart", arAgent.mAdaptersAtStart);
    acrObject.read("heldBytes", arAgent.mHeldBytes);
    acrObject.read("heldRecords", arAgent.mHeldRecords);
    acrObject.read("limitBytes", arAgent.mLimitBytes);
}

static void sReadCollector(const ZTCLiveObject& acrObject, ZTSLiveCollector& arCollector) {
    acrObject.read("pid", arCollector.mPid);
    acrObject.read("since", arCollector.mSince);
    acrObject.read("lastAsked", arCollector.mLastAsked);
    acrObject.read("lastRetrieval", arCollector.mLastRetrieval);
    acrObject.read("lastEvent", arCollector.mLastEvent);
    acrObject.read("lastEventKind", arCollector.mLastEventKind);
    acrObject.read("disk", arCollector.mDisk, scDiskStates);
    acrObject.read("diskProblem", arCollector.mDiskProblem);
    acrObject.read("waitingFrames", arCollector.mWaitingFrames);
    acrObject.read("waitingBytes", arCollector.mWaitingBytes);
}

ZTSLiveState readLiveState(const ZTCJson& acrDocument) {
    ZTSLiveState lState;
    const ZTCLiveObject lRoot(&acrDocument, "", lState.mProblems);
    lRoot.read("storeId", lState.mStoreId);
    lRoot.read("now", lState.mNow);
    sReadKeeper(lRoot.object("keeper"), lState.mKeeper);
    sReadAgent(lRoot.object("agent"), lState.mAgent);
    sReadCollector(lRoot.object("collector"), lState.mCollector);
    lRoot.readList("adapters", lState.mAdapters, sReadAdapter);
    lRoot.readList("kinds", lState.mKinds, sReadKinds);
    lRoot.readList("ledger", lState.mLedger, sReadLedgerRow);
    if (lRoot.has("losses")) {
        lState.mLosses = sReadLosses(lRoot.object("losses"));
    }
    if (lRoot.has("topology")) {
        lState.mTopology = sReadTopology(lRoot.object("topology"));
    }
    lRoot.readList("warnings", lState.mWarnings, sReadWarning);
    return lState;
}
