/// An adapters' library that the test scripts in its own process. It is loaded by the agent's own code, through the
/// environment variable, from a real shared object.
#ifndef TESTS_UNIT_AGENTCOMMON_SUPPORT_ADAPTERSLIBRARYDOUBLE_H
#define TESTS_UNIT_AGENTCOMMON_SUPPORT_ADAPTERSLIBRARYDOUBLE_H

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <tuple>
#include <vector>

#include "tests/support/Bytes.h"
#include "tests/unit/agentcommon/support/UnitLibkpm.h"

/// Board, category, subcategory; for a board registration category 0 and the event type.
using ZTCRegistrationKey = std::tuple<unsigned, unsigned, unsigned>;

/// One object at a time, which is the library from its construction on. The agent calls it from one thread at a time,
/// and so does the test.
class ZTCAdaptersLibraryDouble : private ZTCTestLibrary {
public:
    /// A library with so many adapters, and the environment variable set to it.
    explicit ZTCAdaptersLibraryDouble(unsigned aAdapters = 1);
    ~ZTCAdaptersLibraryDouble();
    ZTCAdaptersLibraryDouble(const ZTCAdaptersLibraryDouble&) = delete;
    ZTCAdaptersLibraryDouble& operator=(const ZTCAdaptersLibraryDouble&) = delete;

    static std::string modulePath();
    static std::string moduleWithoutEntryPath();
    static std::string incompleteModulePath();
    static ZTSWwn nodeName(unsigned aBoard) { return makeWwn(0x20000000c9000000 + aBoard); }
    static ZTSWwn portName(unsigned aBoard) { return makeWwn(0x10000000c9000000 + aBoard); }
    /// "NODE, PORT", as log lines name an initiator.
    static std::string namesText(unsigned aBoard) {
        return wwnText(nodeName(aBoard)) + ", " + wwnText(portName(aBoard));
    }

    /// Lets go of the module, so that only the agent's own code keeps it loaded.
    void releaseModule();
    static bool isModuleLoaded();

    // ---- What the library answers ----
    std::uint32_t mFunctionListStatus = 0;
    bool mGivesTable = true;                        ///< false: the status is given, but no table
    bool mTakesLog = false;                         ///< whether the table has the entry for the log
    bool mTakesReport = false;                      ///< whether the table has the entry for the reports
    std::function<void(KPM_FunctionList&)> mShape;  ///< changes the table before it is given
    std::uint32_t mInitStatus = 0;
    std::uint32_t mNumberOfAdapters;
    std::uint32_t mIsZtapiSupported = 1;
    std::map<unsigned, std::uint32_t> mInfoStatuses;                   ///< by adapter; 0 where there is none
    std::map<ZTCRegistrationKey, std::uint32_t> mRegisterStatuses;     ///< likewise
    std::map<ZTCRegistrationKey, std::uint32_t> mRegisterHandles;      ///< a new number where there is none
    std::map<unsigned, std::uint32_t> mUnregisterStatuses;             ///< by handle
    std::function<void(const ZTCRegistrationKey&)> mBeforeRegistered;  ///< runs before a registration returns
    std::function<void()> mBeforeClosed;                               ///< runs before Close returns
    std::function<void()> mBeforeCounted;                              ///< runs before GetNumberOfAdapters returns

    // ---- What the agent has done ----
    bool mNotesCounting = true;  ///< false: GetNumberOfAdapters is not noted, and so allocates nothing
    /// One text for each call, in order.
    const std::vector<std::string>& calls() const { return mCalls; }
    std::vector<std::string> callsOf(const std::string& acrPrefix) const;
    void forgetCalls() { mCalls.clear(); }

    std::map<ZTCRegistrationKey, KPM_ScopeCallback> mScopeCallbacks;
    std::map<ZTCRegistrationKey, KPM_EventCallback> mEventCallbacks;
    std::map<ZTCRegistrationKey, void*> mContexts;
    std::map<ZTCRegistrationKey, std::uint32_t> mHandles;
    KPM_LogFunction mpLog = nullptr;
    void* mpReportContext = nullptr;
    KPM_StateFunction mpReportState = nullptr;
    KPM_LossFunction mpReportLoss = nullptr;

private:
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
    std::uint32_t kpmRegEvent(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext, std::uint32_t aSize,
                              KPM_EventCallback apCallback) override;
    std::uint32_t kpmUnregEvent(std::uint32_t aBoard, std::uint32_t aHandle) override;
    void setLog(KPM_LogFunction apLog) override;
    void setReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) override;

    std::uint32_t makeHandle(const ZTCRegistrationKey& acrKey);

    void* mpModule;
    KPM_FunctionList mList{};
    std::uint32_t mNextHandle = 1001;
    std::vector<std::string> mCalls;
};

/// A world wide name as the library hands it over.
HBA_wwn hbaWwnOf(const ZTSWwn& acrName);
ZTSWwn wwnOf(const HBA_wwn& acrName);

#endif
