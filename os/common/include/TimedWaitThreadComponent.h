/// A thread component whose waits are bounded by a time.

#ifndef OS_COMMON_INCLUDE_TIMEDWAITTHREADCOMPONENT_H
#define OS_COMMON_INCLUDE_TIMEDWAITTHREADCOMPONENT_H

#include "common/include/Types.h"
#include "os/common/include/ThreadComponent.h"

class ZTCTimedWaitThreadComponent : public virtual ZTCThreadComponent {
public:
    ZTCTimedWaitThreadComponent(ZTThreadProcedure apProcedure, const ZTCString& acrName,
                                ZTCSystemInterface* apSystemInterface, unsigned aWaitTimeSeconds)
        : ZTCThreadComponent(apProcedure, acrName, apSystemInterface), mWaitTime(aWaitTimeSeconds) {}

    void finish() override {}

    /// The longest time of one wait, in seconds.
    unsigned getWaitTime() const { return mWaitTime; }

private:
    const Size mWaitTime;
};

#endif
