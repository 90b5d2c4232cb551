#include "common/include/Buffer.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <limits>

#include "common/include/Exception.h"
#include "common/include/Memory.h"

namespace {

constexpr std::uint64_t scLargestBuffer = std::numeric_limits<Size>::max();
constexpr std::uint64_t scLeastCapacity = 64;

}  // namespace

ZTCBuffer::ZTCBuffer(Size aCapacity) {
    if (aCapacity != 0) {
        growTo(aCapacity);
    }
}

ZTCBuffer::~ZTCBuffer() {
    std::free(mpData);
}

void ZTCBuffer::growAndAppend(const void* apBytes, Size aCount) {
    if (aCount == 0) {
        return;
    }
    const unsigned char* lpBytes = static_cast<const unsigned char*>(apBytes);
    const std::less<const unsigned char*> lIsBefore;
    const bool lIsOwn = mpData != nullptr && !lIsBefore(lpBytes, mpData) && lIsBefore(lpBytes, mpData + mSize);
    const std::ptrdiff_t lOffset = lIsOwn ? lpBytes - mpData : 0;
    makeRoomFor(std::uint64_t{mSize} + aCount);
    if (lIsOwn) {
        lpBytes = mpData + lOffset;
    }
    std::memmove(mpData + mSize, lpBytes, aCount);
    mSize += aCount;
}

void ZTCBuffer::resize(Size aSize) {
    reserve(aSize);
    if (aSize > mSize) {
        std::memset(mpData + mSize, 0, aSize - mSize);
    }
    mSize = aSize;
}

void ZTCBuffer::reserve(Size aCapacity) {
    if (aCapacity > mCapacity) {
        growTo(aCapacity);
    }
}

void ZTCBuffer::makeRoomFor(std::uint64_t aNeeded) {
    if (aNeeded > scLargestBuffer) {
        throw ZTCInvalidEx("Buffer cannot hold more than 4294967295 bytes", gcErrInvalid);
    }
    const std::uint64_t lDoubled = ZT_MAX(std::uint64_t{mCapacity} * 2, scLeastCapacity);
    growTo(static_cast<Size>(ZT_MIN(ZT_MAX(aNeeded, lDoubled), scLargestBuffer)));
}

void ZTCBuffer::growTo(Size aNeeded) {
    void* const lpData = std::realloc(mpData, aNeeded);
    if (lpData == nullptr) {
        throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
    }
    mpData = static_cast<unsigned char*>(lpData);
    mCapacity = aNeeded;
}
