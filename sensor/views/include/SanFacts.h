/// The host's storage as a topology shows it: each logical unit with its paths, and the troubles.
///
/// Pure: it reads topologies, and nothing of this host. A value that is not known makes no trouble.
#ifndef SENSOR_VIEWS_INCLUDE_SANFACTS_H
#define SENSOR_VIEWS_INCLUDE_SANFACTS_H

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/include/TopologyHistory.h"
#include "sensor/topology/include/Topology.h"

enum ZTEPathHealth : std::uint8_t {
    ZTPH_Running,
    ZTPH_Unknown,  ///< the kernel did not say
    ZTPH_Down      ///< the device, its remote port or its initiator carries no I/O
};

/// A path of a logical unit.
struct ZTSSanPath {
    std::string mAddress{};  ///< "7:0:3:12"
    ZTSInitiator mInitiator{};
    std::string mRemotePortName{};               ///< "rport-7:0-3"
    std::optional<ZTSRemotePort> mRemotePort{};  ///< absent: its WWPN is not known
    std::uint64_t mLun = 0;
    std::optional<std::string> mDisk{};
    std::optional<std::uint32_t> mQueueDepth{};
    std::optional<std::string> mState{};  ///< of the SCSI device, in the kernel's word
    std::optional<std::string> mRemotePortState{};
    std::optional<std::string> mInitiatorState{};
    ZTEPathHealth mHealth = ZTPH_Unknown;
};

enum ZTERedundancy : std::uint8_t {
    ZTRD_Whole,    ///< every path that there was runs. Also a unit that never had more than one
    ZTRD_Unknown,  ///< paths are missing, but the state of some is not known
    ZTRD_Reduced,  ///< fewer paths run than there were
    ZTRD_Lost,     ///< one path, initiator or remote port is left where there were more
    ZTRD_None,     ///< no path runs
    ZTRD_Count
};

/// "whole", "unknown", "reduced", "lost", "none".
const char* getRedundancyName(ZTERedundancy aRedundancy);

/// A logical unit: what has one wwid. A path without a wwid is a unit of its own.
struct ZTSSanLun {
    std::string mId;  ///< the wwid, else the path's address
    std::optional<std::string> mWwid;
    std::optional<std::string> mVendor;
    std::optional<std::string> mModel;
    std::optional<std::string> mMultipath;        ///< "mpatha"
    std::optional<std::string> mMultipathDevice;  ///< "dm-3"
    std::vector<std::string> mMounts;
    std::vector<ZTSSanPath> mPaths;  ///< of a unit that is gone: its last known ones, all down
    bool mIsGone = false;            ///< the kernel has no path of it left, and its ports went away with it
    std::size_t mRunning = 0;
    std::size_t mExpected = 0;  ///< most paths that it had, as far as that is known
    ZTERedundancy mRedundancy = ZTRD_Whole;
};

/// What a trouble is to a monitoring system.
enum ZTESanSeverity : std::uint8_t {
    ZTSS_Notice,    ///< worth a look; nothing has become worse
    ZTSS_Warning,   ///< I/O goes on, with less in reserve
    ZTSS_Critical,  ///< a logical unit cannot be reached
    ZTSS_Count
};

/// "notice", "warning" or "critical".
const char* getSanSeverityName(ZTESanSeverity aSeverity);

/// The troubles that are looked for, the worst first.
enum ZTESanTrouble : std::uint8_t {
    ZTST_LunWithoutPath,
    ZTST_RedundancyLost,
    ZTST_LinkDown,
    ZTST_PathLost,  ///< a remote port is not Online
    ZTST_RedundancyReduced,
    ZTST_InitiatorWithoutPath,
    ZTST_Flapping,     ///< a link or a remote port goes and comes
    ZTST_UselessPort,  ///< an Online target port that contributes no path
    ZTST_Count
};

struct ZTSSanTrouble {
    ZTESanTrouble mKind = ZTST_Count;
    ZTESanSeverity mSeverity = ZTSS_Notice;
    std::vector<ZTSInitiator> mInitiators{};
    std::vector<ZTSRemotePort> mRemotePorts{};
    std::string mState{};                     ///< of the link or the remote port; empty: several, or not known
    std::optional<ZTCHistoryTime> mSince{};   ///< when that state began
    std::vector<std::size_t> mLuns{};         ///< concerned, by their place in the facts
    std::size_t mChanges = 0;                 ///< of ZTST_Flapping: changes of state in the last hour
    std::optional<std::uint64_t> mEpisode{};  ///< the number of an episode that shows it best
    std::size_t mOtherPorts = 0;  ///< of ZTST_PathLost from one initiator: its target ports that are Online still
};

/// What is known of earlier. Without it only what the kernel still shows is expected.
struct ZTSSanPast {
    std::vector<ZTSTopology> mEarlier{};            ///< in any order
    std::map<std::string, ZTSLunWays> mMostWays{};  ///< that led to a unit, by its wwid

    struct States {
        std::optional<ZTCHistoryTime> mSince{};  ///< when the state that it has now began
        std::size_t mChanges = 0;                ///< in the last hour
    };
    std::map<std::string, States> mStates{};  ///< by "host7" or "rport-7:0-3"
};

/// So many changes of state in an hour are flapping: it went away and came back twice.
inline constexpr std::size_t gcFlappingChanges = 4;

struct ZTSSanFacts {
    std::vector<ZTSSanLun> mLuns;          ///< by id
    std::vector<ZTSSanTrouble> mTroubles;  ///< the worst severity first, then by kind
    std::size_t mBlocked = 0;              ///< files of the kernel that did not answer

    std::size_t countLuns(ZTERedundancy aRedundancy) const;
    /// The worst of the troubles; absent: there is none.
    std::optional<ZTESanSeverity> getWorst() const;
};

/// The ports of a topology as the history names them. Absent for a remote port without a WWPN.
ZTSInitiator toInitiator(const ZTSTopologyInitiator& acrPort);
std::optional<ZTSRemotePort> toRemotePort(const ZTSTopologyRemotePort& acrPort);

ZTSSanFacts findSanFacts(const ZTSTopology& acrNow, const ZTSSanPast& acrPast = {});

#endif
