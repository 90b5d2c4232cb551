/// A named group of thread components.

#ifndef SYSTEM_INCLUDE_THREADPOOL_H
#define SYSTEM_INCLUDE_THREADPOOL_H

#include "common/include/List.h"
#include "common/include/String.h"

/// Filled before the threads start and only read afterwards.
class ZTCThreadPool {
public:
    explicit ZTCThreadPool(const ZTCString& acrName) : mName(acrName) {}

    const ZTCString& getName() const { return mName; }

    /// The slot indices of the pool's thread components.
    ZTCList<unsigned>& getThreadComponents() { return mThreadComponents; }

private:
    const ZTCString mName;
    ZTCList<unsigned> mThreadComponents;
};

#endif
