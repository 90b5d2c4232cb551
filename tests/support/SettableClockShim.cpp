// Answers for the kernel's time of day (SettableClock.h).
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/time.h>
#include <time.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>
#include <cstdlib>

#include "tests/support/SettableClock.h"

/// Seconds; 0 where there is no file.
static std::int64_t sJump() {
    static std::int64_t* const lpJump = []() -> std::int64_t* {
        const char* const lpPath = std::getenv(gcSettableClockVariable);
        const int lFile = lpPath == nullptr ? -1 : open(lpPath, O_RDWR | O_CLOEXEC);
        if (lFile < 0) {
            return nullptr;
        }
        void* const lpMapped = mmap(nullptr, sizeof(std::int64_t), PROT_READ | PROT_WRITE, MAP_SHARED, lFile, 0);
        close(lFile);
        return lpMapped == MAP_FAILED ? nullptr : static_cast<std::int64_t*>(lpMapped);
    }();
    return lpJump == nullptr ? 0 : std::atomic_ref(*lpJump).load();
}

template <typename Function>
static Function* sReal(const char* apName) {
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, apName));
}

extern "C" int clock_gettime(clockid_t aClock, timespec* apTime) noexcept {
    static auto* const lpReal = sReal<int(clockid_t, timespec*)>("clock_gettime");
    const int lResult = lpReal(aClock, apTime);
    if (lResult == 0 && (aClock == CLOCK_REALTIME || aClock == CLOCK_REALTIME_COARSE)) {
        apTime->tv_sec += sJump();
    }
    return lResult;
}

extern "C" int gettimeofday(timeval* apTime, void* apZone) noexcept {
    static auto* const lpReal = sReal<int(timeval*, void*)>("gettimeofday");
    const int lResult = lpReal(apTime, apZone);
    if (lResult == 0) {
        apTime->tv_sec += sJump();
    }
    return lResult;
}

extern "C" time_t time(time_t* apTime) noexcept {
    timespec lTime{};
    clock_gettime(CLOCK_REALTIME, &lTime);
    if (apTime != nullptr) {
        *apTime = lTime.tv_sec;
    }
    return lTime.tv_sec;
}
