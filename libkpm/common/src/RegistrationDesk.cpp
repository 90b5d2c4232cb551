#include "libkpm/common/include/RegistrationDesk.h"

#include <cstring>

std::uint32_t ZTCRegistrationDesk::getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    if (apNodeName == nullptr || apPortName == nullptr) {
        return ZTLST_NullPointer;
    }
    if (aIndex >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    ZTSBoardNames lNames;
    const std::uint32_t lStatus = answerAdapterInfo(aIndex, lNames);
    if (lStatus == ZTLST_Success) {
        std::memcpy(apNodeName, &lNames.mNodeName, sizeof *apNodeName);
        std::memcpy(apPortName, &lNames.mPortName, sizeof *apPortName);
    }
    return lStatus;
}

std::uint32_t ZTCRegistrationDesk::registerForPort(std::uint32_t aBoard, const HBA_wwn& acrPort,
                                                   std::uint32_t aCategory, std::uint32_t aSubcategory, void* apContext,
                                                   std::uint32_t* apHandle, KPM_ScopeCallback apCallback) {
    if (apHandle == nullptr || apCallback == nullptr) {
        return ZTLST_NullPointer;
    }
    if (aBoard >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    if (!isPortOf(aBoard, acrPort)) {
        return ZTLST_NotItsPort;
    }
    const std::optional<std::size_t> lKind = aCategory == 0 ? std::nullopt : findKind(aCategory, aSubcategory);
    if (!lKind) {
        return ZTLST_NoSuchKind;
    }
    const ZTSRegistrationAnswer lAnswer = answerRegistration(aBoard, *lKind);
    if (!isAcceptedStatus(lAnswer.mStatus)) {
        return lAnswer.mStatus;
    }
    ZTSLibraryRegistration lRegistration;
    lRegistration.mHasSource = lAnswer.mHasSource;
    lRegistration.mpContext = apContext;
    lRegistration.mpScopeCallback = apCallback;
    const std::uint32_t lHandle = mRegistry.put(aBoard, *lKind, lRegistration, lAnswer.mHandle);
    std::memcpy(apHandle, &lHandle, sizeof lHandle);
    noteRegistration(aBoard, *lKind);
    return lAnswer.mStatus;
}

std::uint32_t ZTCRegistrationDesk::registerForBoard(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                                    KPM_EventCallback apCallback) {
    if (apCallback == nullptr || aBoard >= getNumberOfAdapters()) {
        return 0;
    }
    const std::optional<std::size_t> lKind = findKind(0, aEventType);
    if (!lKind) {
        return 0;
    }
    const ZTSRegistrationAnswer lAnswer = answerRegistration(aBoard, *lKind);
    if (!isAcceptedStatus(lAnswer.mStatus) || lAnswer.mHandle == 0u) {
        return 0;
    }
    ZTSLibraryRegistration lRegistration;
    lRegistration.mHasSource = lAnswer.mHasSource;
    lRegistration.mpContext = apContext;
    lRegistration.mpEventCallback = apCallback;
    const std::uint32_t lHandle = mRegistry.put(aBoard, *lKind, lRegistration, lAnswer.mHandle);
    noteRegistration(aBoard, *lKind);
    return lHandle;
}

std::uint32_t ZTCRegistrationDesk::unregister(std::uint32_t aBoard, std::uint32_t aHandle, bool aIsPerPort) {
    const std::optional<std::size_t> lKind = mRegistry.findKind(aBoard, aHandle);
    const std::optional<ZTSLibraryRegistration> lRegistration = lKind ? mRegistry.find(aBoard, *lKind) : std::nullopt;
    if (!lRegistration || lRegistration->isPerPort() != aIsPerPort) {
        return ZTLST_NoSuchHandle;
    }
    const std::uint32_t lStatus = answerUnregistration(aBoard, *lKind);
    if (lStatus != ZTLST_Success) {
        return lStatus;
    }
    return mRegistry.remove(aBoard, *lKind, aHandle) ? ZTLST_Success : ZTLST_NoSuchHandle;
}

std::uint32_t ZTCRegistrationDesk::unregisterForPort(std::uint32_t aBoard, const HBA_wwn& acrPort,
                                                     std::uint32_t aHandle) {
    if (aBoard >= getNumberOfBoardsEver()) {
        return ZTLST_NoSuchBoard;
    }
    return isPortOf(aBoard, acrPort) ? unregister(aBoard, aHandle, true) : ZTLST_NotItsPort;
}

std::uint32_t ZTCRegistrationDesk::unregisterForBoard(std::uint32_t aBoard, std::uint32_t aHandle) {
    return aBoard >= getNumberOfBoardsEver() ? ZTLST_NoSuchBoard : unregister(aBoard, aHandle, false);
}
