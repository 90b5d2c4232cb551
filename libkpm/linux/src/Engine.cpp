#include "libkpm/linux/src/Engine.h"

#include <pthread.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <exception>
#include <system_error>
#include <utility>

#include "libkpm/linux/src/Report.h"
#include "libkpm/linux/src/TracePage.h"

// How much of one source is read before the others, and a stop, have their turn.
static constexpr unsigned scDatagramsInARound = 256;
static constexpr unsigned scPagesInARound = 16;

/// Blocks all signals of the calling thread for as long as it lives: a new thread inherits the mask.
class ZTCLinuxSignalBlock {
public:
    ZTCLinuxSignalBlock() {
        sigset_t lAll;
        sigfillset(&lAll);
        pthread_sigmask(SIG_SETMASK, &lAll, &mBefore);
    }
    ~ZTCLinuxSignalBlock() { pthread_sigmask(SIG_SETMASK, &mBefore, nullptr); }
    ZTCLinuxSignalBlock(const ZTCLinuxSignalBlock&) = delete;
    ZTCLinuxSignalBlock& operator=(const ZTCLinuxSignalBlock&) = delete;

private:
    sigset_t mBefore;
};

static std::string sNameText(const HBA_wwn& acrName) {
    static constexpr char scDigits[] = "0123456789abcdef";
    std::string lText;
    for (const std::uint8_t lByte : acrName.wwn) {
        lText += lText.empty() ? "" : ":";
        lText += scDigits[lByte >> 4];
        lText += scDigits[lByte & 15];
    }
    return lText;
}

std::unique_ptr<ZTCFcEventSource> ZTCLinuxSources::openFcEvents(std::string& arProblem) {
    return ZTCFcEventSocket::open(arProblem);
}

ZTCLinuxEngine::ZTCLinuxEngine(ZTSLinuxOptions aOptions, ZTCLinuxSources& arSources)
    : mOptions(std::move(aOptions)),
      mrSources(arSources),
      mSysfs(mOptions.mSysfsRoot),
      mWake(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)),
      mRemotePorts(mSysfs),
      mLosses([](const std::string& acrText) { logLinuxLine(KPM_LOG_WARNING, acrText); }) {
    if (!mWake.isOpen()) {
        throw std::system_error(errno, std::generic_category(), "eventfd");
    }
}

ZTCLinuxEngine::~ZTCLinuxEngine() {
    stop();
}

// ---- Start and stop ----

void ZTCLinuxEngine::start() {
    look();
    tellMissing();
    mNextLook = Clock::now() + mOptions.mPollInterval;
    const ZTCLinuxSignalBlock lBlock;
    mThread = std::thread([this] { run(); });
}

void ZTCLinuxEngine::stop() {
    mIsStopping.store(true, std::memory_order_relaxed);
    const std::uint64_t lOne = 1;
    const ssize_t lWritten = ::write(mWake.get(), &lOne, sizeof lOne);
    static_cast<void>(lWritten);
    if (mThread.joinable()) {
        mThread.join();
        try {
            readTraceLosses();
            mLosses.tellAll();
        } catch (const std::exception&) {
            mLosses.count(ZTLO_Failure);  // without memory, there is nothing to say it with
        }
    }
    mpMessages.reset();
    mpTrace.reset();
}

/// The sources are opened with the first board: a machine without FC hosts is left alone.
void ZTCLinuxEngine::openSources() {
    mAreSourcesOpen = true;
    std::string lProblem;
    mpMessages = mrSources.openFcEvents(lProblem);
    if (mpMessages == nullptr) {
        logLinuxLine(KPM_LOG_WARNING, "no RSCNs, and link states only every " +
                                          std::to_string(mOptions.mPollInterval.count()) + " ms: " + lProblem);
    } else {
        mDatagram.resize(gcMostFcMessageBytes);
        mHasMessages.store(true, std::memory_order_relaxed);
    }
    openTrace();
}

void ZTCLinuxEngine::openTrace() {
    std::string lRoot = mOptions.mTracefsRoots.empty() ? std::string() : mOptions.mTracefsRoots.front();
    for (const std::string& lrRoot : mOptions.mTracefsRoots) {
        if (::access((lrRoot + "/instances").c_str(), F_OK) == 0) {
            lRoot = lrRoot;
            break;
        }
    }
    std::string lProblem;
    mpTrace = ZTCTraceInstance::open(lRoot, mrSources, lProblem);
    if (mpTrace == nullptr) {
        logLinuxLine(KPM_LOG_WARNING, "no SCSI outcomes: " + lProblem);
        return;
    }
    if (!mpTrace->getRecordLayout().hasSense()) {
        logLinuxLine(KPM_LOG_NOTICE, "this kernel's trace has no sense data: check conditions come without them");
    }
    mPage.resize(mpTrace->getPageLayout().mPageSize);
    mBuffers.assign(mpTrace->getBufferCount(), Buffer());
    mHasTrace.store(true, std::memory_order_relaxed);
}

void ZTCLinuxEngine::tellMissing() const {
    std::string lNames;
    for (std::size_t lKind = 0; lKind < gcLinuxKindCount; ++lKind) {
        if (!hasSource(lKind)) {
            lNames += lNames.empty() ? "" : ", ";
            lNames += gcScopeEventKinds[lKind].mpName;
        }
    }
    logLinuxLine(KPM_LOG_NOTICE, "this host cannot deliver: " + lNames);
}

bool ZTCLinuxEngine::hasSource(std::size_t aKind) const {
    switch (getLinuxSource(aKind)) {
        case ZTLSO_None:
            return false;
        case ZTLSO_Hosts:
            return true;
        case ZTLSO_Messages:
            return mHasMessages.load(std::memory_order_relaxed);
        case ZTLSO_Trace:
            return mHasTrace.load(std::memory_order_relaxed);
    }
    return false;
}

// ---- The watcher ----

void ZTCLinuxEngine::run() {
    while (!mIsStopping.load(std::memory_order_relaxed)) {
        try {
            runRound();
        } catch (const std::exception&) {
            // Memory has run out over one event: the next may fare better.
            mLosses.count(ZTLO_Failure);
        }
        mLosses.tell(Clock::now());
    }
}

void ZTCLinuxEngine::runRound() {
    waitForWork();
    if (mIsStopping.load(std::memory_order_relaxed)) {
        return;
    }
    if (mIsSocketReady) {
        readMessages();
    }
    for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
        if (mBuffers[lBuffer].mIsReady) {
            readTrace(lBuffer);
        }
    }
    if (Clock::now() >= mNextLook) {
        mNextLook = Clock::now() + mOptions.mPollInterval;
        mHasLookedForHost = false;
        look();
        // With messages on their way that the state read is ahead of, the links go on counting them.
        for (std::size_t lBoard = 0; mIsSocketDrained && lBoard < mLinks.size(); ++lBoard) {
            mLinks[lBoard].forgetMessages();
        }
        readTraceLosses();
    }
}

/// Waits until a source is readable, a look is due, or the engine stops, and marks what is to be read.
void ZTCLinuxEngine::waitForWork() {
    // A member: with memory short, waiting must go on working.
    mPolls.resize(2 + mBuffers.size());
    mPolls[0] = {mWake.get(), POLLIN, 0};
    const bool lHasSocket = mpMessages != nullptr && !mIsSocketResting;
    // A negative descriptor is passed over.
    mPolls[1] = {lHasSocket ? mpMessages->getDescriptor() : -1, POLLIN, 0};
    for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
        mPolls[lBuffer + 2] = {mBuffers[lBuffer].mIsResting ? -1 : mpTrace->getDescriptor(lBuffer), POLLIN, 0};
    }
    const auto lLeft = std::chrono::duration_cast<std::chrono::milliseconds>(mNextLook - Clock::now()).count() + 1;
    const auto lTimeout = static_cast<int>(std::clamp<long long>(lLeft, 0, mOptions.mPollInterval.count() + 1));
    if (::poll(mPolls.data(), mPolls.size(), lTimeout) < 0 && errno != EINTR) {
        // Memory is short, or fewer descriptors are allowed than are open: until the next look, only a stop is waited
        // for.
        mLosses.count(ZTLO_Failure);
        ::poll(mPolls.data(), 1, lTimeout);
    }
    const bool lIsLookDue = Clock::now() >= mNextLook;
    mIsSocketReady = mPolls[1].revents != 0;
    for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
        // Buffers that do not wake for a single record are read with every look.
        const bool lIsToBeTried = lIsLookDue && !mpTrace->wakesAtOnce();
        mBuffers[lBuffer].mIsReady = mPolls[lBuffer + 2].revents != 0 || lIsToBeTried;
    }
}

// ---- Hosts and links ----

void ZTCLinuxEngine::look() {
    mIsSocketResting = false;
    for (Buffer& lrBuffer : mBuffers) {
        lrBuffer.mIsResting = false;
    }
    mRemotePorts.forget();
    const std::optional<std::vector<ZTSLinuxHost>> lHosts = mSysfs.readHosts();
    if (!lHosts) {
        // With descriptors or memory short, for one: the hosts have not left for that.
        mLosses.count(ZTLO_Failure);
        return;
    }
    // As many as there may be boards then, and before there are: with memory short, there is no board without its link.
    mLinks.resize(mBoards.size() + lHosts->size());
    ZTCLinuxBoards::Changes lChanges;
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        lChanges = mBoards.update(*lHosts);
    }
    handleHostChanges(lChanges);
    lookAtLinks();
}

void ZTCLinuxEngine::handleHostChanges(const ZTCLinuxBoards::Changes& acrChanges) {
    if (acrChanges.isEmpty()) {
        return;
    }
    for (const std::uint32_t lBoard : acrChanges.mLeft) {
        logLinuxLine(KPM_LOG_NOTICE, "board " + std::to_string(lBoard) + ": its host is gone");
        for (const ZTSLinuxLinkChange& lrChange : mLinks[lBoard].noteReading(ZTLK_Down)) {
            deliverLink(lBoard, lrChange);
        }
    }
    const std::uint32_t lBefore = mCount.load(std::memory_order_relaxed);
    mCount.store(mBoards.size(), std::memory_order_relaxed);
    for (const std::uint32_t lBoard : acrChanges.mArrived) {
        const ZTSLinuxBoard& lrBoard = mBoards.get(lBoard);
        logLinuxLine(KPM_LOG_NOTICE, "board " + std::to_string(lBoard) + " is host" + std::to_string(*lrBoard.mHost) +
                                         ", node " + sNameText(lrBoard.mNodeName) + ", port " +
                                         sNameText(lrBoard.mPortName));
        if (isZeroName(lrBoard.mPortName)) {
            logLinuxLine(KPM_LOG_WARNING,
                         "host" + std::to_string(*lrBoard.mHost) + ": its port name cannot be read from sysfs");
        }
    }
    if (!mAreSourcesOpen && mBoards.size() != 0) {
        openSources();
    }
    watchHosts();
    // What is found first has not come while someone watched.
    for (std::size_t lArrival = 0; lBefore != 0 && lArrival < acrChanges.mArrived.size(); ++lArrival) {
        for (std::uint32_t lBoard = 0; lBoard < mBoards.size(); ++lBoard) {
            deliverScope(lBoard, gcLinuxAdapterArrival, nullptr, 0);
        }
    }
}

void ZTCLinuxEngine::watchHosts() {
    std::string lProblem;
    if (mpTrace != nullptr && !mpTrace->watchHosts(mBoards.getHosts(), lProblem)) {
        mHasTrace.store(false, std::memory_order_relaxed);
        mBuffers.clear();
        mpTrace.reset();
        logLinuxLine(KPM_LOG_WARNING, "no SCSI outcomes: " + lProblem);
    }
}

void ZTCLinuxEngine::lookAtLinks() {
    for (std::uint32_t lBoard = 0; lBoard < mBoards.size(); ++lBoard) {
        lookAtLink(lBoard);
    }
}

void ZTCLinuxEngine::lookAtLink(std::uint32_t aBoard) {
    const std::optional<std::uint32_t> lHost = mBoards.get(aBoard).mHost;
    if (!lHost) {
        return;
    }
    for (const ZTSLinuxLinkChange& lrChange : mLinks[aBoard].noteReading(mSysfs.readPortState(*lHost))) {
        deliverLink(aBoard, lrChange);
    }
}

// ---- FC messages ----

void ZTCLinuxEngine::readMessages() {
    bool lIsStateInDoubt = false;
    mIsSocketDrained = false;
    for (unsigned lCount = 0; lCount < scDatagramsInARound; ++lCount) {
        const ZTSLinuxReceived lReceived = mpMessages->receive(mDatagram);
        if (lReceived.mOutcome == ZTLR_Datagram) {
            readDatagram(ZTCByteSpan(mDatagram).first(lReceived.mSize));
        } else if (lReceived.mOutcome == ZTLR_Foreign) {
            mLosses.count(ZTLO_ForeignMessage);
        } else if (lReceived.mOutcome == ZTLR_Truncated) {
            mLosses.count(ZTLO_MalformedMessage);
        } else if (lReceived.mOutcome == ZTLR_Overrun) {
            mLosses.count(ZTLO_SocketOverrun);
            lIsStateInDoubt = true;
        } else {
            if (lReceived.mOutcome == ZTLR_Failed) {
                mLosses.count(ZTLO_Failure);
            }
            // Readable with nothing to read, it would wake the watcher again at once.
            mIsSocketDrained = true;
            mIsSocketResting = lReceived.mOutcome == ZTLR_Failed || lCount == 0;
            break;
        }
    }
    if (const std::uint64_t lLost = mSequence.takeLost(); lLost != 0) {
        mLosses.count(ZTLO_MissingMessage, lLost);
        lIsStateInDoubt = true;
    }
    if (lIsStateInDoubt) {
        look();
    }
}

void ZTCLinuxEngine::readDatagram(ZTCByteSpan aDatagram) {
    ZTCLinuxFcMessages lMessages(aDatagram);
    while (const std::optional<ZTSLinuxFcEvent> lEvent = lMessages.next()) {
        mSequence.note(lEvent->mNumber);
        handleMessage(*lEvent);
    }
    mLosses.count(ZTLO_MalformedMessage, lMessages.getMalformed());
}

void ZTCLinuxEngine::handleMessage(const ZTSLinuxFcEvent& acrEvent) {
    std::optional<std::uint32_t> lBoard = mBoards.findHost(acrEvent.mHost);
    if (!lBoard) {
        // A host that has come since the last look; one look more is enough for any number of its messages.
        if (!std::exchange(mHasLookedForHost, true)) {
            look();
        }
        lBoard = mBoards.findHost(acrEvent.mHost);
        if (!lBoard) {
            return;
        }
    }
    if (acrEvent.mCode == ZTLFC_Rscn) {
        mRemotePorts.forget();
        std::optional<std::vector<std::uint8_t>> lPayload = makeLinuxRscn(acrEvent.mData);
        if (lPayload) {
            deliverRscn(*lBoard, *lPayload);
        } else {
            mLosses.count(ZTLO_MalformedMessage);
        }
        return;
    }
    const bool lTellsState = acrEvent.mCode == ZTLFC_AdapterChange ||
                             (acrEvent.mCode >= ZTLFC_Lip && acrEvent.mCode <= ZTLFC_LipReset) ||
                             (acrEvent.mCode >= ZTLFC_PortUnknown && acrEvent.mCode <= ZTLFC_PortError);
    if (!lTellsState) {
        return;
    }
    mRemotePorts.forget();
    if (acrEvent.mCode == ZTLFC_LinkUp || acrEvent.mCode == ZTLFC_LinkDown) {
        mLinks[*lBoard].noteMessage(acrEvent.mCode == ZTLFC_LinkUp);
    }
    lookAtLink(*lBoard);
}

// ---- SCSI outcomes ----

void ZTCLinuxEngine::readTrace(std::size_t aBuffer) {
    for (unsigned lPages = 0; lPages < scPagesInARound; ++lPages) {
        std::size_t lSize = 0;
        const ZTETraceRead lRead = mpTrace->read(aBuffer, mPage, lSize);
        if (lRead != ZTTR_Page) {
            if (lRead == ZTTR_Failed) {
                mLosses.count(ZTLO_Failure);
            }
            mBuffers[aBuffer].mIsResting = lRead == ZTTR_Failed || lPages == 0;
            return;
        }
        mBuffers[aBuffer].mHasRecords = true;
        if (readPage(ZTCByteSpan(mPage).first(lSize))) {
            mBuffers[aBuffer].mHasLoss = true;
        }
    }
}

/// Whether the page says that records before it are lost.
bool ZTCLinuxEngine::readPage(ZTCByteSpan aPage) {
    const ZTSScsiDoneLayout& lrLayout = mpTrace->getRecordLayout();
    ZTCTracePage lPage(aPage, mpTrace->getPageLayout());
    while (const std::optional<ZTCByteSpan> lRecord = lPage.next()) {
        const std::optional<std::uint32_t> lId = getTraceRecordId(*lRecord, lrLayout);
        if (lId && *lId != lrLayout.mId) {
            continue;
        }
        const std::optional<ZTSScsiOutcome> lOutcome = lId ? parseScsiOutcome(*lRecord, lrLayout) : std::nullopt;
        if (lOutcome) {
            handleOutcome(*lOutcome);
        } else {
            mLosses.count(ZTLO_MalformedRecord);
        }
    }
    if (lPage.isMalformed()) {
        mLosses.count(ZTLO_MalformedRecord);
    }
    return lPage.hasLossBefore();
}

/// A buffer that nothing came from has lost nothing either: the newest records are kept.
void ZTCLinuxEngine::readTraceLosses() {
    for (std::size_t lBuffer = 0; lBuffer < mBuffers.size(); ++lBuffer) {
        Buffer& lrBuffer = mBuffers[lBuffer];
        if (lrBuffer.mHasRecords) {
            mLosses.count(ZTLO_TraceOverrun, mpTrace->takeLosses(lBuffer).value_or(lrBuffer.mHasLoss ? 1 : 0));
            lrBuffer.mHasRecords = false;
            lrBuffer.mHasLoss = false;
        }
    }
}

void ZTCLinuxEngine::handleOutcome(const ZTSScsiOutcome& acrOutcome) {
    const std::optional<std::uint32_t> lBoard = mBoards.findHost(acrOutcome.mHost);
    const bool lIsEvent = acrOutcome.mStatus == ZTLSS_CheckCondition || acrOutcome.mStatus == ZTLSS_Busy ||
                          acrOutcome.mStatus == ZTLSS_TaskSetFull;
    if (!lBoard || !lIsEvent) {
        return;
    }
    const HBA_wwn lPort = mRemotePorts.find(acrOutcome.mHost, acrOutcome.mChannel, acrOutcome.mTarget);
    if (acrOutcome.mStatus == ZTLSS_CheckCondition) {
        zt_scsi_checkcondition_v0 lData{};
        lData.zt_checkcondition_rport = lPort;
        lData.zt_checkcondition_lun = acrOutcome.mLun;
        lData.zt_checkcondition_cmdcode = acrOutcome.mOpcode;
        lData.zt_checkcondition_senskey = acrOutcome.mSenseKey;
        lData.zt_checkcondition_asc = acrOutcome.mAsc;
        lData.zt_checkcondition_ascq = acrOutcome.mAscq;
        deliverScope(*lBoard, gcLinuxCheckCondition, &lData, sizeof lData);
        return;
    }
    ZT_scsi_generic_v0 lData{};
    lData.zt_scsi_generic_rport = lPort;
    lData.zt_scsi_generic_lun = acrOutcome.mLun;
    const bool lIsFull = acrOutcome.mStatus == ZTLSS_TaskSetFull;
    deliverScope(*lBoard, lIsFull ? gcLinuxQueueFull : gcLinuxDeviceBusy, &lData, sizeof lData);
}

// ---- Delivery ----

void ZTCLinuxEngine::deliverScope(std::uint32_t aBoard, std::size_t aKind, const void* apData, std::size_t aSize) {
    const std::optional<ZTSLinuxRegistration> lRegistration = mRegistry.find(aBoard, aKind);
    if (!lRegistration) {
        return;
    }
    ZT_event_payload lPayload{0, const_cast<void*>(apData)};
    ZT_event lEvent{};
    lEvent.zt_evt_version = ZT_EVENT_VERSION;
    lEvent.zt_evt_size = ZT_EVENT_HEADER_SIZE + aSize;
    lEvent.zt_evt_payload = apData == nullptr ? nullptr : &lPayload;
    lRegistration->mpScopeCallback(aBoard, mBoards.get(aBoard).mPortName, gcScopeEventKinds[aKind].mDeliveredCategory,
                                   gcScopeEventKinds[aKind].mDeliveredSubcategory, lRegistration->mpContext, &lEvent);
}

void ZTCLinuxEngine::deliverLink(std::uint32_t aBoard, const ZTSLinuxLinkChange& acrChange) {
    const std::optional<ZTSLinuxRegistration> lRegistration = mRegistry.find(aBoard, gcLinuxLink);
    if (!lRegistration) {
        return;
    }
    const ZTSLinuxBoard& lrBoard = mBoards.get(aBoard);
    LINKINFO lInfo{};
    lInfo.a_linkEventTag = acrChange.mTag;
    lInfo.a_linkUp = acrChange.mUp;
    lInfo.a_linkDown = acrChange.mDown;
    lInfo.a_DID = acrChange.mIsUp && lrBoard.mHost ? mSysfs.readPortId(*lrBoard.mHost) : 0;
    lInfo.a_linkState = acrChange.mIsUp ? 1 : 0;
    lInfo.a_wwpName = lrBoard.mPortName;
    lInfo.a_wwnName = lrBoard.mNodeName;
    // The detour over void(*)(): a generic function pointer that the compiler knows as such.
    const auto lpGeneric = reinterpret_cast<void (*)()>(lRegistration->mpEventCallback);
    reinterpret_cast<KPM_LinkCallback>(lpGeneric)(aBoard, &lInfo);
}

void ZTCLinuxEngine::deliverRscn(std::uint32_t aBoard, std::vector<std::uint8_t>& arPayload) {
    const std::optional<ZTSLinuxRegistration> lRegistration = mRegistry.find(aBoard, gcLinuxRscn);
    if (!lRegistration) {
        return;
    }
    const auto lpGeneric = reinterpret_cast<void (*)()>(lRegistration->mpEventCallback);
    reinterpret_cast<KPM_RscnCallback>(lpGeneric)(aBoard, arPayload.data(), static_cast<unsigned>(arPayload.size()));
}

// ---- The entry points' questions ----

std::uint32_t ZTCLinuxEngine::getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) const {
    if (apNodeName == nullptr || apPortName == nullptr) {
        return ZTLST_NullPointer;
    }
    if (aIndex >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    const std::lock_guard<std::mutex> lGuard(mLock);
    const ZTSLinuxBoard& lrBoard = mBoards.get(aIndex);
    std::memcpy(apNodeName, &lrBoard.mNodeName, sizeof *apNodeName);
    std::memcpy(apPortName, &lrBoard.mPortName, sizeof *apPortName);
    return ZTLST_Success;
}

/// The zero name stands for a port whose name could not be read when it was asked for.
bool ZTCLinuxEngine::isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return isZeroName(acrPort) || isSameName(mBoards.get(aBoard).mPortName, acrPort);
}

std::uint32_t ZTCLinuxEngine::registerForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                                              std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                              KPM_ScopeCallback apCallback) {
    if (apHandle == nullptr || apCallback == nullptr) {
        return ZTLST_NullPointer;
    }
    if (aBoard >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    if (!isPortOf(aBoard, acrPort)) {
        return ZTLST_NotItsPort;
    }
    const std::optional<std::size_t> lKind = findLinuxKind(aCategory, aSubcategory);
    if (aCategory == 0 || !lKind) {
        return ZTLST_NoSuchKind;
    }
    ZTSLinuxRegistration lRegistration;
    lRegistration.mpContext = apContext;
    lRegistration.mpScopeCallback = apCallback;
    const std::uint32_t lHandle = mRegistry.put(aBoard, *lKind, lRegistration);
    std::memcpy(apHandle, &lHandle, sizeof lHandle);
    return hasSource(*lKind) ? KPM_STATUS_SUCCESS : KPM_STATUS_NO_SOURCE;
}

std::uint32_t ZTCLinuxEngine::unregisterForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aHandle) {
    if (aBoard >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    if (!isPortOf(aBoard, acrPort)) {
        return ZTLST_NotItsPort;
    }
    return mRegistry.remove(aBoard, aHandle, true) ? ZTLST_Success : ZTLST_NoSuchHandle;
}

std::uint32_t ZTCLinuxEngine::registerForBoard(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                               KPM_EventCallback apCallback) {
    const std::optional<std::size_t> lKind = findLinuxKind(0, aEventType);
    if (apCallback == nullptr || aBoard >= getNumberOfAdapters() || !lKind || getLinuxSource(*lKind) == ZTLSO_None) {
        return 0;
    }
    ZTSLinuxRegistration lRegistration;
    lRegistration.mpContext = apContext;
    lRegistration.mpEventCallback = apCallback;
    return mRegistry.put(aBoard, *lKind, lRegistration);
}

std::uint32_t ZTCLinuxEngine::unregisterForBoard(std::uint32_t aBoard, std::uint32_t aHandle) {
    if (aBoard >= getNumberOfAdapters()) {
        return ZTLST_NoSuchBoard;
    }
    return mRegistry.remove(aBoard, aHandle, false) ? ZTLST_Success : ZTLST_NoSuchHandle;
}
