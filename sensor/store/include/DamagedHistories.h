/// Databases that were damaged and set aside. Nothing in Tavik reads them again.
#ifndef SENSOR_STORE_INCLUDE_DAMAGEDHISTORIES_H
#define SENSOR_STORE_INCLUDE_DAMAGEDHISTORIES_H

#include <optional>
#include <string>
#include <vector>

/// The paths of those that still lie in the directory, by their names and so by their dates. Absent where the directory
/// cannot be read.
std::optional<std::vector<std::string>> listDamagedHistories(const std::string& acrStateDirectory);

#endif
