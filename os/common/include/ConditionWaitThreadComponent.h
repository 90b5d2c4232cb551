/// A thread component that waits on conditionals of the system.

#ifndef OS_COMMON_INCLUDE_CONDITIONWAITTHREADCOMPONENT_H
#define OS_COMMON_INCLUDE_CONDITIONWAITTHREADCOMPONENT_H

#include "common/include/Vector.h"
#include "os/common/include/ThreadComponent.h"

class ZTCConditionWaitThreadComponent : public virtual ZTCThreadComponent {
public:
    /// apConditionals points to aNumberOfConditionals slot indices, which are copied.
    ZTCConditionWaitThreadComponent(ZTThreadProcedure apProcedure, const ZTCString& acrName,
                                    ZTCSystemInterface* apSystemInterface, const unsigned* apConditionals,
                                    unsigned aNumberOfConditionals)
        : ZTCThreadComponent(apProcedure, acrName, apSystemInterface), mConditionals(aNumberOfConditionals) {
        for (unsigned lIndex = 0; lIndex < aNumberOfConditionals; ++lIndex) {
            mConditionals.add(apConditionals[lIndex]);
        }
    }

    void finish() override {}

    unsigned getNumberOfConditionals() const { return mConditionals.numberOfElements(); }

    /// The slot index of the component's own conditional aIndex. Throws ZTCInvalidEx past the last one.
    unsigned getConditional(unsigned aIndex) { return mConditionals.get(aIndex); }

private:
    ZTCVector<unsigned> mConditionals;
};

#endif
