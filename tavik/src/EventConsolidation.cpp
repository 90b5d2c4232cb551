#include "tavik/include/EventConsolidation.h"

#include <cstring>

#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "common/include/Unaligned.h"
#include "sensor/agentcommon/include/EventDataRecords.h"
#include "tavik/include/EventDataBytes.h"

namespace {

constexpr unsigned int scAllLuns = 0xFFFFFFFF;
constexpr unsigned int scBitsPerField = gcBitFieldSize * 8;

bool sIsSameIdentity(const ZTSConsolidationKind& acrKind, const ZTSPrevIdentity& acrPrev,
                     const unsigned char* apPayload) {
    ZT_ENTRY();
    bool lIsSame = true;
    for (unsigned lIndex = 0; lIsSame && acrKind.mIdentityNames[lIndex] != 0; ++lIndex) {
        lIsSame = *acrPrev.mpNames[lIndex] == ZTCWorldWideName(apPayload + acrKind.mIdentityNames[lIndex]);
    }
    for (unsigned lIndex = 0; lIsSame && acrKind.mIdentityNumbers[lIndex] != 0; ++lIndex) {
        lIsSame =
            *acrPrev.mpNumbers[lIndex] == loadUnaligned<unsigned int>(apPayload + acrKind.mIdentityNumbers[lIndex]);
    }
    ZT_EXIT();
    return lIsSame;
}

void sNoteIdentity(const ZTSConsolidationKind& acrKind, const ZTSPrevIdentity& acrPrev,
                   const unsigned char* apPayload) noexcept {
    ZT_ENTRY();
    for (unsigned lIndex = 0; acrKind.mIdentityNames[lIndex] != 0; ++lIndex) {
        *acrPrev.mpNames[lIndex] = ZTCWorldWideName(apPayload + acrKind.mIdentityNames[lIndex]);
    }
    for (unsigned lIndex = 0; acrKind.mIdentityNumbers[lIndex] != 0; ++lIndex) {
        *acrPrev.mpNumbers[lIndex] = loadUnaligned<unsigned int>(apPayload + acrKind.mIdentityNumbers[lIndex]);
    }
    ZT_EXIT();
}

inline void sCopyFields(const ZTSFieldCopy* apFields, const unsigned char* apPayload, unsigned char* apRecord) {
    ZT_ENTRY();
    for (; apFields->mSize != 0; ++apFields) {
        unsigned char* lpTo = apRecord + apFields->mRecordOffset;
        if (apFields->mSize == ZTCWorldWideName::gcLength) {
            std::memcpy(lpTo, apPayload + apFields->mPayloadOffset, ZTCWorldWideName::gcLength);
        } else {
            TavikStore32(lpTo, loadUnaligned<unsigned int>(apPayload + apFields->mPayloadOffset));
        }
    }
    ZT_EXIT();
}

inline void sSetBits(const ZTSConsolidationKind& acrKind, const unsigned char* apPayload, unsigned char* apRecord) {
    ZT_ENTRY();
    for (const ZTSBitFieldCopy* lpField = acrKind.mBitFields; lpField->mFieldOffset != 0; ++lpField) {
        const unsigned int lNumber = loadUnaligned<unsigned int>(apPayload + lpField->mPayloadOffset);
        if (lpField->mHasAll && lNumber == scAllLuns) {
            TavikSet_AllBitField(apRecord + lpField->mFieldOffset, gcBitFieldSize);
        } else if (lNumber < scBitsPerField) {
            TavikSet_BitField(apRecord + lpField->mFieldOffset, lNumber);
        }
    }
    ZT_EXIT();
}

void sFillRecord(const ZTSConsolidationKind& acrKind, const unsigned char* apPayload, unsigned char* apRecord) {
    ZT_ENTRY();
    TavikStore32(apRecord, EVENTDATA_VERSION);
    sCopyFields(acrKind.mRecordFields, apPayload, apRecord);
    for (const ZTSBitFieldCopy* lpField = acrKind.mBitFields; lpField->mFieldOffset != 0; ++lpField) {
        TavikStore32(apRecord + lpField->mLengthOffset, scBitsPerField);
    }
    sSetBits(acrKind, apPayload, apRecord);
    ZT_EXIT();
}

/// True where the event went into the pending record, whose identity it has.
bool sContinue(ZTCTavikSystem& arSystem, const ZTSConsolidationKind& acrKind, const unsigned char* apPayload)
    ZT_REQUIRES(arSystem.getPrevDataLock()) {
    ZT_ENTRY();
    bool lIsContinued = true;
    switch (acrKind.mContinuation) {
        case ZTCN_Count:
            arSystem.incrementOccurences();
            break;
        case ZTCN_SetBits:
            sSetBits(acrKind, apPayload, arSystem.getPrevScopeData()->getEventData());
            arSystem.incrementOccurences();
            break;
        case ZTCN_Append:
            lIsContinued = arSystem.canAddEventDataPerRecord(acrKind.mAppendedSize);
            if (lIsContinued) {
                unsigned char lAppended[gcMaxAppendedSize] = {};
                sCopyFields(acrKind.mAppendedFields, apPayload, lAppended);
                arSystem.appendEventData(lAppended, acrKind.mAppendedSize);
            }
            break;
    }
    ZT_EXIT();
    return lIsContinued;
}

}  // namespace

void consolidateEvent(ZTCTavikSystem& arSystem, const ZTSConsolidationKind& acrKind, const ZTSPrevIdentity& acrPrev,
                      const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData,
                      bool aIsNew) {
    ZT_ENTRY();
    const auto* lpPayload = static_cast<const unsigned char*>(apData);
    const bool lMatches = !aIsNew && sIsSameIdentity(acrKind, acrPrev, lpPayload);
    if (!lMatches || !sContinue(arSystem, acrKind, lpPayload)) {
        unsigned char lRecord[gcMaxRecordDataSize] = {};
        sFillRecord(acrKind, lpPayload, lRecord);
        startScopeRecord(arSystem, acrEvent, aBoardId, lRecord, acrKind.mRecordSize,
                         arSystem.findWwpnNames(ZTCWorldWideName(lpPayload + gcRemotePortOffset).getKey()));
        // Only now: an identity without its record would let the next event extend the wrong one.
        sNoteIdentity(acrKind, acrPrev, lpPayload);
    }
    ZT_EXIT();
}

void startScopeRecord(ZTCTavikSystem& arSystem, const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId,
                      const unsigned char* apRecord, unsigned int aSize, const ZTSRemotePortNames* apNames) {
    ZT_ENTRY();
    const unsigned int lCapacity = arSystem.getMaxEventDataSize();
    ZTCPointer<ZTCScopeData> lData =
        apNames != nullptr
            ? ZTCPointer<ZTCScopeData>::make(acrEvent, apRecord, aSize, lCapacity, apNames->mWwpn, apNames->mWwnn)
            : ZTCPointer<ZTCScopeData>::make(acrEvent, apRecord, aSize, lCapacity);
    arSystem.setPrevScopeData(aBoardId, lData);
    ZT_EXIT();
}
