#include "sensor/collector/include/Outputs.h"

#include <unistd.h>

#include <array>
#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/collector/include/CollectorLog.h"
#include "sensor/metrics/include/Metrics.h"

/// Between two descriptions of the live state.
static constexpr std::chrono::seconds scLivePause{1};

static std::string sHostName() {
    std::array<char, 256> lName{};
    return gethostname(lName.data(), lName.size() - 1) == 0 ? lName.data() : "unknown";
}

ZTCOutputs::ZTCOutputs(const std::string& acrStateDirectory, const ZTSSettings& acrSettings,
                       ZTCHistoryWorker& arHistory)
    : mrHistory(arHistory),
      mOutlets({.mStateDirectory = acrStateDirectory,
                .mHost = sHostName(),
                .mVersion = TAVIK_VERSION,
                .mSetValue = [this](const std::string& acrName,
                                    const std::string& acrValue) { mrHistory.setValue(acrName, acrValue); },
                .mReport = logLine},
               acrSettings),
      mWarnings({.mStateDirectory = acrStateDirectory,
                 .mHost = sHostName(),
                 .mFailuresValue = gcHookFailuresValue,
                 .mSetValue = [this](const std::string& acrName,
                                     const std::string& acrValue) { mrHistory.setValue(acrName, acrValue); },
                 .mReport = logLine},
                acrSettings) {}

void ZTCOutputs::setSettings(const ZTSSettings& acrSettings) {
    mOutlets.setSettings(acrSettings);
    mWarnings.setSettings(acrSettings);
}

void ZTCOutputs::feed(ZTCTime aNow, const std::function<std::string()>& acrDescribe) {
    if (aNow - mLastLive < scLivePause) {
        return;
    }
    mLastLive = aNow;
    if (mrHistory.getState().mIsOpen) {
        // Not before: a reader that opens the database while the disk is read-only makes it read-only for the writer in
        // the same process, too.
        mOutlets.openHistory();
        mWarnings.openHistory();
    }
    const std::string lLive = acrDescribe();
    mOutlets.setLive(lLive);
    mOutlets.wake();
    mWarnings.setLive(lLive);
}

std::string ZTCOutputs::describeWarnings() const {
    nlohmann::ordered_json lWarnings = nlohmann::ordered_json::parse(mWarnings.describe());
    for (const nlohmann::ordered_json& lrFailing : nlohmann::ordered_json::parse(mOutlets.describe())) {
        lWarnings.push_back(lrFailing);
    }
    return dumpJson(lWarnings, -1);
}
