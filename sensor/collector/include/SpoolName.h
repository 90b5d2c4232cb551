/// Names of the files in the spool folder: "NUMBER.GENERATION.STATE".
///
/// NUMBER is decimal and rises for ever. GENERATION is the id of the agent's start, as lower-case hex digits. STATE
/// says what the file is, so that a look at the folder explains it.
#ifndef SENSOR_COLLECTOR_INCLUDE_SPOOLNAME_H
#define SENSOR_COLLECTOR_INCLUDE_SPOOLNAME_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

enum ZTESpoolState : std::uint8_t {
    ZTSPS_Part,   ///< "part": a response that is arriving, or the place for the one that was asked for
    ZTSPS_Frame,  ///< "frame": one whole response
    ZTSPS_Torn    ///< "torn": the beginning of a response whose rest will never come
};

/// Longest text of a generation.
inline constexpr std::size_t gcMaxGenerationDigits = 64;

struct ZTSSpoolName {
    std::uint64_t mNumber = 0;
    std::string mGeneration;
    ZTESpoolState mState = ZTSPS_Part;

    bool operator==(const ZTSSpoolName&) const = default;

    std::string toText() const;
    /// The same response in another state.
    ZTSSpoolName withState(ZTESpoolState aState) const;
};

/// Reads what toText() writes and nothing else: no sign, no leading zeros, no upper case. Empty for other names.
std::optional<ZTSSpoolName> parseSpoolName(std::string_view aText);

#endif
