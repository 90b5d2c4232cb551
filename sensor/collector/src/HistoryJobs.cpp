// The jobs of the history's thread: how each comes into the queue, and what of it is stored. A new kind of job is added
// here. HistoryWorker.cpp has the thread and its transactions.
#include "sensor/collector/include/HistoryWorker.h"

using std::chrono::steady_clock;

/// After so many tries, a pause between them, a file that cannot be read is given up: the others must not wait for
/// ever.
static constexpr unsigned scReadTries = 10;

// ---- in: any thread ----

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

void ZTCHistoryWorker::setMark(std::uint64_t aTicket, const std::string& acrName, ZTCHistoryTime aTime) {
    submit(ZTSMarkJob{{.mTicket = aTicket, .mName = acrName, .mTime = aTime, .mError = {}}});
}

void ZTCHistoryWorker::setValue(const std::string& acrName, const std::string& acrValue) {
    submit(ZTSValueJob{acrName, acrValue});
}

// ---- out: the worker's thread, each within the batch's transaction ----

void ZTCHistoryWorker::store(ZTSFrameJob& arJob) {
    try {
        if (const auto lRecords = mpWriter->takeIn(arJob.mEntry, arJob.mpPage, arJob.mTries >= scReadTries)) {
            ++mBatchFrames;
            mBatchRecords += *lRecords;
        }
    } catch (const ZTCSpoolTroubleEx& lrEx) {
        arJob.mTries += isShortage(lrEx.getErrno()) ? 0 : 1;  // then no other file could be read either
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
