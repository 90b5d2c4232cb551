/// `tavik status` as text and as JSON.
#ifndef SENSOR_VIEWS_INCLUDE_STATUSVIEW_H
#define SENSOR_VIEWS_INCLUDE_STATUSVIEW_H

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "sensor/views/include/Judgement.h"

struct ZTSTextStyle {
    std::size_t mWidth = 80;  ///< characters in a line
    bool mHasColor = false;
};

/// The state, its troubles with what to do, and without a trouble the links and how quiet it is. Ends with a line
/// break. Lines are at most `mWidth` less 3 characters long, but for words that cannot be broken.
std::string formatStatus(const ZTSStatusFacts& acrFacts, const ZTSTextStyle& acrStyle);

/// The document `tavik.status/1`. docs/tavik.md documents it.
nlohmann::ordered_json makeStatusDocument(const ZTSStatusFacts& acrFacts);

/// The members that every document begins with: schema ("tavik.COMMAND/1"), host, storeId. An empty id becomes null.
nlohmann::ordered_json beginDocument(const std::string& acrCommand, const std::string& acrHost,
                                     const std::string& acrStoreId);

/// {"id", "title", "subject", "severity", "status", "action", "see"}; a trouble of Tavik itself has no severity.
nlohmann::ordered_json toJson(const ZTSTroubleText& acrTrouble);

/// The gap as JSON.
nlohmann::ordered_json toJson(const ZTSGap& acrGap);

#endif
