#include "sensor/agentcommon/include/LibkpmAbs.h"

#include <dlfcn.h>

#include <cstdint>
#include <cstdio>
#include <cstring>

#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"

namespace {

constexpr unsigned scReasonSize = 512;

/// Why this table of functions cannot be used, written to apReason; false where it can.
bool sIsRefused(const KPM_FunctionList* apFunctions, char* apReason) {
    if (apFunctions == nullptr) {
        std::snprintf(apReason, scReasonSize, "it gave no table of functions");
        return true;
    }
    if (apFunctions->version != KPM_INTERFACE_VERSION) {
        std::snprintf(apReason, scReasonSize, "its table of functions has version %u, wanted %u", apFunctions->version,
                      KPM_INTERFACE_VERSION);
        return true;
    }
    if (apFunctions->size < KPM_FUNCTION_LIST_SIZE_V1) {
        std::snprintf(apReason, scReasonSize, "its table of functions has %u bytes, wanted at least %u",
                      apFunctions->size, KPM_FUNCTION_LIST_SIZE_V1);
        return true;
    }
    if (apFunctions->Init == nullptr || apFunctions->Close == nullptr || apFunctions->GetNumberOfAdapters == nullptr ||
        apFunctions->IsZtapiSupported == nullptr || apFunctions->GetAdapterInfo == nullptr ||
        apFunctions->ZtapiRegEvent == nullptr || apFunctions->ZtapiUnregEvent == nullptr ||
        apFunctions->KpmRegEvent == nullptr || apFunctions->KpmUnregEvent == nullptr) {
        std::snprintf(apReason, scReasonSize, "its table of functions has an empty entry");
        return true;
    }
    return false;
}

/// The library's way into the agent's log.
void sWriteLibraryLine(std::uint32_t aLevel, const char* apText) {
    if (apText == nullptr) {
        apText = "(no text)";
    }
    switch (aLevel) {
        case KPM_LOG_ERROR:
            ZT_LOG_ERR("Libkpm: %s", apText);
            break;
        case KPM_LOG_NOTICE:
            ZT_LOG_NOTICE("Libkpm: %s", apText);
            break;
        case KPM_LOG_INFO:
            ZT_LOG_INFO("Libkpm: %s", apText);
            break;
        default:
            ZT_LOG_WARN("Libkpm: %s", apText);
            break;
    }
}

/// The library's way to the receiver of its reports, which is their context.
void sReportState(void* apContext, std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory,
                  std::uint32_t aState, const char* apReason) {
    static_cast<ZTCLibkpmReports*>(apContext)->reportState(aBoard, aCategory, aSubcategory, aState,
                                                           apReason != nullptr ? apReason : "");
}

void sReportLoss(void* apContext, const char* apName, std::uint64_t aTotal) {
    static_cast<ZTCLibkpmReports*>(apContext)->reportLoss(apName != nullptr ? apName : "", aTotal);
}

HBA_wwn sMakeHbaWwn(const ZTCPointer<ZTCWorldWideName>& acrName) {
    HBA_wwn lName;
    std::memcpy(lName.wwn, acrName->getBytes(), sizeof lName.wwn);
    return lName;
}

}  // namespace

void ZTCLibkpmAbs::LIBKPM_LoadLibrary(ZTCLibkpmReports* apReports) {
    const char* lpPath = ClibGetenv(gcLibkpmPathVariable, nullptr);
    if (lpPath == nullptr) {
        lpPath = gcDefaultLibkpm;
    }
    if (*lpPath == '\0') {
        ZT_LOG_WARN("Libkpm is disabled: %s is set and empty", gcLibkpmPathVariable);
        throw ZTCNotFoundEx("Libkpm is disabled");
    }

    void* lpHandle = dlopen(lpPath, RTLD_NOW | RTLD_LOCAL);
    if (lpHandle == nullptr) {
        const char* lpReason = dlerror();
        ZT_LOG_WARN("Libkpm '%s' cannot be loaded: %s", lpPath, lpReason != nullptr ? lpReason : "unknown reason");
        throw ZTCNotFoundEx("Libkpm cannot be loaded");
    }

    char lReason[scReasonSize];
    bool lRefused = true;
    const KPM_FunctionList* lpFunctions = nullptr;
    const auto lpGetFunctionList = reinterpret_cast<KPM_GetFunctionListType>(dlsym(lpHandle, "KPM_GetFunctionList"));
    if (lpGetFunctionList == nullptr) {
        std::snprintf(lReason, sizeof lReason, "it has no function KPM_GetFunctionList");
    } else if (const uint32_t lStatus = lpGetFunctionList(KPM_INTERFACE_VERSION, &lpFunctions); lStatus != 0) {
        std::snprintf(lReason, sizeof lReason, "it does not speak version %u (status %u)", KPM_INTERFACE_VERSION,
                      lStatus);
    } else {
        lRefused = sIsRefused(lpFunctions, lReason);
    }
    if (lRefused) {
        ZT_LOG_WARN("Libkpm '%s' cannot be used: %s", lpPath, lReason);
        dlclose(lpHandle);
        throw ZTCNotFoundEx("Libkpm cannot be used");
    }
    if (lpFunctions->size >= KPM_FUNCTION_LIST_SIZE_LOG && lpFunctions->SetLog != nullptr) {
        lpFunctions->SetLog(&sWriteLibraryLine);
    }
    if (apReports != nullptr && lpFunctions->size >= KPM_FUNCTION_LIST_SIZE_REPORT &&
        lpFunctions->SetReport != nullptr) {
        lpFunctions->SetReport(apReports, &sReportState, &sReportLoss);
    }
    mpHandle = lpHandle;
    mpFunctions = lpFunctions;
}

void ZTCLibkpmAbs::LIBKPM_FreeLibrary() {
    if (mpHandle == nullptr) {
        return;
    }
    mpFunctions = nullptr;
    dlclose(mpHandle);
    mpHandle = nullptr;
}

void ZTCLibkpmAbs::LIBKPM_Init() {
    if (const uint32_t lStatus = getFunctions().Init(); lStatus != 0) {
        throwWith<ZTCLibkpmFailedEx>("LIBKPM_Init failed with status %u", lStatus);
    }
}

void ZTCLibkpmAbs::LIBKPM_Close() {
    getFunctions().Close();
}

unsigned int ZTCLibkpmAbs::LIBKPM_GetNumberOfAdapters() {
    return getFunctions().GetNumberOfAdapters();
}

bool ZTCLibkpmAbs::LIBKPM_IsZtapiSupported() {
    return getFunctions().IsZtapiSupported() != 0;
}

void ZTCLibkpmAbs::LIBKPM_GetAdapterInfo(unsigned int aIndex, ZTCPointer<ZTCWorldWideName>& arWwnn,
                                         ZTCPointer<ZTCWorldWideName>& arWwpn) {
    HBA_wwn lNodeName{};
    HBA_wwn lPortName{};
    if (const uint32_t lStatus = getFunctions().GetAdapterInfo(aIndex, &lNodeName, &lPortName); lStatus != 0) {
        throwWith<ZTCLibkpmFailedEx>("LIBKPM_GetAdapterInfo failed for adapter %u with status %u", aIndex, lStatus);
    }
    arWwnn = ZTCPointer<ZTCWorldWideName>(NEW ZTCWorldWideName(lNodeName.wwn));
    arWwpn = ZTCPointer<ZTCWorldWideName>(NEW ZTCWorldWideName(lPortName.wwn));
}

unsigned int ZTCLibkpmAbs::LIBKPM_ZtapiRegEvent(unsigned int aBoardId, const ZTCPointer<ZTCWorldWideName>& acrPort,
                                                const ZTCPointer<ZTCScopeEvent>& acrEvent, void* apContext,
                                                unsigned int* apHandle, KPM_ScopeCallback apCallback) {
    return getFunctions().ZtapiRegEvent(aBoardId, sMakeHbaWwn(acrPort), acrEvent->getCategory(),
                                        acrEvent->getSubcategory(), apContext, apHandle, apCallback);
}

unsigned int ZTCLibkpmAbs::LIBKPM_ZtapiUnregEvent(unsigned int aBoardId, const ZTCPointer<ZTCWorldWideName>& acrPort,
                                                  unsigned int aHandle) {
    return getFunctions().ZtapiUnregEvent(aBoardId, sMakeHbaWwn(acrPort), aHandle);
}

unsigned int ZTCLibkpmAbs::LIBKPM_KpmRegEvent(unsigned int aBoardId, unsigned int aEventType, void* apContext,
                                              unsigned int aSize, KPM_EventCallback apCallback) {
    return getFunctions().KpmRegEvent(aBoardId, aEventType, apContext, aSize, apCallback);
}

unsigned int ZTCLibkpmAbs::LIBKPM_KpmUnregEvent(unsigned int aBoardId, unsigned int aHandle) {
    return getFunctions().KpmUnregEvent(aBoardId, aHandle);
}

const KPM_FunctionList& ZTCLibkpmAbs::getFunctions() const {
    if (mpFunctions == nullptr) {
        throw ZTCInvalidEx("Libkpm is not loaded");
    }
    return *mpFunctions;
}
