#include "tavik/include/CheckHeartbeat.h"

#include <sys/stat.h>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/Clib.h"
#include "system/include/System.h"

namespace {

constexpr ZTError scHeartbeatFailedCode = ZT_SEGMENTED_ERRCODE(3, 12);

}  // namespace

void ZTCCheckHeartbeat::CheckStatus() {
    ZT_ENTRY();
    struct stat lStatus;
    ClibMemset(&lStatus, 0, sizeof lStatus);
    try {
        ClibStat(mFileName->get(), &lStatus);
    } catch (const ZTCClibStatFailedEx&) {
        ZT_LOG_WARN("Failed in stat on %s file", mFileName->get());
        if (isOutOfRetries()) {
            ZT_THROW(ZTCHeartbeatFailedEx, "", scHeartbeatFailedCode);
        }
        ZT_EXIT();
        return;
    }

    const std::int64_t lTime = lStatus.st_mtime;
    if (mPrevTime == 0) {
        mPrevTime = lTime;
    } else if (mPrevTime != lTime) {
        mPrevTime = lTime;
        mRetriesDone = 0;
    } else if (isOutOfRetries()) {
        ZT_EXIT();
        ZT_LOG_WARN("Modfication time of the %s hasn't changed", mFileName->get());
        throw ZTCHeartbeatFailedEx("", scHeartbeatFailedCode);
    }
    ZT_EXIT();
}

void ZTCCheckHeartbeat::getProcStatus() {
    ZT_ENTRY();
    auto* lpSystem = dynamic_cast<ZTCSystem*>(mpSystemInterface);
    if (lpSystem == nullptr) {
        ZT_THROW(ZTCClibGetProcStatusFailedEx, "The system interface is no system", scHeartbeatFailedCode);
    }
    lpSystem->getProcStatus(ZTCString(*mFileName));
    ZT_EXIT();
}

bool ZTCCheckHeartbeat::isOutOfRetries() {
    ZT_ENTRY();
    const bool lIsOut = ++mRetriesDone >= MAX_HEARTBEAT_RETRIES;
    ZT_EXIT();
    return lIsOut;
}
