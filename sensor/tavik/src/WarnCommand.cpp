#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/ControlClient.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TextTable.h"

/// Beside the timeouts of the hooks, which the sensor may have changed since.
static constexpr std::chrono::seconds scMargin{15};

/// One line a hook. Returns whether all did their work.
static bool sDescribe(const nlohmann::json& acrHooks, std::string& arText) {
    bool lIsGood = true;
    for (const nlohmann::json& lrHook : acrHooks) {
        std::string lProgram;
        for (const nlohmann::json& lrWord : lrHook.value("run", nlohmann::json::array())) {
            lProgram += (lProgram.empty() ? "" : " ") + (lrWord.is_string() ? lrWord.get<std::string>() : "?");
        }
        const nlohmann::json lProblem = lrHook.value("problem", nlohmann::json());
        lIsGood = lIsGood && lProblem.is_null();
        arText += escapeControls(lrHook.value("kind", "?") + ": " + lProgram + ": " +
                                 (lProblem.is_string() ? "failed: " + lProblem.get<std::string>() : "done")) +
                  "\n";
    }
    if (acrHooks.empty()) {
        arText = "no hook is set: add [[warn]] tables to the configuration\n";
    }
    return lIsGood;
}

int runWarn(const ZTSTavikOptions& acrOptions) {
    if (!acrOptions.mIsTest) {
        throw ZTCWrongUseEx("warn needs --test: all else is the configuration's [[warn]] tables");
    }
    const ZTCContext lContext(acrOptions);
    std::chrono::milliseconds lLimit = scMargin;
    for (const ZTSWarnRule& lrRule : lContext.getSettings().mWarnings) {
        lLimit += 2 * lrRule.mTimeout;
    }
    const ZTSControlAnswer lAnswer =
        askSensor(lContext.getSettings().controlPath(), {{"request", "warn-test"}}, lLimit);
    if (lAnswer.mAnswer != ZTAN_Answered) {
        throw ZTCNotKnownEx("the hooks were not tested: " + lAnswer.mProblem);
    }
    const nlohmann::json lHooks = lAnswer.mDocument.value("hooks", nlohmann::json::array());
    std::string lText;
    const bool lIsGood = sDescribe(lHooks, lText);
    if (acrOptions.mIsJson) {
        nlohmann::ordered_json lDocument = beginDocument("warn", lContext.getHost(), lContext.findStoreId());
        lDocument["hooks"] = lHooks;
        writeDocument(lDocument);
    } else {
        writeOutput(lText);
    }
    return lIsGood ? ZTTX_Done : ZTTX_HookFailed;
}
