/// libkpm-scripted.so: an adapters' library that a test scripts. ScriptedLibrary.h describes its configuration lines
/// and what it records; the requests on its socket are those that ScriptedLibrary.cpp sends, one line each, answered by
/// one line.
///
/// It keeps the adapters' library's contract and leans on every freedom that this gives it: what a callback gets is
/// overwritten and freed as soon as the callback has returned, and threads may still run when the process exits.
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <exception>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <tuple>
#include <utility>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "tests/support/Bytes.h"
#include "tests/support/LibraryEvent.h"

namespace {

/// A thread that runs what it is given, in order.
class ZTCWorker {
public:
    ZTCWorker() : mThread([this] { run(); }) {}
    ~ZTCWorker() {
        {
            const std::lock_guard lGuard(mLock);
            mIsToEnd = true;
        }
        mChange.notify_all();
        mThread.join();
    }
    ZTCWorker(const ZTCWorker&) = delete;
    ZTCWorker& operator=(const ZTCWorker&) = delete;

    /// Runs the job on the thread. Returns whether it was done within `aPatience`.
    bool runJob(std::function<void()> aJob, std::chrono::seconds aPatience) {
        const auto lpDone = std::make_shared<bool>(false);
        std::unique_lock lGuard(mLock);
        mJobs.push_back([this, aJob = std::move(aJob), lpDone] {
            aJob();
            const std::lock_guard lInner(mLock);
            *lpDone = true;
            mChange.notify_all();
        });
        mChange.notify_all();
        return mChange.wait_for(lGuard, aPatience, [&] { return *lpDone; });
    }

private:
    void run() {
        std::unique_lock lGuard(mLock);
        for (;;) {
            mChange.wait(lGuard, [this] { return mIsToEnd || !mJobs.empty(); });
            if (mJobs.empty()) {
                return;
            }
            const std::function<void()> lJob = std::move(mJobs.front());
            mJobs.pop_front();
            lGuard.unlock();
            lJob();
            lGuard.lock();
        }
    }

    std::mutex mLock;
    std::condition_variable mChange;
    std::deque<std::function<void()>> mJobs;
    bool mIsToEnd = false;
    std::thread mThread;
};

/// Bytes on the heap at an address of one's choice; overwritten before they are freed.
class ZTCPlacedBytes {
public:
    ZTCPlacedBytes(std::size_t aSize, bool aIsMisaligned)
        : mSize(aSize + 1), mpBlock(new unsigned char[mSize]), mOffset(aIsMisaligned ? 1 : 0) {}
    ~ZTCPlacedBytes() { std::memset(mpBlock.get(), 0xEE, mSize); }
    ZTCPlacedBytes(const ZTCPlacedBytes&) = delete;
    ZTCPlacedBytes& operator=(const ZTCPlacedBytes&) = delete;

    unsigned char* get() { return mpBlock.get() + mOffset; }

private:
    std::size_t mSize;
    std::unique_ptr<unsigned char[]> mpBlock;
    std::size_t mOffset;
};

struct ZTSAdapter {
    HBA_wwn mNodeName{};
    HBA_wwn mPortName{};
};

struct ZTSScopeRegistration {
    KPM_ScopeCallback mpCallback = nullptr;
    void* mpContext = nullptr;
};

using ZTCKindKey = std::tuple<unsigned, unsigned, unsigned>;  // board, category, subcategory

class ZTCScriptedLibkpm {
public:
    ZTCScriptedLibkpm();

    uint32_t getFunctionList(uint32_t aVersion, const KPM_FunctionList** appList);
    uint32_t init();
    void close();
    uint32_t getNumberOfAdapters();
    uint32_t isZtapiSupported();
    uint32_t getAdapterInfo(uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName);
    uint32_t ztapiRegEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aCategory, uint32_t aSubcategory, void* apContext,
                           uint32_t* apHandle, KPM_ScopeCallback apCallback);
    uint32_t ztapiUnregEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aHandle);
    uint32_t kpmRegEvent(uint32_t aBoard, uint32_t aType, void* apContext, uint32_t aSize,
                         KPM_EventCallback apCallback);
    uint32_t kpmUnregEvent(uint32_t aBoard, uint32_t aHandle);

    bool isOpen() const { return mIsOpen; }
    void record(const std::string& acrCall);

private:
    std::string pathOf(const char* apName) const { return mDirectory + "/" + apName; }
    void configure(const std::string& acrLine);
    bool connectToTest();
    void serve();
    std::string handle(const std::string& acrLine);
    std::string startStorm(std::istream& arRequest);
    void runStorm(unsigned aThread, std::uint64_t aRounds, const std::vector<ZTSLibraryEvent>& acrEvents);
    std::string endStorm(bool aIsToStop);
    void deliver(const ZTSLibraryEvent& acrEvent);
    void deliverOnRegister(const ZTCKindKey& acrKind);
    void deliverInClose();
    /// Where a test holds this function: waits until it lets go of it.
    void waitWhileHeld(const std::string& acrFunction);
    ZTCWorker& worker(unsigned aNumber);

    // Constant after construction.
    std::string mDirectory;
    KPM_FunctionList mList{};

    // Touched by the caller of Init and Close alone.
    std::thread mServer;
    std::atomic<bool> mIsOpen{false};

    // Guarded by mLock, which is never held over a callback.
    std::mutex mLock;
    uint32_t mFunctionListStatus = 0;
    uint32_t mInitStatus = 0;
    uint32_t mIsZtapiSupported = 1;
    uint32_t mNumberOfAdapters = 0;
    uint32_t mNextHandle = 1;
    std::vector<ZTSAdapter> mAdapters;
    std::map<uint32_t, uint32_t> mInfoStatuses;
    std::map<ZTCKindKey, uint32_t> mRegisterStatuses;
    std::map<ZTCKindKey, uint32_t> mRegisterHandles;
    std::map<ZTCKindKey, std::vector<ZTSLibraryEvent>> mDeliveries;
    std::map<ZTCKindKey, std::vector<ZTSLibraryEvent>> mInlineDeliveries;
    unsigned mCloseThreads = 0;
    std::vector<ZTSLibraryEvent> mCloseDeliveries;
    std::set<std::string> mHeldFunctions;
    bool mIsLetGo = false;
    std::condition_variable mLettingGo;
    std::map<ZTCKindKey, ZTSScopeRegistration> mScopeRegistrations;
    ZTSScopeRegistration mLatestScope;
    std::map<std::pair<unsigned, unsigned>, KPM_EventCallback> mBoardRegistrations;  // board, event type
    std::map<unsigned, KPM_EventCallback> mLatestBoard;                              // event type
    std::map<unsigned, std::unique_ptr<ZTCWorker>> mWorkers;

    // The storm: threads by the server thread, and by Close after that has ended.
    std::vector<std::thread> mStorm;
    std::atomic<bool> mIsStormToStop{false};
    std::atomic<std::uint64_t> mDelivered{0};

    int mConnection = -1;
};

ZTCScriptedLibkpm* spLibrary = nullptr;

uint32_t sInit() {
    return spLibrary->init();
}
void sClose() {
    spLibrary->close();
}
uint32_t sGetNumberOfAdapters() {
    return spLibrary->getNumberOfAdapters();
}
uint32_t sIsZtapiSupported() {
    return spLibrary->isZtapiSupported();
}
uint32_t sGetAdapterInfo(uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    return spLibrary->getAdapterInfo(aIndex, apNodeName, apPortName);
}
uint32_t sZtapiRegEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aCategory, uint32_t aSubcategory, void* apContext,
                        uint32_t* apHandle, KPM_ScopeCallback apCallback) {
    return spLibrary->ztapiRegEvent(aBoard, aPort, aCategory, aSubcategory, apContext, apHandle, apCallback);
}
uint32_t sZtapiUnregEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aHandle) {
    return spLibrary->ztapiUnregEvent(aBoard, aPort, aHandle);
}
uint32_t sKpmRegEvent(uint32_t aBoard, uint32_t aType, void* apContext, uint32_t aSize, KPM_EventCallback apCallback) {
    return spLibrary->kpmRegEvent(aBoard, aType, apContext, aSize, apCallback);
}
uint32_t sKpmUnregEvent(uint32_t aBoard, uint32_t aHandle) {
    return spLibrary->kpmUnregEvent(aBoard, aHandle);
}

std::atomic<KPM_LogFunction> spLog{nullptr};

void sSetLog(KPM_LogFunction apLog) {
    spLog = apLog;
}

HBA_wwn sToHba(const ZTCBytes& acrBytes) {
    HBA_wwn lName{};
    if (acrBytes.size() != sizeof(lName.wwn)) {
        throw std::runtime_error("a name has 16 hex digits");
    }
    std::memcpy(lName.wwn, acrBytes.data(), sizeof(lName.wwn));
    return lName;
}

HBA_wwn sToHba(const ZTSWwn& acrName) {
    HBA_wwn lName{};
    std::memcpy(lName.wwn, acrName.mBytes.data(), sizeof(lName.wwn));
    return lName;
}

std::string sTextOf(const HBA_wwn& acrName) {
    ZTSWwn lName;
    std::memcpy(lName.mBytes.data(), acrName.wwn, sizeof(acrName.wwn));
    return wwnText(lName);
}

ZTCScriptedLibkpm::ZTCScriptedLibkpm() {
    const char* const lpDirectory = getenv("ZT_SCRIPTED_KPM_DIR");
    mDirectory = lpDirectory != nullptr ? lpDirectory : "/nonexistent";
    mList.version = KPM_INTERFACE_VERSION;
    mList.size = sizeof(KPM_FunctionList);
    mList.Init = sInit;
    mList.Close = sClose;
    mList.GetNumberOfAdapters = sGetNumberOfAdapters;
    mList.IsZtapiSupported = sIsZtapiSupported;
    mList.GetAdapterInfo = sGetAdapterInfo;
    mList.ZtapiRegEvent = sZtapiRegEvent;
    mList.ZtapiUnregEvent = sZtapiUnregEvent;
    mList.KpmRegEvent = sKpmRegEvent;
    mList.KpmUnregEvent = sKpmUnregEvent;
    mList.SetLog = sSetLog;

    std::string lLine;
    const int lFile = open(pathOf("scripted.conf").c_str(), O_RDONLY | O_CLOEXEC);
    if (lFile >= 0) {
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
    std::istringstream lLine(acrLine);
    std::string lKey;
    lLine >> lKey;
    const auto lNumber = [&lLine] {
        uint32_t lValue = 0;
        if (!(lLine >> lValue)) {
            throw std::runtime_error("a number is missing");
        }
        return lValue;
    };
    const auto lKind = [&lNumber] {
        const uint32_t lBoard = lNumber();
        const uint32_t lCategory = lNumber();
        return ZTCKindKey(lBoard, lCategory, lNumber());
    };
    const std::lock_guard lGuard(mLock);
    if (lKey == "adapter") {
        std::string lNodeName;
        std::string lPortName;
        lLine >> lNodeName >> lPortName;
        mAdapters.push_back({sToHba(bytesOf(lNodeName)), sToHba(bytesOf(lPortName))});
        mNumberOfAdapters = static_cast<uint32_t>(mAdapters.size());
    } else if (lKey == "adapters") {
        mNumberOfAdapters = lNumber();
    } else if (lKey == "function-list-status") {
        mFunctionListStatus = lNumber();
    } else if (lKey == "version") {
        mList.version = lNumber();
    } else if (lKey == "size") {
        mList.size = lNumber();
    } else if (lKey == "null-entry") {
        const std::size_t lEntry = lNumber();
        std::memset(reinterpret_cast<unsigned char*>(&mList) + 8 + lEntry * sizeof(void*), 0, sizeof(void*));
    } else if (lKey == "init-status") {
        mInitStatus = lNumber();
    } else if (lKey == "ztapi-supported") {
        mIsZtapiSupported = lNumber();
    } else if (lKey == "info-status") {
        const uint32_t lIndex = lNumber();
        mInfoStatuses[lIndex] = lNumber();
    } else if (lKey == "register-status") {
        const ZTCKindKey lKey2 = lKind();
        mRegisterStatuses[lKey2] = lNumber();
    } else if (lKey == "register-handle") {
        const ZTCKindKey lKey2 = lKind();
        mRegisterHandles[lKey2] = lNumber();
    } else if (lKey == "deliver-on-register") {
        const ZTCKindKey lKey2 = lKind();
        mDeliveries[lKey2].push_back(ZTSLibraryEvent::parse(lLine));
    } else if (lKey == "deliver-in-register") {
        const ZTCKindKey lKey2 = lKind();
        mInlineDeliveries[lKey2].push_back(ZTSLibraryEvent::parse(lLine));
    } else if (lKey == "deliver-in-close") {
        mCloseThreads = lNumber();
        mCloseDeliveries.push_back(ZTSLibraryEvent::parse(lLine));
    } else if (lKey == "hold") {
        std::string lFunction;
        lLine >> lFunction;
        mHeldFunctions.insert(lFunction);
    } else if (lKey == "hold-nothing") {
        mHeldFunctions.clear();
    } else if (lKey == "log") {
        const uint32_t lLevel = lNumber();
        std::string lText;
        std::getline(lLine >> std::ws, lText);
        spLog.load()(lLevel, lText.c_str());
    } else if (!lKey.empty()) {
        throw std::runtime_error("no such configuration: " + lKey);
    }
}

uint32_t ZTCScriptedLibkpm::getFunctionList(uint32_t aVersion, const KPM_FunctionList** appList) {
    record("KPM_GetFunctionList version=" + std::to_string(aVersion));
    if (mFunctionListStatus == 0) {
        *appList = &mList;
    }
    return mFunctionListStatus;
}

bool ZTCScriptedLibkpm::connectToTest() {
    const std::string lPath = pathOf("scripted.sock");
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    if (lPath.size() >= sizeof(lAddress.sun_path)) {
        return false;
    }
    std::memcpy(lAddress.sun_path, lPath.c_str(), lPath.size());
    mConnection = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (connect(mConnection, reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) != 0) {
        ::close(mConnection);
        mConnection = -1;
        return false;
    }
    return true;
}

uint32_t ZTCScriptedLibkpm::init() {
    sigset_t lBlocked;
    pthread_sigmask(SIG_SETMASK, nullptr, &lBlocked);
    std::string lNames;
    for (const auto& [lSignal, lpName] :
         {std::pair{SIGTERM, " TERM"}, std::pair{SIGINT, " INT"}, std::pair{SIGHUP, " HUP"}}) {
        lNames += sigismember(&lBlocked, lSignal) == 1 ? lpName : "";
    }
    record("Init blocked:" + lNames + " -> " + std::to_string(mInitStatus));
    if (mInitStatus == 0) {
        mIsOpen = true;
        if (connectToTest()) {
            mServer = std::thread([this] { serve(); });
        }
        waitWhileHeld("Init");
    }
    return mInitStatus;
}

void ZTCScriptedLibkpm::waitWhileHeld(const std::string& acrFunction) {
    std::unique_lock lGuard(mLock);
    if (mHeldFunctions.erase(acrFunction) == 0) {
        return;
    }
    mIsLetGo = false;
    record(acrFunction + " held");
    if (!mLettingGo.wait_for(lGuard, std::chrono::seconds(60), [this] { return mIsLetGo; })) {
        record(acrFunction + " was not let go of");
    }
}

void ZTCScriptedLibkpm::deliverInClose() {
    std::vector<ZTSLibraryEvent> lEvents;
    unsigned lThreads = 0;
    {
        const std::lock_guard lGuard(mLock);
        lEvents = mCloseDeliveries;
        lThreads = mCloseThreads;
    }
    if (lEvents.empty()) {
        return;
    }
    const auto lDeliver = [this](const ZTSLibraryEvent& acrEvent) {
        try {
            deliver(acrEvent);
        } catch (const std::exception& lcrError) {
            record(std::string("deliver-in-close failed: ") + lcrError.what());
        }
    };
    std::vector<std::thread> lDeliverers;
    for (unsigned i = 0; i < lThreads; ++i) {
        lDeliverers.emplace_back([&lDeliver, &lEvents] {
            for (const ZTSLibraryEvent& lcrEvent : lEvents) {
                lDeliver(lcrEvent);
            }
        });
    }
    for (std::thread& lrThread : lDeliverers) {
        lrThread.join();
    }
    lDeliver(lEvents.front());
    record("deliver-in-close returned");
}

void ZTCScriptedLibkpm::close() {
    waitWhileHeld("Close");
    deliverInClose();
    if (mConnection >= 0) {
        shutdown(mConnection, SHUT_RDWR);
    }
    mIsStormToStop = true;
    if (mServer.joinable()) {
        mServer.join();
    }
    for (std::thread& lrThread : mStorm) {
        lrThread.join();
    }
    mStorm.clear();
    std::map<unsigned, std::unique_ptr<ZTCWorker>> lWorkers;
    {
        const std::lock_guard lGuard(mLock);
        lWorkers.swap(mWorkers);
        mScopeRegistrations.clear();
        mBoardRegistrations.clear();
        mLatestBoard.clear();
        mLatestScope = {};
    }
    lWorkers.clear();
    if (mConnection >= 0) {
        ::close(mConnection);
        mConnection = -1;
    }
    mIsOpen = false;
    record("Close");
}

uint32_t ZTCScriptedLibkpm::getNumberOfAdapters() {
    waitWhileHeld("GetNumberOfAdapters");
    const std::lock_guard lGuard(mLock);
    record("GetNumberOfAdapters -> " + std::to_string(mNumberOfAdapters));
    return mNumberOfAdapters;
}

uint32_t ZTCScriptedLibkpm::isZtapiSupported() {
    const std::lock_guard lGuard(mLock);
    record("IsZtapiSupported -> " + std::to_string(mIsZtapiSupported));
    return mIsZtapiSupported;
}

uint32_t ZTCScriptedLibkpm::getAdapterInfo(uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    const std::lock_guard lGuard(mLock);
    const auto lStatus = mInfoStatuses.find(aIndex);
    const uint32_t lResult =
        lStatus != mInfoStatuses.end() ? lStatus->second : static_cast<uint32_t>(aIndex < mAdapters.size() ? 0 : 1);
    record("GetAdapterInfo index=" + std::to_string(aIndex) + " -> " + std::to_string(lResult));
    if (lResult == 0 && aIndex < mAdapters.size()) {
        *apNodeName = mAdapters[aIndex].mNodeName;
        *apPortName = mAdapters[aIndex].mPortName;
    }
    return lResult;
}

uint32_t ZTCScriptedLibkpm::ztapiRegEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aCategory, uint32_t aSubcategory,
                                          void* apContext, uint32_t* apHandle, KPM_ScopeCallback apCallback) {
    waitWhileHeld("ZtapiRegEvent");
    const ZTCKindKey lKind(aBoard, aCategory, aSubcategory);
    uint32_t lStatus = 0;
    {
        const std::lock_guard lGuard(mLock);
        const auto lScripted = mRegisterStatuses.find(lKind);
        lStatus = lScripted != mRegisterStatuses.end() ? lScripted->second : 0;
        std::ostringstream lCall;
        lCall << "ZtapiRegEvent board=" << aBoard << " port=" << sTextOf(aPort) << " category=" << aCategory
              << " subcategory=" << aSubcategory << " context=" << (apContext != nullptr ? "set" : "null")
              << " preset=" << *apHandle << " -> " << lStatus;
        if (lStatus == 0 || (lStatus >= 5 && lStatus <= 7)) {
            const auto lHandle = mRegisterHandles.find(lKind);
            *apHandle = lHandle != mRegisterHandles.end() ? lHandle->second : mNextHandle++;
            mScopeRegistrations[lKind] = {apCallback, apContext};
            mLatestScope = {apCallback, apContext};
        }
        record(lCall.str());
    }
    deliverOnRegister(lKind);
    return lStatus;
}

uint32_t ZTCScriptedLibkpm::ztapiUnregEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aHandle) {
    record("ZtapiUnregEvent board=" + std::to_string(aBoard) + " port=" + sTextOf(aPort) +
           " handle=" + std::to_string(aHandle));
    return 0;
}

uint32_t ZTCScriptedLibkpm::kpmRegEvent(uint32_t aBoard, uint32_t aType, void* apContext, uint32_t aSize,
                                        KPM_EventCallback apCallback) {
    const ZTCKindKey lKind(aBoard, 0, aType);
    uint32_t lResult = 0;
    {
        const std::lock_guard lGuard(mLock);
        const auto lHandle = mRegisterHandles.find(lKind);
        lResult = lHandle != mRegisterHandles.end() ? lHandle->second : mNextHandle++;
        std::ostringstream lCall;
        lCall << "KpmRegEvent board=" << aBoard << " type=" << aType << " context=" << std::hex << "0x"
              << reinterpret_cast<std::uintptr_t>(apContext) << std::dec << " size=" << aSize << " -> "
              << (lResult != 0 ? "handle" : "0");
        record(lCall.str());
        if (lResult != 0) {
            mBoardRegistrations[{aBoard, aType}] = apCallback;
            mLatestBoard[aType] = apCallback;
        }
    }
    deliverOnRegister(lKind);
    return lResult;
}

uint32_t ZTCScriptedLibkpm::kpmUnregEvent(uint32_t aBoard, uint32_t aHandle) {
    record("KpmUnregEvent board=" + std::to_string(aBoard) + " handle=" + std::to_string(aHandle));
    return 0;
}

void ZTCScriptedLibkpm::deliverOnRegister(const ZTCKindKey& acrKind) {
    std::vector<ZTSLibraryEvent> lEvents;
    std::vector<ZTSLibraryEvent> lInlineEvents;
    {
        const std::lock_guard lGuard(mLock);
        const auto lScripted = mDeliveries.find(acrKind);
        if (lScripted != mDeliveries.end()) {
            lEvents = lScripted->second;
        }
        const auto lInline = mInlineDeliveries.find(acrKind);
        if (lInline != mInlineDeliveries.end()) {
            lInlineEvents = lInline->second;
        }
    }
    for (const ZTSLibraryEvent& lcrEvent : lInlineEvents) {
        deliver(lcrEvent);
        record("deliver-in-register returned");
    }
    for (const ZTSLibraryEvent& lcrEvent : lEvents) {
        const bool lIsDone = worker(0).runJob([this, lcrEvent] { deliver(lcrEvent); }, std::chrono::seconds(10));
        record(std::string("deliver-on-register ") + (lIsDone ? "returned" : "timed out"));
    }
}

unsigned sRegisteredType(ZTELibraryEventType aType) {
    switch (aType) {
        case ZTELibraryEventType::Link:
            return FC_REG_LINK_EVENT;
        case ZTELibraryEventType::Rscn:
            return FC_REG_RSCN_EVENT;
        default:
            return FC_REG_TEMPERATURE_EVENT;
    }
}

void ZTCScriptedLibkpm::deliver(const ZTSLibraryEvent& acrEvent) {
    ZTSScopeRegistration lScope;
    KPM_EventCallback lpCallback = nullptr;
    {
        const std::lock_guard lGuard(mLock);
        if (acrEvent.mType == ZTELibraryEventType::Scope) {
            const auto lFound = mScopeRegistrations.find({acrEvent.mBoard, acrEvent.mCategory, acrEvent.mSubcategory});
            lScope = lFound != mScopeRegistrations.end() ? lFound->second : mLatestScope;
        } else {
            const unsigned lType = sRegisteredType(acrEvent.mType);
            const auto lFound = mBoardRegistrations.find({acrEvent.mBoard, lType});
            lpCallback = lFound != mBoardRegistrations.end() ? lFound->second : mLatestBoard[lType];
        }
    }
    ZTCPlacedBytes lData(acrEvent.mData.size(), acrEvent.mIsMisaligned);
    if (!acrEvent.mData.empty()) {
        std::memcpy(lData.get(), acrEvent.mData.data(), acrEvent.mData.size());
    }
    if (acrEvent.mType == ZTELibraryEventType::Scope) {
        if (lScope.mpCallback == nullptr) {
            throw std::runtime_error("no scope event is registered");
        }
        ZT_event_payload lPayload{};
        lPayload.zt_payload_reserved = 0xA5A5A5A5A5A5A5A5;
        lPayload.zt_payload_data = acrEvent.mPayload == ZTELibraryEventPayload::Data ? lData.get() : nullptr;
        ZTCPlacedBytes lPlacedPayload(sizeof(lPayload), acrEvent.mIsMisaligned);
        std::memcpy(lPlacedPayload.get(), &lPayload, sizeof(lPayload));
        ZT_event lEvent{};
        lEvent.zt_evt_version = ZT_EVENT_VERSION;
        lEvent.zt_evt_size = acrEvent.mSize;
        lEvent.zt_evt_payload =
            acrEvent.mPayload == ZTELibraryEventPayload::NullPayload ? nullptr : lPlacedPayload.get();
        ZTCPlacedBytes lPlacedEvent(sizeof(lEvent), acrEvent.mIsMisaligned);
        std::memcpy(lPlacedEvent.get(), &lEvent, sizeof(lEvent));
        lScope.mpCallback(acrEvent.mBoard, sToHba(acrEvent.mPort), acrEvent.mCategory, acrEvent.mSubcategory,
                          lScope.mpContext, reinterpret_cast<ZT_event*>(lPlacedEvent.get()));
        return;
    }
    if (lpCallback == nullptr) {
        throw std::runtime_error("this board event is not registered");
    }
    void (*const lpGeneric)() = reinterpret_cast<void (*)()>(lpCallback);
    if (acrEvent.mType == ZTELibraryEventType::Link) {
        LINKINFO lInfo{};
        lInfo.a_linkEventTag = 1;
        lInfo.a_wwpName = sToHba(acrEvent.mPort);
        lInfo.a_wwnName = sToHba(makeWwn(0x7777777777777777));
        ZTCPlacedBytes lPlaced(sizeof(lInfo), acrEvent.mIsMisaligned);
        std::memcpy(lPlaced.get(), &lInfo, sizeof(lInfo));
        reinterpret_cast<KPM_LinkCallback>(lpGeneric)(acrEvent.mBoard, lPlaced.get());
    } else if (acrEvent.mType == ZTELibraryEventType::Rscn) {
        reinterpret_cast<KPM_RscnCallback>(lpGeneric)(acrEvent.mBoard, lData.get(),
                                                      static_cast<unsigned>(acrEvent.mSize));
    } else {
        reinterpret_cast<KPM_TemperatureCallback>(lpGeneric)(acrEvent.mBoard, 41, 42);
    }
}

ZTCWorker& ZTCScriptedLibkpm::worker(unsigned aNumber) {
    const std::lock_guard lGuard(mLock);
    std::unique_ptr<ZTCWorker>& lrWorker = mWorkers[aNumber];
    if (lrWorker == nullptr) {
        lrWorker = std::make_unique<ZTCWorker>();
    }
    return *lrWorker;
}

void ZTCScriptedLibkpm::serve() {
    std::string lBuffered;
    char lChunk[4096];
    for (;;) {
        const ssize_t lCount = recv(mConnection, lChunk, sizeof(lChunk), 0);
        if (lCount <= 0) {
            return;
        }
        lBuffered.append(lChunk, static_cast<std::size_t>(lCount));
        for (std::size_t lEnd = lBuffered.find('\n'); lEnd != std::string::npos; lEnd = lBuffered.find('\n')) {
            // The function that is let go of may close the connection: the reply comes first.
            const bool lIsToLetGo = lBuffered.starts_with("let-go\n");
            std::string lReply;
            try {
                lReply = "ok " + handle(lBuffered.substr(0, lEnd));
            } catch (const std::exception& lcrError) {
                lReply = std::string("error ") + lcrError.what();
            }
            lBuffered.erase(0, lEnd + 1);
            lReply += '\n';
            if (send(mConnection, lReply.data(), lReply.size(), MSG_NOSIGNAL) < 0) {
                return;
            }
            if (lIsToLetGo) {
                const std::lock_guard lGuard(mLock);
                mIsLetGo = true;
                mLettingGo.notify_all();
            }
        }
    }
}

std::string ZTCScriptedLibkpm::handle(const std::string& acrLine) {
    std::istringstream lRequest(acrLine);
    std::string lVerb;
    lRequest >> lVerb;
    if (lVerb == "configure") {
        std::string lLine;
        std::getline(lRequest, lLine);
        configure(lLine);
        return "";
    }
    if (lVerb == "deliver") {
        unsigned lThread = 0;
        lRequest >> lThread;
        const ZTSLibraryEvent lEvent = ZTSLibraryEvent::parse(lRequest);
        std::string lFailure;
        const bool lIsDone = worker(lThread).runJob(
            [&] {
                try {
                    deliver(lEvent);
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
    if (lVerb == "let-go") {
        return "";
    }
    if (lVerb == "storm") {
        return startStorm(lRequest);
    }
    if (lVerb == "wait-storm" || lVerb == "stop-storm") {
        return endStorm(lVerb == "stop-storm");
    }
    throw std::runtime_error("no such request: " + lVerb);
}

std::string ZTCScriptedLibkpm::startStorm(std::istream& arRequest) {
    unsigned lThreads = 0;
    std::uint64_t lRounds = 0;
    std::size_t lCount = 0;
    if (!(arRequest >> lThreads >> lRounds >> lCount) || !mStorm.empty()) {
        throw std::runtime_error("bad storm");
    }
    std::vector<ZTSLibraryEvent> lEvents;
    for (std::size_t i = 0; i < lCount; ++i) {
        lEvents.push_back(ZTSLibraryEvent::parse(arRequest));
    }
    mIsStormToStop = false;
    mDelivered = 0;
    for (unsigned i = 0; i < lThreads; ++i) {
        mStorm.emplace_back([this, i, lRounds, lEvents] { runStorm(i, lRounds, lEvents); });
    }
    return "";
}

void ZTCScriptedLibkpm::runStorm(unsigned aThread, std::uint64_t aRounds,
                                 const std::vector<ZTSLibraryEvent>& acrEvents) {
    for (std::uint64_t lRound = 0; aRounds == 0 || lRound < aRounds; ++lRound) {
        for (std::size_t i = 0; i < acrEvents.size(); ++i) {
            if (mIsStormToStop) {
                return;
            }
            try {
                deliver(acrEvents[(i + aThread) % acrEvents.size()]);
            } catch (const std::exception& lcrError) {
                record(std::string("storm failed: ") + lcrError.what());
                return;
            }
            ++mDelivered;
        }
    }
}

std::string ZTCScriptedLibkpm::endStorm(bool aIsToStop) {
    if (aIsToStop) {
        mIsStormToStop = true;
    }
    for (std::thread& lrThread : mStorm) {
        lrThread.join();
    }
    mStorm.clear();
    return std::to_string(mDelivered);
}

// Runs when the library is unloaded, and when the process exits. In the second case threads may be running: nothing is
// joined, nothing is freed.
__attribute__((destructor)) void sUnload() {
    if (spLibrary != nullptr && !spLibrary->isOpen()) {
        spLibrary->record("Unloaded");
        delete spLibrary;
        spLibrary = nullptr;
    }
}

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    if (spLibrary == nullptr) {
        spLibrary = new ZTCScriptedLibkpm();
    }
    return spLibrary->getFunctionList(aVersion, appList);
}
