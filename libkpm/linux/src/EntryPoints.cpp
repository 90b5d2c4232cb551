#include "libkpm/linux/src/EntryPoints.h"

#include <cstdlib>
#include <cstring>
#include <exception>
#include <memory>
#include <string>
#include <utility>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/common/include/OpenLibrary.h"
#include "libkpm/linux/src/Engine.h"

/// What is open between Init and Close.
struct ZTSLinuxSession {
    explicit ZTSLinuxSession(ZTSLinuxOptions aOptions) : mEngine(std::move(aOptions), mSources) {}

    ZTCLinuxSources mSources;
    ZTCLinuxEngine mEngine;
};

using ZTCLinuxLibrary = ZTCOpenLibrary<ZTSLinuxSession>;

static void sReportAs(const char* apPrefix, const char* apWhat) noexcept {
    try {
        logLibraryLine(KPM_LOG_ERROR, std::string(apPrefix) + apWhat);
    } catch (const std::exception&) {  // out of memory: only the status can report it
        return;
    }
}

static void sReport(const char* apWhat) noexcept {
    sReportAs("", apWhat);
}

using ZTCLinuxEntries = ZTCEngineEntries<ZTSLinuxSession, sReport>;

static ZTSLinuxOptions sOptions() {
    ZTSLinuxOptions lOptions;
    const char* lpSysfs = std::getenv("KPM_LINUX_SYSFS");
    if (lpSysfs != nullptr && *lpSysfs != '\0') {
        lOptions.mSysfsRoot = lpSysfs;
        lOptions.mTracePlace.mSysfsRoot = lpSysfs;
    }
    const char* lpTracefs = std::getenv("KPM_LINUX_TRACEFS");
    if (lpTracefs != nullptr && *lpTracefs != '\0') {
        lOptions.mTracePlace.mRoots = {lpTracefs};
    }
    if (const char* lpInstance = std::getenv("KPM_LINUX_INSTANCE"); lpInstance != nullptr) {
        lOptions.mTracePlace.mPrepared = lpInstance;
    }
    if (const char* lpProbe = std::getenv("KPM_LINUX_PROBE"); lpProbe != nullptr) {
        lOptions.mTracePlace.mProbeUse = std::strcmp(lpProbe, "1") == 0   ? ZTPU_Always
                                         : std::strcmp(lpProbe, "0") == 0 ? ZTPU_Never
                                                                          : ZTPU_Needed;
    }
    return lOptions;
}

/// The engine writes to the agent's log while it starts.
static std::uint32_t sInit() {
    ZTCLinuxLibrary& lrLibrary = ZTCLinuxLibrary::get();
    if (!lrLibrary.beginOpening()) {
        sReportAs("Init: ", "the library is open");
        return ZTLST_AlreadyOpen;
    }
    try {
        auto lpSession = std::make_shared<ZTSLinuxSession>(sOptions());
        lpSession->mEngine.start();
        lrLibrary.endOpening(std::move(lpSession));
        return ZTLST_Success;
    } catch (const std::exception& lrException) {
        lrLibrary.endOpening(nullptr);
        sReportAs("Init: ", lrException.what());
        return ZTLST_NoResources;
    }
}

static void sClose() {
    const std::shared_ptr<ZTSLinuxSession> lpSession = ZTCLinuxLibrary::get().takeSession();
    if (lpSession != nullptr) {
        lpSession->mEngine.stop();
    }
}

static std::uint32_t sIsZtapiSupported() {
    return ZTCLinuxLibrary::get().getSession() != nullptr ? 1 : 0;
}

static void sSetLog(KPM_LogFunction apLog) {
    setLibraryLog(apLog);
}

static void sSetReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) {
    setLibraryReport(apContext, apState, apLoss);
}

const KPM_FunctionList* getLinuxFunctionList() {
    static constexpr KPM_FunctionList scList{KPM_INTERFACE_VERSION,
                                             sizeof(KPM_FunctionList),
                                             sInit,
                                             sClose,
                                             ZTCLinuxEntries::getNumberOfAdapters,
                                             sIsZtapiSupported,
                                             ZTCLinuxEntries::getAdapterInfo,
                                             ZTCLinuxEntries::registerForPort,
                                             ZTCLinuxEntries::unregisterForPort,
                                             ZTCLinuxEntries::registerForBoard,
                                             ZTCLinuxEntries::unregisterForBoard,
                                             sSetLog,
                                             sSetReport};
    return &scList;
}
