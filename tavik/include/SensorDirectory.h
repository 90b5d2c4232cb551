/// The sensor's directory, which holds the two FIFOs and the pid files.
#ifndef TAVIK_INCLUDE_SENSORDIRECTORY_H
#define TAVIK_INCLUDE_SENSORDIRECTORY_H

#include "common/include/String.h"

/// Warns in the log where anybody but the sensor's user can write in the directory: such a user can command the agent.
/// The warning says how to make the directory private. A directory that cannot be examined is left to its later users.
void warnOfSharedDirectory(const ZTCString& acrPath);

#endif
