/// A Fibre Channel world wide name: the eight bytes that name a node (WWNN) or a port (WWPN).
///
/// A value without a lock: an object that is shared between threads is not changed, or is guarded by its owner's lock.
#ifndef SENSOR_AGENTCOMMON_INCLUDE_WORLDWIDENAME_H
#define SENSOR_AGENTCOMMON_INCLUDE_WORLDWIDENAME_H

#include <cstdint>
#include <cstring>

#include "common/include/EncodableStream.h"
#include "common/include/String.h"

class ZTCWorldWideName {
public:
    static constexpr unsigned gcLength = 8;

    /// The name of no port: all bytes zero.
    ZTCWorldWideName() = default;

    /// Copies eight bytes in wire order.
    explicit ZTCWorldWideName(const unsigned char* apBytes) { std::memcpy(mBytes, apBytes, gcLength); }

    /// The binary form: eight bytes in wire order, owned by this object.
    const unsigned char* getBytes() const { return mBytes; }

    /// The eight bytes copied unchanged into an integer of the host's byte order: a key to look names up by, whose
    /// order is not the order of the bytes.
    unsigned long getKey() const {
        unsigned long lKey;
        static_assert(sizeof lKey == gcLength);
        std::memcpy(&lKey, mBytes, gcLength);
        return lKey;
    }

    /// The string form: lower-case hex pairs with colons, "50:06:01:60:3b:a0:12:34".
    ZTCString getString() const;

    /// Writes the characters of the string form, without an end, and returns the address behind them.
    char* storeString(char* apText) const noexcept;

    /// The length of the string form.
    static constexpr unsigned gcStringLength = 3 * gcLength - 1;

    void encode(ZTCEncodableOutStream& arStream) const { arStream.writeBytes(mBytes, gcLength); }

    /// Throws ZTCInvalidEx and leaves the name as it was where the stream holds fewer than eight bytes.
    void decode(ZTCEncodableInStream& arStream) { arStream.readBytes(mBytes, gcLength); }

    bool operator==(const ZTCWorldWideName& acrOther) const { return getKey() == acrOther.getKey(); }

private:
    unsigned char mBytes[gcLength] = {};
};

#endif
