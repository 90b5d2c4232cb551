#include "sensor/store/include/Ledger.h"

#include <numeric>

const char* getRefusalName(ZTERefusal aRefusal) {
    static constexpr std::array<const char*, ZTRF_Count> scNames = {
        "collection-off", "total-limit", "unknown-board", "no-list", "too-short", "unknown-kind", "failed"};
    return aRefusal < ZTRF_Count ? scNames[aRefusal] : "unknown";
}

const char* getKindStateName(ZTEKindState aState) {
    static constexpr std::array<const char*, 5> scNames = {"off", "listening", "failed", "no_rights", "no_source"};
    return aState < scNames.size() ? scNames[aState] : "unknown";
}

std::uint64_t ZTSLedgerRow::getRefusedTotal() const {
    return std::accumulate(mRefused.begin(), mRefused.end(), std::uint64_t{0});
}

std::uint64_t ZTSGap::getOccurrences() const {
    std::uint64_t lSum = 0;
    for (const ZTSGapCount& lrCount : mCounts) {
        lSum += lrCount.mHeld + lrCount.mHandedOver;
    }
    return lSum;
}
