/// Times of received records as the history counts them.
#ifndef SENSOR_STORE_SRC_RECEIVEDTIME_H
#define SENSOR_STORE_SRC_RECEIVEDTIME_H

#include <algorithm>
#include <cstdint>

#include "sensor/client/include/Response.h"

/// Microseconds since the epoch. Seconds behind the year 9999 are cut to its end.
inline std::int64_t toMicroseconds(const ZTSReceivedTime& acrTime) {
    constexpr std::uint64_t scLastSecond = 253402300799;
    return static_cast<std::int64_t>(std::min(acrTime.mEpochSeconds, scLastSecond) * 1'000'000 +
                                     acrTime.mMilliseconds * std::uint64_t{1000} + acrTime.mMicroseconds);
}

#endif
