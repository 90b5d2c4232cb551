#include "tests/unit/tavik/support/Deliveries.h"

#include <cstring>
#include <memory>

#include "libkpm/include/libkpm.h"
#include "tavik/include/TavikCore.h"
#include "tests/unit/agentcommon/support/AdaptersLibraryDouble.h"

namespace {

/// A copy of some bytes in a block that ends where they end.
class ZTCExactBlock {
public:
    ZTCExactBlock(const void* apBytes, std::size_t aSize, bool aIsMisaligned)
        : mOffset(aIsMisaligned ? 1 : 0), mSize(mOffset + aSize), mpBlock(new unsigned char[mSize]) {
        if (aSize != 0) {
            std::memcpy(get(), apBytes, aSize);
        }
    }
    ~ZTCExactBlock() { std::memset(mpBlock.get(), 0xDD, mSize); }
    ZTCExactBlock(const ZTCExactBlock&) = delete;
    ZTCExactBlock& operator=(const ZTCExactBlock&) = delete;

    unsigned char* get() { return mpBlock.get() + mOffset; }

private:
    std::size_t mOffset;
    std::size_t mSize;
    std::unique_ptr<unsigned char[]> mpBlock;
};

}  // namespace

void deliverScope(unsigned aBoard, unsigned aCategory, unsigned aSubcategory, const ZTCBytes& acrData,
                  const ZTSDeliveryShape& acrShape) {
    ZTCExactBlock lData(acrData.data(), acrData.size(), acrShape.mIsMisaligned);
    ZT_event_payload lPayload{};
    lPayload.zt_payload_reserved = 0xA5A5A5A5A5A5A5A5;
    lPayload.zt_payload_data = acrShape.mHasData ? lData.get() : nullptr;
    ZTCExactBlock lPlacedPayload(&lPayload, sizeof lPayload, acrShape.mIsMisaligned);
    ZT_event lEvent{};
    lEvent.zt_evt_version = ZT_EVENT_VERSION;
    lEvent.zt_evt_size = acrShape.mSize.value_or(ZT_EVENT_HEADER_SIZE + acrData.size());
    lEvent.zt_evt_payload = acrShape.mHasPayload ? lPlacedPayload.get() : nullptr;
    ZTCExactBlock lPlacedEvent(&lEvent, sizeof lEvent, acrShape.mIsMisaligned);
    ScopeCb_Generic(aBoard, hbaWwnOf(acrShape.mPort), aCategory, aSubcategory, nullptr,
                    reinterpret_cast<ZT_event*>(lPlacedEvent.get()));
}

void deliverNullEvent(unsigned aBoard, unsigned aCategory, unsigned aSubcategory) {
    ScopeCb_Generic(aBoard, HBA_wwn{}, aCategory, aSubcategory, nullptr, nullptr);
}

void deliverLink(unsigned aBoard, const ZTSWwn& acrPort) {
    LINKINFO lInfo{};
    lInfo.a_wwpName = hbaWwnOf(acrPort);
    ZTCExactBlock lPlaced(&lInfo, sizeof lInfo, true);
    ScopeCb_KpmLink(aBoard, lPlaced.get());
}

void deliverNullLink(unsigned aBoard) {
    ScopeCb_KpmLink(aBoard, nullptr);
}

void deliverTemperature(unsigned aBoard) {
    ScopeCb_KpmTemp(aBoard, 41, 42);
}

void deliverRscn(unsigned aBoard, const ZTCBytes& acrPayload) {
    deliverRscn(aBoard, acrPayload, static_cast<unsigned>(acrPayload.size()));
}

void deliverRscn(unsigned aBoard, const ZTCBytes& acrPayload, unsigned aLength) {
    ZTCExactBlock lPlaced(acrPayload.data(), acrPayload.size(), true);
    ScopeCb_KpmRscn(aBoard, acrPayload.empty() ? nullptr : lPlaced.get(), aLength);
}

ZTCBytes makeRscn(const std::vector<std::uint32_t>& acrPages) {
    return makeRscn(acrPages, static_cast<unsigned>(4 + 4 * acrPages.size()));
}

ZTCBytes makeRscn(const std::vector<std::uint32_t>& acrPages, unsigned aPayloadLength) {
    ZTCByteWriter lPayload;
    lPayload.u8(0x61).u8(4).u16(aPayloadLength);
    for (const std::uint32_t lPage : acrPages) {
        lPayload.u32(lPage);
    }
    return lPayload.bytes();
}
