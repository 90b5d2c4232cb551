#include "sensor/warnings/include/WarnWindow.h"

#include <algorithm>

static constexpr int scSlots = 255;

ZTCWarnWindow::ZTCWarnWindow(std::chrono::milliseconds aWithin) : mWithin(aWithin), mSlotLength(mWithin / scSlots) {}

void ZTCWarnWindow::add(ZTCHistoryTime aTime, std::uint64_t aCount) {
    if (mSlots.empty() || aTime - mSlots.back().mFirst > mSlotLength) {
        mSlots.push_back({.mFirst = aTime, .mLast = aTime, .mCount = 0});
    }
    mSlots.back().mLast = std::max(mSlots.back().mLast, aTime);
    mSlots.back().mCount += aCount;
}

std::uint64_t ZTCWarnWindow::count(ZTCHistoryTime aNow) {
    std::uint64_t lCount = 0;
    for (ZTSSlot& lrSlot : mSlots) {
        lrSlot.mFirst = std::min(lrSlot.mFirst, aNow);
        lrSlot.mLast = std::min(lrSlot.mLast, aNow);
    }
    std::erase_if(mSlots, [&](const ZTSSlot& acrSlot) { return aNow - acrSlot.mLast > mWithin; });
    for (const ZTSSlot& lrSlot : mSlots) {
        lCount += lrSlot.mCount;
    }
    return lCount;
}
