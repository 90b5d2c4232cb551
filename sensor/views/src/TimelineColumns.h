/// The columns of a timeline.
#ifndef SENSOR_VIEWS_SRC_TIMELINECOLUMNS_H
#define SENSOR_VIEWS_SRC_TIMELINECOLUMNS_H

#include <algorithm>
#include <chrono>

#include "sensor/views/include/Timeline.h"

/// The column of a time before the request's end. What lies before its begin belongs to the first one: a minute in
/// which the range begins.
inline std::size_t findColumn(const ZTSTimelineRequest& acrRequest, ZTCHistoryTime aTime) {
    const auto lOffset = std::max(aTime - acrRequest.mFrom, std::chrono::microseconds(0));
    const auto lRange = acrRequest.mTo - acrRequest.mFrom;
    const auto lColumn = static_cast<std::size_t>(static_cast<long double>(lOffset.count()) *
                                                  static_cast<long double>(acrRequest.mColumns) /
                                                  static_cast<long double>(lRange.count()));
    return std::min(lColumn, acrRequest.mColumns - 1);
}

#endif
