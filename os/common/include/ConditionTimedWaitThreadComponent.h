/// A thread component that waits on conditionals of the system, each wait bounded by a time.

#ifndef OS_COMMON_INCLUDE_CONDITIONTIMEDWAITTHREADCOMPONENT_H
#define OS_COMMON_INCLUDE_CONDITIONTIMEDWAITTHREADCOMPONENT_H

#include "os/common/include/ConditionWaitThreadComponent.h"
#include "os/common/include/TimedWaitThreadComponent.h"

class ZTCConditionTimedWaitThreadComponent : public ZTCConditionWaitThreadComponent,
                                             public ZTCTimedWaitThreadComponent {
public:
    ZTCConditionTimedWaitThreadComponent(ZTThreadProcedure apProcedure, const ZTCString& acrName,
                                         ZTCSystemInterface* apSystemInterface, const unsigned* apConditionals,
                                         unsigned aNumberOfConditionals, unsigned aWaitTimeSeconds)
        : ZTCThreadComponent(apProcedure, acrName, apSystemInterface),
          ZTCConditionWaitThreadComponent(apProcedure, acrName, apSystemInterface, apConditionals,
                                          aNumberOfConditionals),
          ZTCTimedWaitThreadComponent(apProcedure, acrName, apSystemInterface, aWaitTimeSeconds) {}

    void finish() override {}
};

#endif
