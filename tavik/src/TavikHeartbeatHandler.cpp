#include "tavik/include/TavikHeartbeatHandler.h"

#include "common/include/Assert.h"
#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "tavik/include/TavikSystem.h"

namespace {

constexpr unsigned int scHeartbeatConditional = 0;
constexpr unsigned int scConditionals[] = {scHeartbeatConditional};
constexpr char scThreadName[] = "TavikHeartbeatThread";

}  // namespace

ZTCTavikHeartbeatHandler::ZTCTavikHeartbeatHandler(ZTCSystemInterface* apSystem, unsigned int aTimeout)
    : ZTCThreadComponent(&TavikHeartbeatThread, ZTCString(scThreadName), apSystem),
      ZTCConditionTimedWaitThreadComponent(&TavikHeartbeatThread, ZTCString(scThreadName), apSystem, scConditionals, 1,
                                           aTimeout) {
    ZT_ENTRY();
    const ZTCPointer<ZTCString> lSensorFile(NEW ZTCString(apSystem->getInstallDir() + ZTCString(gcSensorPidFileName)));
    const ZTCPointer<ZTCString> lOwnFile(NEW ZTCString(apSystem->getPidFilePathStr()));
    mSensorHeartbeat = ZTCPointer<ZTCCheckHeartbeat>(NEW ZTCCheckHeartbeat(lSensorFile, apSystem));
    mOwnHeartbeat = ZTCPointer<ZTCSetHeartbeat>(NEW ZTCSetHeartbeat(lOwnFile));
    ZT_EXIT();
}

void* TavikHeartbeatThread(void* lpArgs) {
    ZT_ENTRY();
    ZT_ASSERT(0 != lpArgs);
    const auto* lpArguments = static_cast<const ZTSThreadArguments*>(lpArgs);
    auto* lpTavikSystem = dynamic_cast<ZTCTavikSystem*>(lpArguments->mpSystemInterface);
    auto* lpHandler = dynamic_cast<ZTCTavikHeartbeatHandler*>(lpArguments->mpThreadComponent);
    if (lpTavikSystem == nullptr || lpHandler == nullptr) {
        ZT_LOG_ALERT("Dynamic cast of base class failed, error. Exiting the thread abnormally.");
        ZT_EXIT();
        return nullptr;
    }

    while (!lpHandler->isSetForExit()) {
        const unsigned int lWaitTime = lpHandler->getWaitTime();
        ZT_TRACE_MSG("Going to wait for %u seconds", lWaitTime);
        try {
            lpTavikSystem->timedWait(scHeartbeatConditional, lWaitTime);
        } catch (const ZTCTimeOutEx&) {  // a period is over
        }
        if (lpHandler->isSetForExit()) {
            // At halt level, so that a normal exit shows with the default log code.
            ZT_LOG_HALT("Exiting Heartbeat Handler Thread as it is marked for exit.");
            break;
        }

        ZT_TRACE_MSG("Updating the status");
        try {
            lpHandler->getOwnHeartbeat()->SetHeartbeat();
        } catch (const ZTCClibUtimeFailedEx&) {
            ZT_LOG_HALT("Failed in updating the status");
            lpTavikSystem->makeThreadsToExit();
            break;
        }

        ZT_TRACE_MSG("Checking the status of Sensor");
        try {
            lpHandler->getSensorHeartbeat()->CheckStatus();
            continue;
        } catch (const ZTCHeartbeatFailedEx&) {
            ZT_LOG_NOTICE("Checking the status of the actual sensor process/service");
        }
        try {
            lpHandler->getSensorHeartbeat()->getProcStatus();
            ZT_LOG_NOTICE("Sensor process still running, but not updating the heartbeat");
        } catch (const ZTCClibGetProcStatusFailedEx&) {
            ZT_LOG_HALT("Failed in getting the status of Sensor");
            lpTavikSystem->getStatusPage().setEnd(ZTSE_SensorGone);
            lpTavikSystem->makeThreadsToExit();
            break;
        }
    }
    ZT_EXIT();
    return nullptr;
}
