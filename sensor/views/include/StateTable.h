/// The table of the states that Tavik can be in. It is the one place that knows of each state when it holds, its id,
/// its exit status, its number in metrics, and its words. The worst state comes first.
#ifndef SENSOR_VIEWS_INCLUDE_STATETABLE_H
#define SENSOR_VIEWS_INCLUDE_STATETABLE_H

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/views/include/StatusFacts.h"

/// What a state means for the people who rely on Tavik.
enum ZTEVerdict : std::uint8_t {
    ZTVD_NotCollecting,
    ZTVD_NotKnown,    ///< nobody can say whether it collects
    ZTVD_PartlyDeaf,  ///< it collects, but some kinds do not reach it
    ZTVD_Lossy,       ///< it collects, but something was lost
    ZTVD_Collecting,
    ZTVD_Count
};

/// "NOT COLLECTING", "NOT KNOWN", "PARTLY DEAF", "COLLECTING" (twice).
const char* getVerdictWord(ZTEVerdict aVerdict);

/// Of `tavik status`: 0, 1 or 3.
int getVerdictExit(ZTEVerdict aVerdict);

struct ZTSStateRow {
    const char* mpId;  ///< stable; as `tavik explain` takes it
    ZTEVerdict mVerdict;
    bool (*mpHolds)(const ZTSStatusFacts& acrFacts);
    const char* mpHeadline;                                                ///< behind the verdict's word
    std::vector<std::string> (*mpStatus)(const ZTSStatusFacts& acrFacts);  ///< one text a paragraph
    const char* mpAction;                                                  ///< lines: commands, or what to do
    const char* mpSee;
    const char* mpMeans;  ///< for `tavik explain`, as the next two
    const char* mpCauses;
    const char* mpLookAt;
    bool mIsWithoutFc = false;  ///< nothing to collect from: no trouble for a monitoring system
};

/// The rows, the worst state first; the last one, "collecting", always holds.
std::span<const ZTSStateRow> getStateTable();

/// The row of that id, or null.
const ZTSStateRow* findState(std::string_view aId);

/// The state's number in metrics: its place in the table, from the last, "collecting" = 0, upwards.
std::size_t getStateNumber(const ZTSStateRow& acrRow);

#endif
