#include "sensor/topology/include/CounterScan.h"

#include <algorithm>
#include <array>

#include "sensor/topology/src/SysfsFiles.h"

/// Beginnings of the names of files that count traffic or time, and of the one that only takes writes.
static constexpr std::array scNoErrors = {"seconds_since", "tx_",         "rx_",   "fcp_input",
                                          "fcp_output",    "fcp_control", "reset_"};

static bool sCountsErrors(const std::string& acrName) {
    return std::ranges::none_of(scNoErrors, [&](const char* apBegin) { return acrName.starts_with(apBegin); });
}

std::vector<ZTSCounterReading> scanCounters(const std::string& acrSysfs, const ZTSTopology& acrPorts,
                                            ZTCPatientReader& arReader) {
    std::vector<ZTSCounterReading> lWanted;
    std::vector<std::string> lPaths;
    const auto lAdd = [&](const std::string& acrFolder, const ZTSFcName& acrInitiator,
                          const std::optional<ZTSFcName>& acrRemotePort) {
        for (const std::string& lrName : listDirectory(acrFolder)) {
            if (sCountsErrors(lrName) && lPaths.size() < gcMostCounters) {
                lPaths.push_back(acrFolder + "/" + lrName);
                lWanted.push_back({.mInitiator = acrInitiator, .mRemotePort = acrRemotePort, .mName = lrName});
            }
        }
    };
    for (const ZTSTopologyInitiator& lrPort : acrPorts.mInitiators) {
        if (lrPort.mWwpn) {
            lAdd(acrSysfs + "/class/fc_host/" + lrPort.mHost + "/statistics", *lrPort.mWwpn, std::nullopt);
        }
    }
    for (const ZTSTopologyRemotePort& lrPort : acrPorts.mRemotePorts) {
        const ZTSTopologyInitiator* const lpInitiator = acrPorts.findInitiator(lrPort.mHost);
        if (lrPort.mWwpn && lpInitiator != nullptr && lpInitiator->mWwpn) {
            lAdd(acrSysfs + "/class/fc_remote_ports/" + lrPort.mName + "/statistics", *lpInitiator->mWwpn,
                 lrPort.mWwpn);
        }
    }

    const std::vector<std::optional<std::string>> lTexts = arReader.readAll(std::move(lPaths));
    std::vector<ZTSCounterReading> lReadings;
    for (std::size_t i = 0; i < lTexts.size(); ++i) {
        const auto lValue = lTexts[i] ? parseAttribute<std::uint64_t>(*lTexts[i], 16) : std::nullopt;
        if (lValue && *lValue != UINT64_MAX) {
            lWanted[i].mValue = *lValue;
            lReadings.push_back(std::move(lWanted[i]));
        }
    }
    return lReadings;
}
