/// The twenty event kinds that the agent registers for, each a class of its own.
///
/// RSCN, link attention and temperature stand under category 0 with the library's event type as subcategory: so they
/// are registered. They are delivered under other pairs (see gcRscnCategory and its neighbours in TavikCore.h).
#ifndef TAVIK_INCLUDE_SCOPEEVENTSUBTYPE_H
#define TAVIK_INCLUDE_SCOPEEVENTSUBTYPE_H

#include "common/include/Log.h"
#include "libkpm/include/libkpm.h"
#include "sensor/agentcommon/include/ScopeEvent.h"

/// Declares the class ZTC<Subtype>ScopeEvent of the kind (Category, Subcategory).
#define ZT_SCOPE_EVENT_SUBTYPE(Subtype, Category, Subcategory)                  \
    class ZTC##Subtype##ScopeEvent : public ZTCScopeEvent {                     \
    public:                                                                     \
        static constexpr unsigned char gcCategory = (Category);                 \
        static constexpr unsigned char gcSubcategory = (Subcategory);           \
        ZTC##Subtype##ScopeEvent() : ZTCScopeEvent(gcCategory, gcSubcategory) { \
            ZT_ENTRY();                                                         \
            ZT_EXIT();                                                          \
        }                                                                       \
    }

/// Category of the kinds that are registered per board with an event type of their own.
inline constexpr unsigned char gcBoardEventCategory = 0;

ZT_SCOPE_EVENT_SUBTYPE(ElsPlogi, ZT_REG_ELS_EVENT, ZT_ELS_SUBCATEGORY_PLOGI_RCV);
ZT_SCOPE_EVENT_SUBTYPE(ElsPrlo, ZT_REG_ELS_EVENT, ZT_ELS_SUBCATEGORY_PRLO_RCV);
ZT_SCOPE_EVENT_SUBTYPE(ElsAdisc, ZT_REG_ELS_EVENT, ZT_ELS_SUBCATEGORY_ADISC_RCV);
ZT_SCOPE_EVENT_SUBTYPE(ElsLsrjt, ZT_REG_ELS_EVENT, ZT_ELS_SUBCATEGORY_LSRJT_RCV);
ZT_SCOPE_EVENT_SUBTYPE(ElsLogo, ZT_REG_ELS_EVENT, ZT_ELS_SUBCATEGORY_LOGO_RCV);
ZT_SCOPE_EVENT_SUBTYPE(ElsRscn, gcBoardEventCategory, FC_REG_RSCN_EVENT);
ZT_SCOPE_EVENT_SUBTYPE(FabricFbsy, ZT_REG_FABRIC_EVENT, ZT_FABRIC_SUBCATEGORY_FABRIC_BUSY);
ZT_SCOPE_EVENT_SUBTYPE(FabricPbsy, ZT_REG_FABRIC_EVENT, ZT_FABRIC_SUBCATEGORY_PORT_BUSY);
ZT_SCOPE_EVENT_SUBTYPE(FabricFcprdchkerr, ZT_REG_FABRIC_EVENT, ZT_FABRIC_SUBCATEGORY_FCPRDCHKERR);
ZT_SCOPE_EVENT_SUBTYPE(ScsiQfull, ZT_REG_SCSI_EVENT, ZT_SCSI_SUBCATEGORY_QFULL);
ZT_SCOPE_EVENT_SUBTYPE(ScsiDevbsy, ZT_REG_SCSI_EVENT, ZT_SCSI_SUBCATEGORY_DEVBSY);
ZT_SCOPE_EVENT_SUBTYPE(ScsiCheckcondition, ZT_REG_SCSI_EVENT, ZT_SCSI_SUBCATEGORY_CHECKCONDITION);
ZT_SCOPE_EVENT_SUBTYPE(ScsiLunreset, ZT_REG_SCSI_EVENT, ZT_SCSI_SUBCATEGORY_LUNRESET);
ZT_SCOPE_EVENT_SUBTYPE(ScsiTgtreset, ZT_REG_SCSI_EVENT, ZT_SCSI_SUBCATEGORY_TGTRESET);
ZT_SCOPE_EVENT_SUBTYPE(ScsiBusreset, ZT_REG_SCSI_EVENT, ZT_SCSI_SUBCATEGORY_BUSRESET);
ZT_SCOPE_EVENT_SUBTYPE(ScsiVarquedepth, ZT_REG_SCSI_EVENT, ZT_SCSI_SUBCATEGORY_VARQUEDEPTH);
ZT_SCOPE_EVENT_SUBTYPE(BoardPortinterr, ZT_REG_BOARD_EVENT, ZT_BOARD_SUBCATEGORY_PORTINTERR);
ZT_SCOPE_EVENT_SUBTYPE(BoardLinkatte, gcBoardEventCategory, FC_REG_LINK_EVENT);
ZT_SCOPE_EVENT_SUBTYPE(BoardTemperature, gcBoardEventCategory, FC_REG_TEMPERATURE_EVENT);
ZT_SCOPE_EVENT_SUBTYPE(AdapterArrival, ZT_REG_ADAPTER_EVENT, ZT_ADAPTER_SUBCATEGORY_ARRIVAL);

#endif
