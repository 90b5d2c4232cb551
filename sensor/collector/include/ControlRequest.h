/// Requests on the control socket as values, and the answers that are not the live state.
#ifndef SENSOR_COLLECTOR_INCLUDE_CONTROLREQUEST_H
#define SENSOR_COLLECTOR_INCLUDE_CONTROLREQUEST_H

#include <cstdint>
#include <optional>
#include <string>

#include "sensor/collector/include/HistoryWorker.h"

enum ZTEControlRequest : std::uint8_t { ZTCR_Status, ZTCR_Mark, ZTCR_WarnTest, ZTCR_Wrong };

struct ZTSControlRequest {
    ZTEControlRequest mKind = ZTCR_Wrong;
    std::string mName;   ///< of a mark
    std::string mError;  ///< of a wrong request: one line
    /// Of a mark; absent: now. Of a status: losses are counted from then on; absent: those of the last 24 hours.
    std::optional<ZTCHistoryTime> mTime{};
};

/// Longest name of a mark in bytes.
inline constexpr std::size_t gcMaxMarkName = 200;

/// Never throws, whatever the line holds.
ZTSControlRequest parseControlRequest(const std::string& acrLine);

std::string toErrorJson(const std::string& acrError);
std::string toMarkJson(const ZTSMarkResult& acrMark);

#endif
