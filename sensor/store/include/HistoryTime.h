/// Points in time of the history: microseconds since the epoch, by the host's clock.
#ifndef SENSOR_STORE_INCLUDE_HISTORYTIME_H
#define SENSOR_STORE_INCLUDE_HISTORYTIME_H

#include <chrono>
#include <cstdint>

using ZTCHistoryTime = std::chrono::sys_time<std::chrono::microseconds>;

/// The clock's time now.
inline ZTCHistoryTime getHistoryTime() {
    return std::chrono::time_point_cast<std::chrono::microseconds>(std::chrono::system_clock::now());
}

constexpr std::int64_t toMicroseconds(ZTCHistoryTime aTime) {
    return aTime.time_since_epoch().count();
}

constexpr ZTCHistoryTime fromMicroseconds(std::int64_t aMicroseconds) {
    return ZTCHistoryTime(std::chrono::microseconds(aMicroseconds));
}

#endif
