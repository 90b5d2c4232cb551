#include "tavik/include/KindStates.h"

#include <cstdio>
#include <exception>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "libkpm/include/ScopeEventKinds.h"

namespace {

/// Boards that a library may report on before their number is known.
constexpr unsigned scMostBoards = 4096;

unsigned sFindRegistered(const ZTCScopeEvent& acrEvent) {
    ZT_ENTRY();
    const auto lKind = findRegisteredKindIndex(acrEvent.getCategory(), acrEvent.getSubcategory());
    ZT_EXIT();
    return static_cast<unsigned>(lKind.value_or(gcStatusKinds));
}

unsigned sFindDelivered(std::uint32_t aCategory, std::uint32_t aSubcategory) {
    ZT_ENTRY();
    unsigned lKind = 0;
    while (lKind < gcStatusKinds && (gcScopeEventKinds[lKind].mDeliveredCategory != aCategory ||
                                     gcScopeEventKinds[lKind].mDeliveredSubcategory != aSubcategory)) {
        ++lKind;
    }
    ZT_EXIT();
    return lKind;
}

void sSayNotShown(const ZTCException& acrException) {
    ZT_ENTRY();
    ZT_LOG_ERR("The status page lacks a report of Libkpm: %s", acrException.what());
    ZT_EXIT();
}

ZTEStatusState sGetStateOfStatus(unsigned aStatus) {
    ZT_ENTRY();
    ZTEStatusState lState = ZTSS_Failed;
    if (aStatus == KPM_STATUS_SUCCESS || aStatus == KPM_STATUS_INFO_5) {
        lState = ZTSS_Listening;
    } else if (aStatus == KPM_STATUS_NO_SOURCE) {
        lState = ZTSS_NoSource;
    } else if (aStatus == KPM_STATUS_NO_RIGHTS) {
        lState = ZTSS_NoRights;
    }
    ZT_EXIT();
    return lState;
}

/// A state that this agent does not know counts as failed: it cannot promise that events arrive.
ZTEStatusState sGetStateOfReport(std::uint32_t aState) {
    ZT_ENTRY();
    ZTEStatusState lState = ZTSS_Failed;
    if (aState == KPM_STATE_WORKING) {
        lState = ZTSS_Listening;
    } else if (aState == KPM_STATE_NO_SOURCE) {
        lState = ZTSS_NoSource;
    } else if (aState == KPM_STATE_NO_RIGHTS) {
        lState = ZTSS_NoRights;
    }
    ZT_EXIT();
    return lState;
}

}  // namespace

void ZTCKindStates::addBoards(const ZTCMap<unsigned int, ZTCPointer<ZTCTavikInitiator>>& acrInitiators) {
    ZT_ENTRY();
    // The library may report something at this moment, and the page moves.
    const ZTCMutexLock lLock(mLock);
    mrPage.addBoards(acrInitiators);
    ZT_EXIT();
}

void ZTCKindStates::setCollecting(bool aIsCollecting) {
    ZT_ENTRY();
    const ZTCMutexLock lLock(mLock);
    mIsCollecting = aIsCollecting;
    mrPage.setCollecting(aIsCollecting);
    showAll();
    ZT_EXIT();
}

std::uint64_t ZTCKindStates::countReports() {
    ZT_ENTRY();
    const ZTCMutexLock lLock(mLock);
    ZT_EXIT();
    return mReports;
}

void ZTCKindStates::noteStatus(unsigned aBoardId, const ZTCScopeEvent& acrEvent, unsigned aStatus,
                               std::uint64_t aReports) {
    ZT_ENTRY();
    const ZTCMutexLock lLock(mLock);
    const unsigned lKind = sFindRegistered(acrEvent);
    if (ZTSKindState* lpState = findKind(aBoardId, lKind); lpState != nullptr) {
        const bool lIsReportNewer = lpState->mReportNumber > aReports;
        lpState->mIsRegistered = true;
        // The status is the same for a source that has failed and one that needs rights. The report is not.
        const bool lIsReportExact = aStatus == KPM_STATUS_NO_RIGHTS && lpState->mReported == ZTSS_Failed;
        lpState->mState = lIsReportNewer || lIsReportExact ? lpState->mReported : sGetStateOfStatus(aStatus);
        show(aBoardId, lKind);
    }
    ZT_EXIT();
}

void ZTCKindStates::noteHandle(unsigned aBoardId, const ZTCScopeEvent& acrEvent, unsigned aHandle, bool aIsOptional) {
    ZT_ENTRY();
    const ZTCMutexLock lLock(mLock);
    const unsigned lKind = sFindRegistered(acrEvent);
    if (ZTSKindState* lpState = findKind(aBoardId, lKind); lpState != nullptr) {
        lpState->mIsRegistered = true;
        if (aHandle != 0) {
            lpState->mState = lpState->mReported != ZTSS_Off ? lpState->mReported : ZTSS_Listening;
        } else if (lpState->mReported != ZTSS_Off && lpState->mReported != ZTSS_Listening) {
            lpState->mState = lpState->mReported;
        } else {
            lpState->mState = aIsOptional ? ZTSS_NoSource : ZTSS_Failed;
        }
        show(aBoardId, lKind);
    }
    ZT_EXIT();
}

void ZTCKindStates::clearRegistrations() {
    ZT_ENTRY();
    const ZTCMutexLock lLock(mLock);
    for (ZTCBoardStates& lrBoard : mBoards) {
        for (ZTSKindState& lrKind : lrBoard) {
            lrKind.mIsRegistered = false;
        }
    }
    showAll();
    ZT_EXIT();
}

void ZTCKindStates::reportState(std::uint32_t aBoardId, std::uint32_t aCategory, std::uint32_t aSubcategory,
                                std::uint32_t aState, const char* apReason) noexcept {
    ZT_ENTRY();
    try {
        const ZTCMutexLock lLock(mLock);
        const unsigned lKind = sFindDelivered(aCategory, aSubcategory);
        if (ZTSKindState* lpState = findKind(aBoardId, lKind); lpState != nullptr) {
            lpState->mReported = sGetStateOfReport(aState);
            lpState->mReportNumber = ++mReports;
            std::snprintf(lpState->mReason, sizeof lpState->mReason, "%s", apReason);
            lpState->mState = lpState->mReported;
            show(aBoardId, lKind);
        }
    } catch (const ZTCException& lrException) {
        sSayNotShown(lrException);
    }
    ZT_EXIT();
}

void ZTCKindStates::reportLoss(const char* apName, std::uint64_t aTotal) noexcept {
    ZT_ENTRY();
    try {
        const ZTCMutexLock lLock(mLock);
        mrPage.setLoss(apName, aTotal);
    } catch (const ZTCException& lrException) {
        sSayNotShown(lrException);
    }
    ZT_EXIT();
}

/// Null while there is no page, and for a board or kind that no page shows.
ZTCKindStates::ZTSKindState* ZTCKindStates::findKind(unsigned aBoardId, unsigned aKind) {
    ZT_ENTRY();
    if (!mrPage.isOpen() || aKind >= gcStatusKinds || aBoardId >= scMostBoards) {
        ZT_EXIT();
        return nullptr;
    }
    if (aBoardId >= mBoards.size()) {
        try {
            mBoards.resize(aBoardId + 1);
        } catch (const std::exception&) {
            ZT_THROW(ZTCNoMemoryEx, "Out of Memory", gcErrNoMemory);
        }
    }
    ZT_EXIT();
    return &mBoards[aBoardId][aKind];
}

void ZTCKindStates::show(unsigned aBoardId, unsigned aKind) noexcept {
    ZT_ENTRY();
    const ZTSKindState& lrState = mBoards[aBoardId][aKind];
    const bool lIsOn = mIsCollecting && lrState.mIsRegistered;
    mrPage.setState(mrPage.getRow(aBoardId, aKind), lIsOn ? lrState.mState : ZTSS_Off,
                    lIsOn && lrState.mState == lrState.mReported ? lrState.mReason : "");
    ZT_EXIT();
}

void ZTCKindStates::showAll() noexcept {
    ZT_ENTRY();
    for (unsigned lBoard = 0; lBoard < mBoards.size(); ++lBoard) {
        for (unsigned lKind = 0; lKind < gcStatusKinds; ++lKind) {
            show(lBoard, lKind);
        }
    }
    ZT_EXIT();
}
