#include "fuzz/support/FuzzLibkpm.h"

#include "libkpm/testing/include/TestLibrary.h"

namespace {

ZTSFuzzLibkpm sAnswers;

class ZTCFuzzLibrary : public ZTCTestLibrary {
public:
    std::uint32_t getNumberOfAdapters() override { return sAnswers.mAdapters; }

    std::uint32_t ztapiRegEvent(std::uint32_t, HBA_wwn, std::uint32_t, std::uint32_t, void*, std::uint32_t* apHandle,
                                KPM_ScopeCallback) override {
        const std::uint32_t lStatus = takeStatus();
        *apHandle = sAnswers.mRegistrations;
        return lStatus;
    }

    std::uint32_t kpmRegEvent(std::uint32_t, std::uint32_t, void*, std::uint32_t, KPM_EventCallback) override {
        return takeStatus() == 0 ? sAnswers.mRegistrations : 0;
    }

private:
    static std::uint32_t takeStatus() {
        const std::uint32_t lRegistration = sAnswers.mRegistrations++;
        return sAnswers.mStatusCount == 0 ? 0 : sAnswers.mpStatuses[lRegistration % sAnswers.mStatusCount];
    }
};

ZTCFuzzLibrary sLibrary;

ZTCTestLibrary& sGet() {
    return sLibrary;
}

}  // namespace

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t aVersion,
                                                                               const KPM_FunctionList** appList) {
    return sGet().getFunctionList(aVersion, gcTestLibraryList<sGet>, appList);
}

extern "C" __attribute__((visibility("default"))) ZTSFuzzLibkpm* FuzzLibkpm_get();
ZTSFuzzLibkpm* FuzzLibkpm_get() {
    return &sAnswers;
}
