#include "sensor/diagnosis/include/Diagnosis.h"

#include <algorithm>

#include "sensor/diagnosis/src/EvidenceIndex.h"

const ZTSRule* findRule(std::string_view aId) {
    const auto lFound = std::ranges::find_if(getRules(), [aId](const ZTSRule& acrRule) { return acrRule.mpId == aId; });
    return lFound == getRules().end() ? nullptr : &*lFound;
}

std::vector<ZTSFinding> diagnose(const ZTSEvidence& acrEvidence) {
    const ZTCEvidenceIndex lIndex(acrEvidence);
    std::vector<ZTSFinding> lFindings;
    for (const ZTSRule& lrRule : getRules()) {
        lrRule.mpLook(lIndex, lrRule, lFindings);
    }
    std::ranges::stable_sort(lFindings, [](const ZTSFinding& acrOne, const ZTSFinding& acrOther) {
        return acrOne.mSeverity != acrOther.mSeverity ? acrOne.mSeverity < acrOther.mSeverity
                                                      : acrOne.mLast > acrOther.mLast;
    });
    return lFindings;
}
