/// The three ways in which an event continues the pending record or starts a new one, driven by the table of kinds.
///
/// Everything here runs under the system's previous-data lock.
#ifndef TAVIK_INCLUDE_EVENTCONSOLIDATION_H
#define TAVIK_INCLUDE_EVENTCONSOLIDATION_H

#include "common/include/Pointer.h"
#include "common/include/ThreadAnnotations.h"
#include "sensor/agentcommon/include/ScopeData.h"
#include "sensor/agentcommon/include/ScopeEvent.h"
#include "sensor/agentcommon/include/WorldWideName.h"
#include "tavik/include/ConsolidationKinds.h"
#include "tavik/include/TavikSystem.h"
#include "tavik/include/TavikTargetIndex.h"

/// Points to the system's members with the identity of the last record of a kind, in the order of the kind's row. Names
/// are made once and then assigned in place, so that noting a new identity cannot fail.
struct ZTSPrevIdentity {
    ZTCWorldWideName* mpNames[gcMaxIdentityNames];
    unsigned int* mpNumbers[gcMaxIdentityNumbers];
};

/// Continues the pending record with the event, or makes it a new pending record and notes its identity. apData holds
/// at least the kind's minimum length, at any alignment. aIsNew: the pending record is of another kind or board, or
/// there is none. Throws ZTCNoMemoryEx; record, identity and running total are then as they were.
void consolidateEvent(ZTCTavikSystem& arSystem, const ZTSConsolidationKind& acrKind, const ZTSPrevIdentity& acrPrev,
                      const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId, const void* apData, bool aIsNew)
    ZT_REQUIRES(arSystem.getPrevDataLock());

/// Starts a new pending record with these bytes, which gets the remote port's names where apNames is not null.
void startScopeRecord(ZTCTavikSystem& arSystem, const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aBoardId,
                      const unsigned char* apRecord, unsigned int aSize, const ZTSRemotePortNames* apNames)
    ZT_REQUIRES(arSystem.getPrevDataLock());

#endif
