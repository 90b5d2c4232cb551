#include "libkpm/sim/src/EntryPoints.h"

#include <cstdlib>
#include <exception>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/common/include/OpenLibrary.h"
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

using ZTCSimLibrary = ZTCOpenLibrary<ZTSSimSession>;

static void sReportAs(const char* apPrefix, const char* apWhat) noexcept {
    try {
        reportSimProblem(std::string(apPrefix) + apWhat);
    } catch (const std::exception&) {  // out of memory: only the status can report it
        return;
    }
}

static void sReport(const char* apWhat) noexcept {
    sReportAs("libkpm-sim: ", apWhat);
}

using ZTCSimEntries = ZTCEngineEntries<ZTSSimSession, sReport>;

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

static std::uint32_t sOpen(std::shared_ptr<ZTSSimSession>& arpSession) {
    ZTSSimScenario lScenario = sReadScenario();
    if (lScenario.mInitStatus != ZTLST_Success) {
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
            return ZTLST_NoSocket;
        }
    }
    arpSession = std::move(lpSession);
    return ZTLST_Success;
}

/// The status of sOpen, or that of the exception by which it ended.
static std::uint32_t sTryToOpen(std::shared_ptr<ZTSSimSession>& arpSession) {
    try {
        return sOpen(arpSession);
    } catch (const ZTCSimUnreadable& lrUnreadable) {
        sReportAs("", lrUnreadable.what());
        return ZTLST_NoScenario;
    } catch (const ZTCSimRefusal& lrRefusal) {
        sReportAs("", lrRefusal.what());
        return ZTLST_BadScenario;
    } catch (const std::exception& lrException) {
        sReportAs("libkpm-sim: Init: ", lrException.what());
        return ZTLST_NoResources;
    }
}

static std::uint32_t sInit() {
    if (!ZTCSimLibrary::get().beginOpening()) {
        sReportAs("libkpm-sim: Init: ", "the library is open");
        return ZTLST_AlreadyOpen;
    }
    std::shared_ptr<ZTSSimSession> lpSession;
    const std::uint32_t lStatus = sTryToOpen(lpSession);
    ZTCSimLibrary::get().endOpening(std::move(lpSession));
    return lStatus;
}

static void sClose() {
    const std::shared_ptr<ZTSSimSession> lpSession = ZTCSimLibrary::get().takeSession();
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

static std::uint32_t sIsZtapiSupported() {
    const std::shared_ptr<ZTSSimSession> lpSession = ZTCSimLibrary::get().getSession();
    return lpSession != nullptr && lpSession->mEngine.getScenario().mIsZtapiSupported ? 1 : 0;
}

const KPM_FunctionList* getSimFunctionList() {
    static constexpr KPM_FunctionList scList{KPM_INTERFACE_VERSION,
                                             sizeof(KPM_FunctionList),
                                             sInit,
                                             sClose,
                                             ZTCSimEntries::getNumberOfAdapters,
                                             sIsZtapiSupported,
                                             ZTCSimEntries::getAdapterInfo,
                                             ZTCSimEntries::registerForPort,
                                             ZTCSimEntries::unregisterForPort,
                                             ZTCSimEntries::registerForBoard,
                                             ZTCSimEntries::unregisterForBoard,
                                             nullptr,
                                             setLibraryReport};
    return &scList;
}
