/// The table of the twenty event kinds: the name of each for people, the pair it is registered under with the adapters'
/// library, the pair it is delivered and recorded under, and the sizes of its data.
///
/// Every other table of kinds refers to this one, or is checked against it when it is compiled.
///
/// The two pairs differ for the three kinds that the library reports through callbacks of their own (RSCN, link
/// attention, temperature). They are registered under category 0, with the library's event type as the subcategory.
/// They are delivered under the category that they belong to.
#ifndef LIBKPM_INCLUDE_SCOPEEVENTKINDS_H
#define LIBKPM_INCLUDE_SCOPEEVENTKINDS_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

#include "libkpm/include/libkpm.h"

struct ZTSScopeEventKind {
    const char* mpName;  ///< short lower-case name, as tools print and read it
    std::uint8_t mRegisteredCategory;
    std::uint8_t mRegisteredSubcategory;
    std::uint8_t mDeliveredCategory;
    std::uint8_t mDeliveredSubcategory;

    /// Bytes of the data that an event of the kind carries: its structure in libkpm.h, the header of an RSCN, the two
    /// values of a temperature. 0: no data. A scope event with fewer bytes is dropped.
    std::uint16_t mDataSize;

    /// Bytes of the record that one event makes.
    std::uint16_t mRecordSize;

    /// Bytes that each further event of the same identity appends to that record. 0: it appends nothing.
    std::uint16_t mEntrySize;

    /// True for the kinds that are registered per port. The other three are registered per board, each with a callback
    /// of its own.
    constexpr bool isScope() const { return mRegisteredCategory != 0; }
};

/// In catalogue order.
inline constexpr std::array<ZTSScopeEventKind, 20> gcScopeEventKinds{{
    {"plogi", 1, 0x01, 1, 0x01, sizeof(zt_plogi_rcv_v0), 20, 0},
    {"prlo", 1, 0x02, 1, 0x02, sizeof(zt_prlo_rcv_v0), 12, 0},
    {"adisc", 1, 0x04, 1, 0x04, sizeof(zt_adisc_rcv_v0), 20, 0},
    {"lsrjt", 1, 0x08, 1, 0x08, sizeof(zt_lsrjt_rcv_v0), 24, 8},
    {"logo", 1, 0x10, 1, 0x10, sizeof(zt_logo_rcv_v0), 20, 0},
    {"rscn", 0, 0x02, 1, 0x20, 4, 8, 0},
    {"fabric-busy", 2, 0x01, 2, 0x01, 0, 4, 0},
    {"port-busy", 2, 0x02, 2, 0x02, sizeof(zt_pbsy_rcv_v0), 12, 0},
    {"fcp-read-check", 2, 0x04, 2, 0x04, sizeof(zt_fcprdchkerr_v0), 24, 4},
    {"queue-full", 4, 0x01, 4, 0x01, sizeof(ZT_scsi_generic_v0), 48, 0},
    {"device-busy", 4, 0x02, 4, 0x02, sizeof(ZT_scsi_generic_v0), 48, 0},
    {"check-condition", 4, 0x04, 4, 0x04, sizeof(zt_scsi_checkcondition_v0), 128, 0},
    {"lun-reset", 4, 0x08, 4, 0x08, sizeof(ZT_scsi_generic_v0), 16, 4},
    {"target-reset", 4, 0x10, 4, 0x10, sizeof(ZT_scsi_generic_v0), 16, 4},
    {"bus-reset", 4, 0x20, 4, 0x20, 0, 4, 0},
    {"queue-depth", 4, 0x40, 4, 0x40, sizeof(zt_scsi_varquedepth_v0), 20, 8},
    {"port-interrupt", 8, 0x01, 8, 0x01, 0, 4, 0},
    {"link", 0, 0x01, 8, 0x02, sizeof(LINKINFO), 4, 0},
    {"temperature", 0, 0x20, 8, 0x04, 8, 4, 0},
    {"adapter-arrival", 16, 0x01, 16, 0x01, 0, 4, 0},
}};

inline constexpr std::size_t gcScopeEventKindCount = gcScopeEventKinds.size();

/// The index of the kind of this name.
constexpr std::optional<std::size_t> findKindIndex(std::string_view aName) {
    for (std::size_t lKind = 0; lKind < gcScopeEventKindCount; ++lKind) {
        if (gcScopeEventKinds[lKind].mpName == aName) {
            return lKind;
        }
    }
    return std::nullopt;
}

/// The index of the kind that is registered under this pair.
constexpr std::optional<std::size_t> findRegisteredKindIndex(std::uint32_t aCategory, std::uint32_t aSubcategory) {
    for (std::size_t lKind = 0; lKind < gcScopeEventKindCount; ++lKind) {
        if (gcScopeEventKinds[lKind].mRegisteredCategory == aCategory &&
            gcScopeEventKinds[lKind].mRegisteredSubcategory == aSubcategory) {
            return lKind;
        }
    }
    return std::nullopt;
}

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
