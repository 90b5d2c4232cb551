#include "bench/support/WatchedLock.h"

#include <algorithm>
#include <cstddef>
#include <ctime>

namespace {

constinit thread_local pthread_mutex_t* spWatched = nullptr;
constinit thread_local std::int64_t sSince = 0;

std::vector<std::int64_t>& sHolds() {
    static auto& srHolds = *new std::vector<std::int64_t>();
    return srHolds;
}

/// After an attempt to lock: where it was the watched mutex, and has succeeded, the hold begins.
int sNote(pthread_mutex_t* apMutex, int aResult) {
    if (apMutex == spWatched && aResult == 0) {
        sSince = benchNow();
    }
    return aResult;
}

}  // namespace

ZTCWatchedLock::ZTCWatchedLock(pthread_mutex_t* apMutex) {
    sHolds().clear();
    sHolds().reserve(1 << 20);
    spWatched = apMutex;
}

ZTCWatchedLock::~ZTCWatchedLock() {
    spWatched = nullptr;
}

const std::vector<std::int64_t>& ZTCWatchedLock::holds() {
    return sHolds();
}

std::int64_t benchNow() {
    std::timespec lNow{};
    clock_gettime(CLOCK_MONOTONIC, &lNow);
    return std::int64_t{lNow.tv_sec} * 1000000000 + lNow.tv_nsec;
}

double benchPercentile(std::vector<std::int64_t>& arValues, double aPercent) {
    const auto lIndex = static_cast<std::size_t>(aPercent / 100 * static_cast<double>(arValues.size() - 1));
    std::nth_element(arValues.begin(), arValues.begin() + static_cast<std::ptrdiff_t>(lIndex), arValues.end());
    return static_cast<double>(arValues[lIndex]);
}

extern "C" {
int __real_pthread_mutex_lock(pthread_mutex_t*);
int __real_pthread_mutex_trylock(pthread_mutex_t*);
int __real_pthread_mutex_unlock(pthread_mutex_t*);
int __wrap_pthread_mutex_lock(pthread_mutex_t*);
int __wrap_pthread_mutex_trylock(pthread_mutex_t*);
int __wrap_pthread_mutex_unlock(pthread_mutex_t*);

int __wrap_pthread_mutex_lock(pthread_mutex_t* apMutex) {
    return sNote(apMutex, __real_pthread_mutex_lock(apMutex));
}

int __wrap_pthread_mutex_trylock(pthread_mutex_t* apMutex) {
    return sNote(apMutex, __real_pthread_mutex_trylock(apMutex));
}

int __wrap_pthread_mutex_unlock(pthread_mutex_t* apMutex) {
    if (apMutex == spWatched) {
        sHolds().push_back(benchNow() - sSince);
    }
    return __real_pthread_mutex_unlock(apMutex);
}
}
