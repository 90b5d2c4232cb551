#include "libkpm/linux/src/EntryPoints.h"

#include <cstdlib>
#include <exception>
#include <memory>
#include <mutex>
#include <new>
#include <string>
#include <utility>

#include "libkpm/linux/src/Engine.h"
#include "libkpm/linux/src/Report.h"

/// What is open between Init and Close.
struct ZTSLinuxSession {
    explicit ZTSLinuxSession(ZTSLinuxOptions aOptions) : mEngine(std::move(aOptions), mSources) {}

    ZTCLinuxSources mSources;
    ZTCLinuxEngine mEngine;
};

struct ZTSLinuxLibrary {
    std::mutex mLock;
    std::shared_ptr<ZTSLinuxSession> mpSession;  // guarded by mLock; null: not open
    bool mIsOpening = false;                     // guarded by mLock: an Init is under way
};

/// Never destroyed: a process may end with the library open and its thread running. In static memory, so that unloading
/// the library leaks nothing.
static ZTSLinuxLibrary& sLibrary() {
    alignas(ZTSLinuxLibrary) static unsigned char sMemory[sizeof(ZTSLinuxLibrary)];
    static ZTSLinuxLibrary& srLibrary = *new (sMemory) ZTSLinuxLibrary;
    return srLibrary;
}

/// The session is used without the lock, and lives as long as someone uses it.
static std::shared_ptr<ZTSLinuxSession> sSession() {
    ZTSLinuxLibrary& lrLibrary = sLibrary();
    const std::lock_guard<std::mutex> lGuard(lrLibrary.mLock);
    return lrLibrary.mpSession;
}

static ZTSLinuxOptions sOptions() {
    ZTSLinuxOptions lOptions;
    const char* lpSysfs = std::getenv("KPM_LINUX_SYSFS");
    if (lpSysfs != nullptr && *lpSysfs != '\0') {
        lOptions.mSysfsRoot = lpSysfs;
    }
    const char* lpTracefs = std::getenv("KPM_LINUX_TRACEFS");
    if (lpTracefs != nullptr && *lpTracefs != '\0') {
        lOptions.mTracefsRoots = {lpTracefs};
    }
    return lOptions;
}

/// Ends what an Init has begun: the library is open with this session, or, without one, as it was before.
static void sEndOpening(std::shared_ptr<ZTSLinuxSession> apSession) {
    ZTSLinuxLibrary& lrLibrary = sLibrary();
    const std::lock_guard<std::mutex> lGuard(lrLibrary.mLock);
    lrLibrary.mpSession = std::move(apSession);
    lrLibrary.mIsOpening = false;
}

static bool sBeginOpening() {
    ZTSLinuxLibrary& lrLibrary = sLibrary();
    const std::lock_guard<std::mutex> lGuard(lrLibrary.mLock);
    if (lrLibrary.mpSession != nullptr || lrLibrary.mIsOpening) {
        return false;
    }
    lrLibrary.mIsOpening = true;
    return true;
}

/// The lock is not held while the session starts: it writes to the agent's log.
static std::uint32_t sInit() {
    if (!sBeginOpening()) {
        logLinuxLine(KPM_LOG_ERROR, "Init: the library is open");
        return ZTLST_AlreadyOpen;
    }
    try {
        auto lpSession = std::make_shared<ZTSLinuxSession>(sOptions());
        lpSession->mEngine.start();
        sEndOpening(std::move(lpSession));
        return ZTLST_Success;
    } catch (const std::exception& lrException) {
        sEndOpening(nullptr);
        logLinuxLine(KPM_LOG_ERROR, std::string("Init: ") + lrException.what());
        return ZTLST_NoResources;
    }
}

static void sClose() {
    std::shared_ptr<ZTSLinuxSession> lpSession;
    {
        ZTSLinuxLibrary& lrLibrary = sLibrary();
        const std::lock_guard<std::mutex> lGuard(lrLibrary.mLock);
        lpSession.swap(lrLibrary.mpSession);
    }
    if (lpSession != nullptr) {
        lpSession->mEngine.stop();
    }
}

static std::uint32_t sGetNumberOfAdapters() {
    const std::shared_ptr<ZTSLinuxSession> lpSession = sSession();
    return lpSession == nullptr ? 0 : lpSession->mEngine.getNumberOfAdapters();
}

static std::uint32_t sIsZtapiSupported() {
    return sSession() != nullptr ? 1 : 0;
}

/// Calls `aCall` on the open engine; `aNotOpen` where there is none, `aFailed` where memory has run out.
template <class Call>
static std::uint32_t sOnEngine(std::uint32_t aNotOpen, std::uint32_t aFailed, Call aCall) {
    try {
        const std::shared_ptr<ZTSLinuxSession> lpSession = sSession();
        return lpSession == nullptr ? aNotOpen : aCall(lpSession->mEngine);
    } catch (const std::exception& lrException) {
        logLinuxLine(KPM_LOG_ERROR, lrException.what());
        return aFailed;
    }
}

static std::uint32_t sGetAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    return sOnEngine(ZTLST_NotOpen, ZTLST_NoResources,
                     [&](ZTCLinuxEngine& arEngine) { return arEngine.getAdapterInfo(aIndex, apNodeName, apPortName); });
}

static std::uint32_t sZtapiRegEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory,
                                    std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                    KPM_ScopeCallback apCallback) {
    return sOnEngine(ZTLST_NotOpen, ZTLST_NoResources, [&](ZTCLinuxEngine& arEngine) {
        return arEngine.registerForPort(aBoard, aPort, aCategory, aSubcategory, apContext, apHandle, apCallback);
    });
}

static std::uint32_t sZtapiUnregEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) {
    return sOnEngine(ZTLST_NotOpen, ZTLST_NoResources,
                     [&](ZTCLinuxEngine& arEngine) { return arEngine.unregisterForPort(aBoard, aPort, aHandle); });
}

static std::uint32_t sKpmRegEvent(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                  std::uint32_t /*aSize*/, KPM_EventCallback apCallback) {
    return sOnEngine(0, 0, [&](ZTCLinuxEngine& arEngine) {
        return arEngine.registerForBoard(aBoard, aEventType, apContext, apCallback);
    });
}

static std::uint32_t sKpmUnregEvent(std::uint32_t aBoard, std::uint32_t aHandle) {
    return sOnEngine(ZTLST_NotOpen, ZTLST_NoResources,
                     [&](ZTCLinuxEngine& arEngine) { return arEngine.unregisterForBoard(aBoard, aHandle); });
}

static void sSetLog(KPM_LogFunction apLog) {
    setLinuxLog(apLog);
}

const KPM_FunctionList* getLinuxFunctionList() {
    static constexpr KPM_FunctionList scList{KPM_INTERFACE_VERSION,
                                             sizeof(KPM_FunctionList),
                                             sInit,
                                             sClose,
                                             sGetNumberOfAdapters,
                                             sIsZtapiSupported,
                                             sGetAdapterInfo,
                                             sZtapiRegEvent,
                                             sZtapiUnregEvent,
                                             sKpmRegEvent,
                                             sKpmUnregEvent,
                                             sSetLog};
    return &scList;
}
