/// Where the keeper finds programs, and the files that it makes.
#ifndef SENSOR_KEEPER_INCLUDE_KEEPERPLACES_H
#define SENSOR_KEEPER_INCLUDE_KEEPERPLACES_H

#include <set>
#include <string>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/settings/include/Settings.h"

/// The folder of the program that runs here.
std::string ownFolder();

/// The agent: a path as it stands; a name beside this program, else in ../sbin, else in PATH. Throws ZTCBadInputEx,
/// naming the places, where there is none.
std::string findAgentProgram(const std::string& acrProgram, const std::string& acrOwnFolder);

/// The collector: beside this program, else in ../libexec/tavik. Throws as above.
std::string findCollectorProgram(const std::string& acrOwnFolder);

/// Makes sensor.directory (0755), its agent/ (0700) and sensor.state (0750), with the folders above them (0755),
/// whatever the umask is. Existing ones keep their mode, except agent/, which must be this user's. One thread: the
/// umask is changed meanwhile. Throws ZTCSystemCallEx, ZTCBadInputEx.
void makeDirectories(const ZTSSettings& acrSettings);

/// A listening socket at the path, mode 0660, in place of one that an earlier sensor left. Throws ZTCSystemCallEx.
ZTCFileDescriptor openControlSocket(const std::string& acrPath);

/// A new FIFO at the path, mode 0600, in place of what was there, open for reading without blocking. As large as the
/// system allows, up to 1 MiB. Throws ZTCSystemCallEx.
ZTCFileDescriptor makeResponseFifo(const std::string& acrPath);

/// The names in class/fc_host below the root of sysfs: /sys, or what TAVIK_SYSFS_ROOT names.
std::set<std::string> listHostNames();

/// A file without a name that holds the text. Throws ZTCSystemCallEx.
ZTCFileDescriptor makeTextFile(const std::string& acrText);

#endif
