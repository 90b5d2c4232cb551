/// The sending end of a channel of messages.

#ifndef OS_COMMON_INCLUDE_WRITER_H
#define OS_COMMON_INCLUDE_WRITER_H

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"

class ZTCWriter {
public:
    ZTCWriter() = default;
    virtual ~ZTCWriter() = default;

    ZTCWriter(const ZTCWriter&) = delete;
    ZTCWriter& operator=(const ZTCWriter&) = delete;

    /// Sends one whole message, and puts the number of its bytes into arCount.
    virtual void write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) = 0;
};

#endif
