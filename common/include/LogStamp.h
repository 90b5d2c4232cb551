/// The time stamp of a log line.

#ifndef COMMON_INCLUDE_LOGSTAMP_H
#define COMMON_INCLUDE_LOGSTAMP_H

#include <cstdint>

#include "common/include/DateTime.h"

/// Writes `YYYY-MM-DD HH:MM:SS.uuuuuu`, ZTCLogLine::gcStampLength bytes without a terminator.
void storeLogStamp(char* apStamp, const ZTCDateTime& acrTime) noexcept;

#endif
