/// Hands out byte buffers and keeps a few for reuse.

#ifndef SYSTEM_INCLUDE_BUFFERMANAGER_H
#define SYSTEM_INCLUDE_BUFFERMANAGER_H

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"
#include "common/include/ThreadAnnotations.h"
#include "os/common/include/Mutex.h"

/// Any thread, at any time.
class ZTCBufferManager {
public:
    static constexpr unsigned gcMaxKeptBuffers = 4;

    /// A larger buffer is not kept, so that one large message does not hold its memory for good.
    static constexpr unsigned gcMaxKeptSize = 65536;

    ZTCBufferManager() = default;

    /// Puts an empty buffer with room for aSize bytes into arBuffer. Throws ZTCNoMemoryEx.
    void getBuffer(unsigned aSize, ZTCPointer<ZTCBuffer>& arBuffer);

    /// Takes the buffer back and puts an empty one in its place. The caller holds the only pointer to it.
    void reuseBuffer(ZTCPointer<ZTCBuffer>& arBuffer);

    /// Empties the buffer; it stays the caller's.
    void clearBuffer(ZTCPointer<ZTCBuffer>& arBuffer);

private:
    ZTCMutex mMutex;
    ZTCPointer<ZTCBuffer> mKept[gcMaxKeptBuffers] ZT_GUARDED_BY(mMutex);
    unsigned mNumberOfKept ZT_GUARDED_BY(mMutex) = 0;
};

#endif
