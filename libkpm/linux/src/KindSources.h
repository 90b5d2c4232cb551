/// What each of the twenty event kinds is made from here, in the order of gcScopeEventKinds.
#ifndef LIBKPM_LINUX_SRC_KINDSOURCES_H
#define LIBKPM_LINUX_SRC_KINDSOURCES_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

#include "libkpm/include/ScopeEventKinds.h"

enum ZTELinuxSource : std::uint8_t {
    ZTLSO_None,      ///< the kernel has no generic source
    ZTLSO_Hosts,     ///< the hosts, and what is behind them, in sysfs
    ZTLSO_Messages,  ///< FC events of the netlink family
    ZTLSO_Trace      ///< trace events of finished SCSI commands
};

inline constexpr std::size_t gcLinuxKindCount = gcScopeEventKinds.size();

struct ZTSLinuxKindSource {
    std::string_view mName;
    ZTELinuxSource mSource;
};

inline constexpr std::array<ZTSLinuxKindSource, 7> gcLinuxKindSources{{{"rscn", ZTLSO_Messages},
                                                                       {"queue-full", ZTLSO_Trace},
                                                                       {"device-busy", ZTLSO_Trace},
                                                                       {"check-condition", ZTLSO_Trace},
                                                                       {"queue-depth", ZTLSO_Hosts},
                                                                       {"link", ZTLSO_Hosts},
                                                                       {"adapter-arrival", ZTLSO_Hosts}}};

/// The source of a kind, an index below gcLinuxKindCount.
constexpr ZTELinuxSource getLinuxSource(std::size_t aKind) {
    for (const ZTSLinuxKindSource& lrRow : gcLinuxKindSources) {
        if (lrRow.mName == gcScopeEventKinds[aKind].mpName) {
            return lrRow.mSource;
        }
    }
    return ZTLSO_None;
}

constexpr std::size_t getLinuxKind(std::string_view aName) {
    std::size_t lKind = 0;
    while (gcScopeEventKinds[lKind].mpName != aName) {
        ++lKind;
    }
    return lKind;
}

inline constexpr std::size_t gcLinuxRscn = getLinuxKind("rscn");
inline constexpr std::size_t gcLinuxQueueFull = getLinuxKind("queue-full");
inline constexpr std::size_t gcLinuxDeviceBusy = getLinuxKind("device-busy");
inline constexpr std::size_t gcLinuxCheckCondition = getLinuxKind("check-condition");
inline constexpr std::size_t gcLinuxQueueDepth = getLinuxKind("queue-depth");
inline constexpr std::size_t gcLinuxLink = getLinuxKind("link");
inline constexpr std::size_t gcLinuxAdapterArrival = getLinuxKind("adapter-arrival");

/// The kind that is registered under this pair.
constexpr std::optional<std::size_t> findLinuxKind(std::uint32_t aCategory, std::uint32_t aSubcategory) {
    for (std::size_t lKind = 0; lKind < gcLinuxKindCount; ++lKind) {
        if (gcScopeEventKinds[lKind].mRegisteredCategory == aCategory &&
            gcScopeEventKinds[lKind].mRegisteredSubcategory == aSubcategory) {
            return lKind;
        }
    }
    return std::nullopt;
}

#endif
