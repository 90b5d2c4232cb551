/// `tavik explain WHAT`: what a kind, a state, a rule or an episode means, what is known of it, and what to look at
/// next. What a stretch of time means is in DiagnosisView.h.
#ifndef SENSOR_VIEWS_INCLUDE_EXPLANATION_H
#define SENSOR_VIEWS_INCLUDE_EXPLANATION_H

#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/diagnosis/include/Diagnosis.h"
#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/StatusView.h"

/// A paragraph with what it is about: "means", "usual causes", "look at", "facts", "evidence".
struct ZTSExplainedPart {
    std::string mLabel;
    std::vector<std::string> mTexts;
};

struct ZTSExplanation {
    std::string mSubject;  ///< "kind", "state", "trouble", "rule", "episode" or "topics"
    std::string mId;       ///< "queue-full", "deaf", "118"
    std::string mTitle;
    std::vector<ZTSExplainedPart> mParts;
    std::vector<std::uint64_t> mEvidence;  ///< sequence numbers of records
    std::optional<ZTSEpisode> mEpisode;
    std::vector<ZTSFinding> mFindings;  ///< that the episode is evidence of
};

/// A kind, a state, a trouble of the SAN or a rule by its name, or "topics": the names of all of them. Nothing where
/// the text is none of these.
std::optional<ZTSExplanation> explainTopic(std::string_view aText);

/// @param aEvidence  sequence numbers of the episode's records that are kept
/// @param aFindings  what it is evidence of
ZTSExplanation explainEpisode(const ZTSEpisode& acrEpisode, std::vector<std::uint64_t> aEvidence,
                              std::vector<ZTSFinding> aFindings, const ZTCNameBook& acrNames, ZTCHistoryTime aNow);

/// Whether a text can be the number of an episode. Throws ZTCBadFilterEx where it cannot.
void checkEpisodeNumber(const std::string& acrText);

/// The episode of that number, with the records that are kept of it as evidence. Throws ZTCBadFilterEx where the text
/// is no number or the history has no such episode, and what ZTCHistory throws.
ZTSExplanation explainEpisode(const std::string& acrNumber, const ZTCHistory& acrHistory, const ZTCNameBook& acrNames,
                              ZTCHistoryTime aNow);

std::string formatExplanation(const ZTSExplanation& acrExplanation, const ZTSTextStyle& acrStyle, ZTCHistoryTime aNow);

/// The document `tavik.explain/1`.
nlohmann::ordered_json makeExplainDocument(const ZTSExplanation& acrExplanation, const std::string& acrHost,
                                           const std::string& acrStoreId, const ZTCNameBook& acrNames);

#endif
