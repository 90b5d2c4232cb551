/// Where an episode happened, in the names that host, ports and disks had at its time.
#ifndef SENSOR_VIEWS_INCLUDE_EPISODEPLACE_H
#define SENSOR_VIEWS_INCLUDE_EPISODEPLACE_H

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"

/// Devices that one episode names at most.
inline constexpr std::size_t gcMostPlaceDevices = 1024;

/// What stood behind one LUN of the remote port. What is not known is absent.
struct ZTSPlaceDevice {
    std::uint64_t mLun = 0;
    std::string mAddress;  ///< "7:0:3:12"
    std::optional<std::string> mVendor;
    std::optional<std::string> mModel;
    std::optional<std::string> mWwid;
    std::optional<std::string> mDisk;       ///< "sdc"
    std::optional<std::string> mMultipath;  ///< "mpatha"
    std::vector<std::string> mMounts;       ///< of the disk and of what is built on it

    bool operator==(const ZTSPlaceDevice&) const = default;
};

/// What the topology of then adds to an episode or a record. Without a topology it holds what the history has anyway.
struct ZTSPlace {
    ZTSInitiator mInitiator;
    std::optional<ZTSRemotePort> mRemotePort;
    std::optional<std::string> mRport;  ///< the kernel's name of the remote port: "rport-7:0-3"
    /// Those of the episode's LUNs, rising by LUN; for "all" those of every LUN.
    std::vector<ZTSPlaceDevice> mDevices;
    /// rscn of an area or a domain: the remote ports within it that the initiator knew. Absent: no such page, or not
    /// known.
    std::optional<std::vector<ZTSRemotePort>> mAffected;
};

/// By the topology at the episode's first event.
ZTSPlace findPlace(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames);
/// The same for initiator and remote port alone.
ZTSPlace findPlace(const ZTSInitiator& acrInitiator, const std::optional<ZTSRemotePort>& acrPort, ZTCHistoryTime aTime,
                   const ZTCNameBook& acrNames);

/// A remote port as the host sees it now.
struct ZTSPortView {
    /// The kernel's word; several, with commas, where initiators see it in different states. Empty: not known.
    std::string mState;
    std::vector<ZTSInitiator> mInitiators;       ///< that reported events of it, or see it
    std::vector<ZTSTopologyRemotePort> mRports;  ///< one for each initiator that sees it
};
ZTSPortView findPortView(const ZTSPortSummary& acrPort, const ZTCNameBook& acrNames);

/// "mpatha (/srv/data), sdd": the devices for one line. Empty: none.
std::string formatDevices(const std::vector<ZTSPlaceDevice>& acrDevices);

/// The counters of the same ports that rose in the minutes of the episode, each summed up: those of its initiator, and
/// of its remote port as that initiator sees it. `mMinute` is the first minute in which it rose. As many as the names
/// know counters.
std::vector<ZTSCounterSample> countersBeside(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames);

/// The counters of a remote port that rose in the last 24 hours, each summed up over the initiators that see it.
std::vector<ZTSCounterSample> countersOf(const ZTSRemotePort& acrPort, const ZTCNameBook& acrNames,
                                         ZTCHistoryTime aNow);

/// "invalid_crc_count +7, port's fpin_cn +2" for one line. Empty: none rose.
std::string formatCounters(const std::vector<ZTSCounterSample>& acrCounters);

#endif
