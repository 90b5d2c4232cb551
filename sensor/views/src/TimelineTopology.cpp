#include "sensor/views/src/TimelineTopology.h"

#include <algorithm>
#include <map>
#include <nlohmann/json.hpp>

#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/SanFacts.h"
#include "sensor/views/include/TimeText.h"
#include "sensor/views/src/TimelineColumns.h"

using ZTCJson = nlohmann::ordered_json;

namespace {

/// A month in which each of 16 ports has a minute with errors in five.
constexpr std::size_t scMostSamples = 200000;

ZTCJson sText(const std::optional<std::string>& acrText) {
    return acrText && !acrText->empty() ? ZTCJson(*acrText) : ZTCJson(nullptr);
}

/// The states of the initiators' links, as intervals.
class ZTCLinkStates {
public:
    explicit ZTCLinkStates(ZTCHistoryTime aEnd) : mEnd(aEnd) {}

    /// All initiators as they were at a time. Those that have an open interval of the same state keep it.
    void set(const ZTSTopology& acrTopology, ZTCHistoryTime aTime) {
        for (const ZTSTopologyInitiator& lrInitiator : acrTopology.mInitiators) {
            set(lrInitiator.mHost, lrInitiator.mState, aTime);
            mInitiators[lrInitiator.mHost] = toInitiator(lrInitiator);
        }
    }
    void set(const std::string& acrHost, const std::optional<std::string>& acrState, ZTCHistoryTime aTime) {
        const auto lOpen = mOpen.find(acrHost);
        if (lOpen != mOpen.end() && acrState == lOpen->second.mState) {
            return;
        }
        end(acrHost, aTime);
        if (acrState) {
            mOpen[acrHost] = {*acrState, aTime};
        }
    }
    void end(const std::string& acrHost, ZTCHistoryTime aTime) {
        const auto lOpen = mOpen.find(acrHost);
        if (lOpen != mOpen.end()) {
            mEnded.push_back({acrHost, lOpen->second.mState, lOpen->second.mFrom, aTime});
            mOpen.erase(lOpen);
        }
    }

    ZTCJson toJsonList() const {
        ZTCJson lList = ZTCJson::array();
        for (const Ended& lrEnded : mEnded) {
            lList.push_back(toJsonOne(lrEnded));
        }
        for (const auto& [lHost, lrOpen] : mOpen) {
            lList.push_back(toJsonOne({lHost, lrOpen.mState, lrOpen.mFrom, mEnd}));
        }
        return lList;
    }

private:
    struct Open {
        std::string mState;
        ZTCHistoryTime mFrom;
    };
    struct Ended {
        std::string mHost;
        std::string mState;
        ZTCHistoryTime mFrom;
        ZTCHistoryTime mTo;
    };

    ZTCJson toJsonOne(const Ended& acrEnded) const {
        const auto lFound = mInitiators.find(acrEnded.mHost);
        const ZTSInitiator lInitiator = lFound != mInitiators.end()
                                            ? lFound->second
                                            : ZTSInitiator{.mWwpn = {}, .mWwnn = {}, .mHost = acrEnded.mHost};
        return {{"initiator", toJson(lInitiator)},
                {"state", acrEnded.mState},
                {"from", toRfc3339(acrEnded.mFrom)},
                {"to", toRfc3339(acrEnded.mTo)}};
    }

    const ZTCHistoryTime mEnd;
    std::map<std::string, ZTSInitiator> mInitiators;  ///< by host
    std::map<std::string, Open> mOpen;
    std::vector<Ended> mEnded;
};

/// The first topology of the range, and since when it is known: exactly where it reaches back to the begin, else to the
/// column. Absent: there is none up to the end.
std::optional<std::pair<ZTSTopology, ZTCHistoryTime>> sFindFirst(const ZTCHistory& acrHistory,
                                                                 const ZTSTimelineRequest& acrRequest) {
    const auto lAt = [&acrRequest](std::size_t aColumn) {
        return acrRequest.mFrom + (acrRequest.mTo - acrRequest.mFrom) / static_cast<std::int64_t>(acrRequest.mColumns) *
                                      static_cast<std::int64_t>(aColumn);
    };
    const auto lRead = [&acrHistory](ZTCHistoryTime aTime) { return acrHistory.readTopology(toMicroseconds(aTime)); };
    // Once there is a topology there is one at every later time.
    std::size_t lAbsent = 0;
    std::size_t lPresent = acrRequest.mColumns;
    std::optional<ZTSStoredTopology> lFound = lRead(lAt(lAbsent));
    if (lFound) {
        return std::pair(lFound->mTopology, lAt(lAbsent));
    }
    lFound = lRead(acrRequest.mTo);
    if (!lFound) {
        return std::nullopt;
    }
    while (lPresent - lAbsent > 1) {
        const std::size_t lMiddle = lAbsent + (lPresent - lAbsent) / 2;
        if (auto lEarlier = lRead(lAt(lMiddle))) {
            lFound = std::move(lEarlier);
            lPresent = lMiddle;
        } else {
            lAbsent = lMiddle;
        }
    }
    return std::pair(lFound->mTopology, lAt(lPresent));
}

ZTCJson sLinks(const ZTCHistory& acrHistory, const ZTSTimelineRequest& acrRequest) {
    ZTCLinkStates lStates(acrRequest.mTo);
    const auto lFirst = sFindFirst(acrHistory, acrRequest);
    if (!lFirst) {
        return ZTCJson::array();
    }
    lStates.set(lFirst->first, lFirst->second);
    for (const ZTSTopologyChange& lrChange :
         acrHistory.readTopologyChanges(toMicroseconds(lFirst->second), toMicroseconds(acrRequest.mTo))) {
        if (lrChange.mThing != ZTTT_Initiator) {
            continue;
        }
        const ZTCHistoryTime lTime = fromMicroseconds(lrChange.mTime);
        if (lrChange.mAttribute == "state") {
            lStates.set(lrChange.mKey, lrChange.mAfter, lTime);
        } else if (lrChange.mAttribute.empty() && !lrChange.mAfter) {
            lStates.end(lrChange.mKey, lTime);
        } else if (lrChange.mAttribute.empty()) {
            // It appeared: its state stands in the topology alone.
            if (const auto lNow = acrHistory.readTopology(lrChange.mTime)) {
                lStates.set(lNow->mTopology, lTime);
            }
        }
    }
    return lStates.toJsonList();
}

/// Targets that the host knows, each once, with the words of the array behind it.
ZTCJson sRemotePorts(const ZTSTopology& acrTopology, const ZTCNameBook& acrNames) {
    std::map<std::string, const ZTSTopologyPath*> lPaths;  // one of each remote port
    for (const ZTSTopologyPath& lrPath : acrTopology.mPaths) {
        lPaths.emplace(lrPath.mRemotePort, &lrPath);
    }
    std::map<std::string, ZTCJson> lByName;
    for (const ZTSTopologyRemotePort& lrPort : acrTopology.mRemotePorts) {
        const auto lPath = lPaths.find(lrPort.mName);
        const bool lIsTarget = !lrPort.mRoles || lrPort.mRoles->find("Target") != std::string::npos;
        const auto lPort = toRemotePort(lrPort);
        if (!lPort || (!lIsTarget && lPath == lPaths.end())) {
            continue;
        }
        ZTCJson& lrJson = lByName.try_emplace(lPort->mWwpn.toText(), toJson(lPort, acrNames)).first->second;
        const bool lHasWords = lPath != lPaths.end();
        if (lHasWords || !lrJson.contains("vendor")) {
            lrJson["vendor"] = lHasWords ? sText(lPath->second->mVendor) : nullptr;
            lrJson["model"] = lHasWords ? sText(lPath->second->mModel) : nullptr;
        }
    }
    ZTCJson lPorts = ZTCJson::array();
    for (auto& [lWwpn, lrJson] : lByName) {
        lPorts.push_back(std::move(lrJson));
    }
    return lPorts;
}

ZTCJson sCounters(const ZTCHistory& acrHistory, const ZTSTimelineRequest& acrRequest, const ZTCNameBook& acrNames) {
    struct Counter {
        ZTSCounterSample mSample;  ///< one of its samples: it names the ports and the counter
        std::map<std::size_t, std::uint64_t> mCells;
    };
    std::map<std::string, Counter> lCounters;
    for (const ZTSCounterSample& lrSample :
         acrHistory.readCounters(toMicroseconds(acrRequest.mFrom), toMicroseconds(acrRequest.mTo), scMostSamples)) {
        const ZTCHistoryTime lMinute = fromMicroseconds(lrSample.mMinute);
        if (lMinute >= acrRequest.mTo) {
            continue;
        }
        const std::string lPort = lrSample.mRemotePort ? lrSample.mRemotePort->toText() : "";
        Counter& lrCounter = lCounters[lrSample.mCounter + " " + lrSample.mInitiator.toText() + " " + lPort];
        lrCounter.mSample = lrSample;
        lrCounter.mCells[findColumn(acrRequest, lMinute)] += lrSample.mDifference;
    }
    const std::vector<ZTSInitiator> lInitiators = acrHistory.readInitiators();
    const auto lInitiatorOf = [&lInitiators](const ZTSFcName& acrName) {
        const auto lFound = std::ranges::find(lInitiators, std::optional(acrName), &ZTSInitiator::mWwpn);
        return lFound != lInitiators.end() ? *lFound : ZTSInitiator{.mWwpn = acrName, .mWwnn = {}, .mHost = {}};
    };
    ZTCJson lList = ZTCJson::array();
    for (const auto& [lrKey, lrCounter] : lCounters) {
        std::optional<ZTSRemotePort> lPort;
        if (lrCounter.mSample.mRemotePort) {
            lPort = ZTSRemotePort{.mWwpn = *lrCounter.mSample.mRemotePort, .mWwnn = {}, .mFcId = {}};
        }
        ZTCJson lCells = ZTCJson::array();
        for (const auto& [lColumn, lRise] : lrCounter.mCells) {
            lCells.push_back({lColumn, lRise});
        }
        lList.push_back({{"counter", lrCounter.mSample.mCounter},
                         {"initiator", toJson(lInitiatorOf(lrCounter.mSample.mInitiator))},
                         {"remotePort", toJson(lPort, acrNames)},
                         {"cells", std::move(lCells)}});
    }
    return lList;
}

}  // namespace

void addTopology(ZTCJson& arDocument, const ZTCHistory& acrHistory, const ZTSTimelineRequest& acrRequest,
                 const ZTCNameBook& acrNames) {
    const auto lLast = acrHistory.readTopology(toMicroseconds(acrRequest.mTo));
    arDocument["remotePorts"] = lLast ? sRemotePorts(lLast->mTopology, acrNames) : ZTCJson::array();
    arDocument["links"] = sLinks(acrHistory, acrRequest);
    arDocument["counters"] = sCounters(acrHistory, acrRequest, acrNames);
}
