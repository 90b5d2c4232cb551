/// What the adapters' libraries of the tests, the benchmarks and the fuzzers share: a class whose operations are the
/// entries of the table of functions, and the table that leads to an object of it.
///
/// A module derives a class, overrides what it is about, and exports KPM_GetFunctionList in three lines:
///
///     static ZTCTestLibrary& sGet();
///     extern "C" ... KPM_GetFunctionList(uint32_t aVersion, const KPM_FunctionList** appList) {
///         return sGet().getFunctionList(aVersion, gcTestLibraryList<sGet>, appList);
///     }
#ifndef LIBKPM_TESTING_INCLUDE_TESTLIBRARY_H
#define LIBKPM_TESTING_INCLUDE_TESTLIBRARY_H

#include <cstdint>

#include "libkpm/include/libkpm.h"

/// libkpm.h says what each operation means. By default there is one adapter, named by its number; every registration is
/// accepted, and nothing is ever delivered.
class ZTCTestLibrary {
public:
    /// `acrList` is the table of functions, complete and of the right version and size.
    virtual std::uint32_t getFunctionList(std::uint32_t aVersion, const KPM_FunctionList& acrList,
                                          const KPM_FunctionList** appList) {
        if (aVersion != KPM_INTERFACE_VERSION) {
            return 1;
        }
        *appList = &acrList;
        return 0;
    }
    virtual std::uint32_t init() { return 0; }
    virtual void close() {}
    virtual std::uint32_t getNumberOfAdapters() { return 1; }
    virtual std::uint32_t isZtapiSupported() { return 1; }
    virtual std::uint32_t getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
        *apNodeName = makeName(0x20000000c9000000 + aIndex);
        *apPortName = makeName(0x10000000c9000000 + aIndex);
        return 0;
    }
    virtual std::uint32_t ztapiRegEvent(std::uint32_t /*aBoard*/, HBA_wwn /*aPort*/, std::uint32_t /*aCategory*/,
                                        std::uint32_t /*aSubcategory*/, void* /*apContext*/, std::uint32_t* apHandle,
                                        KPM_ScopeCallback /*apCallback*/) {
        *apHandle = 1;
        return KPM_STATUS_SUCCESS;
    }
    virtual std::uint32_t ztapiUnregEvent(std::uint32_t /*aBoard*/, HBA_wwn /*aPort*/, std::uint32_t /*aHandle*/) {
        return 0;
    }
    virtual std::uint32_t kpmRegEvent(std::uint32_t /*aBoard*/, std::uint32_t /*aEventType*/, void* /*apContext*/,
                                      std::uint32_t /*aSize*/, KPM_EventCallback /*apCallback*/) {
        return 1;
    }
    virtual std::uint32_t kpmUnregEvent(std::uint32_t /*aBoard*/, std::uint32_t /*aHandle*/) { return 0; }
    virtual void setLog(KPM_LogFunction /*apLog*/) {}
    virtual void setReport(void* /*apContext*/, KPM_StateFunction /*apState*/, KPM_LossFunction /*apLoss*/) {}

    /// The name whose bytes, read as one big-endian number, are `aValue`.
    static constexpr HBA_wwn makeName(std::uint64_t aValue) {
        HBA_wwn lName{};
        for (unsigned i = 0; i < sizeof lName.wwn; ++i) {
            lName.wwn[i] = static_cast<std::uint8_t>(aValue >> 8 * (7 - i));
        }
        return lName;
    }

protected:
    ~ZTCTestLibrary() = default;
};

/// The table of functions whose entries call the operations of the object that `TGet` returns.
template <ZTCTestLibrary& (*TGet)()>
inline constexpr KPM_FunctionList gcTestLibraryList{
    .version = KPM_INTERFACE_VERSION,
    .size = sizeof(KPM_FunctionList),
    .Init = []() -> std::uint32_t { return TGet().init(); },
    .Close = [] { TGet().close(); },
    .GetNumberOfAdapters = []() -> std::uint32_t { return TGet().getNumberOfAdapters(); },
    .IsZtapiSupported = []() -> std::uint32_t { return TGet().isZtapiSupported(); },
    .GetAdapterInfo = [](std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) -> std::uint32_t {
        return TGet().getAdapterInfo(aIndex, apNodeName, apPortName);
    },
    .ZtapiRegEvent = [](std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory, std::uint32_t aSubcategory,
                        void* apContext, std::uint32_t* apHandle, KPM_ScopeCallback apCallback) -> std::uint32_t {
        return TGet().ztapiRegEvent(aBoard, aPort, aCategory, aSubcategory, apContext, apHandle, apCallback);
    },
    .ZtapiUnregEvent = [](std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) -> std::uint32_t {
        return TGet().ztapiUnregEvent(aBoard, aPort, aHandle);
    },
    .KpmRegEvent = [](std::uint32_t aBoard, std::uint32_t aEventType, void* apContext, std::uint32_t aSize,
                      KPM_EventCallback apCallback) -> std::uint32_t {
        return TGet().kpmRegEvent(aBoard, aEventType, apContext, aSize, apCallback);
    },
    .KpmUnregEvent = [](std::uint32_t aBoard, std::uint32_t aHandle) -> std::uint32_t {
        return TGet().kpmUnregEvent(aBoard, aHandle);
    },
    .SetLog = [](KPM_LogFunction apLog) { TGet().setLog(apLog); },
    .SetReport = [](void* apContext, KPM_StateFunction apState,
                    KPM_LossFunction apLoss) { TGet().setReport(apContext, apState, apLoss); }};

#endif
