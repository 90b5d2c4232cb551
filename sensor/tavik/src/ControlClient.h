/// Asks the running sensor over its control socket: sends one line of JSON and returns the line of JSON that answers
/// it.
#ifndef SENSOR_TAVIK_SRC_CONTROLCLIENT_H
#define SENSOR_TAVIK_SRC_CONTROLCLIENT_H

#include <chrono>
#include <nlohmann/json.hpp>
#include <string>

#include "sensor/views/include/StatusFacts.h"

struct ZTSControlAnswer {
    ZTEAnswer mAnswer = ZTAN_NoSensor;
    std::string mProblem;      ///< one line; empty where it answered
    nlohmann::json mDocument;  ///< an object, where it answered
};

/// Bytes of an answer that are accepted at most.
inline constexpr std::size_t gcMostAnswerBytes = std::size_t{16} * 1024 * 1024;

/// Never throws, whatever the other side does, and waits for it at most so long in all.
ZTSControlAnswer askSensor(const std::string& acrSocketPath, const nlohmann::json& acrRequest,
                           std::chrono::milliseconds aLimit);

#endif
