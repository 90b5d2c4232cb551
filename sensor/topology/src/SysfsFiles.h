/// Names and numbers as sysfs shows them.
#ifndef SENSOR_TOPOLOGY_SRC_SYSFSFILES_H
#define SENSOR_TOPOLOGY_SRC_SYSFSFILES_H

#include <charconv>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

/// The names in a directory, sorted; none where it cannot be read. Those that begin with a full stop are left out.
std::vector<std::string> listDirectory(const std::string& acrPath);

/// A whole text as a number; with "0x" in front always to the base of 16.
template <typename Number>
std::optional<Number> parseAttribute(std::string_view aText, int aBase = 10) {
    if (aText.starts_with("0x")) {
        aText.remove_prefix(2);
        aBase = 16;
    }
    Number lNumber{};
    const auto [lpEnd, lError] = std::from_chars(aText.data(), aText.data() + aText.size(), lNumber, aBase);
    if (lError != std::errc() || lpEnd != aText.data() + aText.size()) {
        return std::nullopt;
    }
    return lNumber;
}

#endif
