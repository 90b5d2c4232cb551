#include "system/include/ProtocolHelper.h"

#include <atomic>
#include <cstddef>

#include "common/include/Log.h"
#include "common/include/Memory.h"

namespace {

constexpr Size scBytesPerLine = 16;

// Relaxed: a message at the moment of the change may go either way.
std::atomic<bool> sIsSnifferModeOn{false};

/// One line: the hex digits, padded to the width of a full line, then the bytes as text.
void sDumpLine(const unsigned char* apBytes, Size aCount) {
    constexpr char lcDigits[] = "0123456789abcdef";
    char lHex[3 * scBytesPerLine + 1];
    char lText[scBytesPerLine + 1];
    for (std::size_t lIndex = 0; lIndex < scBytesPerLine; ++lIndex) {
        const bool lIsThere = lIndex < aCount;
        const unsigned char lByte = lIsThere ? apBytes[lIndex] : 0;
        lHex[3 * lIndex] = lIsThere ? lcDigits[lByte >> 4] : ' ';
        lHex[3 * lIndex + 1] = lIsThere ? lcDigits[lByte & 0x0f] : ' ';
        lHex[3 * lIndex + 2] = ' ';
        if (lIsThere) {
            lText[lIndex] = lByte >= 0x20 && lByte < 0x7f ? static_cast<char>(lByte) : '.';
        }
    }
    lHex[sizeof(lHex) - 1] = '\0';
    lText[aCount] = '\0';
    ZT_LOG_NAP("%s %s", lHex, lText);
}

void sDump(const ZTCPointer<ZTCBuffer>& acrBuffer) {
    const unsigned char* lpBytes = acrBuffer->getData();
    const Size lSize = acrBuffer->getSize();
    for (Size lOffset = 0; lOffset < lSize;) {
        const Size lCount = ZT_MIN(lSize - lOffset, scBytesPerLine);
        sDumpLine(lpBytes + lOffset, lCount);
        lOffset += lCount;
    }
}

}  // namespace

void ZTCProtocolHelper::receive(const ZTCPointer<ZTCReader>& acrReader, ZTCPointer<ZTCBuffer>& arBuffer,
                                unsigned /*aFlags*/) {
    unsigned lCount = 0;
    acrReader->read(arBuffer, lCount);
    if (isSnifferModeOn()) {
        sDump(arBuffer);
    }
}

void ZTCProtocolHelper::send(const ZTCPointer<ZTCWriter>& acrWriter, const ZTCPointer<ZTCBuffer>& acrBuffer,
                             unsigned /*aFlags*/) {
    if (isSnifferModeOn()) {
        sDump(acrBuffer);
    }
    unsigned lCount = 0;
    acrWriter->write(acrBuffer, lCount);
}

void ZTCProtocolHelper::setSnifferMode(bool aIsOn) {
    sIsSnifferModeOn.store(aIsOn, std::memory_order_relaxed);
}

bool ZTCProtocolHelper::isSnifferModeOn() {
    return sIsSnifferModeOn.load(std::memory_order_relaxed);
}
