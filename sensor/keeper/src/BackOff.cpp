#include "sensor/keeper/include/BackOff.h"

#include <algorithm>

std::chrono::seconds ZTCBackOff::take() {
    const std::chrono::seconds lPause = mNext;
    mNext = std::min(mNext * 2, mMost);
    return lPause;
}
