#include "sensor/views/include/EpisodeJson.h"

#include <array>
#include <cstdio>
#include <nlohmann/json.hpp>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/views/include/EpisodePlace.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::ordered_json;

static ZTCJson sWwn(const std::optional<ZTSFcName>& acrWwn) {
    return acrWwn ? ZTCJson(acrWwn->toText()) : ZTCJson(nullptr);
}

static ZTCJson sText(const std::string& acrText) {
    return acrText.empty() ? ZTCJson(nullptr) : ZTCJson(acrText);
}

/// The value that stands for "not known" in sense data.
static ZTCJson sKnownNumber(std::uint32_t aNumber) {
    return aNumber == 0xFFFFFFFFU ? ZTCJson(nullptr) : ZTCJson(aNumber);
}

static std::string sFcAddress(std::uint32_t aAddress) {
    std::array<char, 16> lText{};
    std::snprintf(lText.data(), lText.size(), "%06x", static_cast<unsigned>(aAddress & 0xFFFFFFU));
    return lText.data();
}

ZTCJson toJson(const ZTSInitiator& acrInitiator) {
    return {
        {"wwpn", sWwn(acrInitiator.mWwpn)}, {"wwnn", sWwn(acrInitiator.mWwnn)}, {"host", sText(acrInitiator.mHost)}};
}

ZTCJson toJson(const std::optional<ZTSRemotePort>& acrPort, const ZTCNameBook& acrNames) {
    if (!acrPort) {
        return nullptr;
    }
    return {{"wwpn", acrPort->mWwpn.toText()},
            {"wwnn", sWwn(acrPort->mWwnn)},
            {"fcId", acrPort->mFcId ? ZTCJson(sFcAddress(*acrPort->mFcId)) : ZTCJson(nullptr)},
            {"name", sText(acrNames.findName(acrPort->mWwpn, acrPort->mWwnn))}};
}

static ZTCJson sOptional(const std::optional<std::string>& acrText) {
    return acrText ? ZTCJson(*acrText) : ZTCJson(nullptr);
}

/// With the kernel's name of then.
static ZTCJson sPortOf(const ZTSPlace& acrPlace, const ZTCNameBook& acrNames) {
    ZTCJson lPort = toJson(acrPlace.mRemotePort, acrNames);
    if (!lPort.is_null()) {
        lPort["rport"] = sOptional(acrPlace.mRport);
    }
    return lPort;
}

static ZTCJson sDevices(const std::vector<ZTSPlaceDevice>& acrDevices) {
    ZTCJson lList = ZTCJson::array();
    for (const ZTSPlaceDevice& lrDevice : acrDevices) {
        lList.push_back({{"lun", lrDevice.mLun},
                         {"address", lrDevice.mAddress},
                         {"vendor", sOptional(lrDevice.mVendor)},
                         {"model", sOptional(lrDevice.mModel)},
                         {"wwid", sOptional(lrDevice.mWwid)},
                         {"disk", sOptional(lrDevice.mDisk)},
                         {"multipath", sOptional(lrDevice.mMultipath)},
                         {"mounts", lrDevice.mMounts}});
    }
    return lList;
}

/// Only where counters were looked for.
static void sAddCounters(ZTCJson& arJson, const std::vector<ZTSCounterSample>& acrCounters,
                         const ZTCNameBook& acrNames) {
    if (!acrNames.hasCounters()) {
        return;
    }
    ZTCJson& lrList = arJson["counters"] = ZTCJson::array();
    for (const ZTSCounterSample& lrSample : acrCounters) {
        lrList.push_back({{"of", lrSample.mRemotePort ? "remotePort" : "initiator"},
                          {"counter", lrSample.mCounter},
                          {"difference", lrSample.mDifference}});
    }
}

static ZTCJson sLuns(const std::optional<ZTSLunSet>& acrLuns) {
    if (!acrLuns) {
        return nullptr;
    }
    ZTCJson lLuns{{"all", acrLuns->mIsAll}, {"numbers", acrLuns->mNumbers}};
    if (acrLuns->mHasMore) {
        lLuns["more"] = true;
    }
    return lLuns;
}

/// The names of a reason's two numbers in JSON, by kind.
struct ZTSReasonNames {
    const char* mpKind;
    const char* mpValue;
    const char* mpExplanation;  ///< null: the kind has none
};

static constexpr std::array<ZTSReasonNames, 3> scReasonNames{{{"lsrjt", "reasonCode", "explanation"},
                                                              {"fcp-read-check", "fcpiParam", nullptr},
                                                              {"queue-depth", "depth", nullptr}}};

static ZTCJson sReasons(const ZTSEpisode& acrEpisode) {
    const std::string lKind = getKindName(acrEpisode.mKind);
    const ZTSReasonNames* lpNames = nullptr;
    for (const ZTSReasonNames& lrNames : scReasonNames) {
        lpNames = lKind == lrNames.mpKind ? &lrNames : lpNames;
    }
    ZTCJson lReasons = ZTCJson::array();
    for (const ZTSReasonCount& lrReason : acrEpisode.mDetail.mReasons) {
        ZTCJson lOne{{lpNames != nullptr ? lpNames->mpValue : "value", lrReason.mValue}};
        if (lpNames != nullptr && lpNames->mpExplanation != nullptr) {
            lOne[lpNames->mpExplanation] = lrReason.mExplanation;
        }
        lOne["count"] = lrReason.mCount;
        lReasons.push_back(std::move(lOne));
    }
    return lReasons;
}

static ZTCJson sDetail(const ZTSEpisode& acrEpisode) {
    const ZTSEpisodeDetail& lrDetail = acrEpisode.mDetail;
    ZTCJson lJson = ZTCJson::object();
    const auto lName = [&lJson](const char* apKey, const std::optional<ZTSFcName>& acrWwn) {
        if (acrWwn) {
            lJson[apKey] = acrWwn->toText();
        }
    };
    const auto lNumber = [&lJson](const char* apKey, const std::optional<std::uint32_t>& acrNumber) {
        if (acrNumber) {
            lJson[apKey] = sKnownNumber(*acrNumber);
        }
    };
    lName("nodeName", lrDetail.mNodeName);
    lName("payloadPortName", lrDetail.mPayloadPortName);
    lNumber("originalCommand", lrDetail.mOriginalCommand);
    lNumber("opCode", lrDetail.mOpCode);
    lNumber("senseKey", lrDetail.mSenseKey);
    lNumber("asc", lrDetail.mAsc);
    if (lrDetail.mSenseKey || lrDetail.mAsc) {
        lJson["ascqs"] = lrDetail.mAscqs;
        lJson["commandCodes"] = lrDetail.mCommandCodes;
    }
    if (lrDetail.mPage) {
        static constexpr std::array<const char*, 4> scFormats{"port", "area", "domain", "fabric"};
        lJson["addressFormat"] = scFormats.at(*lrDetail.mPage >> 24 & 3);
        lJson["address"] = sFcAddress(*lrDetail.mPage);
    }
    if (!lrDetail.mReasons.empty()) {
        lJson["reasons"] = sReasons(acrEpisode);
    }
    if (lrDetail.mOtherReasons != 0) {
        lJson["otherReasons"] = lrDetail.mOtherReasons;
    }
    if (acrEpisode.mHasClockFlag) {
        lJson["clock"] = true;
    }
    if (acrEpisode.mIsMalformed) {
        lJson["malformed"] = true;
    }
    return lJson;
}

ZTCJson toJson(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames) {
    const ZTSPlace lPlace = findPlace(acrEpisode, acrNames);
    ZTCJson lDetail = sDetail(acrEpisode);
    if (lPlace.mAffected) {
        lDetail["ports"] = ZTCJson::array();
        for (const ZTSRemotePort& lrPort : *lPlace.mAffected) {
            lDetail["ports"].push_back(toJson(std::optional(lrPort), acrNames));
        }
    }
    ZTCJson lJson{{"seq", acrEpisode.mSeq},
                  {"episode", acrEpisode.mEpisode},
                  {"phase", getPhaseName(acrEpisode.mPhase)},
                  {"kind", getKindName(acrEpisode.mKind)},
                  {"initiator", toJson(lPlace.mInitiator)},
                  {"remotePort", sPortOf(lPlace, acrNames)},
                  {"count", acrEpisode.mCount},
                  {"first", toRfc3339(acrEpisode.mFirst)},
                  {"last", toRfc3339(acrEpisode.mLast)},
                  {"luns", sLuns(acrEpisode.mDetail.mLuns)},
                  {"devices", acrEpisode.mDetail.mLuns && lPlace.mRport ? sDevices(lPlace.mDevices) : ZTCJson(nullptr)},
                  {"detail", std::move(lDetail)}};
    sAddCounters(lJson, countersBeside(acrEpisode, acrNames), acrNames);
    return lJson;
}

/// The time that the agent's clock showed, whatever its local fields say.
static ZTCHistoryTime sTime(const ZTSReceivedTime& acrTime) {
    return ZTCHistoryTime(std::chrono::seconds(static_cast<std::int64_t>(acrTime.mEpochSeconds))) +
           std::chrono::microseconds(acrTime.mMilliseconds * 1000 + acrTime.mMicroseconds);
}

ZTCJson toJson(const ZTSStoredRecord& acrRecord, const ZTCNameBook& acrNames) {
    ZTCJson lRaw = ::toJson(acrRecord.mRecord);
    const ZTSPlace lPlace =
        findPlace(acrRecord.mInitiator, acrRecord.mRemotePort, sTime(acrRecord.mRecord.mBegin), acrNames);
    return {{"seq", acrRecord.mSeq},
            {"episode", acrRecord.mEpisode},
            {"kind", getKindName(acrRecord.mKind)},
            {"initiator", toJson(lPlace.mInitiator)},
            {"remotePort", sPortOf(lPlace, acrNames)},
            {"count", acrRecord.mRecord.mOccurrences},
            {"first", toRfc3339(sTime(acrRecord.mRecord.mBegin))},
            {"last", toRfc3339(sTime(acrRecord.mRecord.mEnd))},
            {"clock", acrRecord.mHasClockFlag},
            {"data", std::move(lRaw["data"])},
            {"dataProblem", std::move(lRaw["dataProblem"])},
            {"dataHex", std::move(lRaw["dataHex"])}};
}

ZTCJson toJson(const ZTSPortSummary& acrPort, const ZTCNameBook& acrNames) {
    const ZTSPortView lView = findPortView(acrPort, acrNames);
    ZTCJson lInitiators = ZTCJson::array();
    for (const ZTSInitiator& lrInitiator : lView.mInitiators) {
        lInitiators.push_back(toJson(lrInitiator));
    }
    ZTCJson lRports = ZTCJson::array();
    for (const ZTSTopologyRemotePort& lrPort : lView.mRports) {
        lRports.push_back({{"rport", lrPort.mName}, {"host", lrPort.mHost}, {"state", sOptional(lrPort.mState)}});
    }
    ZTCJson lKinds = ZTCJson::object();
    for (const ZTSPortSummary::Count& lrCount : acrPort.mCounts) {
        lKinds[getKindName(lrCount.mKind)] = lrCount.mOccurrences;
    }
    ZTCJson lJson{{"remotePort", toJson(std::optional(acrPort.mPort), acrNames)},
                  {"state", sText(lView.mState)},
                  {"initiators", std::move(lInitiators)},
                  {"rports", std::move(lRports)},
                  {"count", acrPort.mOccurrences},
                  {"kinds", std::move(lKinds)},
                  {"last", toRfc3339(acrPort.mLastEvent)}};
    sAddCounters(lJson, countersOf(acrPort.mPort, acrNames, getHistoryTime()), acrNames);
    return lJson;
}
