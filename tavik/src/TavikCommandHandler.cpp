#include "tavik/include/TavikCommandHandler.h"

#include "common/include/Assert.h"
#include "common/include/Buffer.h"
#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Pointer.h"
#include "system/include/ProtocolHelper.h"
#include "tavik/include/TavikProtocolHandler.h"
#include "tavik/include/TavikSystem.h"

namespace {

constexpr unsigned int scCommandReader = 0;
constexpr unsigned int scResponseWriter = 0;

void sReadCommand(ZTCTavikSystem* apSystem, ZTCPointer<ZTCBuffer>& arRequest) {
    ZT_ENTRY();
    apSystem->getProtocolHelper()->receive(apSystem->getReader(scCommandReader), arRequest, 0);
    ZT_EXIT();
}

void sProcessCommand(ZTCTavikSystem* apSystem, const ZTCPointer<ZTCBuffer>& acrRequest,
                     ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    apSystem->getProtocolHandler()->process(acrRequest, arResponse);
    ZT_EXIT();
}

void sOutputResponse(ZTCTavikSystem* apSystem, const ZTCPointer<ZTCBuffer>& acrResponse) {
    ZT_ENTRY();
    try {
        apSystem->getProtocolHelper()->send(apSystem->getWriter(scResponseWriter), acrResponse, 0);
    } catch (const ZTCClibWriteFailedEx&) {
        apSystem->getStatusPage().setEnd(ZTSE_SensorGone);
        ZT_EXIT();
        throw;
    }
    ZT_EXIT();
}

void sReadAndProcessCommand(ZTCTavikSystem* apSystem) {
    ZT_ENTRY();
    ZTCPointer<ZTCBuffer> lRequest;
    sReadCommand(apSystem, lRequest);
    ZTCPointer<ZTCBuffer> lResponse;
    try {
        sProcessCommand(apSystem, lRequest, lResponse);
    } catch (const ZTCShutDownEx&) {
        // The sensor gets its answer before the agent begins to exit.
        sOutputResponse(apSystem, lResponse);
        ZT_EXIT();
        throw;
    }
    sOutputResponse(apSystem, lResponse);
    ZT_EXIT();
}

}  // namespace

ZTCTavikCommandHandler::ZTCTavikCommandHandler(ZTCSystemInterface* apSystemInterface, unsigned int aWaitTime)
    : ZTCThreadComponent(&CommandHandlerThreadProcedure, ZTCString("TavikCommandHandler"), apSystemInterface),
      ZTCTimedWaitThreadComponent(&CommandHandlerThreadProcedure, ZTCString("TavikCommandHandler"), apSystemInterface,
                                  aWaitTime) {
    ZT_ENTRY();
    ZT_EXIT();
}

void* CommandHandlerThreadProcedure(void* lpArgs) {
    ZT_ENTRY();
    ZT_ASSERT(0 != lpArgs);
    const auto* lpArguments = static_cast<const ZTSThreadArguments*>(lpArgs);
    auto* lpTavikSystem = dynamic_cast<ZTCTavikSystem*>(lpArguments->mpSystemInterface);
    ZT_ASSERT(0 != lpTavikSystem);
    auto* lCommandHandler = dynamic_cast<ZTCTavikCommandHandler*>(lpArguments->mpThreadComponent);
    ZT_ASSERT(0 != lCommandHandler);

    try {
        while (!lCommandHandler->isSetForExit()) {
            ZT_LOG_INFO("Waiting for control availability...");
            try {
                lpTavikSystem->waitForActivity(scCommandReader, lCommandHandler->getWaitTime());
            } catch (const ZTCTimeOutEx&) {
                lpTavikSystem->showAdapters();
                continue;
            }
            if (lCommandHandler->isSetForExit()) {
                ZT_LOG_INFO("Command handler thread is set for exit ...");
                break;
            }
            sReadAndProcessCommand(lpTavikSystem);
        }
    } catch (const ZTCQuitThreadEx& lrException) {
        ZT_LOG_HALT("Exiting TavikCommandHnadler thread (thread-only): %s", lrException.what());
    } catch (const ZTCHaltEx& lrException) {
        ZT_LOG_HALT("Exiting TavikCommandHandler thread with error : %s", lrException.what());
        lpTavikSystem->makeThreadsToExit();
    } catch (const ZTCException& lrException) {
        ZT_LOG_HALT("Exiting TavikCommandHandler thread with error : %s", lrException.what());
        lpTavikSystem->makeThreadsToExit();
    }
    ZT_EXIT();
    return nullptr;
}
