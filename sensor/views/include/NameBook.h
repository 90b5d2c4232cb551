/// Names that people know ports by: those of the configuration, and the hostN of local ports.
#ifndef SENSOR_VIEWS_INCLUDE_NAMEBOOK_H
#define SENSOR_VIEWS_INCLUDE_NAMEBOOK_H

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/store/include/Episode.h"

/// Names of ports and nodes, and the ports that are known. Filled once, then only read; by any thread.
class ZTCNameBook {
public:
    /// The administrator's name of a port or a node.
    void addName(const ZTSFcName& acrWwn, const std::string& acrName) { mNames[acrWwn.mBytes] = acrName; }
    void addInitiator(const ZTSInitiator& acrInitiator) { mInitiators.push_back(acrInitiator); }
    void addRemotePort(const ZTSRemotePort& acrPort) { mRemotePorts.push_back(acrPort); }

    /// The name of the port, else that of its node; empty: it has none.
    std::string findName(const std::optional<ZTSFcName>& acrWwpn, const std::optional<ZTSFcName>& acrWwnn) const;

    /// The name of a remote port, else its WWPN.
    std::string describe(const ZTSRemotePort& acrPort) const;
    /// The name of a local port, else hostN, else its WWPN; "unknown adapter" without one.
    std::string describe(const ZTSInitiator& acrInitiator) const;

    /// WWPNs of the remote ports that a WWPN, or a name of a port or node, stands for. Empty: nothing has that name.
    std::vector<ZTSFcName> findRemotePorts(std::string_view aText) const;
    /// The same for local ports; "host7" too.
    std::vector<ZTSFcName> findInitiators(std::string_view aText) const;

private:
    std::vector<ZTSFcName> findNamed(std::string_view aText) const;

    std::map<std::array<std::uint8_t, 8>, std::string> mNames;
    std::vector<ZTSInitiator> mInitiators;
    std::vector<ZTSRemotePort> mRemotePorts;
};

/// A WWN from its text; nothing where the text is no WWN.
std::optional<ZTSFcName> parseWwn(std::string_view aText);

/// "10:..:01": the first and the last byte, where there is no room for more.
std::string abbreviateWwn(const ZTSFcName& acrWwn);

#endif
