/// The targets that agents are told of, from the ports in sysfs and from the targets' file; and which events are a
/// reason to look at the host anew. One thread: the collecting one.
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
    /// The next look at the targets is due at once.
    void hurry() { mNextScan = {}; }
    /// Returns whether a look was due, and the targets are new.
    bool scan(const ZTSSettings& acrSettings, ZTCTime aNow);
    /// Whether agents can be told of their targets: the ports are known, or they have been waited for long enough.
    bool isReady() const { return mIsReady; }

    /// A page of the running agent. Where it shows a new event that says that something on the fabric has changed, the
    /// host is looked at anew.
    void noteEvents(const std::shared_ptr<const ZTSStatusSnapshot>& acrPage);

    /// As of the last look.
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
