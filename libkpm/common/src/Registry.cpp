#include "libkpm/common/include/Registry.h"

#include <algorithm>

std::uint32_t ZTCLibraryRegistry::put(std::uint32_t aBoard, std::size_t aKind, ZTSLibraryRegistration aRegistration,
                                      std::optional<std::uint32_t> aHandle) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    while (mBoards.size() <= aBoard) {
        mBoards.emplace_back(mKinds);
    }
    if (!aHandle && ++mLastHandle == 0) {
        ++mLastHandle;
    }
    aRegistration.mHandle = aHandle.value_or(mLastHandle);
    mBoards[aBoard].at(aKind) = aRegistration;
    return aRegistration.mHandle;
}

const ZTCLibraryRegistry::Entry* ZTCLibraryRegistry::findEntry(std::uint32_t aBoard, std::size_t aKind) const {
    return aBoard < mBoards.size() ? &mBoards[aBoard].at(aKind) : nullptr;
}

std::optional<std::size_t> ZTCLibraryRegistry::findKind(std::uint32_t aBoard, std::uint32_t aHandle) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    for (std::size_t lKind = 0; lKind < mKinds; ++lKind) {
        const Entry* lpEntry = findEntry(aBoard, lKind);
        if (lpEntry != nullptr && *lpEntry && (*lpEntry)->mHandle == aHandle) {
            return lKind;
        }
    }
    return std::nullopt;
}

std::optional<ZTSLibraryRegistration> ZTCLibraryRegistry::find(std::uint32_t aBoard, std::size_t aKind) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    const Entry* lpEntry = findEntry(aBoard, aKind);
    return lpEntry == nullptr ? std::nullopt : *lpEntry;
}

bool ZTCLibraryRegistry::remove(std::uint32_t aBoard, std::size_t aKind, std::uint32_t aHandle) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    const Entry* lpEntry = findEntry(aBoard, aKind);
    if (lpEntry == nullptr || !*lpEntry || (*lpEntry)->mHandle != aHandle) {
        return false;
    }
    mBoards[aBoard][aKind].reset();
    return true;
}

std::size_t ZTCLibraryRegistry::size() const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    std::size_t lCount = 0;
    for (const std::vector<Entry>& lrKinds : mBoards) {
        lCount += static_cast<std::size_t>(
            std::count_if(lrKinds.begin(), lrKinds.end(), [](const Entry& acrEntry) { return acrEntry.has_value(); }));
    }
    return lCount;
}
