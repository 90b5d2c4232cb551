/// Touches a heartbeat file, so that another process can see that its owner is alive.
#ifndef TAVIK_INCLUDE_SETHEARTBEAT_H
#define TAVIK_INCLUDE_SETHEARTBEAT_H

#include "common/include/Log.h"
#include "common/include/Pointer.h"
#include "common/include/String.h"

/// Used by one thread.
class ZTCSetHeartbeat {
public:
    explicit ZTCSetHeartbeat(ZTCPointer<ZTCString> aFileName) : mFileName(aFileName) {
        ZT_ENTRY();
        ZT_EXIT();
    }
    virtual ~ZTCSetHeartbeat() = default;

    /// Sets the file's access and modification time to now. Throws ZTCClibUtimeFailedEx.
    void SetHeartbeat();

private:
    ZTCPointer<ZTCString> mFileName;
};

#endif
