/// What happened when, for drawing: counts in columns of equal width, and when Tavik could see anything at all.
#ifndef SENSOR_VIEWS_INCLUDE_TIMELINE_H
#define SENSOR_VIEWS_INCLUDE_TIMELINE_H

#include <cstddef>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"

inline constexpr std::size_t gcLeastColumns = 1;
inline constexpr std::size_t gcMostColumns = 4000;

struct ZTSTimelineRequest {
    ZTCHistoryTime mFrom;
    ZTCHistoryTime mTo;  ///< behind mFrom
    std::size_t mColumns = 600;
};

/// The document `tavik.timeline/1`:
///
///     {"schema", "host", "storeId", "from", "to", "columns", "columnSeconds",
///      "rows": [{"initiator": {…}, "remotePort": {…} or null, "kind": "queue-full",
///                "cells": [[column, count, spread], …]}, …],
///      "coverage": [{"initiator": {…}, "kind", "state", "from", "to"}, …],
///      "runs": [{"from", "to"}, …], "gaps": […], "marks": [{"name", "time"}, …],
///      "remotePorts": [{"wwpn", …, "vendor", "model"}, …],
///      "links": [{"initiator": {…}, "state": "Online", "from", "to"}, …],
///      "counters": [{"counter": "invalid_crc_count", "initiator": {…}, "remotePort": {…} or null,
///                    "cells": [[column, rise], …]}, …]}
///
/// Cells are rising by column, and only those that are not empty. A count belongs to the column in which its minute
/// begins. `spread` is the part of the count whose records began before that minute. `coverage` holds the states other
/// than `listening` and `no_source`: what was not listened to. `remotePorts` are the targets that the host knew at the
/// end of the range, those without events too. `links` are the states of the local ports; what was not known then is
/// absent.
///
/// Throws what ZTCHistory throws.
nlohmann::ordered_json makeTimelineDocument(const ZTCHistory& acrHistory, const ZTSTimelineRequest& acrRequest,
                                            const ZTCNameBook& acrNames, const std::string& acrHost);

#endif
