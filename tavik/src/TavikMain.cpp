#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "common/include/String.h"
#include "system/include/SystemGlobals.h"
#include "tavik/include/TavikSystem.h"

namespace {

constexpr char scLogFile[] = "qrv-tvk.log";

}  // namespace

int main(int argc, char** argv) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Starting the Tavik");
    setLogFilePath(scLogFile);
    try {
        {
            const ZTCString lName(gcTavikName);
            // Out of memory hands null on; the driver refuses it.
            setSystemObject(NEW ZTCTavikSystem(lName));
        }
        SystemMain(argc, argv);
        ZT_LOG_HALT("Tavik System exiting");
    } catch (const ZTCExitConditionEx&) {
        ZT_LOG_INFO("Exit condition");
    } catch (const ZTCException& lrException) {
        ZT_LOG_INFO("Failed with error - %s, exiting abruptly", lrException.what());
    }
    ZT_EXIT();
    return 0;
}
