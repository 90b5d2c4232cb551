/// Finds the targets to register with the agent, and decides when to scan the host again.
///
/// Targets come from the ports in sysfs and from the targets' file. A fabric event on the agent's status page leads to
/// a new scan. Used by the collecting thread alone.
#ifndef SENSOR_COLLECTOR_INCLUDE_PORTWATCH_H
#define SENSOR_COLLECTOR_INCLUDE_PORTWATCH_H

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "sensor/client/include/StatusPageReader.h"
#include "sensor/collector/include/TargetBook.h"
#include "sensor/collector/include/TopologyWatch.h"
#include "sensor/settings/include/Settings.h"

class ZTCPortWatch {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;
    using Report = std::function<void(const std::string& acrLine)>;

    /// @param arTopology  outlives this object
    ZTCPortWatch(ZTCTopologyWatch& arTopology, Report aReport);

    ZTCTime getNextScan() const { return mNextScan; }
    /// Makes the next scan due at once.
    void hurry() { mNextScan = {}; }
    /// Scans if a scan is due. Returns whether the targets have changed.
    bool scan(const ZTSSettings& acrSettings, ZTCTime aNow);
    /// Whether targets can be registered: the ports are known, or waiting for them has taken too long.
    bool isReady() const { return mIsReady; }

    /// Takes the running agent's status page. Asks for a new scan where the page counts a new event of a kind that
    /// reports a change of the fabric.
    void noteEvents(const std::shared_ptr<const ZTSStatusSnapshot>& acrPage);

    /// As of the last scan.
    const ZTSTopology& getPorts() const { return *mpPorts; }
    const std::vector<ZTSTargetPort>& getTargets() const { return mTargets; }

private:
    ZTCTopologyWatch& mrTopology;
    const Report mReport;
    ZTCTime mNextScan{};
    std::optional<ZTCTime> mReadyBy;
    bool mIsReady = false;
    std::shared_ptr<const ZTSTopology> mpPorts;
    std::vector<ZTSTargetPort> mTargets;
    std::string mTargetFileProblem;
    std::shared_ptr<const ZTSStatusSnapshot> mpPage;
    std::int64_t mLastEvent = 0;
};

#endif
