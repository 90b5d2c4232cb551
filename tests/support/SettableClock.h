/// The time of day as the processes of a test see it. A library that is loaded before all others answers for the kernel
/// (SettableClockShim.cpp); the clocks that only run, and never jump, are left alone.
#ifndef TESTS_SUPPORT_SETTABLECLOCK_H
#define TESTS_SUPPORT_SETTABLECLOCK_H

#include <chrono>
#include <map>
#include <string>

/// Environment variable with the path of the file that holds the jump: seconds, 8 bytes.
inline constexpr const char* gcSettableClockVariable = "ZT_SETTABLE_CLOCK";

class ZTCSettableClock {
public:
    /// @param acrPath  where the file is made
    explicit ZTCSettableClock(const std::string& acrPath);
    ~ZTCSettableClock();
    ZTCSettableClock(const ZTCSettableClock&) = delete;
    ZTCSettableClock& operator=(const ZTCSettableClock&) = delete;

    /// What a process needs in its environment.
    std::map<std::string, std::string> getEnvironment() const;
    /// From now on the clock is so far ahead of the real one; also back again, and behind.
    void setAhead(std::chrono::seconds aTime);

private:
    std::string mPath;
    void* mpMapped = nullptr;
};

#endif
