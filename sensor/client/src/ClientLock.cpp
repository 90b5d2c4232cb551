#include "sensor/client/include/ClientLock.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/ClientErrors.h"

ZTCClientLock::ZTCClientLock(const std::string& acrDirectory) : mPath(acrDirectory + gcSensorLockFileName) {}

bool ZTCClientLock::tryAcquire() {
    if (isHeld()) {
        return true;
    }
    ZTCFileDescriptor lFile = ZTCFileDescriptor::open(mPath.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK, 0600);
    if (!lFile.isOpen()) {
        throw ZTCSystemCallEx("cannot open the lock file " + mPath, errno);
    }
    while (flock(lFile.get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno == EWOULDBLOCK) {
            return false;
        }
        if (errno != EINTR) {
            throw ZTCSystemCallEx("cannot lock " + mPath, errno);
        }
    }
    if (!lFile.isAtPath(mPath.c_str())) {
        return false;  // replaced in between: a lock on a file that nobody else finds is none
    }
    mFile = std::move(lFile);
    return true;
}
