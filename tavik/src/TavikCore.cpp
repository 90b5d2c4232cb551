#include "tavik/include/TavikCore.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <exception>
#include <iterator>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "common/include/Unaligned.h"
#include "libkpm/include/ScopeEventKinds.h"
#include "os/common/include/Clib.h"
#include "sensor/agentcommon/include/EventDataRecords.h"
#include "tavik/include/EventConsolidation.h"
#include "tavik/include/EventDataBytes.h"
#include "tavik/include/KindSlot.h"
#include "tavik/include/TavikProtocolHandler.h"
#include "tavik/include/TavikSystem.h"

namespace {

/// One delivered event, until its outcome is decided. Each event counts once on the status page: the system counts
/// those that it consolidates, this object all others. An RSCN counts as one event for each page, once its pages are
/// known.
class ZTCEventOutcome {
public:
    ZTCEventOutcome(unsigned int aBoardId, unsigned int aCategory, unsigned int aSubcategory)
        : mBoardId(aBoardId),
          mCategory(static_cast<unsigned char>(aCategory)),
          mSubcategory(static_cast<unsigned char>(aSubcategory)) {
        ZT_ENTRY();
        ZT_EXIT();
    }

    void setEvents(unsigned int aEvents) { mUndecided = aEvents; }

    /// The system has consolidated and counted one.
    void noteConsolidated() {
        ZT_ENTRY();
        --mUndecided;
        ZT_EXIT();
    }

    /// Counts the events that are still undecided as refused.
    void refuse(ZTEStatusRefusal aReason) noexcept {
        ZT_ENTRY();
        if (mUndecided != 0 && gpTavikSystem != nullptr) {
            gpTavikSystem->getStatusPage().countRefused(mBoardId, mCategory, mSubcategory, aReason, mUndecided);
            mUndecided = 0;
        }
        ZT_EXIT();
    }

private:
    unsigned int mBoardId;
    unsigned int mUndecided = 1;
    unsigned char mCategory;
    unsigned char mSubcategory;
};

// ---- Consolidation: one member a kind, each with its own notice and the identity of the last record it started ----

/// A holder for the name of a previous event. Never destroyed: callbacks may run while the process exits.
const ZTCPointer<ZTCWorldWideName>& sMakePrevName() {
    ZT_ENTRY();
    ZTCPointer<ZTCWorldWideName> lName(NEW ZTCWorldWideName());
    auto* lpHolder = NEW ZTCPointer<ZTCWorldWideName>(lName);
    if (lpHolder == nullptr) {
        ZT_EXIT();
        throw ZTCNoMemoryEx();
    }
    ZT_EXIT();
    return *lpHolder;
}

void sConsolidatePlogiEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                             bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing PLOGI event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    static const ZTCPointer<ZTCWorldWideName>& lPrevNodeName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcPlogiKind, {{lPrevPortName.get(), lPrevNodeName.get()}, {}}, acrEvent, aBoardId,
                     apData, aIsNew);
    ZT_EXIT();
}

void sConsolidatePrloEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                            bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing PRLO event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcPrloKind, {{lPrevPortName.get()}, {}}, acrEvent, aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateAdiscEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                             bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing ADISC event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    static const ZTCPointer<ZTCWorldWideName>& lPrevNodeName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcAdiscKind, {{lPrevPortName.get(), lPrevNodeName.get()}, {}}, acrEvent, aBoardId,
                     apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateLogoEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                            bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing LOGO event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    static const ZTCPointer<ZTCWorldWideName>& lPrevPayloadWwpn = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcLogoKind, {{lPrevPortName.get(), lPrevPayloadWwpn.get()}, {}}, acrEvent,
                     aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidatePbsyEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                            bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing PORTBUSY event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcPortBusyKind, {{lPrevPortName.get()}, {}}, acrEvent, aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateLsRjtEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                             bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing LsRjt Event Category=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    static unsigned int lPrevLsRjtOrgCmd = 0;
    consolidateEvent(*gpTavikSystem, gcLsRjtKind, {{lPrevPortName.get()}, {&lPrevLsRjtOrgCmd}}, acrEvent, aBoardId,
                     apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateFcprdChkErrEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                                   bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing FCPRDCHKERR event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    static unsigned int lPrevFcprdChkErrLun = 0;
    static unsigned int lPrevFcprdChkErrOpCode = 0;
    consolidateEvent(*gpTavikSystem, gcFcprdChkErrKind,
                     {{lPrevPortName.get()}, {&lPrevFcprdChkErrLun, &lPrevFcprdChkErrOpCode}}, acrEvent, aBoardId,
                     apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateLunResetEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                                bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing LUN RESET Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcLunResetKind, {{lPrevPortName.get()}, {}}, acrEvent, aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateTargetResetEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                                   bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing TGT RESET Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcTargetResetKind, {{lPrevPortName.get()}, {}}, acrEvent, aBoardId, apData,
                     aIsNew);
    ZT_EXIT();
}

void sConsolidateVarQDepthEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                                 bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing VARQDEPTH event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcVarQDepthKind, {{lPrevPortName.get()}, {}}, acrEvent, aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateQFullEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                             bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing QFULL event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcQFullKind, {{lPrevPortName.get()}, {}}, acrEvent, aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateDevBsyEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                              bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing DEVBSY event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    consolidateEvent(*gpTavikSystem, gcDevBsyKind, {{lPrevPortName.get()}, {}}, acrEvent, aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateCheckCondEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                                 bool aIsNew) ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Processing CHECKCOND event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    static const ZTCPointer<ZTCWorldWideName>& lPrevPortName = sMakePrevName();
    static unsigned int lPrevSensKey = 0;
    static unsigned int lPrevAsc = 0;
    consolidateEvent(*gpTavikSystem, gcCheckCondKind, {{lPrevPortName.get()}, {&lPrevSensKey, &lPrevAsc}}, acrEvent,
                     aBoardId, apData, aIsNew);
    ZT_EXIT();
}

void sConsolidateGenericEvents(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, bool aIsNew)
    ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    if (aIsNew) {
        TavikGeneric lRecord;
        TavikStore32(lRecord.Version.mBytes, EVENTDATA_VERSION);
        startScopeRecord(*gpTavikSystem, acrEvent, aBoardId, lRecord.Version.mBytes, sizeof lRecord, nullptr);
    } else {
        gpTavikSystem->incrementOccurences();
    }
    ZT_EXIT();
}

/// The member that consolidates the events of a pair: that of its kind, or the generic one where the kind has no data.
struct ZTSDispatch {
    unsigned char mCategory;
    unsigned char mSubcategory;
    const ZTSConsolidationKind* mpKind;  ///< null: the generic member
    void (*mpMember)(const ZTCPointer<ZTCScopeEvent>&, unsigned int, const void*, bool);
    const char* mpText;  ///< too short an event; for the generic member the notice in front
};

constexpr ZTSDispatch scDispatch[] = {
    {1, 0x01, &gcPlogiKind, sConsolidatePlogiEvents, "Not enough data in ELS PLOGI Event %u %u"},
    {1, 0x02, &gcPrloKind, sConsolidatePrloEvents, "Not enough data in ELS PRLO Event %u %u"},
    {1, 0x04, &gcAdiscKind, sConsolidateAdiscEvents, "Not enough data in ELS ADISC Event %u %u"},
    {1, 0x08, &gcLsRjtKind, sConsolidateLsRjtEvents, "Not enough data in ELS LSRJT Event %u %u"},
    {1, 0x10, &gcLogoKind, sConsolidateLogoEvents, "Not enough data in ELS LOGO Event %u %u"},
    {2, 0x01, nullptr, nullptr, "Processing Fabric BUSY event Cat=%u SubCat=%u"},
    {2, 0x02, &gcPortBusyKind, sConsolidatePbsyEvents, "Not enough event data in FABRIC PORT BUSY event%u %u"},
    {2, 0x04, &gcFcprdChkErrKind, sConsolidateFcprdChkErrEvents, "Not enough data in FCPRDCHECKERR event %u %u"},
    {4, 0x01, &gcQFullKind, sConsolidateQFullEvents, "Not enough data in SCSI Event %u %u"},
    {4, 0x02, &gcDevBsyKind, sConsolidateDevBsyEvents, "Not enough data in SCSI Event %u %u"},
    {4, 0x04, &gcCheckCondKind, sConsolidateCheckCondEvents, "Not enough data in SCSI CHECKCOND Event %u %u"},
    // A LUN reset that is too short is reported as a target reset.
    {4, 0x08, &gcLunResetKind, sConsolidateLunResetEvents, "Not enough data in SCSI TGTRESET Event %u %u"},
    {4, 0x10, &gcTargetResetKind, sConsolidateTargetResetEvents, "Not enough data in SCSI TGTRESET Event %u %u"},
    {4, 0x20, nullptr, nullptr, "Processing BUSRESET event Cat=%u SubCat=%u"},
    {4, 0x40, &gcVarQDepthKind, sConsolidateVarQDepthEvents, "Not enough data in SCSI VARQUEDEPTH Event %u %u"},
    {8, 0x01, nullptr, nullptr, "Processing PORTINTERR event Cat=%u SubCat=%u"},
    {8, 0x02, nullptr, nullptr, "Processing LINK event Cat=%u SubCat=%u"},
    {8, 0x04, nullptr, nullptr, "Processing TEMP event Cat=%u SubCat=%u"},
    {16, 0x01, nullptr, nullptr, "Processing ADAPTER ARRIVAL Event Cat=%u SubCat=%u"},
};

/// Every kind has its row, in the order of the table of kinds: under the pair it is delivered as, and with a member of
/// its own where its events carry data that a record keeps. RSCNs do not come here.
[[maybe_unused]] constexpr bool sHasEveryKindButRscn() {
    const ZTSDispatch* lpDispatch = std::begin(scDispatch);
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        if (lrKind.mDeliveredCategory == gcRscnCategory && lrKind.mDeliveredSubcategory == gcRscnSubcategory) {
            continue;
        }
        const bool lHasMember = lrKind.isScope() && lrKind.mDataSize != 0;
        if (lpDispatch == std::end(scDispatch) || lpDispatch->mCategory != lrKind.mDeliveredCategory ||
            lpDispatch->mSubcategory != lrKind.mDeliveredSubcategory || (lpDispatch->mpKind != nullptr) != lHasMember ||
            (lpDispatch->mpMember != nullptr) != lHasMember) {
            return false;
        }
        ++lpDispatch;
    }
    return lpDispatch == std::end(scDispatch);
}
#ifndef __SANITIZE_ADDRESS__  // with it g++ compares an address with null only when the program runs
static_assert(sHasEveryKindButRscn());
#endif

/// The rows of the table by slot; the last slot is that of what has none.
constexpr auto scDispatchBySlot = [] {
    std::array<const ZTSDispatch*, gcKindSlots + 1> lRows{};
    for (const ZTSDispatch& lrDispatch : scDispatch) {
        lRows[getKindSlot(lrDispatch.mCategory, lrDispatch.mSubcategory)] = &lrDispatch;
    }
    return lRows;
}();
static_assert(scDispatchBySlot[gcKindSlots] == nullptr);

/// Makes a kind that is never destroyed: callbacks may run while the process exits.
const ZTCPointer<ZTCScopeEvent>* sMakeKind(unsigned char aCategory, unsigned char aSubcategory) {
    ZT_ENTRY();
    const ZTCPointer<ZTCScopeEvent> lKind(NEW ZTCScopeEvent(aCategory, aSubcategory));
    const auto* lpKind = NEW ZTCPointer<ZTCScopeEvent>(lKind);
    if (lpKind == nullptr) {
        ZT_EXIT();
        throw ZTCNoMemoryEx();
    }
    ZT_EXIT();
    return lpKind;
}

/// The kind of the events of this slot. It never changes: all events and records of one pair share it. A pair without a
/// slot gets a new kind each time, in arHolder. Throws ZTCNoMemoryEx.
const ZTCPointer<ZTCScopeEvent>& sGetKind(unsigned int aSlot, unsigned char aCategory, unsigned char aSubcategory,
                                          ZTCPointer<ZTCScopeEvent>& arHolder)
    ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    static const ZTCPointer<ZTCScopeEvent>* spKinds[gcKindSlots];
    if (aSlot == gcKindSlots) {
        arHolder = ZTCPointer<ZTCScopeEvent>(NEW ZTCScopeEvent(aCategory, aSubcategory));
        ZT_EXIT();
        return arHolder;
    }
    if (spKinds[aSlot] == nullptr) {
        spKinds[aSlot] = sMakeKind(aCategory, aSubcategory);
    }
    ZT_EXIT();
    return *spKinds[aSlot];
}

int sConsolidateEvents(unsigned int aSlot, const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId,
                       const void* apData, unsigned int aLength, ZTCEventOutcome& arOutcome)
    ZT_REQUIRES(gpTavikSystem->getPrevDataLock()) {
    ZT_ENTRY();
    const unsigned int lCategory = acrEvent->getCategory();
    const unsigned int lSubcategory = acrEvent->getSubcategory();
    const ZTSDispatch* lpDispatch = scDispatchBySlot[aSlot];
    const bool lIsNew = !gpTavikSystem->isPrevScopeDataSet() ||
                        gpTavikSystem->getPrevScopeData()->getCategory() != lCategory ||
                        gpTavikSystem->getPrevScopeData()->getSubcategory() != lSubcategory ||
                        gpTavikSystem->getPrevBoardId() != aBoardId;
    if (lpDispatch != nullptr && lpDispatch->mpKind == nullptr) {
        ZT_LOG_NOTICE(lpDispatch->mpText, lCategory, lSubcategory);
        sConsolidateGenericEvents(acrEvent, aBoardId, lIsNew);
        arOutcome.noteConsolidated();
    } else if (lpDispatch != nullptr && aLength < lpDispatch->mpKind->mMinimumLength) {
        ZT_LOG_WARN(lpDispatch->mpText, lpDispatch->mpKind->mMinimumLength, aLength);
        arOutcome.refuse(ZTSR_TooShort);
    } else if (lpDispatch != nullptr) {
        lpDispatch->mpMember(acrEvent, aBoardId, apData, lIsNew);
        arOutcome.noteConsolidated();
    } else {
        arOutcome.refuse(ZTSR_UnknownKind);
        switch (lCategory) {
            case ZT_REG_ELS_EVENT:
                ZT_LOG_NOTICE("Unknown ELS Event subcategory = %u, ignored", lSubcategory);
                break;
            case ZT_REG_FABRIC_EVENT:
                ZT_LOG_NOTICE("Unknown Fabric Event subcategory=%u, ignored", lSubcategory);
                break;
            case ZT_REG_SCSI_EVENT:
                ZT_LOG_NOTICE("Unknown Scsi Event subcategory = %u, ignored", lSubcategory);
                break;
            case ZT_REG_BOARD_EVENT:
                ZT_LOG_NOTICE("Unknown Board Evt catgory=%u subcatgory=%u ignored", lCategory, lSubcategory);
                break;
            case ZT_REG_ADAPTER_EVENT:
                ZT_LOG_NOTICE("Unknown Adapter Evt catgory=%u subcatgory=%u ignored", lCategory, lSubcategory);
                break;
            default:
                ZT_LOG_NOTICE("Unknown Category = %u SubCategory = %u, ignored", lCategory, lSubcategory);
                break;
        }
    }
    ZT_EXIT();
    return 1;
}

// ---- RSCN: a payload of affected-address pages, each consolidated on its own ----

constexpr unsigned int scRscnHeaderSize = 4;
constexpr unsigned int scRscnPageSize = 4;
constexpr unsigned int scRscnMinimumLength = scRscnHeaderSize + scRscnPageSize;
constexpr unsigned int scRscnFormatMask = 0x03000000;  // 0: a single port's address
constexpr unsigned int scRscnAddressMask = 0x00FFFFFF;

/// False where the board has no record list any more: the page is not recorded then.
bool sConsolidateRscnEvent(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, unsigned int aFcId) {
    ZT_ENTRY();
    static unsigned int lPrevFcId = 0;
    ZT_LOG_NOTICE("Processing Rscn Event Cat=%u SubCat=%u", acrEvent->getCategory(), acrEvent->getSubcategory());
    bool lHasRecordList;
    {
        // One hold for both: no list goes away between the test and the record.
        const ZTCPrevDataHold lHold(*gpTavikSystem);
        lHasRecordList = gpTavikSystem->isRecordListExist(aBoardId);
        if (lHasRecordList && gpTavikSystem->isPrevScopeDataSet() &&
            gpTavikSystem->getPrevScopeData()->getCategory() == acrEvent->getCategory() &&
            gpTavikSystem->getPrevScopeData()->getSubcategory() == acrEvent->getSubcategory() &&
            gpTavikSystem->getPrevBoardId() == aBoardId && aFcId == lPrevFcId) {
            gpTavikSystem->incrementOccurences();
        } else if (lHasRecordList) {
            unsigned char lRecord[sizeof(TavikRscn)];
            TavikStore32(lRecord + offsetof(TavikRscn, Version), EVENTDATA_VERSION);
            TavikStore32(lRecord + offsetof(TavikRscn, FcId), aFcId);
            const bool lIsPortAddress = (aFcId & scRscnFormatMask) == 0;
            const ZTCTavikTarget* lpTarget =
                lIsPortAddress ? gpTavikSystem->findFcTarget(aFcId & scRscnAddressMask) : nullptr;
            ZTSRemotePortNames lNames;
            if (lpTarget != nullptr) {
                lNames = {*lpTarget->getWwpn(), *lpTarget->getWwnn()};
            }
            startScopeRecord(*gpTavikSystem, acrEvent, aBoardId, lRecord, sizeof lRecord,
                             lpTarget != nullptr ? &lNames : nullptr);
            lPrevFcId = aFcId;
        }
    }
    gpTavikSystem->getBell().ringIfDue();
    ZT_EXIT();
    return lHasRecordList;
}

/// False where the board has lost its record list: the pages from there on are not recorded.
bool sProcessRscnEvent(unsigned int aBoardId, const void* apData, unsigned int aLength,
                       const ZTCPointer<ZTCScopeEvent>& acrEvent, ZTCEventOutcome& arOutcome) {
    ZT_ENTRY();
    if (aLength < scRscnMinimumLength) {
        ZT_LOG_WARN("Not enough data in RSCN Event %u %u", scRscnMinimumLength, aLength);
        arOutcome.refuse(ZTSR_TooShort);
        ZT_EXIT();
        return true;
    }
    ZT_LOG_INFO("Got an RSCN event: datalength:%u", aLength);
    const auto* lpPayload = static_cast<const unsigned char*>(apData);
    const auto lPayloadLength = static_cast<std::uint16_t>(lpPayload[2] << 8 | lpPayload[3]);
    if (lPayloadLength == 0) {
        ZT_LOG_NOTICE("No Payload in RSCN Event");
        arOutcome.refuse(ZTSR_TooShort);
        ZT_EXIT();
        return true;
    }
    ZT_LOG_INFO("lPayloadLength = %hu", lPayloadLength);
    // The payload is as long as it says: the library delivers it whole, whatever length goes with it.
    const auto lPageCount = std::max<std::int16_t>(static_cast<std::int16_t>(lPayloadLength / scRscnPageSize - 1), 0);
    if (lPageCount == 0) {
        arOutcome.refuse(ZTSR_TooShort);
    } else {
        arOutcome.setEvents(static_cast<unsigned int>(lPageCount));
    }
    const unsigned char* lpPage = lpPayload + scRscnHeaderSize;
    bool lHasRecordList = true;
    for (std::int16_t lPage = 0; lPage < lPageCount && lHasRecordList; ++lPage) {
        lHasRecordList = sConsolidateRscnEvent(acrEvent, aBoardId, ClibNtohl(loadUnaligned<unsigned int>(lpPage)));
        if (lHasRecordList) {
            arOutcome.noteConsolidated();
        }
        lpPage += scRscnPageSize;
    }
    ZT_EXIT();
    return lHasRecordList;
}

// ---- Admission ----

void sProcessScopeEvent(const ZTCCallbackEventData* apEventData, ZTCEventOutcome& arOutcome) {
    ZT_ENTRY();
    const unsigned int lBoardId = apEventData->getBoardId();
    const auto lCategory = static_cast<unsigned char>(apEventData->getCategory());
    const auto lSubcategory = static_cast<unsigned char>(apEventData->getSubcategory());
    const bool lIsRscn = lCategory == gcRscnCategory && lSubcategory == gcRscnSubcategory;
    bool lHasRecordList;
    {
        // One hold for both: no list goes away between the test and the record.
        const ZTCPrevDataHold lHold(*gpTavikSystem);
        lHasRecordList = gpTavikSystem->isRecordListExist(lBoardId);
        if (lHasRecordList && !lIsRscn) {
            const unsigned int lSlot = getKindSlot(lCategory, lSubcategory);
            ZTCPointer<ZTCScopeEvent> lUnknown;
            try {
                sConsolidateEvents(lSlot, sGetKind(lSlot, lCategory, lSubcategory, lUnknown), lBoardId,
                                   apEventData->getEventData(), apEventData->getEventDataLength(), arOutcome);
            } catch (const ZTCNotFoundEx&) {  // the event's port or board is gone: there is nothing to say about it
                arOutcome.refuse(ZTSR_Failed);
            }
        }
    }
    gpTavikSystem->getBell().ringIfDue();
    if (lHasRecordList && lIsRscn) {
        static const ZTCPointer<ZTCScopeEvent>& lRscnKind = *sMakeKind(gcRscnCategory, gcRscnSubcategory);
        // Each page tests for the list again, in a hold of its own.
        lHasRecordList = sProcessRscnEvent(lBoardId, apEventData->getEventData(), apEventData->getEventDataLength(),
                                           lRscnKind, arOutcome);
    }
    if (!lHasRecordList) {
        arOutcome.refuse(ZTSR_NoList);
        ZT_LOG_ERR("Bad boardid %d in event has been recieved. Event: wwn %s; cat %d; subcat %d.  Skip event!",
                   static_cast<int>(lBoardId), ZTCWorldWideName(apEventData->getWwpn()).getString().get(),
                   static_cast<int>(apEventData->getCategory()), static_cast<int>(apEventData->getSubcategory()));
    }
    ZT_EXIT();
}

/// Why an event is not admitted, as the text of a notice that is given the board id; null where it is admitted.
inline const char* sFindRefusal(unsigned int aBoardId, const char* apBadBoardText, ZTCEventOutcome& arOutcome) {
    ZT_ENTRY();
    if (!mDoScopeCollection) {
        arOutcome.refuse(ZTSR_CollectionOff);
        ZT_EXIT();
        return "Ignoring the event as Scope data Collection is not enabled.";
    }
    const char* lpRefusal = nullptr;
    // Before the total is read: a retrieval in between makes the next refusal ring again.
    const std::uint64_t lRetrievals = gpTavikSystem->getBell().getRetrievals();
    if (gpTavikSystem->isTotalLimitOnScopeDataReached()) {
        lpRefusal = "Ignoring the event as the limit on the total Event Data";
        arOutcome.refuse(ZTSR_TotalLimit);
        gpTavikSystem->getBell().ringForRefusal(lRetrievals);
    } else if (!gpTavikSystem->isFcInitiatorExist(aBoardId)) {
        lpRefusal = apBadBoardText;
        arOutcome.refuse(ZTSR_UnknownBoard);
    }
    ZT_EXIT();
    return lpRefusal;
}

/// The text of the exception that is being handled.
const char* sGetExceptionText() {
    ZT_ENTRY();
    const char* lpText;
    try {
        std::rethrow_exception(std::current_exception());
    } catch (const ZTCException& lrException) {
        lpText = lrException.what();
    } catch (const std::exception& lrException) {
        lpText = lrException.what();
    } catch (...) {
        lpText = "unknown exception";
    }
    ZT_EXIT();
    return lpText;
}

/// The event-kind data of an event and their length; null and 0 where it has none.
struct ZTSEventBytes {
    unsigned char* mpData;
    unsigned int mLength;
};

ZTSEventBytes sTakeEventBytes(const void* apPayload, std::uint64_t aEventSize) {
    ZT_ENTRY();
    void* lpData;
    std::memcpy(&lpData, static_cast<const unsigned char*>(apPayload) + offsetof(ZT_event_payload, zt_payload_data),
                sizeof lpData);
    const auto lSize = static_cast<std::uint32_t>(aEventSize);
    ZT_EXIT();
    return {static_cast<unsigned char*>(lpData), lSize > ZT_EVENT_HEADER_SIZE ? lSize - ZT_EVENT_HEADER_SIZE : 0};
}

const unsigned char* sGetInitiatorWwpn(unsigned int aBoardId) {
    ZT_ENTRY();
    const unsigned char* lpWwpn = gpTavikSystem->getFcInitiator(aBoardId)->getWwpn()->getBytes();
    ZT_EXIT();
    return lpWwpn;
}

}  // namespace

void ScopeCb_Generic(unsigned int aBoardId, HBA_wwn aWwn, unsigned int aCategory, unsigned int aSubcategory, void*,
                     ZT_event* apEvent) {
    ZT_ENTRY();
    ZTCEventOutcome lOutcome(aBoardId, aCategory, aSubcategory);
    try {
        ZT_TRACE_MSG("Invoking Generic callback with boardId: %u, hba wwn: %s, Cat: %u, subCat: %u", aBoardId,
                     ZTCWorldWideName(aWwn.wwn).getString().get(), aCategory, aSubcategory);
        // An unknown board is reported in the words of the link callback.
        const char* lpRefusal =
            sFindRefusal(aBoardId, "Ignoring the KpmLink event callback as boardid %d is bad", lOutcome);
        if (lpRefusal != nullptr) {
            ZT_LOG_NOTICE(lpRefusal, aBoardId);
        } else {
            ZTSEventBytes lBytes{nullptr, 0};
            if (apEvent != nullptr) {
                ZT_event lEvent;
                std::memcpy(&lEvent, apEvent, sizeof lEvent);
                if (lEvent.zt_evt_payload != nullptr) {
                    lBytes = sTakeEventBytes(lEvent.zt_evt_payload, lEvent.zt_evt_size);
                    ZT_TRACE_MSG("Data = %p", static_cast<void*>(lBytes.mpData));
                }
            }
            const ZTCCallbackEventData lEventData(aBoardId, aWwn.wwn, aCategory, aSubcategory, lBytes.mpData,
                                                  lBytes.mLength);
            sProcessScopeEvent(&lEventData, lOutcome);
        }
    } catch (...) {
        lOutcome.refuse(ZTSR_Failed);
        ZT_LOG_ERR("Error: %s, processing event callback", sGetExceptionText());
    }
    ZT_EXIT();
}

void ScopeCb_KpmTemp(unsigned int aBoardId, unsigned int, unsigned int) {
    ZT_ENTRY();
    ZTCEventOutcome lOutcome(aBoardId, gcTemperatureCategory, gcTemperatureSubcategory);
    try {
        ZT_TRACE_MSG("Invoking TEMPERATURE callback with boardId: %u", aBoardId);
        const char* lpRefusal =
            sFindRefusal(aBoardId, "Ignoring the KpmTemp event callback as boardid %d is bad", lOutcome);
        if (lpRefusal != nullptr) {
            ZT_LOG_NOTICE(lpRefusal, aBoardId);
        } else {
            const ZTCCallbackEventData lEventData(aBoardId, sGetInitiatorWwpn(aBoardId), gcTemperatureCategory,
                                                  gcTemperatureSubcategory, nullptr, 0);
            sProcessScopeEvent(&lEventData, lOutcome);
        }
    } catch (...) {
        lOutcome.refuse(ZTSR_Failed);
        ZT_LOG_ERR("Error: %s, processing event callback", sGetExceptionText());
    }
    ZT_EXIT();
}

void ScopeCb_KpmLink(unsigned int aBoardId, void* apLinkInfo) {
    ZT_ENTRY();
    ZTCEventOutcome lOutcome(aBoardId, gcLinkCategory, gcLinkSubcategory);
    try {
        ZT_TRACE_MSG("Invoking LINK callback with boardId: %u", aBoardId);
        const char* lpRefusal =
            sFindRefusal(aBoardId, "Ignoring the KpmLink event callback as boardid %d is bad", lOutcome);
        if (lpRefusal != nullptr) {
            ZT_LOG_NOTICE(lpRefusal, aBoardId);
        } else {
            const unsigned char* lpWwpn = nullptr;
            if (apLinkInfo != nullptr) {
                lpWwpn = static_cast<const unsigned char*>(apLinkInfo) + offsetof(LINKINFO, a_wwpName);
            }
            const ZTCCallbackEventData lEventData(aBoardId, lpWwpn, gcLinkCategory, gcLinkSubcategory, nullptr, 0);
            sProcessScopeEvent(&lEventData, lOutcome);
        }
    } catch (...) {
        lOutcome.refuse(ZTSR_Failed);
        ZT_LOG_ERR("Error: %s, processing event callback", sGetExceptionText());
    }
    ZT_EXIT();
}

void ScopeCb_KpmRscn(unsigned int aBoardId, void* apData, unsigned int aLength) {
    ZT_ENTRY();
    ZTCEventOutcome lOutcome(aBoardId, gcRscnCategory, gcRscnSubcategory);
    try {
        ZT_TRACE_MSG("Invoking RSCN callback with boardId: %u", aBoardId);
        const char* lpRefusal =
            sFindRefusal(aBoardId, "Ignoring the KpmRscn event callback as boardid %d is bad", lOutcome);
        if (lpRefusal != nullptr) {
            ZT_LOG_NOTICE(lpRefusal, aBoardId);
        } else {
            const ZTCCallbackEventData lEventData(aBoardId, sGetInitiatorWwpn(aBoardId), gcRscnCategory,
                                                  gcRscnSubcategory, static_cast<unsigned char*>(apData), aLength);
            sProcessScopeEvent(&lEventData, lOutcome);
        }
    } catch (...) {
        lOutcome.refuse(ZTSR_Failed);
        ZT_LOG_ERR("Error: %s, processing event callback", sGetExceptionText());
    }
    ZT_EXIT();
}
