/// The lock of the program that talks to the agent as its sensor: a flock, which the kernel drops when the process
/// ends.
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

    /// Writes the own pid into the lock that is held. A sensor does that, which holds it as long as it runs; a client
    /// that talks for a moment does not. Throws ZTCSystemCallEx.
    void nameHolder();
    /// The pid in the lock file, if another process of that pid runs. Otherwise 0: only a client holds the lock, or
    /// nobody. To be called after tryAcquire() has returned false.
    long getNamedHolder() const;
    /// One line about who holds the lock.
    std::string describeHolder() const;

    bool isHeld() const { return mFile.isOpen(); }
    const std::string& getPath() const { return mPath; }

private:
    std::string mPath;
    ZTCFileDescriptor mFile;
};

#endif
