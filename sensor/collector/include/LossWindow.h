/// What the agent refused and dropped, and what its library reported as lost, in the last 24 hours: from the pages of
/// one start after the other. Losses of the last hour are kept by the minute, earlier ones by the hour.
///
/// It can be kept as text, so that the next process of this kind goes on where this one stopped.
#ifndef SENSOR_COLLECTOR_INCLUDE_LOSSWINDOW_H
#define SENSOR_COLLECTOR_INCLUDE_LOSSWINDOW_H

#include <cstdint>
#include <map>
#include <string>
#include <vector>

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

    /// Continues from a text that toText() of an earlier window has made. Call it before the first page. Returns false,
    /// and changes nothing, for any other text.
    bool restore(const std::string& acrText);
    /// JSON of one line.
    std::string toText() const;

    /// Counts what is new on the page. Of a start that is older than this object, only what comes after its first
    /// page counts. Returns whether there was anything new: toText() has changed.
    bool note(const ZTSStatusSnapshot& acrPage, ZTCHistoryTime aNow);
    /// @param aSince  counted from then on, to the minute or to the hour; the last 24 hours at most
    ZTSLosses get(ZTCHistoryTime aNow, ZTCHistoryTime aSince = {});

private:
    struct ZTSCounts {
        std::map<std::string, std::uint64_t> mRefused;
        std::uint64_t mDropped = 0;
        std::map<std::string, std::uint64_t> mLibrary;

        bool operator==(const ZTSCounts&) const = default;
    };
    /// The losses between two pages, or more than two.
    struct ZTSSlot {
        ZTCHistoryTime mBegin;
        ZTCHistoryTime mEnd;
        ZTSCounts mCounts;
    };

    static ZTSCounts countAll(const ZTSStatusSnapshot& acrPage);
    static void addGrowth(ZTSCounts& arSum, const ZTSCounts& acrOld, const ZTSCounts& acrNew);
    void tidy(ZTCHistoryTime aNow);

    ZTCHistoryTime mBegin;
    std::string mGeneration;
    ZTSCounts mLast;
    std::vector<ZTSSlot> mSlots;  ///< rising
};

#endif
