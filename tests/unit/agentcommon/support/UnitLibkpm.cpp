#include "tests/unit/agentcommon/support/UnitLibkpm.h"

static ZTCTestLibrary* spBehaviour = nullptr;

static ZTCTestLibrary& sGet() {
    return *spBehaviour;
}

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    return sGet().getFunctionList(aVersion, gcTestLibraryList<sGet>, appList);
}

extern "C" __attribute__((visibility("default"))) void UnitLibkpm_setBehaviour(ZTCTestLibrary* apBehaviour);
void UnitLibkpm_setBehaviour(ZTCTestLibrary* apBehaviour) {
    spBehaviour = apBehaviour;
}
