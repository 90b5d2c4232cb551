#include "fuzz/support/FuzzLibkpm.h"

#include "libkpm/include/libkpm.h"

namespace {

ZTSFuzzLibkpm sAnswers;

std::uint32_t sTakeStatus() {
    const std::uint32_t lRegistration = sAnswers.mRegistrations++;
    return sAnswers.mStatusCount == 0 ? 0 : sAnswers.mpStatuses[lRegistration % sAnswers.mStatusCount];
}

std::uint32_t sInit() {
    return 0;
}

void sClose() {}

std::uint32_t sGetNumberOfAdapters() {
    return sAnswers.mAdapters;
}

std::uint32_t sIsZtapiSupported() {
    return 1;
}

std::uint32_t sGetAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
    *apNodeName = HBA_wwn{{0x20, 0, 0, 0, 0xc9, 0, 0, static_cast<std::uint8_t>(aIndex)}};
    *apPortName = HBA_wwn{{0x10, 0, 0, 0, 0xc9, 0, 0, static_cast<std::uint8_t>(aIndex)}};
    return 0;
}

std::uint32_t sZtapiRegEvent(std::uint32_t, HBA_wwn, std::uint32_t, std::uint32_t, void*, std::uint32_t* apHandle,
                             KPM_ScopeCallback) {
    const std::uint32_t lStatus = sTakeStatus();
    *apHandle = sAnswers.mRegistrations;
    return lStatus;
}

std::uint32_t sZtapiUnregEvent(std::uint32_t, HBA_wwn, std::uint32_t) {
    return 0;
}

std::uint32_t sKpmRegEvent(std::uint32_t, std::uint32_t, void*, std::uint32_t, KPM_EventCallback) {
    return sTakeStatus() == 0 ? sAnswers.mRegistrations : 0;
}

std::uint32_t sKpmUnregEvent(std::uint32_t, std::uint32_t) {
    return 0;
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
                                 nullptr};

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t,
                                                                               const KPM_FunctionList** appList) {
    *appList = &scList;
    return 0;
}

extern "C" __attribute__((visibility("default"))) ZTSFuzzLibkpm* FuzzLibkpm_get();
ZTSFuzzLibkpm* FuzzLibkpm_get() {
    return &sAnswers;
}
