#include "sensor/store/include/Ledger.h"

#include <numeric>

#include "sensor/agentcommon/include/StatusPage.h"

// The numbers are those of the status page, which has the names.
static_assert(ZTRF_CollectionOff == +ZTSR_CollectionOff && ZTRF_Failed == +ZTSR_Failed &&
              ZTRF_Count == gcStatusRefusals);
static_assert(ZTKST_Off == +ZTSS_Off && ZTKST_Failed == +ZTSS_Failed && ZTKST_NoSource == +ZTSS_NoSource);

const char* getRefusalName(ZTERefusal aRefusal) {
    return aRefusal < ZTRF_Count ? gcStatusRefusalNames[aRefusal] : "unknown";
}

const char* getKindStateName(ZTEKindState aState) {
    return aState < gcStatusStateNames.size() ? gcStatusStateNames[aState] : "unknown";
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
