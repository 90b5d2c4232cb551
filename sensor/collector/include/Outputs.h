/// The outputs that nobody has to ask for: the outlets and the warnings. Both have threads of their own; this class
/// feeds them.
///
/// Used by the collecting thread alone. No call waits.
#ifndef SENSOR_COLLECTOR_INCLUDE_OUTPUTS_H
#define SENSOR_COLLECTOR_INCLUDE_OUTPUTS_H

#include <chrono>
#include <functional>
#include <string>
#include <vector>

#include "sensor/collector/include/HistoryWorker.h"
#include "sensor/outlets/include/Outlets.h"
#include "sensor/settings/include/Settings.h"
#include "sensor/warnings/include/Warnings.h"

class ZTCOutputs {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;

    /// Starts both. @param arHistory  keeps their values; outlives this object
    ZTCOutputs(const std::string& acrStateDirectory, const ZTSSettings& acrSettings, ZTCHistoryWorker& arHistory);

    void setSettings(const ZTSSettings& acrSettings);
    /// To be called at each turn. The live state that they show is then at most a second old.
    void feed(ZTCTime aNow, const std::function<std::string()>& acrDescribe);

    /// Runs all hooks with a test record. Returns how long that takes at most.
    std::chrono::milliseconds testHooks(std::uint64_t aTicket) { return mWarnings.test(aTicket); }
    std::vector<ZTSHookTest> takeHookTests() { return mWarnings.takeTests(); }
    /// Readable when takeHookTests() has something; takeHookTests() reads it empty.
    int getBell() const { return mWarnings.getBell(); }
    /// The open warnings and the outlets that do not work, as JSON.
    std::string describeWarnings() const;

private:
    ZTCHistoryWorker& mrHistory;
    ZTCOutlets mOutlets;
    ZTCWarnings mWarnings;
    ZTCTime mLastLive{};
};

#endif
