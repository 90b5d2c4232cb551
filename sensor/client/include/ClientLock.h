/// The lock that whoever acts as the sensor holds while it talks: a flock that the kernel drops with the process.
#ifndef SENSOR_CLIENT_INCLUDE_CLIENTLOCK_H
#define SENSOR_CLIENT_INCLUDE_CLIENTLOCK_H

#include <string>

#include "sensor/client/include/FileDescriptor.h"

class ZTCClientLock {
public:
    /// @param acrDirectory  the install directory
    explicit ZTCClientLock(const std::string& acrDirectory);

    /// Takes the lock if nobody else holds it. True when it is held, also when it was before. Throws ZTCSystemCallEx
    /// where the lock file cannot be opened or locked.
    bool tryAcquire();
    void release() noexcept { mFile.reset(); }
    bool isHeld() const { return mFile.isOpen(); }
    const std::string& getPath() const { return mPath; }

private:
    std::string mPath;
    ZTCFileDescriptor mFile;
};

#endif
