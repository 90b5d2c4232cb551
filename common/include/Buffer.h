/// Owned bytes that grow.

#ifndef COMMON_INCLUDE_BUFFER_H
#define COMMON_INCLUDE_BUFFER_H

#include <cstdint>
#include <cstring>

#include "common/include/Types.h"

/// A block of bytes with a size and a capacity, both below 4 GiB. A failed allocation is
/// ZTCNoMemoryEx("Out of Memory", 2), a size past the limit ZTCInvalidEx; the buffer is unchanged then.
/// Not locked: its owner guards it.
class ZTCBuffer {
public:
    /// An empty buffer with room for aCapacity bytes.
    explicit ZTCBuffer(Size aCapacity = 0);
    ZTCBuffer(const ZTCBuffer&) = delete;
    ZTCBuffer& operator=(const ZTCBuffer&) = delete;
    ~ZTCBuffer();

    /// The bytes; valid until the buffer grows. Null while nothing was ever allocated.
    unsigned char* getData() noexcept { return mpData; }
    const unsigned char* getData() const noexcept { return mpData; }

    /// The number of bytes held.
    Size getSize() const noexcept { return mSize; }

    /// The number of bytes that fit before the buffer must grow.
    Size getCapacity() const noexcept { return mCapacity; }

    /// Adds bytes at the end; they may lie in this very buffer. The capacity grows geometrically.
    void append(const void* apBytes, Size aCount) {
        if (aCount <= mCapacity - mSize && aCount != 0) {
            std::memmove(mpData + mSize, apBytes, aCount);
            mSize += aCount;
        } else {
            growAndAppend(apBytes, aCount);
        }
    }

    /// Adds aCount bytes at the end and returns their address. The caller writes them. Grows as append does.
    unsigned char* extend(Size aCount) {
        if (aCount > mCapacity - mSize) {
            makeRoomFor(std::uint64_t{mSize} + aCount);
        }
        unsigned char* const lpBytes = mpData + mSize;
        mSize += aCount;
        return lpBytes;
    }

    /// Cuts the buffer, or fills it up with zeros.
    void resize(Size aSize);

    /// Makes room for aCapacity bytes in all.
    void reserve(Size aCapacity);

    /// Drops the bytes and keeps the room.
    void clear() noexcept { mSize = 0; }

private:
    void growAndAppend(const void* apBytes, Size aCount);
    void makeRoomFor(std::uint64_t aNeeded);
    void growTo(Size aNeeded);

    unsigned char* mpData = nullptr;
    Size mSize = 0;
    Size mCapacity = 0;
};

#endif
