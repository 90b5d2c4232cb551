/// Reads the topology of this host, or of a tree that looks like one.
#ifndef SENSOR_TOPOLOGY_INCLUDE_TOPOLOGYSCAN_H
#define SENSOR_TOPOLOGY_INCLUDE_TOPOLOGYSCAN_H

#include <string>

#include "sensor/topology/include/PatientReader.h"
#include "sensor/topology/include/Topology.h"

/// Where the kernel's file systems are. Tests and support name other trees.
struct ZTSTopologyRoots {
    std::string mSysfs = "/sys";
    std::string mProcfs = "/proc/self";  ///< holds `mountinfo`
    std::string mSwaps = "/proc/swaps";
};

/// One scan. Never throws, whatever the trees hold: what is missing, malformed or blocks is absent. Everything is
/// sorted by name, so that two scans of the same state are equal.
ZTSTopology scanTopology(const ZTSTopologyRoots& acrRoots, ZTCPatientReader& arReader);

/// The same for initiators and remote ports alone: a few files a port.
ZTSTopology scanPorts(const std::string& acrSysfs, ZTCPatientReader& arReader);

#endif
