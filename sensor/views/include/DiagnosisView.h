/// Explains a period of time, as text and as JSON: the findings of the rules, and the events that no rule explains.
#ifndef SENSOR_VIEWS_INCLUDE_DIAGNOSISVIEW_H
#define SENSOR_VIEWS_INCLUDE_DIAGNOSISVIEW_H

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "sensor/diagnosis/include/EvidenceWindow.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/StatusView.h"

/// How far `tavik explain` looks back where nothing else is asked for.
inline constexpr std::chrono::hours gcDiagnosisSpan{24};

/// Episodes of one kind that are evidence of nothing.
struct ZTSUnexplained {
    ZTCKindKey mKind = 0;
    std::uint64_t mEpisodes = 0;
    std::uint64_t mOccurrences = 0;
};

struct ZTSDiagnosis {
    ZTCHistoryTime mFrom;
    ZTCHistoryTime mTo;
    std::vector<ZTSFinding> mFindings;  ///< the worst first; noise last
    std::uint64_t mEpisodes = 0;
    std::uint64_t mOccurrences = 0;
    std::vector<ZTSUnexplained> mUnexplained;  ///< by kind
    std::vector<ZTSUnobserved> mUnobserved;
    std::optional<ZTCHistoryTime> mTopologyScanned;  ///< absent: no topology is known of the time
    bool mIsTopologyStale = false;
    std::chrono::microseconds mNotRunning{0};
    std::uint64_t mGaps = 0;
    bool mIsCut = false;  ///< there were more episodes: `mFrom` is later than was asked for

    /// Findings that are shown without being asked for.
    std::size_t countShown() const;
};

/// Gathers the evidence of the time and applies the rules. Throws what ZTCHistory throws.
ZTSDiagnosis diagnoseWindow(const ZTCHistory& acrHistory, const ZTCNameBook& acrNames, ZTCHistoryTime aFrom,
                            ZTCHistoryTime aTo);

/// The findings that this episode is evidence of, from what happened around it. Throws what ZTCHistory throws.
std::vector<ZTSFinding> diagnoseEpisode(const ZTCHistory& acrHistory, const ZTCNameBook& acrNames,
                                        const ZTSEpisode& acrEpisode, ZTCHistoryTime aNow);

/// The whole answer. @param aIsAll  noise too. Ends with a line break.
std::string formatDiagnosis(const ZTSDiagnosis& acrDiagnosis, const ZTSTextStyle& acrStyle, bool aIsAll,
                            ZTCHistoryTime aNow);

/// One finding with its number in front. Begins and ends with a line break.
std::string formatFinding(const ZTSFinding& acrFinding, std::size_t aNumber, const ZTSTextStyle& acrStyle,
                          ZTCHistoryTime aNow);

nlohmann::ordered_json toJson(const ZTSFinding& acrFinding, const ZTCNameBook& acrNames);

/// The document `tavik.explain/1` of a stretch of time.
nlohmann::ordered_json makeDiagnosisDocument(const ZTSDiagnosis& acrDiagnosis, const std::string& acrHost,
                                             const std::string& acrStoreId, const ZTCNameBook& acrNames);

#endif
