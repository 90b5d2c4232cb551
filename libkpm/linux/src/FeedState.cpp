#include "libkpm/linux/src/FeedState.h"

#include <algorithm>
#include <array>
#include <cerrno>

/// One row a state, one column a happening, in the order of the enumerations.
static constexpr ZTSFeedStep scSteps[gcFeedStateCount][gcFeedHappeningCount] = {
    // HostFound, Opened, NotGranted, Broken, NothingRead, Look, Stop
    // Idle
    {{ZTFS_Idle, ZTFA_Open},
     {ZTFS_Working, ZTFA_None, true},
     {ZTFS_NoRights, ZTFA_None, true},
     {ZTFS_Failed, ZTFA_None, true},
     {ZTFS_Idle, ZTFA_None},
     {ZTFS_Idle, ZTFA_None},
     {ZTFS_Closed, ZTFA_None}},
    // Working
    {{ZTFS_Working, ZTFA_None},
     {ZTFS_Working, ZTFA_None},
     {ZTFS_NoRights, ZTFA_Close, true},
     {ZTFS_Failed, ZTFA_Close, true},
     {ZTFS_Resting, ZTFA_None},
     {ZTFS_Working, ZTFA_None},
     {ZTFS_Closed, ZTFA_Close}},
    // Resting
    {{ZTFS_Resting, ZTFA_None},
     {ZTFS_Resting, ZTFA_None},
     {ZTFS_NoRights, ZTFA_Close, true},
     {ZTFS_Failed, ZTFA_Close, true},
     {ZTFS_Resting, ZTFA_None},
     {ZTFS_Working, ZTFA_None},
     {ZTFS_Closed, ZTFA_Close}},
    // NoRights
    {{ZTFS_NoRights, ZTFA_None},
     {ZTFS_Working, ZTFA_None, true},
     {ZTFS_NoRights, ZTFA_None, true},
     {ZTFS_Failed, ZTFA_None, true},
     {ZTFS_NoRights, ZTFA_None},
     {ZTFS_NoRights, ZTFA_Open},
     {ZTFS_Closed, ZTFA_None}},
    // Failed
    {{ZTFS_Failed, ZTFA_None},
     {ZTFS_Working, ZTFA_None, true},
     {ZTFS_NoRights, ZTFA_None, true},
     {ZTFS_Failed, ZTFA_None, true},
     {ZTFS_Failed, ZTFA_None},
     {ZTFS_Failed, ZTFA_Open},
     {ZTFS_Closed, ZTFA_None}},
    // Closed
    {{ZTFS_Closed, ZTFA_None},
     {ZTFS_Closed, ZTFA_None},
     {ZTFS_Closed, ZTFA_None},
     {ZTFS_Closed, ZTFA_None},
     {ZTFS_Closed, ZTFA_None},
     {ZTFS_Closed, ZTFA_None},
     {ZTFS_Closed, ZTFA_None}},
};

ZTSFeedStep getFeedStep(ZTEFeedState aState, ZTEFeedHappening aHappening) {
    return scSteps[aState][aHappening];
}

ZTEFeedHappening judgeFeedError(int aError) {
    return aError == EPERM || aError == EACCES || aError == EROFS ? ZTFH_NotGranted : ZTFH_Broken;
}

bool ZTCRetryPause::isDue() {
    if (--mLeft != 0) {
        return false;
    }
    mLength = std::min(2 * mLength, scLongest);
    mLeft = mLength;
    return true;
}

ZTSFeedStep ZTCFeedState::happen(ZTEFeedHappening aHappening, const std::string& acrReason) {
    ZTSFeedStep lStep = getFeedStep(get(), aHappening);
    const bool lIsNewReason = lStep.mIsToTell && acrReason != mReason;
    if (lStep.mIsToTell) {
        // First: where memory is short, the state is as it was.
        mReason = acrReason;
    }
    // The same state was already reported for the same reason.
    lStep.mIsToTell = lIsNewReason || (lStep.mIsToTell && lStep.mNext != get());
    mChanges += lStep.mIsToTell ? 1 : 0;
    mState.store(lStep.mNext, std::memory_order_relaxed);
    return lStep;
}
