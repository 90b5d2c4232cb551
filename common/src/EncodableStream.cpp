#include "common/include/EncodableStream.h"

#include <cstdint>
#include <cstring>
#include <limits>
#include <type_traits>

#include "common/include/NetworkOrder.h"

namespace {

template <typename Number>
void sWriteNumber(ZTCEncodableOutStream& arStream, Number aValue) {
    storeInNetworkOrder(arStream.extend(sizeof(Number)), aValue);
}

template <typename Number>
void sReadNumber(ZTCEncodableInStream& arStream, Number& arValue) {
    unsigned char lBytes[sizeof(Number)];
    arStream.readBytes(lBytes, sizeof(lBytes));
    arValue = loadFromNetworkOrder<Number>(lBytes);
}

template <typename Number>
void sReadSigned(ZTCEncodableInStream& arStream, Number& arValue) {
    std::make_unsigned_t<Number> lValue = 0;
    sReadNumber(arStream, lValue);
    arValue = static_cast<Number>(lValue);
}

}  // namespace

static_assert(sizeof(unsigned short) == 2 && sizeof(unsigned int) == 4 && sizeof(unsigned long) == 8,
              "the widths on the wire are those of the types");

ZTCEncodableOutStream::ZTCEncodableOutStream(Size aInitialCapacity) : mBuffer(NEW ZTCBuffer(aInitialCapacity)) {}

ZTCEncodableOutStream& ZTCEncodableOutStream::operator<<(unsigned char aValue) {
    sWriteNumber(*this, aValue);
    return *this;
}

ZTCEncodableOutStream& ZTCEncodableOutStream::operator<<(unsigned short aValue) {
    sWriteNumber(*this, aValue);
    return *this;
}

ZTCEncodableOutStream& ZTCEncodableOutStream::operator<<(unsigned int aValue) {
    sWriteNumber(*this, aValue);
    return *this;
}

ZTCEncodableOutStream& ZTCEncodableOutStream::operator<<(unsigned long aValue) {
    sWriteNumber(*this, aValue);
    return *this;
}

ZTCEncodableOutStream& ZTCEncodableOutStream::operator<<(int aValue) {
    return *this << static_cast<unsigned int>(aValue);
}

ZTCEncodableOutStream& ZTCEncodableOutStream::operator<<(long aValue) {
    return *this << static_cast<unsigned long>(aValue);
}

ZTCEncodableOutStream& ZTCEncodableOutStream::operator<<(const ZTCString& acrText) {
    const std::uint64_t lWhole = std::uint64_t{mBuffer->getSize()} + sizeof(Size) + acrText.length();
    if (lWhole > std::numeric_limits<Size>::max()) {
        throw ZTCInvalidEx("Buffer cannot hold more than 4294967295 bytes", gcErrInvalid);
    }
    const Size lLength = static_cast<Size>(acrText.length());
    const Size lFormerSize = mBuffer->getSize();
    *this << lLength;
    try {
        mBuffer->append(acrText.get(), lLength);
    } catch (...) {
        // A count without its bytes is not taken.
        mBuffer->resize(lFormerSize);
        throw;
    }
    return *this;
}

ZTCEncodableOutStream& ZTCEncodableOutStream::writeBytes(const void* apBytes, Size aCount) {
    mBuffer->append(apBytes, aCount);
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::operator>>(unsigned char& arValue) {
    sReadNumber(*this, arValue);
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::operator>>(unsigned short& arValue) {
    sReadNumber(*this, arValue);
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::operator>>(unsigned int& arValue) {
    sReadNumber(*this, arValue);
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::operator>>(unsigned long& arValue) {
    sReadNumber(*this, arValue);
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::operator>>(int& arValue) {
    sReadSigned(*this, arValue);
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::operator>>(long& arValue) {
    sReadSigned(*this, arValue);
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::operator>>(ZTCString& arText) {
    const Size lLength = loadFromNetworkOrder<Size>(peek(sizeof(Size)));
    if (lLength > remaining() - sizeof(Size)) {
        throw ZTCInvalidEx("Not enough data in stream", gcErrInvalid);
    }
    const unsigned char* const lpText = mBuffer->getData() + mPosition + sizeof(Size);
    arText = ZTCString(reinterpret_cast<const char*>(lpText), lLength);
    mPosition += static_cast<Size>(sizeof(Size)) + lLength;
    return *this;
}

ZTCEncodableInStream& ZTCEncodableInStream::readBytes(void* apBytes, Size aCount) {
    const unsigned char* const lpBytes = peek(aCount);
    if (aCount != 0) {
        std::memcpy(apBytes, lpBytes, aCount);
        mPosition += aCount;
    }
    return *this;
}

Size ZTCEncodableInStream::remaining() const {
    const Size lSize = mBuffer->getSize();
    return lSize > mPosition ? lSize - mPosition : 0;
}

const unsigned char* ZTCEncodableInStream::peek(Size aCount) const {
    if (aCount > remaining()) {
        throw ZTCInvalidEx("Not enough data in stream", gcErrInvalid);
    }
    const unsigned char* const lpData = static_cast<const ZTCBuffer&>(*mBuffer).getData();
    return lpData == nullptr ? nullptr : lpData + mPosition;
}
