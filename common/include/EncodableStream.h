/// Typed fields to and from the bytes of a message.
///
/// Fields follow each other without tags or padding; numbers are in network byte order; a string is its 32-bit byte
/// count and its bytes. Types without a fixed width on the wire (bool, char, enumerations, pointers) do not compile:
/// the caller converts them first.

#ifndef COMMON_INCLUDE_ENCODABLESTREAM_H
#define COMMON_INCLUDE_ENCODABLESTREAM_H

#include <type_traits>

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"
#include "common/include/String.h"
#include "common/include/Types.h"

/// Writes fields into a buffer of its own. Failures are those of ZTCBuffer; no field is ever written in part.
class ZTCEncodableOutStream {
public:
    explicit ZTCEncodableOutStream(Size aInitialCapacity = 0);

    ZTCEncodableOutStream& operator<<(unsigned char aValue);
    ZTCEncodableOutStream& operator<<(unsigned short aValue);
    ZTCEncodableOutStream& operator<<(unsigned int aValue);
    ZTCEncodableOutStream& operator<<(unsigned long aValue);
    ZTCEncodableOutStream& operator<<(int aValue);
    ZTCEncodableOutStream& operator<<(long aValue);
    ZTCEncodableOutStream& operator<<(const ZTCString& acrText);

    template <typename T>
    requires(std::is_arithmetic_v<T> || std::is_enum_v<T> || std::is_pointer_v<T>) ZTCEncodableOutStream& operator<<(
        T aValue) = delete;

    /// Writes bytes as they are, without a count.
    ZTCEncodableOutStream& writeBytes(const void* apBytes, Size aCount);

    /// Adds aCount bytes and returns their address. The caller writes them at once.
    unsigned char* extend(Size aCount) { return mBuffer->extend(aCount); }

    /// Makes room for aCount more bytes.
    void reserve(Size aCount) { mBuffer->reserve(mBuffer->getSize() + aCount); }

    /// The buffer that holds what was written so far; shared with the stream.
    ZTCPointer<ZTCBuffer> getBuffer() const { return mBuffer; }

private:
    ZTCPointer<ZTCBuffer> mBuffer;
};

/// Reads fields from a shared buffer, from its first byte on. Where fewer bytes are left than a field has, it throws
/// ZTCInvalidEx("Not enough data in stream", 6) and changes nothing.
class ZTCEncodableInStream {
public:
    explicit ZTCEncodableInStream(const ZTCPointer<ZTCBuffer>& acrBuffer) : mBuffer(acrBuffer) {}

    ZTCEncodableInStream& operator>>(unsigned char& arValue);
    ZTCEncodableInStream& operator>>(unsigned short& arValue);
    ZTCEncodableInStream& operator>>(unsigned int& arValue);
    ZTCEncodableInStream& operator>>(unsigned long& arValue);
    ZTCEncodableInStream& operator>>(int& arValue);
    ZTCEncodableInStream& operator>>(long& arValue);
    ZTCEncodableInStream& operator>>(ZTCString& arText);

    /// Reads bytes as they are.
    ZTCEncodableInStream& readBytes(void* apBytes, Size aCount);

    /// The number of bytes not yet read.
    Size remaining() const;

private:
    const unsigned char* peek(Size aCount) const;

    ZTCPointer<ZTCBuffer> mBuffer;
    Size mPosition = 0;
};

#endif
