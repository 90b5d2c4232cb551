#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/views/include/CheckView.h"

static constexpr const char* scDefaultSince = "10m";

/// Events since then, and only the gaps since then left in the facts.
static std::optional<std::uint64_t> sCountEvents(const ZTSTavikOptions& acrOptions, const ZTCContext& acrContext,
                                                 ZTSStatusFacts& arFacts) {
    const std::string lSince = acrOptions.mFilter.mSince.empty() ? scDefaultSince : acrOptions.mFilter.mSince;
    try {
        const std::unique_ptr<ZTCHistory> lpHistory = acrContext.openHistory();
        ZTSHistoryFilter lFilter;
        lFilter.mSince = readPoint(lSince, "--since", lpHistory->readMarks(), arFacts.mNow);
        std::uint64_t lEvents = 0;
        lpHistory->visitMinutes(lFilter, [&lEvents](const ZTSBucket& acrBucket) {
            lEvents += acrBucket.mOccurrences;
            return true;
        });
        if (arFacts.mHistory) {
            arFacts.mHistory->mGaps = lpHistory->readGaps(lFilter.mSince);
        }
        return lEvents;
    } catch (const ZTCStoreEx&) {
        return std::nullopt;  // the facts hold the reason
    }
}

int runCheck(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    ZTSStatusFacts lFacts = lContext.gatherFacts();
    const std::optional<std::uint64_t> lEvents = sCountEvents(acrOptions, lContext, lFacts);
    const ZTSCheck lCheck = makeCheck(lFacts, lEvents);
    if (acrOptions.mIsJson) {
        writeDocument(makeCheckDocument(lCheck, lFacts));
    } else {
        writeOutput(formatCheck(lCheck));
    }
    return lCheck.mResult;
}
