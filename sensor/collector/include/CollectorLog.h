/// The collector's messages: lines on standard error with the program's name in front.
#ifndef SENSOR_COLLECTOR_INCLUDE_COLLECTORLOG_H
#define SENSOR_COLLECTOR_INCLUDE_COLLECTORLOG_H

#include <string>

/// Writes one line. Control characters are replaced. Any thread; lines do not mix.
void logLine(const std::string& acrText);

#endif
