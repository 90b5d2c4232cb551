/// The logical units of a topology with their paths.
#ifndef SENSOR_VIEWS_SRC_SANLUNS_H
#define SENSOR_VIEWS_SRC_SANLUNS_H

#include <string_view>
#include <vector>

#include "sensor/views/include/SanFacts.h"

inline constexpr std::string_view gcOnline = "Online";

/// Whether I/O can go through: it can through a port that is known to be "Marginal" too.
bool isRemotePortUp(const ZTSTopologyRemotePort& acrPort);

/// Whether the port is a target, or may have been one: the kernel forgets the roles of a port that it lost.
bool mayBeTarget(const ZTSTopologyRemotePort& acrPort);
/// Whether the kernel shows it as a target now.
bool isTarget(const ZTSTopologyRemotePort& acrPort);

/// By id; each with its redundancy, measured by what it had earlier. Units that went away with their ports are among
/// them.
std::vector<ZTSSanLun> findLuns(const ZTSTopology& acrNow, const ZTSSanPast& acrPast);

#endif
