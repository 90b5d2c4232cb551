/// The source in the kernel of each of the twenty event kinds, in the order of gcScopeEventKinds.
#ifndef LIBKPM_LINUX_SRC_KINDSOURCES_H
#define LIBKPM_LINUX_SRC_KINDSOURCES_H

#include <array>
#include <cstddef>
#include <cstdint>
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

inline constexpr std::size_t gcLinuxRscn = findKindIndex("rscn").value();
inline constexpr std::size_t gcLinuxQueueFull = findKindIndex("queue-full").value();
inline constexpr std::size_t gcLinuxDeviceBusy = findKindIndex("device-busy").value();
inline constexpr std::size_t gcLinuxCheckCondition = findKindIndex("check-condition").value();
inline constexpr std::size_t gcLinuxQueueDepth = findKindIndex("queue-depth").value();
inline constexpr std::size_t gcLinuxLink = findKindIndex("link").value();
inline constexpr std::size_t gcLinuxAdapterArrival = findKindIndex("adapter-arrival").value();

#endif
