#include "sensor/collector/include/HistoryWorker.h"

#include <sys/eventfd.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

using std::chrono::milliseconds;
using std::chrono::seconds;
using std::chrono::steady_clock;

/// A transaction is committed at the latest so long after it began.
static constexpr milliseconds scLongestTransaction{500};
/// A frame that waits longer than this is synced itself.
static constexpr seconds scLongestUnsynced{1};
static constexpr seconds scRetryPause{1};
/// After so many tries, a pause between them, a file that cannot be read is given up: the others must not wait for
/// ever.
static constexpr unsigned scReadTries = 10;
static constexpr seconds scUpkeepPeriod{60};
static constexpr seconds scCheckpointPeriod{1};

ZTCHistoryWorker::ZTCHistoryWorker(ZTCSpool& arSpool, std::string aStateDirectory, const ZTSStoreLimits& acrLimits,
                                   Report aReport)
    : mrSpool(arSpool),
      mDirectory(std::move(aStateDirectory)),
      mReport(std::move(aReport)),
      mBell(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)),
      mLimits(acrLimits) {
    if (!mBell.isOpen()) {
        throw ZTCSystemCallEx("cannot make an eventfd", errno);
    }
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

void ZTCHistoryWorker::submit(ZTCJob aJob) {
    {
        const std::lock_guard lLock(mMutex);
        if (const auto* lpFrame = std::get_if<ZTSFrameJob>(&aJob)) {
            ++mState.mWaitingFrames;
            mState.mWaitingBytes += lpFrame->mEntry.mSize;
        }
        // Of pages in a row the last one says it all.
        if (std::holds_alternative<ZTSPageJob>(aJob) && !mQueue.empty() &&
            std::holds_alternative<ZTSPageJob>(mQueue.back())) {
            mQueue.back() = std::move(aJob);
        } else {
            mQueue.push_back(std::move(aJob));
        }
    }
    mWake.notify_all();
}

void ZTCHistoryWorker::takeIn(const ZTSSpoolEntry& acrEntry, ZTCPagePointer apPage) {
    submit(ZTSFrameJob{.mEntry = acrEntry, .mpPage = std::move(apPage), .mSince = steady_clock::now()});
}

void ZTCHistoryWorker::notePage(ZTCPagePointer apPage) {
    submit(ZTSPageJob{std::move(apPage)});
}

void ZTCHistoryWorker::endAgent(ZTSEndedAgent aAgent) {
    submit(std::move(aAgent));
}

void ZTCHistoryWorker::endForgottenAgents(const std::string& acrRunningGeneration) {
    submit(ZTSForgottenJob{acrRunningGeneration});
}

void ZTCHistoryWorker::notePorts(std::shared_ptr<const ZTSTopology> apPorts) {
    submit(ZTSPortsJob{std::move(apPorts)});
}

void ZTCHistoryWorker::noteTopology(ZTCHistoryTime aTime, std::shared_ptr<const ZTSTopology> apTopology) {
    {
        const std::lock_guard lLock(mMutex);
        mScan = {.mTime = aTime, .mpTopology = std::move(apTopology)};
        if (std::exchange(mIsScanQueued, true)) {
            return;
        }
    }
    submit(ZTSTopologyJob{});
}

void ZTCHistoryWorker::noteCounters(std::vector<ZTSCounterSample> aSamples) {
    submit(ZTSCountersJob{std::move(aSamples)});
}

void ZTCHistoryWorker::setLimits(const ZTSStoreLimits& acrLimits) {
    const std::lock_guard lLock(mMutex);
    mLimits = acrLimits;
    mHasNewLimits = true;
}

void ZTCHistoryWorker::setMark(std::uint64_t aTicket, const std::string& acrName, ZTCHistoryTime aTime) {
    submit(ZTSMarkJob{{.mTicket = aTicket, .mName = acrName, .mTime = aTime, .mError = {}}});
}

void ZTCHistoryWorker::setValue(const std::string& acrName, const std::string& acrValue) {
    submit(ZTSValueJob{acrName, acrValue});
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

void ZTCHistoryWorker::ring() {
    const std::uint64_t lOne = 1;
    [[maybe_unused]] const ssize_t lWritten = write(mBell.get(), &lOne, sizeof(lOne));
}

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
    ring();
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
            ring();
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
        if (!pause(scRetryPause)) {
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
    ring();
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
    syncWaiting(arBatch);
    pause(scRetryPause);
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
    syncWaiting(arBatch);
}

/// Behind the commit: removes what is stored from the spool and from the batch.
void ZTCHistoryWorker::settle(std::deque<ZTCJob>& arBatch, std::size_t aCount) {
    const std::size_t lOpenEpisodes = mpStore->countOpenEpisodes();
    noteGeneration();
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
    ring();
}

/// What other agents counted changes only when this one begins or ends.
void ZTCHistoryWorker::noteGeneration() {
    const std::string lGeneration = mpWriter->getGeneration();
    {
        const std::lock_guard lLock(mMutex);
        if (mState.mpOthers != nullptr && mState.mGeneration == lGeneration) {
            return;
        }
    }
    auto lpOthers = std::make_shared<const std::vector<ZTSPageCounts>>(mpStore->sumCountsOfOthers(lGeneration));
    const std::lock_guard lLock(mMutex);
    mState.mGeneration = lGeneration;
    mState.mpOthers = std::move(lpOthers);
}

/// A power cut must not cost more than the last second: what has to wait longer is written to the disk as it is.
void ZTCHistoryWorker::syncWaiting(std::deque<ZTCJob>& arBatch) {
    const auto lNow = steady_clock::now();
    for (ZTCJob& lrJob : arBatch) {
        auto* lpFrame = std::get_if<ZTSFrameJob>(&lrJob);
        if (lpFrame == nullptr || lpFrame->mIsSynced || lNow - lpFrame->mSince < scLongestUnsynced) {
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

// ---- each within the batch's transaction ----

void ZTCHistoryWorker::store(ZTSFrameJob& arJob) {
    try {
        if (const auto lRecords = mpWriter->takeIn(arJob.mEntry, arJob.mpPage, arJob.mTries >= scReadTries)) {
            ++mBatchFrames;
            mBatchRecords += *lRecords;
        }
    } catch (const ZTCSpoolTroubleEx&) {
        ++arJob.mTries;
        throw;
    }
}

void ZTCHistoryWorker::store(ZTSPageJob& arJob) {
    mpWriter->notePage(arJob.mpPage);
}

void ZTCHistoryWorker::store(ZTSEndedAgent& arAgent) {
    mpWriter->endAgent(arAgent);
}

void ZTCHistoryWorker::store(ZTSForgottenJob& arJob) {
    mpWriter->endForgottenAgents(arJob.mRunningGeneration);
}

void ZTCHistoryWorker::store(ZTSPortsJob& arJob) {
    mpWriter->notePorts(arJob.mpPorts);
}

void ZTCHistoryWorker::store(ZTSTopologyJob& /*arJob*/) {
    ZTSScan lScan;
    {
        const std::lock_guard lLock(mMutex);
        lScan = mScan;
        mIsScanQueued = false;
    }
    if (!mpStore->noteTopology(toMicroseconds(lScan.mTime), *lScan.mpTopology)) {
        // The rest is for a later transaction, behind the frames that wait.
        const std::lock_guard lLock(mMutex);
        if (!std::exchange(mIsScanQueued, true)) {
            mQueue.emplace_back(ZTSTopologyJob{});
        }
    }
}

void ZTCHistoryWorker::store(ZTSCountersJob& arJob) {
    mpStore->noteCounters(arJob.mSamples);
}

void ZTCHistoryWorker::store(ZTSMarkJob& arJob) {
    mpStore->setMark(arJob.mMark.mName, arJob.mMark.mTime);
}

void ZTCHistoryWorker::store(ZTSValueJob& arJob) {
    mpStore->setValue(arJob.mName, arJob.mValue);
}
