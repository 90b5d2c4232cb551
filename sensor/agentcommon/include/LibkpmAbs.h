/// The agent's view of the adapters' library: loading it, and one operation for each of its functions (libkpm.h).
#ifndef SENSOR_AGENTCOMMON_INCLUDE_LIBKPMABS_H
#define SENSOR_AGENTCOMMON_INCLUDE_LIBKPMABS_H

#include <cstdint>

#include "common/include/Exception.h"
#include "common/include/Pointer.h"
#include "libkpm/include/libkpm.h"
#include "sensor/agentcommon/include/ScopeEvent.h"
#include "sensor/agentcommon/include/WorldWideName.h"

/// An operation of the adapters' library failed; the text names the operation and the status.
ZT_EXCEPTION(ZTCLibkpmFailedEx, ZTCOpsException, "Libkpm operation failed", ZT_SEGMENTED_ERRCODE(3, 13));

/// Environment variable with the path of the library. Unset: gcDefaultLibkpm; set and empty: the library is disabled.
inline constexpr const char* gcLibkpmPathVariable = "ZT_LIBKPM_PATH";
inline constexpr const char* gcDefaultLibkpm = "libkpm.so.1";

/// Takes the reports of the adapters' library. Called on any thread, also from inside of an operation of ZTCLibkpmAbs;
/// it does not call back into the library and throws nothing. The texts are never null and live for the call alone.
class ZTCLibkpmReports {
public:
    virtual ~ZTCLibkpmReports() = default;

    /// The state of a kind, named by the pair it is delivered as, is one of KPM_STATE_...; an unknown one is possible.
    virtual void reportState(std::uint32_t aBoardId, std::uint32_t aCategory, std::uint32_t aSubcategory,
                             std::uint32_t aState, const char* apReason) noexcept = 0;

    /// The running total of a named loss.
    virtual void reportLoss(const char* apName, std::uint64_t aTotal) noexcept = 0;
};

/// Used by one thread at a time: the main thread until the threads start, then the command thread. Every operation but
/// LIBKPM_LoadLibrary and LIBKPM_FreeLibrary throws ZTCInvalidEx while no library is loaded. The destructor unloads
/// nothing: at process exit the library's threads may still be running.
class ZTCLibkpmAbs {
public:
    ZTCLibkpmAbs() = default;
    virtual ~ZTCLibkpmAbs() = default;
    ZTCLibkpmAbs(const ZTCLibkpmAbs&) = delete;
    ZTCLibkpmAbs& operator=(const ZTCLibkpmAbs&) = delete;

    /// Throws ZTCNotFoundEx, after logging the reason, where the library is missing, disabled, without its function, of
    /// another version, or with an incomplete table of functions. Gives the library a log
    /// function and, with apReports, functions for reports if it takes them. apReports outlives the library's threads.
    void LIBKPM_LoadLibrary(ZTCLibkpmReports* apReports = nullptr);

    /// Unloads the library, which must have been closed.
    void LIBKPM_FreeLibrary();

    /// Throws ZTCLibkpmFailedEx with the status.
    void LIBKPM_Init();

    /// Returns when every thread of the library has ended. The caller holds no lock that a callback needs.
    void LIBKPM_Close();

    /// The number of boards now. Never waits for a callback.
    unsigned int LIBKPM_GetNumberOfAdapters();

    /// Whether the installed driver offers the event interface.
    bool LIBKPM_IsZtapiSupported();

    /// Replaces both names. Throws ZTCLibkpmFailedEx with the board and the status.
    void LIBKPM_GetAdapterInfo(unsigned int aIndex, ZTCPointer<ZTCWorldWideName>& arWwnn,
                               ZTCPointer<ZTCWorldWideName>& arWwpn);

    /// Returns a registration status of libkpm.h; writes the handle for those that count as success.
    unsigned int LIBKPM_ZtapiRegEvent(unsigned int aBoardId, const ZTCPointer<ZTCWorldWideName>& acrPort,
                                      const ZTCPointer<ZTCScopeEvent>& acrEvent, void* apContext,
                                      unsigned int* apHandle, KPM_ScopeCallback apCallback);

    /// Returns 0 on success.
    unsigned int LIBKPM_ZtapiUnregEvent(unsigned int aBoardId, const ZTCPointer<ZTCWorldWideName>& acrPort,
                                        unsigned int aHandle);

    /// Returns the registration handle, 0 on failure. The callback has the type that libkpm.h gives for the event type.
    unsigned int LIBKPM_KpmRegEvent(unsigned int aBoardId, unsigned int aEventType, void* apContext, unsigned int aSize,
                                    KPM_EventCallback apCallback);

    /// Returns 0 on success.
    unsigned int LIBKPM_KpmUnregEvent(unsigned int aBoardId, unsigned int aHandle);

private:
    const KPM_FunctionList& getFunctions() const;

    void* mpHandle = nullptr;
    const KPM_FunctionList* mpFunctions = nullptr;
};

#endif
