#include "tavik/include/TavikTargetIndex.h"

#include <bit>
#include <new>

#include "common/include/Exception.h"
#include "common/include/Log.h"

namespace {

constexpr std::size_t scLeastSlots = 16;
constexpr unsigned scHashBits = 64;

}  // namespace

void ZTCTavikTargetIndex::reserveOne() {
    ZT_ENTRY();
    if (3 * (mTaken + 1) <= 2 * mSlots.size()) {
        ZT_EXIT();
        return;
    }
    ZTCTavikTargetIndex lGrown;
    try {
        lGrown.mSlots.resize(mSlots.empty() ? scLeastSlots : 2 * mSlots.size());
    } catch (const std::bad_alloc&) {
        ZT_THROW(ZTCNoMemoryEx, "Out of Memory", gcErrNoMemory);
    }
    lGrown.mShift = scHashBits - static_cast<unsigned>(std::countr_zero(lGrown.mSlots.size()));
    for (const ZTSRemotePortNames& lrNames : mSlots) {
        if (lrNames.mWwpn.getKey() != 0) {
            lGrown.insert(lrNames);
        }
    }
    mSlots.swap(lGrown.mSlots);
    mShift = lGrown.mShift;
    ZT_EXIT();
}

void ZTCTavikTargetIndex::insert(const ZTSRemotePortNames& acrNames) noexcept {
    ZT_ENTRY();
    if (acrNames.mWwpn.getKey() == 0) {
        mNoPort = acrNames;
        mHasNoPort = true;
        ZT_EXIT();
        return;
    }
    std::size_t lSlot = getFirstSlot(acrNames.mWwpn.getKey());
    while (mSlots[lSlot].mWwpn.getKey() != 0) {
        lSlot = (lSlot + 1) % mSlots.size();
    }
    mSlots[lSlot] = acrNames;
    ++mTaken;
    ZT_EXIT();
}

const ZTSRemotePortNames* ZTCTavikTargetIndex::find(unsigned long aKey) const noexcept {
    ZT_ENTRY();
    const ZTSRemotePortNames* lpFound = nullptr;
    if (aKey == 0) {
        lpFound = mHasNoPort ? &mNoPort : nullptr;
    } else if (!mSlots.empty()) {
        const std::size_t lMask = mSlots.size() - 1;
        std::size_t lSlot = getFirstSlot(aKey);
        while (mSlots[lSlot].mWwpn.getKey() != aKey && mSlots[lSlot].mWwpn.getKey() != 0) {
            lSlot = (lSlot + 1) & lMask;
        }
        lpFound = mSlots[lSlot].mWwpn.getKey() == aKey ? &mSlots[lSlot] : nullptr;
    }
    ZT_EXIT();
    return lpFound;
}
