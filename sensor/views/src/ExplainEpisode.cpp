#include <charconv>

#include "sensor/views/include/DiagnosisView.h"
#include "sensor/views/include/Explanation.h"
#include "sensor/views/include/FilterText.h"

/// Sequence numbers of records that are named as evidence at most.
static constexpr std::size_t scMostEvidence = 200;

static std::optional<std::uint64_t> sParseNumber(const std::string& acrText) {
    std::uint64_t lNumber = 0;
    const char* const lpEnd = acrText.data() + acrText.size();
    const auto [lpStop, lError] = std::from_chars(acrText.data(), lpEnd, lNumber);
    return lError == std::errc() && lpStop == lpEnd ? std::optional(lNumber) : std::nullopt;
}

/// The records that are kept of an episode. They lie within its times, but for those that a clock set back has made.
static std::vector<std::uint64_t> sEvidence(const ZTCHistory& acrHistory, const ZTSEpisode& acrEpisode) {
    std::vector<std::uint64_t> lNumbers;
    ZTSHistoryFilter lFilter;
    lFilter.mKinds = {acrEpisode.mKind};
    if (!acrEpisode.mHasClockFlag) {
        lFilter.mSince = acrEpisode.mFirst;
        lFilter.mUntil = acrEpisode.mLast;
    }
    acrHistory.visitRecords(lFilter, [&](const ZTSStoredRecord& acrRecord) {
        if (acrRecord.mEpisode == acrEpisode.mEpisode) {
            lNumbers.push_back(acrRecord.mSeq);
        }
        return lNumbers.size() < scMostEvidence && acrRecord.mEpisode <= acrEpisode.mEpisode;
    });
    return lNumbers;
}

static std::uint64_t sRequireNumber(const std::string& acrText) {
    const auto lNumber = sParseNumber(acrText);
    if (!lNumber) {
        throw ZTCBadFilterEx(
            "\"" + acrText +
            "\" is not a kind, a state, a trouble, a rule or the number of an episode: tavik explain topics "
            "lists them");
    }
    return *lNumber;
}

void checkEpisodeNumber(const std::string& acrText) {
    sRequireNumber(acrText);
}

ZTSExplanation explainEpisode(const std::string& acrNumber, const ZTCHistory& acrHistory, const ZTCNameBook& acrNames,
                              ZTCHistoryTime aNow) {
    const auto lEpisode = acrHistory.findEpisode(sRequireNumber(acrNumber));
    if (!lEpisode) {
        throw ZTCBadFilterEx("the history has no episode " + acrNumber + ": tavik events shows those that it has");
    }
    return explainEpisode(*lEpisode, sEvidence(acrHistory, *lEpisode),
                          diagnoseEpisode(acrHistory, acrNames, *lEpisode, aNow), acrNames, aNow);
}
