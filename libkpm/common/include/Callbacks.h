/// Calls the agent's callbacks. Registrations per board carry a generic function pointer, which is converted back here,
/// and nowhere else, to the type of its event.
#ifndef LIBKPM_COMMON_INCLUDE_CALLBACKS_H
#define LIBKPM_COMMON_INCLUDE_CALLBACKS_H

#include <cstdint>

#include "libkpm/common/include/Registry.h"
#include "libkpm/include/libkpm.h"

/// Calls a callback that was registered per port.
inline void callScope(const ZTSLibraryRegistration& acrRegistration, std::uint32_t aBoard, const HBA_wwn& acrPort,
                      std::uint32_t aCategory, std::uint32_t aSubcategory, ZT_event* apEvent) {
    acrRegistration.mpScopeCallback(aBoard, acrPort, aCategory, aSubcategory, acrRegistration.mpContext, apEvent);
}

/// Converts the callback to the type of its event. It goes through void(*)(), which compilers accept as a generic
/// function pointer without a warning.
template <class Callback>
Callback restoreCallback(KPM_EventCallback apCallback) {
    return reinterpret_cast<Callback>(reinterpret_cast<void (*)()>(apCallback));
}

inline void callLink(const ZTSLibraryRegistration& acrRegistration, std::uint32_t aBoard, void* apInfo) {
    restoreCallback<KPM_LinkCallback>(acrRegistration.mpEventCallback)(aBoard, apInfo);
}

inline void callRscn(const ZTSLibraryRegistration& acrRegistration, std::uint32_t aBoard, void* apPayload,
                     std::uint32_t aLength) {
    restoreCallback<KPM_RscnCallback>(acrRegistration.mpEventCallback)(aBoard, apPayload, aLength);
}

inline void callTemperature(const ZTSLibraryRegistration& acrRegistration, std::uint32_t aBoard, unsigned aFirst,
                            unsigned aSecond) {
    restoreCallback<KPM_TemperatureCallback>(acrRegistration.mpEventCallback)(aBoard, aFirst, aSecond);
}

#endif
