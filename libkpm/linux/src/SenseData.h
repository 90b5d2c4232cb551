/// Sense data on kernels whose trace records have none. The kernel decodes the sense data of a failed command in one
/// function; a probe on that function records them. This header makes the text of the probe and reads its records.
/// Pure: descriptions in, texts and numbers out.
#ifndef LIBKPM_LINUX_SRC_SENSEDATA_H
#define LIBKPM_LINUX_SRC_SENSEDATA_H

#include <compare>
#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "libkpm/linux/src/Btf.h"
#include "libkpm/linux/src/HostBytes.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/TraceFormat.h"

/// The name of the probe's event in its group.
inline constexpr const char* gcSenseEvent = "check_sense";

struct ZTSSenseValues {
    std::uint32_t mSenseKey = gcUnknownSense;
    std::uint32_t mAsc = gcUnknownSense;
    std::uint32_t mAscq = gcUnknownSense;
};

/// Sense key and codes of sense data in fixed (0x70, 0x71) or descriptor format (0x72, 0x73), as SPC has them; all
/// unknown for any other format.
ZTSSenseValues parseSense(ZTCByteSpan aSense);

/// The line that defines the probe as GROUP/check_sense, with the offsets of this kernel. `aArgument` is how the
/// kernel's probes name the first argument of a function. A problem where the description lacks something.
std::variant<std::string, ZTSTraceProblem> makeSenseProbe(const ZTCBtf& acrBtf, const std::string& acrGroup,
                                                          const std::string& acrArgument);

/// The filter for the probe's event: commands of these hosts, which are in ascending order and at least one. "0", which
/// the kernel reads as no filter, where the text would be too long.
std::string makeSenseFilter(const std::vector<std::uint32_t>& acrHosts);

/// Where the fields of the probe's event are in its record.
struct ZTSSenseLayout {
    std::uint32_t mId = 0;
    ZTSTraceFieldPlace mHost;
    ZTSTraceFieldPlace mChannel;
    ZTSTraceFieldPlace mTarget;
    ZTSTraceFieldPlace mLun;
    ZTSTraceFieldPlace mOpcode;
    ZTSTraceFieldPlace mDriverTag;
    ZTSTraceFieldPlace mSchedulerTag;
    ZTSTraceFieldPlace mSense;
};

std::variant<ZTSSenseLayout, ZTSTraceProblem> makeSenseLayout(const ZTSTraceFormat& acrFormat);

struct ZTSSenseRecord {
    ZTSCommandName mCommand;
    ZTSSenseValues mValues;
};

/// Nothing where the record is shorter than its fields.
std::optional<ZTSSenseRecord> parseSenseRecord(ZTCByteSpan aRecord, const ZTSSenseLayout& acrLayout,
                                               std::endian aOrder = std::endian::native);

#endif
