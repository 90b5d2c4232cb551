/// The settings as a list of keys and values, for people: `tavik report` puts them into its archive.
#ifndef SENSOR_SETTINGS_INCLUDE_SETTINGSLIST_H
#define SENSOR_SETTINGS_INCLUDE_SETTINGSLIST_H

#include <string>
#include <vector>

#include "sensor/settings/include/Settings.h"

/// "KEY = VALUE", a line each, in the order of the table; then the names and the [[warn]] tables. Of a hook only the
/// program is named: its arguments may hold a secret.
std::string listSettings(const ZTSSettings& acrSettings);

/// What must not leave this host: the arguments of all hooks that are long enough to be a secret.
std::vector<std::string> listSecrets(const ZTSSettings& acrSettings);

#endif
