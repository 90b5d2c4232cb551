/// Finds what warnings are about: new events, gaps and refusals in the history, and states that hold in the sensor's
/// live state.
///
/// One thread.
#ifndef SENSOR_WARNINGS_INCLUDE_WARNSOURCE_H
#define SENSOR_WARNINGS_INCLUDE_WARNSOURCE_H

#include <map>
#include <string>
#include <utility>
#include <vector>

#include "sensor/store/include/History.h"
#include "sensor/views/include/LiveState.h"
#include "sensor/views/include/SanFacts.h"
#include "sensor/warnings/include/WarnBook.h"

/// Names of stored values: how far gaps and refusals were counted, so that none is missed over a restart.
inline constexpr const char* gcWarnGapValue = "warn.gap";
inline constexpr const char* gcWarnRefusedValue = "warn.refused";

class ZTCWarnSource {
public:
    explicit ZTCWarnSource(const std::vector<ZTSWarnRule>& acrRules);

    /// What has come to the history since the last call. The first call finds what happened within the longest time of
    /// a rule. Throws what ZTCHistory throws.
    std::vector<ZTSWarnOccurrence> read(const ZTCHistory& acrHistory, ZTCHistoryTime aNow);
    bool hasRead() const { return !mStoreId.empty(); }
    /// Values to be stored since the last call, by name.
    std::map<std::string, std::string> takeValues() { return std::exchange(mValues, {}); }

    /// The states that hold: deaf, agent-down, disk-full, path-lost. @param apSan  null: the paths are not known
    static std::vector<ZTSWarnOccurrence> findHolding(const ZTSLiveState& acrLive, const ZTSSanFacts* apSan,
                                                      ZTCHistoryTime aNow);
    /// Whether it is known whether a state of that kind holds; false for what is no state.
    static bool isKnown(const ZTSLiveState& acrLive, const ZTSSanFacts* apSan, const std::string& acrKind);
    /// Whether a kind is one of these states.
    static bool isState(const std::string& acrKind);

private:
    using ZTCTotalKey = std::pair<std::string, ZTCKindKey>;

    void begin(const ZTCHistory& acrHistory, ZTCHistoryTime aNow, std::vector<ZTSWarnOccurrence>& arFound);
    void readTotals(const ZTCHistory& acrHistory);
    void readMinutes(const ZTCHistory& acrHistory, ZTCHistoryTime aNow, std::vector<ZTSWarnOccurrence>& arFound) const;
    void readEvents(const ZTCHistory& acrHistory, ZTCHistoryTime aNow, std::vector<ZTSWarnOccurrence>& arFound);
    void readGaps(const ZTCHistory& acrHistory, ZTCHistoryTime aNow, std::vector<ZTSWarnOccurrence>& arFound);
    void readRefusals(const ZTCHistory& acrHistory, ZTCHistoryTime aNow, std::vector<ZTSWarnOccurrence>& arFound);

    std::vector<ZTCKindKey> mKinds;  ///< that a rule names
    bool mHasGapRule = false;
    bool mHasRefusedRule = false;
    std::chrono::milliseconds mLongest{};  ///< of the rules' times

    std::string mStoreId;  ///< of the history that the numbers below are of; empty: none was read
    std::map<ZTCTotalKey, std::uint64_t> mTotals;
    std::uint64_t mOccurrences = 0;
    std::uint64_t mGaps = 0;
    std::uint64_t mGapSeq = 0;
    std::map<std::string, std::uint64_t> mRefused;  ///< by initiator
    std::map<std::string, std::string> mValues;
};

#endif
