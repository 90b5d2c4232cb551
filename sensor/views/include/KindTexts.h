/// What each kind of event means: the sections of docs/events.md, which is built into the programs.
#ifndef SENSOR_VIEWS_INCLUDE_KINDTEXTS_H
#define SENSOR_VIEWS_INCLUDE_KINDTEXTS_H

#include <string>
#include <string_view>
#include <vector>

/// The section of one kind, as plain text: marks of emphasis and of code are taken out.
struct ZTSKindText {
    std::string mKind;   ///< "queue-full"
    std::string mTitle;  ///< "Queue full"
    std::string mMeans;  ///< each of these is one paragraph
    std::string mCauses;
    std::string mLookAt;
    std::string mConsolidation;  ///< "The next event of the kind is counted ..."
};

/// Reads the sections of a page. A section begins with "## Title (`kind`)"; headings without a kind are skipped. Its
/// paragraph on causes begins with "*Usual causes.*", the next one with "*Look at.*", and the last one with "*The next
/// event of the kind is*". The first of the others that does not begin with "Category" is the meaning.
std::vector<ZTSKindText> parseKindTexts(std::string_view aPage);

/// The sections of docs/events.md, in its order.
const std::vector<ZTSKindText>& getKindTexts();

/// The section of that kind, or null.
const ZTSKindText* findKindText(std::string_view aKind);

#endif
