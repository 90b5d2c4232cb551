/// What is checked of a configuration file before the TOML reader sees it.
#ifndef SENSOR_SETTINGS_SRC_SETTINGSSYNTAX_H
#define SENSOR_SETTINGS_SRC_SETTINGSSYNTAX_H

#include <optional>
#include <string_view>

/// The line, from 1, of the first character beyond ASCII that is neither in a comment nor in quotes; nothing where
/// there is none. TOML allows no such character, apart from a byte order mark at the beginning. The behavior of the
/// TOML reader of Debian 12 (3.3.0) is undefined for most of them.
std::optional<unsigned> findLineWithBareCharacter(std::string_view aText);

#endif
