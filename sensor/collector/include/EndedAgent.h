/// How an agent ended, read from the status page that it left.
#ifndef SENSOR_COLLECTOR_INCLUDE_ENDEDAGENT_H
#define SENSOR_COLLECTOR_INCLUDE_ENDEDAGENT_H

#include <string>

#include "sensor/collector/include/HistorySink.h"

/// @param acrPage  not null
ZTSEndedAgent describeEndedAgent(const ZTCPagePointer& acrPage, const std::string& acrPagePath);

#endif
