#include <nlohmann/json.hpp>

#include "sensor/views/include/DiagnosisView.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::ordered_json;

static ZTCJson sUnobserved(const std::vector<ZTSUnobserved>& acrUnobserved) {
    ZTCJson lList = ZTCJson::array();
    for (const ZTSUnobserved& lrUnobserved : acrUnobserved) {
        lList.push_back({{"initiator", toJson(lrUnobserved.mInitiator)},
                         {"kind", getKindName(lrUnobserved.mKind)},
                         {"state", getKindStateName(lrUnobserved.mState)}});
    }
    return lList;
}

ZTCJson toJson(const ZTSFinding& acrFinding, const ZTCNameBook& acrNames) {
    ZTCJson lInitiators = ZTCJson::array();
    for (const ZTSInitiator& lrInitiator : acrFinding.mInitiators) {
        lInitiators.push_back(toJson(lrInitiator));
    }
    ZTCJson lPorts = ZTCJson::array();
    for (const ZTSRemotePort& lrPort : acrFinding.mRemotePorts) {
        lPorts.push_back(toJson(std::optional(lrPort), acrNames));
    }
    ZTCJson lCounters = ZTCJson::array();
    for (const ZTSCounterRise& lrRise : acrFinding.mCounters) {
        lCounters.push_back({{"initiator", lrRise.mInitiator.toText()},
                             {"counter", lrRise.mCounter},
                             {"difference", lrRise.mDifference}});
    }
    const ZTSRule& lrRule = *acrFinding.mpRule;
    return {{"rule", lrRule.mpId},
            {"severity", getFindingSeverityName(acrFinding.mSeverity)},
            {"title", lrRule.mpTitle},
            {"subject", acrFinding.mSubject},
            {"first", toRfc3339(acrFinding.mFirst)},
            {"last", toRfc3339(acrFinding.mLast)},
            {"count", acrFinding.mOccurrences},
            {"initiators", std::move(lInitiators)},
            {"remotePorts", std::move(lPorts)},
            {"seen", acrFinding.mSeen},
            {"means", lrRule.mpMeans},
            {"against", acrFinding.mAgainst},
            {"unless", lrRule.mpAgainst},
            {"next", acrFinding.mNext},
            {"episodes", acrFinding.mEpisodes},
            {"evidence", acrFinding.mSeqs},
            {"counters", std::move(lCounters)},
            {"unobserved", sUnobserved(acrFinding.mUnobserved)}};
}

ZTCJson makeDiagnosisDocument(const ZTSDiagnosis& acrDiagnosis, const std::string& acrHost,
                              const std::string& acrStoreId, const ZTCNameBook& acrNames) {
    ZTCJson lDocument = beginDocument("explain", acrHost, acrStoreId);
    lDocument["subject"] = "window";
    lDocument["id"] = nullptr;
    lDocument["title"] = nullptr;
    lDocument["from"] = toRfc3339(acrDiagnosis.mFrom);
    lDocument["to"] = toRfc3339(acrDiagnosis.mTo);
    lDocument["isCut"] = acrDiagnosis.mIsCut;
    lDocument["episodes"] = acrDiagnosis.mEpisodes;
    lDocument["count"] = acrDiagnosis.mOccurrences;
    ZTCJson& lrFindings = lDocument["findings"] = ZTCJson::array();
    for (const ZTSFinding& lrFinding : acrDiagnosis.mFindings) {
        lrFindings.push_back(toJson(lrFinding, acrNames));
    }
    ZTCJson& lrUnexplained = lDocument["unexplained"] = ZTCJson::array();
    for (const ZTSUnexplained& lrKind : acrDiagnosis.mUnexplained) {
        lrUnexplained.push_back(
            {{"kind", getKindName(lrKind.mKind)}, {"episodes", lrKind.mEpisodes}, {"count", lrKind.mOccurrences}});
    }
    lDocument["unobserved"] = sUnobserved(acrDiagnosis.mUnobserved);
    lDocument["topology"] = nullptr;
    if (acrDiagnosis.mTopologyScanned) {
        lDocument["topology"] = {{"scanned", toRfc3339(*acrDiagnosis.mTopologyScanned)},
                                 {"stale", acrDiagnosis.mIsTopologyStale}};
    }
    lDocument["notRunningSeconds"] = std::chrono::duration<double>(acrDiagnosis.mNotRunning).count();
    lDocument["gaps"] = acrDiagnosis.mGaps;
    return lDocument;
}
