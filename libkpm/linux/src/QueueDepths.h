/// Queue depths of the LUNs behind FC hosts, read from sysfs: a change is delivered with the value before and after it.
///
/// Every regular look begins a sweep over all LUNs. A sweep reads a limited number at a time, so that thousands of LUNs
/// delay nothing else. A LUN that answered queue full is read once more, soon after. The first value of a LUN is not a
/// change. Changes between two readings are delivered as one.
///
/// Used by the library's thread alone.
#ifndef LIBKPM_LINUX_SRC_QUEUEDEPTHS_H
#define LIBKPM_LINUX_SRC_QUEUEDEPTHS_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <vector>

#include "libkpm/linux/src/Delivery.h"
#include "libkpm/linux/src/HostWatcher.h"
#include "libkpm/linux/src/Sysfs.h"
#include "libkpm/linux/src/SysfsText.h"

class ZTCLinuxQueueDepths {
public:
    using Clock = std::chrono::steady_clock;

    /// How many LUNs are read at a time, and how long the pause is before the next ones.
    static constexpr std::size_t scLunsInARound = 64;
    static constexpr std::chrono::milliseconds scPause{20};
    /// How long after a queue full its LUN is read.
    static constexpr std::chrono::milliseconds scSoon{50};

    /// All outlive the object.
    ZTCLinuxQueueDepths(const ZTCSysfs& acrSysfs, ZTCLinuxHostWatcher& arWatcher, const ZTCLinuxDelivery& acrDelivery)
        : mrSysfs(acrSysfs), mrWatcher(arWatcher), mrDelivery(acrDelivery) {}

    /// Begins a sweep, unless one is under way.
    void look(Clock::time_point aNow);

    /// A command of this LUN ended with queue full.
    void noteQueueFull(const ZTSLinuxLunName& acrLun, Clock::time_point aNow);

    /// Reads what is due.
    void serve(Clock::time_point aNow);

    /// When something is due next; nothing where that is not before the next look.
    std::optional<Clock::time_point> getNextTime() const;

private:
    void read(const ZTSLinuxLunName& acrLun);

    const ZTCSysfs& mrSysfs;
    ZTCLinuxHostWatcher& mrWatcher;
    const ZTCLinuxDelivery& mrDelivery;

    std::map<ZTSLinuxLunName, std::uint32_t> mDepths;
    std::vector<ZTSLinuxLunName> mSweep;  // LUNs that the sweep has still to read
    Clock::time_point mNextSlice{};       // when it goes on
    std::map<ZTSLinuxLunName, Clock::time_point> mSoon;
};

#endif
