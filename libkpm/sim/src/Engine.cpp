#include "libkpm/sim/src/Engine.h"

#include <algorithm>
#include <cstring>
#include <exception>
#include <queue>
#include <string>
#include <utility>

#include "libkpm/sim/src/Report.h"
#include "libkpm/sim/src/SimThread.h"

static bool sIsSameName(const HBA_wwn& acrOne, const HBA_wwn& acrOther) {
    return std::memcmp(acrOne.wwn, acrOther.wwn, sizeof acrOne.wwn) == 0;
}

static bool sIsAccepted(std::uint32_t aStatus) {
    return aStatus == KPM_STATUS_SUCCESS || aStatus == KPM_STATUS_INFO_5 || aStatus == KPM_STATUS_NO_SOURCE ||
           aStatus == KPM_STATUS_NO_RIGHTS;
}

/// Memory that lives for one callback: what a callback is given stands at the end of its block, at an odd address
/// unless the scenario wants it aligned, and is overwritten before it is freed. An agent that keeps a pointer, reads
/// too far or expects alignment is found out.
class ZTCSimLoan {
public:
    ZTCSimLoan(const void* apBytes, std::size_t aSize, bool aIsOdd)
        : mSize(aSize), mOffset(aIsOdd ? 1 : 0), mpBlock(new unsigned char[mOffset + aSize]) {
        if (aSize != 0) {
            std::memcpy(get(), apBytes, aSize);
        }
    }
    ~ZTCSimLoan() {
        std::memset(mpBlock.get(), 0xDD, mOffset + mSize);
        __asm__ __volatile__("" : : "r"(mpBlock.get()) : "memory");
    }
    ZTCSimLoan(const ZTCSimLoan&) = delete;
    ZTCSimLoan& operator=(const ZTCSimLoan&) = delete;

    void* get() const { return mpBlock.get() + mOffset; }

private:
    std::size_t mSize;
    std::size_t mOffset;
    std::unique_ptr<unsigned char[]> mpBlock;
};

ZTCSimEngine::ZTCSimEngine(ZTSSimScenario aScenario)
    : mScenario(std::move(aScenario)),
      mRegistry(mScenario.mAdapters.size()),
      mCount(mScenario.mCount.value_or(static_cast<std::uint32_t>(mScenario.mAdapters.size()))),
      mLinkTags(mScenario.mAdapters.size()),
      mAnswerUses(mScenario.mAnswers.size()) {}

ZTCSimEngine::~ZTCSimEngine() {
    stop();
}

std::uint64_t ZTCSimEngine::Share::getDueTime() const {
    if (mpCountChange != nullptr) {
        return mpCountChange->mAt;
    }
    if (mpEvent != nullptr) {
        return mpEvent->mAt + mNext * mpEvent->mEvery;
    }
    return mpStorm->mAt + mNext * mpStorm->mOver / mpStorm->mCount;
}

std::vector<ZTCSimEngine::Lane> ZTCSimEngine::makeLanes() const {
    std::vector<Lane> lLanes;
    Lane lTimer;
    for (const ZTSSimCountChange& lrChange : mScenario.mCountChanges) {
        lTimer.push_back({nullptr, nullptr, &lrChange, 0, 1, 1});
    }
    for (const ZTSSimEvent& lrEvent : mScenario.mEvents) {
        if (lrEvent.mThreads == 1) {
            lTimer.push_back({&lrEvent, nullptr, nullptr, 0, 1, lrEvent.mTimes});
            continue;
        }
        for (std::uint64_t lThread = 0; lThread < lrEvent.mThreads; ++lThread) {
            if (lrEvent.mTimes == 0 || lThread < lrEvent.mTimes) {
                lLanes.push_back({{&lrEvent, nullptr, nullptr, lThread, lrEvent.mThreads, lrEvent.mTimes}});
            }
        }
    }
    for (const ZTSSimStorm& lrStorm : mScenario.mStorms) {
        for (std::uint64_t lThread = 0; lThread < std::min(lrStorm.mThreads, lrStorm.mCount); ++lThread) {
            lLanes.push_back({{nullptr, &lrStorm, nullptr, lThread, lrStorm.mThreads, lrStorm.mCount}});
        }
    }
    if (!lTimer.empty()) {
        lLanes.push_back(std::move(lTimer));
    }
    return lLanes;
}

void ZTCSimEngine::start() {
    std::vector<Lane> lLanes = makeLanes();
    mThreads.reserve(lLanes.size());
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        mLanesLeft = lLanes.size();
    }
    try {
        for (Lane& lrLane : lLanes) {
            mThreads.push_back(startSimThread([this, lLane = std::move(lrLane)] { runLane(lLane); }));
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
    if (acrShare.mpCountChange != nullptr) {
        mCount.store(acrShare.mpCountChange->mCount, std::memory_order_relaxed);
        return 0;
    }
    if (acrShare.mpEvent != nullptr) {
        return deliverToBoards(*acrShare.mpEvent, acrShare.mNext);
    }
    return deliverToBoards(drawSimEvent(*acrShare.mpStorm, acrShare.mNext), 0);
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

void ZTCSimEngine::callScope(const ZTSSimRegistration& acrRegistration, const ZTSSimDelivery& acrDelivery) const {
    const bool lIsOdd = mScenario.mHasOddAddresses;
    const ZTCSimLoan lData(acrDelivery.mData.data(), acrDelivery.mData.size(), lIsOdd);
    ZT_event_payload lPayload{};
    lPayload.zt_payload_data = acrDelivery.mIsDataNull ? nullptr : lData.get();
    const ZTCSimLoan lLentPayload(&lPayload, sizeof lPayload, lIsOdd);
    ZT_event lEvent{};
    lEvent.zt_evt_version = ZT_EVENT_VERSION;
    lEvent.zt_evt_size = acrDelivery.mEventSize;
    lEvent.zt_evt_payload = acrDelivery.mIsPayloadNull ? nullptr : lLentPayload.get();
    const ZTCSimLoan lLentEvent(&lEvent, sizeof lEvent, lIsOdd);
    acrRegistration.mpScopeCallback(acrDelivery.mToldBoard, acrDelivery.mLocal, acrDelivery.mCategory,
                                    acrDelivery.mSubcategory, acrRegistration.mpContext,
                                    static_cast<ZT_event*>(lLentEvent.get()));
}

bool ZTCSimEngine::deliver(const ZTSSimDelivery& acrDelivery) {
    const std::optional<ZTSSimRegistration> lRegistration = mRegistry.find(acrDelivery.mBoard, acrDelivery.mKind);
    if (!lRegistration || !lRegistration->mHasSource) {
        mDropped.fetch_add(1, std::memory_order_relaxed);
        return false;
    }
    const ZTESimDelivery lDelivery = getSimKind(acrDelivery.mKind).mDelivery;
    // The detour over void(*)(): a generic function pointer that the compiler knows as such.
    const auto lpGeneric = reinterpret_cast<void (*)()>(lRegistration->mpEventCallback);
    const std::vector<std::uint8_t>& lrData = acrDelivery.mData;
    switch (lDelivery) {
        case ZTSD_Scope:
            callScope(*lRegistration, acrDelivery);
            break;
        case ZTSD_Link: {
            const ZTCSimLoan lInfo(lrData.data(), lrData.size(), mScenario.mHasOddAddresses);
            reinterpret_cast<KPM_LinkCallback>(lpGeneric)(acrDelivery.mToldBoard, lInfo.get());
            break;
        }
        case ZTSD_Rscn: {
            const ZTCSimLoan lPayload(lrData.data(), lrData.size(), mScenario.mHasOddAddresses);
            reinterpret_cast<KPM_RscnCallback>(lpGeneric)(acrDelivery.mToldBoard, lPayload.get(), acrDelivery.mLength);
            break;
        }
        case ZTSD_Temperature: {
            unsigned lValues[2];
            std::memcpy(lValues, lrData.data(), sizeof lValues);
            reinterpret_cast<KPM_TemperatureCallback>(lpGeneric)(acrDelivery.mToldBoard, lValues[0], lValues[1]);
            break;
        }
    }
    mPages.fetch_add(countSimPages(acrDelivery), std::memory_order_relaxed);
    // Release, with the acquire in getStatus(): who reads the count sees what the callback did.
    mDeliveredByKind[acrDelivery.mKind].fetch_add(1, std::memory_order_release);
    return true;
}

std::uint64_t ZTCSimEngine::inject(const ZTSSimEventLine& acrLine) {
    const auto* lpEvent = std::get_if<ZTSSimEvent>(&acrLine);
    const auto* lpStorm = lpEvent != nullptr ? nullptr : &std::get<ZTSSimStorm>(acrLine);
    const std::uint64_t lEnd = lpEvent != nullptr ? lpEvent->mTimes : lpStorm->mCount;
    const std::uint64_t lThreads = std::min(lpEvent != nullptr ? lpEvent->mThreads : lpStorm->mThreads, lEnd);
    std::atomic<std::uint64_t> lDelivered{0};
    const auto lDeliver = [&](std::uint64_t aFirst) {
        Share lShare{lpEvent, lpStorm, nullptr, aFirst, lThreads, lEnd};
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
            lHelpers.push_back(startSimThread([&lDeliverGuarded, lThread] { lDeliverGuarded(lThread); }));
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

std::uint32_t ZTCSimEngine::getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    if (apNodeName == nullptr || apPortName == nullptr) {
        return ZTLST_NullPointer;
    }
    if (aIndex >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    const std::optional<ZTSSimAnswer> lAnswer = findAnswer(ZTSO_GetAdapterInfo, std::nullopt, aIndex);
    if (lAnswer && lAnswer->mStatus != ZTLST_Success) {
        return lAnswer->mStatus;
    }
    std::memcpy(apNodeName, &mScenario.mAdapters[aIndex].mWwnn, sizeof *apNodeName);
    std::memcpy(apPortName, &mScenario.mAdapters[aIndex].mWwpn, sizeof *apPortName);
    return ZTLST_Success;
}

void ZTCSimEngine::noteRegistration(std::uint32_t aBoard, std::size_t aKind) {
    const bool lIsLast = aKind == gcSimLastKind && aBoard + 1 == getNumberOfAdapters();
    if (mScenario.mStart == ZTSS_First || (mScenario.mStart == ZTSS_Registered && lIsLast)) {
        startClock();
    }
}

std::uint32_t ZTCSimEngine::registerForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                                            std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                            KPM_ScopeCallback apCallback) {
    if (apHandle == nullptr || apCallback == nullptr) {
        return ZTLST_NullPointer;
    }
    if (aBoard >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    if (!sIsSameName(acrPort, mScenario.mAdapters[aBoard].mWwpn)) {
        return ZTLST_NotItsPort;
    }
    const std::optional<std::size_t> lKind = findRegisteredKindIndex(aCategory, aSubcategory);
    if (!lKind || getSimKind(*lKind).mDelivery != ZTSD_Scope) {
        return ZTLST_NoSuchKind;
    }
    const ZTSSimAnswer lAnswer = findAnswer(ZTSO_Register, lKind, aBoard).value_or(ZTSSimAnswer{});
    if (!sIsAccepted(lAnswer.mStatus)) {
        return lAnswer.mStatus;
    }
    ZTSSimRegistration lRegistration;
    lRegistration.mHasSource = lAnswer.mStatus != KPM_STATUS_NO_SOURCE && lAnswer.mHandle != 0u;
    lRegistration.mpContext = apContext;
    lRegistration.mpScopeCallback = apCallback;
    *apHandle = mRegistry.put(aBoard, *lKind, lRegistration, lAnswer.mHandle);
    noteRegistration(aBoard, *lKind);
    return lAnswer.mStatus;
}

std::uint32_t ZTCSimEngine::registerForBoard(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                             KPM_EventCallback apCallback) {
    const std::optional<std::size_t> lKind = findRegisteredKindIndex(0, aEventType);
    if (apCallback == nullptr || aBoard >= getNumberOfAdapters() || !lKind) {
        return 0;
    }
    const ZTSSimAnswer lAnswer = findAnswer(ZTSO_Register, lKind, aBoard).value_or(ZTSSimAnswer{});
    if (!sIsAccepted(lAnswer.mStatus) || lAnswer.mHandle == 0u) {
        return 0;
    }
    ZTSSimRegistration lRegistration;
    lRegistration.mHasSource = lAnswer.mStatus != KPM_STATUS_NO_SOURCE;
    lRegistration.mpContext = apContext;
    lRegistration.mpEventCallback = apCallback;
    const std::uint32_t lHandle = mRegistry.put(aBoard, *lKind, lRegistration, lAnswer.mHandle);
    noteRegistration(aBoard, *lKind);
    return lHandle;
}

std::uint32_t ZTCSimEngine::unregisterForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aHandle) {
    if (aBoard >= mScenario.mAdapters.size()) {
        return ZTLST_NoSuchBoard;
    }
    if (!sIsSameName(acrPort, mScenario.mAdapters[aBoard].mWwpn)) {
        return ZTLST_NotItsPort;
    }
    const std::optional<std::size_t> lKind = mRegistry.findKind(aBoard, aHandle);
    if (!lKind || getSimKind(*lKind).mDelivery != ZTSD_Scope) {
        return ZTLST_NoSuchHandle;
    }
    const std::optional<ZTSSimAnswer> lAnswer = findAnswer(ZTSO_Unregister, lKind, aBoard);
    if (lAnswer && lAnswer->mStatus != ZTLST_Success) {
        return lAnswer->mStatus;
    }
    mRegistry.remove(aBoard, *lKind, aHandle);
    return ZTLST_Success;
}

std::uint32_t ZTCSimEngine::unregisterForBoard(std::uint32_t aBoard, std::uint32_t aHandle) {
    if (aBoard >= mScenario.mAdapters.size()) {
        return ZTLST_NoSuchBoard;
    }
    const std::optional<std::size_t> lKind = mRegistry.findKind(aBoard, aHandle);
    if (!lKind || getSimKind(*lKind).mDelivery == ZTSD_Scope) {
        return ZTLST_NoSuchHandle;
    }
    const std::optional<ZTSSimAnswer> lAnswer = findAnswer(ZTSO_Unregister, lKind, aBoard);
    if (lAnswer && lAnswer->mStatus != ZTLST_Success) {
        return lAnswer->mStatus;
    }
    mRegistry.remove(aBoard, *lKind, aHandle);
    return ZTLST_Success;
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
    lStatus.mRegistered = mRegistry.size();
    lStatus.mAdapters = getNumberOfAdapters();
    return lStatus;
}
