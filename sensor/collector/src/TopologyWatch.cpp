#include "sensor/collector/include/TopologyWatch.h"

#include <algorithm>
#include <condition_variable>
#include <cstdlib>
#include <mutex>

#include "sensor/topology/include/CounterDifferences.h"

using std::chrono::milliseconds;
using ZTCTime = std::chrono::steady_clock::time_point;

/// How long the end waits for a scan that is under way.
static constexpr std::chrono::seconds scStopPatience{1};
static constexpr std::chrono::microseconds scMinute = std::chrono::minutes(1);

ZTSTopologyWatchSetup makeTopologyWatchSetup() {
    ZTSTopologyWatchSetup lSetup;
    const auto lTake = [](const char* apVariable, std::string& arRoot) {
        const char* const lpRoot = std::getenv(apVariable);
        if (lpRoot != nullptr && *lpRoot != '\0') {
            arRoot = lpRoot;
        }
    };
    lTake(gcSysfsVariable, lSetup.mRoots.mSysfs);
    lTake(gcProcfsVariable, lSetup.mRoots.mProcfs);
    return lSetup;
}

/// All that the thread touches. It is shared with it, since the thread may outlive the watch.
class ZTCTopologyWatch::ZTCThread {
public:
    ZTCThread(ZTCTopologySink& arSink, ZTSTopologyWatchSetup aSetup)
        : mSetup(std::move(aSetup)), mReader(mSetup.mPatience), mpSink(&arSink) {}

    void run();
    bool stop();
    void hurry();
    std::shared_ptr<const ZTSTopology> getPorts() const;
    std::shared_ptr<const ZTSTopology> getTopology() const;
    ZTSTopologyState getState() const;
    const ZTCEventBell& getBell() const { return mBell; }

private:
    bool wait();
    ZTCTime getNext() const;
    void scanWhole();
    void turn();
    void publishPorts(const ZTSTopology& acrPorts);
    void sampleCounters();
    std::int64_t getMinute() const { return mSetup.mClock().time_since_epoch() / scMinute; }

    // ---- constant after construction, or with a lock of its own ----
    const ZTSTopologyWatchSetup mSetup;
    ZTCPatientReader mReader;
    const ZTCEventBell mBell;
    const ZTCHistoryTime mBegun = mSetup.mClock();

    // ---- of the thread ----
    ZTCCounterDifferences mDifferences;
    std::optional<std::int64_t> mLastMinute;
    ZTCTime mNextPorts{};
    ZTCTime mNextWhole{};
    ZTCTime mLastWhole{};

    // ---- guarded by mMutex ----
    mutable std::mutex mMutex;
    std::condition_variable mChanged;
    ZTCTopologySink* mpSink;  ///< null: stopped
    bool mIsHurried = false;
    bool mIsOver = false;
    std::shared_ptr<const ZTSTopology> mpPorts;
    std::shared_ptr<const ZTSTopology> mpTopology;
    std::optional<ZTCHistoryTime> mScanned;
    ZTCTime mScannedAt{};
    std::optional<ZTCHistoryTime> mBlockedSince;  ///< the look after which files blocked, and have since
};

void ZTCTopologyWatch::ZTCThread::run() {
    do {
        try {
            turn();
        } catch (const std::exception&) {
            // No memory, or no thread for a file that blocks. The next try comes at the next time. Until then the age
            // of the last scan shows it.
            mLastMinute = getMinute();
        }
    } while (wait());
    const std::lock_guard lLock(mMutex);
    mIsOver = true;
    mChanged.notify_all();
}

/// Does all that is due. A part that throws is tried again at its next time, not at once.
void ZTCTopologyWatch::ZTCThread::turn() {
    const ZTCTime lNow = std::chrono::steady_clock::now();
    if (lNow >= mNextPorts) {
        mNextPorts = lNow + mSetup.mPortsPeriod;
        publishPorts(scanPorts(mSetup.mRoots.mSysfs, mReader));
    }
    if (lNow >= mNextWhole) {
        mNextWhole = lNow + mSetup.mWholePeriod;
        scanWhole();
    }
    sampleCounters();
}

ZTCTime ZTCTopologyWatch::ZTCThread::getNext() const {
    const std::chrono::microseconds lIntoMinute(toMicroseconds(mSetup.mClock()) % scMinute.count());
    const ZTCTime lMinuteEnd = std::chrono::steady_clock::now() + (scMinute - lIntoMinute);
    return std::min({mNextPorts, mNextWhole, lMinuteEnd});
}

/// Until something is due. False: the thread is to end.
bool ZTCTopologyWatch::ZTCThread::wait() {
    std::unique_lock lLock(mMutex);
    if (!mIsHurried && mpSink != nullptr) {
        mChanged.wait_until(lLock, getNext(), [this] { return mIsHurried || mpSink == nullptr; });
    }
    if (mIsHurried) {
        mIsHurried = false;
        mNextWhole = std::min(mNextWhole, mLastWhole + mSetup.mHurryPause);
    }
    return mpSink != nullptr;
}

void ZTCTopologyWatch::ZTCThread::scanWhole() {
    const auto lpTopology = std::make_shared<const ZTSTopology>(scanTopology(mSetup.mRoots, mReader));
    const ZTCHistoryTime lTime = mSetup.mClock();
    mLastWhole = std::chrono::steady_clock::now();
    mNextWhole = mLastWhole + mSetup.mWholePeriod;
    mNextPorts = mLastWhole + mSetup.mPortsPeriod;
    publishPorts(*lpTopology);
    const bool lIsBlocked = !lpTopology->mBlocked.empty();
    const std::lock_guard lLock(mMutex);
    mBlockedSince = lIsBlocked ? std::optional(mBlockedSince.value_or(lTime)) : std::nullopt;
    mpTopology = lpTopology;
    mScanned = lTime;
    mScannedAt = mLastWhole;
    if (mpSink != nullptr) {
        mpSink->noteTopology(lTime, lpTopology);
    }
}

/// A change of the ports is a reason to read everything.
void ZTCTopologyWatch::ZTCThread::publishPorts(const ZTSTopology& acrPorts) {
    const std::lock_guard lLock(mMutex);
    if (mpPorts != nullptr && mpPorts->mInitiators == acrPorts.mInitiators &&
        mpPorts->mRemotePorts == acrPorts.mRemotePorts) {
        return;
    }
    auto lpPorts = std::make_shared<ZTSTopology>();
    lpPorts->mInitiators = acrPorts.mInitiators;
    lpPorts->mRemotePorts = acrPorts.mRemotePorts;
    mIsHurried = mIsHurried || mpPorts != nullptr;
    mpPorts = lpPorts;
    if (mpSink != nullptr) {
        mpSink->notePorts(std::move(lpPorts));
    }
    mBell.ring();
}

/// A difference belongs to the minute that has just ended.
void ZTCTopologyWatch::ZTCThread::sampleCounters() {
    const std::int64_t lMinute = getMinute();
    if (mLastMinute == lMinute) {
        return;
    }
    mLastMinute = lMinute;
    std::vector<ZTSCounterSample> lSamples;
    for (ZTSCounterReading& lrRise : mDifferences.take(scanCounters(mSetup.mRoots.mSysfs, *getPorts(), mReader))) {
        lSamples.push_back({.mMinute = (lMinute - 1) * scMinute.count(),
                            .mInitiator = lrRise.mInitiator,
                            .mRemotePort = lrRise.mRemotePort,
                            .mCounter = std::move(lrRise.mName),
                            .mDifference = lrRise.mValue});
    }
    const std::lock_guard lLock(mMutex);
    if (mpSink != nullptr && !lSamples.empty()) {
        mpSink->noteCounters(std::move(lSamples));
    }
}

void ZTCTopologyWatch::ZTCThread::hurry() {
    const std::lock_guard lLock(mMutex);
    mIsHurried = true;
    mChanged.notify_all();
}

/// Whether the thread is at its end.
bool ZTCTopologyWatch::ZTCThread::stop() {
    std::unique_lock lLock(mMutex);
    mpSink = nullptr;
    mChanged.notify_all();
    return mChanged.wait_for(lLock, scStopPatience, [this] { return mIsOver; });
}

std::shared_ptr<const ZTSTopology> ZTCTopologyWatch::ZTCThread::getPorts() const {
    const std::lock_guard lLock(mMutex);
    return mpPorts;
}

std::shared_ptr<const ZTSTopology> ZTCTopologyWatch::ZTCThread::getTopology() const {
    const std::lock_guard lLock(mMutex);
    return mpTopology;
}

ZTSTopologyState ZTCTopologyWatch::ZTCThread::getState() const {
    ZTSTopologyState lState;
    lState.mBlocked = mReader.getBlockedPaths();
    const std::lock_guard lLock(mMutex);
    lState.mScanned = mScanned;
    if (mScanned) {
        lState.mAge = std::chrono::duration_cast<milliseconds>(std::chrono::steady_clock::now() - mScannedAt);
    }
    lState.mIsStale = !mScanned || *lState.mAge > mSetup.mStaleAfter || !lState.mBlocked.empty();
    if (lState.mIsStale) {
        lState.mStaleSince = mBlockedSince ? *mBlockedSince : mScanned.value_or(mBegun);
    }
    return lState;
}

// ---- the owner's side ----

ZTCTopologyWatch::ZTCTopologyWatch(ZTCTopologySink& arSink, ZTSTopologyWatchSetup aSetup)
    : mpThread(std::make_shared<ZTCThread>(arSink, std::move(aSetup))),
      mRunner([lpThread = mpThread] { lpThread->run(); }) {}

ZTCTopologyWatch::~ZTCTopologyWatch() {
    stop();
}

void ZTCTopologyWatch::stop() {
    if (!mRunner.joinable()) {
        return;
    }
    if (mpThread->stop()) {
        mRunner.join();
    } else {
        mRunner.detach();
    }
}

void ZTCTopologyWatch::hurry() {
    mpThread->hurry();
}

std::shared_ptr<const ZTSTopology> ZTCTopologyWatch::getPorts() const {
    return mpThread->getPorts();
}

std::shared_ptr<const ZTSTopology> ZTCTopologyWatch::getTopology() const {
    return mpThread->getTopology();
}

ZTSTopologyState ZTCTopologyWatch::getState() const {
    return mpThread->getState();
}

const ZTCEventBell& ZTCTopologyWatch::getBell() const {
    return mpThread->getBell();
}
