/// The receiving end of a channel of messages.

#ifndef OS_COMMON_INCLUDE_READER_H
#define OS_COMMON_INCLUDE_READER_H

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"

class ZTCReader {
public:
    ZTCReader() = default;
    virtual ~ZTCReader() = default;

    ZTCReader(const ZTCReader&) = delete;
    ZTCReader& operator=(const ZTCReader&) = delete;

    /// Puts one whole message into arBuffer, which may be empty before, and its size into arCount.
    virtual void read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) = 0;

    /// Returns when a message can be read or the threads are to exit; throws ZTCTimeOutEx when the time passes first.
    virtual void waitForActivity(unsigned aSeconds) = 0;
};

#endif
