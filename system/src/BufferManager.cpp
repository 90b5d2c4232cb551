#include "system/include/BufferManager.h"

#include "common/include/Memory.h"

void ZTCBufferManager::getBuffer(unsigned aSize, ZTCPointer<ZTCBuffer>& arBuffer) {
    ZTCPointer<ZTCBuffer> lBuffer(NEW ZTCBuffer());
    {
        ZTCMutexLock lLock(mMutex);
        if (mNumberOfKept > 0) {
            // The slot keeps no share of what is handed out: it gets the new one, which nobody else has.
            const ZTCPointer<ZTCBuffer> lKept(mKept[mNumberOfKept - 1]);
            mKept[--mNumberOfKept] = lBuffer;
            lBuffer = lKept;
        }
    }
    lBuffer->reserve(aSize);
    arBuffer = lBuffer;
}

void ZTCBufferManager::reuseBuffer(ZTCPointer<ZTCBuffer>& arBuffer) {
    const ZTCPointer<ZTCBuffer> lReplacement(NEW ZTCBuffer());
    const ZTCPointer<ZTCBuffer> lReturned(arBuffer);
    arBuffer = lReplacement;
    lReturned->clear();
    if (lReturned->getCapacity() > gcMaxKeptSize) {
        return;
    }
    ZTCMutexLock lLock(mMutex);
    if (mNumberOfKept < gcMaxKeptBuffers) {
        mKept[mNumberOfKept++] = lReturned;
    }
}

void ZTCBufferManager::clearBuffer(ZTCPointer<ZTCBuffer>& arBuffer) {
    arBuffer->clear();
}
