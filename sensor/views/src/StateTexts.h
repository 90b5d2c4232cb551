/// What each state of Tavik says about this host: the lines behind "status" of a trouble, made from the facts.
///
/// Each function is for one row of the table of states, and may only be called where that row holds.
#ifndef SENSOR_VIEWS_SRC_STATETEXTS_H
#define SENSOR_VIEWS_SRC_STATETEXTS_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/views/include/StatusFacts.h"

/// " since 14 Nov 08:12"; empty where the time is not known.
std::string formatSince(const std::optional<ZTCHistoryTime>& acrTime, const ZTSStatusFacts& acrFacts);

/// " in the last 24 h".
std::string formatLossSpan(const ZTSStatusFacts& acrFacts);

/// Whether a kind in this state could be heard on this host, and is not.
bool isDeafState(std::string_view aState);

std::vector<std::string> describeNewerHistoryState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeNoSensorState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeVanishedState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeAnswerState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeStoppingState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeNoAdaptersState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeNoLibraryState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeNoEventSupportState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeStartingState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeAgentDownState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeDiskState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeDeafState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeGapState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeRefusedState(const ZTSStatusFacts& acrFacts);
std::vector<std::string> describeCollectingState(const ZTSStatusFacts& acrFacts);

#endif
