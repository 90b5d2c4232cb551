/// An open file descriptor that is closed with its owner.

#ifndef OS_COMMON_INCLUDE_DESCRIPTOR_H
#define OS_COMMON_INCLUDE_DESCRIPTOR_H

#include <utility>

#include "os/common/include/Clib.h"

/// Owns a descriptor, or none where it is negative. Belongs to one thread's stack.
class ZTCDescriptor {
public:
    explicit ZTCDescriptor(int aDescriptor) noexcept : mDescriptor(aDescriptor) {}
    ~ZTCDescriptor() { ClibClose(mDescriptor); }
    ZTCDescriptor(const ZTCDescriptor&) = delete;
    ZTCDescriptor& operator=(const ZTCDescriptor&) = delete;

    int get() const noexcept { return mDescriptor; }

    /// Gives the descriptor to the caller, who has to close it.
    int release() noexcept { return std::exchange(mDescriptor, -1); }

private:
    int mDescriptor;
};

#endif
