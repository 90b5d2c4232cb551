/// Notifies the service manager, where there is one: the protocol of NOTIFY_SOCKET.
#ifndef SENSOR_KEEPER_INCLUDE_SERVICEMANAGER_H
#define SENSOR_KEEPER_INCLUDE_SERVICEMANAGER_H

#include <string>

#include "sensor/client/include/FileDescriptor.h"

class ZTCServiceManager {
public:
    /// Reads NOTIFY_SOCKET, WATCHDOG_USEC and WATCHDOG_PID. Without the first, or with one that cannot be used,
    /// notify() does nothing.
    ZTCServiceManager();

    /// Sends one or several assignments, separated by line breaks. Never waits: one that does not get through is lost.
    /// "WATCHDOG=1" goes out only where the service manager wants it of this process.
    void notify(const std::string& acrAssignments);

private:
    std::string mPath;  ///< empty: none; one of the abstract kind begins with a null byte
    ZTCFileDescriptor mSocket;
    bool mHasWatchdog = false;
};

#endif
