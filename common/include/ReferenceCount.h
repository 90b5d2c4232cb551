/// The count that the pointers to one object share.

#ifndef COMMON_INCLUDE_REFERENCECOUNT_H
#define COMMON_INCLUDE_REFERENCECOUNT_H

#include <atomic>
#include <cstddef>

/// Where the storage of the counted object comes from.
enum ZTEObjectStorage : unsigned char {
    ZTOS_Apart,   ///< object and count were allocated each by itself
    ZTOS_Joined,  ///< one allocation holds both, the count at its beginning
    ZTOS_Foreign  ///< object and count are parts of something that outlives all pointers to them
};

/// An atomic count. May be used from any thread.
class ZTCReferenceCount {
public:
    explicit ZTCReferenceCount(std::size_t aInitialCount, ZTEObjectStorage aStorage = ZTOS_Apart) noexcept
        : mCount(aInitialCount | std::size_t{aStorage} << gcStorageShift) {}
    ZTCReferenceCount(const ZTCReferenceCount&) = delete;
    ZTCReferenceCount& operator=(const ZTCReferenceCount&) = delete;

    /// Adds one.
    void increment() noexcept {
        // Relaxed: who adds one holds a pointer already, so the object cannot go away meanwhile.
        mCount.fetch_add(1, std::memory_order_relaxed);
    }

    /// Subtracts one and returns the new count. Who gets zero releases the object.
    std::size_t decrement() noexcept {
        // Release: what this thread did to the object comes before its release. Acquire: the one who releases sees it.
        return (mCount.fetch_sub(1, std::memory_order_acq_rel) - 1) & gcCountMask;
    }

    ZTEObjectStorage getStorage() const noexcept {
        // Relaxed: it never changes.
        return static_cast<ZTEObjectStorage>(mCount.load(std::memory_order_relaxed) >> gcStorageShift);
    }

private:
    // The storage stands in the two highest bits, which no count reaches.
    static constexpr unsigned gcStorageShift = 8 * sizeof(std::size_t) - 2;
    static constexpr std::size_t gcCountMask = (std::size_t{1} << gcStorageShift) - 1;

    std::atomic<std::size_t> mCount;
};

#endif
