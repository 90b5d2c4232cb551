#include "sensor/store/src/KindShapes.h"

#include <algorithm>
#include <array>
#include <cstddef>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/agentcommon/include/EventDataRecords.h"

static constexpr ZTSKindShape sGeneric(std::uint8_t aCategory, std::uint8_t aSubcategory) {
    return {.mCategory = aCategory, .mSubcategory = aSubcategory, .mSize = sizeof(TavikGeneric)};
}

static constexpr ZTSKindShape sPortOnly(std::uint8_t aCategory, std::uint8_t aSubcategory) {
    return {.mCategory = aCategory, .mSubcategory = aSubcategory, .mSize = sizeof(TavikPrlo), .mHasPort = true};
}

static constexpr ZTSKindShape sTwoNames(std::uint8_t aSubcategory, ZTEIdentityForm aForm) {
    return {.mCategory = 1,
            .mSubcategory = aSubcategory,
            .mSize = sizeof(TavikPlogi),
            .mHasPort = true,
            .mIdentityForm = aForm,
            .mIdentityOffset = offsetof(TavikPlogi, PayloadWwpn),
            .mIdentitySize = 8};
}

static constexpr ZTSKindShape sBusy(std::uint8_t aSubcategory) {
    return {.mCategory = 4,
            .mSubcategory = aSubcategory,
            .mSize = sizeof(TavikQFull),
            .mHasPort = true,
            .mLunForm = ZTLF_Bits,
            .mLunOffset = offsetof(TavikQFull, OsLun)};
}

static constexpr ZTSKindShape sReset(std::uint8_t aSubcategory) {
    return {.mCategory = 4,
            .mSubcategory = aSubcategory,
            .mSize = sizeof(TavikLunReset),
            .mHasPort = true,
            .mLunForm = ZTLF_Entries,
            .mEntriesOffset = offsetof(TavikLunReset, OsLun),
            .mEntrySize = sizeof(TavikConsLunReset)};
}

static constexpr std::array<ZTSKindShape, gcScopeEventKinds.size()> scShapes{{
    sTwoNames(0x01, ZTIF_NodeName),
    sPortOnly(1, 0x02),
    sTwoNames(0x04, ZTIF_NodeName),
    {.mCategory = 1,
     .mSubcategory = 0x08,
     .mSize = sizeof(TavikLsRjt),
     .mHasPort = true,
     .mIdentityForm = ZTIF_OriginalCommand,
     .mIdentityOffset = offsetof(TavikLsRjt, OrgCmd),
     .mIdentitySize = 4,
     .mEntriesOffset = offsetof(TavikLsRjt, ReasonCode),
     .mEntrySize = sizeof(TavikConsLsRjt),
     .mReasonSize = 8},
    sTwoNames(0x10, ZTIF_PayloadPortName),
    {.mCategory = 1,
     .mSubcategory = 0x20,
     .mSize = sizeof(TavikRscn),
     .mIdentityForm = ZTIF_Page,
     .mIdentityOffset = offsetof(TavikRscn, FcId),
     .mIdentitySize = 4},
    sGeneric(2, 0x01),
    sPortOnly(2, 0x02),
    {.mCategory = 2,
     .mSubcategory = 0x04,
     .mSize = sizeof(TavikFcprdChkErr),
     .mHasPort = true,
     .mIdentityForm = ZTIF_OpCode,
     .mIdentityOffset = offsetof(TavikFcprdChkErr, OpCode),
     .mIdentitySize = 4,
     .mLunForm = ZTLF_Number,
     .mLunOffset = offsetof(TavikFcprdChkErr, OsLun),
     .mEntriesOffset = offsetof(TavikFcprdChkErr, FcpiParam),
     .mEntrySize = sizeof(TavikConsFcprdChkErr),
     .mReasonSize = 4},
    sBusy(0x01),
    sBusy(0x02),
    {.mCategory = 4,
     .mSubcategory = 0x04,
     .mSize = sizeof(TavikCheckCond),
     .mHasPort = true,
     .mIdentityForm = ZTIF_SenseKeyAndAsc,
     .mIdentityOffset = offsetof(TavikCheckCond, SensKey),
     .mIdentitySize = 8,
     .mLunForm = ZTLF_Bits,
     .mLunOffset = offsetof(TavikCheckCond, OsLun),
     .mCommandCodesOffset = offsetof(TavikCheckCond, CmdCode),
     .mAscqsOffset = offsetof(TavikCheckCond, Ascq)},
    sReset(0x08),
    sReset(0x10),
    sGeneric(4, 0x20),
    {.mCategory = 4,
     .mSubcategory = 0x40,
     .mSize = sizeof(TavikQChange),
     .mHasPort = true,
     .mLunForm = ZTLF_Entries,
     .mEntriesOffset = offsetof(TavikQChange, OsLun),
     .mEntrySize = sizeof(TavikConsQChange),
     .mReasonOffset = offsetof(TavikConsQChange, NewVal),
     .mReasonSize = 4},
    sGeneric(8, 0x01),
    sGeneric(8, 0x02),
    sGeneric(8, 0x04),
    sGeneric(16, 0x01),
}};

// The rows made by a helper rely on these layouts being alike.
static_assert(offsetof(TavikAdisc, Wwnn) == offsetof(TavikPlogi, PayloadWwpn) &&
              sizeof(TavikAdisc) == sizeof(TavikPlogi));
static_assert(offsetof(TavikLogo, PayloadWwpn) == offsetof(TavikPlogi, PayloadWwpn));
static_assert(sizeof(TavikPortBusy) == sizeof(TavikPrlo) && sizeof(TavikDevBsy) == sizeof(TavikQFull));
static_assert(sizeof(TavikTargetReset) == sizeof(TavikLunReset) && offsetof(TavikCheckCond, Wwpn) == gcPortOffset);
static_assert(offsetof(TavikCheckCond, Asc) == offsetof(TavikCheckCond, SensKey) + 4);

std::span<const ZTSKindShape> getKindShapes() {
    return scShapes;
}

/// The number of each kind's row plus 1, by key; 0: no row. Asked for each record.
static constexpr auto scRowOfKey = [] {
    constexpr ZTCKindKey lcMost =
        std::ranges::max(scShapes, {}, [](const ZTSKindShape& acrShape) { return acrShape.getKey(); }).getKey();
    std::array<std::uint8_t, lcMost + 1> lRows{};
    for (std::size_t i = 0; i < scShapes.size(); ++i) {
        lRows[scShapes[i].getKey()] = static_cast<std::uint8_t>(i + 1);
    }
    return lRows;
}();

const ZTSKindShape* findKindShape(ZTCKindKey aKind) {
    const std::size_t lRow = aKind < scRowOfKey.size() ? scRowOfKey[aKind] : 0;
    return lRow == 0 ? nullptr : &scShapes[lRow - 1];
}

static bool sIsName(ZTEIdentityForm aForm) {
    return aForm == ZTIF_NodeName || aForm == ZTIF_PayloadPortName;
}

std::uint64_t readIdentity(const ZTSKindShape& acrShape, std::span<const std::uint8_t> aData) {
    if (acrShape.mIdentitySize == 0) {
        return 0;
    }
    if (sIsName(acrShape.mIdentityForm)) {
        std::uint64_t lName = 0;
        for (const std::uint8_t lByte : aData.subspan(acrShape.mIdentityOffset, 8)) {
            lName = lName << 8 | lByte;
        }
        return lName;
    }
    std::uint64_t lValue = readLittleEndian32(aData, acrShape.mIdentityOffset);
    if (acrShape.mIdentitySize == 8) {
        lValue |= static_cast<std::uint64_t>(readLittleEndian32(aData, acrShape.mIdentityOffset + 4)) << 32;
    }
    return lValue;
}

static ZTSFcName sName(std::uint64_t aIdentity) {
    ZTSFcName lName;
    for (std::size_t i = lName.mBytes.size(); i-- > 0;) {
        lName.mBytes[i] = static_cast<std::uint8_t>(aIdentity);
        aIdentity >>= 8;
    }
    return lName;
}

void storeIdentity(const ZTSKindShape& acrShape, std::uint64_t aIdentity, ZTSEpisodeDetail& arDetail) {
    const auto lLow = static_cast<std::uint32_t>(aIdentity);
    switch (acrShape.mIdentityForm) {
        case ZTIF_None:
            break;
        case ZTIF_NodeName:
            arDetail.mNodeName = sName(aIdentity);
            break;
        case ZTIF_PayloadPortName:
            arDetail.mPayloadPortName = sName(aIdentity);
            break;
        case ZTIF_OriginalCommand:
            arDetail.mOriginalCommand = lLow;
            break;
        case ZTIF_OpCode:
            arDetail.mOpCode = lLow;
            break;
        case ZTIF_SenseKeyAndAsc:
            arDetail.mSenseKey = lLow;
            arDetail.mAsc = static_cast<std::uint32_t>(aIdentity >> 32);
            break;
        case ZTIF_Page:
            arDetail.mPage = lLow;
            break;
    }
}
