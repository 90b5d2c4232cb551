#include "sensor/store/include/Episode.h"

#include "libkpm/include/ScopeEventKinds.h"

std::string getKindName(ZTCKindKey aKind) {
    const auto lCategory = static_cast<std::uint8_t>(aKind >> 8);
    const auto lSubcategory = static_cast<std::uint8_t>(aKind & 0xFF);
    if (const ZTSScopeEventKind* const lpKind = findDeliveredKind(lCategory, lSubcategory)) {
        return lpKind->mpName;
    }
    return aKind == 0 ? "other" : "unknown-" + std::to_string(lCategory) + "-" + std::to_string(lSubcategory);
}

std::optional<ZTCKindKey> findKind(std::string_view aName) {
    const std::optional<std::size_t> lIndex = findKindIndex(aName);
    if (!lIndex) {
        return std::nullopt;
    }
    const ZTSScopeEventKind& lrKind = gcScopeEventKinds[*lIndex];
    return makeKindKey(lrKind.mDeliveredCategory, lrKind.mDeliveredSubcategory);
}

const char* getPhaseName(ZTEPhase aPhase) {
    switch (aPhase) {
        case ZTP_Open:
            return "open";
        case ZTP_Update:
            return "update";
        case ZTP_Closed:
            break;
    }
    return "closed";
}
