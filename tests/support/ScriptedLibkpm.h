/// The adapters' library of libkpm-scripted.so, which a test scripts. ScriptedLibrary.h describes its configuration
/// lines and what it records. The requests on its socket are those that ScriptedLibrary.cpp sends, one line each,
/// answered by one line.
///
/// It keeps the adapters' library's contract and uses every freedom that this gives it: what a callback gets is
/// overwritten and freed as soon as the callback has returned, and threads may still run when the process exits.
#ifndef TESTS_SUPPORT_SCRIPTEDLIBKPM_H
#define TESTS_SUPPORT_SCRIPTEDLIBKPM_H

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <istream>
#include <map>
#include <memory>
#include <mutex>
#include <string>

#include "libkpm/testing/include/TestLibrary.h"
#include "tests/support/LibraryEvent.h"
#include "tests/support/LibraryWorker.h"
#include "tests/support/ScriptedCallbacks.h"
#include "tests/support/ScriptedConnection.h"
#include "tests/support/ScriptedReports.h"
#include "tests/support/ScriptedSettings.h"
#include "tests/support/ScriptedStorm.h"

class ZTCScriptedLibkpm final : public ZTCTestLibrary {
public:
    /// `acrList` is the table of functions that leads to this object.
    explicit ZTCScriptedLibkpm(const KPM_FunctionList& acrList);

    std::uint32_t getFunctionList(std::uint32_t aVersion, const KPM_FunctionList& acrList,
                                  const KPM_FunctionList** appList) override;
    std::uint32_t init() override;
    void close() override;
    std::uint32_t getNumberOfAdapters() override;
    std::uint32_t isZtapiSupported() override;
    std::uint32_t getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) override;
    std::uint32_t ztapiRegEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory,
                                std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                KPM_ScopeCallback apCallback) override;
    std::uint32_t ztapiUnregEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) override;
    std::uint32_t kpmRegEvent(std::uint32_t aBoard, std::uint32_t aType, void* apContext, std::uint32_t aSize,
                              KPM_EventCallback apCallback) override;
    std::uint32_t kpmUnregEvent(std::uint32_t aBoard, std::uint32_t aHandle) override;
    void setLog(KPM_LogFunction apLog) override { mReports.setLog(apLog); }
    void setReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) override {
        mReports.setReport(apContext, apState, apLoss);
    }

    bool isOpen() const { return mIsOpen; }
    void record(const std::string& acrCall);

private:
    std::string pathOf(const char* apName) const { return mDirectory + "/" + apName; }
    void configure(const std::string& acrLine);
    /// The function that is let go of may close the connection, so that it is let go after the answer.
    void letGoAfter(const std::string& acrLine);
    std::string handle(const std::string& acrLine);
    std::string handleConfigure(std::istream& arRequest);
    std::string handleDeliver(std::istream& arRequest);
    std::string handleLetGo(std::istream&) { return ""; }
    std::string handleStorm(std::istream& arRequest);
    std::string handleWaitStorm(std::istream&) { return std::to_string(mStorm.join()); }
    std::string handleStopStorm(std::istream&);

    void deliverOnRegister(const ZTCKindKey& acrKind);
    void deliverInClose();
    /// Delivers, and records a failure under this name. Returns whether it was delivered.
    bool tryToDeliver(const char* apName, const ZTSLibraryEvent& acrEvent);
    /// Where a test holds this function: waits until the test lets it go on.
    void waitWhileHeld(const std::string& acrFunction);
    ZTCLibraryWorker& worker(unsigned aNumber);

    // Constant after construction.
    std::string mDirectory;

    // Set before Init.
    ZTCScriptedReports mReports;

    // With synchronization of its own.
    ZTCScriptedCallbacks mCallbacks;

    // Used by the caller of Init and Close alone.
    ZTCScriptedConnection mConnection;
    std::atomic<bool> mIsOpen{false};

    // Guarded by mLock, which is never held over a callback.
    std::mutex mLock;
    ZTSScriptedSettings mSettings;
    std::uint32_t mNextHandle = 1;
    bool mIsLetGo = false;
    std::condition_variable mLettingGo;
    std::map<unsigned, std::unique_ptr<ZTCLibraryWorker>> mWorkers;

    // Used by the server thread, and by Close after that has ended.
    ZTCScriptedStorm mStorm;
};

#endif
