#include "libkpm/linux/src/Delivery.h"

#include <optional>

#include "libkpm/common/include/Callbacks.h"
#include "libkpm/linux/src/KindSources.h"

void ZTCLinuxDelivery::deliverScope(std::uint32_t aBoard, const HBA_wwn& acrPort, std::size_t aKind, const void* apData,
                                    std::size_t aSize) const {
    const std::optional<ZTSLibraryRegistration> lRegistration = mrRegistry.find(aBoard, aKind);
    if (!lRegistration) {
        return;
    }
    ZT_event_payload lPayload{0, const_cast<void*>(apData)};
    ZT_event lEvent{};
    lEvent.zt_evt_version = ZT_EVENT_VERSION;
    lEvent.zt_evt_size = ZT_EVENT_HEADER_SIZE + aSize;
    lEvent.zt_evt_payload = apData == nullptr ? nullptr : &lPayload;
    callScope(*lRegistration, aBoard, acrPort, gcScopeEventKinds[aKind].mDeliveredCategory,
              gcScopeEventKinds[aKind].mDeliveredSubcategory, &lEvent);
}

void ZTCLinuxDelivery::deliverLink(std::uint32_t aBoard, LINKINFO& arInfo) const {
    if (const auto lRegistration = mrRegistry.find(aBoard, gcLinuxLink)) {
        callLink(*lRegistration, aBoard, &arInfo);
    }
}

void ZTCLinuxDelivery::deliverRscn(std::uint32_t aBoard, std::vector<std::uint8_t>& arPayload) const {
    if (const auto lRegistration = mrRegistry.find(aBoard, gcLinuxRscn)) {
        callRscn(*lRegistration, aBoard, arPayload.data(), static_cast<std::uint32_t>(arPayload.size()));
    }
}
