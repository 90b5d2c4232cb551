/// The ports of this host, looked at from time to time: what is new goes to the history, and the targets are made of
/// it. One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_PORTWATCH_H
#define SENSOR_COLLECTOR_INCLUDE_PORTWATCH_H

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "sensor/collector/include/HistoryWorker.h"
#include "sensor/collector/include/TargetBook.h"
#include "sensor/settings/include/Settings.h"
#include "sensor/topology/include/TopologyScan.h"

/// Environment variable with another root than "/sys", for tests.
inline constexpr const char* gcSysfsVariable = "TAVIK_SYSFS_ROOT";

class ZTCPortWatch {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;
    using Report = std::function<void(const std::string& acrLine)>;

    /// @param arHistory  outlives this object
    ZTCPortWatch(ZTCHistoryWorker& arHistory, Report aReport);

    ZTCTime getNextScan() const { return mNextScan; }
    /// The next scan is due at once.
    void hurry() { mNextScan = {}; }
    /// Returns whether a scan was due, and is done.
    bool scan(const ZTSSettings& acrSettings, ZTCTime aNow);

    /// As of the last scan.
    const ZTSTopology& getPorts() const { return *mpPorts; }
    const std::vector<ZTSTargetPort>& getTargets() const { return mTargets; }

private:
    ZTCHistoryWorker& mrHistory;
    const Report mReport;
    const std::string mSysfsRoot;
    ZTCTime mNextScan{};
    ZTCPatientReader mReader;
    std::shared_ptr<const ZTSTopology> mpPorts;
    std::vector<ZTSTargetPort> mTargets;
    std::string mTargetFileProblem;
};

#endif
