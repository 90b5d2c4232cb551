/// Durations and sizes as people write them, in settings and on command lines.
#ifndef SENSOR_SETTINGS_INCLUDE_QUANTITIES_H
#define SENSOR_SETTINGS_INCLUDE_QUANTITIES_H

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>

#include "sensor/client/include/ClientErrors.h"

/// A duration or a size beyond the largest. The text names it and the limit.
class ZTCTooLargeEx : public ZTCBadInputEx {
public:
    using ZTCBadInputEx::ZTCBadInputEx;
};

/// A duration: a number, with a fraction where wanted, and a unit: s, m, h or d. A number alone means seconds. "90s",
/// "1.5h", "30d", "2". Milliseconds are the finest; the longest is 36500 days. Throws ZTCTooLargeEx for a longer one,
/// ZTCBadInputEx for any other text, both naming it.
std::chrono::milliseconds durationFromText(std::string_view aText);

/// The duration in the largest unit that holds it in whole numbers: "90s", "2h", "0.25s".
std::string durationText(std::chrono::milliseconds aDuration);

/// A size in bytes: a whole number and a unit: B, KiB, MiB, GiB or TiB. A number alone means bytes. "64MiB", "4096".
/// The largest is 1024 TiB. Throws ZTCTooLargeEx for a larger one, ZTCBadInputEx for any other text, both naming it.
std::uint64_t sizeFromText(std::string_view aText);

/// The size in the largest unit that holds it in whole numbers: "64MiB", "1000B".
std::string sizeText(std::uint64_t aBytes);

#endif
