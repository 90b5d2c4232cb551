#include "sensor/collector/include/ControlRequest.h"

#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/views/include/TimeText.h"

static ZTSControlRequest sWrong(const std::string& acrError) {
    return {.mKind = ZTCR_Wrong, .mName = {}, .mError = acrError};
}

static bool sHasControlCharacters(const std::string& acrText) {
    for (const char lCharacter : acrText) {
        if (static_cast<unsigned char>(lCharacter) < 0x20 || lCharacter == 0x7F) {
            return true;
        }
    }
    return false;
}

/// Adds the time of that name, where there is one.
static ZTSControlRequest sReadTime(const nlohmann::json& acrJson, const char* apName, ZTSControlRequest aRequest) {
    if (acrJson.contains(apName)) {
        const nlohmann::json& lrTime = acrJson[apName];
        aRequest.mTime = lrTime.is_string() ? fromRfc3339(lrTime.get<std::string>()) : std::nullopt;
        if (!aRequest.mTime) {
            return sWrong("\"" + std::string(apName) + "\" is a text as of RFC 3339");
        }
    }
    return aRequest;
}

ZTSControlRequest parseControlRequest(const std::string& acrLine) {
    const nlohmann::json lJson = nlohmann::json::parse(acrLine, nullptr, false);
    if (!lJson.is_object() || !lJson.contains("request") || !lJson["request"].is_string()) {
        return sWrong("a request is a JSON object with a text \"request\"");
    }
    const auto lRequest = lJson["request"].get<std::string>();
    if (lRequest == "status") {
        return sReadTime(lJson, "lossesSince", {.mKind = ZTCR_Status, .mName = {}, .mError = {}});
    }
    if (lRequest == "warn-test") {
        return {.mKind = ZTCR_WarnTest, .mName = {}, .mError = {}};
    }
    if (lRequest != "mark") {
        return sWrong("unknown request \"" + lRequest + "\": status, mark and warn-test are known");
    }
    if (!lJson.contains("name") || !lJson["name"].is_string()) {
        return sWrong("a mark needs a text \"name\"");
    }
    const auto lName = lJson["name"].get<std::string>();
    if (lName.empty() || lName.size() > gcMaxMarkName || sHasControlCharacters(lName)) {
        return sWrong("a mark's name has 1 to " + std::to_string(gcMaxMarkName) +
                      " bytes without control characters, this one has " + std::to_string(lName.size()));
    }
    return sReadTime(lJson, "time", {.mKind = ZTCR_Mark, .mName = lName, .mError = {}});
}

std::string toErrorJson(const std::string& acrError) {
    return dumpJson({{"error", acrError}}, -1);
}

std::string toMarkJson(const ZTSMarkResult& acrMark) {
    if (!acrMark.mError.empty()) {
        return toErrorJson(acrMark.mError);
    }
    return dumpJson({{"mark", acrMark.mName}, {"time", toRfc3339(acrMark.mTime)}}, -1);
}
