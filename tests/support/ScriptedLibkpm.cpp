#include "tests/support/ScriptedLibkpm.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <exception>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

#include "tests/support/Bytes.h"

static constexpr const char* scLetGo = "let-go";

static std::string sTextOf(const HBA_wwn& acrName) {
    return wwnText(wwnOfHbaName(acrName));
}

ZTCScriptedLibkpm::ZTCScriptedLibkpm(const KPM_FunctionList& acrList) {
    const char* const lpDirectory = getenv("ZT_SCRIPTED_KPM_DIR");
    mDirectory = lpDirectory != nullptr ? lpDirectory : "/nonexistent";
    mSettings.mList = acrList;
    const int lFile = open(pathOf("scripted.conf").c_str(), O_RDONLY | O_CLOEXEC);
    if (lFile >= 0) {
        std::string lLine;
        char lByte = 0;
        while (read(lFile, &lByte, 1) == 1) {
            if (lByte == '\n') {
                configure(lLine);
                lLine.clear();
            } else {
                lLine += lByte;
            }
        }
        ::close(lFile);
    }
}

void ZTCScriptedLibkpm::record(const std::string& acrCall) {
    const int lFile = open(pathOf("scripted.calls").c_str(), O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0600);
    if (lFile >= 0) {
        const std::string lLine = acrCall + "\n";
        [[maybe_unused]] const ssize_t lCount = write(lFile, lLine.data(), lLine.size());
        ::close(lFile);
    }
}

void ZTCScriptedLibkpm::configure(const std::string& acrLine) {
    if (!mReports.say(acrLine)) {
        const std::lock_guard lGuard(mLock);
        mSettings.apply(acrLine);
    }
}

// ---- The entries ----

std::uint32_t ZTCScriptedLibkpm::getFunctionList(std::uint32_t aVersion, const KPM_FunctionList&,
                                                 const KPM_FunctionList** appList) {
    record("KPM_GetFunctionList version=" + std::to_string(aVersion));
    if (mSettings.mFunctionListStatus == 0) {
        *appList = &mSettings.mList;
    }
    return mSettings.mFunctionListStatus;
}

std::uint32_t ZTCScriptedLibkpm::init() {
    sigset_t lBlocked;
    pthread_sigmask(SIG_SETMASK, nullptr, &lBlocked);
    std::string lNames;
    for (const auto& [lSignal, lpName] :
         {std::pair{SIGTERM, " TERM"}, std::pair{SIGINT, " INT"}, std::pair{SIGHUP, " HUP"}}) {
        lNames += sigismember(&lBlocked, lSignal) == 1 ? lpName : "";
    }
    const std::uint32_t lStatus = mSettings.mInitStatus;
    record("Init blocked:" + lNames + " -> " + std::to_string(lStatus));
    if (lStatus == 0) {
        mIsOpen = true;
        mConnection.open(
            pathOf("scripted.sock"), [this](const std::string& acrLine) { return handle(acrLine); },
            [this](const std::string& acrLine) { letGoAfter(acrLine); });
        waitWhileHeld("Init");
    }
    return lStatus;
}

void ZTCScriptedLibkpm::close() {
    waitWhileHeld("Close");
    deliverInClose();
    mStorm.requestStop();
    mConnection.stopServing();
    mStorm.requestStop();  // a last request may have started another one
    mStorm.join();
    std::map<unsigned, std::unique_ptr<ZTCLibraryWorker>> lWorkers;
    {
        const std::lock_guard lGuard(mLock);
        lWorkers.swap(mWorkers);
    }
    mCallbacks.clear();
    lWorkers.clear();
    mConnection.close();
    mIsOpen = false;
    record("Close");
}

std::uint32_t ZTCScriptedLibkpm::getNumberOfAdapters() {
    waitWhileHeld("GetNumberOfAdapters");
    const std::lock_guard lGuard(mLock);
    record("GetNumberOfAdapters -> " + std::to_string(mSettings.mNumberOfAdapters));
    return mSettings.mNumberOfAdapters;
}

std::uint32_t ZTCScriptedLibkpm::isZtapiSupported() {
    const std::lock_guard lGuard(mLock);
    record("IsZtapiSupported -> " + std::to_string(mSettings.mIsZtapiSupported));
    return mSettings.mIsZtapiSupported;
}

std::uint32_t ZTCScriptedLibkpm::getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    const std::lock_guard lGuard(mLock);
    const std::vector<ZTSScriptedAdapter>& lrAdapters = mSettings.mAdapters;
    const std::uint32_t lStatus = findSetting(mSettings.mInfoStatuses, aIndex, aIndex < lrAdapters.size() ? 0u : 1u);
    record("GetAdapterInfo index=" + std::to_string(aIndex) + " -> " + std::to_string(lStatus));
    if (lStatus == 0 && aIndex < lrAdapters.size()) {
        *apNodeName = lrAdapters[aIndex].mNodeName;
        *apPortName = lrAdapters[aIndex].mPortName;
    }
    return lStatus;
}

std::uint32_t ZTCScriptedLibkpm::ztapiRegEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory,
                                               std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                               KPM_ScopeCallback apCallback) {
    waitWhileHeld("ZtapiRegEvent");
    const ZTCKindKey lKind(aBoard, aCategory, aSubcategory);
    std::uint32_t lStatus = 0;
    {
        const std::lock_guard lGuard(mLock);
        lStatus = findSetting(mSettings.mRegisterStatuses, lKind, 0);
        std::ostringstream lCall;
        lCall << "ZtapiRegEvent board=" << aBoard << " port=" << sTextOf(aPort) << " category=" << aCategory
              << " subcategory=" << aSubcategory << " context=" << (apContext != nullptr ? "set" : "null")
              << " preset=" << *apHandle << " -> " << lStatus;
        if (lStatus == KPM_STATUS_SUCCESS || (lStatus >= KPM_STATUS_INFO_5 && lStatus <= KPM_STATUS_NO_RIGHTS)) {
            const auto lHandle = mSettings.mRegisterHandles.find(lKind);
            *apHandle = lHandle != mSettings.mRegisterHandles.end() ? lHandle->second : mNextHandle++;
            mCallbacks.addScope(lKind, apCallback, apContext);
        }
        record(lCall.str());
    }
    deliverOnRegister(lKind);
    return lStatus;
}

std::uint32_t ZTCScriptedLibkpm::ztapiUnregEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) {
    record("ZtapiUnregEvent board=" + std::to_string(aBoard) + " port=" + sTextOf(aPort) +
           " handle=" + std::to_string(aHandle));
    return 0;
}

std::uint32_t ZTCScriptedLibkpm::kpmRegEvent(std::uint32_t aBoard, std::uint32_t aType, void* apContext,
                                             std::uint32_t aSize, KPM_EventCallback apCallback) {
    const ZTCKindKey lKind(aBoard, 0, aType);
    std::uint32_t lHandle = 0;
    {
        const std::lock_guard lGuard(mLock);
        const auto lScripted = mSettings.mRegisterHandles.find(lKind);
        lHandle = lScripted != mSettings.mRegisterHandles.end() ? lScripted->second : mNextHandle++;
        std::ostringstream lCall;
        lCall << "KpmRegEvent board=" << aBoard << " type=" << aType << " context=" << std::hex << "0x"
              << reinterpret_cast<std::uintptr_t>(apContext) << std::dec << " size=" << aSize << " -> "
              << (lHandle != 0 ? "handle" : "0");
        record(lCall.str());
        if (lHandle != 0) {
            mCallbacks.addBoard(lKind, apCallback);
        }
    }
    deliverOnRegister(lKind);
    return lHandle;
}

std::uint32_t ZTCScriptedLibkpm::kpmUnregEvent(std::uint32_t aBoard, std::uint32_t aHandle) {
    record("KpmUnregEvent board=" + std::to_string(aBoard) + " handle=" + std::to_string(aHandle));
    return 0;
}

void ZTCScriptedLibkpm::waitWhileHeld(const std::string& acrFunction) {
    std::unique_lock lGuard(mLock);
    if (mSettings.mHeldFunctions.erase(acrFunction) == 0) {
        return;
    }
    mIsLetGo = false;
    record(acrFunction + " held");
    if (!mLettingGo.wait_for(lGuard, std::chrono::seconds(60), [this] { return mIsLetGo; })) {
        record(acrFunction + " was not let go of");
    }
}

// ---- Deliveries ----

bool ZTCScriptedLibkpm::tryToDeliver(const char* apName, const ZTSLibraryEvent& acrEvent) {
    try {
        mCallbacks.deliver(acrEvent);
        return true;
    } catch (const std::exception& lcrError) {
        record(std::string(apName) + " failed: " + lcrError.what());
        return false;
    }
}

void ZTCScriptedLibkpm::deliverOnRegister(const ZTCKindKey& acrKind) {
    std::vector<ZTSLibraryEvent> lEvents;
    std::vector<ZTSLibraryEvent> lInlineEvents;
    {
        const std::lock_guard lGuard(mLock);
        const auto lScripted = mSettings.mDeliveries.find(acrKind);
        if (lScripted != mSettings.mDeliveries.end()) {
            lEvents = lScripted->second;
        }
        const auto lInline = mSettings.mInlineDeliveries.find(acrKind);
        if (lInline != mSettings.mInlineDeliveries.end()) {
            lInlineEvents = lInline->second;
        }
    }
    for (const ZTSLibraryEvent& lcrEvent : lInlineEvents) {
        mCallbacks.deliver(lcrEvent);
        record("deliver-in-register returned");
    }
    for (const ZTSLibraryEvent& lcrEvent : lEvents) {
        const bool lIsDone =
            worker(0).runJob([this, lcrEvent] { mCallbacks.deliver(lcrEvent); }, std::chrono::seconds(10));
        record(std::string("deliver-on-register ") + (lIsDone ? "returned" : "timed out"));
    }
}

void ZTCScriptedLibkpm::deliverInClose() {
    static constexpr const char* scName = "deliver-in-close";
    std::vector<ZTSLibraryEvent> lEvents;
    unsigned lThreads = 0;
    {
        const std::lock_guard lGuard(mLock);
        lEvents = mSettings.mCloseDeliveries;
        lThreads = mSettings.mCloseThreads;
    }
    if (lEvents.empty()) {
        return;
    }
    std::vector<std::thread> lDeliverers;
    for (unsigned i = 0; i < lThreads; ++i) {
        lDeliverers.emplace_back([this, &lEvents] {
            for (const ZTSLibraryEvent& lcrEvent : lEvents) {
                tryToDeliver(scName, lcrEvent);
            }
        });
    }
    for (std::thread& lrThread : lDeliverers) {
        lrThread.join();
    }
    tryToDeliver(scName, lEvents.front());
    record("deliver-in-close returned");
}

ZTCLibraryWorker& ZTCScriptedLibkpm::worker(unsigned aNumber) {
    const std::lock_guard lGuard(mLock);
    std::unique_ptr<ZTCLibraryWorker>& lrWorker = mWorkers[aNumber];
    if (lrWorker == nullptr) {
        lrWorker = std::make_unique<ZTCLibraryWorker>();
    }
    return *lrWorker;
}

// ---- The test's requests ----

void ZTCScriptedLibkpm::letGoAfter(const std::string& acrLine) {
    if (acrLine == scLetGo) {
        const std::lock_guard lGuard(mLock);
        mIsLetGo = true;
        mLettingGo.notify_all();
    }
}

std::string ZTCScriptedLibkpm::handle(const std::string& acrLine) {
    struct Request {
        std::string_view mVerb;
        std::string (ZTCScriptedLibkpm::*mpHandle)(std::istream& arRequest);
    };
    static constexpr Request scRequests[] = {
        {"configure", &ZTCScriptedLibkpm::handleConfigure},  {"deliver", &ZTCScriptedLibkpm::handleDeliver},
        {scLetGo, &ZTCScriptedLibkpm::handleLetGo},          {"storm", &ZTCScriptedLibkpm::handleStorm},
        {"wait-storm", &ZTCScriptedLibkpm::handleWaitStorm}, {"stop-storm", &ZTCScriptedLibkpm::handleStopStorm},
    };
    std::istringstream lRequest(acrLine);
    std::string lVerb;
    lRequest >> lVerb;
    const auto* const lpFound = std::find_if(std::begin(scRequests), std::end(scRequests),
                                             [&](const Request& acrRow) { return acrRow.mVerb == lVerb; });
    if (lpFound == std::end(scRequests)) {
        throw std::runtime_error("no such request: " + lVerb);
    }
    return (this->*lpFound->mpHandle)(lRequest);
}

std::string ZTCScriptedLibkpm::handleConfigure(std::istream& arRequest) {
    std::string lLine;
    std::getline(arRequest, lLine);
    configure(lLine);
    return "";
}

std::string ZTCScriptedLibkpm::handleDeliver(std::istream& arRequest) {
    const unsigned lThread = readNumber(arRequest);
    const ZTSLibraryEvent lEvent = ZTSLibraryEvent::parse(arRequest);
    std::string lFailure;
    const bool lIsDone = worker(lThread).runJob(
        [&] {
            try {
                mCallbacks.deliver(lEvent);
            } catch (const std::exception& lcrError) {
                lFailure = lcrError.what();
            }
        },
        std::chrono::hours(1));
    if (!lIsDone || !lFailure.empty()) {
        throw std::runtime_error(lFailure);
    }
    return "";
}

std::string ZTCScriptedLibkpm::handleStorm(std::istream& arRequest) {
    const unsigned lThreads = readNumber(arRequest);
    std::uint64_t lRounds = 0;
    std::size_t lCount = 0;
    if (!(arRequest >> lRounds >> lCount)) {
        throw std::runtime_error("a storm needs threads, rounds and events");
    }
    std::vector<ZTSLibraryEvent> lEvents;
    for (std::size_t i = 0; i < lCount; ++i) {
        lEvents.push_back(ZTSLibraryEvent::parse(arRequest));
    }
    mStorm.start(lThreads, lRounds, lEvents,
                 [this](const ZTSLibraryEvent& acrEvent) { return tryToDeliver("storm", acrEvent); });
    return "";
}

std::string ZTCScriptedLibkpm::handleStopStorm(std::istream&) {
    mStorm.requestStop();
    return std::to_string(mStorm.join());
}
