#include "sensor/web/include/Api.h"

#include <algorithm>
#include <charconv>
#include <nlohmann/json.hpp>
#include <set>

#include "sensor/client/include/RecordJson.h"
#include "sensor/metrics/include/Metrics.h"
#include "sensor/store/include/DamagedHistories.h"
#include "sensor/views/include/DiagnosisView.h"
#include "sensor/views/include/DiffView.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/Explanation.h"
#include "sensor/views/include/FilterText.h"
#include "sensor/views/include/PathsView.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/Timeline.h"
#include "sensor/web/src/PageFiles.h"

using ZTCJson = nlohmann::ordered_json;

static constexpr const char* scDatabase = "/history.db";

static ZTSWebResponse sJson(const ZTCJson& acrDocument, unsigned aStatus = 200) {
    return {.mStatus = aStatus, .mType = "application/json", .mBody = dumpJson(acrDocument, -1) + "\n"};
}

static ZTSWebResponse sError(unsigned aStatus, const std::string& acrText) {
    return sJson({{"error", acrText}}, aStatus);
}

/// Throws for a parameter of another name: a misspelled filter must not answer with everything.
static void sCheckNames(const ZTSWebRequest& acrRequest, const std::set<std::string>& acrKnown) {
    for (const auto& [lName, lValue] : acrRequest.mParameters) {
        if (!acrKnown.contains(lName)) {
            throw ZTCBadFilterEx("unknown parameter \"" + lName + "\"");
        }
    }
}

static bool sReadFlag(const ZTSWebRequest& acrRequest, const std::string& acrName) {
    const std::string lText = acrRequest.get(acrName);
    if (!lText.empty() && lText != "true" && lText != "false") {
        throw ZTCBadFilterEx(acrName + " is true or false, not \"" + lText + "\"");
    }
    return lText == "true";
}

/// Which ports and LUNs: the parameters that every filter has.
static ZTSFilterTexts sPortTexts(const ZTSWebRequest& acrRequest) {
    ZTSFilterTexts lTexts;
    lTexts.mPorts = acrRequest.getAll("port");
    lTexts.mInitiators = acrRequest.getAll("initiator");
    lTexts.mLuns = acrRequest.getAll("lun");
    lTexts.mNamePrefix.clear();
    return lTexts;
}

static ZTSFilterTexts sFilterTexts(const ZTSWebRequest& acrRequest) {
    sCheckNames(acrRequest, {"since", "until", "kind", "port", "initiator", "lun", "limit", "open"});
    ZTSFilterTexts lTexts = sPortTexts(acrRequest);
    lTexts.mSince = acrRequest.get("since");
    lTexts.mUntil = acrRequest.get("until");
    lTexts.mKinds = acrRequest.getAll("kind");
    lTexts.mLimit = acrRequest.get("limit");
    lTexts.mIsOpenOnly = sReadFlag(acrRequest, "open");
    return lTexts;
}

ZTCApi::ZTCApi(ZTSApiSources aSources) : mSources(std::move(aSources)) {}

ZTCApi::~ZTCApi() = default;

const ZTCHistory& ZTCApi::openHistory() {
    if (mpHistory == nullptr) {
        if (!mSources.mMayRead()) {
            throw ZTCNoHistoryEx("the sensor has not opened its history yet");
        }
        mpHistory = std::make_unique<ZTCHistory>(mSources.mStateDirectory);
    }
    return *mpHistory;
}

ZTCNameBook ZTCApi::makeNames(const ZTCHistory& acrHistory) const {
    ZTCNameBook lNames;
    mSources.mAddNames(lNames);
    lNames.setTopology(readTopologyOf(acrHistory));
    lNames.setCounters(readCountersOf(acrHistory));
    for (const ZTSInitiator& lrInitiator : acrHistory.readInitiators()) {
        lNames.addInitiator(lrInitiator);
    }
    for (const ZTSRemotePort& lrPort : acrHistory.readRemotePorts()) {
        lNames.addRemotePort(lrPort);
    }
    if (const auto lStored = acrHistory.readTopology(toMicroseconds(getHistoryTime()))) {
        addPorts(lNames, lStored->mTopology);
    }
    return lNames;
}

ZTSStatusFacts ZTCApi::gatherFacts() {
    ZTSStatusFacts lFacts;
    lFacts.mHost = mSources.mHost;
    lFacts.mPlaces.mStateDirectory = mSources.mStateDirectory;
    lFacts.mNow = getHistoryTime();
    lFacts.mAnswer = ZTAN_Answered;
    lFacts.mLive = readLiveState(mSources.mReadLive());
    try {
        lFacts.mHistory = readHistoryFacts(openHistory(), lFacts.mNow);
        lFacts.mNames = makeNames(*mpHistory);
    } catch (const ZTCStoreEx& lrEx) {
        mpHistory.reset();
        lFacts.mHistoryProblem = lrEx.what();
    }
    lFacts.mDamagedHistories = listDamagedHistories(mSources.mStateDirectory);
    return lFacts;
}

ZTSWebResponse ZTCApi::answer(const ZTSWebRequest& acrRequest) {
    try {
        return answerKnown(acrRequest);
    } catch (const ZTCBadFilterEx& lrEx) {
        return sError(400, lrEx.what());
    } catch (const ZTCStoreEx& lrEx) {
        mpHistory.reset();  // the next request opens the history anew: it may have been replaced
        return sError(503, lrEx.what());
    }
}

ZTSWebResponse ZTCApi::answerKnown(const ZTSWebRequest& acrRequest) {
    const std::string& lrPath = acrRequest.mPath;
    if (const ZTSPageFile* const lpFile = findPageFile(lrPath)) {
        return {.mType = lpFile->mpType, .mBody = std::string(lpFile->mContent), .mCacheControl = "no-cache"};
    }
    if (lrPath == "/healthz") {
        return answerHealth();
    }
    if (lrPath == "/metrics") {
        return answerMetrics();
    }
    if (lrPath == "/api/v1/status") {
        sCheckNames(acrRequest, {});
        return sJson(makeStatus());
    }
    if (lrPath == "/api/v1/events") {
        return sJson(makeEvents(acrRequest));
    }
    if (lrPath == "/api/v1/ports") {
        return sJson(makePorts(acrRequest));
    }
    if (lrPath == "/api/v1/paths") {
        return sJson(makePaths(acrRequest));
    }
    if (lrPath == "/api/v1/diff") {
        return sJson(makeDifferences(acrRequest));
    }
    if (lrPath == "/api/v1/explain") {
        return sJson(makeExplanation(acrRequest));
    }
    if (lrPath == "/api/v1/timeline") {
        return sJson(makeTimeline(acrRequest));
    }
    if (lrPath == "/api/v1/stream") {
        sCheckNames(acrRequest, {});
        return {.mType = "text/event-stream", .mBody = ": the stream begins\n\n", .mIsStream = true};
    }
    return sError(404, "there is no " + lrPath + " here");
}

/// 200 while Tavik collects, also where it is partly deaf; 503 otherwise, with the state's id.
ZTSWebResponse ZTCApi::answerHealth() {
    const ZTSJudgement lJudgement = judge(gatherFacts());
    return {.mStatus = lJudgement.isCollecting() ? 200U : 503U,
            .mBody = std::string(lJudgement.getWorst().mpId) + "\n"};
}

ZTSWebResponse ZTCApi::answerMetrics() {
    ZTSStatusFacts lStatus = gatherFacts();
    ZTSMetricFacts lFacts;
    if (mpHistory != nullptr) {
        lFacts = readMetricFacts(*mpHistory, std::move(lStatus), mSources.mStateDirectory + scDatabase);
        mSources.mGiveSeries(lFacts);
    } else {
        lFacts.mStatus = std::move(lStatus);
    }
    lFacts.mVersion = mSources.mVersion;
    return {.mType = "text/plain; version=0.0.4; charset=utf-8", .mBody = formatMetrics(makeMetrics(lFacts))};
}

ZTCJson ZTCApi::makeStatus() {
    return makeStatusDocument(gatherFacts());
}

ZTCJson ZTCApi::makeEvents(const ZTSWebRequest& acrRequest) {
    const ZTSFilterTexts lTexts = sFilterTexts(acrRequest);
    checkFilter(lTexts);
    const ZTCHistory& lrHistory = openHistory();
    const ZTCNameBook lNames = makeNames(lrHistory);
    ZTSHistoryFilter lFilter = readFilter(lTexts, lNames, lrHistory.readMarks(), getHistoryTime(), gcDefaultAnswerRows);
    lFilter.mLimit = std::min(lFilter.mLimit == 0 ? gcMostAnswerRows : lFilter.mLimit, gcMostAnswerRows);
    ZTCJson lDocument = beginDocument("events", mSources.mHost, lrHistory.getStoreId());
    ZTCJson& lrEpisodes = lDocument["episodes"] = ZTCJson::array();
    lrHistory.visitEpisodes(lFilter, [&](const ZTSEpisode& acrEpisode) {
        lrEpisodes.push_back(toJson(acrEpisode, lNames));
        return true;
    });
    return lDocument;
}

ZTCJson ZTCApi::makePorts(const ZTSWebRequest& acrRequest) {
    const ZTSFilterTexts lTexts = sFilterTexts(acrRequest);
    checkFilter(lTexts);
    const ZTCHistory& lrHistory = openHistory();
    const ZTCNameBook lNames = makeNames(lrHistory);
    const ZTSHistoryFilter lFilter = readFilter(lTexts, lNames, lrHistory.readMarks(), getHistoryTime(), 0);
    ZTCJson lDocument = beginDocument("ports", mSources.mHost, lrHistory.getStoreId());
    ZTCJson& lrPorts = lDocument["ports"] = ZTCJson::array();
    for (const ZTSPortSummary& lrPort : lrHistory.readPorts(lFilter)) {
        if (lFilter.mLimit == 0 || lrPorts.size() < lFilter.mLimit) {
            lrPorts.push_back(toJson(lrPort, lNames));
        }
    }
    return lDocument;
}

ZTCJson ZTCApi::makePaths(const ZTSWebRequest& acrRequest) {
    sCheckNames(acrRequest, {"at", "port", "initiator", "lun", "trouble"});
    const ZTCHistory& lrHistory = openHistory();
    const ZTCHistoryTime lNow = getHistoryTime();
    const std::string lAt = acrRequest.get("at");
    ZTSPathsRequest lRequest;
    lRequest.mTime = lAt.empty() ? lNow : readPoint(lAt, "at", lrHistory.readMarks(), lNow);
    const std::optional<ZTSSanView> lView = readSan(lrHistory, lRequest.mTime);
    ZTCNameBook lNames = makeNames(lrHistory);
    if (lView) {
        addPorts(lNames, lView->mTopology);
    }
    lRequest.mFilter = readPathsFilter(sPortTexts(acrRequest), lNames, sReadFlag(acrRequest, "trouble"));
    return makePathsDocument(lView ? &*lView : nullptr, lRequest, lNames, mSources.mHost, lrHistory.getStoreId());
}

ZTCJson ZTCApi::makeDifferences(const ZTSWebRequest& acrRequest) {
    sCheckNames(acrRequest, {"from", "to", "before-since", "after-since"});
    const ZTCHistory& lrHistory = openHistory();
    const ZTSDiffRequest lRequest = readDiffRequest({.mFrom = acrRequest.get("from"),
                                                     .mTo = acrRequest.get("to"),
                                                     .mBeforeSince = acrRequest.get("before-since"),
                                                     .mAfterSince = acrRequest.get("after-since")},
                                                    lrHistory.readMarks(), getHistoryTime());
    return makeDiffDocument(makeDiff(lrHistory, lRequest), makeNames(lrHistory), mSources.mHost,
                            lrHistory.getStoreId());
}

ZTCJson ZTCApi::makeExplanation(const ZTSWebRequest& acrRequest) {
    sCheckNames(acrRequest, {"subject", "since", "until"});
    const std::string lSubject = acrRequest.get("subject");
    const ZTCHistory& lrHistory = openHistory();
    const ZTCNameBook lNames = makeNames(lrHistory);
    const ZTCHistoryTime lNow = getHistoryTime();
    if (!lSubject.empty()) {
        sCheckNames(acrRequest, {"subject"});
        const auto lTopic = explainTopic(lSubject);
        return makeExplainDocument(lTopic ? *lTopic : explainEpisode(lSubject, lrHistory, lNames, lNow), mSources.mHost,
                                   lrHistory.getStoreId(), lNames);
    }
    const std::vector<ZTSMark> lMarks = lrHistory.readMarks();
    const std::string lSince = acrRequest.get("since");
    const std::string lUntil = acrRequest.get("until");
    const ZTCHistoryTime lTo = lUntil.empty() ? lNow : readPoint(lUntil, "until", lMarks, lNow);
    const ZTCHistoryTime lFrom = lSince.empty() ? lTo - gcDiagnosisSpan : readPoint(lSince, "since", lMarks, lNow);
    checkOrder("since", lFrom, "until", lTo);
    return makeDiagnosisDocument(diagnoseWindow(lrHistory, lNames, lFrom, lTo), mSources.mHost, lrHistory.getStoreId(),
                                 lNames);
}

ZTCJson ZTCApi::makeTimeline(const ZTSWebRequest& acrRequest) {
    sCheckNames(acrRequest, {"from", "to", "columns"});
    const ZTCHistory& lrHistory = openHistory();
    const std::vector<ZTSMark> lMarks = lrHistory.readMarks();
    const ZTCHistoryTime lNow = getHistoryTime();
    ZTSTimelineRequest lRequest;
    const std::string lFrom = acrRequest.get("from");
    const std::string lTo = acrRequest.get("to");
    lRequest.mFrom = lFrom.empty() ? lNow - std::chrono::hours(24) : readPoint(lFrom, "from", lMarks, lNow);
    lRequest.mTo = lTo.empty() ? lNow : readPoint(lTo, "to", lMarks, lNow);
    checkOrder("from", lRequest.mFrom, "to", lRequest.mTo);
    const std::string lColumns = acrRequest.get("columns");
    const char* const lpEnd = lColumns.data() + lColumns.size();
    if (!lColumns.empty()) {
        const auto [lpStop, lError] = std::from_chars(lColumns.data(), lpEnd, lRequest.mColumns);
        if (lError != std::errc() || lpStop != lpEnd || lRequest.mColumns < gcLeastColumns ||
            lRequest.mColumns > gcMostColumns) {
            throw ZTCBadFilterEx("columns \"" + lColumns + "\" is not a number from " + std::to_string(gcLeastColumns) +
                                 " to " + std::to_string(gcMostColumns));
        }
    }
    return makeTimelineDocument(lrHistory, lRequest, makeNames(lrHistory), mSources.mHost);
}
