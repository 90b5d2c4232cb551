#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/ControlClient.h"
#include "sensor/views/include/FilterText.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

static constexpr std::size_t scMostCharacters = 64;
/// The sensor answers once the mark is on the disk.
static constexpr std::chrono::seconds scMarkLimit{5};

static void sCheckName(const std::string& acrName) {
    if (acrName.empty() || countCharacters(acrName) > scMostCharacters) {
        throw ZTCWrongUseEx("the name of a mark has 1 to " + std::to_string(scMostCharacters) + " characters, \"" +
                            acrName + "\" has " + std::to_string(countCharacters(acrName)));
    }
    if (escapeControls(acrName) != acrName) {
        throw ZTCWrongUseEx("the name of a mark is UTF-8 text without control characters, \"" + acrName + "\" is not");
    }
    if (isTimeOrDuration(acrName)) {
        throw ZTCWrongUseEx("\"" + acrName + "\" reads as a time or a duration, so it cannot name a mark");
    }
}

int runMark(const ZTSTavikOptions& acrOptions) {
    sCheckName(acrOptions.mMark);
    const ZTCContext lContext(acrOptions);
    nlohmann::json lRequest{{"request", "mark"}, {"name", acrOptions.mMark}};
    if (!acrOptions.mMarkTime.empty()) {
        lRequest["time"] = toRfc3339(readPoint(acrOptions.mMarkTime, "--at", {}, getHistoryTime()));
    }
    const ZTSControlAnswer lAnswer = askSensor(lContext.getSettings().controlPath(), lRequest, scMarkLimit);
    if (lAnswer.mAnswer != ZTAN_Answered) {
        throw ZTCNotKnownEx("the mark was not set: " + lAnswer.mProblem);
    }
    const nlohmann::json lTime = lAnswer.mDocument.value("time", nlohmann::json());
    const auto lParsed = lTime.is_string() ? fromRfc3339(lTime.get<std::string>()) : std::nullopt;
    if (acrOptions.mIsJson) {
        nlohmann::ordered_json lDocument = beginDocument("mark", lContext.getHost(), lContext.findStoreId());
        lDocument["mark"] = acrOptions.mMark;
        lDocument["time"] = lParsed ? nlohmann::ordered_json(toRfc3339(*lParsed)) : nlohmann::ordered_json(nullptr);
        writeDocument(lDocument);
    } else {
        writeOutput("mark \"" + acrOptions.mMark + "\" set" + (lParsed ? " at " + formatDateTime(*lParsed) : "") +
                    "\n");
    }
    return ZTTX_Done;
}
