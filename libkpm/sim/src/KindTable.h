/// The simulated library's table of the twenty event kinds: how each is delivered, and the name, place and default of
/// each of its fields. It has one row for each kind, in the order of gcScopeEventKinds, which has the rest. The reader
/// of scenarios, the builder of events, the storms and the tool's listing all use this table.
#ifndef LIBKPM_SIM_SRC_KINDTABLE_H
#define LIBKPM_SIM_SRC_KINDTABLE_H

#include <cstddef>
#include <cstdint>
#include <span>

#include "libkpm/include/ScopeEventKinds.h"

/// The callback that a kind is delivered through.
enum ZTESimDelivery : std::uint8_t { ZTSD_Scope, ZTSD_Link, ZTSD_Rscn, ZTSD_Temperature };

/// How a field's value is written in a scenario and stored in the event.
enum ZTESimFieldForm : std::uint8_t {
    ZTSFF_Number,     ///< unsigned, host byte order
    ZTSFF_BigEndian,  ///< unsigned, network byte order
    ZTSFF_Wwn,        ///< 8 bytes
    ZTSFF_Bytes       ///< as many bytes as the field has
};

/// Where the value of a field comes from that a scenario line does not set.
enum ZTESimDefault : std::uint8_t {
    ZTSDF_Constant,    ///< the row's constant
    ZTSDF_RemotePort,  ///< port name of the line's remote port
    ZTSDF_RemoteNode,  ///< its node name
    ZTSDF_LocalPort,   ///< port name of the board
    ZTSDF_LocalNode,   ///< its node name
    ZTSDF_LocalId,     ///< its FC id, 0 while its link is down
    ZTSDF_LinkTag,     ///< number of this link event on its board, from 1
    ZTSDF_LinkUp,      ///< number of link-up events so far: every second event is one
    ZTSDF_LinkDown,    ///< number of link-down events so far: the first event is one
    ZTSDF_RscnLength,  ///< bytes of the RSCN: 4 and 4 more for each page
    ZTSDF_Lun          ///< the row's constant; a storm takes it from its own list of LUNs
};

struct ZTSSimField {
    const char* mpName;
    ZTESimFieldForm mForm;
    std::uint16_t mOffset;  ///< within the kind's data
    std::uint16_t mWidth;   ///< in bytes
    ZTESimDefault mDefault;
    std::uint32_t mConstant;    ///< for ZTSDF_Constant and ZTSDF_Lun
    std::uint32_t mStormLimit;  ///< a storm draws constants from 0 to this; 0: it leaves the field at its default
    const char* mpMeaning;
};

struct ZTSSimKind {
    const char* mpName;
    ZTESimDelivery mDelivery;
    std::span<const ZTSSimField> mFields;
};

inline constexpr std::size_t gcSimKindCount = gcScopeEventKindCount;

/// The table's rows, in the order of gcScopeEventKinds. `aKind` is an index below gcSimKindCount.
const ZTSSimKind& getSimKind(std::size_t aKind);

/// Stores a number as a field of mWidth bytes, at most 4, at `apPlace`, in the byte order of the field's form.
void storeSimNumber(const ZTSSimField& acrField, std::uint32_t aNumber, std::uint8_t* apPlace);

/// The last kind in catalogue order: with its registration on the last board everything is registered.
inline constexpr std::size_t gcSimLastKind = gcSimKindCount - 1;

#endif
