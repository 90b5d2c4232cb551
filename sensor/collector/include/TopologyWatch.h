/// Looks at the ports, LUNs and counters of this host, on a thread of its own, so that collecting never waits for an
/// attribute of a sick adapter.
///
/// It scans the ports often and the whole topology less often. The whole topology is also scanned soon after an event
/// was seen. Counters are read at the begin of each minute. The results are handed to a sink on the watch's thread. All
/// public functions may be called by any thread and never wait for a file.
#ifndef SENSOR_COLLECTOR_INCLUDE_TOPOLOGYWATCH_H
#define SENSOR_COLLECTOR_INCLUDE_TOPOLOGYWATCH_H

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "sensor/client/include/EventBell.h"
#include "sensor/store/include/HistoryTime.h"
#include "sensor/store/include/TopologyHistory.h"
#include "sensor/topology/include/TopologyScan.h"

/// Environment variable with another root than "/sys", for tests.
inline constexpr const char* gcSysfsVariable = "TAVIK_SYSFS_ROOT";
/// Environment variable with another folder than "/proc/self" for `mountinfo`, for tests.
inline constexpr const char* gcProcfsVariable = "TAVIK_PROCFS_ROOT";

/// Takes what the watch finds, on the watch's thread; no function waits. Outlives the watch.
class ZTCTopologySink {
public:
    virtual ~ZTCTopologySink() = default;

    /// Initiators and remote ports, where they differ from the last ones.
    virtual void notePorts(std::shared_ptr<const ZTSTopology> apPorts) = 0;
    /// A scan of everything, finished at this time.
    virtual void noteTopology(ZTCHistoryTime aTime, std::shared_ptr<const ZTSTopology> apTopology) = 0;
    virtual void noteCounters(std::vector<ZTSCounterSample> aSamples) = 0;
};

struct ZTSTopologyWatchSetup {
    ZTSTopologyRoots mRoots{};
    std::chrono::milliseconds mPortsPeriod = std::chrono::seconds(10);
    std::chrono::milliseconds mWholePeriod = std::chrono::seconds(30);
    std::chrono::milliseconds mHurryPause = std::chrono::seconds(2);  ///< between whole scans at least
    std::chrono::milliseconds mStaleAfter = std::chrono::seconds(90);
    std::chrono::milliseconds mPatience = std::chrono::milliseconds(250);  ///< with one file
    std::function<ZTCHistoryTime()> mClock = getHistoryTime;
};

/// The kernel's trees, or the one that the environment names.
ZTSTopologyWatchSetup makeTopologyWatchSetup();

/// How current the names are.
struct ZTSTopologyState {
    std::optional<ZTCHistoryTime> mScanned{};         ///< the last whole scan; absent: none is finished yet
    std::optional<std::chrono::milliseconds> mAge{};  ///< since then, by a clock that nobody sets
    bool mIsStale = true;                             ///< none is finished, the last is old, or files block
    std::optional<ZTCHistoryTime> mStaleSince{};      ///< present where they are stale
    std::vector<std::string> mBlocked{};              ///< files that do not answer now
};

class ZTCTopologyWatch {
public:
    /// Starts the thread.
    ZTCTopologyWatch(ZTCTopologySink& arSink, ZTSTopologyWatchSetup aSetup);
    /// As stop().
    ~ZTCTopologyWatch();
    ZTCTopologyWatch(const ZTCTopologyWatch&) = delete;
    ZTCTopologyWatch& operator=(const ZTCTopologyWatch&) = delete;

    /// Nothing is handed to the sink any more. Waits for the thread, but not for a directory that does not answer: that
    /// thread is left behind, and touches nothing of its owner.
    void stop();

    /// A whole scan is due soon: at once, or as soon as the pause since the last one is over.
    void hurry();

    /// The ports as of the last look; null: the first is not finished. A new object where they differ.
    std::shared_ptr<const ZTSTopology> getPorts() const;
    /// The last whole scan; null: none is finished.
    std::shared_ptr<const ZTSTopology> getTopology() const;
    ZTSTopologyState getState() const;

    /// Rings when the ports are new. The caller clears it.
    const ZTCEventBell& getBell() const;

private:
    class ZTCThread;
    std::shared_ptr<ZTCThread> mpThread;
    std::thread mRunner;
};

#endif
