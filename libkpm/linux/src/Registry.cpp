#include "libkpm/linux/src/Registry.h"

std::uint32_t ZTCLinuxRegistry::put(std::uint32_t aBoard, std::size_t aKind, ZTSLinuxRegistration aRegistration) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    if (++mLastHandle == 0) {
        ++mLastHandle;
    }
    aRegistration.mHandle = mLastHandle;
    if (aBoard >= mBoards.size()) {
        mBoards.resize(aBoard + std::size_t{1});
    }
    mBoards[aBoard].at(aKind) = aRegistration;
    return aRegistration.mHandle;
}

bool ZTCLinuxRegistry::remove(std::uint32_t aBoard, std::uint32_t aHandle, bool aIsPerPort) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    if (aBoard >= mBoards.size()) {
        return false;
    }
    for (std::optional<ZTSLinuxRegistration>& lrRegistration : mBoards[aBoard]) {
        if (lrRegistration && lrRegistration->mHandle == aHandle &&
            (lrRegistration->mpScopeCallback != nullptr) == aIsPerPort) {
            lrRegistration.reset();
            return true;
        }
    }
    return false;
}

std::optional<ZTSLinuxRegistration> ZTCLinuxRegistry::find(std::uint32_t aBoard, std::size_t aKind) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    if (aBoard >= mBoards.size()) {
        return std::nullopt;
    }
    return mBoards[aBoard].at(aKind);
}
