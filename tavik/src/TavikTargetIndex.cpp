#include "tavik/include/TavikTargetIndex.h"

#include <bit>
#include <new>

#include "common/include/Exception.h"

namespace {

constexpr std::size_t gcLeastSlots = 16;
constexpr unsigned gcHashBits = 64;

}  // namespace

void ZTCTavikTargetIndex::reserveOne() {
    if (3 * (mTaken + 1) <= 2 * mSlots.size()) {
        return;
    }
    ZTCTavikTargetIndex lGrown;
    try {
        lGrown.mSlots.resize(mSlots.empty() ? gcLeastSlots : 2 * mSlots.size());
    } catch (const std::bad_alloc&) {
        throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
    }
    lGrown.mShift = gcHashBits - static_cast<unsigned>(std::countr_zero(lGrown.mSlots.size()));
    for (const ZTSRemotePortNames& lrNames : mSlots) {
        if (lrNames.mWwpn.getKey() != 0) {
            lGrown.insert(lrNames);
        }
    }
    mSlots.swap(lGrown.mSlots);
    mShift = lGrown.mShift;
}

void ZTCTavikTargetIndex::insert(const ZTSRemotePortNames& acrNames) noexcept {
    if (acrNames.mWwpn.getKey() == 0) {
        mNoPort = acrNames;
        mHasNoPort = true;
        return;
    }
    std::size_t lSlot = getFirstSlot(acrNames.mWwpn.getKey());
    while (mSlots[lSlot].mWwpn.getKey() != 0) {
        lSlot = (lSlot + 1) % mSlots.size();
    }
    mSlots[lSlot] = acrNames;
    ++mTaken;
}

const ZTSRemotePortNames* ZTCTavikTargetIndex::find(unsigned long aKey) const noexcept {
    if (aKey == 0) {
        return mHasNoPort ? &mNoPort : nullptr;
    }
    if (mSlots.empty()) {
        return nullptr;
    }
    const std::size_t lMask = mSlots.size() - 1;
    for (std::size_t lSlot = getFirstSlot(aKey);; lSlot = (lSlot + 1) & lMask) {
        const unsigned long lKey = mSlots[lSlot].mWwpn.getKey();
        if (lKey == aKey) {
            return &mSlots[lSlot];
        }
        if (lKey == 0) {
            return nullptr;
        }
    }
}
