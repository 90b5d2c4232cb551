/// The remote ports that are registered with one start of an agent, and those that will be registered next.
///
/// The agent keeps the first target that it was given for an FC id. So each target is registered once, and a port that
/// comes back with another id is registered again.
#ifndef SENSOR_COLLECTOR_INCLUDE_TARGETBOOK_H
#define SENSOR_COLLECTOR_INCLUDE_TARGETBOOK_H

#include <set>
#include <span>
#include <string>
#include <vector>

#include "sensor/client/include/CommandEncoder.h"
#include "sensor/topology/include/Topology.h"

class ZTCTargetBook {
public:
    /// What is known now. Duplicates and targets that the agent has are dropped.
    void offer(std::span<const ZTSTargetPort> aTargets);

    /// At most this many that the agent does not have yet; they count as registered once noteRegistered() is called.
    std::vector<ZTSTargetPort> getNext(std::size_t aMost) const;
    void noteRegistered(std::size_t aCount);
    bool hasMore() const { return mRegistered < mTargets.size(); }
    std::size_t countRegistered() const { return mRegistered; }

private:
    struct ZTSOrder {
        bool operator()(const ZTSTargetPort& acrLeft, const ZTSTargetPort& acrRight) const;
    };

    std::vector<ZTSTargetPort> mTargets;  ///< the registered ones first
    std::set<ZTSTargetPort, ZTSOrder> mKnown;
    std::size_t mRegistered = 0;
};

/// The remote ports that have names and an FC id. One that several local ports see is there several times.
std::vector<ZTSTargetPort> toTargets(const ZTSTopology& acrPorts);

/// The targets of a file as of readTargets(). An empty path has none. Throws ZTCBadInputEx, naming the file and the
/// line.
std::vector<ZTSTargetPort> readTargetFile(const std::string& acrPath);

#endif
