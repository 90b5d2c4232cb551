/// Responses as JSON for programs. docs/tavikctl.md documents the schema.
#ifndef SENSOR_CLIENT_INCLUDE_RECORDJSON_H
#define SENSOR_CLIENT_INCLUDE_RECORDJSON_H

#include <nlohmann/json_fwd.hpp>
#include <span>
#include <string>

#include "sensor/client/include/Response.h"

/// "outcome" and what belongs to it.
nlohmann::ordered_json toJson(const ZTSResponse& acrResponse);
nlohmann::ordered_json toJson(const ZTSReceivedRecord& acrRecord);

/// Lower-case hex digits without separators.
std::string toHex(std::span<const std::uint8_t> aBytes);

/// Text of the value, with bytes that are no UTF-8 replaced. @param aIndent  -1: one line
std::string dumpJson(const nlohmann::ordered_json& acrValue, int aIndent);

#endif
