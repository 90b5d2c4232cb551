/// Buffers and streams of the framework as plain bytes, and back.
#ifndef TESTS_UNIT_AGENTCOMMON_SUPPORT_BUFFERBYTES_H
#define TESTS_UNIT_AGENTCOMMON_SUPPORT_BUFFERBYTES_H

#include "common/include/Buffer.h"
#include "common/include/EncodableStream.h"
#include "common/include/Pointer.h"
#include "tests/support/Bytes.h"

ZTCPointer<ZTCBuffer> makeBuffer(const ZTCBytes& acrBytes);
ZTCBytes contentOf(const ZTCBuffer& acrBuffer);

/// What a value with a function encode writes.
template <typename TValue>
ZTCBytes encodingOf(const TValue& acrValue) {
    ZTCEncodableOutStream lStream(16);
    acrValue.encode(lStream);
    return contentOf(*lStream.getBuffer());
}

#endif
