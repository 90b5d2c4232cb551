/// How far counters rose between two scans.
#ifndef SENSOR_TOPOLOGY_INCLUDE_COUNTERDIFFERENCES_H
#define SENSOR_TOPOLOGY_INCLUDE_COUNTERDIFFERENCES_H

#include <array>
#include <cstdint>
#include <map>
#include <string>
#include <tuple>
#include <vector>

#include "sensor/topology/include/CounterScan.h"

class ZTCCounterDifferences {
public:
    /// The counters that rose since the last call, `mValue` being how far. A counter that is lower than before was
    /// reset: what it shows is where it begins anew, and no difference. One that was not in the last call has none.
    std::vector<ZTSCounterReading> take(const std::vector<ZTSCounterReading>& acrReadings);

private:
    using Bytes = std::array<std::uint8_t, 8>;
    /// Initiator, remote port (zeros: none), name.
    using Key = std::tuple<Bytes, Bytes, std::string>;

    std::map<Key, std::uint64_t> mLast;
};

#endif
