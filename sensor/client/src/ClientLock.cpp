#include "sensor/client/include/ClientLock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/SensorPidFile.h"

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
    struct stat lStatus {};
    if (fstat(lFile.get(), &lStatus) == 0 && lStatus.st_size != 0 && ftruncate(lFile.get(), 0) != 0) {
        throw ZTCSystemCallEx("cannot empty the lock file " + mPath, errno);  // it names a sensor that was killed
    }
    mFile = std::move(lFile);
    return true;
}

void ZTCClientLock::nameHolder() {
    const std::string lText = std::to_string(getpid()) + "\n";
    if (pwrite(mFile.get(), lText.data(), lText.size(), 0) != static_cast<ssize_t>(lText.size())) {
        throw ZTCSystemCallEx("cannot write the lock file " + mPath, errno);
    }
}

long ZTCClientLock::getNamedHolder() const {
    const ZTCFileDescriptor lFile = ZTCFileDescriptor::open(mPath.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK);
    const long lPid = lFile.isOpen() ? readPid(lFile.get()) : 0;
    return lPid != getpid() && isProcessAlive(lPid) ? lPid : 0;
}

std::string ZTCClientLock::describeHolder() const {
    const long lPid = getNamedHolder();
    return lPid == 0 ? "another client holds " + mPath
                     : "a sensor runs, process " + std::to_string(lPid) + ", and holds " + mPath;
}
