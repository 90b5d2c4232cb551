#include "tavik/include/SetHeartbeat.h"

#include "common/include/Log.h"
#include "os/common/include/Clib.h"

void ZTCSetHeartbeat::SetHeartbeat() {
    ZT_ENTRY();
    ZT_TRACE_MSG("Setting the mod time of %s", mFileName->get());
    ClibUtime(mFileName->get());
    ZT_EXIT();
}
