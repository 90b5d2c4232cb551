/// Hands events to the callbacks that are registered for them. Called by the library's thread, with no lock held.
#ifndef LIBKPM_LINUX_SRC_DELIVERY_H
#define LIBKPM_LINUX_SRC_DELIVERY_H

#include <cstddef>
#include <cstdint>
#include <vector>

#include "libkpm/common/include/Registry.h"
#include "libkpm/include/libkpm.h"

class ZTCLinuxDelivery {
public:
    /// `acrRegistry` outlives the object.
    explicit ZTCLinuxDelivery(const ZTCLibraryRegistry& acrRegistry) : mrRegistry(acrRegistry) {}

    /// An event of a kind that is registered per port; `apData` is null where the kind has no data.
    void deliverScope(std::uint32_t aBoard, const HBA_wwn& acrPort, std::size_t aKind, const void* apData,
                      std::size_t aSize) const;

    void deliverLink(std::uint32_t aBoard, LINKINFO& arInfo) const;

    /// The payload as on the wire.
    void deliverRscn(std::uint32_t aBoard, std::vector<std::uint8_t>& arPayload) const;

private:
    const ZTCLibraryRegistry& mrRegistry;
};

#endif
