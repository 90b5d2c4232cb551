/// What hung on this host's Fibre Channel ports at a time, what changed, and how the ports' error counters moved.
///
/// The store keeps intervals: a thing with its attributes, from the scan that first saw it so to the first scan that
/// saw it otherwise. A value that is not known is absent, never zero or empty.
#ifndef SENSOR_STORE_INCLUDE_TOPOLOGYHISTORY_H
#define SENSOR_STORE_INCLUDE_TOPOLOGYHISTORY_H

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

#include "sensor/client/include/FcName.h"
#include "sensor/topology/include/Topology.h"

/// A kind of thing. The numbers are those in the database.
enum ZTETopologyThing : std::uint8_t {
    ZTTT_Initiator = 0,   ///< key: the host, "host7"
    ZTTT_RemotePort = 1,  ///< key: name and WWPN, "rport-7:0-3 50:06:…"; the name alone while it has no WWPN
    ZTTT_Path = 2,        ///< key: the SCSI device, "7:0:3:12"
    ZTTT_Mapping = 3,     ///< key: the device-mapper device, "dm-3"
    ZTTT_Mount = 4,       ///< key: the block device that is mounted, "dm-4"
    ZTTT_Count
};

/// "initiator", "remote-port", "path", "mapping", "mount".
const char* getTopologyThingName(ZTETopologyThing aThing);

/// A topology as it was at a time.
struct ZTSStoredTopology {
    ZTSTopology mTopology;      ///< everything sorted as a scan sorts it
    std::int64_t mScanned = 0;  ///< the last scan by then: microseconds since the epoch
    bool mIsStale = false;      ///< files blocked (mTopology.mBlocked): their values are the last ones that were read
};

/// Something that became different between two scans.
struct ZTSTopologyChange {
    std::int64_t mTime = 0;  ///< of the scan that saw it: microseconds since the epoch
    ZTETopologyThing mThing = ZTTT_Initiator;
    std::string mKey;
    /// Empty: the whole thing appeared (no `mBefore`, an empty `mAfter`) or vanished (the other way round). Otherwise
    /// the attribute's name, as docs/history.md lists them: "state", "wwid", "queueDepth" ...
    std::string mAttribute;
    std::optional<std::string> mBefore;  ///< absent: it was not known. Lists have ", " between their members
    std::optional<std::string> mAfter;

    bool operator==(const ZTSTopologyChange&) const = default;
};

/// How many ways led to a logical unit.
struct ZTSLunWays {
    std::size_t mPaths = 0;
    std::size_t mInitiators = 0;
    std::size_t mRemotePorts = 0;

    void raise(const ZTSLunWays& acrOther) {
        mPaths = std::max(mPaths, acrOther.mPaths);
        mInitiators = std::max(mInitiators, acrOther.mInitiators);
        mRemotePorts = std::max(mRemotePorts, acrOther.mRemotePorts);
    }
    bool operator==(const ZTSLunWays&) const = default;
};

/// The mark from which on redundancy is measured anew: the paths at its time are the wanted ones.
inline constexpr const char* gcBaselineMark = "baseline";

/// How far one counter of a port rose within one minute.
struct ZTSCounterSample {
    std::int64_t mMinute = 0;  ///< begin of the minute: microseconds since the epoch
    ZTSFcName mInitiator;
    std::optional<ZTSFcName> mRemotePort;  ///< absent: a counter of the initiator itself
    std::string mCounter;                  ///< the kernel's file name: "invalid_crc_count"
    std::uint64_t mDifference = 0;         ///< never 0

    bool operator==(const ZTSCounterSample&) const = default;
};

#endif
