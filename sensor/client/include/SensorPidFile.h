/// The sensor's pid file: it names the process that plays the sensor, and its modification time is the sensor's
/// heartbeat.
#ifndef SENSOR_CLIENT_INCLUDE_SENSORPIDFILE_H
#define SENSOR_CLIENT_INCLUDE_SENSORPIDFILE_H

#include <string>

#include "sensor/client/include/FileDescriptor.h"

class ZTCSensorPidFile {
public:
    /// Makes the file or takes over a stale one, holds a flock on it, and writes the own pid. Throws ZTCSensorBusyEx
    /// where another process holds that lock or the file names another process that runs, ZTCSystemCallEx.
    explicit ZTCSensorPidFile(const std::string& acrDirectory);
    /// Removes the file if it is still this one.
    ~ZTCSensorPidFile();
    ZTCSensorPidFile(const ZTCSensorPidFile&) = delete;
    ZTCSensorPidFile& operator=(const ZTCSensorPidFile&) = delete;

    /// Sets the modification time to now; makes the file anew where somebody has removed it. Throws as the constructor
    /// does.
    void touch();

private:
    void take();

    const std::string mPath;
    ZTCFileDescriptor mFile;
};

/// Whether the pid names a process that exists and is no zombie.
bool isProcessAlive(long aPid);

/// The decimal pid above 0 that the file behind the descriptor begins with, or 0.
long readPid(int aDescriptor);

#endif
