/// `tavik check`: the status as a monitoring plugin reports it, in one line with performance data.
#ifndef SENSOR_VIEWS_INCLUDE_CHECKVIEW_H
#define SENSOR_VIEWS_INCLUDE_CHECKVIEW_H

#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>

#include "sensor/views/include/Judgement.h"

/// The four results of a monitoring plugin; the numbers are its exit statuses.
enum ZTECheckResult : int { ZTCR_Ok = 0, ZTCR_Warning = 1, ZTCR_Critical = 2, ZTCR_Unknown = 3 };

/// "OK", "WARNING", "CRITICAL" or "UNKNOWN".
const char* getCheckWord(ZTECheckResult aResult);

struct ZTSCheck {
    ZTECheckResult mResult = ZTCR_Ok;
    std::string mText;  ///< behind the word
    // Performance data; what is not known is left out of the line, and null in JSON.
    std::optional<std::uint64_t> mEvents;  ///< in the time that was asked for
    std::optional<std::uint64_t> mOpenEpisodes;
    std::optional<std::uint64_t> mLost;  ///< in the time of the facts' gaps
    std::optional<std::uint64_t> mHeldBytes;
    std::optional<std::uint64_t> mLimitBytes;
};

/// @param aEvents  events in the time that was asked for, where the history could be read
ZTSCheck makeCheck(const ZTSStatusFacts& acrFacts, std::optional<std::uint64_t> aEvents);

/// "TAVIK OK - COLLECTING; nothing lost | events=12 ...": one line with a line break.
std::string formatCheck(const ZTSCheck& acrCheck);

/// The document `tavik.check/1`.
nlohmann::ordered_json makeCheckDocument(const ZTSCheck& acrCheck, const ZTSStatusFacts& acrFacts);

#endif
