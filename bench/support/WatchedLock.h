/// How long a thread holds one lock: what is linked with this locks and unlocks through it.
#ifndef BENCH_SUPPORT_WATCHEDLOCK_H
#define BENCH_SUPPORT_WATCHEDLOCK_H

#include <pthread.h>

#include <cstdint>
#include <vector>

/// While it lives, the holds of this mutex by this thread are noted. One object a thread at a time.
class ZTCWatchedLock {
public:
    explicit ZTCWatchedLock(pthread_mutex_t* apMutex);
    ~ZTCWatchedLock();
    ZTCWatchedLock(const ZTCWatchedLock&) = delete;
    ZTCWatchedLock& operator=(const ZTCWatchedLock&) = delete;

    /// Nanoseconds of each hold so far, in their order.
    static const std::vector<std::int64_t>& holds();
};

/// Nanoseconds of the monotonic clock.
std::int64_t benchNow();

/// The value below which so many of a hundred lie. The values are sorted by it; there is at least one.
double benchPercentile(std::vector<std::int64_t>& arValues, double aPercent);

#endif
