#include "libkpm/sim/src/EntryPoints.h"

#include <cstdlib>
#include <exception>
#include <memory>
#include <mutex>
#include <new>
#include <string>
#include <string_view>
#include <utility>

#include "libkpm/sim/src/Control.h"
#include "libkpm/sim/src/ControlSocket.h"
#include "libkpm/sim/src/Engine.h"
#include "libkpm/sim/src/Report.h"
#include "libkpm/sim/src/ScenarioFile.h"

/// What is open between Init and Close.
struct ZTSSimSession {
    explicit ZTSSimSession(ZTSSimScenario aScenario) : mEngine(std::move(aScenario)) {}

    ZTCSimEngine mEngine;
    std::unique_ptr<ZTCSimControlSocket> mpSocket;
};

struct ZTSSimLibrary {
    std::mutex mLock;
    std::shared_ptr<ZTSSimSession> mpSession;  // guarded by mLock; null: not open
};

/// Never destroyed: a process may end with the library open and its threads running. In static memory, so that
/// unloading the library leaks nothing.
static ZTSSimLibrary& sLibrary() {
    alignas(ZTSSimLibrary) static unsigned char sMemory[sizeof(ZTSSimLibrary)];
    static ZTSSimLibrary& srLibrary = *new (sMemory) ZTSSimLibrary;
    return srLibrary;
}

/// The session is used without the lock, and lives as long as someone uses it.
static std::shared_ptr<ZTSSimSession> sSession() {
    ZTSSimLibrary& lrLibrary = sLibrary();
    const std::lock_guard<std::mutex> lGuard(lrLibrary.mLock);
    return lrLibrary.mpSession;
}

static std::string sEnvironment(const char* apName) {
    const char* lpValue = std::getenv(apName);
    return lpValue == nullptr ? "" : lpValue;
}

static ZTSSimScenario sReadScenario() {
    const std::string lPath = sEnvironment("KPM_SIM_SCENARIO");
    if (lPath.empty()) {
        return parseSimScenario(getDefaultSimScenario());
    }
    const std::string lText = readSimFile(lPath);
    try {
        return parseSimScenario(lText);
    } catch (const ZTCSimRefusal& lrRefusal) {
        throw ZTCSimRefusal(lrRefusal.getLine(), describeSimRefusal(lPath, lrRefusal));
    }
}

static std::uint32_t sOpen(ZTSSimLibrary& arLibrary) {
    ZTSSimScenario lScenario = sReadScenario();
    if (lScenario.mInitStatus != ZTSST_Success) {
        return lScenario.mInitStatus;
    }
    auto lpSession = std::make_shared<ZTSSimSession>(std::move(lScenario));
    lpSession->mEngine.start();
    const std::string lSocket = sEnvironment("KPM_SIM_SOCKET");
    if (!lSocket.empty()) {
        ZTCSimEngine& lrEngine = lpSession->mEngine;
        try {
            lpSession->mpSocket = std::make_unique<ZTCSimControlSocket>(
                lSocket, [&lrEngine](std::string_view aLine) { return answerSimLine(lrEngine, aLine); });
        } catch (const std::exception& lrException) {
            reportSimProblem(lrException.what());
            return ZTSST_NoSocket;
        }
    }
    arLibrary.mpSession = std::move(lpSession);
    return ZTSST_Success;
}

static std::uint32_t sInit() {
    try {
        ZTSSimLibrary& lrLibrary = sLibrary();
        const std::lock_guard<std::mutex> lGuard(lrLibrary.mLock);
        if (lrLibrary.mpSession != nullptr) {
            reportSimProblem("libkpm-sim: Init: the library is open");
            return ZTSST_AlreadyOpen;
        }
        return sOpen(lrLibrary);
    } catch (const ZTCSimUnreadable& lrUnreadable) {
        reportSimProblem(lrUnreadable.what());
        return ZTSST_NoScenario;
    } catch (const ZTCSimRefusal& lrRefusal) {
        reportSimProblem(lrRefusal.what());
        return ZTSST_BadScenario;
    } catch (const std::exception& lrException) {
        reportSimProblem(std::string("libkpm-sim: Init: ") + lrException.what());
        return ZTSST_NoResources;
    }
}

static void sClose() {
    std::shared_ptr<ZTSSimSession> lpSession;
    {
        ZTSSimLibrary& lrLibrary = sLibrary();
        const std::lock_guard<std::mutex> lGuard(lrLibrary.mLock);
        lpSession.swap(lrLibrary.mpSession);
    }
    if (lpSession == nullptr) {
        return;
    }
    lpSession->mEngine.requestStop();
    lpSession->mpSocket.reset();
    lpSession->mEngine.stop();
    try {
        const ZTSSimStatus lStatus = lpSession->mEngine.getStatus();
        noteSimLine("libkpm-sim: closed after " + std::to_string(lStatus.mDelivered) + " delivered and " +
                    std::to_string(lStatus.mDropped) + " dropped events");
    } catch (const std::exception&) {
        // Only the note is lost.
        return;
    }
}

static std::uint32_t sGetNumberOfAdapters() {
    const std::shared_ptr<ZTSSimSession> lpSession = sSession();
    return lpSession == nullptr ? 0 : lpSession->mEngine.getNumberOfAdapters();
}

static std::uint32_t sIsZtapiSupported() {
    const std::shared_ptr<ZTSSimSession> lpSession = sSession();
    return lpSession != nullptr && lpSession->mEngine.getScenario().mIsZtapiSupported ? 1 : 0;
}

/// Calls `aCall` on the open engine; `aFailed` where there is none or memory has run out.
template <class Call>
static std::uint32_t sOnEngine(std::uint32_t aNotOpen, std::uint32_t aFailed, Call aCall) {
    try {
        const std::shared_ptr<ZTSSimSession> lpSession = sSession();
        return lpSession == nullptr ? aNotOpen : aCall(lpSession->mEngine);
    } catch (const std::exception& lrException) {
        reportSimProblem(std::string("libkpm-sim: ") + lrException.what());
        return aFailed;
    }
}

static std::uint32_t sGetAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    return sOnEngine(ZTSST_NotOpen, ZTSST_NoResources,
                     [&](ZTCSimEngine& arEngine) { return arEngine.getAdapterInfo(aIndex, apNodeName, apPortName); });
}

static std::uint32_t sZtapiRegEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory,
                                    std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                    KPM_ScopeCallback apCallback) {
    return sOnEngine(ZTSST_NotOpen, ZTSST_NoResources, [&](ZTCSimEngine& arEngine) {
        return arEngine.registerForPort(aBoard, aPort, aCategory, aSubcategory, apContext, apHandle, apCallback);
    });
}

static std::uint32_t sZtapiUnregEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) {
    return sOnEngine(ZTSST_NotOpen, ZTSST_NoResources,
                     [&](ZTCSimEngine& arEngine) { return arEngine.unregisterForPort(aBoard, aPort, aHandle); });
}

static std::uint32_t sKpmRegEvent(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                  std::uint32_t /*aSize*/, KPM_EventCallback apCallback) {
    return sOnEngine(0, 0, [&](ZTCSimEngine& arEngine) {
        return arEngine.registerForBoard(aBoard, aEventType, apContext, apCallback);
    });
}

static std::uint32_t sKpmUnregEvent(std::uint32_t aBoard, std::uint32_t aHandle) {
    return sOnEngine(ZTSST_NotOpen, ZTSST_NoResources,
                     [&](ZTCSimEngine& arEngine) { return arEngine.unregisterForBoard(aBoard, aHandle); });
}

const KPM_FunctionList* getSimFunctionList() {
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
                                             nullptr};
    return &scList;
}
