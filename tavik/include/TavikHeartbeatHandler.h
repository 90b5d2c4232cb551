/// The thread that shows the sensor that the agent is alive, and looks whether the sensor is.
#ifndef TAVIK_INCLUDE_TAVIKHEARTBEATHANDLER_H
#define TAVIK_INCLUDE_TAVIKHEARTBEATHANDLER_H

#include "common/include/Pointer.h"
#include "os/common/include/ConditionTimedWaitThreadComponent.h"
#include "os/common/include/SystemInterface.h"
#include "tavik/include/CheckHeartbeat.h"
#include "tavik/include/SetHeartbeat.h"

/// The thread procedure; takes a ZTSThreadArguments and returns null.
void* TavikHeartbeatThread(void* lpArgs);

class ZTCTavikHeartbeatHandler : public ZTCConditionTimedWaitThreadComponent {
public:
    /// aTimeout: the heartbeat period in seconds. The system's install directory and pid file path are read here.
    ZTCTavikHeartbeatHandler(ZTCSystemInterface* apSystem, unsigned int aTimeout);

    ZTCPointer<ZTCCheckHeartbeat>& getSensorHeartbeat() { return mSensorHeartbeat; }
    ZTCPointer<ZTCSetHeartbeat>& getOwnHeartbeat() { return mOwnHeartbeat; }

private:
    ZTCPointer<ZTCCheckHeartbeat> mSensorHeartbeat;
    ZTCPointer<ZTCSetHeartbeat> mOwnHeartbeat;
};

#endif
