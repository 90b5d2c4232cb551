#include <charconv>
#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/Explanation.h"

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

static void sPrint(const ZTSTavikOptions& acrOptions, const ZTCContext& acrContext, const std::string& acrStoreId,
                   const ZTSExplanation& acrExplanation, const ZTCNameBook& acrNames) {
    if (acrOptions.mIsJson) {
        writeDocument(makeExplainDocument(acrExplanation, acrContext.getHost(), acrStoreId, acrNames));
    } else {
        writeOutput(formatExplanation(acrExplanation, getPageStyle()));
    }
}

/// The database's id where there is one: what is explained then is a fixed text.
static std::string sStoreId(const ZTCContext& acrContext) {
    try {
        return acrContext.openHistory()->getStoreId();
    } catch (const ZTCStoreEx&) {
        return {};
    }
}

int runExplain(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const std::string& lrSubject = acrOptions.mSubject;
    if (const auto lTopic = lrSubject.empty() ? explainTopics() : explainTopic(lrSubject)) {
        sPrint(acrOptions, lContext, sStoreId(lContext), *lTopic, ZTCNameBook());
        return ZTTX_Done;
    }
    const auto lNumber = sParseNumber(lrSubject);
    if (!lNumber) {
        throw ZTCWrongUseEx("\"" + lrSubject +
                            "\" is not a kind, a state or the number of an episode: tavik explain lists them");
    }
    const std::unique_ptr<ZTCHistory> lpHistory = lContext.openHistory();
    const auto lEpisode = lpHistory->findEpisode(*lNumber);
    if (!lEpisode) {
        throw ZTCWrongUseEx("the history has no episode " + lrSubject + ": tavik events shows those that it has");
    }
    const ZTCNameBook lNames = lContext.makeNames(lpHistory.get());
    const ZTSExplanation lExplanation =
        explainEpisode(*lEpisode, sEvidence(*lpHistory, *lEpisode), lNames, getHistoryTime());
    sPrint(acrOptions, lContext, lpHistory->getStoreId(), lExplanation, lNames);
    return ZTTX_Done;
}
