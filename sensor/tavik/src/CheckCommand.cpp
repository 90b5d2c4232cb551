#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Context.h"
#include "sensor/views/include/CheckView.h"

static constexpr const char* scDefaultSince = "10m";

/// From when on losses and events count. Where no history can be read there are no marks either.
static ZTCHistoryTime sReadSince(const ZTSTavikOptions& acrOptions, const ZTCContext& acrContext) {
    const std::string lSince = acrOptions.mFilter.mSince.empty() ? scDefaultSince : acrOptions.mFilter.mSince;
    std::optional<std::vector<ZTSMark>> lMarks;
    try {
        lMarks = acrContext.openHistory()->readMarks();
    } catch (const ZTCStoreEx&) {
        if (!isTimeOrDuration(lSince)) {
            return readPoint(scDefaultSince, "--since", {}, getHistoryTime());
        }
    }
    return readPoint(lSince, "--since", lMarks.value_or(std::vector<ZTSMark>()), getHistoryTime());
}

/// Empty: no history can be read; the facts hold the reason.
static std::optional<std::uint64_t> sCountEvents(const ZTCContext& acrContext, ZTCHistoryTime aSince) {
    try {
        ZTSHistoryFilter lFilter;
        lFilter.mSince = aSince;
        std::uint64_t lEvents = 0;
        acrContext.openHistory()->visitMinutes(lFilter, [&lEvents](const ZTSBucket& acrBucket) {
            lEvents += acrBucket.mOccurrences;
            return true;
        });
        return lEvents;
    } catch (const ZTCStoreEx&) {
        return std::nullopt;
    }
}

int runCheck(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const ZTCHistoryTime lSince = sReadSince(acrOptions, lContext);
    const ZTSStatusFacts lFacts = lContext.gatherFacts(lSince);
    const ZTSCheck lCheck = makeCheck(lFacts, sCountEvents(lContext, lSince));
    if (acrOptions.mIsJson) {
        writeDocument(makeCheckDocument(lCheck, lFacts));
    } else {
        writeOutput(formatCheck(lCheck));
    }
    return lCheck.mResult;
}
