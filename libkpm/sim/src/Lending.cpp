#include "libkpm/sim/src/Lending.h"

#include <cstddef>
#include <cstring>
#include <memory>
#include <vector>

#include "libkpm/common/include/Callbacks.h"

/// Memory that lives for one callback. The data are at the end of the block, at an odd address unless the scenario asks
/// for alignment, and are overwritten before they are freed. So an agent is caught that keeps a pointer, reads too far,
/// or expects alignment.
class ZTCSimLoan {
public:
    ZTCSimLoan(const void* apBytes, std::size_t aSize, bool aIsOdd)
        : mSize(aSize), mOffset(aIsOdd ? 1 : 0), mpBlock(new unsigned char[mOffset + aSize]) {
        if (aSize != 0) {
            std::memcpy(get(), apBytes, aSize);
        }
    }
    ~ZTCSimLoan() {
        std::memset(mpBlock.get(), 0xDD, mOffset + mSize);
        __asm__ __volatile__("" : : "r"(mpBlock.get()) : "memory");
    }
    ZTCSimLoan(const ZTCSimLoan&) = delete;
    ZTCSimLoan& operator=(const ZTCSimLoan&) = delete;

    void* get() const { return mpBlock.get() + mOffset; }

private:
    std::size_t mSize;
    std::size_t mOffset;
    std::unique_ptr<unsigned char[]> mpBlock;
};

static void sLendToScope(const ZTSLibraryRegistration& acrRegistration, const ZTSSimDelivery& acrDelivery,
                         bool aIsOdd) {
    const ZTCSimLoan lData(acrDelivery.mData.data(), acrDelivery.mData.size(), aIsOdd);
    ZT_event_payload lPayload{};
    lPayload.zt_payload_data = acrDelivery.mIsDataNull ? nullptr : lData.get();
    const ZTCSimLoan lLentPayload(&lPayload, sizeof lPayload, aIsOdd);
    ZT_event lEvent{};
    lEvent.zt_evt_version = ZT_EVENT_VERSION;
    lEvent.zt_evt_size = acrDelivery.mEventSize;
    lEvent.zt_evt_payload = acrDelivery.mIsPayloadNull ? nullptr : lLentPayload.get();
    const ZTCSimLoan lLentEvent(&lEvent, sizeof lEvent, aIsOdd);
    callScope(acrRegistration, acrDelivery.mToldBoard, acrDelivery.mLocal, acrDelivery.mCategory,
              acrDelivery.mSubcategory, static_cast<ZT_event*>(lLentEvent.get()));
}

void lendSimDelivery(const ZTSLibraryRegistration& acrRegistration, const ZTSSimDelivery& acrDelivery, bool aIsOdd) {
    const std::vector<std::uint8_t>& lrData = acrDelivery.mData;
    switch (getSimKind(acrDelivery.mKind).mDelivery) {
        case ZTSD_Scope:
            sLendToScope(acrRegistration, acrDelivery, aIsOdd);
            break;
        case ZTSD_Link: {
            const ZTCSimLoan lInfo(lrData.data(), lrData.size(), aIsOdd);
            callLink(acrRegistration, acrDelivery.mToldBoard, lInfo.get());
            break;
        }
        case ZTSD_Rscn: {
            const ZTCSimLoan lPayload(lrData.data(), lrData.size(), aIsOdd);
            callRscn(acrRegistration, acrDelivery.mToldBoard, lPayload.get(), acrDelivery.mLength);
            break;
        }
        case ZTSD_Temperature: {
            unsigned lValues[2];
            std::memcpy(lValues, lrData.data(), sizeof lValues);
            callTemperature(acrRegistration, acrDelivery.mToldBoard, lValues[0], lValues[1]);
            break;
        }
    }
}
