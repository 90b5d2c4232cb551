#include "sensor/views/include/SanView.h"

/// How far back the begin of a state is looked for, and how far back its changes count.
static constexpr std::chrono::hours scStateSpan{24};
static constexpr std::chrono::hours scFlappingSpan{1};

/// The host or the remote port's name that a change is about; empty: it is about neither.
static std::string sPortOf(const ZTSTopologyChange& acrChange) {
    return acrChange.mThing == ZTTT_Initiator    ? acrChange.mKey
           : acrChange.mThing == ZTTT_RemotePort ? acrChange.mKey.substr(0, acrChange.mKey.find(' '))
                                                 : "";
}

static void sAddStates(const ZTCHistory& acrHistory, ZTCHistoryTime aTime, ZTSSanPast& arPast) {
    const std::int64_t lUntil = toMicroseconds(aTime);
    const std::int64_t lFlapping = toMicroseconds(aTime - scFlappingSpan);
    for (const ZTSTopologyChange& lrChange :
         acrHistory.readTopologyChanges(toMicroseconds(aTime - scStateSpan), lUntil)) {
        const std::string lPort = sPortOf(lrChange);
        // A port that appears or vanishes has changed its state as well.
        if (lPort.empty() || (lrChange.mAttribute != "state" && !lrChange.mAttribute.empty())) {
            continue;
        }
        ZTSSanPast::States& lrStates = arPast.mStates[lPort];
        const ZTCHistoryTime lTime = fromMicroseconds(lrChange.mTime);
        lrStates.mSince = std::max(lrStates.mSince.value_or(lTime), lTime);
        lrStates.mChanges += lrChange.mTime >= lFlapping ? 1 : 0;
    }
}

std::optional<ZTSSanView> readSan(const ZTCHistory& acrHistory, ZTCHistoryTime aTime) {
    std::optional<ZTSStoredTopology> lNow = acrHistory.readTopology(toMicroseconds(aTime));
    if (!lNow) {
        return std::nullopt;
    }
    ZTSSanPast lPast;
    for (const std::chrono::hours lAge : gcEarlierMoments) {
        if (auto lEarlier = acrHistory.readTopology(toMicroseconds(aTime - lAge))) {
            lPast.mEarlier.push_back(std::move(lEarlier->mTopology));
        }
    }
    sAddStates(acrHistory, aTime, lPast);
    ZTSSanView lView{.mTopology = std::move(lNow->mTopology),
                     .mFacts = {},
                     .mScanned = fromMicroseconds(lNow->mScanned),
                     .mIsStale = lNow->mIsStale};
    lView.mFacts = findSanFacts(lView.mTopology, lPast);
    return lView;
}

void addPorts(ZTCNameBook& arNames, const ZTSTopology& acrTopology) {
    for (const ZTSTopologyInitiator& lrPort : acrTopology.mInitiators) {
        arNames.addInitiator(toInitiator(lrPort));
    }
    for (const ZTSTopologyRemotePort& lrPort : acrTopology.mRemotePorts) {
        if (const auto lPort = toRemotePort(lrPort)) {
            arNames.addRemotePort(*lPort);
        }
    }
}
