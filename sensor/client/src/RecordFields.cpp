#include "sensor/client/include/RecordFields.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstring>
#include <string_view>

#include "sensor/agentcommon/include/EventDataRecords.h"

static constexpr ZTSValueName scElsCommands[] = {
    {0x03, "PLOGI"}, {0x05, "LOGO"},  {0x0E, "RRQ"},  {0x20, "PRLI"}, {0x21, "PRLO"},
    {0x50, "PDISC"}, {0x52, "ADISC"}, {0x61, "RSCN"}, {0x62, "SCR"},
};

static constexpr ZTSValueName scRejectReasons[] = {
    {0x01, "invalid command"}, {0x03, "logical error"},     {0x05, "logical busy"},
    {0x07, "protocol error"},  {0x09, "unable to perform"}, {0x0B, "not supported"},
};

static constexpr ZTSValueName scSenseKeys[] = {
    {0x0, "no sense"},       {0x1, "recovered error"}, {0x2, "not ready"},       {0x3, "medium error"},
    {0x4, "hardware error"}, {0x5, "illegal request"}, {0x6, "unit attention"},  {0x7, "data protect"},
    {0x8, "blank check"},    {0xA, "copy aborted"},    {0xB, "aborted command"}, {0xD, "volume overflow"},
    {0xE, "miscompare"},
};

static constexpr ZTSValueName scAddressFormats[] = {{0, "port"}, {1, "area"}, {2, "domain"}, {3, "fabric"}};

static constexpr ZTSFieldRule scVersionFields[] = {{"version", 0, ZTFF_Number}};

static constexpr ZTSFieldRule scPlogiFields[] = {
    {"version", offsetof(TavikPlogi, Version), ZTFF_Number},
    {"portName", offsetof(TavikPlogi, Wwpn), ZTFF_Name},
    {"nodeName", offsetof(TavikPlogi, PayloadWwpn), ZTFF_Name},
};

static constexpr ZTSFieldRule scPortFields[] = {
    {"version", offsetof(TavikPrlo, Version), ZTFF_Number},
    {"portName", offsetof(TavikPrlo, Wwpn), ZTFF_Name},
};

static constexpr ZTSFieldRule scAdiscFields[] = {
    {"version", offsetof(TavikAdisc, Version), ZTFF_Number},
    {"portName", offsetof(TavikAdisc, Wwpn), ZTFF_Name},
    {"nodeName", offsetof(TavikAdisc, Wwnn), ZTFF_Name},
};

static constexpr ZTSFieldRule scLsRjtFields[] = {
    {"version", offsetof(TavikLsRjt, Version), ZTFF_Number},
    {"portName", offsetof(TavikLsRjt, Wwpn), ZTFF_Name},
    {.mpName = "originalCommand",
     .mOffset = offsetof(TavikLsRjt, OrgCmd),
     .mForm = ZTFF_Hex,
     .mValueNames = scElsCommands},
};

static constexpr ZTSFieldRule scLsRjtEntry[] = {
    {.mpName = "reasonCode",
     .mOffset = offsetof(TavikConsLsRjt, ReasonCode),
     .mForm = ZTFF_Hex,
     .mValueNames = scRejectReasons},
    {"explanation", offsetof(TavikConsLsRjt, ReasonCodeExpl), ZTFF_Hex},
};

static constexpr ZTSFieldRule scLogoFields[] = {
    {"version", offsetof(TavikLogo, Version), ZTFF_Number},
    {"portName", offsetof(TavikLogo, Wwpn), ZTFF_Name},
    {"payloadPortName", offsetof(TavikLogo, PayloadWwpn), ZTFF_Name},
};

static constexpr ZTSFieldRule scRscnFields[] = {
    {"version", offsetof(TavikRscn, Version), ZTFF_Number},
    {"page", offsetof(TavikRscn, FcId), ZTFF_Hex},
    {.mpName = "addressFormat",
     .mOffset = offsetof(TavikRscn, FcId),
     .mForm = ZTFF_Number,
     .mShift = 24,
     .mMask = 0x3,
     .mValueNames = scAddressFormats},
    {.mpName = "fcAddress", .mOffset = offsetof(TavikRscn, FcId), .mForm = ZTFF_FcAddress, .mMask = 0xFFFFFF},
};

static constexpr ZTSFieldRule scFcprdChkErrFields[] = {
    {"version", offsetof(TavikFcprdChkErr, Version), ZTFF_Number},
    {"portName", offsetof(TavikFcprdChkErr, Wwpn), ZTFF_Name},
    {"opCode", offsetof(TavikFcprdChkErr, OpCode), ZTFF_Hex},
    {"lun", offsetof(TavikFcprdChkErr, OsLun), ZTFF_Lun},
};

static constexpr ZTSFieldRule scFcprdChkErrEntry[] = {
    {"fcpiParameter", offsetof(TavikConsFcprdChkErr, FcpiParam), ZTFF_Hex},
};

static constexpr ZTSFieldRule scResetEntry[] = {{"lun", offsetof(TavikConsLunReset, OsLun), ZTFF_Lun}};

static constexpr ZTSFieldRule scQChangeEntry[] = {
    {"lun", offsetof(TavikConsQChange, OsLun), ZTFF_Lun},
    {"newDepth", offsetof(TavikConsQChange, NewVal), ZTFF_Number},
};

static constexpr ZTSFieldRule scBusyFields[] = {
    {"version", offsetof(TavikQFull, Version), ZTFF_Number},
    {"portName", offsetof(TavikQFull, Wwpn), ZTFF_Name},
    {.mpName = "luns",
     .mOffset = offsetof(TavikQFull, OsLun),
     .mForm = ZTFF_Bits,
     .mBitCountOffset = offsetof(TavikQFull, LenOsLun)},
};

static constexpr ZTSFieldRule scCheckCondFields[] = {
    {"version", offsetof(TavikCheckCond, Version), ZTFF_Number},
    {"portName", offsetof(TavikCheckCond, Wwpn), ZTFF_Name},
    {.mpName = "senseKey", .mOffset = offsetof(TavikCheckCond, SensKey), .mForm = ZTFF_Hex, .mValueNames = scSenseKeys},
    {"asc", offsetof(TavikCheckCond, Asc), ZTFF_Hex},
    {.mpName = "luns",
     .mOffset = offsetof(TavikCheckCond, OsLun),
     .mForm = ZTFF_Bits,
     .mBitCountOffset = offsetof(TavikCheckCond, OsLunLen)},
    {.mpName = "commandCodes",
     .mOffset = offsetof(TavikCheckCond, CmdCode),
     .mForm = ZTFF_HexBits,
     .mBitCountOffset = offsetof(TavikCheckCond, CmdCodeLen)},
    {.mpName = "ascqs",
     .mOffset = offsetof(TavikCheckCond, Ascq),
     .mForm = ZTFF_HexBits,
     .mBitCountOffset = offsetof(TavikCheckCond, AscqLen)},
};

static_assert(sizeof(TavikPortBusy) == sizeof(TavikPrlo) &&
              offsetof(TavikPortBusy, Wwpn) == offsetof(TavikPrlo, Wwpn) &&
              offsetof(TavikLunReset, Wwpn) == offsetof(TavikPrlo, Wwpn) &&
              offsetof(TavikTargetReset, Wwpn) == offsetof(TavikPrlo, Wwpn) &&
              offsetof(TavikQChange, Wwpn) == offsetof(TavikPrlo, Wwpn));
static_assert(sizeof(TavikDevBsy) == sizeof(TavikQFull) &&
              offsetof(TavikDevBsy, OsLun) == offsetof(TavikQFull, OsLun) &&
              offsetof(TavikDevBsy, LenOsLun) == offsetof(TavikQFull, LenOsLun));
static_assert(sizeof(TavikConsTargetReset) == sizeof(TavikConsLunReset));

/// The rule of the kind of this name, whose records begin with a `Record`.
template <class Record>
static constexpr ZTSKindRule sRule(std::string_view aName, std::span<const ZTSFieldRule> aFields) {
    const ZTSScopeEventKind& lrKind = gcScopeEventKinds[findKindIndex(aName).value()];
    if (lrKind.mRecordSize != sizeof(Record)) {
        throw "the record is not as long as the table of kinds says";
    }
    return {&lrKind, aFields};
}

/// The rule of a kind whose further events append an `Entry` each.
template <class Record, class Entry>
static constexpr ZTSKindRule sAppendingRule(std::string_view aName, std::span<const ZTSFieldRule> aFields,
                                            const char* apEntriesName, std::size_t aEntriesOffset,
                                            std::span<const ZTSFieldRule> aEntryFields) {
    ZTSKindRule lRule = sRule<Record>(aName, aFields);
    if (lRule.mpKind->mEntrySize != sizeof(Entry)) {
        throw "an entry is not as long as the table of kinds says";
    }
    lRule.mpEntriesName = apEntriesName;
    lRule.mEntriesOffset = static_cast<std::uint32_t>(aEntriesOffset);
    lRule.mEntryFields = aEntryFields;
    return lRule;
}

static constexpr std::array<ZTSKindRule, gcScopeEventKindCount> scKindRules{{
    sRule<TavikPlogi>("plogi", scPlogiFields),
    sRule<TavikPrlo>("prlo", scPortFields),
    sRule<TavikAdisc>("adisc", scAdiscFields),
    sAppendingRule<TavikLsRjt, TavikConsLsRjt>("lsrjt", scLsRjtFields, "rejections", offsetof(TavikLsRjt, ReasonCode),
                                               scLsRjtEntry),
    sRule<TavikLogo>("logo", scLogoFields),
    sRule<TavikRscn>("rscn", scRscnFields),
    sRule<TavikGeneric>("fabric-busy", scVersionFields),
    sRule<TavikPortBusy>("port-busy", scPortFields),
    sAppendingRule<TavikFcprdChkErr, TavikConsFcprdChkErr>("fcp-read-check", scFcprdChkErrFields, "parameters",
                                                           offsetof(TavikFcprdChkErr, FcpiParam), scFcprdChkErrEntry),
    sRule<TavikQFull>("queue-full", scBusyFields),
    sRule<TavikDevBsy>("device-busy", scBusyFields),
    sRule<TavikCheckCond>("check-condition", scCheckCondFields),
    sAppendingRule<TavikLunReset, TavikConsLunReset>("lun-reset", scPortFields, "resets",
                                                     offsetof(TavikLunReset, OsLun), scResetEntry),
    sAppendingRule<TavikTargetReset, TavikConsTargetReset>("target-reset", scPortFields, "resets",
                                                           offsetof(TavikTargetReset, OsLun), scResetEntry),
    sRule<TavikGeneric>("bus-reset", scVersionFields),
    sAppendingRule<TavikQChange, TavikConsQChange>("queue-depth", scPortFields, "changes",
                                                   offsetof(TavikQChange, OsLun), scQChangeEntry),
    sRule<TavikGeneric>("port-interrupt", scVersionFields),
    sRule<TavikGeneric>("link", scVersionFields),
    sRule<TavikGeneric>("temperature", scVersionFields),
    sRule<TavikGeneric>("adapter-arrival", scVersionFields),
}};

static constexpr bool sIsInCatalogueOrder() {
    for (std::size_t i = 0; i < scKindRules.size(); ++i) {
        if (scKindRules[i].mpKind != &gcScopeEventKinds[i]) {
            return false;
        }
    }
    return true;
}
static_assert(sIsInCatalogueOrder());

std::span<const ZTSKindRule> getKindRules() {
    return scKindRules;
}

const ZTSKindRule* findKindRule(std::uint8_t aCategory, std::uint8_t aSubcategory) {
    const ZTSScopeEventKind* lpKind = findDeliveredKind(aCategory, aSubcategory);
    return lpKind != nullptr ? &scKindRules[static_cast<std::size_t>(lpKind - gcScopeEventKinds.data())] : nullptr;
}

const char* ZTSFieldValue::findValueName() const {
    if (const auto* lpNumber = std::get_if<std::uint32_t>(&mValue)) {
        for (const ZTSValueName& lrName : mpRule->mValueNames) {
            if (lrName.mValue == *lpNumber) {
                return lrName.mpName;
            }
        }
    }
    return nullptr;
}

const ZTSFieldValue* ZTSDecodedData::find(const char* apName) const {
    const auto lFound = std::ranges::find_if(
        mFields, [apName](const ZTSFieldValue& acrValue) { return std::strcmp(acrValue.mpRule->mpName, apName) == 0; });
    return lFound == mFields.end() ? nullptr : &*lFound;
}

static std::uint32_t sReadNumber(std::span<const std::uint8_t> aData, std::size_t aOffset) {
    ZTSLittleEndian32 lNumber;
    std::memcpy(&lNumber, aData.data() + aOffset, sizeof(lNumber));
    return lNumber.get();
}

static void sAddProblem(std::string& arProblem, const std::string& acrText) {
    arProblem += (arProblem.empty() ? "" : "; ") + acrText;
}

static std::vector<std::uint32_t> sReadBits(const ZTSFieldRule& acrRule, std::span<const std::uint8_t> aData,
                                            std::string& arProblem) {
    const std::uint32_t lRoom = 8 * acrRule.getSize();
    const std::uint32_t lCount = sReadNumber(aData, acrRule.mBitCountOffset);
    if (lCount != lRoom) {
        sAddProblem(arProblem, std::string(acrRule.mpName) + " announces " + std::to_string(lCount) + " bits, wanted " +
                                   std::to_string(lRoom));
    }
    std::vector<std::uint32_t> lBits;
    for (std::uint32_t lBit = 0; lBit < lRoom; ++lBit) {
        if ((aData[acrRule.mOffset + lBit / 8] >> (lBit % 8) & 1) != 0) {
            lBits.push_back(lBit);
        }
    }
    return lBits;
}

static std::vector<ZTSFieldValue> sReadFields(std::span<const ZTSFieldRule> aRules, std::span<const std::uint8_t> aData,
                                              std::string& arProblem) {
    std::vector<ZTSFieldValue> lValues;
    for (const ZTSFieldRule& lrRule : aRules) {
        if (lrRule.mOffset + lrRule.getSize() > aData.size()) {
            break;
        }
        switch (lrRule.mForm) {
            case ZTFF_Name: {
                ZTSFcName lName;
                std::ranges::copy(aData.subspan(lrRule.mOffset, lName.mBytes.size()), lName.mBytes.begin());
                lValues.push_back({&lrRule, lName});
                break;
            }
            case ZTFF_Bits:
            case ZTFF_HexBits:
                lValues.push_back({&lrRule, sReadBits(lrRule, aData, arProblem)});
                break;
            default:
                lValues.push_back({&lrRule, sReadNumber(aData, lrRule.mOffset) >> lrRule.mShift & lrRule.mMask});
                break;
        }
    }
    return lValues;
}

ZTSDecodedData decodeEventData(std::uint8_t aCategory, std::uint8_t aSubcategory, std::span<const std::uint8_t> aData) {
    ZTSDecodedData lDecoded;
    lDecoded.mpRule = findKindRule(aCategory, aSubcategory);
    if (lDecoded.mpRule == nullptr) {
        return lDecoded;
    }
    const ZTSKindRule& lrRule = *lDecoded.mpRule;
    lDecoded.mpKind = lrRule.mpKind;
    const std::size_t lEntrySize = lrRule.mpKind->mEntrySize;
    const std::size_t lRecordSize = lrRule.mpKind->mRecordSize;
    lDecoded.mFields = sReadFields(lrRule.mFields, aData, lDecoded.mProblem);
    if (lEntrySize != 0) {
        for (std::size_t lOffset = lrRule.mEntriesOffset; lOffset + lEntrySize <= aData.size(); lOffset += lEntrySize) {
            lDecoded.mEntries.push_back(
                sReadFields(lrRule.mEntryFields, aData.subspan(lOffset, lEntrySize), lDecoded.mProblem));
        }
    }

    if (const auto* lpVersion = lDecoded.find("version")) {
        const std::uint32_t lVersion = std::get<std::uint32_t>(lpVersion->mValue);
        if (lVersion != EVENTDATA_VERSION) {
            sAddProblem(lDecoded.mProblem,
                        "version " + std::to_string(lVersion) + ", known is " + std::to_string(EVENTDATA_VERSION));
        }
    }
    const std::size_t lExtra = aData.size() - std::min(aData.size(), lRecordSize);
    if (aData.size() < lRecordSize) {
        sAddProblem(lDecoded.mProblem, std::to_string(aData.size()) + " bytes of event data, wanted at least " +
                                           std::to_string(lRecordSize));
    } else if (lEntrySize == 0 ? lExtra != 0 : lExtra % lEntrySize != 0) {
        sAddProblem(lDecoded.mProblem,
                    std::to_string(lEntrySize == 0 ? lExtra : lExtra % lEntrySize) + " bytes behind the last field");
    }
    return lDecoded;
}
