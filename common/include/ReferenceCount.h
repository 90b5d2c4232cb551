/// The count that the pointers to one object share.

#ifndef COMMON_INCLUDE_REFERENCECOUNT_H
#define COMMON_INCLUDE_REFERENCECOUNT_H

#include <atomic>
#include <cstddef>

/// An atomic count. May be used from any thread.
class ZTCReferenceCount {
public:
    explicit ZTCReferenceCount(std::size_t aInitialCount) noexcept : mCount(aInitialCount) {}
    ZTCReferenceCount(const ZTCReferenceCount&) = delete;
    ZTCReferenceCount& operator=(const ZTCReferenceCount&) = delete;

    /// Adds one.
    void increment() noexcept {
        // Relaxed: the caller already holds a pointer, so the object cannot go away meanwhile.
        mCount.fetch_add(1, std::memory_order_relaxed);
    }

    /// Subtracts one and returns the new count. The caller that gets zero releases the object.
    std::size_t decrement() noexcept {
        // Release: what this thread did to the object comes before its release. Acquire: the last owner sees it.
        return mCount.fetch_sub(1, std::memory_order_acq_rel) - 1;
    }

private:
    std::atomic<std::size_t> mCount;
};

#endif
