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
    mPage.resize(mpTrace->getPageLayout().mPageSize);
    mBuffers.assign(mpTrace->getBufferCount(), Buffer());
    mHostsVersion = mrWatcher.getVersion();
    openProbe();
    mPause.reset();
    happen(ZTFH_Opened);
}

/// Where the trace has no sense data, they come by a probe, if this host grants it.
void ZTCLinuxOutcomeFeed::openProbe() {
    if (mpTrace->getRecordLayout().hasSense() && mPlace.mProbeUse != ZTPU_Always) {
        return;
    }
    ZTSFeedProblem lProblem{ZTFH_NotGranted, "the probe is switched off (KPM_LINUX_PROBE=0)"};
    if (mPlace.mProbeUse != ZTPU_Never) {
        mpProbe = ZTCSenseProbe::open(mpTrace->getPath(), mPlace.mSysfsRoot, mrFiles, lProblem);
    }
    if (mpProbe != nullptr) {
        mpProbe->watchHosts(mrWatcher.getHosts());
        return;
    }
    mSenseProblem = "no sense data: this kernel's trace has none, and " + lProblem.mText;
    logLibraryLine(KPM_LOG_WARNING, "check conditions come with " + mSenseProblem);
}

void ZTCLinuxOutcomeFeed::close() {
    mBuffers.clear();
    if (mpProbe != nullptr) {
        mpProbe->switchOff();
    }
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
    return mBuffers[aBuffer].mState == ZTBS_Resting ? -1 : mpTrace->getDescriptor(aBuffer);
}

void ZTCLinuxOutcomeFeed::serve() {
    for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
        if (mBuffers[lBuffer].mState == ZTBS_Ready) {
            readBuffer(lBuffer);
        }
    }
    if (mpProbe != nullptr) {
        deliverMatched(mMatcher.take(ZTCSenseMatcher::Clock::now()));
    }
}

void ZTCLinuxOutcomeFeed::look() {
    happen(ZTFH_Look);
    noteHosts();
    for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
        readBuffer(lBuffer);
        // A buffer that has nothing may be waited for again: what it was left alone for may be over.
        mBuffers[lBuffer].mState = ZTBS_Waiting;
    }
    readLosses();
}

void ZTCLinuxOutcomeFeed::stop() {
    if (mpTrace != nullptr) {
        mpTrace->switchOff();
        for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
            do {
                readBuffer(lBuffer);
            } while (mBuffers[lBuffer].mState == ZTBS_Ready);
        }
        deliverMatched(mMatcher.takeAll());
        readLosses();
    }
    happen(ZTFH_Stop);
}

/// Leaves the buffer Ready where the limit was reached, Resting where nothing was there.
void ZTCLinuxOutcomeFeed::readBuffer(std::size_t aBuffer) {
    Buffer& lrBuffer = mBuffers[aBuffer];
    for (unsigned lPages = 0; lPages < scPagesInARound; ++lPages) {
        std::size_t lSize = 0;
        const ZTETraceRead lRead = mpTrace->read(aBuffer, mPage, lSize);
        if (lRead != ZTTR_Page) {
            if (lRead == ZTTR_Failed) {
                mrLosses.count(ZTLO_Failure);
            }
            // Readable with nothing to read: it would wake the thread again at once.
            lrBuffer.mState = lRead == ZTTR_Failed || lPages == 0 ? ZTBS_Resting : ZTBS_Waiting;
            return;
        }
        lrBuffer.mHasRecords = true;
        if (readPage(ZTCByteSpan(mPage).first(lSize))) {
            lrBuffer.mHasLoss = true;
        }
    }
    lrBuffer.mState = ZTBS_Ready;
}

/// Whether the page says that records before it are lost.
bool ZTCLinuxOutcomeFeed::readPage(ZTCByteSpan aPage) {
    ZTCTracePage lPage(aPage, mpTrace->getPageLayout());
    while (const std::optional<ZTCByteSpan> lRecord = lPage.next()) {
        try {
            readRecord(*lRecord, lPage.getTime());
        } catch (const std::exception&) {
            // Memory has run out over one outcome: the others of the page may fare better.
            mrLosses.count(ZTLO_Failure);
        }
    }
    if (lPage.isMalformed()) {
        mrLosses.count(ZTLO_MalformedRecord);
    }
    return lPage.hasLossBefore();
}

void ZTCLinuxOutcomeFeed::readRecord(ZTCByteSpan aRecord, std::uint64_t aTime) {
    const ZTSScsiDoneLayout& lrLayout = mpTrace->getRecordLayout();
    const std::optional<std::uint32_t> lId = getTraceRecordId(aRecord, lrLayout);
    if (mpProbe != nullptr && lId == mpProbe->getLayout().mId) {
        if (const std::optional<ZTSSenseRecord> lSense = parseSenseRecord(aRecord, mpProbe->getLayout())) {
            mMatcher.addSense(*lSense, aTime, ZTCSenseMatcher::Clock::now());
        } else {
            mrLosses.count(ZTLO_MalformedRecord);
        }
        return;
    }
    if (lId && *lId != lrLayout.mId) {
        return;
    }
    std::optional<ZTSScsiOutcome> lOutcome = lId ? parseScsiOutcome(aRecord, lrLayout) : std::nullopt;
    if (!lOutcome) {
        mrLosses.count(ZTLO_MalformedRecord);
    } else if (mpProbe != nullptr && lOutcome->mStatus == ZTLSS_CheckCondition) {
        // What the trace itself says, where it says it, does not count while the probe is in use.
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
    } else {
        handle(*lOutcome);
    }
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
    for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
        Buffer& lrBuffer = mBuffers[lBuffer];
        if (lrBuffer.mHasRecords) {
            mrLosses.count(ZTLO_TraceOverrun, mpTrace->takeLosses(lBuffer).value_or(lrBuffer.mHasLoss ? 1 : 0));
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
