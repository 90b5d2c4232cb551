#include "libkpm/sim/src/Registry.h"

#include <algorithm>

ZTCSimRegistry::ZTCSimRegistry(std::size_t aBoards) : mBoards(aBoards) {}

std::uint32_t ZTCSimRegistry::put(std::uint32_t aBoard, std::size_t aKind, ZTSSimRegistration aRegistration,
                                  std::optional<std::uint32_t> aHandle) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    if (!aHandle && ++mLastHandle == 0) {
        ++mLastHandle;
    }
    aRegistration.mHandle = aHandle.value_or(mLastHandle);
    mBoards.at(aBoard).at(aKind) = aRegistration;
    return aRegistration.mHandle;
}

std::optional<std::size_t> ZTCSimRegistry::findKind(std::uint32_t aBoard, std::uint32_t aHandle) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    if (aBoard >= mBoards.size()) {
        return std::nullopt;
    }
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        const std::optional<ZTSSimRegistration>& lrRegistration = mBoards[aBoard][lKind];
        if (lrRegistration && lrRegistration->mHandle == aHandle) {
            return lKind;
        }
    }
    return std::nullopt;
}

void ZTCSimRegistry::remove(std::uint32_t aBoard, std::size_t aKind, std::uint32_t aHandle) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    std::optional<ZTSSimRegistration>& lrRegistration = mBoards.at(aBoard).at(aKind);
    if (lrRegistration && lrRegistration->mHandle == aHandle) {
        lrRegistration.reset();
    }
}

std::optional<ZTSSimRegistration> ZTCSimRegistry::find(std::uint32_t aBoard, std::size_t aKind) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    if (aBoard >= mBoards.size()) {
        return std::nullopt;
    }
    return mBoards[aBoard].at(aKind);
}

std::size_t ZTCSimRegistry::size() const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    std::size_t lCount = 0;
    for (const auto& lrKinds : mBoards) {
        lCount += static_cast<std::size_t>(
            std::count_if(lrKinds.begin(), lrKinds.end(), [](const auto& acrEntry) { return acrEntry.has_value(); }));
    }
    return lCount;
}
