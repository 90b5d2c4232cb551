#include "sensor/views/include/SanView.h"

#include <algorithm>
#include <set>
#include <string_view>
#include <vector>

/// How far back the begin of a state is looked for, and how far back its changes count.
static constexpr std::chrono::hours scStateSpan{24};
static constexpr std::chrono::hours scFlappingSpan{1};

/// The host or the remote port's name that a change is about; empty: it is about neither.
static std::string sPortOf(const ZTSTopologyChange& acrChange) {
    return acrChange.mThing == ZTTT_Initiator    ? acrChange.mKey
           : acrChange.mThing == ZTTT_RemotePort ? acrChange.mKey.substr(0, acrChange.mKey.find(' '))
                                                 : "";
}

static void sAddStates(const std::vector<ZTSTopologyChange>& acrChanges, ZTCHistoryTime aTime, ZTSSanPast& arPast) {
    const std::int64_t lFlapping = toMicroseconds(aTime - scFlappingSpan);
    for (const ZTSTopologyChange& lrChange : acrChanges) {
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

/// The newest mark "baseline" by then; else the begin of all times.
static ZTCHistoryTime sFindBaseline(const ZTCHistory& acrHistory, ZTCHistoryTime aTime) {
    ZTCHistoryTime lBaseline{};
    for (const ZTSMark& lrMark : acrHistory.readMarks()) {
        if (lrMark.mName == gcBaselineMark && lrMark.mTime <= aTime) {
            lBaseline = std::max(lBaseline, lrMark.mTime);
        }
    }
    return lBaseline;
}

/// The moments that count as earlier: some fixed ones, and those right before a path went away for the first and the
/// last time in the last day, so that what came and went since the last fixed one is missed too. None lies before the
/// baseline.
static std::set<std::int64_t> sFindMoments(const std::vector<ZTSTopologyChange>& acrChanges, ZTCHistoryTime aTime,
                                           ZTCHistoryTime aBaseline) {
    std::set<std::int64_t> lMoments;
    for (const std::chrono::hours lAge : gcEarlierMoments) {
        lMoments.insert(toMicroseconds(std::max(aTime - lAge, aBaseline)));
    }
    std::set<std::int64_t> lLosses;
    for (const ZTSTopologyChange& lrChange : acrChanges) {
        const bool lIsGone = lrChange.mAttribute.empty() && !lrChange.mAfter;
        if (lrChange.mThing == ZTTT_Path && lIsGone && lrChange.mTime > toMicroseconds(aBaseline)) {
            lLosses.insert(lrChange.mTime - 1);
        }
    }
    if (!lLosses.empty()) {
        lMoments.insert({*lLosses.begin(), *lLosses.rbegin()});
    }
    return lMoments;
}

// ---- episodes that show a trouble ----

/// Kinds that show that a link or a remote port went away, the most telling first.
static constexpr std::array<std::string_view, 6> scTellingKinds{"link", "logo", "prlo", "rscn", "adisc", "plogi"};
/// Events come this much before or behind the look that saw the state change.
static constexpr std::chrono::minutes scEpisodeReach{2};
static constexpr std::uint64_t scMostEpisodes = 1000;

/// How well an episode shows a trouble: 0 for not at all, the less the better otherwise.
static std::size_t sRank(const ZTSEpisode& acrEpisode, const ZTSSanTrouble& acrTrouble) {
    const bool lIsInitiator = std::ranges::any_of(acrTrouble.mInitiators, [&](const ZTSInitiator& acrInitiator) {
        return acrInitiator.mWwpn && acrInitiator.mWwpn == acrEpisode.mInitiator.mWwpn;
    });
    const bool lIsPort = std::ranges::any_of(acrTrouble.mRemotePorts, [&](const ZTSRemotePort& acrPort) {
        return acrEpisode.mRemotePort && acrEpisode.mRemotePort->mWwpn == acrPort.mWwpn;
    });
    const auto lKind = std::ranges::find(scTellingKinds, getKindName(acrEpisode.mKind));
    const bool lIsOther = !acrTrouble.mRemotePorts.empty() && acrEpisode.mRemotePort && !lIsPort;
    if (!lIsInitiator || lIsOther || lKind == scTellingKinds.end()) {
        return 0;
    }
    const auto lPlace = static_cast<std::size_t>(lKind - scTellingKinds.begin());
    return 1 + lPlace + (lIsPort || acrTrouble.mRemotePorts.empty() ? 0 : scTellingKinds.size());
}

/// The episode that best shows each trouble whose begin is known; of like ones the latest. A trouble of LUNs has that
/// of a link or a port that they are behind.
static void sAddEpisodes(const ZTCHistory& acrHistory, ZTCHistoryTime aTime, ZTSSanFacts& arFacts) {
    ZTSHistoryFilter lFilter;
    lFilter.mLimit = scMostEpisodes;
    lFilter.mUntil = aTime;
    for (const ZTSSanTrouble& lrTrouble : arFacts.mTroubles) {
        if (lrTrouble.mSince) {
            const ZTCHistoryTime lFrom = *lrTrouble.mSince - scEpisodeReach;
            lFilter.mSince = std::min(lFilter.mSince.value_or(lFrom), lFrom);
        }
    }
    if (!lFilter.mSince) {
        return;
    }
    const std::vector<ZTSEpisode> lEpisodes = acrHistory.readEpisodes(lFilter);
    for (ZTSSanTrouble& lrTrouble : arFacts.mTroubles) {
        std::size_t lBest = 0;
        for (const ZTSEpisode& lrEpisode : lEpisodes) {
            const bool lIsOfThen = lrTrouble.mSince && lrEpisode.mLast >= *lrTrouble.mSince - scEpisodeReach &&
                                   lrEpisode.mFirst <= *lrTrouble.mSince + scEpisodeReach;
            const std::size_t lRank = lIsOfThen ? sRank(lrEpisode, lrTrouble) : 0;
            if (lRank != 0 && (lBest == 0 || lRank <= lBest)) {
                lBest = lRank;
                lrTrouble.mEpisode = lrEpisode.mEpisode;
            }
        }
    }
    for (ZTSSanTrouble& lrTrouble : arFacts.mTroubles) {
        for (const ZTSSanTrouble& lrCause : arFacts.mTroubles) {
            const bool lIsBehind =
                lrTrouble.mInitiators.empty() && std::ranges::any_of(lrTrouble.mLuns, [&](std::size_t aLun) {
                    return std::ranges::find(lrCause.mLuns, aLun) != lrCause.mLuns.end();
                });
            if (lIsBehind && !lrTrouble.mEpisode && !lrCause.mInitiators.empty()) {
                lrTrouble.mEpisode = lrCause.mEpisode;
            }
        }
    }
}

std::optional<ZTSSanView> readSan(const ZTCHistory& acrHistory, ZTCHistoryTime aTime) {
    std::optional<ZTSStoredTopology> lNow = acrHistory.readTopology(toMicroseconds(aTime));
    if (!lNow) {
        return std::nullopt;
    }
    const ZTCHistoryTime lBaseline = sFindBaseline(acrHistory, aTime);
    const std::vector<ZTSTopologyChange> lChanges =
        acrHistory.readTopologyChanges(toMicroseconds(aTime - scStateSpan), toMicroseconds(aTime));
    ZTSSanPast lPast;
    for (const std::int64_t lThen : sFindMoments(lChanges, aTime, lBaseline)) {
        if (auto lEarlier = acrHistory.readTopology(lThen)) {
            lPast.mEarlier.push_back(std::move(lEarlier->mTopology));
        }
    }
    lPast.mMostWays = acrHistory.readMostWays(toMicroseconds(lBaseline), toMicroseconds(aTime));
    sAddStates(lChanges, aTime, lPast);
    ZTSSanView lView{.mTopology = std::move(lNow->mTopology),
                     .mFacts = {},
                     .mScanned = fromMicroseconds(lNow->mScanned),
                     .mIsStale = lNow->mIsStale};
    lView.mFacts = findSanFacts(lView.mTopology, lPast);
    sAddEpisodes(acrHistory, aTime, lView.mFacts);
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
