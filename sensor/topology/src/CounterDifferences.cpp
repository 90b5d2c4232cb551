#include "sensor/topology/include/CounterDifferences.h"

std::vector<ZTSCounterReading> ZTCCounterDifferences::take(const std::vector<ZTSCounterReading>& acrReadings) {
    std::vector<ZTSCounterReading> lRisen;
    std::map<Key, std::uint64_t> lNow;
    for (const ZTSCounterReading& lrReading : acrReadings) {
        const Key lKey{lrReading.mInitiator.mBytes, lrReading.mRemotePort.value_or(ZTSFcName()).mBytes,
                       lrReading.mName};
        lNow[lKey] = lrReading.mValue;
        const auto lLast = mLast.find(lKey);
        if (lLast != mLast.end() && lrReading.mValue > lLast->second) {
            lRisen.push_back(lrReading);
            lRisen.back().mValue -= lLast->second;
        }
    }
    mLast = std::move(lNow);
    return lRisen;
}
