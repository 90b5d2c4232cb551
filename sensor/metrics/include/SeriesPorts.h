/// The remote ports that have time series of their own.
///
/// A series that comes and goes is worse than none: a port that was given one keeps it as long as the database lives.
/// The list is kept in the database, in the order in which the ports were given theirs.
#ifndef SENSOR_METRICS_INCLUDE_SERIESPORTS_H
#define SENSOR_METRICS_INCLUDE_SERIESPORTS_H

#include <cstddef>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/store/include/Ledger.h"

/// The name of the stored value that holds the list.
inline constexpr const char* gcSeriesPortsValue = "metrics.remote_ports";

class ZTCSeriesPorts {
public:
    ZTCSeriesPorts() = default;
    /// Reads the stored value: WWPNs with blanks between them. It skips texts that are no WWPNs.
    explicit ZTCSeriesPorts(std::string_view aStored);

    /// Gives series to the ports of these totals that have none, as far as the limit goes, in the order of their names.
    /// A lower limit than before takes nothing away. Returns whether the list has grown.
    bool extend(std::span<const ZTSTotal> aTotals, std::size_t aLimit);

    bool has(const ZTSFcName& acrWwpn) const { return mPorts.contains(acrWwpn.mBytes); }
    std::size_t getSize() const { return mOrder.size(); }
    /// What is to be stored.
    std::string toText() const;

private:
    std::vector<ZTSFcName> mOrder;
    std::set<std::array<std::uint8_t, 8>> mPorts;  // the same
};

#endif
