/// Whether an agent runs in a directory, by its pid file alone: nothing is sent to it.
#ifndef SENSOR_CLIENT_INCLUDE_AGENTSTATE_H
#define SENSOR_CLIENT_INCLUDE_AGENTSTATE_H

#include <string>

enum ZTEAgentPresence {
    ZTAP_None,      ///< no pid file, or one that nobody holds
    ZTAP_Starting,  ///< the pid file is held and still empty
    ZTAP_Running
};

struct ZTSAgentState {
    ZTEAgentPresence mPresence = ZTAP_None;
    long mPid = 0;                    ///< as recorded; 0 = none
    long long mHeartbeatSeconds = 0;  ///< seconds since the epoch at which the pid file was last touched
};

/// The agent holds a flock on its pid file as long as it lives. The lock is only tried where the recorded process
/// exists, or where none has been recorded for a moment, so that a look never gets in the way of a start. Throws
/// ZTCSystemCallEx where the file cannot be read.
ZTSAgentState lookAtAgent(const std::string& acrDirectory);

#endif
