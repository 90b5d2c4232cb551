#include "sensor/collector/include/HistoryWorker.h"

#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>

using std::chrono::milliseconds;
using std::chrono::seconds;
using std::chrono::steady_clock;

/// A transaction is committed at the latest so long after it began.
static constexpr milliseconds scLongestTransaction{500};
/// A frame that is older than this when a transaction is over is synced itself. A younger one is committed or synced at
/// the end of the next transaction. So nothing is unsynced for much more than a second.
static constexpr milliseconds scLongestUnsynced{500};
static constexpr seconds scUpkeepPeriod{60};
static constexpr seconds scCheckpointPeriod{1};

ZTCHistoryWorker::ZTCHistoryWorker(ZTCSpool& arSpool, std::string aStateDirectory, const ZTSStoreLimits& acrLimits,
                                   Report aReport, milliseconds aRetryPause)
    : mrSpool(arSpool),
      mDirectory(std::move(aStateDirectory)),
      mReport(std::move(aReport)),
      mRetryPause(aRetryPause),
      mLimits(acrLimits) {
    mThread = std::thread([this] { run(); });
}

ZTCHistoryWorker::~ZTCHistoryWorker() {
    {
        const std::lock_guard lLock(mMutex);
        mIsStopping = true;
    }
    mWake.notify_all();
    if (mThread.joinable()) {
        mThread.join();
    }
}

// ---- for the other thread ----

void ZTCHistoryWorker::setLimits(const ZTSStoreLimits& acrLimits) {
    const std::lock_guard lLock(mMutex);
    mLimits = acrLimits;
    mHasNewLimits = true;
}

std::string ZTCHistoryWorker::takeStoredLosses() {
    const std::lock_guard lLock(mMutex);
    return std::exchange(mStoredLosses, {});
}

std::vector<ZTSMarkResult> ZTCHistoryWorker::takeMarkResults() {
    const std::lock_guard lLock(mMutex);
    return std::exchange(mMarkResults, {});
}

ZTSHistoryState ZTCHistoryWorker::getState() const {
    const std::lock_guard lLock(mMutex);
    return mState;
}

bool ZTCHistoryWorker::finish(milliseconds aAtMost) {
    bool lIsDone = false;
    {
        std::unique_lock lLock(mMutex);
        mIsFinishing = true;
        mWake.notify_all();
        lIsDone = mWake.wait_for(lLock, aAtMost, [this] { return mIsDone; });
        mIsStopping = true;
    }
    mWake.notify_all();
    mThread.join();
    return lIsDone;
}

// ---- the thread ----

/// False: the thread is to end.
bool ZTCHistoryWorker::pause(milliseconds aTime) {
    std::unique_lock lLock(mMutex);
    return !mWake.wait_for(lLock, aTime, [this] { return mIsStopping; });
}

void ZTCHistoryWorker::setProblem(const std::string& acrProblem) {
    if (acrProblem != mLastProblem) {
        mReport(acrProblem.empty() ? "the history can be written again" : acrProblem);
        mLastProblem = acrProblem;
    }
    struct statvfs lRoom {};
    const bool lIsReadOnly =
        !acrProblem.empty() && statvfs(mDirectory.c_str(), &lRoom) == 0 && (lRoom.f_flag & ST_RDONLY) != 0;
    {
        const std::lock_guard lLock(mMutex);
        mState.mProblem = acrProblem;
        mState.mIsReadOnly = lIsReadOnly;
    }
    mBell.ring();
}

/// False: the thread is to end.
bool ZTCHistoryWorker::openStore() {
    while (true) {
        std::string lProblem;
        try {
            ZTSStoreLimits lLimits;
            {
                const std::lock_guard lLock(mMutex);
                lLimits = mLimits;
                mHasNewLimits = false;
            }
            if (mpStore == nullptr) {
                mpStore = std::make_unique<ZTCStore>(mDirectory, lLimits, mReport);
            } else {
                mpStore->reopen();  // sets a damaged database aside
            }
            mpWriter = std::make_unique<ZTCHistoryWriter>(*mpStore, mrSpool, mReport);
            beginRun();
            break;
        } catch (const ZTCStoreNewerEx& lrEx) {
            {
                const std::lock_guard lLock(mMutex);
                mState.mFatal = lrEx.what();
            }
            mBell.ring();
            return false;
        } catch (const ZTCStoreDamagedEx& lrEx) {
            mpWriter.reset();  // the store stays: it knows that its database is damaged
            lProblem = lrEx.what();
        } catch (const ZTCStoreEx& lrEx) {
            mpWriter.reset();
            mpStore.reset();
            lProblem = lrEx.what();
        }
        setProblem(lProblem);
        if (!pause(mRetryPause)) {
            return false;
        }
    }
    setProblem("");
    return true;
}

void ZTCHistoryWorker::beginRun() {
    ZTCStoreTransaction lTransaction = mpStore->begin();
    mpStore->beginRun(getHistoryTime());
    lTransaction.commit();
    const std::string lLosses = mpStore->getValue(gcLossesValue);
    const std::lock_guard lLock(mMutex);
    mStoredLosses = lLosses;
    mState.mIsOpen = true;
    mState.mStoreId = mpStore->getStoreId();
    mState.mLastFrame = mpStore->getLastFrame();
    mState.mpOthers = nullptr;
}

/// Adds what waits to the batch; waits for something where the batch is empty. False: the thread is to end.
bool ZTCHistoryWorker::nextBatch(std::deque<ZTCJob>& arBatch) {
    std::unique_lock lLock(mMutex);
    const auto lHasWork = [this] { return mIsStopping || mIsFinishing || !mQueue.empty(); };
    if (arBatch.empty()) {
        mWake.wait_until(lLock, mHasMoreToRetire ? mLastUpkeep : mLastUpkeep + scUpkeepPeriod, lHasWork);
    }
    std::ranges::move(mQueue, std::back_inserter(arBatch));
    mQueue.clear();
    return !mIsStopping && !(mIsFinishing && arBatch.empty());
}

void ZTCHistoryWorker::run() {
    std::deque<ZTCJob> lBatch;
    if (openStore()) {
        while (nextBatch(lBatch)) {
            work(lBatch);
        }
        bool lIsFinished = false;
        {
            const std::lock_guard lLock(mMutex);
            lIsFinished = mIsFinishing && !mIsStopping;
        }
        if (lIsFinished) {
            closeRun();
        }
        mpWriter.reset();
        mpStore.reset();
        const std::lock_guard lLock(mMutex);
        mIsDone = lIsFinished;
    }
    mWake.notify_all();
    mBell.ring();
}

/// Stores as much of the batch as one transaction takes. What is not stored stays in the batch.
void ZTCHistoryWorker::work(std::deque<ZTCJob>& arBatch) {
    try {
        ZTSStoreLimits lLimits;
        bool lHasLimits = false;
        {
            const std::lock_guard lLock(mMutex);
            lHasLimits = std::exchange(mHasNewLimits, false);
            lLimits = mLimits;
        }
        if (lHasLimits) {
            mpStore->setLimits(lLimits);
        }
        storeBatch(arBatch);
        if (!mLastProblem.empty()) {
            setProblem("");
        }
        upkeep();
        return;
    } catch (const ZTCStoreDamagedEx& lrEx) {
        setProblem(lrEx.what());
        try {
            mpStore->reopen();
            beginRun();
            return;
        } catch (const ZTCStoreEx& lrReopenEx) {
            setProblem(lrReopenEx.what());
        }
    } catch (const ZTCStoreEx& lrEx) {
        setProblem(lrEx.what());
    } catch (const ZTCSpoolTroubleEx& lrEx) {
        setProblem(lrEx.what());
    }
    syncWaiting(arBatch, milliseconds(0));
    pause(mRetryPause);
}

void ZTCHistoryWorker::storeBatch(std::deque<ZTCJob>& arBatch) {
    if (arBatch.empty()) {
        return;
    }
    const auto lBegin = steady_clock::now();
    mBatchFrames = 0;
    mBatchRecords = 0;
    std::size_t lCount = 0;
    ZTCStoreTransaction lTransaction = mpStore->begin();
    while (lCount < arBatch.size() && steady_clock::now() - lBegin < scLongestTransaction) {
        std::visit([this](auto& arJob) { store(arJob); }, arBatch[lCount]);
        ++lCount;
    }
    lTransaction.commit();
    settle(arBatch, lCount);
    syncWaiting(arBatch, scLongestUnsynced);
}

/// Behind the commit: removes what is stored from the spool and from the batch.
void ZTCHistoryWorker::settle(std::deque<ZTCJob>& arBatch, std::size_t aCount) {
    const std::size_t lOpenEpisodes = mpStore->countOpenEpisodes();
    bool lIsAwaited = noteGeneration();
    {
        const std::lock_guard lLock(mMutex);
        mState.mTakenFrames += mBatchFrames;
        mState.mTakenRecords += mBatchRecords;
        mState.mOpenEpisodes = lOpenEpisodes;
        if (mBatchFrames != 0) {
            mState.mLastTaken = getHistoryTime();
        }
    }
    for (; aCount > 0; --aCount) {
        lIsAwaited = lIsAwaited || !std::holds_alternative<ZTSPageJob>(arBatch.front());
        if (const auto* lpFrame = std::get_if<ZTSFrameJob>(&arBatch.front())) {
            mrSpool.remove(lpFrame->mEntry.mName);
            const std::lock_guard lLock(mMutex);
            --mState.mWaitingFrames;
            mState.mWaitingBytes -= lpFrame->mEntry.mSize;
        } else if (const auto* lpAgent = std::get_if<ZTSEndedAgent>(&arBatch.front())) {
            if (!lpAgent->mPagePath.empty()) {
                unlink(lpAgent->mPagePath.c_str());
            }
        } else if (const auto* lpMark = std::get_if<ZTSMarkJob>(&arBatch.front())) {
            const std::lock_guard lLock(mMutex);
            mMarkResults.push_back(lpMark->mMark);
        }
        arBatch.pop_front();
    }
    if (lIsAwaited) {
        mBell.ring();  // not for the counts of an idle agent's page, which come at every look
    }
}

/// The counts of other agents change only when this one begins or ends. True: they were read again.
bool ZTCHistoryWorker::noteGeneration() {
    const std::string lGeneration = mpWriter->getGeneration();
    {
        const std::lock_guard lLock(mMutex);
        if (mState.mpOthers != nullptr && mState.mGeneration == lGeneration) {
            return false;
        }
    }
    auto lpOthers = std::make_shared<const std::vector<ZTSPageCounts>>(mpStore->sumCountsOfOthers(lGeneration));
    const std::lock_guard lLock(mMutex);
    mState.mGeneration = lGeneration;
    mState.mpOthers = std::move(lpOthers);
    return true;
}

/// A power cut must not cost more than the last second: frames that have waited for at least this time, and are not
/// committed, are written to the disk as they are.
void ZTCHistoryWorker::syncWaiting(std::deque<ZTCJob>& arBatch, milliseconds aAge) {
    const auto lNow = steady_clock::now();
    for (ZTCJob& lrJob : arBatch) {
        auto* lpFrame = std::get_if<ZTSFrameJob>(&lrJob);
        if (lpFrame == nullptr || lpFrame->mIsSynced || lNow - lpFrame->mSince < aAge) {
            continue;
        }
        try {
            mrSpool.sync(lpFrame->mEntry.mName);
            lpFrame->mIsSynced = true;
        } catch (const ZTCSpoolTroubleEx& lrEx) {
            setProblem(lrEx.what());
            return;
        }
    }
}

void ZTCHistoryWorker::upkeep() {
    const auto lNow = steady_clock::now();
    if (lNow - mLastCheckpoint >= scCheckpointPeriod) {
        mLastCheckpoint = lNow;
        mpStore->checkpoint();
    }
    if (lNow - mLastUpkeep < scUpkeepPeriod && !mHasMoreToRetire) {
        return;
    }
    mLastUpkeep = lNow;
    ZTCStoreTransaction lTransaction = mpStore->begin();
    mpStore->noteRunning(getHistoryTime());
    mpWriter->closeEpisodes();
    lTransaction.commit();
    mHasMoreToRetire = mpStore->retireStep(getHistoryTime(), lNow);
}

void ZTCHistoryWorker::closeRun() {
    try {
        ZTCStoreTransaction lTransaction = mpStore->begin();
        mpStore->noteCoverage(getHistoryTime(), {});
        mpStore->endRun(getHistoryTime());
        lTransaction.commit();
    } catch (const ZTCStoreEx& lrEx) {
        mReport(std::string("the end of this run is not in the history: ") + lrEx.what());
    }
}
