#include "libkpm/sim/src/Engine.h"

#include <algorithm>
#include <cstring>
#include <exception>
#include <queue>
#include <string>
#include <utility>

#include "libkpm/common/include/LibraryThread.h"
#include "libkpm/common/include/PortName.h"
#include "libkpm/sim/src/Lending.h"
#include "libkpm/sim/src/Report.h"

ZTCSimEngine::ZTCSimEngine(ZTSSimScenario aScenario)
    : ZTCRegistrationDesk(gcScopeEventKindCount),
      mScenario(std::move(aScenario)),
      mSources(mScenario.mAdapters.size()),
      mCount(mScenario.mCount.value_or(static_cast<std::uint32_t>(mScenario.mAdapters.size()))),
      mLinkTags(mScenario.mAdapters.size()),
      mAnswerUses(mScenario.mAnswers.size()) {}

ZTCSimEngine::~ZTCSimEngine() {
    stop();
}

static std::uint64_t sGetDueTime(const ZTSSimCountChange& acrChange, std::uint64_t) {
    return acrChange.mAt;
}

static std::uint64_t sGetDueTime(const ZTSSimState& acrState, std::uint64_t) {
    return acrState.mAt;
}

static std::uint64_t sGetDueTime(const ZTSSimEvent& acrEvent, std::uint64_t aOccurrence) {
    return acrEvent.mAt + aOccurrence * acrEvent.mEvery;
}

static std::uint64_t sGetDueTime(const ZTSSimLoss& acrLoss, std::uint64_t aOccurrence) {
    return acrLoss.mAt + aOccurrence * acrLoss.mEvery;
}

static std::uint64_t sGetDueTime(const ZTSSimStorm& acrStorm, std::uint64_t aOccurrence) {
    return acrStorm.mAt + aOccurrence * acrStorm.mOver / acrStorm.mCount;
}

std::uint64_t ZTCSimEngine::Share::getDueTime() const {
    return std::visit([this](const auto* apLine) { return sGetDueTime(*apLine, mNext); }, mLine);
}

std::vector<ZTCSimEngine::Lane> ZTCSimEngine::makeLanes() const {
    std::vector<Lane> lLanes;
    Lane lTimer;
    for (const ZTSSimCountChange& lrChange : mScenario.mCountChanges) {
        lTimer.push_back({&lrChange, 0, 1, 1});
    }
    for (const ZTSSimState& lrState : mScenario.mStates) {
        if (lrState.mIsTimed) {
            lTimer.push_back({&lrState, 0, 1, 1});
        }
    }
    for (const ZTSSimLoss& lrLoss : mScenario.mLosses) {
        lTimer.push_back({&lrLoss, 0, 1, lrLoss.mTimes});
    }
    for (const ZTSSimEvent& lrEvent : mScenario.mEvents) {
        if (lrEvent.mThreads == 1) {
            lTimer.push_back({&lrEvent, 0, 1, lrEvent.mTimes});
            continue;
        }
        for (std::uint64_t lThread = 0; lThread < lrEvent.mThreads; ++lThread) {
            if (lrEvent.mTimes == 0 || lThread < lrEvent.mTimes) {
                lLanes.push_back({{&lrEvent, lThread, lrEvent.mThreads, lrEvent.mTimes}});
            }
        }
    }
    for (const ZTSSimStorm& lrStorm : mScenario.mStorms) {
        for (std::uint64_t lThread = 0; lThread < std::min(lrStorm.mThreads, lrStorm.mCount); ++lThread) {
            lLanes.push_back({{&lrStorm, lThread, lrStorm.mThreads, lrStorm.mCount}});
        }
    }
    if (!lTimer.empty()) {
        lLanes.push_back(std::move(lTimer));
    }
    return lLanes;
}

void ZTCSimEngine::start() {
    for (const ZTSSimState& lrState : mScenario.mStates) {
        if (!lrState.mIsTimed) {
            mSources.change(lrState);
        }
    }
    std::vector<Lane> lLanes = makeLanes();
    mThreads.reserve(lLanes.size());
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        mLanesLeft = lLanes.size();
    }
    try {
        for (Lane& lrLane : lLanes) {
            mThreads.push_back(startLibraryThread([this, lLane = std::move(lrLane)] { runLane(lLane); }));
        }
    } catch (...) {
        stop();
        throw;
    }
    if (mScenario.mStart == ZTSS_Init) {
        startClock();
    }
}

void ZTCSimEngine::requestStop() {
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        mIsStopping.store(true, std::memory_order_relaxed);
    }
    mWake.notify_all();
}

void ZTCSimEngine::stop() {
    requestStop();
    for (std::thread& lrThread : mThreads) {
        lrThread.join();
    }
    mThreads.clear();
}

void ZTCSimEngine::startClock() {
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        if (mStartTime.load(std::memory_order_relaxed) != 0) {
            return;
        }
        mStartTime.store(Clock::now().time_since_epoch().count(), std::memory_order_relaxed);
    }
    mWake.notify_all();
}

/// Waits until the schedule is that old. False: the engine stops.
bool ZTCSimEngine::waitUntil(std::uint64_t aMilliseconds) {
    const auto lIsStopping = [this] { return mIsStopping.load(std::memory_order_relaxed); };
    const auto lHasStarted = [this] { return mStartTime.load(std::memory_order_relaxed) != 0; };
    const auto lDue = [&] {
        return Clock::time_point(Clock::duration(mStartTime.load(std::memory_order_relaxed))) +
               std::chrono::milliseconds(aMilliseconds);
    };
    // The threads of a storm do not meet at the lock for events that are due.
    if (lHasStarted() && Clock::now() >= lDue()) {
        return !lIsStopping();
    }
    std::unique_lock<std::mutex> lGuard(mLock);
    mWake.wait(lGuard, [&] { return lIsStopping() || lHasStarted(); });
    if (lIsStopping()) {
        return false;
    }
    return !mWake.wait_until(lGuard, lDue(), lIsStopping);
}

void ZTCSimEngine::runLane(Lane aLane) {
    try {
        const auto lIsLater = [&aLane](std::size_t aOne, std::size_t aOther) {
            return std::pair(aLane[aOne].getDueTime(), aOne) > std::pair(aLane[aOther].getDueTime(), aOther);
        };
        std::priority_queue<std::size_t, std::vector<std::size_t>, decltype(lIsLater)> lQueue(lIsLater);
        for (std::size_t lShare = 0; lShare < aLane.size(); ++lShare) {
            lQueue.push(lShare);
        }
        while (!lQueue.empty()) {
            const std::size_t lNext = lQueue.top();
            Share& lrShare = aLane[lNext];
            if (!waitUntil(lrShare.getDueTime())) {
                return;
            }
            play(lrShare);
            lQueue.pop();
            if (!lrShare.isLast()) {
                lrShare.mNext += lrShare.mStride;
                lQueue.push(lNext);
            }
        }
    } catch (const std::exception& lrException) {
        reportSimProblem(std::string("libkpm-sim: a thread of the schedule ends early: ") + lrException.what());
    }
    const std::lock_guard<std::mutex> lGuard(mLock);
    --mLanesLeft;
}

std::uint64_t ZTCSimEngine::play(const Share& acrShare) {
    if (const auto* lpChange = std::get_if<const ZTSSimCountChange*>(&acrShare.mLine)) {
        mCount.store((*lpChange)->mCount, std::memory_order_relaxed);
        return 0;
    }
    if (const auto* lpState = std::get_if<const ZTSSimState*>(&acrShare.mLine)) {
        return mSources.change(**lpState);
    }
    if (const auto* lpLoss = std::get_if<const ZTSSimLoss*>(&acrShare.mLine)) {
        mSources.lose(**lpLoss);
        return 1;
    }
    if (const auto* lpEvent = std::get_if<const ZTSSimEvent*>(&acrShare.mLine)) {
        return deliverToBoards(**lpEvent, acrShare.mNext);
    }
    return deliverToBoards(drawSimEvent(*std::get<const ZTSSimStorm*>(acrShare.mLine), acrShare.mNext), 0);
}

std::uint64_t ZTCSimEngine::deliverToBoards(const ZTSSimEvent& acrEvent, std::uint64_t aOccurrence) {
    const auto lDeliverTo = [&](std::uint32_t aBoard) -> std::uint64_t {
        const bool lIsLink = getSimKind(acrEvent.mKind).mDelivery == ZTSD_Link;
        const std::uint32_t lTag = lIsLink ? mLinkTags[aBoard].fetch_add(1, std::memory_order_relaxed) + 1 : 0;
        return deliver(makeSimDelivery(mScenario, acrEvent, aBoard, aOccurrence, lTag)) ? 1 : 0;
    };
    std::uint64_t lDelivered = 0;
    if (acrEvent.mBoards.mAll) {
        for (std::uint32_t lBoard = 0; lBoard < getNumberOfAdapters(); ++lBoard) {
            lDelivered += lDeliverTo(lBoard);
        }
    }
    for (const std::uint32_t lBoard : acrEvent.mBoards.mBoards) {
        lDelivered += lDeliverTo(lBoard);
    }
    return lDelivered;
}

bool ZTCSimEngine::deliver(const ZTSSimDelivery& acrDelivery) {
    const std::optional<ZTSLibraryRegistration> lRegistration =
        getRegistry().find(acrDelivery.mBoard, acrDelivery.mKind);
    if (!lRegistration || !lRegistration->mHasSource || !mSources.isWorking(acrDelivery.mBoard, acrDelivery.mKind)) {
        mDropped.fetch_add(1, std::memory_order_relaxed);
        return false;
    }
    lendSimDelivery(*lRegistration, acrDelivery, mScenario.mHasOddAddresses);
    mPages.fetch_add(countSimPages(acrDelivery), std::memory_order_relaxed);
    // Release, with the acquire in getStatus(): a thread that reads the count sees what the callback did.
    mDeliveredByKind[acrDelivery.mKind].fetch_add(1, std::memory_order_release);
    return true;
}

/// All occurrences of a line, for as many threads as it asks for.
static std::pair<std::uint64_t, std::uint64_t> sGetTimesAndThreads(const ZTSSimEventLine& acrLine) {
    struct Visitor {
        std::pair<std::uint64_t, std::uint64_t> operator()(const ZTSSimEvent& acrEvent) const {
            return {acrEvent.mTimes, acrEvent.mThreads};
        }
        std::pair<std::uint64_t, std::uint64_t> operator()(const ZTSSimStorm& acrStorm) const {
            return {acrStorm.mCount, acrStorm.mThreads};
        }
        std::pair<std::uint64_t, std::uint64_t> operator()(const ZTSSimState&) const { return {1, 1}; }
        std::pair<std::uint64_t, std::uint64_t> operator()(const ZTSSimLoss& acrLoss) const {
            return {acrLoss.mTimes, 1};
        }
    };
    return std::visit(Visitor{}, acrLine);
}

std::uint64_t ZTCSimEngine::inject(const ZTSSimEventLine& acrLine) {
    const auto [lEnd, lAskedThreads] = sGetTimesAndThreads(acrLine);
    const std::uint64_t lThreads = std::min(lAskedThreads, lEnd);
    const Share lWhole = std::visit(
        [lStride = lThreads, lLast = lEnd](const auto& acrOf) {
            return Share{&acrOf, 0, lStride, lLast};
        },
        acrLine);
    std::atomic<std::uint64_t> lDelivered{0};
    const auto lDeliver = [&](std::uint64_t aFirst) {
        Share lShare = lWhole;
        lShare.mNext = aFirst;
        while (!mIsStopping.load(std::memory_order_relaxed)) {
            lDelivered.fetch_add(play(lShare), std::memory_order_relaxed);
            if (lShare.isLast()) {
                break;
            }
            lShare.mNext += lShare.mStride;
        }
    };
    std::vector<std::thread> lHelpers;
    std::exception_ptr lProblem;
    std::mutex lProblemLock;
    const auto lDeliverGuarded = [&](std::uint64_t aFirst) {
        try {
            lDeliver(aFirst);
        } catch (...) {
            const std::lock_guard<std::mutex> lGuard(lProblemLock);
            lProblem = std::current_exception();
        }
    };
    try {
        for (std::uint64_t lThread = 1; lThread < lThreads; ++lThread) {
            lHelpers.push_back(startLibraryThread([&lDeliverGuarded, lThread] { lDeliverGuarded(lThread); }));
        }
    } catch (...) {
        const std::lock_guard<std::mutex> lGuard(lProblemLock);
        lProblem = std::current_exception();
    }
    lDeliverGuarded(0);
    for (std::thread& lrHelper : lHelpers) {
        lrHelper.join();
    }
    if (lProblem) {
        std::rethrow_exception(lProblem);
    }
    return lDelivered.load(std::memory_order_relaxed);
}

std::optional<ZTSSimAnswer> ZTCSimEngine::findAnswer(ZTESimOperation aOperation, std::optional<std::size_t> aKind,
                                                     std::uint32_t aBoard) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    for (std::size_t lAnswer = 0; lAnswer < mScenario.mAnswers.size(); ++lAnswer) {
        const ZTSSimAnswer& lrAnswer = mScenario.mAnswers[lAnswer];
        const bool lIsMeant = lrAnswer.mOperation == aOperation && (!lrAnswer.mKind || lrAnswer.mKind == aKind) &&
                              (!lrAnswer.mBoard || lrAnswer.mBoard == aBoard);
        if (lIsMeant && (lrAnswer.mTimes == 0 || mAnswerUses[lAnswer] < lrAnswer.mTimes)) {
            ++mAnswerUses[lAnswer];
            return lrAnswer;
        }
    }
    return std::nullopt;
}

std::uint32_t ZTCSimEngine::getNumberOfBoardsEver() const {
    return static_cast<std::uint32_t>(mScenario.mAdapters.size());
}

std::uint32_t ZTCSimEngine::answerAdapterInfo(std::uint32_t aBoard, ZTSBoardNames& arNames) {
    arNames = {mScenario.mAdapters[aBoard].mWwnn, mScenario.mAdapters[aBoard].mWwpn};
    return findAnswer(ZTSO_GetAdapterInfo, std::nullopt, aBoard).value_or(ZTSSimAnswer{}).mStatus;
}

bool ZTCSimEngine::isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const {
    return isSameName(acrPort, mScenario.mAdapters[aBoard].mWwpn);
}

std::optional<std::size_t> ZTCSimEngine::findKind(std::uint32_t aCategory, std::uint32_t aSubcategory) const {
    return findRegisteredKindIndex(aCategory, aSubcategory);
}

ZTSRegistrationAnswer ZTCSimEngine::answerRegistration(std::uint32_t aBoard, std::size_t aKind) {
    const std::optional<ZTSSimAnswer> lScripted = findAnswer(ZTSO_Register, aKind, aBoard);
    const ZTSSimSource lSource = mSources.get(aBoard, aKind);
    const ZTSSimAnswer lAnswer = lScripted.value_or(answerSimSource(aKind, lSource.mState));
    if (!gcScopeEventKinds[aKind].isScope()) {
        reportSimSource(aBoard, aKind, lScripted ? describeSimAnswer(*lScripted) : lSource);
    }
    const bool lHasSource = lAnswer.mStatus != KPM_STATUS_NO_SOURCE && lAnswer.mHandle != 0u;
    return {lAnswer.mStatus, lAnswer.mHandle, lHasSource};
}

void ZTCSimEngine::noteRegistration(std::uint32_t aBoard, std::size_t aKind) {
    const bool lIsLast = aKind == gcSimLastKind && aBoard + 1 == getNumberOfAdapters();
    if (mScenario.mStart == ZTSS_First || (mScenario.mStart == ZTSS_Registered && lIsLast)) {
        startClock();
    }
}

std::uint32_t ZTCSimEngine::answerUnregistration(std::uint32_t aBoard, std::size_t aKind) {
    return findAnswer(ZTSO_Unregister, aKind, aBoard).value_or(ZTSSimAnswer{}).mStatus;
}

ZTSSimStatus ZTCSimEngine::getStatus() const {
    ZTSSimStatus lStatus;
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        if (mStartTime.load(std::memory_order_relaxed) != 0) {
            lStatus.mSchedule = mLanesLeft == 0 ? ZTSSC_Done : ZTSSC_Running;
        }
    }
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        lStatus.mDeliveredByKind[lKind] = mDeliveredByKind[lKind].load(std::memory_order_acquire);
        lStatus.mDelivered += lStatus.mDeliveredByKind[lKind];
    }
    lStatus.mDropped = mDropped.load(std::memory_order_relaxed);
    lStatus.mPages = mPages.load(std::memory_order_relaxed);
    lStatus.mRegistered = getRegistry().size();
    lStatus.mAdapters = getNumberOfAdapters();
    return lStatus;
}
