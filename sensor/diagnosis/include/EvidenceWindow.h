/// Gathers from the history what the rules look at.
#ifndef SENSOR_DIAGNOSIS_INCLUDE_EVIDENCEWINDOW_H
#define SENSOR_DIAGNOSIS_INCLUDE_EVIDENCEWINDOW_H

#include "sensor/diagnosis/include/Diagnosis.h"
#include "sensor/store/include/History.h"

/// Episodes that one look takes in at most; of more, the newest.
inline constexpr std::uint64_t gcMostEvidenceEpisodes = 20000;

/// Steps of counters that one look takes in at most; of more, the oldest.
inline constexpr std::size_t gcMostEvidenceCounters = 200000;

/// How far before and after an episode its evidence may lie.
inline constexpr std::chrono::minutes gcEvidenceReach{10};

struct ZTSEvidenceWindow {
    ZTSEvidence mEvidence;  ///< without the names for people
    bool mIsCut = false;    ///< there were more episodes: the time begins later than was asked for
    std::optional<ZTCHistoryTime> mTopologyScanned;  ///< when the topology was last read by then; absent: never
    bool mIsTopologyStale = false;
    std::chrono::microseconds mNotRunning{0};  ///< how long Tavik did not run within the time
    std::vector<ZTSGap> mGaps;                 ///< within the time
};

/// What the history holds of that time. Throws what ZTCHistory throws.
ZTSEvidenceWindow gatherEvidence(const ZTCHistory& acrHistory, ZTCHistoryTime aFrom, ZTCHistoryTime aTo);

#endif
