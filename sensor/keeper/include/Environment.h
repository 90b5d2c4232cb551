/// The environment that agent and collector inherit.
#ifndef SENSOR_KEEPER_INCLUDE_ENVIRONMENT_H
#define SENSOR_KEEPER_INCLUDE_ENVIRONMENT_H

#include <map>
#include <string>
#include <vector>

/// This process's environment, less what the service manager adds for one process of a service, and with these
/// variables set. As "NAME=VALUE".
std::vector<std::string> makeChildEnvironment(const std::map<std::string, std::string>& acrMore);

#endif
