#include "sensor/collector/include/SpoolRecovery.h"

#include <algorithm>
#include <limits>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"

ZTSSpoolPlan planSpoolRecovery(std::span<const ZTSSpoolEntry> aEntries, const std::string& acrGeneration) {
    ZTSSpoolPlan lPlan;
    for (const ZTSSpoolEntry& lrEntry : aEntries) {
        if (lrEntry.mName.mNumber >= lPlan.mNextNumber &&
            lrEntry.mName.mNumber != std::numeric_limits<std::uint64_t>::max()) {
            lPlan.mNextNumber = lrEntry.mName.mNumber + 1;
        }
        if (lrEntry.mName.mState != ZTSPS_Part) {
            lPlan.mWaiting.push_back(lrEntry);
        } else if (lrEntry.mName.mGeneration != acrGeneration || (lPlan.mResume && lPlan.mResume->mSize != 0)) {
            lPlan.mTear.push_back(lrEntry);
        } else {
            // Only one answer can be on its way. The one that has begun is that one.
            if (lPlan.mResume) {
                lPlan.mTear.push_back(*lPlan.mResume);
            }
            lPlan.mResume = lrEntry;
        }
    }
    std::ranges::stable_sort(lPlan.mWaiting, {}, [](const ZTSSpoolEntry& acrEntry) { return acrEntry.mName.mNumber; });
    return lPlan;
}

ZTSSpooledBody readSpooledBody(std::span<const std::uint8_t> aBytes) {
    ZTSSpooledBody lResult;
    if (aBytes.size() < gcFrameHeaderSize) {
        return lResult;
    }
    std::uint64_t lLength = 0;
    for (const std::uint8_t lByte : aBytes.first(gcFrameHeaderSize)) {
        lLength = lLength << 8U | lByte;
    }
    const std::span<const std::uint8_t> lRest = aBytes.subspan(gcFrameHeaderSize);
    lResult.mHasLength = true;
    lResult.mBody = lRest.first(static_cast<std::size_t>(std::min<std::uint64_t>(lLength, lRest.size())));
    lResult.mMissing = lLength - lResult.mBody.size();
    lResult.mBehind = lRest.size() - lResult.mBody.size();
    return lResult;
}
