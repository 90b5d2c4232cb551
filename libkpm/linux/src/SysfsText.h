/// Reads the texts that the kernel shows below /sys/class and beside its trace buffers. Pure.
#ifndef LIBKPM_LINUX_SRC_SYSFSTEXT_H
#define LIBKPM_LINUX_SRC_SYSFSTEXT_H

#include <compare>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "libkpm/include/libkpm.h"

/// "0x1000020000000001" and a line end: a world wide name. All ones is no name: the transport class shows that until
/// the driver has set it.
std::optional<HBA_wwn> parseSysfsWwn(std::string_view aText);

/// "0x000001" and a line end: an FC id, of 24 bits.
std::optional<std::uint32_t> parseSysfsFcId(std::string_view aText);

/// A decimal number with or without a minus sign.
std::optional<std::int64_t> parseSysfsNumber(std::string_view aText);

/// The state of a link. Unknown is what cannot be told: no text, a text that is no state, and the kernel's own
/// "Unknown".
enum ZTELinuxLink : std::uint8_t { ZTLK_Unknown, ZTLK_Up, ZTLK_Down };

/// A host's port_state: "Online", and "Marginal", which is online with errors, are up, every other state that the
/// transport class has is down.
ZTELinuxLink parseSysfsPortState(std::string_view aText);

/// "host12": 12.
std::optional<std::uint32_t> parseSysfsHostName(std::string_view aName);

/// "rport-12:0-3": host 12, channel 0.
struct ZTSLinuxRportName {
    std::uint32_t mHost = 0;
    std::uint32_t mChannel = 0;
};
std::optional<ZTSLinuxRportName> parseSysfsRportName(std::string_view aName);

/// "12:0:3:5": host, channel, target and LUN, the name of a SCSI device.
struct ZTSLinuxLunName {
    std::uint32_t mHost = 0;
    std::uint32_t mChannel = 0;
    std::uint32_t mTarget = 0;
    std::uint64_t mLun = 0;

    auto operator<=>(const ZTSLinuxLunName&) const = default;
};
std::optional<ZTSLinuxLunName> parseSysfsLunName(std::string_view aName);
std::string formatSysfsLunName(const ZTSLinuxLunName& acrName);

/// The records that a processor's trace buffer has lost, from its `stats` file: those overwritten and those that found
/// no place. Nothing where no such count is in the text, or one is all ones, which is what a kernel shows that does not
/// count.
std::optional<std::uint64_t> parseTraceLosses(std::string_view aText);

#endif
