/// Which Host headers belong to this server.
#ifndef SENSOR_WEB_SRC_HOSTCHECK_H
#define SENSOR_WEB_SRC_HOSTCHECK_H

#include <string>
#include <string_view>
#include <vector>

/// Whether the header names localhost, 127.0.0.1, [::1] or one of the names given, with any port or none. Names are
/// compared without regard to case.
bool isHostAccepted(std::string_view aHeader, const std::vector<std::string>& acrNames);

#endif
