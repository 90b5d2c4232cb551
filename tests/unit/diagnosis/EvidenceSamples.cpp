#include "tests/unit/diagnosis/EvidenceSamples.h"

#include <stdexcept>

static ZTSFcName sName(std::uint8_t aFirst, unsigned aNumber) {
    ZTSFcName lName;
    lName.mBytes = {aFirst, 0, 0, 0, 0, 0, 0, static_cast<std::uint8_t>(aNumber)};
    return lName;
}

ZTSFcName initiatorName(unsigned aHost) {
    return sName(0x10, aHost);
}

ZTSFcName remoteName(unsigned aPort) {
    return sName(0x50, aPort);
}

ZTSFcName nodeName(unsigned aNode) {
    return sName(0x51, aNode);
}

static std::string sHost(unsigned aHost) {
    return "host" + std::to_string(aHost);
}

static std::string sRport(unsigned aHost, unsigned aPort) {
    return "rport-" + std::to_string(aHost) + ":0-" + std::to_string(aPort);
}

ZTSTopology& ZTCSampleEvidence::topology() {
    return mEvidence.mTopology ? *mEvidence.mTopology : mEvidence.mTopology.emplace();
}

ZTSEpisode& ZTCSampleEvidence::add(const std::string& acrKind, unsigned aHost, unsigned aSecond, int aPort) {
    const auto lKind = findKind(acrKind);
    if (!lKind) {
        throw std::invalid_argument("no kind: " + acrKind);
    }
    ZTSEpisode& lrEpisode = mEvidence.mEpisodes.emplace_back();
    lrEpisode.mEpisode = mEvidence.mEpisodes.size();
    lrEpisode.mSeq = 100 + lrEpisode.mEpisode;
    lrEpisode.mKind = *lKind;
    lrEpisode.mInitiator = {initiatorName(aHost), std::nullopt, sHost(aHost)};
    if (aPort >= 0) {
        lrEpisode.mRemotePort = ZTSRemotePort{remoteName(static_cast<unsigned>(aPort)), std::nullopt, std::nullopt};
    }
    lrEpisode.mCount = 1;
    lrEpisode.mRecords = 1;
    lrEpisode.mFirst = fromMicroseconds(std::int64_t{aSecond} * 1'000'000);
    lrEpisode.mLast = lrEpisode.mFirst;
    return lrEpisode;
}

ZTSEpisode& ZTCSampleEvidence::addLuns(const std::string& acrKind, unsigned aHost, unsigned aSecond, int aPort,
                                       std::initializer_list<std::uint32_t> aLuns) {
    ZTSEpisode& lrEpisode = add(acrKind, aHost, aSecond, aPort);
    lrEpisode.mDetail.mLuns = ZTSLunSet{.mIsAll = false, .mNumbers = aLuns, .mHasMore = false};
    return lrEpisode;
}

ZTSEpisode& ZTCSampleEvidence::addSense(unsigned aHost, unsigned aSecond, int aPort, std::uint32_t aKey,
                                        std::uint32_t aAsc, std::uint32_t aAscq, std::uint32_t aCommand) {
    ZTSEpisode& lrEpisode = addLuns("check-condition", aHost, aSecond, aPort, {0});
    lrEpisode.mDetail.mSenseKey = aKey;
    lrEpisode.mDetail.mAsc = aAsc;
    lrEpisode.mDetail.mAscqs = {aAscq};
    lrEpisode.mDetail.mCommandCodes = {aCommand};
    return lrEpisode;
}

ZTSEpisode& ZTCSampleEvidence::addRejection(unsigned aHost, unsigned aSecond, int aPort, std::uint32_t aCommand,
                                            std::uint32_t aReason, std::uint32_t aExplanation) {
    ZTSEpisode& lrEpisode = add("lsrjt", aHost, aSecond, aPort);
    lrEpisode.mDetail.mOriginalCommand = aCommand;
    lrEpisode.mDetail.mReasons = {{.mValue = aReason, .mExplanation = aExplanation, .mCount = 1}};
    return lrEpisode;
}

void ZTCSampleEvidence::addRelogin(unsigned aHost, unsigned aSecond, int aPort) {
    add("logo", aHost, aSecond, aPort);
    add("plogi", aHost, aSecond + 1, aPort).mDetail.mNodeName = nodeName(static_cast<unsigned>(aPort) / 2);
}

void ZTCSampleEvidence::addInitiator(unsigned aHost, std::optional<unsigned> aFabric, const std::string& acrState) {
    ZTSTopologyInitiator& lrInitiator = topology().mInitiators.emplace_back();
    lrInitiator.mHost = sHost(aHost);
    lrInitiator.mWwpn = initiatorName(aHost);
    lrInitiator.mState = acrState;
    if (aFabric) {
        lrInitiator.mFabric = sName(0x20, *aFabric);
    }
}

void ZTCSampleEvidence::addRemotePort(unsigned aHost, unsigned aPort) {
    ZTSTopologyRemotePort& lrPort = topology().mRemotePorts.emplace_back();
    lrPort.mName = sRport(aHost, aPort);
    lrPort.mHost = sHost(aHost);
    lrPort.mWwpn = remoteName(aPort);
    lrPort.mWwnn = nodeName(aPort / 2);
    lrPort.mState = "Online";
}

void ZTCSampleEvidence::addPath(unsigned aHost, unsigned aPort, unsigned aLun, std::uint32_t aQueueDepth) {
    ZTSTopologyPath& lrPath = topology().mPaths.emplace_back();
    lrPath.mHost = sHost(aHost);
    lrPath.mRemotePort = sRport(aHost, aPort);
    lrPath.mLun = aLun;
    lrPath.mQueueDepth = aQueueDepth;
}

void ZTCSampleEvidence::addCounter(unsigned aHost, unsigned aSecond, const std::string& acrCounter,
                                   std::uint64_t aDifference) {
    mEvidence.mCounters.push_back({.mMinute = fromMicroseconds(std::int64_t{aSecond} * 1'000'000),
                                   .mInitiator = initiatorName(aHost),
                                   .mRemotePort = std::nullopt,
                                   .mCounter = acrCounter,
                                   .mDifference = aDifference});
}

void ZTCSampleEvidence::hide(unsigned aHost, const std::string& acrKind, ZTEKindState aState) {
    mEvidence.mUnobserved.push_back({.mInitiator = {initiatorName(aHost), std::nullopt, sHost(aHost)},
                                     .mKind = *findKind(acrKind),
                                     .mState = aState});
}

std::vector<ZTSFinding> ZTCSampleEvidence::find(const std::string& acrRule) const {
    std::vector<ZTSFinding> lFindings = diagnoseAll();
    std::erase_if(lFindings, [&](const ZTSFinding& acrFinding) { return acrFinding.mpRule->mpId != acrRule; });
    return lFindings;
}
