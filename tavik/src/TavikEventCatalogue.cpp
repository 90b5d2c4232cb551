#include "tavik/include/TavikEventCatalogue.h"

#include <array>
#include <cstddef>

#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "libkpm/include/ScopeEventKinds.h"
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
    unsigned char mCategory;
    unsigned char mSubcategory;
};

template <typename TKind>
constexpr ZTSCatalogueEntry sEntry(const char* apMessage) {
    return {apMessage, sMake<TKind>, TKind::gcCategory, TKind::gcSubcategory};
}

constexpr std::array<ZTSCatalogueEntry, gcScopeEventKindCount> scEntries{{
    sEntry<ZTCElsPlogiScopeEvent>("Inserting ElsPlogi ScopeEvent into Events Catalogue"),
    sEntry<ZTCElsPrloScopeEvent>("Inserting ElsPrlo ScopeEvent into Events Catalogue"),
    sEntry<ZTCElsAdiscScopeEvent>("Inserting ElsAdisc ScopeEvent into Events Catalogue"),
    sEntry<ZTCElsLsrjtScopeEvent>("Inserting ElsLsrjt ScopeEvent into Events Catalogue"),
    sEntry<ZTCElsLogoScopeEvent>("Inserting ElsLogo ScopeEvent into Events Catalogue"),
    sEntry<ZTCElsRscnScopeEvent>("Inserting ElsRscn ScopeEvent into Events Catalogue"),
    sEntry<ZTCFabricFbsyScopeEvent>("Inserting FabricFbsy ScopeEvent into Events Catalogue"),
    sEntry<ZTCFabricPbsyScopeEvent>("Inserting FabricPbsy ScopeEvent into Events Catalogue"),
    sEntry<ZTCFabricFcprdchkerrScopeEvent>("Inserting FabricFcprdchkerr ScopeEvent into Events Catalogue"),
    sEntry<ZTCScsiQfullScopeEvent>("Inserting ScsiQfull ScopeEvent into Events Catalogue"),
    sEntry<ZTCScsiDevbsyScopeEvent>("Inserting ScsiDevbsy ScopeEvent into Events Catalogue"),
    sEntry<ZTCScsiCheckconditionScopeEvent>("Inserting ScsiCheckcondition ScopeEvent into Events Catalogue"),
    sEntry<ZTCScsiLunresetScopeEvent>("Inserting ScsiLunreset ScopeEvent into Events Catalogue"),
    sEntry<ZTCScsiTgtresetScopeEvent>("Inserting ScsiTgtreset ScopeEvent into Events Catalogue"),
    sEntry<ZTCScsiBusresetScopeEvent>("Inserting ScsiBusreset ScopeEvent into Events Catalogue"),
    sEntry<ZTCScsiVarquedepthScopeEvent>("Inserting ScsiVarquedepth ScopeEvent into Events Catalogue"),
    sEntry<ZTCBoardPortinterrScopeEvent>("Inserting BoardPortinterr ScopeEvent into Events Catalogue"),
    sEntry<ZTCBoardLinkatteScopeEvent>("Inserting BoardLinkatte ScopeEvent into Events Catalogue"),
    sEntry<ZTCBoardTemperatureScopeEvent>("Inserting BoardTemperature ScopeEvent into Events Catalogue"),
    sEntry<ZTCAdapterArrivalScopeEvent>("Inserting AdapterArrival ScopeEvent into Events Catalogue"),
}};

constexpr bool sIsInOrderOfKinds() {
    for (std::size_t lKind = 0; lKind < gcScopeEventKindCount; ++lKind) {
        if (scEntries[lKind].mCategory != gcScopeEventKinds[lKind].mRegisteredCategory ||
            scEntries[lKind].mSubcategory != gcScopeEventKinds[lKind].mRegisteredSubcategory) {
            return false;
        }
    }
    return true;
}
static_assert(sIsInOrderOfKinds());

}  // namespace

ZTCTavikEventCatalogue::ZTCTavikEventCatalogue() {
    ZT_ENTRY();
    for (const ZTSCatalogueEntry& lrEntry : scEntries) {
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
