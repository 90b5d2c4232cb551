/// The collecting loop: one thread over the link to the keeper, the agent's FIFO and bell, the control socket and the
/// clock. It passes on what happens: sessions decide about agents, and the worker about the database.
#ifndef SENSOR_COLLECTOR_INCLUDE_COLLECTOR_H
#define SENSOR_COLLECTOR_INCLUDE_COLLECTOR_H

#include <poll.h>

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "sensor/collector/include/AgentQueue.h"
#include "sensor/collector/include/ControlRequest.h"
#include "sensor/collector/include/ControlServer.h"
#include "sensor/collector/include/HistoryWorker.h"
#include "sensor/collector/include/KeeperPort.h"
#include "sensor/collector/include/Leftovers.h"
#include "sensor/collector/include/LiveStateJson.h"
#include "sensor/collector/include/Outputs.h"
#include "sensor/collector/include/PortWatch.h"
#include "sensor/collector/include/Spool.h"
#include "sensor/collector/include/TopologyWatch.h"
#include "sensor/link/include/Inheritance.h"
#include "sensor/settings/include/Settings.h"

class ZTCCollector {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;

    /// Starts the worker of the history and the watch of the topology.
    ZTCCollector(ZTSInheritance aInheritance, const ZTSSettings& acrSettings);
    ~ZTCCollector();
    ZTCCollector(const ZTCCollector&) = delete;
    ZTCCollector& operator=(const ZTCCollector&) = delete;

    /// Until the keeper says so, or is gone. Returns the exit status: 0 for an orderly end, 1 where the keeper is gone,
    /// 2 where this program must not use the database.
    int run();

private:
    void turn(ZTCTime aNow);
    void poll(ZTCTime aNow);
    bool hasWorked() const;
    int getPollTime(ZTCTime aNow) const;
    bool isOver(ZTCTime aNow);

    void handle(ZTSLinkMessage aMessage, ZTCTime aNow);
    void reload(const ZTSLinkMessage& acrMessage, ZTCTime aNow);

    void openSpool(ZTCTime aNow);
    void sweep(ZTCTime aNow);
    void noteHistory();
    void tellState();
    void storeLosses();

    std::optional<std::string> serve(std::uint64_t aTicket, const std::string& acrRequest);
    std::string describeState(ZTCHistoryTime aLossesSince = {});

    ZTSInheritance mInheritance;
    ZTSSettings mSettings;
    const ZTCHistoryTime mSince;
    ZTCKeeperPort mKeeper;
    ZTCSpool mSpool;
    ZTCHistoryWorker mHistory;
    ZTCLeftovers mLeftovers;
    ZTCAgentQueue mAgents;
    ZTCTopologyWatch mTopology;
    ZTCPortWatch mPorts;
    ZTCControlServer mControl;
    ZTCOutputs mOutputs;

    bool mIsReady = false;  ///< the database is open, and what was found in the spool is handed to it
    bool mIsSwept = false;  ///< once at least
    ZTCTime mNextSweep{};
    ZTCTime mNextSpoolTry{};
    std::string mSpoolProblem;
    int mSpoolErrno = 0;

    std::uint64_t mRestarts = 0;
    std::optional<ZTSLinkMessage> mKeeperState;
    std::optional<ZTCTime> mFinishBy;
    std::vector<pollfd> mFds;
};

#endif
