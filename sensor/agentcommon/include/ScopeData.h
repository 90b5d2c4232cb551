/// What a scope record says beyond its counts: the event kind, the remote port's names where they are known, and the
/// kind's event data (EventDataRecords.h).
#ifndef SENSOR_AGENTCOMMON_INCLUDE_SCOPEDATA_H
#define SENSOR_AGENTCOMMON_INCLUDE_SCOPEDATA_H

#include "common/include/Buffer.h"
#include "common/include/EncodableStream.h"
#include "common/include/Pointer.h"
#include "common/include/Types.h"
#include "sensor/agentcommon/include/ScopeEvent.h"
#include "sensor/agentcommon/include/WorldWideName.h"

/// Largest scope record that a sensor of this generation stores; the agent compares its records with the limit of the
/// start command instead.
inline constexpr Size MAX_SCOPERECORD_SIZE = 900;

/// No lock of its own: its owner guards it.
class ZTCScopeData {
public:
    using ZTMadeWithItsCount = void;

    /// Encoded bytes beside the names and the data: category, subcategory, names (0 or 1), length.
    static constexpr Size gcFixedSize = 7;

    /// The same with names.
    static constexpr Size gcFixedSizeWithNames = gcFixedSize + 2 * ZTCWorldWideName::gcLength;

    /// A record without names. Copies aLength bytes of event data. aCapacity is the size in bytes up to which the event
    /// data are meant to grow. It reserves nothing: the holder tests it before it appends. It may be smaller than the
    /// first data, even 0. Throws ZTCNoMemoryEx.
    ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                 unsigned int aCapacity);

    /// The same with the port and node name of the remote port.
    ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                 unsigned int aCapacity, const ZTCPointer<ZTCWorldWideName>& acrWwpn,
                 const ZTCPointer<ZTCWorldWideName>& acrWwnn);

    /// The same with names that are copied.
    ZTCScopeData(const ZTCPointer<ZTCScopeEvent>& acrEvent, const unsigned char* apData, unsigned int aLength,
                 unsigned int aCapacity, const ZTCWorldWideName& acrWwpn, const ZTCWorldWideName& acrWwnn);

    unsigned char getCategory() const { return mEvent->getCategory(); }
    unsigned char getSubcategory() const { return mEvent->getSubcategory(); }

    /// The stored bytes, which may be changed in place. Valid until the next append.
    unsigned char* getEventData() { return mEventData.getData(); }
    unsigned int getEventDataSize() const { return mEventData.getSize(); }
    unsigned int getCapacity() const { return mCapacity; }

    /// Adds bytes behind the stored ones. Throws ZTCNoMemoryEx and changes nothing where there is no memory.
    void appendEventData(const unsigned char* apData, unsigned int aLength) { mEventData.append(apData, aLength); }

    /// Category, subcategory, names (0 or 1), with 1 port name and node name, then the data's length and the data.
    void encode(ZTCEncodableOutStream& arStream) const;

    /// The number of bytes that encode writes. store() writes them where there is room, and returns the address behind.
    Size getEncodedSize() const noexcept {
        return (mHasNames ? gcFixedSizeWithNames : gcFixedSize) + mEventData.getSize();
    }
    unsigned char* store(unsigned char* apBytes) const noexcept;

private:
    ZTCPointer<ZTCScopeEvent> mEvent;
    ZTCBuffer mEventData;
    unsigned int mCapacity;
    bool mHasNames;
    ZTCWorldWideName mWwpn;
    ZTCWorldWideName mWwnn;
};

#endif
