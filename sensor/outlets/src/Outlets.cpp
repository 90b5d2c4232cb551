#include "sensor/outlets/include/Outlets.h"

#include <nlohmann/json.hpp>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/metrics/include/Metrics.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/StatusView.h"

using std::chrono::seconds;
using std::chrono::steady_clock;

/// Between two looks at the history while somebody waits for changes.
static constexpr seconds scFeedPeriod{1};
/// Between two writings of the metrics file; node_exporter is scraped that often at most.
static constexpr seconds scMetricsPeriod{15};
/// Between two tries to listen.
static constexpr seconds scServerPause{10};
/// Changes in one writing: each is a part of an answer in memory.
static constexpr std::uint64_t scMostChanges = 1000;

ZTCOutlets::ZTCOutlets(ZTSOutletsSetup aSetup, const ZTSSettings& acrSettings)
    : mSetup(std::move(aSetup)), mNewSettings(acrSettings) {
    ZTSApiSources lSources;
    lSources.mStateDirectory = mSetup.mStateDirectory;
    lSources.mHost = mSetup.mHost;
    lSources.mVersion = mSetup.mVersion;
    lSources.mMayRead = [this] {
        const std::lock_guard lLock(mMutex);
        return mMayRead;
    };
    lSources.mReadLive = [this] { return nlohmann::json::parse(readLive(), nullptr, false); };
    lSources.mGiveSeries = [this](ZTSMetricFacts& arFacts) { giveSeries(arFacts); };
    lSources.mAddNames = [this](ZTCNameBook& arNames) {
        const std::lock_guard lLock(mMutex);
        for (const auto& [lWwn, lName] : mNames) {
            if (const auto lParsed = parseWwn(lWwn)) {
                arNames.addName(*lParsed, lName);
            }
        }
    };
    mpApi = std::make_unique<ZTCApi>(lSources);
    mpFileApi = std::make_unique<ZTCApi>(std::move(lSources));
    mThread = std::thread([this] { run(); });
}

ZTCOutlets::~ZTCOutlets() {
    {
        const std::lock_guard lLock(mMutex);
        mIsStopping = true;
        mWake.notify_all();
    }
    mThread.join();
}

void ZTCOutlets::setSettings(const ZTSSettings& acrSettings) {
    const std::lock_guard lLock(mMutex);
    mNewSettings = acrSettings;
    mHasWork = true;
    mWake.notify_all();
}

void ZTCOutlets::openHistory() {
    const std::lock_guard lLock(mMutex);
    mHasWork = mHasWork || !mMayRead;
    mMayRead = true;
    mWake.notify_all();
}

void ZTCOutlets::setLive(std::string aLive) {
    const std::lock_guard lLock(mMutex);
    mLive = std::move(aLive);
}

void ZTCOutlets::wake() {
    const std::lock_guard lLock(mMutex);
    mHasWork = true;
    mWake.notify_all();
}

unsigned ZTCOutlets::getPort() const {
    const std::lock_guard lLock(mMutex);
    return mPort;
}

std::string ZTCOutlets::readLive() const {
    const std::lock_guard lLock(mMutex);
    return mLive;
}

void ZTCOutlets::run() {
    while (waitForWork()) {
        applySettings();
        openServer();
        feed();
    }
    feed();
    mpServer.reset();
}

/// False: it is over. Nobody is woken where nothing is to be fed.
bool ZTCOutlets::waitForWork() {
    const bool lHasReaders = mpServer != nullptr && mpServer->hasStreams();
    std::unique_lock lLock(mMutex);
    const auto lIsDue = [this] { return mIsStopping || mHasWork; };
    if (!mServerProblem.empty() || !mNdjsonProblem.empty() || !mHistoryProblem.empty()) {
        mWake.wait_for(lLock, scServerPause, lIsDue);
    } else if (lHasReaders) {
        mWake.wait_for(lLock, scFeedPeriod, lIsDue);
    } else if (!mSettings.mMetricsTextfile.empty()) {
        mWake.wait_until(lLock, mNextMetrics, lIsDue);
    } else if (mpServer != nullptr) {
        mWake.wait_for(lLock, 5 * scFeedPeriod, lIsDue);  // a reader of the stream may have come
    } else {
        mWake.wait(lLock, lIsDue);
    }
    mHasWork = false;
    return !mIsStopping;
}

void ZTCOutlets::applySettings() {
    std::optional<ZTSSettings> lNew;
    {
        const std::lock_guard lLock(mMutex);
        lNew.swap(mNewSettings);
        if (lNew) {
            mNames = lNew->mNames;
            mMostSeries = lNew->mMetricsRemotePorts;
        }
    }
    if (!lNew) {
        return;
    }
    if (lNew->mHttpListen != mSettings.mHttpListen || lNew->mHttpHosts != mSettings.mHttpHosts) {
        mpServer.reset();
        mNextServer = {};
    }
    if (mpNdjson == nullptr || lNew->mNdjsonPath != mSettings.mNdjsonPath ||
        lNew->mNdjsonSize != mSettings.mNdjsonSize || lNew->mNdjsonKeep != mSettings.mNdjsonKeep) {
        mpNdjson.reset();
        if (!lNew->mNdjsonPath.empty()) {
            mpNdjson = std::make_unique<ZTCNdjsonFile>(lNew->mNdjsonPath, lNew->mNdjsonSize, lNew->mNdjsonKeep);
        }
    }
    mSettings = std::move(*lNew);
}

void ZTCOutlets::report(std::string& arLast, const std::string& acrProblem, const char* apOutlet) {
    if (acrProblem != arLast) {
        mSetup.mReport(acrProblem.empty() ? std::string(apOutlet) + " works again" : acrProblem + "; trying on");
        arLast = acrProblem;
    }
}

void ZTCOutlets::openServer() {
    if (mpServer != nullptr || mSettings.mHttpListen.empty() || steady_clock::now() < mNextServer) {
        return;
    }
    mNextServer = steady_clock::now() + scServerPause;
    try {
        mpServer = std::make_unique<ZTCWebServer>(
            ZTSWebOptions{.mListen = mSettings.mHttpListen, .mHosts = mSettings.mHttpHosts},
            [this](const ZTSWebRequest& acrRequest) { return mpApi->answer(acrRequest); });
        report(mServerProblem, "", "the web server");
        const std::lock_guard lLock(mMutex);
        mPort = mpServer->getPort();
    } catch (const ZTCClientEx& lrEx) {
        report(mServerProblem, lrEx.what(), "the web server");
    }
}

/// What needs the history; without it nothing is lost, it comes later.
void ZTCOutlets::feedHistory() {
    {
        const std::lock_guard lLock(mMutex);
        if (!mMayRead) {
            return;
        }
    }
    try {
        if (mpHistory == nullptr) {
            mpHistory = std::make_unique<ZTCHistory>(mSetup.mStateDirectory);
            mNdjsonSeq.reset();
            mStreamSeq.reset();
        }
        feedStream();
        feedNdjson();
        report(mHistoryProblem, "", "the outlets' reading of the history");
    } catch (const ZTCStoreEx& lrEx) {
        mpHistory.reset();  // it may have been replaced
        report(mHistoryProblem, std::string("the outlets cannot read the history: ") + lrEx.what(), "");
    }
}

/// A port that was shown with a series of its own must never be counted among the others later: who asks first decides,
/// for all.
void ZTCOutlets::giveSeries(ZTSMetricFacts& arFacts) {
    const std::lock_guard lLock(mMutex);
    if (mSeriesStoreId != arFacts.mStatus.mHistory->mStoreId) {
        mSeriesStoreId = arFacts.mStatus.mHistory->mStoreId;
        mSeriesPorts = arFacts.mSeriesPorts;
    }
    if (mSeriesPorts.extend(arFacts.mTotals, mMostSeries)) {
        mSetup.mSetValue(gcSeriesPortsValue, mSeriesPorts.toText());
    }
    arFacts.mSeriesPorts = mSeriesPorts;
}

void ZTCOutlets::feed() {
    feedHistory();
    if (steady_clock::now() >= mNextMetrics) {
        writeMetrics();
    }
}

ZTCNameBook ZTCOutlets::makeNames() const {
    ZTCNameBook lNames;
    for (const auto& [lWwn, lName] : mSettings.mNames) {
        if (const auto lParsed = parseWwn(lWwn)) {
            lNames.addName(*lParsed, lName);
        }
    }
    return lNames;
}

/// The episode in one line, with what names the row outside of this host.
std::string ZTCOutlets::toLine(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames) const {
    nlohmann::ordered_json lDocument{{"host", mSetup.mHost}, {"storeId", mpHistory->getStoreId()}};
    lDocument.update(toJson(acrEpisode, acrNames));
    return dumpJson(lDocument, -1);
}

void ZTCOutlets::feedStream() {
    if (mpServer == nullptr || !mpServer->hasStreams()) {
        mStreamSeq.reset();
        return;
    }
    if (!mStreamSeq) {
        mStreamSeq = mpHistory->getLastSeq();
    }
    const ZTCNameBook lNames = makeNames();
    ZTSHistoryFilter lFilter;
    lFilter.mAfterSeq = *mStreamSeq;
    lFilter.mLimit = scMostChanges;
    mpHistory->visitChanges(lFilter, [&](const ZTSEpisode& acrEpisode) {
        mpServer->publish("episode", toLine(acrEpisode, lNames));
        mStreamSeq = acrEpisode.mSeq;
        return true;
    });
}

void ZTCOutlets::feedNdjson() {
    if (mpNdjson == nullptr) {
        return;
    }
    if (!mNdjsonSeq) {
        const std::string lStored = mpHistory->getValue(gcNdjsonCursorValue);
        mNdjsonSeq = lStored.empty() ? 0 : std::stoull(lStored);
    }
    const ZTCNameBook lNames = makeNames();
    ZTSHistoryFilter lFilter;
    lFilter.mLimit = scMostChanges;
    while (true) {
        lFilter.mAfterSeq = *mNdjsonSeq;
        std::string lLines;
        std::uint64_t lLast = *mNdjsonSeq;
        mpHistory->visitChanges(lFilter, [&](const ZTSEpisode& acrEpisode) {
            lLines += toLine(acrEpisode, lNames) + "\n";
            lLast = acrEpisode.mSeq;
            return true;
        });
        if (lLines.empty()) {
            return;
        }
        try {
            mpNdjson->append(lLines);
            report(mNdjsonProblem, "", "the file of JSON lines");
        } catch (const ZTCSystemCallEx& lrEx) {
            report(mNdjsonProblem, lrEx.what(), "the file of JSON lines");
            return;
        }
        // The lines are on the disk: what is stored too late only makes them come twice.
        mNdjsonSeq = lLast;
        mSetup.mSetValue(gcNdjsonCursorValue, std::to_string(lLast));
    }
}

void ZTCOutlets::writeMetrics() {
    mNextMetrics = steady_clock::now() + scMetricsPeriod;
    if (mSettings.mMetricsTextfile.empty()) {
        return;
    }
    const ZTSWebResponse lMetrics = mpFileApi->answer({.mPath = "/metrics", .mParameters = {}});
    try {
        writeMetricsFile(mSettings.mMetricsTextfile, lMetrics.mBody);
        report(mMetricsProblem, "", "the metrics file");
    } catch (const ZTCSystemCallEx& lrEx) {
        report(mMetricsProblem, lrEx.what(), "the metrics file");
    }
}
