/// The catalogue of all event kinds that the agent can collect.
#ifndef TAVIK_INCLUDE_TAVIKEVENTCATALOGUE_H
#define TAVIK_INCLUDE_TAVIKEVENTCATALOGUE_H

#include "common/include/List.h"
#include "common/include/Map.h"
#include "common/include/Pointer.h"
#include "sensor/agentcommon/include/ScopeEvent.h"

/// Headroom that a holder of all kinds may plan for; nothing enforces it.
inline constexpr unsigned MAX_SCOPE_EVENTS = 25;

using ZTCScopeEventMap = ZTCMap<unsigned short, ZTCPointer<ZTCScopeEvent>>;
using ZTCScopeEventSet = ZTCList<ZTCPointer<ZTCScopeEvent>>;

/// Read-only once constructed, so that any thread may look kinds up.
class ZTCTavikEventCatalogue {
public:
    /// Inserts the twenty kinds. Throws ZTCNoMemoryEx.
    ZTCTavikEventCatalogue();
    virtual ~ZTCTavikEventCatalogue() = default;

    /// Throws ZTCExistsEx where the catalogue has a kind of the same key form; the list then holds the duplicate.
    void insertIntoCatalogue(const ZTCPointer<ZTCScopeEvent>& acrEvent);

    /// The kind of a key form. Throws ZTCNotFoundEx.
    const ZTCPointer<ZTCScopeEvent>& get(unsigned short aKeyForm) const { return mEventMap.get(aKeyForm); }

    /// All kinds in the order of their insertion.
    const ZTCScopeEventSet& getAll() const { return mEventSet; }

private:
    ZTCScopeEventMap mEventMap;
    ZTCScopeEventSet mEventSet;
};

#endif
