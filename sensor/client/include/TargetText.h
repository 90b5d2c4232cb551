/// Targets as people write them: one in an argument, or one a line in a file.
#ifndef SENSOR_CLIENT_INCLUDE_TARGETTEXT_H
#define SENSOR_CLIENT_INCLUDE_TARGETTEXT_H

#include <istream>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/client/include/CommandEncoder.h"

/// Largest Fibre Channel address: 24 bits.
inline constexpr std::uint32_t gcMaxFcAddress = 0xFFFFFF;

/// "WWNN,WWPN,FCID": node name, port name and port address, separated by commas or blanks. The address is decimal or
/// 0x-hexadecimal. Throws ZTCBadInputEx that names the part and its value.
ZTSTargetPort parseTarget(std::string_view aText);

/// One target a line; '#' starts a comment, empty lines are skipped. `acrName` names the stream in errors, with the
/// line's number. Throws ZTCBadInputEx, also when the stream fails.
std::vector<ZTSTargetPort> readTargets(std::istream& arStream, const std::string& acrName);

/// An unsigned number of at most `aMax`, decimal or 0x-hexadecimal, nothing around it. `acrWhat` names it in the error.
/// Throws ZTCBadInputEx.
std::uint32_t parseNumber(std::string_view aText, std::uint32_t aMax, const std::string& acrWhat);

#endif
