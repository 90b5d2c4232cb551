/// What a hook is given: one JSON object on standard input, and the same in short as TAVIK_ variables.
#ifndef SENSOR_WARNINGS_INCLUDE_WARNDOCUMENT_H
#define SENSOR_WARNINGS_INCLUDE_WARNDOCUMENT_H

#include <optional>
#include <string>
#include <vector>

#include "sensor/views/include/NameBook.h"
#include "sensor/warnings/include/WarnBook.h"

struct ZTSWarnDocument {
    std::string mHost;
    std::string mStoreId;  ///< empty: no history was read yet
    ZTSWarnRule mRule;
    ZTSTrouble mTrouble;
    std::optional<ZTSEpisode> mEpisode;  ///< the newest of the trouble; absent: it has none, or it is not known
    bool mIsTest = false;
};

/// The episode as everywhere, with `host`, `storeId` and `warning`; without an episode the same keys with what is
/// known. One line with its line break.
std::string toHookInput(const ZTSWarnDocument& acrDocument, const ZTCNameBook& acrNames);

/// "TAVIK_KIND=queue-full" and so on. All of them are always there; empty means not known.
std::vector<std::string> toHookEnvironment(const ZTSWarnDocument& acrDocument, const ZTCNameBook& acrNames);

/// "queue-full of array7 ctrl-A: 120 within 5 m", for people.
std::string describeTrouble(const ZTSWarnRule& acrRule, const ZTSTrouble& acrTrouble, const ZTCNameBook& acrNames);

#endif
