#include "libkpm/sim/src/Sources.h"

#include "libkpm/common/include/AgentLink.h"

void reportSimSource(std::uint32_t aBoard, std::size_t aKind, const ZTSSimSource& acrSource) {
    const ZTSScopeEventKind& lrKind = gcScopeEventKinds[aKind];
    reportLibraryState(aBoard, lrKind.mDeliveredCategory, lrKind.mDeliveredSubcategory, acrSource.mState,
                       acrSource.mReason);
}

ZTCSimSources::ZTCSimSources(std::size_t aBoards)
    : mAreWorking(aBoards * gcScopeEventKindCount), mBoards(aBoards, std::vector<ZTSSimSource>(gcScopeEventKindCount)) {
    for (std::atomic<bool>& lrIsWorking : mAreWorking) {
        lrIsWorking.store(true, std::memory_order_relaxed);
    }
}

ZTSSimSource ZTCSimSources::get(std::uint32_t aBoard, std::size_t aKind) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return mBoards.at(aBoard).at(aKind);
}

std::uint64_t ZTCSimSources::change(const ZTSSimState& acrLine) {
    const ZTSSimSource lNew{acrLine.mState, acrLine.mReason};
    std::uint64_t lChanges = 0;
    const auto lChange = [&](std::uint32_t aBoard, std::size_t aKind) {
        ZTSSimSource& lrSource = mBoards.at(aBoard)[aKind];
        if (lrSource != lNew) {
            lrSource = lNew;
            mAreWorking[aBoard * gcScopeEventKindCount + aKind].store(lNew.mState == KPM_STATE_WORKING,
                                                                      std::memory_order_relaxed);
            reportSimSource(aBoard, aKind, lNew);
            ++lChanges;
        }
    };
    const auto lChangeBoard = [&](std::uint32_t aBoard) {
        for (std::size_t lKind = 0; lKind < gcScopeEventKindCount; ++lKind) {
            if (!acrLine.mKind || *acrLine.mKind == lKind) {
                lChange(aBoard, lKind);
            }
        }
    };
    // The agent's functions may be called with a lock held. Without it, reports could overtake each other.
    const std::lock_guard<std::mutex> lGuard(mLock);
    if (acrLine.mBoards.mAll) {
        for (std::uint32_t lBoard = 0; lBoard < mBoards.size(); ++lBoard) {
            lChangeBoard(lBoard);
        }
    }
    for (const std::uint32_t lBoard : acrLine.mBoards.mBoards) {
        lChangeBoard(lBoard);
    }
    return lChanges;
}

void ZTCSimSources::lose(const ZTSSimLoss& acrLine) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    std::uint64_t& lrTotal = mLosses[acrLine.mName];
    lrTotal += acrLine.mCount;
    reportLibraryLoss(acrLine.mName.c_str(), lrTotal);
}

ZTSSimAnswer answerSimSource(std::size_t aKind, std::uint32_t aState) {
    ZTSSimAnswer lAnswer;
    if (aState == KPM_STATE_NO_SOURCE) {
        lAnswer.mStatus = KPM_STATUS_NO_SOURCE;
        // The agent starts without temperatures, but not without a handle for the others.
        if (getSimKind(aKind).mDelivery == ZTSD_Temperature) {
            lAnswer.mHandle = 0;
        }
    } else if (aState == KPM_STATE_NO_RIGHTS) {
        lAnswer.mStatus = KPM_STATUS_NO_RIGHTS;
    }
    return lAnswer;
}

ZTSSimSource describeSimAnswer(const ZTSSimAnswer& acrAnswer) {
    switch (acrAnswer.mStatus) {
        case KPM_STATUS_SUCCESS:
        case KPM_STATUS_INFO_5:
            return acrAnswer.mHandle == 0u ? ZTSSimSource{KPM_STATE_FAILED, "no handle is given"} : ZTSSimSource{};
        case KPM_STATUS_NO_SOURCE:
            return {KPM_STATE_NO_SOURCE, ""};
        case KPM_STATUS_NO_RIGHTS:
            return {KPM_STATE_NO_RIGHTS, ""};
        default:
            return {KPM_STATE_FAILED, "refused with status " + std::to_string(acrAnswer.mStatus)};
    }
}
