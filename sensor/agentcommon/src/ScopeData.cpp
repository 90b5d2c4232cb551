#include "sensor/agentcommon/include/ScopeData.h"

#include <cstring>

#include "common/include/NetworkOrder.h"

ZTCScopeData::ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                           unsigned int aCapacity)
    : mEvent(acrEvent), mEventData(aLength), mCapacity(aCapacity), mHasNames(false) {
    mEventData.append(apData, aLength);
}

ZTCScopeData::ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                           unsigned int aCapacity, const ZTCPointer<ZTCWorldWideName>& acrWwpn,
                           const ZTCPointer<ZTCWorldWideName>& acrWwnn)
    : ZTCScopeData(acrEvent, apData, aLength, aCapacity, *acrWwpn, *acrWwnn) {}

ZTCScopeData::ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                           unsigned int aCapacity, const ZTCWorldWideName& acrWwpn, const ZTCWorldWideName& acrWwnn)
    : mEvent(acrEvent), mEventData(aLength), mCapacity(aCapacity), mHasNames(true), mWwpn(acrWwpn), mWwnn(acrWwnn) {
    mEventData.append(apData, aLength);
}

void ZTCScopeData::encode(ZTCEncodableOutStream& arStream) const {
    store(arStream.extend(getEncodedSize()));
}

unsigned char* ZTCScopeData::store(unsigned char* apBytes) const noexcept {
    const ZTCScopeEvent& lrEvent = *mEvent;
    *apBytes++ = lrEvent.getCategory();
    *apBytes++ = lrEvent.getSubcategory();
    *apBytes++ = mHasNames ? 1 : 0;
    if (mHasNames) {
        for (const ZTCWorldWideName* lpName : {&mWwpn, &mWwnn}) {
            std::memcpy(apBytes, lpName->getBytes(), ZTCWorldWideName::gcLength);
            apBytes += ZTCWorldWideName::gcLength;
        }
    }
    const Size lSize = mEventData.getSize();
    apBytes = storeInNetworkOrder(apBytes, lSize);
    if (lSize != 0) {
        std::memcpy(apBytes, mEventData.getData(), lSize);
    }
    return apBytes + lSize;
}
