#include "sensor/outlets/include/Outlets.h"

#include <algorithm>
#include <charconv>
#include <nlohmann/json.hpp>
#include <tuple>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/metrics/include/Metrics.h"
#include "sensor/outlets/include/JournalOutlet.h"
#include "sensor/outlets/include/NdjsonOutlet.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/StatusView.h"

using std::chrono::seconds;
using std::chrono::steady_clock;

/// Between two looks at the history while somebody waits for changes.
static constexpr seconds scFeedPeriod{1};
/// Between two writings of the metrics file. node_exporter is hardly ever scraped more often.
static constexpr seconds scMetricsPeriod{15};
/// Between two tries to listen.
static constexpr seconds scServerPause{10};
/// Changes in one writing: each is a part of an answer in memory.
static constexpr std::uint64_t scMostChanges = 1000;

/// The outputs that are not in the table of outlets, named for people.
static constexpr const char* scServerTitle = "the web server";
static constexpr const char* scMetricsTitle = "the metrics file";
static constexpr const char* scHistoryTitle = "the outlets' reading of the history";

ZTCOutlets::ZTCOutlets(ZTSOutletsSetup aSetup, const ZTSSettings& acrSettings)
    : mSetup(std::move(aSetup)), mProblems(mSetup.mReport), mNewSettings(acrSettings) {
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
        arNames.addNames(mNames);
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
    if (!std::exchange(mMayRead, true)) {
        mHasWork = true;
        mWake.notify_all();
    }
}

void ZTCOutlets::setLive(std::string aLive) {
    const std::lock_guard lLock(mMutex);
    mLive = std::move(aLive);
}

void ZTCOutlets::wake() {
    {
        const std::lock_guard lLock(mMutex);
        mHasWork = true;
    }
    mWake.notify_all();  // after the lock: a thread that wakes up need not wait for it
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

/// Sleeps while there is nothing to feed. False: the thread is to end.
bool ZTCOutlets::waitForWork() {
    const bool lHasReaders = mpServer != nullptr && mpServer->hasStreams();
    std::unique_lock lLock(mMutex);
    const auto lIsDue = [this] { return mIsStopping || mHasWork; };
    if (mProblems.has(scServerTitle) || isFailing() || mProblems.has(scHistoryTitle)) {
        mWake.wait_for(lLock, scServerPause, lIsDue);
    } else if (lHasReaders) {
        mWake.wait_for(lLock, scFeedPeriod, lIsDue);
    } else if (!mSettings.mMetricsTextfile.empty()) {
        mWake.wait_until(lLock, mNextMetrics, lIsDue);
    } else {
        mWake.wait(lLock, lIsDue);  // a reader of the stream that comes meanwhile is seen at the next wake()
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
        mProblems.forget(scServerTitle);
    }
    if (lNew->mMetricsTextfile != mSettings.mMetricsTextfile) {
        mNextMetrics = {};
        mProblems.forget(scMetricsTitle);
    }
    makeOutlets(*lNew);
    mSettings = std::move(*lNew);
}

/// The table of outlets. One that goes on keeps what it has.
void ZTCOutlets::makeOutlets(const ZTSSettings& acrNew) {
    const bool lIsSame = mSettings.mNdjsonPath == acrNew.mNdjsonPath && mSettings.mNdjsonSize == acrNew.mNdjsonSize &&
                         mSettings.mNdjsonKeep == acrNew.mNdjsonKeep &&
                         mSettings.mJournalEnabled == acrNew.mJournalEnabled;
    if (lIsSame) {
        return;
    }
    std::map<std::string, std::pair<std::optional<std::uint64_t>, std::uint64_t>> lHad;
    for (ZTSFedOutlet& lrOutlet : mOutlets) {
        lHad[lrOutlet.mpOutlet->getName()] = {lrOutlet.mSeq, lrOutlet.mTold};  // what is stored may be older
        mProblems.forget(lrOutlet.mpOutlet->getTitle());
    }
    mOutlets.clear();
    if (!acrNew.mNdjsonPath.empty()) {
        mOutlets.emplace_back().mpOutlet =
            std::make_unique<ZTCNdjsonOutlet>(acrNew.mNdjsonPath, acrNew.mNdjsonSize, acrNew.mNdjsonKeep);
    }
    if (acrNew.mJournalEnabled) {
        mOutlets.emplace_back().mpOutlet = std::make_unique<ZTCJournalOutlet>(mSetup.mJournalSocket);
    }
    for (ZTSFedOutlet& lrOutlet : mOutlets) {
        std::tie(lrOutlet.mSeq, lrOutlet.mTold) = lHad[lrOutlet.mpOutlet->getName()];
    }
}

bool ZTCOutlets::isFailing() const {
    return std::ranges::any_of(
        mOutlets, [this](const ZTSFedOutlet& acrOutlet) { return mProblems.has(acrOutlet.mpOutlet->getTitle()); });
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
        mProblems.note(scServerTitle, "");
        const std::lock_guard lLock(mMutex);
        mPort = mpServer->getPort();
    } catch (const ZTCClientEx& lrEx) {
        mProblems.note(scServerTitle, lrEx.what());
    }
}

/// Feeds the outlets that need the history. Without the history they are fed later, and lose nothing.
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
            for (ZTSFedOutlet& lrOutlet : mOutlets) {
                lrOutlet.mSeq.reset();
            }
            mStreamSeq.reset();
            mNextMetrics = {};  // a file that was written without the history lacks most of its metrics
        }
        feedStream();
        for (ZTSFedOutlet& lrOutlet : mOutlets) {
            feed(lrOutlet);
        }
        mProblems.note(scHistoryTitle, "");
    } catch (const ZTCStoreEx& lrEx) {
        mpHistory.reset();  // it may have been replaced
        mProblems.note(scHistoryTitle, std::string("the outlets cannot read the history: ") + lrEx.what());
    }
}

/// A port that was shown with a series of its own keeps it, and is never counted among the others later. So the first
/// answer that shows a port decides for all.
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
    if (mpHistory != nullptr) {
        lNames.setTopology(readTopologyOf(*mpHistory));
    }
    lNames.addNames(mSettings.mNames);
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

static std::uint64_t sReadNumber(const std::string& acrText) {
    std::uint64_t lNumber = 0;
    std::from_chars(acrText.data(), acrText.data() + acrText.size(), lNumber);
    return lNumber;
}

std::string getOutletValue(const std::string& acrOutlet, const char* apValue) {
    return "outlet." + acrOutlet + "." + apValue;
}

/// Gives the outlet the number of changes that retention deleted before it had them.
void ZTCOutlets::giveMissed(ZTSFedOutlet& arOutlet) {
    const std::string lName = arOutlet.mpOutlet->getName();
    const std::uint64_t lMissed = sReadNumber(mpHistory->getValue(getOutletValue(lName, "missed")));
    if (lMissed <= arOutlet.mTold) {
        return;
    }
    const std::uint64_t lNew = lMissed - arOutlet.mTold;
    const nlohmann::ordered_json lLine{{"host", mSetup.mHost}, {"storeId", mpHistory->getStoreId()},
                                       {"seq", nullptr},       {"kind", "missed"},
                                       {"output", lName},      {"count", lNew}};
    arOutlet.mpOutlet->writeMissed(lNew, dumpJson(lLine, -1));
    mSetup.mReport("retention removed " + std::to_string(lNew) + " changes of episodes before " +
                   arOutlet.mpOutlet->getTitle() + " had them");
    arOutlet.mTold = lMissed;
    mSetup.mSetValue(getOutletValue(lName, "told"), std::to_string(lMissed));
}

void ZTCOutlets::feed(ZTSFedOutlet& arOutlet) {
    const std::string lName = arOutlet.mpOutlet->getName();
    if (!arOutlet.mSeq) {
        arOutlet.mSeq = sReadNumber(mpHistory->getValue(getOutletValue(lName, "seq")));
        arOutlet.mTold = sReadNumber(mpHistory->getValue(getOutletValue(lName, "told")));
    }
    const ZTCNameBook lNames = makeNames();
    ZTSHistoryFilter lFilter;
    lFilter.mLimit = scMostChanges;
    while (true) {
        lFilter.mAfterSeq = *arOutlet.mSeq;
        std::vector<ZTSOutletChange> lChanges;
        mpHistory->visitChanges(lFilter, [&](const ZTSEpisode& acrEpisode) {
            ZTSOutletChange& lrChange = lChanges.emplace_back();
            lrChange.mEpisode = acrEpisode;
            lrChange.mPort = acrEpisode.mRemotePort ? lNames.describe(*acrEpisode.mRemotePort) : "";
            lrChange.mLine = toLine(acrEpisode, lNames);
            return true;
        });
        try {
            giveMissed(arOutlet);
            if (lChanges.empty()) {
                return;
            }
            arOutlet.mpOutlet->write(lChanges);
            mProblems.note(arOutlet.mpOutlet->getTitle(), "");
        } catch (const ZTCSystemCallEx& lrEx) {
            mProblems.note(arOutlet.mpOutlet->getTitle(), lrEx.what());
            return;
        }
        // They are written. Where the number is stored too late they are only written again.
        arOutlet.mSeq = lChanges.back().mEpisode.mSeq;
        mSetup.mSetValue(getOutletValue(lName, "seq"), std::to_string(*arOutlet.mSeq));
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
        mProblems.note(scMetricsTitle, "");
    } catch (const ZTCSystemCallEx& lrEx) {
        mProblems.note(scMetricsTitle, lrEx.what());
        mNextMetrics = steady_clock::now() + scFeedPeriod;
    }
}
