/// What a collector inherits from the keeper that started it: descriptors whose numbers stand in its environment, and
/// the directories that the keeper works on.
#ifndef SENSOR_LINK_INCLUDE_INHERITANCE_H
#define SENSOR_LINK_INCLUDE_INHERITANCE_H

#include <string>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/link/include/Link.h"

/// Its end of the link.
inline constexpr const char* gcLinkVariable = "TAVIK_LINK_FD";
/// The control socket: listening, non-blocking, of the unix stream kind.
inline constexpr const char* gcControlVariable = "TAVIK_CONTROL_FD";
/// A file with the text of the settings that the keeper has checked. The configuration file may have been changed to
/// a bad one since: a collector that is restarted then still works by the good one.
inline constexpr const char* gcSettingsVariable = "TAVIK_SETTINGS_FD";
/// sensor.directory and sensor.state as they were when the keeper started: a reload does not move them.
inline constexpr const char* gcDirectoryVariable = "TAVIK_SENSOR_DIRECTORY";
inline constexpr const char* gcStateVariable = "TAVIK_SENSOR_STATE";

struct ZTSInheritance {
    ZTCLink mLink;
    ZTCFileDescriptor mControl;
    ZTCFileDescriptor mSettings;
    std::string mDirectory;
    std::string mState;
};

/// Takes them all, makes the descriptors close-on-exec and removes the variables from the environment. Throws
/// ZTCBadInputEx, naming the variable, where one is missing or does not name an open descriptor of its kind.
ZTSInheritance takeInheritance();

/// The whole content of a file of which only the descriptor is known; the descriptor's position does not matter and
/// does not change. Throws ZTCSystemCallEx.
std::string readWhole(const ZTCFileDescriptor& acrFile);

#endif
