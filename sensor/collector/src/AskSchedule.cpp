#include "sensor/collector/include/AskSchedule.h"

#include <algorithm>

using std::chrono::milliseconds;

/// Between two requests after a bell. Half of the second that is promised: the answer needs time, too.
static constexpr milliseconds scUrgentPause{500};

/// Until the next try where asking was not possible.
static constexpr milliseconds scRetryPause{1000};

void ZTCAskSchedule::noteStart(ZTCTime aNow) {
    mIsFirst = true;
    mIsUrgent = false;
    mNextLook = aNow;
}

void ZTCAskSchedule::noteBell(ZTCTime aNow) {
    mIsUrgent = true;
    mNextLook = std::min(mNextLook, aNow);
}

void ZTCAskSchedule::noteAnswer(ZTCTime aNow) {
    if (mIsUrgent) {
        mNextLook = std::min(mNextLook, std::max(aNow, mAsked + std::min(scUrgentPause, mPeriod)));
    }
}

void ZTCAskSchedule::notePostponed(ZTCTime aNow) {
    mNextLook = aNow + std::min(scRetryPause, mPeriod);
}

bool ZTCAskSchedule::look(ZTCTime aNow, std::optional<bool> aIsHolding) {
    const bool lAsks = mIsFirst || aIsHolding.value_or(true);
    if (!aIsHolding.value_or(false)) {
        mIsUrgent = false;  // without a page there is no way to see when all has been taken
    }
    if (lAsks) {
        mAsked = aNow;
        mIsFirst = false;
    }
    mNextLook = aNow + (mIsUrgent ? std::min(scUrgentPause, mPeriod) : mPeriod);
    return lAsks;
}
