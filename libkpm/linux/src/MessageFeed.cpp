#include "libkpm/linux/src/MessageFeed.h"

#include <optional>
#include <string>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/linux/src/Losses.h"

// How much is read before the other sources, and a stop, have their turn.
static constexpr unsigned scDatagramsInARound = 256;

ZTCLinuxMessageFeed::ZTCLinuxMessageFeed(ZTCLinuxSources& arSources, ZTCLinuxHostWatcher& arWatcher,
                                         const ZTCLinuxDelivery& acrDelivery, ZTCLosses& arLosses,
                                         std::chrono::milliseconds aPollInterval)
    : mrSources(arSources),
      mrWatcher(arWatcher),
      mrDelivery(acrDelivery),
      mrLosses(arLosses),
      mPollInterval(aPollInterval) {}

// ---- The state ----

void ZTCLinuxMessageFeed::happen(ZTEFeedHappening aHappening, const std::string& acrReason) {
    const bool lIsFirst = mState.get() == ZTFS_Idle;
    const ZTSFeedStep lStep = mState.happen(aHappening, acrReason);
    if (lStep.mAction == ZTFA_Close) {
        mpSource.reset();
    }
    if (lStep.mIsToTell && !(lIsFirst && mState.isOpen())) {
        tell();
    }
    if (lStep.mAction == ZTFA_Open && (aHappening != ZTFH_Look || mPause.isDue())) {
        open();
    }
}

void ZTCLinuxMessageFeed::open() {
    ZTSFeedProblem lProblem;
    mDatagram.resize(gcMostFcMessageBytes);
    mpSource = mrSources.openFcEvents(lProblem);
    if (mpSource == nullptr) {
        happen(lProblem.mHappening, lProblem.mText);
        return;
    }
    mPause.reset();
    happen(ZTFH_Opened);
}

void ZTCLinuxMessageFeed::tell() const {
    if (mState.isOpen()) {
        logLibraryLine(KPM_LOG_NOTICE, "RSCNs are received again");
        return;
    }
    logLibraryLine(KPM_LOG_WARNING, "no RSCNs, and link states only every " + std::to_string(mPollInterval.count()) +
                                        " ms: " + mState.getReason());
}

// ---- Reading ----

void ZTCLinuxMessageFeed::serve() {
    bool lIsStateInDoubt = false;
    mIsDrained = false;
    for (unsigned lCount = 0; lCount < scDatagramsInARound && !mIsDrained; ++lCount) {
        const ZTSLinuxReceived lReceived = mpSource->receive(mDatagram);
        switch (lReceived.mOutcome) {
            case ZTLR_Datagram:
                readDatagram(ZTCByteSpan(mDatagram).first(lReceived.mSize));
                break;
            case ZTLR_Foreign:
                mrLosses.count(ZTLO_ForeignMessage);
                break;
            case ZTLR_Truncated:
                mrLosses.count(ZTLO_MalformedMessage);
                break;
            case ZTLR_Overrun:
                mrLosses.count(ZTLO_SocketOverrun);
                lIsStateInDoubt = true;
                break;
            case ZTLR_Empty:
                mIsDrained = true;
                // Readable with nothing to read: it would wake the thread again at once.
                if (lCount == 0) {
                    happen(ZTFH_NothingRead);
                }
                break;
            case ZTLR_Failed:
                mIsDrained = true;
                mrLosses.count(ZTLO_Failure);
                happen(ZTFH_Broken, "the socket for FC events has failed");
                break;
        }
    }
    if (const std::uint64_t lLost = mSequence.takeLost(); lLost != 0) {
        mrLosses.count(ZTLO_MissingMessage, lLost);
        lIsStateInDoubt = true;
    }
    if (lIsStateInDoubt) {
        mrWatcher.look();
    }
}

void ZTCLinuxMessageFeed::look() {
    happen(ZTFH_Look);
    // Only once the socket is drained: older messages may still be queued, and the links count them.
    if (mIsDrained) {
        mrWatcher.forgetLinkMessages();
    }
}

void ZTCLinuxMessageFeed::readDatagram(ZTCByteSpan aDatagram) {
    ZTCLinuxFcMessages lMessages(aDatagram);
    while (const std::optional<ZTSLinuxFcEvent> lEvent = lMessages.next()) {
        mSequence.note(lEvent->mNumber);
        handle(*lEvent);
    }
    mrLosses.count(ZTLO_MalformedMessage, lMessages.getMalformed());
}

/// Whether an event of this code may come with another state of a link or port.
static bool sTellsState(std::uint32_t aCode) {
    return aCode == ZTLFC_AdapterChange || (aCode >= ZTLFC_Lip && aCode <= ZTLFC_LipReset) ||
           (aCode >= ZTLFC_PortUnknown && aCode <= ZTLFC_PortError);
}

void ZTCLinuxMessageFeed::handle(const ZTSLinuxFcEvent& acrEvent) {
    const std::optional<std::uint32_t> lBoard = mrWatcher.findBoard(acrEvent.mHost);
    if (!lBoard) {
        return;
    }
    if (acrEvent.mCode == ZTLFC_Rscn) {
        mrWatcher.forgetRemotePorts();
        if (std::optional<std::vector<std::uint8_t>> lPayload = makeLinuxRscn(acrEvent.mData)) {
            mrDelivery.deliverRscn(*lBoard, *lPayload);
        } else {
            mrLosses.count(ZTLO_MalformedMessage);
        }
    } else if (acrEvent.mCode == ZTLFC_LinkUp || acrEvent.mCode == ZTLFC_LinkDown) {
        mrWatcher.noteLinkMessage(*lBoard, acrEvent.mCode == ZTLFC_LinkUp);
    } else if (sTellsState(acrEvent.mCode)) {
        mrWatcher.noteLinkMessage(*lBoard, std::nullopt);
    }
}
