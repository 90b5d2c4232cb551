/// How much happened within the last stretch of time. Coarse where the stretch is long: at most 256 numbers are kept.
#ifndef SENSOR_WARNINGS_INCLUDE_WARNWINDOW_H
#define SENSOR_WARNINGS_INCLUDE_WARNWINDOW_H

#include <chrono>
#include <cstdint>
#include <deque>

#include "sensor/store/include/HistoryTime.h"

class ZTCWarnWindow {
public:
    explicit ZTCWarnWindow(std::chrono::milliseconds aWithin);

    void add(ZTCHistoryTime aTime, std::uint64_t aCount);
    /// What lies within the stretch that ends now. What seems to come from the future is taken to be of now: the clock
    /// was set back.
    std::uint64_t count(ZTCHistoryTime aNow);
    /// The time of the oldest that counts; only where something does.
    ZTCHistoryTime getFirst() const { return mSlots.front().mFirst; }

private:
    struct ZTSSlot {
        ZTCHistoryTime mFirst;
        ZTCHistoryTime mLast;
        std::uint64_t mCount = 0;
    };

    std::chrono::microseconds mWithin;
    std::chrono::microseconds mSlotLength;
    std::deque<ZTSSlot> mSlots;
};

#endif
