/// The keeper's one thread: waits for ends of processes, messages, signals and time, and tells the rules.
#ifndef SENSOR_KEEPER_INCLUDE_KEEPERLOOP_H
#define SENSOR_KEEPER_INCLUDE_KEEPERLOOP_H

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/keeper/include/HostWorld.h"

/// Blocks SIGTERM, SIGINT and SIGHUP, and returns a descriptor that tells them. Throws ZTCSystemCallEx.
ZTCFileDescriptor openSignals();

/// Runs until a stop is complete. Returns the exit status. Throws ZTCSystemCallEx where waiting itself fails.
int runKeeper(ZTCHostWorld& arWorld, const ZTCFileDescriptor& acrSignals);

#endif
