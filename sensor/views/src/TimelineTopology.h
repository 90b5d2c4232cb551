/// What the stored topology and counters add to a timeline.
#ifndef SENSOR_VIEWS_SRC_TIMELINETOPOLOGY_H
#define SENSOR_VIEWS_SRC_TIMELINETOPOLOGY_H

#include <nlohmann/json_fwd.hpp>

#include "sensor/views/include/Timeline.h"

/// Adds `remotePorts`, `links` and `counters` to the document. Throws what ZTCHistory throws.
void addTopology(nlohmann::ordered_json& arDocument, const ZTCHistory& acrHistory, const ZTSTimelineRequest& acrRequest,
                 const ZTCNameBook& acrNames);

#endif
