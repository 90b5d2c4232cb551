#include "sensor/agentcommon/include/ScopeData.h"

ZTCScopeData::ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                           unsigned int aCapacity)
    : mEvent(acrEvent), mEventData(aLength), mCapacity(aCapacity), mHasNames(false) {
    mEventData.append(apData, aLength);
}

ZTCScopeData::ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                           unsigned int aCapacity, const ZTCPointer<ZTCWorldWideName>& acrWwpn,
                           const ZTCPointer<ZTCWorldWideName>& acrWwnn)
    : mEvent(acrEvent), mEventData(aLength), mCapacity(aCapacity), mHasNames(true), mWwpn(*acrWwpn), mWwnn(*acrWwnn) {
    mEventData.append(apData, aLength);
}

void ZTCScopeData::appendEventData(const unsigned char* apData, unsigned int aLength) {
    mEventData.append(apData, aLength);
}

void ZTCScopeData::encode(ZTCEncodableOutStream& arStream) const {
    arStream << getCategory() << getSubcategory() << static_cast<unsigned char>(mHasNames ? 1 : 0);
    if (mHasNames) {
        mWwpn.encode(arStream);
        mWwnn.encode(arStream);
    }
    arStream << mEventData.getSize();
    arStream.writeBytes(mEventData.getData(), mEventData.getSize());
}
