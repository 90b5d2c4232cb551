/// The keeper's one thread: waits for processes to end, for messages, signals and points in time, and passes them to
/// the rules.
#ifndef SENSOR_KEEPER_INCLUDE_KEEPERLOOP_H
#define SENSOR_KEEPER_INCLUDE_KEEPERLOOP_H

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/keeper/include/HostWorld.h"

/// Blocks SIGTERM, SIGINT and SIGHUP, and returns a descriptor that reports them. Throws ZTCSystemCallEx.
ZTCFileDescriptor openSignals();

/// Runs until a stop is complete. Returns the exit status. Throws ZTCSystemCallEx where waiting itself fails.
int runKeeper(ZTCHostWorld& arWorld, const ZTCFileDescriptor& acrSignals);

#endif
