/// The outcome of one SCSI command as a trace record has it. Pure.
#ifndef LIBKPM_LINUX_SRC_SCSIOUTCOME_H
#define LIBKPM_LINUX_SRC_SCSIOUTCOME_H

#include <bit>
#include <compare>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "libkpm/linux/src/HostBytes.h"
#include "libkpm/linux/src/TraceFormat.h"

/// Status bytes of SCSI (SAM) that are events here.
enum ZTELinuxScsiStatus : std::uint8_t { ZTLSS_CheckCondition = 0x02, ZTLSS_Busy = 0x08, ZTLSS_TaskSetFull = 0x28 };

/// Stands for a sense value that the kernel does not give.
inline constexpr std::uint32_t gcUnknownSense = 0xFFFFFFFFu;

/// Identifies one of the commands that are under way. Tags that the kernel does not give, or that were not read, are
/// 0.
struct ZTSCommandName {
    std::uint32_t mHost = 0;
    std::uint32_t mChannel = 0;
    std::uint32_t mTarget = 0;
    std::uint32_t mLun = 0;
    std::uint8_t mOpcode = 0;
    std::uint32_t mDriverTag = 0;
    std::uint32_t mSchedulerTag = 0;

    auto operator<=>(const ZTSCommandName&) const = default;
};

struct ZTSScsiOutcome : ZTSCommandName {
    std::uint8_t mStatus = 0;
    std::uint32_t mSenseKey = gcUnknownSense;
    std::uint32_t mAsc = gcUnknownSense;
    std::uint32_t mAscq = gcUnknownSense;
};

/// The event number that a record begins with; nothing where it is too short for one.
std::optional<std::uint32_t> getTraceRecordId(ZTCByteSpan aRecord, const ZTSScsiDoneLayout& acrLayout,
                                              std::endian aOrder = std::endian::native);

/// Without the tags, which few need. Nothing where the record is shorter than its fields.
std::optional<ZTSScsiOutcome> parseScsiOutcome(ZTCByteSpan aRecord, const ZTSScsiDoneLayout& acrLayout,
                                               std::endian aOrder = std::endian::native);

/// Reads the command's tags. Where the record does not have both, they stay as they are.
void readCommandTags(ZTCByteSpan aRecord, const ZTSScsiDoneLayout& acrLayout, ZTSCommandName& arCommand,
                     std::endian aOrder = std::endian::native);

/// The filter that the kernel is given for finished commands: those of these hosts (in ascending order) whose status
/// has a bit of one of the three above. A few others pass, which the library drops. Runs of hosts are written as
/// ranges; where the text would still be longer than the kernel takes, or there are no hosts, they are left out.
std::string makeScsiFilter(const std::vector<std::uint32_t>& acrHosts);

/// The part of a filter that passes these hosts, as the kernel writes them in a field of this name.
std::string makeHostFilter(const std::string& acrField, const std::vector<std::uint32_t>& acrHosts);

/// A filter this long or longer is refused by the kernel.
inline constexpr std::size_t gcScsiFilterLimit = 4096;

#endif
