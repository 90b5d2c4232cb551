/// What the agent refused and dropped, and what its library reported as lost, in the last 24 hours: from the pages of
/// one start after the other. In steps of an hour.
#ifndef SENSOR_COLLECTOR_INCLUDE_LOSSWINDOW_H
#define SENSOR_COLLECTOR_INCLUDE_LOSSWINDOW_H

#include <cstdint>
#include <deque>
#include <map>
#include <string>

#include "sensor/client/include/StatusPageReader.h"
#include "sensor/store/include/HistoryTime.h"

struct ZTSLosses {
    ZTCHistoryTime mSince;
    std::map<std::string, std::uint64_t> mRefused;  ///< by reason, all of them
    std::uint64_t mDropped = 0;
    std::map<std::string, std::uint64_t> mLibrary;  ///< by name
};

class ZTCLossWindow {
public:
    /// @param aNow  nothing is known of the time before
    explicit ZTCLossWindow(ZTCHistoryTime aNow) : mBegin(aNow) {}

    /// Counts what is new on the page. The first page of a start that is older than this object is where counting
    /// begins.
    void note(const ZTSStatusSnapshot& acrPage, ZTCHistoryTime aNow);
    ZTSLosses get(ZTCHistoryTime aNow);

private:
    struct ZTSCounts {
        std::map<std::string, std::uint64_t> mRefused;
        std::uint64_t mDropped = 0;
        std::map<std::string, std::uint64_t> mLibrary;
    };
    struct ZTSHour {
        ZTCHistoryTime mBegin;
        ZTSCounts mCounts;
    };

    static ZTSCounts countAll(const ZTSStatusSnapshot& acrPage);
    void forgetOld(ZTCHistoryTime aNow);

    const ZTCHistoryTime mBegin;
    std::string mGeneration;
    ZTSCounts mLast;
    std::deque<ZTSHour> mHours;
};

#endif
