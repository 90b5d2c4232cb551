#include "sensor/client/include/AgentState.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/FileDescriptor.h"
#include "sensor/client/include/SensorPidFile.h"

/// A start opens the file, locks it and empties it at once: longer than this none stands between those steps.
static constexpr int scStartMilliseconds = 200;

ZTSAgentState lookAtAgent(const std::string& acrDirectory) {
    const std::string lPath = acrDirectory + gcAgentPidFileName;
    ZTSAgentState lState;
    const ZTCFileDescriptor lFile =
        ZTCFileDescriptor::open(lPath.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_NOFOLLOW);
    if (!lFile.isOpen()) {
        if (errno == ENOENT) {
            return lState;
        }
        throw ZTCSystemCallEx("cannot open the agent's pid file " + lPath, errno);
    }
    lState.mPid = readPid(lFile.get());
    if (lState.mPid == 0) {
        poll(nullptr, 0, scStartMilliseconds);
        lState.mPid = readPid(lFile.get());
    }
    if (lState.mPid != 0 && !isProcessAlive(lState.mPid)) {
        return lState;
    }
    struct stat lStatus {};
    if (fstat(lFile.get(), &lStatus) != 0) {
        throw ZTCSystemCallEx("cannot look at the agent's pid file " + lPath, errno);
    }
    lState.mHeartbeatSeconds = lStatus.st_mtime;
    if (flock(lFile.get(), LOCK_SH | LOCK_NB) == 0) {
        return lState;
    }
    if (errno != EWOULDBLOCK) {
        throw ZTCSystemCallEx("cannot test the lock of " + lPath, errno);
    }
    lState.mPresence = lState.mPid == 0 ? ZTAP_Starting : ZTAP_Running;
    return lState;
}
