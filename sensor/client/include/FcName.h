/// A Fibre Channel world wide name as a value, and its text form.
#ifndef SENSOR_CLIENT_INCLUDE_FCNAME_H
#define SENSOR_CLIENT_INCLUDE_FCNAME_H

#include <array>
#include <cstdint>
#include <string>
#include <string_view>

struct ZTSFcName {
    std::array<std::uint8_t, 8> mBytes{};  ///< as on the wire

    bool operator==(const ZTSFcName&) const = default;

    /// Lower-case hex pairs with colons: "50:06:01:60:3b:a0:12:34".
    std::string toText() const;

    /// Reads that form in either case, and also 16 hex digits with or without "0x". Throws ZTCBadInputEx.
    static ZTSFcName fromText(std::string_view aText);
};

#endif
