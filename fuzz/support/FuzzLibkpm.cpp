#include "fuzz/support/FuzzLibkpm.h"

#include "libkpm/testing/include/SilentLibrary.h"

namespace {

ZTSFuzzLibkpm sAnswers;

std::uint32_t sTakeStatus() {
    const std::uint32_t lRegistration = sAnswers.mRegistrations++;
    return sAnswers.mStatusCount == 0 ? 0 : sAnswers.mpStatuses[lRegistration % sAnswers.mStatusCount];
}

std::uint32_t sGetNumberOfAdapters() {
    return sAnswers.mAdapters;
}

std::uint32_t sZtapiRegEvent(std::uint32_t, HBA_wwn, std::uint32_t, std::uint32_t, void*, std::uint32_t* apHandle,
                             KPM_ScopeCallback) {
    const std::uint32_t lStatus = sTakeStatus();
    *apHandle = sAnswers.mRegistrations;
    return lStatus;
}

std::uint32_t sKpmRegEvent(std::uint32_t, std::uint32_t, void*, std::uint32_t, KPM_EventCallback) {
    return sTakeStatus() == 0 ? sAnswers.mRegistrations : 0;
}

constexpr KPM_FunctionList gcFunctions = makeSilentLibrary(sGetNumberOfAdapters, sZtapiRegEvent, sKpmRegEvent);

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t,
                                                                               const KPM_FunctionList** appList) {
    *appList = &gcFunctions;
    return 0;
}

extern "C" __attribute__((visibility("default"))) ZTSFuzzLibkpm* FuzzLibkpm_get();
ZTSFuzzLibkpm* FuzzLibkpm_get() {
    return &sAnswers;
}
