#include "sensor/views/include/NameBook.h"

#include <algorithm>
#include <memory>

#include "sensor/client/include/ClientErrors.h"

std::optional<ZTSFcName> parseWwn(std::string_view aText) {
    try {
        return ZTSFcName::fromText(aText);
    } catch (const ZTCBadInputEx&) {
        return std::nullopt;
    }
}

std::string abbreviateWwn(const ZTSFcName& acrWwn) {
    const std::string lText = acrWwn.toText();
    return lText.substr(0, 2) + ":..:" + lText.substr(lText.size() - 2);
}

/// What hung on the ports at the time that was asked for last.
struct ZTSTopologyCursor {
    std::optional<ZTSStoredTopology> mStored;
    std::int64_t mTime = 0;
};

ZTCTopologyAt readTopologyOf(const ZTCHistory& acrHistory) {
    static constexpr std::chrono::minutes scBeforeTheFirst(1);
    return [&acrHistory, lpCursor = std::make_shared<ZTSTopologyCursor>()](ZTCHistoryTime aTime) {
        const std::int64_t lTime = toMicroseconds(aTime);
        if (!lpCursor->mStored || lTime < lpCursor->mTime) {
            lpCursor->mTime = lTime;
            lpCursor->mStored = acrHistory.readTopology(lTime);
            if (!lpCursor->mStored) {
                lpCursor->mTime = toMicroseconds(aTime + scBeforeTheFirst);
                lpCursor->mStored = acrHistory.readTopology(lpCursor->mTime);
            }
        } else if (lTime > lpCursor->mTime) {
            acrHistory.advanceTopology(*lpCursor->mStored, lpCursor->mTime, lTime);
            lpCursor->mTime = lTime;
        }
        return lpCursor->mStored ? &lpCursor->mStored->mTopology : nullptr;
    };
}

/// The counters of the stretch that was read last, and of the one that was asked for last.
struct ZTSCounterCursor {
    ZTCHistoryTime mFrom{};
    ZTCHistoryTime mTo{};
    std::vector<ZTSCounterSample> mRead;
    std::vector<ZTSCounterSample> mAnswer;
};

ZTCCountersAt readCountersOf(const ZTCHistory& acrHistory) {
    static constexpr std::size_t scMostSamples = 100000;
    using std::chrono::hours;
    using std::chrono::minutes;
    return [&acrHistory, lpCursor = std::make_shared<ZTSCounterCursor>()](
               ZTCHistoryTime aFrom, ZTCHistoryTime aTo) -> const std::vector<ZTSCounterSample>& {
        ZTSCounterCursor& lrCursor = *lpCursor;
        // Whole hours at a time: one reading serves many short episodes. Those of the last minutes are still to come.
        if (aFrom < lrCursor.mFrom || aTo >= lrCursor.mTo) {
            const ZTCHistoryTime lEnd = std::chrono::floor<hours>(aTo) + hours(1);
            lrCursor.mFrom = std::chrono::floor<hours>(aFrom);
            lrCursor.mTo = std::min(lEnd, getHistoryTime() - minutes(2));
            lrCursor.mRead =
                acrHistory.readCounters(toMicroseconds(lrCursor.mFrom), toMicroseconds(lEnd), scMostSamples);
        }
        const std::int64_t lFrom = toMicroseconds(std::chrono::floor<minutes>(aFrom));
        const std::int64_t lTo = toMicroseconds(aTo);
        const auto lBegin = std::ranges::lower_bound(lrCursor.mRead, lFrom, {}, &ZTSCounterSample::mMinute);
        const auto lEnd = std::ranges::upper_bound(lrCursor.mRead, lTo, {}, &ZTSCounterSample::mMinute);
        lrCursor.mAnswer.assign(lBegin, std::max(lBegin, lEnd));
        return lrCursor.mAnswer;
    };
}

void ZTCNameBook::addNames(const std::map<std::string, std::string>& acrNames) {
    for (const auto& [lWwn, lName] : acrNames) {
        if (const auto lParsed = parseWwn(lWwn)) {
            addName(*lParsed, lName);
        }
    }
}

const std::vector<ZTSCounterSample>& ZTCNameBook::findCounters(ZTCHistoryTime aFrom, ZTCHistoryTime aTo) const {
    static const std::vector<ZTSCounterSample> scNone;
    return mCounters ? mCounters(aFrom, aTo) : scNone;
}

std::string ZTCNameBook::findName(const std::optional<ZTSFcName>& acrWwpn,
                                  const std::optional<ZTSFcName>& acrWwnn) const {
    for (const std::optional<ZTSFcName>& lrWwn : {acrWwpn, acrWwnn}) {
        const auto lFound = lrWwn ? mNames.find(lrWwn->mBytes) : mNames.end();
        if (lFound != mNames.end()) {
            return lFound->second;
        }
    }
    return {};
}

std::string ZTCNameBook::describe(const ZTSRemotePort& acrPort) const {
    const std::string lName = findName(acrPort.mWwpn, acrPort.mWwnn);
    return lName.empty() ? acrPort.mWwpn.toText() : lName;
}

std::string ZTCNameBook::describe(const ZTSInitiator& acrInitiator) const {
    const std::string lName = findName(acrInitiator.mWwpn, acrInitiator.mWwnn);
    return !lName.empty()                ? lName
           : !acrInitiator.mHost.empty() ? acrInitiator.mHost
           : acrInitiator.mWwpn          ? acrInitiator.mWwpn->toText()
                                         : "unknown adapter";
}

std::vector<ZTSFcName> ZTCNameBook::findNamed(std::string_view aText) const {
    std::vector<ZTSFcName> lWwns;
    for (const auto& [lWwn, lName] : mNames) {
        if (lName == aText) {
            lWwns.push_back(ZTSFcName{lWwn});
        }
    }
    return lWwns;
}

static void sAddOnce(std::vector<ZTSFcName>& arWwns, const ZTSFcName& acrWwn) {
    if (std::find(arWwns.begin(), arWwns.end(), acrWwn) == arWwns.end()) {
        arWwns.push_back(acrWwn);
    }
}

static bool sContains(const std::vector<ZTSFcName>& acrWwns, const std::optional<ZTSFcName>& acrWwn) {
    return acrWwn && std::find(acrWwns.begin(), acrWwns.end(), *acrWwn) != acrWwns.end();
}

std::vector<ZTSFcName> ZTCNameBook::findRemotePorts(std::string_view aText) const {
    if (const auto lWwn = parseWwn(aText)) {
        return {*lWwn};
    }
    // A name may be a port's own, or that of a node with any number of ports.
    const std::vector<ZTSFcName> lNamed = findNamed(aText);
    std::vector<ZTSFcName> lWwpns = lNamed;
    for (const ZTSRemotePort& lrPort : mRemotePorts) {
        if (sContains(lNamed, lrPort.mWwnn)) {
            sAddOnce(lWwpns, lrPort.mWwpn);
        }
    }
    if (const ZTSTopology* const lpNow = findTopology(getHistoryTime())) {
        for (const ZTSTopologyRemotePort& lrPort : lpNow->mRemotePorts) {
            if (lrPort.mWwpn && (lrPort.mName == aText || sContains(lNamed, lrPort.mWwnn))) {
                sAddOnce(lWwpns, *lrPort.mWwpn);
            }
        }
    }
    return lWwpns;
}

std::vector<ZTSFcName> ZTCNameBook::findInitiators(std::string_view aText) const {
    if (const auto lWwn = parseWwn(aText)) {
        return {*lWwn};
    }
    const std::vector<ZTSFcName> lNamed = findNamed(aText);
    std::vector<ZTSFcName> lWwpns = lNamed;
    for (const ZTSInitiator& lrInitiator : mInitiators) {
        if (lrInitiator.mWwpn && (lrInitiator.mHost == aText || sContains(lNamed, lrInitiator.mWwnn))) {
            sAddOnce(lWwpns, *lrInitiator.mWwpn);
        }
    }
    if (const ZTSTopology* const lpNow = findTopology(getHistoryTime())) {
        for (const ZTSTopologyInitiator& lrPort : lpNow->mInitiators) {
            if (lrPort.mWwpn && (lrPort.mHost == aText || lrPort.mSymbolicName == aText)) {
                sAddOnce(lWwpns, *lrPort.mWwpn);
            }
        }
    }
    return lWwpns;
}
