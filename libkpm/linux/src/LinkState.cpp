#include "libkpm/linux/src/LinkState.h"

void ZTCLinuxLinkState::noteMessage(bool aIsUp) {
    if (mState == ZTLK_Unknown) {
        return;
    }
    if (aIsUp != isUp()) {
        mWasToldOther = true;
    } else if (mWasToldOther) {
        mWasToldOther = false;
        mHasFlapped = true;
    }
}

ZTSLinuxLinkChange ZTCLinuxLinkState::makeChange(bool aIsUp) {
    ++(aIsUp ? mUp : mDown);
    return {aIsUp, mUp + mDown, mUp, mDown};
}

std::vector<ZTSLinuxLinkChange> ZTCLinuxLinkState::noteReading(ZTELinuxLink aState) {
    std::vector<ZTSLinuxLinkChange> lChanges;
    if (mHasFlapped) {
        lChanges.push_back(makeChange(!isUp()));
        lChanges.push_back(makeChange(isUp()));
        mHasFlapped = false;
    }
    if (aState != ZTLK_Unknown && aState != mState) {
        if (mState != ZTLK_Unknown) {
            lChanges.push_back(makeChange(aState == ZTLK_Up));
        }
        mState = aState;
        mWasToldOther = false;
    }
    return lChanges;
}

void ZTCLinuxLinkState::forgetMessages() {
    mWasToldOther = false;
}
