#include "tests/unit/agentcommon/support/UnitLibkpm.h"

namespace {

ZTCUnitLibkpmBehaviour* spBehaviour = nullptr;

uint32_t sInit() {
    return spBehaviour->init();
}
void sClose() {
    spBehaviour->close();
}
uint32_t sGetNumberOfAdapters() {
    return spBehaviour->getNumberOfAdapters();
}
uint32_t sIsZtapiSupported() {
    return spBehaviour->isZtapiSupported();
}
uint32_t sGetAdapterInfo(uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    return spBehaviour->getAdapterInfo(aIndex, apNodeName, apPortName);
}
uint32_t sZtapiRegEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aCategory, uint32_t aSubcategory, void* apContext,
                        uint32_t* apHandle, KPM_ScopeCallback apCallback) {
    return spBehaviour->ztapiRegEvent(aBoard, aPort, aCategory, aSubcategory, apContext, apHandle, apCallback);
}
uint32_t sZtapiUnregEvent(uint32_t aBoard, HBA_wwn aPort, uint32_t aHandle) {
    return spBehaviour->ztapiUnregEvent(aBoard, aPort, aHandle);
}
uint32_t sKpmRegEvent(uint32_t aBoard, uint32_t aType, void* apContext, uint32_t aSize, KPM_EventCallback apCallback) {
    return spBehaviour->kpmRegEvent(aBoard, aType, apContext, aSize, apCallback);
}
uint32_t sKpmUnregEvent(uint32_t aBoard, uint32_t aHandle) {
    return spBehaviour->kpmUnregEvent(aBoard, aHandle);
}
void sSetLog(KPM_LogFunction apLog) {
    spBehaviour->setLog(apLog);
}

void sSetReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) {
    spBehaviour->setReport(apContext, apState, apLoss);
}

const KPM_FunctionList scList = {KPM_INTERFACE_VERSION,
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
                                 sSetLog,
                                 sSetReport};

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    return spBehaviour->getFunctionList(aVersion, scList, appList);
}

extern "C" __attribute__((visibility("default"))) void UnitLibkpm_setBehaviour(ZTCUnitLibkpmBehaviour* apBehaviour);
void UnitLibkpm_setBehaviour(ZTCUnitLibkpmBehaviour* apBehaviour) {
    spBehaviour = apBehaviour;
}
