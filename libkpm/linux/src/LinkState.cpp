#include "libkpm/linux/src/LinkState.h"

void ZTCLinuxLinkState::noteMessage(bool aIsUp) {
    if (mState == ZTLK_Unknown || aIsUp == mIsToldUp) {
        return;
    }
    mIsToldUp = aIsUp;
    if (mAhead != 0) {
        --mAhead;
    } else {
        ++mUntold;
    }
}

ZTSLinuxLinkChange ZTCLinuxLinkState::makeChange(bool aIsUp) {
    ++(aIsUp ? mUp : mDown);
    return {aIsUp, mUp + mDown, mUp, mDown};
}

std::vector<ZTSLinuxLinkChange> ZTCLinuxLinkState::noteReading(ZTELinuxLink aState) {
    std::vector<ZTSLinuxLinkChange> lChanges;
    if (mState == ZTLK_Unknown) {
        mState = aState;
        forgetMessages();
        return lChanges;
    }
    const bool lIsOther = aState != ZTLK_Unknown && aState != mState;
    // Between two readings of one state lies an even number of changes, between differing ones an odd number: one
    // change more is a reading ahead of its message, or a message ahead of its reading.
    std::uint32_t lCount = mUntold;
    const bool lIsAhead = lIsOther && mUntold % 2 == 0;
    if (lIsAhead) {
        ++lCount;
    } else if (!lIsOther) {
        lCount -= mUntold % 2;
    }
    // Where memory is short, nothing has changed yet.
    lChanges.reserve(lCount);
    mAhead += lIsAhead ? 1 : 0;
    mUntold -= lCount < mUntold ? lCount : mUntold;
    for (; lCount != 0; --lCount) {
        mState = isUp() ? ZTLK_Down : ZTLK_Up;
        lChanges.push_back(makeChange(isUp()));
    }
    return lChanges;
}

void ZTCLinuxLinkState::forgetMessages() {
    mIsToldUp = isUp();
    mUntold = 0;
    mAhead = 0;
}
