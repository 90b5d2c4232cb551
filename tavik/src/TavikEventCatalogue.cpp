#include "tavik/include/TavikEventCatalogue.h"

#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "tavik/include/ScopeEventSubType.h"

namespace {

template <typename TKind>
ZTCScopeEvent* sMake() {
    ZT_ENTRY();
    ZTCScopeEvent* const lpKind = NEW TKind();
    ZT_EXIT();
    return lpKind;
}

struct ZTSCatalogueEntry {
    const char* mpMessage;
    ZTCScopeEvent* (*mpMake)();
};

constexpr ZTSCatalogueEntry gcEntries[] = {
    {"Inserting ElsPlogi ScopeEvent into Events Catalogue", sMake<ZTCElsPlogiScopeEvent>},
    {"Inserting ElsPrlo ScopeEvent into Events Catalogue", sMake<ZTCElsPrloScopeEvent>},
    {"Inserting ElsAdisc ScopeEvent into Events Catalogue", sMake<ZTCElsAdiscScopeEvent>},
    {"Inserting ElsLsrjt ScopeEvent into Events Catalogue", sMake<ZTCElsLsrjtScopeEvent>},
    {"Inserting ElsLogo ScopeEvent into Events Catalogue", sMake<ZTCElsLogoScopeEvent>},
    {"Inserting ElsRscn ScopeEvent into Events Catalogue", sMake<ZTCElsRscnScopeEvent>},
    {"Inserting FabricFbsy ScopeEvent into Events Catalogue", sMake<ZTCFabricFbsyScopeEvent>},
    {"Inserting FabricPbsy ScopeEvent into Events Catalogue", sMake<ZTCFabricPbsyScopeEvent>},
    {"Inserting FabricFcprdchkerr ScopeEvent into Events Catalogue", sMake<ZTCFabricFcprdchkerrScopeEvent>},
    {"Inserting ScsiQfull ScopeEvent into Events Catalogue", sMake<ZTCScsiQfullScopeEvent>},
    {"Inserting ScsiDevbsy ScopeEvent into Events Catalogue", sMake<ZTCScsiDevbsyScopeEvent>},
    {"Inserting ScsiCheckcondition ScopeEvent into Events Catalogue", sMake<ZTCScsiCheckconditionScopeEvent>},
    {"Inserting ScsiLunreset ScopeEvent into Events Catalogue", sMake<ZTCScsiLunresetScopeEvent>},
    {"Inserting ScsiTgtreset ScopeEvent into Events Catalogue", sMake<ZTCScsiTgtresetScopeEvent>},
    {"Inserting ScsiBusreset ScopeEvent into Events Catalogue", sMake<ZTCScsiBusresetScopeEvent>},
    {"Inserting ScsiVarquedepth ScopeEvent into Events Catalogue", sMake<ZTCScsiVarquedepthScopeEvent>},
    {"Inserting BoardPortinterr ScopeEvent into Events Catalogue", sMake<ZTCBoardPortinterrScopeEvent>},
    {"Inserting BoardLinkatte ScopeEvent into Events Catalogue", sMake<ZTCBoardLinkatteScopeEvent>},
    {"Inserting BoardTemperature ScopeEvent into Events Catalogue", sMake<ZTCBoardTemperatureScopeEvent>},
    {"Inserting AdapterArrival ScopeEvent into Events Catalogue", sMake<ZTCAdapterArrivalScopeEvent>},
};

}  // namespace

ZTCTavikEventCatalogue::ZTCTavikEventCatalogue() {
    ZT_ENTRY();
    for (const ZTSCatalogueEntry& lrEntry : gcEntries) {
        ZT_LOG_INFO("%s", lrEntry.mpMessage);
        insertIntoCatalogue(ZTCPointer<ZTCScopeEvent>(lrEntry.mpMake()));
    }
    ZT_EXIT();
}

void ZTCTavikEventCatalogue::insertIntoCatalogue(const ZTCPointer<ZTCScopeEvent>& acrEvent) {
    ZT_ENTRY();
    mEventSet.push_back(acrEvent);
    mEventMap.insert(acrEvent->getKeyForm(), acrEvent);
    ZT_EXIT();
}
