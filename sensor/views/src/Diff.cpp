#include <algorithm>
#include <array>
#include <cmath>
#include <map>

#include "sensor/views/include/DiffView.h"
#include "sensor/views/include/FilterText.h"
#include "sensor/views/include/SanFacts.h"
#include "sensor/views/include/SanTroubles.h"

static constexpr std::array<const char*, ZTDF_Count> scThings{"link", "remotePort", "lun", "path"};
static constexpr std::chrono::hours scLeastBefore{1};
/// Where no mark has been set.
static constexpr std::chrono::hours scDefaultSpan{24};

const char* getDiffThingName(ZTEDiffThing aThing) {
    return scThings.at(aThing);
}

bool ZTSDiff::isSame() const {
    return mChanges.empty() && std::ranges::none_of(mRates, &ZTSDiffRate::mIsDifferent);
}

// ---- states at two moments ----

/// A thing at one moment.
struct ZTSDiffState {
    ZTSDiffSubject mSubject;
    std::optional<std::string> mState;
};
/// By a key that outlives a restart.
using ZTCDiffStates = std::map<std::string, ZTSDiffState>;

static std::string sKey(const ZTSInitiator& acrInitiator) {
    return acrInitiator.mWwpn ? acrInitiator.mWwpn->toText() : acrInitiator.mHost;
}

static ZTCDiffStates sLinks(const ZTSTopology& acrTopology) {
    ZTCDiffStates lStates;
    for (const ZTSTopologyInitiator& lrPort : acrTopology.mInitiators) {
        const ZTSInitiator lInitiator = toInitiator(lrPort);
        lStates[sKey(lInitiator)] = {{.mThing = ZTDF_Link, .mInitiator = lInitiator}, lrPort.mState};
    }
    return lStates;
}

static ZTCDiffStates sRemotePorts(const ZTSTopology& acrTopology) {
    ZTCDiffStates lStates;
    for (const ZTSTopologyRemotePort& lrPort : acrTopology.mRemotePorts) {
        const auto lPort = toRemotePort(lrPort);
        const ZTSTopologyInitiator* const lpInitiator = acrTopology.findInitiator(lrPort.mHost);
        if (lPort && lpInitiator != nullptr) {
            const ZTSInitiator lInitiator = toInitiator(*lpInitiator);
            lStates[sKey(lInitiator) + " " + lPort->mWwpn.toText()] = {
                {.mThing = ZTDF_RemotePort, .mInitiator = lInitiator, .mRemotePort = lPort}, lrPort.mState};
        }
    }
    return lStates;
}

static ZTCDiffStates sPaths(const ZTSSanLun& acrLun) {
    ZTCDiffStates lStates;
    for (const ZTSSanPath& lrPath : acrLun.mPaths) {
        const std::string lPort = lrPath.mRemotePort ? lrPath.mRemotePort->mWwpn.toText() : lrPath.mRemotePortName;
        lStates[sKey(lrPath.mInitiator) + " " + lPort + " " + std::to_string(lrPath.mLun)] = {
            {.mThing = ZTDF_Path,
             .mInitiator = lrPath.mInitiator,
             .mRemotePort = lrPath.mRemotePort,
             .mLun = acrLun.mId,
             .mLunName = describeLun(acrLun)},
            lrPath.mState};
    }
    return lStates;
}

static void sCompare(const ZTCDiffStates& acrBefore, const ZTCDiffStates& acrAfter,
                     std::vector<ZTSDiffChange>& arChanges) {
    static const std::string scNotKnown = "not known";
    for (const auto& [lKey, lBefore] : acrBefore) {
        const auto lAfter = acrAfter.find(lKey);
        if (lAfter == acrAfter.end()) {
            arChanges.push_back({lBefore.mSubject, lBefore.mState.value_or(scNotKnown), std::nullopt});
        } else if (lBefore.mState && lAfter->second.mState && lBefore.mState != lAfter->second.mState) {
            arChanges.push_back({lAfter->second.mSubject, lBefore.mState, lAfter->second.mState});
        }
    }
    for (const auto& [lKey, lAfter] : acrAfter) {
        if (!acrBefore.contains(lKey)) {
            arChanges.push_back({lAfter.mSubject, std::nullopt, lAfter.mState.value_or(scNotKnown)});
        }
    }
}

static std::map<std::string, ZTSSanLun> sLuns(const ZTSTopology& acrTopology) {
    std::map<std::string, ZTSSanLun> lLuns;
    for (ZTSSanLun& lrLun : findSanFacts(acrTopology).mLuns) {
        lLuns.emplace(lrLun.mId, std::move(lrLun));
    }
    return lLuns;
}

static std::string sCountPaths(const ZTSSanLun& acrLun) {
    return std::to_string(acrLun.mPaths.size()) + (acrLun.mPaths.size() == 1 ? " path" : " paths");
}

static void sCompareLuns(const ZTSTopology& acrBefore, const ZTSTopology& acrAfter,
                         std::vector<ZTSDiffChange>& arChanges) {
    const std::map<std::string, ZTSSanLun> lBefore = sLuns(acrBefore);
    const std::map<std::string, ZTSSanLun> lAfter = sLuns(acrAfter);
    const auto lAdd = [&arChanges](const ZTSSanLun& acrLun, bool aIsGone) {
        const ZTSDiffSubject lSubject{.mThing = ZTDF_Lun, .mLun = acrLun.mId, .mLunName = describeLun(acrLun)};
        const std::optional<std::string> lPaths = sCountPaths(acrLun);
        arChanges.push_back({lSubject, aIsGone ? lPaths : std::nullopt, aIsGone ? std::nullopt : lPaths});
    };
    for (const auto& [lId, lLun] : lBefore) {
        if (!lAfter.contains(lId)) {
            lAdd(lLun, true);
        }
    }
    for (const auto& [lId, lLun] : lAfter) {
        if (!lBefore.contains(lId)) {
            lAdd(lLun, false);
        }
    }
    for (const auto& [lId, lLun] : lAfter) {
        const auto lThen = lBefore.find(lId);
        if (lThen != lBefore.end()) {
            sCompare(sPaths(lThen->second), sPaths(lLun), arChanges);
        }
    }
}

std::vector<ZTSDiffChange> compareTopologies(const ZTSTopology& acrBefore, const ZTSTopology& acrAfter) {
    std::vector<ZTSDiffChange> lChanges;
    sCompare(sLinks(acrBefore), sLinks(acrAfter), lChanges);
    sCompare(sRemotePorts(acrBefore), sRemotePorts(acrAfter), lChanges);
    sCompareLuns(acrBefore, acrAfter, lChanges);
    return lChanges;
}

// ---- what came and went in between ----

/// Finds the subject of a stored change: a link, a remote port or a path that is there at both ends, by its place now.
class ZTCPassingFinder {
public:
    explicit ZTCPassingFinder(const ZTSTopology& acrNow) {
        for (const ZTSTopologyInitiator& lrPort : acrNow.mInitiators) {
            mSubjects[{ZTTT_Initiator, lrPort.mHost}] = {.mThing = ZTDF_Link, .mInitiator = toInitiator(lrPort)};
        }
        for (const ZTSTopologyRemotePort& lrPort : acrNow.mRemotePorts) {
            const ZTSTopologyInitiator* const lpInitiator = acrNow.findInitiator(lrPort.mHost);
            if (lrPort.mWwpn && lpInitiator != nullptr) {
                mSubjects[{ZTTT_RemotePort, lrPort.mName + " " + lrPort.mWwpn->toText()}] = {
                    .mThing = ZTDF_RemotePort,
                    .mInitiator = toInitiator(*lpInitiator),
                    .mRemotePort = toRemotePort(lrPort)};
            }
        }
        for (const ZTSSanLun& lrLun : findSanFacts(acrNow).mLuns) {
            for (const ZTSSanPath& lrPath : lrLun.mPaths) {
                mSubjects[{ZTTT_Path, lrPath.mAddress}] = {.mThing = ZTDF_Path,
                                                           .mInitiator = lrPath.mInitiator,
                                                           .mRemotePort = lrPath.mRemotePort,
                                                           .mLun = lrLun.mId,
                                                           .mLunName = describeLun(lrLun)};
            }
        }
    }

    const ZTSDiffSubject* find(const ZTSTopologyChange& acrChange) const {
        const auto lFound = mSubjects.find({acrChange.mThing, acrChange.mKey});
        return lFound == mSubjects.end() ? nullptr : &lFound->second;
    }

private:
    std::map<std::pair<ZTETopologyThing, std::string>, ZTSDiffSubject> mSubjects;
};

static bool sIsSameSubject(const ZTSDiffSubject& acrOne, const ZTSDiffSubject& acrOther) {
    return acrOne.mThing == acrOther.mThing && acrOne.mInitiator == acrOther.mInitiator &&
           acrOne.mRemotePort == acrOther.mRemotePort && acrOne.mLun == acrOther.mLun;
}

/// Links and remote ports one by one. Paths follow their ports: they are named only where their port stayed.
static std::vector<ZTSDiffPassing> sFindPassing(const std::vector<ZTSTopologyChange>& acrChanges,
                                                const ZTSTopology& acrNow,
                                                const std::vector<ZTSDiffChange>& acrDifferent) {
    const ZTCPassingFinder lFinder(acrNow);
    std::map<std::pair<ZTETopologyThing, std::string>, ZTSDiffPassing> lFound;
    for (const ZTSTopologyChange& lrChange : acrChanges) {
        const ZTSDiffSubject* const lpSubject = lFinder.find(lrChange);
        const bool lIsState = lrChange.mAttribute == "state" || lrChange.mAttribute.empty();
        if (lpSubject == nullptr || !lIsState ||
            std::ranges::any_of(acrDifferent, [lpSubject](const ZTSDiffChange& acrChange) {
                return sIsSameSubject(acrChange.mSubject, *lpSubject);
            })) {
            continue;
        }
        ZTSDiffPassing& lrPassing = lFound[{lrChange.mThing, lrChange.mKey}];
        lrPassing.mSubject = *lpSubject;
        const std::string lState =
            lrChange.mAttribute.empty() ? (lrChange.mAfter ? "there" : "gone") : lrChange.mAfter.value_or("not known");
        lrPassing.mStates.emplace_back(fromMicroseconds(lrChange.mTime), lState);
    }
    std::vector<ZTSDiffPassing> lPassing;
    for (const auto& lrFound : lFound) {
        const ZTSDiffSubject& lrSubject = lrFound.second.mSubject;
        const auto lIsOfPort = [&lrSubject](const auto& acrOther) {
            const ZTSDiffSubject& lrPort = acrOther.second.mSubject;
            return lrPort.mThing != ZTDF_Path && lrPort.mInitiator == lrSubject.mInitiator &&
                   (lrPort.mThing == ZTDF_Link || lrPort.mRemotePort == lrSubject.mRemotePort);
        };
        if (lrSubject.mThing != ZTDF_Path || std::ranges::none_of(lFound, lIsOfPort)) {
            lPassing.push_back(lrFound.second);
        }
    }
    return lPassing;
}

// ---- rates ----

bool areRatesDifferent(std::uint64_t aBefore, double aBeforeHours, std::uint64_t aAfter, double aAfterHours) {
    // The counts are scaled to the shorter time, so that neither is made up.
    const double lHours = std::min(aBeforeHours, aAfterHours);
    const double lBefore = static_cast<double>(aBefore) * lHours / aBeforeHours;
    const double lAfter = static_cast<double>(aAfter) * lHours / aAfterHours;
    const bool lIsFar = std::abs(lAfter - lBefore) > 3 * std::sqrt(lAfter + lBefore);
    return lIsFar && std::max(lBefore, lAfter) >= 2 * std::min(lBefore, lAfter);
}

static double sHours(std::chrono::microseconds aSpan) {
    return std::chrono::duration<double, std::ratio<3600>>(aSpan).count();
}

using ZTCDiffRates = std::map<std::pair<ZTCKindKey, std::string>, ZTSDiffRate>;

using ZTCDiffCount = std::uint64_t ZTSDiffRate::*;

/// Adds what happened in the minutes [aFrom, aTo) to that count of each rate. What had ended before `aBegin`, a time in
/// the first minute, is added to the other count, or to none where that is null.
static void sCount(const ZTCHistory& acrHistory, ZTCHistoryTime aFrom, ZTCHistoryTime aTo, ZTCHistoryTime aBegin,
                   ZTCDiffCount apCount, ZTCDiffCount apCountBefore, ZTCDiffRates& arRates) {
    ZTSHistoryFilter lFilter;
    lFilter.mSince = aFrom;
    lFilter.mUntil = aTo - std::chrono::microseconds(1);
    acrHistory.visitMinutes(lFilter, [&](const ZTSBucket& acrBucket) {
        const ZTCDiffCount lpCount = acrBucket.mLast < aBegin ? apCountBefore : apCount;
        if (lpCount == nullptr) {
            return true;
        }
        const std::string lPort = acrBucket.mRemotePort ? acrBucket.mRemotePort->mWwpn.toText() : "";
        ZTSDiffRate& lrRate = arRates[{acrBucket.mKind, lPort}];
        lrRate.mKind = acrBucket.mKind;
        lrRate.mRemotePort = acrBucket.mRemotePort;
        lrRate.*lpCount += acrBucket.mOccurrences;
        return true;
    });
}

/// Events are counted by the minute: both stretches are whole minutes. In the minute in which the second one begins,
/// events that had ended before its begin do not count as its own.
static void sAddRates(const ZTCHistory& acrHistory, const ZTSDiffRequest& acrRequest, ZTSDiff& arDiff) {
    using std::chrono::ceil;
    using std::chrono::floor;
    using std::chrono::minutes;
    const ZTCHistoryTime lBorder = floor<minutes>(acrRequest.mFrom.mTime);
    const ZTCHistoryTime lAfterSince = floor<minutes>(acrRequest.mAfterSince.value_or(lBorder));
    const ZTCHistoryTime lEnd = std::max<ZTCHistoryTime>(ceil<minutes>(acrRequest.mTo.mTime), lAfterSince + minutes(1));
    arDiff.mBeforeEnd = lBorder;
    arDiff.mAfterEnd = lEnd;
    arDiff.mAfterSpan = lEnd - lAfterSince;
    arDiff.mBeforeSpan = std::max<std::chrono::microseconds>(arDiff.mAfterSpan, scLeastBefore);
    if (acrRequest.mBeforeSince) {
        arDiff.mBeforeSpan =
            std::max<std::chrono::microseconds>(lBorder - floor<minutes>(*acrRequest.mBeforeSince), minutes(1));
    }
    ZTCDiffRates lRates;
    const ZTCDiffCount lpBefore = &ZTSDiffRate::mBefore;
    const ZTCHistoryTime lBegin = acrRequest.mAfterSince.value_or(acrRequest.mFrom.mTime);
    const ZTCDiffCount lpBeforeBegin = lAfterSince == lBorder ? lpBefore : nullptr;
    sCount(acrHistory, lBorder - arDiff.mBeforeSpan, lBorder, ZTCHistoryTime::min(), lpBefore, nullptr, lRates);
    sCount(acrHistory, lAfterSince, lEnd, lBegin, &ZTSDiffRate::mAfter, lpBeforeBegin, lRates);
    for (auto& [lKey, lRate] : lRates) {
        lRate.mIsDifferent =
            areRatesDifferent(lRate.mBefore, sHours(arDiff.mBeforeSpan), lRate.mAfter, sHours(arDiff.mAfterSpan));
        arDiff.mRates.push_back(lRate);
    }
    std::ranges::stable_sort(arDiff.mRates, [](const ZTSDiffRate& acrLeft, const ZTSDiffRate& acrRight) {
        return acrLeft.mIsDifferent > acrRight.mIsDifferent;
    });
}

static ZTSDiffPoint sReadPoint(const std::string& acrText, const char* apName, const std::vector<ZTSMark>& acrMarks,
                               ZTCHistoryTime aNow) {
    const bool lIsMark = std::ranges::find(acrMarks, acrText, &ZTSMark::mName) != acrMarks.end();
    return {.mTime = readPoint(acrText, apName, acrMarks, aNow), .mMark = lIsMark ? acrText : ""};
}

ZTSDiffRequest readDiffRequest(const ZTSDiffTexts& acrTexts, const std::vector<ZTSMark>& acrMarks,
                               ZTCHistoryTime aNow) {
    ZTSDiffRequest lRequest{.mFrom = {.mTime = aNow - scDefaultSpan, .mMark = ""}, .mTo = {.mTime = aNow, .mMark = ""}};
    if (!acrTexts.mFrom.empty()) {
        lRequest.mFrom = sReadPoint(acrTexts.mFrom, "from", acrMarks, aNow);
    } else if (!acrMarks.empty()) {
        lRequest.mFrom = {.mTime = acrMarks.back().mTime, .mMark = acrMarks.back().mName};
    }
    if (!acrTexts.mTo.empty()) {
        lRequest.mTo = sReadPoint(acrTexts.mTo, "to", acrMarks, aNow);
    }
    checkOrder("from", lRequest.mFrom.mTime, "to", lRequest.mTo.mTime);
    if (!acrTexts.mBeforeSince.empty()) {
        lRequest.mBeforeSince = readPoint(acrTexts.mBeforeSince, "before-since", acrMarks, aNow);
        checkOrder("before-since", *lRequest.mBeforeSince, "from", lRequest.mFrom.mTime);
    }
    if (!acrTexts.mAfterSince.empty()) {
        lRequest.mAfterSince = readPoint(acrTexts.mAfterSince, "after-since", acrMarks, aNow);
        checkOrder("after-since", *lRequest.mAfterSince, "to", lRequest.mTo.mTime);
    }
    return lRequest;
}

ZTSDiff makeDiff(const ZTCHistory& acrHistory, const ZTSDiffRequest& acrRequest) {
    ZTSDiff lDiff;
    lDiff.mFrom = acrRequest.mFrom;
    lDiff.mTo = acrRequest.mTo;
    const std::int64_t lFrom = toMicroseconds(acrRequest.mFrom.mTime);
    const std::int64_t lTo = toMicroseconds(acrRequest.mTo.mTime);
    const auto lBefore = acrHistory.readTopology(lFrom);
    const auto lAfter = acrHistory.readTopology(lTo);
    lDiff.mHasTopology = lBefore && lAfter;
    if (lDiff.mHasTopology) {
        lDiff.mChanges = compareTopologies(lBefore->mTopology, lAfter->mTopology);
        lDiff.mPassing = sFindPassing(acrHistory.readTopologyChanges(lFrom, lTo), lAfter->mTopology, lDiff.mChanges);
    }
    sAddRates(acrHistory, acrRequest, lDiff);
    return lDiff;
}
