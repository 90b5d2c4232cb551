#include "libkpm/linux/src/Engine.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <exception>
#include <system_error>
#include <utility>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/common/include/LibraryThread.h"
#include "libkpm/linux/src/Losses.h"

ZTCLinuxEngine::ZTCLinuxEngine(ZTSLinuxOptions aOptions, ZTCLinuxSources& arSources)
    : ZTCRegistrationDesk(gcLinuxKindCount),
      mOptions(std::move(aOptions)),
      mSysfs(mOptions.mSysfsRoot),
      mWake(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)),
      mDelivery(getRegistry()),
      mLosses(gcLinuxLosses),
      mWatcher(mSysfs, mDelivery, mLosses),
      mDepths(mSysfs, mWatcher, mDelivery),
      mMessages(arSources, mWatcher, mDelivery, mLosses, mOptions.mPollInterval),
      mOutcomes(mOptions.mTracePlace, arSources, mWatcher, mDepths, mDelivery, mLosses) {
    if (!mWake.isOpen()) {
        throw std::system_error(errno, std::generic_category(), "eventfd");
    }
}

ZTCLinuxEngine::~ZTCLinuxEngine() {
    stop();
}

// ---- Start and stop ----

void ZTCLinuxEngine::start() {
    mWatcher.look();
    noteHosts();
    mDepths.look(Clock::now());
    mDepths.serve(Clock::now());
    report();
    tellMissing();
    mNextLook = Clock::now() + mOptions.mPollInterval;
    mThread = startLibraryThread([this] { run(); });
}

void ZTCLinuxEngine::stop() {
    mIsStopping.store(true, std::memory_order_relaxed);
    const std::uint64_t lOne = 1;
    const ssize_t lWritten = ::write(mWake.get(), &lOne, sizeof lOne);
    static_cast<void>(lWritten);
    if (mThread.joinable()) {
        mThread.join();
    }
}

void ZTCLinuxEngine::tellMissing() const {
    std::string lNames;
    for (std::size_t lKind = 0; lKind < gcLinuxKindCount; ++lKind) {
        const ZTEFeedState lState = getSourceState(lKind);
        if (getLinuxSource(lKind) == ZTLSO_None || lState == ZTFS_NoRights || lState == ZTFS_Failed ||
            lState == ZTFS_Idle) {
            lNames += lNames.empty() ? "" : ", ";
            lNames += gcScopeEventKinds[lKind].mpName;
        }
    }
    logLibraryLine(KPM_LOG_NOTICE, "this host cannot deliver: " + lNames);
}

// ---- The thread ----

void ZTCLinuxEngine::run() {
    while (!mIsStopping.load(std::memory_order_relaxed)) {
        try {
            runRound();
            mLosses.tell(Clock::now());
        } catch (const std::exception&) {
            // Memory has run out over one event: the next may fare better.
            mLosses.count(ZTLO_Failure);
            waitAfterFailure();
        }
    }
    finish();
}

void ZTCLinuxEngine::runRound() {
    waitForWork();
    if (mIsStopping.load(std::memory_order_relaxed)) {
        return;
    }
    if (mPolls[1].revents != 0) {
        mMessages.serve();
    }
    mOutcomes.serve();
    if (Clock::now() >= mNextLook) {
        mNextLook = Clock::now() + mOptions.mPollInterval;
        look();
    }
    if (mHostsVersion != mWatcher.getVersion()) {
        noteHosts();
    }
    mDepths.serve(Clock::now());
    report();
}

/// Delivers and reports what is left, as far as memory allows. Closes the sources in any case.
void ZTCLinuxEngine::finish() {
    try {
        mOutcomes.stop();
        mMessages.stop();
        mLosses.tellAll();
    } catch (const std::exception&) {
        mLosses.count(ZTLO_Failure);  // without memory, there is nothing to say it with
    }
}

/// Waits until a source is readable, a look is due, or the engine stops, and marks what is to be read.
void ZTCLinuxEngine::waitForWork() {
    static constexpr std::size_t scFirstBuffer = 2;
    // A member: with memory short, waiting must go on working.
    mPolls.resize(scFirstBuffer + mOutcomes.getBufferCount());
    mPolls[0] = {mWake.get(), POLLIN, 0};
    // poll skips a negative descriptor.
    mPolls[1] = {mMessages.getDescriptor(), POLLIN, 0};
    for (std::size_t lBuffer = 0; lBuffer < mOutcomes.getBufferCount(); ++lBuffer) {
        mPolls[scFirstBuffer + lBuffer] = {mOutcomes.getDescriptor(lBuffer), POLLIN, 0};
    }
    const Clock::time_point lNext =
        std::min({mNextLook, mDepths.getNextTime().value_or(mNextLook), mOutcomes.getNextTime().value_or(mNextLook)});
    const auto lLeft = std::chrono::duration_cast<std::chrono::milliseconds>(lNext - Clock::now()).count() + 1;
    const auto lTimeout = static_cast<int>(std::clamp<long long>(lLeft, 0, mOptions.mPollInterval.count() + 1));
    if (::poll(mPolls.data(), mPolls.size(), lTimeout) < 0 && errno != EINTR) {
        // Memory is short, or fewer descriptors are allowed than are open: until the next look, only a stop is waited
        // for.
        mLosses.count(ZTLO_Failure);
        ::poll(mPolls.data(), 1, lTimeout);
    }
    for (std::size_t lBuffer = 0; lBuffer < mOutcomes.getBufferCount(); ++lBuffer) {
        if (mPolls[scFirstBuffer + lBuffer].revents != 0) {
            mOutcomes.markReady(lBuffer);
        }
    }
}

/// Keeps rounds that fail from following each other without a pause.
void ZTCLinuxEngine::waitAfterFailure() {
    static constexpr int scMilliseconds = 10;
    pollfd lWake{mWake.get(), POLLIN, 0};
    ::poll(&lWake, 1, scMilliseconds);
}

void ZTCLinuxEngine::look() {
    mWatcher.allowSearch();
    mWatcher.look();
    noteHosts();
    mMessages.look();
    mOutcomes.look();
    mDepths.look(Clock::now());
}

/// The sources are opened with the first board: a machine without FC hosts is left alone.
void ZTCLinuxEngine::noteHosts() {
    if (mWatcher.countBoards() != 0) {
        mMessages.noteHosts();
        mOutcomes.noteHosts();
    }
    mHostsVersion = mWatcher.getVersion();
}

// ---- Reports ----

void ZTCLinuxEngine::report() {
    const ZTCSourceReports::Moment lMoment{mWatcher.getVersion(), mWatcher.getState().getChanges(),
                                           mMessages.getState().getChanges(), mOutcomes.getChanges()};
    if (!mReports.isNew(lMoment)) {
        return;
    }
    for (std::uint32_t lBoard = 0; lBoard < mWatcher.countBoards(); ++lBoard) {
        ZTCSourceRow lRow;
        for (std::size_t lKind = 0; lKind < gcLinuxKindCount; ++lKind) {
            lRow[lKind] = makeReport(mWatcher.getBoard(lBoard), lKind);
        }
        mReports.update(lBoard, lRow);
    }
    mReports.note(lMoment);
}

ZTSSourceReport ZTCLinuxEngine::makeReport(const ZTSLinuxBoard& acrBoard, std::size_t aKind) const {
    const ZTELinuxSource lSource = getLinuxSource(aKind);
    if (lSource == ZTLSO_None) {
        return {KPM_STATE_NO_SOURCE, "the kernel has no generic source for it"};
    }
    if (!acrBoard.mHost && aKind != gcLinuxAdapterArrival) {
        return {KPM_STATE_FAILED, "the board's host is gone"};
    }
    if (lSource == ZTLSO_Messages) {
        return makeSourceReport(mMessages.getState().get(), mMessages.getState().getReason());
    }
    if (lSource == ZTLSO_Trace) {
        ZTSSourceReport lReport = makeSourceReport(mOutcomes.getState().get(), mOutcomes.getState().getReason());
        if (lReport.mState != KPM_STATE_WORKING) {
            return lReport;
        }
        const std::string lHostProblem = mOutcomes.getHostProblem(*acrBoard.mHost);
        if (!lHostProblem.empty()) {
            return {KPM_STATE_FAILED, lHostProblem};
        }
        if (aKind == gcLinuxCheckCondition) {
            lReport.mReason = mOutcomes.getSenseProblem();
        }
        return lReport;
    }
    return makeSourceReport(mWatcher.getState().get(), mWatcher.getState().getReason());
}

// ---- The entries' questions, from any thread ----

std::uint32_t ZTCLinuxEngine::answerAdapterInfo(std::uint32_t aBoard, ZTSBoardNames& arNames) {
    mWatcher.copyNames(aBoard, arNames.mNodeName, arNames.mPortName);
    return ZTLST_Success;
}

bool ZTCLinuxEngine::isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const {
    return mWatcher.isPortOf(aBoard, acrPort);
}

std::optional<std::size_t> ZTCLinuxEngine::findKind(std::uint32_t aCategory, std::uint32_t aSubcategory) const {
    return findRegisteredKindIndex(aCategory, aSubcategory);
}

ZTEFeedState ZTCLinuxEngine::getSourceState(std::size_t aKind) const {
    switch (getLinuxSource(aKind)) {
        case ZTLSO_Messages:
            return mMessages.getState().get();
        case ZTLSO_Trace:
            return mOutcomes.getState().get();
        case ZTLSO_None:
        case ZTLSO_Hosts:
            break;
    }
    return ZTFS_Working;
}

ZTSRegistrationAnswer ZTCLinuxEngine::answerRegistration(std::uint32_t aBoard, std::size_t aKind) {
    if (getLinuxSource(aKind) == ZTLSO_None) {
        const bool lIsPerBoard = gcScopeEventKinds[aKind].mRegisteredCategory == 0;
        return {KPM_STATUS_NO_SOURCE, lIsPerBoard ? std::optional(0u) : std::nullopt, false};
    }
    std::uint32_t lState = mReports.getState(aBoard, aKind);
    if (lState == 0) {
        // The board has just come: its first report is on its way.
        lState = makeSourceReport(getSourceState(aKind), std::string()).mState;
    }
    return {lState == KPM_STATE_WORKING ? KPM_STATUS_SUCCESS : KPM_STATUS_NO_RIGHTS, std::nullopt, true};
}
