#include "tavik/include/EventConsolidation.h"

#include <cstring>

#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "sensor/agentcommon/include/EventDataRecords.h"
#include "tavik/include/EventDataBytes.h"

namespace {

constexpr unsigned int gcAllLuns = 0xFFFFFFFF;
constexpr unsigned int gcBitsPerField = gcBitFieldSize * 8;

unsigned int sReadNumber(const unsigned char* apPayload, unsigned int aOffset) {
    unsigned int lNumber;
    std::memcpy(&lNumber, apPayload + aOffset, sizeof lNumber);
    return lNumber;
}

bool sIsSameIdentity(const ZTSConsolidationKind& acrKind, const ZTSPrevIdentity& acrPrev,
                     const unsigned char* apPayload) {
    for (unsigned lIndex = 0; acrKind.mIdentityNames[lIndex] != 0; ++lIndex) {
        if (!(*acrPrev.mpNames[lIndex] == ZTCWorldWideName(apPayload + acrKind.mIdentityNames[lIndex]))) {
            return false;
        }
    }
    for (unsigned lIndex = 0; acrKind.mIdentityNumbers[lIndex] != 0; ++lIndex) {
        if (*acrPrev.mpNumbers[lIndex] != sReadNumber(apPayload, acrKind.mIdentityNumbers[lIndex])) {
            return false;
        }
    }
    return true;
}

void sNoteIdentity(const ZTSConsolidationKind& acrKind, const ZTSPrevIdentity& acrPrev,
                   const unsigned char* apPayload) noexcept {
    for (unsigned lIndex = 0; acrKind.mIdentityNames[lIndex] != 0; ++lIndex) {
        *acrPrev.mpNames[lIndex] = ZTCWorldWideName(apPayload + acrKind.mIdentityNames[lIndex]);
    }
    for (unsigned lIndex = 0; acrKind.mIdentityNumbers[lIndex] != 0; ++lIndex) {
        *acrPrev.mpNumbers[lIndex] = sReadNumber(apPayload, acrKind.mIdentityNumbers[lIndex]);
    }
}

void sCopyFields(const ZTSFieldCopy* apFields, const unsigned char* apPayload, unsigned char* apRecord) {
    for (; apFields->mSize != 0; ++apFields) {
        unsigned char* lpTo = apRecord + apFields->mRecordOffset;
        if (apFields->mSize == ZTCWorldWideName::gcLength) {
            std::memcpy(lpTo, apPayload + apFields->mPayloadOffset, ZTCWorldWideName::gcLength);
        } else {
            TavikStore32(lpTo, sReadNumber(apPayload, apFields->mPayloadOffset));
        }
    }
}

void sSetBits(const ZTSConsolidationKind& acrKind, const unsigned char* apPayload, unsigned char* apRecord) {
    for (const ZTSBitFieldCopy* lpField = acrKind.mBitFields; lpField->mFieldOffset != 0; ++lpField) {
        const unsigned int lNumber = sReadNumber(apPayload, lpField->mPayloadOffset);
        if (lpField->mHasAll && lNumber == gcAllLuns) {
            TavikSet_AllBitField(apRecord + lpField->mFieldOffset, gcBitFieldSize);
        } else if (lNumber < gcBitsPerField) {
            TavikSet_BitField(apRecord + lpField->mFieldOffset, lNumber);
        }
    }
}

void sFillRecord(const ZTSConsolidationKind& acrKind, const unsigned char* apPayload, unsigned char* apRecord) {
    TavikStore32(apRecord, EVENTDATA_VERSION);
    sCopyFields(acrKind.mRecordFields, apPayload, apRecord);
    for (const ZTSBitFieldCopy* lpField = acrKind.mBitFields; lpField->mFieldOffset != 0; ++lpField) {
        TavikStore32(apRecord + lpField->mLengthOffset, gcBitsPerField);
    }
    sSetBits(acrKind, apPayload, apRecord);
}

/// True where the event went into the pending record, whose identity it has.
bool sContinue(ZTCTavikSystem& arSystem, const ZTSConsolidationKind& acrKind, const unsigned char* apPayload)
    ZT_REQUIRES(arSystem.getPrevDataLock()) {
    switch (acrKind.mContinuation) {
        case ZTCN_Count:
            arSystem.incrementOccurences();
            return true;
        case ZTCN_SetBits:
            sSetBits(acrKind, apPayload, arSystem.getPrevScopeData()->getEventData());
            arSystem.incrementOccurences();
            return true;
        case ZTCN_Append:
            if (arSystem.canAddEventDataPerRecord(acrKind.mAppendedSize)) {
                unsigned char lAppended[gcMaxAppendedSize] = {};
                sCopyFields(acrKind.mAppendedFields, apPayload, lAppended);
                arSystem.appendEventData(lAppended, acrKind.mAppendedSize);
                return true;
            }
            break;
    }
    return false;
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
