/// The twenty event kinds in one table: their names for people, the pair they are registered under with the adapters'
/// library, and the pair they are delivered and recorded under.
///
/// The two pairs differ for the three kinds that the library reports through callbacks of their own (RSCN, link
/// attention, temperature): they are registered under category 0 with the library's event type as subcategory, and
/// delivered under the category that they belong to.
#ifndef SENSOR_AGENTCOMMON_SCOPEEVENTKINDS_H
#define SENSOR_AGENTCOMMON_SCOPEEVENTKINDS_H

#include <array>
#include <cstdint>

struct ZTSScopeEventKind {
    const char* mpName;  ///< short lower-case name, as tools print and read it
    std::uint8_t mRegisteredCategory;
    std::uint8_t mRegisteredSubcategory;
    std::uint8_t mDeliveredCategory;
    std::uint8_t mDeliveredSubcategory;
};

/// In catalogue order.
inline constexpr std::array<ZTSScopeEventKind, 20> gcScopeEventKinds{{
    {"plogi", 1, 0x01, 1, 0x01},          {"prlo", 1, 0x02, 1, 0x02},
    {"adisc", 1, 0x04, 1, 0x04},          {"lsrjt", 1, 0x08, 1, 0x08},
    {"logo", 1, 0x10, 1, 0x10},           {"rscn", 0, 0x02, 1, 0x20},
    {"fabric-busy", 2, 0x01, 2, 0x01},    {"port-busy", 2, 0x02, 2, 0x02},
    {"fcp-read-check", 2, 0x04, 2, 0x04}, {"queue-full", 4, 0x01, 4, 0x01},
    {"device-busy", 4, 0x02, 4, 0x02},    {"check-condition", 4, 0x04, 4, 0x04},
    {"lun-reset", 4, 0x08, 4, 0x08},      {"target-reset", 4, 0x10, 4, 0x10},
    {"bus-reset", 4, 0x20, 4, 0x20},      {"queue-depth", 4, 0x40, 4, 0x40},
    {"port-interrupt", 8, 0x01, 8, 0x01}, {"link", 0, 0x01, 8, 0x02},
    {"temperature", 0, 0x20, 8, 0x04},    {"adapter-arrival", 16, 0x01, 16, 0x01},
}};

/// The kind that is delivered as this pair, or null.
constexpr const ZTSScopeEventKind* findDeliveredKind(std::uint8_t aCategory, std::uint8_t aSubcategory) {
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        if (lrKind.mDeliveredCategory == aCategory && lrKind.mDeliveredSubcategory == aSubcategory) {
            return &lrKind;
        }
    }
    return nullptr;
}

#endif
