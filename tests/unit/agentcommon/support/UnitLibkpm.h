/// The border between a test and the module unit-libkpm, which it loads into its own process: the module's functions do
/// nothing but ask the test.
#ifndef TESTS_UNIT_AGENTCOMMON_SUPPORT_UNITLIBKPM_H
#define TESTS_UNIT_AGENTCOMMON_SUPPORT_UNITLIBKPM_H

#include <cstdint>

#include "libkpm/include/libkpm.h"

/// What the module's functions do; libkpm.h says what each means.
class ZTCUnitLibkpmBehaviour {
public:
    /// `acrList` is the module's table of functions, complete and of the right version and size.
    virtual std::uint32_t getFunctionList(std::uint32_t aVersion, const KPM_FunctionList& acrList,
                                          const KPM_FunctionList** appList) = 0;
    virtual std::uint32_t init() = 0;
    virtual void close() = 0;
    virtual std::uint32_t getNumberOfAdapters() = 0;
    virtual std::uint32_t isZtapiSupported() = 0;
    virtual std::uint32_t getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) = 0;
    virtual std::uint32_t ztapiRegEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory,
                                        std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                        KPM_ScopeCallback apCallback) = 0;
    virtual std::uint32_t ztapiUnregEvent(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) = 0;
    virtual std::uint32_t kpmRegEvent(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                      std::uint32_t aSize, KPM_EventCallback apCallback) = 0;
    virtual std::uint32_t kpmUnregEvent(std::uint32_t aBoard, std::uint32_t aHandle) = 0;
    virtual void setLog(KPM_LogFunction apLog) = 0;
    virtual void setReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) = 0;

protected:
    ~ZTCUnitLibkpmBehaviour() = default;
};

/// The module's second symbol: who answers from now on. The first is that of every adapters' library.
inline constexpr const char* gcSetBehaviourSymbol = "UnitLibkpm_setBehaviour";
using ZTPSetBehaviour = void (*)(ZTCUnitLibkpmBehaviour*);

#endif
