#include "sensor/warnings/include/WarnBook.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/views/include/NameBook.h"

using ZTCJson = nlohmann::ordered_json;

std::string findWarnSubject(const ZTSWarnRule& acrRule, const ZTSWarnOccurrence& acrOccurrence) {
    if (acrRule.mPer == "host") {
        return {};
    }
    if (acrRule.mPer == "port" && acrOccurrence.mRemotePort) {
        return acrOccurrence.mRemotePort->mWwpn.toText();
    }
    return acrOccurrence.mInitiator.mWwpn ? acrOccurrence.mInitiator.mWwpn->toText() : std::string();
}

/// A rule is the same one after a change of the settings only if all of it is the same.
static std::string sRuleName(const ZTSWarnRule& acrRule) {
    return dumpJson(
        {acrRule.mKind, acrRule.mCount, acrRule.mWithin.count(), acrRule.mPer, acrRule.mRun, acrRule.mTimeout.count()},
        -1);
}

ZTCWarnBook::ZTCWarnBook(std::vector<ZTSWarnRule> aRules) : mRules(std::move(aRules)) {}

ZTCWarnBook::ZTSTrack& ZTCWarnBook::findOrAdd(std::size_t aRule, const ZTSWarnOccurrence& acrOccurrence) {
    const ZTCTrackKey lKey(aRule, findWarnSubject(mRules[aRule], acrOccurrence));
    auto lPlace = mTracks.find(lKey);
    if (lPlace == mTracks.end()) {
        lPlace = mTracks.emplace(lKey, ZTSTrack(mRules[aRule].mWithin)).first;
        lPlace->second.mTrouble.mRule = aRule;
        lPlace->second.mTrouble.mSubject = lKey.second;
    }
    ZTSTrouble& lrTrouble = lPlace->second.mTrouble;
    lrTrouble.mInitiator = acrOccurrence.mInitiator;
    lrTrouble.mRemotePort = acrOccurrence.mRemotePort;
    lrTrouble.mText = acrOccurrence.mText;
    lrTrouble.mLast = acrOccurrence.mTime;
    return lPlace->second;
}

void ZTCWarnBook::note(const ZTSWarnOccurrence& acrOccurrence) {
    for (std::size_t i = 0; i < mRules.size(); ++i) {
        if (mRules[i].mKind == acrOccurrence.mKind) {
            findOrAdd(i, acrOccurrence).mWindow.add(acrOccurrence.mTime, acrOccurrence.mCount);
        }
    }
}

void ZTCWarnBook::setHolding(const std::vector<ZTSWarnOccurrence>& acrHolding) {
    std::map<ZTCTrackKey, bool> lNow;
    for (const ZTSWarnOccurrence& lrOccurrence : acrHolding) {
        for (std::size_t i = 0; i < mRules.size(); ++i) {
            if (mRules[i].mKind != lrOccurrence.mKind) {
                continue;
            }
            ZTSTrack& lrTrack = findOrAdd(i, lrOccurrence);
            lNow[{i, lrTrack.mTrouble.mSubject}] = true;
            // A trouble that an earlier process has warned of does not begin now.
            if (!lrTrack.mIsHolding && !(lrTrack.mIsOpen && lrTrack.mTrouble.mCount == 0)) {
                lrTrack.mWindow.add(lrOccurrence.mTime, lrOccurrence.mCount);
            }
            lrTrack.mIsHolding = true;
        }
    }
    for (auto& [lrKey, lrTrack] : mTracks) {
        lrTrack.mIsHolding = lNow.contains(lrKey);
    }
}

std::string ZTCWarnBook::describe(const ZTSTrouble& acrTrouble) const {
    return mRules[acrTrouble.mRule].mKind + (acrTrouble.mSubject.empty() ? "" : " of " + acrTrouble.mSubject);
}

void ZTCWarnBook::judge(ZTCHistoryTime aNow, const std::function<bool(const std::string& acrKind)>& aIsKnown,
                        std::vector<std::string>& arLines) {
    bool lIsOverfull = false;
    for (auto lPlace = mTracks.begin(); lPlace != mTracks.end();) {
        ZTSTrack& lrTrack = lPlace->second;
        const ZTSWarnRule& lrRule = mRules[lPlace->first.first];
        lrTrack.mTrouble.mCount = lrTrack.mWindow.count(aNow);
        if (lrTrack.mTrouble.mCount == 0 && !lrTrack.mIsHolding && aIsKnown(lrRule.mKind)) {
            if (lrTrack.mIsOpen) {
                arLines.push_back("the trouble is over: " + describe(lrTrack.mTrouble));
                --mOpen;
            }
            lPlace = mTracks.erase(lPlace);
            continue;
        }
        if (!lrTrack.mIsOpen && lrTrack.mTrouble.mCount >= lrRule.mCount) {
            if (mOpen < gcMostWarnings) {
                lrTrack.mIsOpen = true;
                lrTrack.mTrouble.mFirst = lrTrack.mWindow.getFirst();
                lrTrack.mTrouble.mNext = aNow;
                ++mOpen;
            } else {
                lIsOverfull = true;
            }
        }
        ++lPlace;
    }
    if (lIsOverfull && !mIsOverfull) {
        arLines.push_back(std::to_string(gcMostWarnings) +
                          " troubles are open, which is the limit: no warning is given for further ones");
    }
    mIsOverfull = lIsOverfull;
}

std::vector<ZTSTrouble> ZTCWarnBook::takeDue(ZTCHistoryTime aNow, std::size_t aMost) {
    std::vector<ZTSTrouble> lDue;
    for (auto& [lrKey, lrTrack] : mTracks) {
        ZTSTrouble& lrTrouble = lrTrack.mTrouble;
        const ZTSWarnRule& lrRule = mRules[lrKey.first];
        if (lrTrack.mIsOpen && lrTrouble.mNext > aNow + lrTrack.mPause) {
            lrTrouble.mNext = aNow + lrTrack.mPause;  // the clock was set back
        }
        const bool lIsActive = lrTrack.mIsHolding || lrTrouble.mCount >= lrRule.mCount;
        if (!lrTrack.mIsOpen || !lIsActive || aNow < lrTrouble.mNext || lDue.size() == aMost) {
            continue;
        }
        const std::chrono::microseconds lFirstPause =
            std::max<std::chrono::microseconds>(gcFirstWarnPause, lrRule.mWithin);
        lrTrack.mPause =
            std::min<std::chrono::microseconds>(gcLongestWarnPause, std::max(lFirstPause, lrTrack.mPause * 2));
        lrTrouble.mNext = aNow + lrTrack.mPause;
        lDue.push_back(lrTrouble);
        ++lrTrouble.mWarnings;
    }
    return lDue;
}

std::vector<ZTSTrouble> ZTCWarnBook::getOpen() const {
    std::vector<ZTSTrouble> lOpen;
    for (const auto& [lrKey, lrTrack] : mTracks) {
        if (lrTrack.mIsOpen) {
            lOpen.push_back(lrTrack.mTrouble);
        }
    }
    return lOpen;
}

static ZTCJson sName(const std::optional<ZTSFcName>& acrName) {
    return acrName ? ZTCJson(acrName->toText()) : ZTCJson(nullptr);
}

std::string ZTCWarnBook::toText() const {
    ZTCJson lTroubles = ZTCJson::array();
    for (const auto& [lrKey, lrTrack] : mTracks) {
        const ZTSTrouble& lrTrouble = lrTrack.mTrouble;
        if (lrTrack.mIsOpen) {
            lTroubles.push_back(
                {{"rule", sRuleName(mRules[lrKey.first])},
                 {"subject", lrTrouble.mSubject},
                 {"initiator", sName(lrTrouble.mInitiator.mWwpn)},
                 {"port", lrTrouble.mRemotePort ? sName(lrTrouble.mRemotePort->mWwpn) : ZTCJson(nullptr)},
                 {"text", lrTrouble.mText},
                 {"first", toMicroseconds(lrTrouble.mFirst)},
                 {"warnings", lrTrouble.mWarnings},
                 {"next", toMicroseconds(lrTrouble.mNext)},
                 {"pause", lrTrack.mPause.count()}});
        }
    }
    return dumpJson(lTroubles, -1);
}

bool ZTCWarnBook::load(const std::string& acrText) {
    if (acrText.empty()) {
        return true;
    }
    try {
        for (const ZTCJson& lrEntry : ZTCJson::parse(acrText)) {
            const auto lRule = std::ranges::find(mRules, lrEntry.at("rule").get<std::string>(), sRuleName);
            if (lRule == mRules.end() || mOpen == gcMostWarnings) {
                continue;
            }
            const auto lNumber = static_cast<std::size_t>(lRule - mRules.begin());
            const std::string lSubject = lrEntry.at("subject");
            ZTSTrack lTrack(lRule->mWithin);
            ZTSTrouble& lrTrouble = lTrack.mTrouble;
            lrTrouble.mRule = lNumber;
            lrTrouble.mSubject = lSubject;
            if (lrEntry.at("initiator").is_string()) {
                lrTrouble.mInitiator.mWwpn = parseWwn(lrEntry.at("initiator").get<std::string>());
            }
            if (const auto lPort =
                    lrEntry.at("port").is_string() ? parseWwn(lrEntry.at("port").get<std::string>()) : std::nullopt) {
                lrTrouble.mRemotePort = ZTSRemotePort{.mWwpn = *lPort, .mWwnn = {}, .mFcId = {}};
            }
            lrTrouble.mText = lrEntry.at("text");
            lrTrouble.mFirst = fromMicroseconds(lrEntry.at("first"));
            lrTrouble.mLast = lrTrouble.mFirst;
            lrTrouble.mWarnings = lrEntry.at("warnings");
            lrTrouble.mNext = fromMicroseconds(lrEntry.at("next"));
            lTrack.mPause = std::clamp(std::chrono::microseconds(lrEntry.at("pause").get<std::int64_t>()),
                                       std::chrono::microseconds(0), std::chrono::microseconds(gcLongestWarnPause));
            lTrack.mIsOpen = true;
            const auto lKnown = mTracks.find({lNumber, lSubject});
            if (lKnown == mTracks.end() || !lKnown->second.mIsOpen) {
                mTracks.insert_or_assign({lNumber, lSubject}, std::move(lTrack));
                ++mOpen;
            }
        }
    } catch (const nlohmann::json::exception&) {
        return false;
    }
    return true;
}
