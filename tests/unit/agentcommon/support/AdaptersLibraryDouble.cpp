#include "tests/unit/agentcommon/support/AdaptersLibraryDouble.h"

#include <dlfcn.h>

#include <cstdlib>
#include <cstring>
#include <stdexcept>

static const char* const scPathVariable = "ZT_LIBKPM_PATH";

static void sSetBehaviour(void* apModule, ZTCTestLibrary* apBehaviour) {
    const auto lpSetBehaviour = reinterpret_cast<ZTPSetBehaviour>(dlsym(apModule, gcSetBehaviourSymbol));
    if (lpSetBehaviour == nullptr) {
        throw std::runtime_error("the module has no function to set its behaviour");
    }
    lpSetBehaviour(apBehaviour);
}

template <typename TKey>
static std::uint32_t sFind(const std::map<TKey, std::uint32_t>& acrMap, const TKey& acrKey, std::uint32_t aDefault) {
    const auto lFound = acrMap.find(acrKey);
    return lFound != acrMap.end() ? lFound->second : aDefault;
}

ZTCAdaptersLibraryDouble::ZTCAdaptersLibraryDouble(unsigned aAdapters)
    : mNumberOfAdapters(aAdapters), mpModule(dlopen(modulePath().c_str(), RTLD_NOW | RTLD_LOCAL)) {
    if (mpModule == nullptr) {
        throw std::runtime_error(std::string("the module cannot be loaded: ") + dlerror());
    }
    sSetBehaviour(mpModule, this);
    setenv(scPathVariable, modulePath().c_str(), 1);
}

ZTCAdaptersLibraryDouble::~ZTCAdaptersLibraryDouble() {
    releaseModule();
    unsetenv(scPathVariable);
}

std::string ZTCAdaptersLibraryDouble::modulePath() {
    return TAVIK_UNIT_LIBKPM;
}

std::string ZTCAdaptersLibraryDouble::incompleteModulePath() {
    return TAVIK_UNIT_LIBKPM_INCOMPLETE;
}

std::string ZTCAdaptersLibraryDouble::moduleWithoutEntryPath() {
    return TAVIK_UNIT_LIBKPM_NO_ENTRY;
}

void ZTCAdaptersLibraryDouble::releaseModule() {
    if (mpModule != nullptr) {
        dlclose(mpModule);
        mpModule = nullptr;
    }
}

bool ZTCAdaptersLibraryDouble::isModuleLoaded() {
    void* const lpModule = dlopen(modulePath().c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (lpModule == nullptr) {
        return false;
    }
    dlclose(lpModule);
    return true;
}

std::vector<std::string> ZTCAdaptersLibraryDouble::callsOf(const std::string& acrPrefix) const {
    std::vector<std::string> lCalls;
    for (const std::string& lcrCall : mCalls) {
        if (lcrCall.starts_with(acrPrefix)) {
            lCalls.push_back(lcrCall);
        }
    }
    return lCalls;
}

std::uint32_t ZTCAdaptersLibraryDouble::getFunctionList(std::uint32_t aVersion, const KPM_FunctionList& acrList,
                                                        const KPM_FunctionList** appList) {
    mCalls.push_back("KPM_GetFunctionList " + std::to_string(aVersion));
    mList = acrList;
    if (!mTakesLog) {
        mList.SetLog = nullptr;
    }
    if (!mTakesReport) {
        mList.SetReport = nullptr;
    }
    if (mShape) {
        mShape(mList);
    }
    if (mFunctionListStatus == 0 && mGivesTable) {
        *appList = &mList;
    }
    return mFunctionListStatus;
}

std::uint32_t ZTCAdaptersLibraryDouble::init() {
    mCalls.emplace_back("Init");
    return mInitStatus;
}

void ZTCAdaptersLibraryDouble::close() {
    mCalls.emplace_back("Close");
    if (mBeforeClosed) {
        mBeforeClosed();
    }
}

std::uint32_t ZTCAdaptersLibraryDouble::getNumberOfAdapters() {
    if (mNotesCounting) {
        mCalls.emplace_back("GetNumberOfAdapters");
    }
    if (mBeforeCounted) {
        mBeforeCounted();
    }
    return mNumberOfAdapters;
}

std::uint32_t ZTCAdaptersLibraryDouble::isZtapiSupported() {
    mCalls.emplace_back("IsZtapiSupported");
    return mIsZtapiSupported;
}

std::uint32_t ZTCAdaptersLibraryDouble::getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    mCalls.push_back("GetAdapterInfo " + std::to_string(aIndex));
    *apNodeName = hbaWwnOf(nodeName(aIndex));
    *apPortName = hbaWwnOf(portName(aIndex));
    return sFind(mInfoStatuses, aIndex, 0);
}

std::uint32_t ZTCAdaptersLibraryDouble::ztapiRegEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory,
                                                      std::uint32_t aSubcategory, void* apContext,
                                                      std::uint32_t* apHandle, KPM_ScopeCallback apCallback) {
    const ZTCRegistrationKey lKey(aBoard, aCategory, aSubcategory);
    mCalls.push_back("ZtapiRegEvent board " + std::to_string(aBoard) + " port " + wwnText(wwnOf(aPort)) + " kind " +
                     std::to_string(aCategory) + "/" + std::to_string(aSubcategory) + " preset " +
                     std::to_string(*apHandle));
    mScopeCallbacks[lKey] = apCallback;
    mContexts[lKey] = apContext;
    if (mBeforeRegistered) {
        mBeforeRegistered(lKey);
    }
    const std::uint32_t lStatus = sFind(mRegisterStatuses, lKey, KPM_STATUS_SUCCESS);
    if (lStatus == KPM_STATUS_SUCCESS || (lStatus >= KPM_STATUS_INFO_5 && lStatus <= KPM_STATUS_NO_RIGHTS)) {
        *apHandle = makeHandle(lKey);
    }
    return lStatus;
}

std::uint32_t ZTCAdaptersLibraryDouble::ztapiUnregEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) {
    mCalls.push_back("ZtapiUnregEvent board " + std::to_string(aBoard) + " port " + wwnText(wwnOf(aPort)) + " handle " +
                     std::to_string(aHandle));
    return sFind(mUnregisterStatuses, aHandle, 0);
}

std::uint32_t ZTCAdaptersLibraryDouble::kpmRegEvent(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                                    std::uint32_t aSize, KPM_EventCallback apCallback) {
    const ZTCRegistrationKey lKey(aBoard, 0, aEventType);
    mCalls.push_back("KpmRegEvent board " + std::to_string(aBoard) + " type " + std::to_string(aEventType) +
                     " context " + std::to_string(reinterpret_cast<std::uintptr_t>(apContext)) + " size " +
                     std::to_string(aSize));
    mEventCallbacks[lKey] = apCallback;
    if (mBeforeRegistered) {
        mBeforeRegistered(lKey);
    }
    return makeHandle(lKey);
}

std::uint32_t ZTCAdaptersLibraryDouble::kpmUnregEvent(std::uint32_t aBoard, std::uint32_t aHandle) {
    mCalls.push_back("KpmUnregEvent board " + std::to_string(aBoard) + " handle " + std::to_string(aHandle));
    return sFind(mUnregisterStatuses, aHandle, 0);
}

void ZTCAdaptersLibraryDouble::setLog(KPM_LogFunction apLog) {
    mCalls.emplace_back("SetLog");
    mpLog = apLog;
}

void ZTCAdaptersLibraryDouble::setReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) {
    mCalls.emplace_back("SetReport");
    mpReportContext = apContext;
    mpReportState = apState;
    mpReportLoss = apLoss;
}

std::uint32_t ZTCAdaptersLibraryDouble::makeHandle(const ZTCRegistrationKey& acrKey) {
    const std::uint32_t lHandle = sFind(mRegisterHandles, acrKey, mNextHandle);
    ++mNextHandle;
    mHandles[acrKey] = lHandle;
    return lHandle;
}

HBA_wwn hbaWwnOf(const ZTSWwn& acrName) {
    HBA_wwn lName{};
    std::memcpy(lName.wwn, acrName.mBytes.data(), sizeof lName.wwn);
    return lName;
}

ZTSWwn wwnOf(const HBA_wwn& acrName) {
    ZTSWwn lName;
    std::memcpy(lName.mBytes.data(), acrName.wwn, sizeof acrName.wwn);
    return lName;
}
