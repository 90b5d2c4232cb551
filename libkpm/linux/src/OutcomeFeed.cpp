#include "libkpm/linux/src/OutcomeFeed.h"

#include <algorithm>
#include <exception>
#include <new>
#include <optional>
#include <utility>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/linux/src/KindSources.h"
#include "libkpm/linux/src/Losses.h"
#include "libkpm/linux/src/TracePage.h"

// How much of one buffer is read before the other sources, and a stop, have their turn.
static constexpr unsigned scPagesInARound = 16;

ZTCLinuxOutcomeFeed::ZTCLinuxOutcomeFeed(ZTSTracePlace aPlace, ZTCTraceFiles& arFiles, ZTCLinuxHostWatcher& arWatcher,
                                         ZTCLinuxQueueDepths& arDepths, const ZTCLinuxDelivery& acrDelivery,
                                         ZTCLosses& arLosses)
    : mPlace(std::move(aPlace)),
      mrFiles(arFiles),
      mrWatcher(arWatcher),
      mrDepths(arDepths),
      mrDelivery(acrDelivery),
      mrLosses(arLosses) {}

// ---- The state ----

void ZTCLinuxOutcomeFeed::happen(ZTEFeedHappening aHappening, const std::string& acrReason) {
    const bool lIsFirst = mState.get() == ZTFS_Idle;
    const ZTSFeedStep lStep = mState.happen(aHappening, acrReason);
    if (lStep.mAction == ZTFA_Close) {
        close();
    }
    if (lStep.mIsToTell && !(lIsFirst && mState.isOpen())) {
        tell();
    }
    if (lStep.mAction == ZTFA_Open && (aHappening != ZTFH_Look || mPause.isDue())) {
        open();
    }
}

void ZTCLinuxOutcomeFeed::open() {
    ZTSFeedProblem lProblem;
    mpTrace = ZTCTraceInstance::open(mPlace, mrFiles, lProblem);
    mFilteredHosts = mrWatcher.getHosts();
    if (mpTrace != nullptr && mpTrace->watchHosts(mFilteredHosts, lProblem) != ZTTF_Set) {
        mpTrace.reset();
    }
    if (mpTrace == nullptr) {
        happen(lProblem.mHappening, lProblem.mText);
        return;
    }
    mHostsVersion = mrWatcher.getVersion();
    addBuffers(mpTrace->getBuffers(), false);
    openProbe();
    mPause.reset();
    happen(ZTFH_Opened);
}

void ZTCLinuxOutcomeFeed::addBuffers(ZTCTraceBuffers& arBuffers, bool aIsOfProbe) {
    mPage.resize(std::max(mPage.size(), arBuffers.getPageLayout().mPageSize));
    for (std::size_t lIndex = 0; lIndex < arBuffers.size(); ++lIndex) {
        mBuffers.push_back({&arBuffers, lIndex, aIsOfProbe});
    }
}

/// Where the trace has no sense data, they come by a probe, if this host grants it.
void ZTCLinuxOutcomeFeed::openProbe() {
    if (mpTrace->getRecordLayout().hasSense() && mPlace.mProbeUse != ZTPU_Always) {
        return;
    }
    ZTSFeedProblem lProblem{ZTFH_NotGranted, "the probe is switched off (KPM_LINUX_PROBE=0)"};
    if (mPlace.mProbeUse != ZTPU_Never) {
        mpProbe = ZTCSenseProbe::open(mpTrace->getBuffers().getPath(), mPlace.mSysfsRoot, mrFiles, lProblem);
    }
    if (mpProbe != nullptr) {
        addBuffers(mpProbe->getBuffers(), true);
        mpProbe->watchHosts(mrWatcher.getHosts());
        return;
    }
    mSenseProblem = "no sense data: this kernel's trace has none, and " + lProblem.mText;
    logLibraryLine(KPM_LOG_WARNING, "check conditions come with " + mSenseProblem);
}

/// Recording ends, and what was recorded is delivered.
void ZTCLinuxOutcomeFeed::close() {
    mpTrace->switchOff();
    if (mpProbe != nullptr) {
        mpProbe->switchOff();
    }
    try {
        drain();
    } catch (const std::exception&) {
        mrLosses.count(ZTLO_Failure);  // without memory, losses cannot be read
    }
    mBuffers.clear();
    mpTrace.reset();
    mpProbe.reset();
    mSenseProblem.clear();
    mFilterProblem.clear();
}

std::string ZTCLinuxOutcomeFeed::getHostProblem(std::uint32_t aHost) const {
    const bool lIsFiltered = std::binary_search(mFilteredHosts.begin(), mFilteredHosts.end(), aHost);
    return lIsFiltered ? std::string() : mFilterProblem;
}

void ZTCLinuxOutcomeFeed::tell() const {
    if (mState.isOpen()) {
        logLibraryLine(KPM_LOG_NOTICE, "SCSI outcomes are delivered again");
    } else {
        logLibraryLine(KPM_LOG_WARNING, "no SCSI outcomes: " + mState.getReason());
    }
}

void ZTCLinuxOutcomeFeed::noteHosts() {
    happen(ZTFH_HostFound);
    if (mpTrace != nullptr && mHostsVersion != mrWatcher.getVersion()) {
        followHosts();
    }
}

/// Has the filter name the hosts there are. Tried again with the next look where the kernel refuses.
void ZTCLinuxOutcomeFeed::followHosts() {
    ZTSFeedProblem lProblem;
    std::vector<std::uint32_t> lHosts = mrWatcher.getHosts();
    switch (mpTrace->watchHosts(lHosts, lProblem)) {
        case ZTTF_Set:
            mFilteredHosts.swap(lHosts);
            if (!std::exchange(mFilterProblem, std::string()).empty()) {
                ++mFilterChanges;
                logLibraryLine(KPM_LOG_NOTICE, "SCSI outcomes of all FC hosts are delivered again");
            }
            if (mpProbe != nullptr) {
                mpProbe->watchHosts(mrWatcher.getHosts());
            }
            mHostsVersion = mrWatcher.getVersion();
            return;
        case ZTTF_Kept:
            mHostsVersion = 0;
            if (lProblem.mText != mFilterProblem) {
                mFilterProblem = lProblem.mText;
                ++mFilterChanges;
                logLibraryLine(KPM_LOG_WARNING, "no SCSI outcomes of FC hosts that have come since: " + mFilterProblem);
            }
            return;
        case ZTTF_Off:
            happen(lProblem.mHappening, lProblem.mText);
            return;
    }
}

// ---- Reading ----

int ZTCLinuxOutcomeFeed::getDescriptor(std::size_t aBuffer) const {
    const Buffer& lrBuffer = mBuffers[aBuffer];
    return lrBuffer.mState == ZTBS_Resting ? -1 : lrBuffer.mpBuffers->getDescriptor(lrBuffer.mIndex);
}

void ZTCLinuxOutcomeFeed::serve() {
    const ZTCSenseMatcher::Clock::time_point lNow = ZTCSenseMatcher::Clock::now();
    // Before an outcome goes without its sense data, their buffers are read once more.
    const bool lIsLastCall = mMatcher.getNextTime().value_or(lNow + ZTCSenseMatcher::scWait) <= lNow;
    for (Buffer& lrBuffer : mBuffers) {
        if (lrBuffer.mState == ZTBS_Ready || (lIsLastCall && lrBuffer.mIsOfProbe)) {
            readBuffer(lrBuffer);
        }
    }
    if (mpProbe != nullptr) {
        deliverMatched(mMatcher.take(lNow));
    }
}

void ZTCLinuxOutcomeFeed::look() {
    happen(ZTFH_Look);
    noteHosts();
    for (Buffer& lrBuffer : mBuffers) {
        readBuffer(lrBuffer);
        // A resting buffer is waited for again: it may have stopped being readable with nothing in it.
        lrBuffer.mState = ZTBS_Waiting;
    }
    readLosses();
}

void ZTCLinuxOutcomeFeed::drain() {
    for (Buffer& lrBuffer : mBuffers) {
        do {
            readBuffer(lrBuffer);
        } while (lrBuffer.mState == ZTBS_Ready);
    }
    deliverMatched(mMatcher.takeAll());
    readLosses();
}

/// Leaves the buffer Ready where the limit was reached, Resting where nothing was there.
void ZTCLinuxOutcomeFeed::readBuffer(Buffer& arBuffer) {
    for (unsigned lPages = 0; lPages < scPagesInARound; ++lPages) {
        std::size_t lSize = 0;
        const ZTETraceRead lRead = arBuffer.mpBuffers->read(arBuffer.mIndex, mPage, lSize);
        if (lRead != ZTTR_Page) {
            if (lRead == ZTTR_Failed) {
                mrLosses.count(ZTLO_Failure);
            }
            // Readable with nothing to read: it would wake the thread again at once.
            arBuffer.mState = lRead == ZTTR_Failed || lPages == 0 ? ZTBS_Resting : ZTBS_Waiting;
            return;
        }
        arBuffer.mHasRecords = true;
        if (readPage(ZTCByteSpan(mPage).first(lSize), arBuffer)) {
            arBuffer.mHasLoss = true;
        }
    }
    arBuffer.mState = ZTBS_Ready;
}

/// Whether the page says that records before it are lost.
bool ZTCLinuxOutcomeFeed::readPage(ZTCByteSpan aPage, const Buffer& acrBuffer) {
    ZTCTracePage lPage(aPage, acrBuffer.mpBuffers->getPageLayout());
    while (const std::optional<ZTCByteSpan> lRecord = lPage.next()) {
        try {
            if (acrBuffer.mIsOfProbe) {
                readSense(*lRecord, lPage.getTime());
            } else {
                readOutcome(*lRecord, lPage.getTime());
            }
        } catch (const std::exception&) {
            // Memory has run out over one record: the others of the page may fare better.
            mrLosses.count(ZTLO_Failure);
        }
    }
    if (lPage.isMalformed()) {
        mrLosses.count(ZTLO_MalformedRecord);
    }
    return lPage.hasLossBefore();
}

void ZTCLinuxOutcomeFeed::readOutcome(ZTCByteSpan aRecord, std::uint64_t aTime) {
    const ZTSScsiDoneLayout& lrLayout = mpTrace->getRecordLayout();
    const std::optional<std::uint32_t> lId = getTraceRecordId(aRecord, lrLayout);
    if (lId && *lId != lrLayout.mId) {
        return;
    }
    std::optional<ZTSScsiOutcome> lOutcome = lId ? parseScsiOutcome(aRecord, lrLayout) : std::nullopt;
    if (!lOutcome) {
        mrLosses.count(ZTLO_MalformedRecord);
        return;
    }
    if (mpProbe == nullptr || lOutcome->mStatus != ZTLSS_CheckCondition) {
        handle(*lOutcome);
        return;
    }
    // Newer kernels put sense data into the trace, too. While the probe is in use, only its own count.
    lOutcome->mSenseKey = lOutcome->mAsc = lOutcome->mAscq = gcUnknownSense;
    readCommandTags(aRecord, lrLayout, *lOutcome);
    bool lWaits = false;
    try {
        mMatcher.addOutcome(*lOutcome, aTime, ZTCSenseMatcher::Clock::now());
        lWaits = true;
    } catch (const std::bad_alloc&) {
        lWaits = false;  // no memory to wait in: delivered at once, without its sense data
    }
    if (!lWaits) {
        handle(*lOutcome);
    }
}

void ZTCLinuxOutcomeFeed::readSense(ZTCByteSpan aRecord, std::uint64_t aTime) {
    const std::optional<std::uint32_t> lId = getTraceRecordId(aRecord, mpTrace->getRecordLayout());
    if (lId && *lId != mpProbe->getLayout().mId) {
        return;
    }
    const std::optional<ZTSSenseRecord> lSense = lId ? parseSenseRecord(aRecord, mpProbe->getLayout()) : std::nullopt;
    if (!lSense) {
        mrLosses.count(ZTLO_MalformedRecord);
        return;
    }
    mMatcher.addSense(*lSense, aTime, ZTCSenseMatcher::Clock::now());
}

void ZTCLinuxOutcomeFeed::deliverMatched(const std::vector<ZTSScsiOutcome>& acrOutcomes) {
    for (const ZTSScsiOutcome& lrOutcome : acrOutcomes) {
        try {
            handle(lrOutcome);
        } catch (const std::exception&) {
            mrLosses.count(ZTLO_Failure);
        }
    }
}

/// A buffer that nothing came from has lost nothing either: the newest records are kept.
void ZTCLinuxOutcomeFeed::readLosses() {
    for (Buffer& lrBuffer : mBuffers) {
        if (lrBuffer.mHasRecords) {
            mrLosses.count(lrBuffer.mIsOfProbe ? ZTLO_SenseOverrun : ZTLO_OutcomeOverrun,
                           lrBuffer.mpBuffers->takeLosses(lrBuffer.mIndex).value_or(lrBuffer.mHasLoss ? 1 : 0));
            lrBuffer.mHasRecords = false;
            lrBuffer.mHasLoss = false;
        }
    }
}

// ---- Delivery ----

void ZTCLinuxOutcomeFeed::handle(const ZTSScsiOutcome& acrOutcome) {
    const std::optional<std::uint32_t> lBoard = mrWatcher.findKnownBoard(acrOutcome.mHost);
    const bool lIsEvent = acrOutcome.mStatus == ZTLSS_CheckCondition || acrOutcome.mStatus == ZTLSS_Busy ||
                          acrOutcome.mStatus == ZTLSS_TaskSetFull;
    if (!lBoard || !lIsEvent) {
        return;
    }
    const HBA_wwn lPort = mrWatcher.findRemotePort(acrOutcome.mHost, acrOutcome.mChannel, acrOutcome.mTarget);
    const HBA_wwn& lrLocal = mrWatcher.getBoard(*lBoard).mPortName;
    if (acrOutcome.mStatus == ZTLSS_CheckCondition) {
        zt_scsi_checkcondition_v0 lData{};
        lData.zt_checkcondition_rport = lPort;
        lData.zt_checkcondition_lun = acrOutcome.mLun;
        lData.zt_checkcondition_cmdcode = acrOutcome.mOpcode;
        lData.zt_checkcondition_senskey = acrOutcome.mSenseKey;
        lData.zt_checkcondition_asc = acrOutcome.mAsc;
        lData.zt_checkcondition_ascq = acrOutcome.mAscq;
        mrDelivery.deliverScope(*lBoard, lrLocal, gcLinuxCheckCondition, &lData, sizeof lData);
        return;
    }
    ZT_scsi_generic_v0 lData{};
    lData.zt_scsi_generic_rport = lPort;
    lData.zt_scsi_generic_lun = acrOutcome.mLun;
    const bool lIsFull = acrOutcome.mStatus == ZTLSS_TaskSetFull;
    mrDelivery.deliverScope(*lBoard, lrLocal, lIsFull ? gcLinuxQueueFull : gcLinuxDeviceBusy, &lData, sizeof lData);
    if (lIsFull) {
        mrDepths.noteQueueFull({acrOutcome.mHost, acrOutcome.mChannel, acrOutcome.mTarget, acrOutcome.mLun},
                               ZTCLinuxQueueDepths::Clock::now());
    }
}
