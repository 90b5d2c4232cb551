/// What hangs on the Fibre Channel ports of this host, at one moment: initiators, remote ports, LUNs, disks, multipath
/// devices, mounts.
///
/// Source: the kernel's sysfs (`fc_host`, `fc_remote_ports`, `scsi_device`, `block`), `mountinfo` and `swaps` of
/// procfs. All of it is readable without any privilege. A value that the kernel does not show is absent, never zero or
/// empty.
#ifndef SENSOR_TOPOLOGY_INCLUDE_TOPOLOGY_H
#define SENSOR_TOPOLOGY_INCLUDE_TOPOLOGY_H

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "sensor/client/include/FcName.h"

/// A local port.
struct ZTSTopologyInitiator {
    std::string mHost{};               ///< "host7"
    std::optional<ZTSFcName> mWwpn{};  ///< absent while the driver has not named the port
    std::optional<ZTSFcName> mWwnn{};
    std::optional<std::string> mState{};  ///< the kernel's word: "Online", "Linkdown" ...
    std::optional<std::string> mSpeed{};  ///< "16 Gbit"
    std::optional<std::string> mSymbolicName{};
    std::optional<std::string> mModel{};
    std::optional<std::uint32_t> mFcId{};  ///< absent while the link is down
    std::optional<ZTSFcName> mFabric{};    ///< name of the fabric; many drivers show none while the link is down

    bool operator==(const ZTSTopologyInitiator&) const = default;
};

/// A remote port as one initiator sees it.
struct ZTSTopologyRemotePort {
    std::string mName{};  ///< "rport-7:0-3"
    std::string mHost{};  ///< "host7"
    std::optional<ZTSFcName> mWwpn{};
    std::optional<ZTSFcName> mWwnn{};
    std::optional<std::string> mState{};  ///< "Online", "Blocked", "Not Present" ...
    std::optional<std::string> mRoles{};  ///< "FCP Target"
    std::optional<std::uint32_t> mFcId{};
    std::optional<std::uint32_t> mDevLossSeconds{};

    bool operator==(const ZTSTopologyRemotePort&) const = default;
};

/// One path to a logical unit: a SCSI device behind a remote port.
struct ZTSTopologyPath {
    std::string mAddress{};     ///< "7:0:3:12": host, channel, target, LUN
    std::string mHost{};        ///< "host7"
    std::string mRemotePort{};  ///< "rport-7:0-3"
    std::uint64_t mLun = 0;
    std::optional<std::string> mVendor{};
    std::optional<std::string> mModel{};
    std::optional<std::string> mWwid{};   ///< names the logical unit: the same on all its paths
    std::optional<std::string> mState{};  ///< "running", "blocked", "offline", "transport-offline" ...
    std::optional<std::uint32_t> mQueueDepth{};
    std::optional<std::string> mDisk{};   ///< "sdc"; absent where the device is no disk
    std::vector<std::string> mHolders{};  ///< block devices built on the disk, directly or not: "dm-3", "sdc1" ...

    bool operator==(const ZTSTopologyPath&) const = default;
};

/// A device-mapper device.
struct ZTSTopologyMapping {
    std::string mDevice{};               ///< "dm-3"
    std::optional<std::string> mName{};  ///< "mpatha"
    std::optional<std::string> mUuid{};  ///< "mpath-3600..." for a multipath device
    std::vector<std::string> mSlaves{};  ///< the devices that it is built on: the paths of a multipath device

    bool isMultipath() const { return mUuid && mUuid->starts_with("mpath-"); }
    bool operator==(const ZTSTopologyMapping&) const = default;
};

struct ZTSTopology {
    std::vector<ZTSTopologyInitiator> mInitiators;
    std::vector<ZTSTopologyRemotePort> mRemotePorts;
    std::vector<ZTSTopologyPath> mPaths;
    std::map<std::string, ZTSTopologyMapping> mMappings;      ///< by device
    std::map<std::string, std::vector<std::string>> mMounts;  ///< by block device: mount points; "[swap]"
    std::vector<std::string> mBlocked{};                      ///< files that did not answer: those values are absent

    bool operator==(const ZTSTopology&) const = default;

    const ZTSTopologyInitiator* findInitiator(const std::string& acrHost) const;
    const ZTSTopologyRemotePort* findRemotePort(const std::string& acrName) const;

    /// The multipath device that a path belongs to, or null.
    const ZTSTopologyMapping* findMultipath(const ZTSTopologyPath& acrPath) const;
    /// Where the path's disk, or what is built on it, is mounted. Sorted, each once.
    std::vector<std::string> findMounts(const ZTSTopologyPath& acrPath) const;
};

#endif
