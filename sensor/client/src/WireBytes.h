/// Typed fields in network byte order, written and read back to back.
#ifndef SENSOR_CLIENT_SRC_WIREBYTES_H
#define SENSOR_CLIENT_SRC_WIREBYTES_H

#include <concepts>
#include <cstdint>
#include <span>
#include <string>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/CommandEncoder.h"

template <std::unsigned_integral T>
void appendNumber(ZTCWireBytes& arBytes, T aValue) {
    for (std::size_t i = sizeof(T); i-- > 0;) {
        arBytes.push_back(static_cast<std::uint8_t>(aValue >> (8 * i)));
    }
}

inline void appendName(ZTCWireBytes& arBytes, const ZTSFcName& acrName) {
    arBytes.insert(arBytes.end(), acrName.mBytes.begin(), acrName.mBytes.end());
}

/// Reads past the end throw ZTCDecodeEx with the offset and what was wanted, and consume nothing.
class ZTCWireReader {
public:
    explicit ZTCWireReader(std::span<const std::uint8_t> aBytes) : mBytes(aBytes) {}

    std::size_t getOffset() const { return mOffset; }
    std::size_t remaining() const { return mBytes.size() - mOffset; }

    std::span<const std::uint8_t> readBytes(std::size_t aCount, const char* apWhat) {
        if (remaining() < aCount) {
            fail(aCount, apWhat);
        }
        mOffset += aCount;
        return mBytes.subspan(mOffset - aCount, aCount);
    }

    template <std::unsigned_integral T>
    T readNumber(const char* apWhat) {
        std::uint64_t lValue = 0;
        for (const std::uint8_t lByte : readBytes(sizeof(T), apWhat)) {
            lValue = lValue << 8 | lByte;
        }
        return static_cast<T>(lValue);
    }

private:
    [[noreturn]] void fail(std::size_t aCount, const char* apWhat) const {
        throw ZTCDecodeEx(mOffset, "response ends within a field: wanted " + std::string(apWhat) + " (" +
                                       std::to_string(aCount) + " bytes) at offset " + std::to_string(mOffset) +
                                       ", found " + std::to_string(remaining()) + " bytes");
    }

    std::span<const std::uint8_t> mBytes;
    std::size_t mOffset = 0;
};

#endif
