/// The error counters that the kernel keeps of local and remote ports.
///
/// Source: the transport class's `statistics` folders below `fc_host` and `fc_remote_ports`: CRC errors, loss of sync,
/// loss of signal, link failures, invalid words, and what fabrics announce (FPIN). Each file holds one number in
/// hexadecimal.
#ifndef SENSOR_TOPOLOGY_INCLUDE_COUNTERSCAN_H
#define SENSOR_TOPOLOGY_INCLUDE_COUNTERSCAN_H

#include <cstdint>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

#include "sensor/topology/include/PatientReader.h"
#include "sensor/topology/include/Topology.h"

/// Counters that one scan reads at most. Those of further ports are left out.
inline constexpr std::size_t gcMostCounters = 32768;

/// One counter of a port.
struct ZTSCounterReading {
    ZTSFcName mInitiator{};
    std::optional<ZTSFcName> mRemotePort{};  ///< absent: a counter of the initiator itself
    std::string mName{};                     ///< of the file: "invalid_crc_count"
    std::uint64_t mValue = 0;

    bool operator==(const ZTSCounterReading&) const = default;
};

/// The counters of all ports that have a WWPN. What the driver does not count (all bits are ones), does not show, or
/// does not answer for is not there. Counters of traffic and of time are left out: they always rise.
std::vector<ZTSCounterReading> scanCounters(const std::string& acrSysfs, const ZTSTopology& acrPorts,
                                            ZTCPatientReader& arReader);

#endif
