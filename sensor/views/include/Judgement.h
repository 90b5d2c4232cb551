/// Which states of the table Tavik is in now, and what `tavik status` says first.
///
/// All states that hold are reported, and the worst one names the whole. States in which Tavik does not collect exclude
/// each other: only the first of them counts.
#ifndef SENSOR_VIEWS_INCLUDE_JUDGEMENT_H
#define SENSOR_VIEWS_INCLUDE_JUDGEMENT_H

#include <string>
#include <vector>

#include "sensor/views/include/StateTable.h"
#include "sensor/views/include/StatusFacts.h"
#include "sensor/views/include/TroubleText.h"

struct ZTSJudgement {
    std::vector<const ZTSStateRow*> mStates;  ///< all that hold, the worst first; never empty

    const ZTSStateRow& getWorst() const { return *mStates.front(); }
    int getExit() const { return getVerdictExit(getWorst().mVerdict); }
    bool isCollecting() const { return getWorst().mVerdict >= ZTVD_PartlyDeaf; }
};

ZTSJudgement judge(const ZTSStatusFacts& acrFacts);

/// "COLLECTING since 14 Nov 08:12; nothing lost". `aHasSince`: with the time since when, where it is known.
std::string formatHeadline(const ZTSStatusFacts& acrFacts, const ZTSJudgement& acrJudgement, bool aHasSince);

/// The troubles of Tavik itself that hold, with their words. Not those of the SAN.
std::vector<ZTSTroubleText> describeTroubles(const ZTSStatusFacts& acrFacts, const ZTSJudgement& acrJudgement);

/// The troubles of the SAN that count, in words, the worst first; notices are not among them.
std::vector<ZTSTroubleText> describeSanTroubles(const ZTSStatusFacts& acrFacts);

#endif
