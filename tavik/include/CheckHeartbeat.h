/// Watches another process's heartbeat file.
#ifndef TAVIK_INCLUDE_CHECKHEARTBEAT_H
#define TAVIK_INCLUDE_CHECKHEARTBEAT_H

#include <cstdint>

#include "common/include/Log.h"
#include "common/include/Pointer.h"
#include "common/include/String.h"
#include "os/common/include/SystemInterface.h"

/// After this many looks without progress the other process is suspect.
inline constexpr unsigned int MAX_HEARTBEAT_RETRIES = 2;

/// Used by one thread.
class ZTCCheckHeartbeat {
public:
    /// aFileName is the other's heartbeat file and also its pid file. The system is not owned.
    ZTCCheckHeartbeat(ZTCPointer<ZTCString> aFileName, ZTCSystemInterface* apSystem)
        : mFileName(aFileName), mpSystemInterface(apSystem), mPrevTime(0), mRetriesDone(0) {
        ZT_ENTRY();
        ZT_EXIT();
    }
    virtual ~ZTCCheckHeartbeat() = default;

    /// Looks at the file. Without progress means that it cannot be read, or that its time has not changed. The first
    /// look never fails. The second in a row without progress throws ZTCHeartbeatFailedEx, and so does every further
    /// one until the time changes. A time of 0 counts as not seen yet.
    void CheckStatus();

    /// Returns where the process named by the file runs, throws ZTCClibGetProcStatusFailedEx where it does not.
    void getProcStatus();

private:
    /// Counts a look without progress; true where that makes the other suspect.
    bool isOutOfRetries();

    ZTCPointer<ZTCString> mFileName;
    ZTCSystemInterface* mpSystemInterface;
    std::int64_t mPrevTime;
    std::uint32_t mRetriesDone;
    ZTCPointer<ZTCString> mServiceName;
};

#endif
