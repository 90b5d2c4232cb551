/// Points in time as people and programs write them: local time, RFC 3339 in JSON.
#ifndef SENSOR_VIEWS_INCLUDE_TIMETEXT_H
#define SENSOR_VIEWS_INCLUDE_TIMETEXT_H

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "sensor/store/include/HistoryTime.h"

/// "2026-11-21T09:58:03.555216+01:00", in local time.
std::string toRfc3339(ZTCHistoryTime aTime);

/// The reverse; also with "Z", with a blank for the "T", without a fraction or with up to nine digits of one (those
/// behind the sixth are cut). Nothing for any other text.
std::optional<ZTCHistoryTime> fromRfc3339(std::string_view aText);

/// A local time as people type it: "2026-11-21", "2026-11-21 10:04", "2026-11-21 10:04:12" (a "T" for the blank too),
/// or "10:04" and "10:04:12" for the latest such time that is not after `aNow`. Also RFC 3339. Nothing for any other
/// text and for a date that does not exist.
std::optional<ZTCHistoryTime> parseLocalTime(std::string_view aText, ZTCHistoryTime aNow);

/// "2026-11-21 10:04:12".
std::string formatDateTime(ZTCHistoryTime aTime);

/// As short as `aNow` allows: "10:04:12" on the same day, "14 Nov 08:12" within a year, else "2025-11-14 08:12".
std::string formatShortTime(ZTCHistoryTime aTime, ZTCHistoryTime aNow);

/// "2 s", "3 min", "3 h", "4 days": one unit, rounded down. Negative spans count as 0.
std::string formatSpan(std::chrono::microseconds aSpan);

#endif
