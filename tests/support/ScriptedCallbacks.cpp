#include "tests/support/ScriptedCallbacks.h"

#include <cstring>
#include <memory>
#include <stdexcept>

#include "tests/support/Bytes.h"

namespace {

/// Bytes on the heap at an even or an odd address; overwritten before they are freed.
class ZTCPlacedBytes {
public:
    ZTCPlacedBytes(const void* apBytes, std::size_t aSize, bool aIsMisaligned)
        : mSize(aSize + 1), mpBlock(new unsigned char[mSize]), mOffset(aIsMisaligned ? 1 : 0) {
        if (aSize != 0) {
            std::memcpy(get(), apBytes, aSize);
        }
    }
    ~ZTCPlacedBytes() { std::memset(mpBlock.get(), 0xEE, mSize); }
    ZTCPlacedBytes(const ZTCPlacedBytes&) = delete;
    ZTCPlacedBytes& operator=(const ZTCPlacedBytes&) = delete;

    unsigned char* get() { return mpBlock.get() + mOffset; }

private:
    std::size_t mSize;
    std::unique_ptr<unsigned char[]> mpBlock;
    std::size_t mOffset;
};

unsigned sGetEventType(ZTELibraryEventType aType) {
    switch (aType) {
        case ZTELibraryEventType::Link:
            return FC_REG_LINK_EVENT;
        case ZTELibraryEventType::Rscn:
            return FC_REG_RSCN_EVENT;
        default:
            return FC_REG_TEMPERATURE_EVENT;
    }
}

}  // namespace

void ZTCScriptedCallbacks::addScope(const ZTCKindKey& acrKind, KPM_ScopeCallback apCallback, void* apContext) {
    const std::lock_guard lGuard(mLock);
    mScopes[acrKind] = mNewestScope = {apCallback, apContext};
}

void ZTCScriptedCallbacks::addBoard(const ZTCKindKey& acrKind, KPM_EventCallback apCallback) {
    const std::lock_guard lGuard(mLock);
    mBoards[acrKind] = mNewestBoards[std::get<2>(acrKind)] = apCallback;
}

void ZTCScriptedCallbacks::clear() {
    const std::lock_guard lGuard(mLock);
    mScopes.clear();
    mNewestScope = {};
    mBoards.clear();
    mNewestBoards.clear();
}

ZTCScriptedCallbacks::Scope ZTCScriptedCallbacks::findScope(const ZTSLibraryEvent& acrEvent) {
    const std::lock_guard lGuard(mLock);
    const auto lFound = mScopes.find({acrEvent.mBoard, acrEvent.mCategory, acrEvent.mSubcategory});
    const Scope lScope = lFound != mScopes.end() ? lFound->second : mNewestScope;
    if (lScope.mpCallback == nullptr) {
        throw std::runtime_error("no scope event is registered");
    }
    return lScope;
}

KPM_EventCallback ZTCScriptedCallbacks::findBoard(const ZTSLibraryEvent& acrEvent) {
    const std::lock_guard lGuard(mLock);
    const unsigned lType = sGetEventType(acrEvent.mType);
    const auto lFound = mBoards.find({acrEvent.mBoard, 0, lType});
    const KPM_EventCallback lpCallback = lFound != mBoards.end() ? lFound->second : mNewestBoards[lType];
    if (lpCallback == nullptr) {
        throw std::runtime_error("this board event is not registered");
    }
    return lpCallback;
}

void ZTCScriptedCallbacks::deliver(const ZTSLibraryEvent& acrEvent) {
    ZTCPlacedBytes lData(acrEvent.mData.data(), acrEvent.mData.size(), acrEvent.mIsMisaligned);
    if (acrEvent.mType == ZTELibraryEventType::Scope) {
        const Scope lScope = findScope(acrEvent);
        ZT_event_payload lPayload{};
        lPayload.zt_payload_reserved = 0xA5A5A5A5A5A5A5A5;
        lPayload.zt_payload_data = acrEvent.mPayload == ZTELibraryEventPayload::Data ? lData.get() : nullptr;
        ZTCPlacedBytes lPlacedPayload(&lPayload, sizeof(lPayload), acrEvent.mIsMisaligned);
        ZT_event lEvent{};
        lEvent.zt_evt_version = ZT_EVENT_VERSION;
        lEvent.zt_evt_size = acrEvent.mSize;
        lEvent.zt_evt_payload =
            acrEvent.mPayload == ZTELibraryEventPayload::NullPayload ? nullptr : lPlacedPayload.get();
        ZTCPlacedBytes lPlacedEvent(&lEvent, sizeof(lEvent), acrEvent.mIsMisaligned);
        lScope.mpCallback(acrEvent.mBoard, hbaNameOf(acrEvent.mPort), acrEvent.mCategory, acrEvent.mSubcategory,
                          lScope.mpContext, reinterpret_cast<ZT_event*>(lPlacedEvent.get()));
        return;
    }
    void (*const lpGeneric)() = reinterpret_cast<void (*)()>(findBoard(acrEvent));
    if (acrEvent.mType == ZTELibraryEventType::Link) {
        LINKINFO lInfo{};
        lInfo.a_linkEventTag = 1;
        lInfo.a_wwpName = hbaNameOf(acrEvent.mPort);
        lInfo.a_wwnName = hbaNameOf(makeWwn(0x7777777777777777));
        ZTCPlacedBytes lPlaced(&lInfo, sizeof(lInfo), acrEvent.mIsMisaligned);
        reinterpret_cast<KPM_LinkCallback>(lpGeneric)(acrEvent.mBoard, lPlaced.get());
    } else if (acrEvent.mType == ZTELibraryEventType::Rscn) {
        reinterpret_cast<KPM_RscnCallback>(lpGeneric)(acrEvent.mBoard, lData.get(),
                                                      static_cast<unsigned>(acrEvent.mSize));
    } else {
        reinterpret_cast<KPM_TemperatureCallback>(lpGeneric)(acrEvent.mBoard, 41, 42);
    }
}
