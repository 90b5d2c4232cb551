#include "libkpm/linux/src/SourceReports.h"

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/include/libkpm.h"

ZTSSourceReport makeSourceReport(ZTEFeedState aState, const std::string& acrReason) {
    switch (aState) {
        case ZTFS_Working:
        case ZTFS_Resting:
            return {KPM_STATE_WORKING, {}};
        case ZTFS_NoRights:
            return {KPM_STATE_NO_RIGHTS, acrReason};
        case ZTFS_Failed:
            return {KPM_STATE_FAILED, acrReason};
        case ZTFS_Idle:
            return {KPM_STATE_FAILED, "it is not open yet"};
        case ZTFS_Closed:
            return {KPM_STATE_FAILED, "the library is closing"};
    }
    return {};
}

void ZTCSourceReports::update(std::uint32_t aBoard, const ZTCSourceRow& acrRow) {
    if (aBoard >= mRows.size()) {
        const std::lock_guard<std::mutex> lGuard(mLock);
        mRows.resize(aBoard + std::size_t{1});
    }
    for (std::size_t lKind = 0; lKind < acrRow.size(); ++lKind) {
        if (mRows[aBoard][lKind] == acrRow[lKind]) {
            continue;
        }
        {
            const std::lock_guard<std::mutex> lGuard(mLock);
            mRows[aBoard][lKind] = acrRow[lKind];
        }
        reportLibraryState(aBoard, gcScopeEventKinds[lKind].mDeliveredCategory,
                           gcScopeEventKinds[lKind].mDeliveredSubcategory, acrRow[lKind].mState, acrRow[lKind].mReason);
    }
}

std::uint32_t ZTCSourceReports::getState(std::uint32_t aBoard, std::size_t aKind) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return aBoard < mRows.size() ? mRows[aBoard].at(aKind).mState : 0;
}
