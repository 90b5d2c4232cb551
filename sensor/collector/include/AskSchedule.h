/// When the collector looks at the status page, and when it asks. Pure: the caller gives the time.
///
/// A *look* reads the page. A look asks where the page shows that something is held. Looks come every period. A bell
/// makes the next look due at once, and until a look finds nothing held they come at least every second.
#ifndef SENSOR_COLLECTOR_INCLUDE_ASKSCHEDULE_H
#define SENSOR_COLLECTOR_INCLUDE_ASKSCHEDULE_H

#include <chrono>
#include <optional>

class ZTCAskSchedule {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;

    /// @param aPeriod  between looks when little comes
    ZTCAskSchedule(std::chrono::milliseconds aPeriod, ZTCTime aNow) : mPeriod(aPeriod), mNextLook(aNow) {}

    /// Takes effect with the next look.
    void setPeriod(std::chrono::milliseconds aPeriod) { mPeriod = aPeriod; }

    /// An agent that has not been asked yet: the next look is due at once, and asks whatever the page shows.
    void noteStart(ZTCTime aNow);
    void noteBell(ZTCTime aNow);
    /// The answer has come, whole.
    void noteAnswer(ZTCTime aNow);
    /// The look wanted to ask and could not: it is due again soon.
    void notePostponed(ZTCTime aNow);

    ZTCTime getNextLook() const { return mNextLook; }
    bool isDue(ZTCTime aNow) const { return aNow >= mNextLook; }
    bool isUrgent() const { return mIsUrgent; }

    /// Makes a look that is due. Returns whether to ask now.
    /// @param aIsHolding  whether the page shows that something is held; empty: there is no page that can be read
    bool look(ZTCTime aNow, std::optional<bool> aIsHolding);

private:
    std::chrono::milliseconds mPeriod;
    ZTCTime mNextLook;
    ZTCTime mAsked{};
    bool mIsUrgent = false;
    bool mIsFirst = true;
};

#endif
