/// Names that people know ports by: those of the configuration, and the hostN of local ports.
#ifndef SENSOR_VIEWS_INCLUDE_NAMEBOOK_H
#define SENSOR_VIEWS_INCLUDE_NAMEBOOK_H

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/include/History.h"
#include "sensor/topology/include/Topology.h"

/// The topology as it was at a time; null: not known. Lives until the next call.
using ZTCTopologyAt = std::function<const ZTSTopology*(ZTCHistoryTime aTime)>;

/// Reads it from a history, which outlives the result. Cheap where times rise. The first scan of all counts for events
/// of up to a minute before it.
ZTCTopologyAt readTopologyOf(const ZTCHistory& acrHistory);

/// How far counters rose in the minutes from one time to another. Lives until the next call.
using ZTCCountersAt = std::function<const std::vector<ZTSCounterSample>&(ZTCHistoryTime aFrom, ZTCHistoryTime aTo)>;

/// Reads them from a history, which outlives the result. Cheap where times rise.
ZTCCountersAt readCountersOf(const ZTCHistory& acrHistory);

/// Names of ports and nodes, and the ports that are known. Filled once, then only read. Any thread may read it. With a
/// topology or counters only the thread may that uses their history.
class ZTCNameBook {
public:
    /// The administrator's name of a port or a node.
    void addName(const ZTSFcName& acrWwn, const std::string& acrName) { mNames[acrWwn.mBytes] = acrName; }
    /// The administrator's names by WWN, from the settings. A key that is no WWN is skipped.
    void addNames(const std::map<std::string, std::string>& acrNames);
    void addInitiator(const ZTSInitiator& acrInitiator) { mInitiators.push_back(acrInitiator); }
    void addRemotePort(const ZTSRemotePort& acrPort) { mRemotePorts.push_back(acrPort); }

    void setTopology(ZTCTopologyAt aTopology) { mTopology = std::move(aTopology); }
    void setCounters(ZTCCountersAt aCounters) { mCounters = std::move(aCounters); }

    /// What hung on the ports at that time; null: not known. Lives until the next call.
    const ZTSTopology* findTopology(ZTCHistoryTime aTime) const { return mTopology ? mTopology(aTime) : nullptr; }

    bool hasCounters() const { return mCounters != nullptr; }
    /// Where there are none, an empty list.
    const std::vector<ZTSCounterSample>& findCounters(ZTCHistoryTime aFrom, ZTCHistoryTime aTo) const;

    /// The name of the port, else that of its node; empty: it has none.
    std::string findName(const std::optional<ZTSFcName>& acrWwpn, const std::optional<ZTSFcName>& acrWwnn) const;

    /// The name of a remote port, else its WWPN.
    std::string describe(const ZTSRemotePort& acrPort) const;
    /// The name of a local port, else hostN, else its WWPN; "unknown adapter" without one.
    std::string describe(const ZTSInitiator& acrInitiator) const;

    /// WWPNs of the remote ports that a WWPN, a name of a port or node, or the kernel's "rport-7:0-3" of now stands
    /// for. Empty: nothing has that name.
    std::vector<ZTSFcName> findRemotePorts(std::string_view aText) const;
    /// The same for local ports; "host7" and a symbolic name too.
    std::vector<ZTSFcName> findInitiators(std::string_view aText) const;

private:
    std::vector<ZTSFcName> findNamed(std::string_view aText) const;

    std::map<std::array<std::uint8_t, 8>, std::string> mNames;
    std::vector<ZTSInitiator> mInitiators;
    std::vector<ZTSRemotePort> mRemotePorts;
    ZTCTopologyAt mTopology;
    ZTCCountersAt mCounters;
};

/// A WWN from its text; nothing where the text is no WWN.
std::optional<ZTSFcName> parseWwn(std::string_view aText);

/// "10:..:01": the first and the last byte, where there is no room for more.
std::string abbreviateWwn(const ZTSFcName& acrWwn);

#endif
