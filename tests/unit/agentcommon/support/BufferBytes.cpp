#include "tests/unit/agentcommon/support/BufferBytes.h"

ZTCPointer<ZTCBuffer> makeBuffer(const ZTCBytes& acrBytes) {
    ZTCPointer<ZTCBuffer> lBuffer(new ZTCBuffer(static_cast<Size>(acrBytes.size())));
    lBuffer->append(acrBytes.data(), static_cast<Size>(acrBytes.size()));
    return lBuffer;
}

ZTCBytes contentOf(const ZTCBuffer& acrBuffer) {
    return ZTCBytes(acrBuffer.getData(), acrBuffer.getData() + acrBuffer.getSize());
}
