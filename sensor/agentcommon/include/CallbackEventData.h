/// One event as it was delivered by the adapters' library.
#ifndef SENSOR_AGENTCOMMON_INCLUDE_CALLBACKEVENTDATA_H
#define SENSOR_AGENTCOMMON_INCLUDE_CALLBACKEVENTDATA_H

#include "sensor/agentcommon/include/WorldWideName.h"

/// A value on the callback's stack. The event bytes are borrowed from the library for the duration of the callback.
class ZTCCallbackEventData {
public:
    /// Copies eight bytes from apWwpn, or takes the zero name where it is null. Data without a pointer have length 0.
    ZTCCallbackEventData(unsigned int aBoardId, const unsigned char* apWwpn, unsigned int aCategory,
                         unsigned int aSubcategory, unsigned char* apData, unsigned int aLength)
        : mBoardId(aBoardId),
          mWwpn(apWwpn == nullptr ? ZTCWorldWideName() : ZTCWorldWideName(apWwpn)),
          mCateory(aCategory),
          mSubcategory(aSubcategory),
          mpEventData(apData),
          mEventDataLength(apData == nullptr ? 0 : aLength) {}

    unsigned int getBoardId() const { return mBoardId; }

    /// Eight bytes, owned by this object.
    const unsigned char* getWwpn() const { return mWwpn.getBytes(); }
    unsigned int getCategory() const { return mCateory; }
    unsigned int getSubcategory() const { return mSubcategory; }

    /// Null where the event has no data.
    unsigned char* getEventData() const { return mpEventData; }
    unsigned int getEventDataLength() const { return mEventDataLength; }

private:
    unsigned int mBoardId;
    ZTCWorldWideName mWwpn;
    unsigned int mCateory;
    unsigned int mSubcategory;
    unsigned char* mpEventData;
    unsigned int mEventDataLength;
};

#endif
