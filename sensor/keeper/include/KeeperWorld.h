/// What the keeper's rules need of the host: processes, the link, files. The real one is ZTCHostWorld; tests of the
/// rules have one without processes.
#ifndef SENSOR_KEEPER_INCLUDE_KEEPERWORLD_H
#define SENSOR_KEEPER_INCLUDE_KEEPERWORLD_H

#include <sys/types.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <set>
#include <string>

#include "sensor/link/include/Link.h"

/// The processes that the keeper watches.
enum ZTEWatched {
    ZTWP_Agent,
    ZTWP_Collector,
    ZTWP_Stranger  ///< an agent that somebody else has started on the same directory
};

enum ZTEStrangerLook {
    ZTSL_None,     ///< no agent holds the pid file
    ZTSL_Unknown,  ///< one does, but it has not written its pid yet: look again
    ZTSL_Watched   ///< one does, and its end will be reported
};

class ZTCKeeperWorld {
public:
    virtual ~ZTCKeeperWorld() = default;

    /// Makes a new response FIFO and starts an agent. Returns the message AgentStarted without mRestarts; nothing where
    /// that failed, after saying why.
    virtual std::optional<ZTSLinkMessage> startAgent(std::uint64_t aStart) = 0;
    /// Starts a collector on a new link. False where that failed, after saying why.
    virtual bool startCollector() = 0;
    /// Does nothing where the process is gone.
    virtual void sendSignal(ZTEWatched aProcess, int aSignal) = 0;
    virtual ZTEStrangerLook lookForStranger() = 0;

    /// Sends to the collector.
    virtual ZTELinkResult send(const ZTSLinkMessage& acrMessage) = 0;
    /// Whether nothing is left in a response FIFO.
    virtual bool isEmpty(const ZTCFileDescriptor& acrFifo) = 0;

    /// When the agent's pid file was last touched, in any unit that differs for two touches; nothing where it has none.
    virtual std::optional<std::int64_t> getAgentTouch() = 0;
    /// Adapters as the page of the running agent shows them; nothing where it shows none.
    virtual std::optional<std::uint32_t> countAdapters() = 0;
    /// The names in /sys/class/fc_host.
    virtual std::set<std::string> getHostNames() = 0;

    /// Touches the sensor's pid file.
    virtual void touchPidFile() = 0;
    /// Seconds since the epoch, for people.
    virtual std::int64_t getWallClock() = 0;
    /// One line for people.
    virtual void say(const std::string& acrText) = 0;
    /// One assignment for the service manager, such as "READY=1".
    virtual void notify(const std::string& acrAssignment) = 0;
};

#endif
