/// A local adapter port: an initiator.
#ifndef TAVIK_INCLUDE_TAVIKINITIATOR_H
#define TAVIK_INCLUDE_TAVIKINITIATOR_H

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Map.h"
#include "common/include/Pointer.h"
#include "sensor/agentcommon/include/ScopeEvent.h"
#include "sensor/agentcommon/include/WorldWideName.h"

/// Key form of an event kind to the handle of its registration; a handle of 0 means that none is live.
using ZTCScopeEventRegMap = ZTCMap<unsigned short, unsigned int>;

/// The names and the board id never change and may be read by any thread; the registrations belong to the command
/// thread.
class ZTCTavikInitiator {
public:
    /// Shares the two names.
    ZTCTavikInitiator(unsigned int aBoardId, const ZTCPointer<ZTCWorldWideName>& acrWwnn,
                      const ZTCPointer<ZTCWorldWideName>& acrWwpn)
        : mBoardId(aBoardId), mWwnn(acrWwnn), mWwpn(acrWwpn) {
        ZT_ENTRY();
        ZT_EXIT();
    }
    virtual ~ZTCTavikInitiator() = default;

    /// The adapter's index as the library reports it.
    unsigned int getBoardId() const { return mBoardId; }
    const ZTCPointer<ZTCWorldWideName>& getWwnn() const { return mWwnn; }
    const ZTCPointer<ZTCWorldWideName>& getWwpn() const { return mWwpn; }

    /// The node name, a dot and the port name. The sensor knows the record list of a board by it.
    ZTCString getKey() const {
        ZT_ENTRY();
        char lKey[ZTCWorldWideName::gcStringLength + 1 + ZTCWorldWideName::gcStringLength];
        char* lpEnd = mWwnn->storeString(lKey);
        *lpEnd++ = '.';
        lpEnd = mWwpn->storeString(lpEnd);
        ZT_EXIT();
        return ZTCString(lKey, static_cast<std::size_t>(lpEnd - lKey));
    }

    /// The registrations in the order of their key forms.
    auto r_begin() const { return mRegMap.begin(); }
    auto r_end() const { return mRegMap.end(); }

    void cleanRegs() {
        ZT_ENTRY();
        mRegMap.clear();
        ZT_EXIT();
    }

    /// Notes a registration. A kind that is registered already gets the new handle; the old one is not unregistered.
    void addRegEvent(const ZTCPointer<ZTCScopeEvent>& acrEvent, unsigned int aHandle) {
        ZT_ENTRY();
        const unsigned short lKeyForm = acrEvent->getKeyForm();
        try {
            mRegMap.insert(lKeyForm, aHandle);
        } catch (const ZTCExistsEx&) {
            ZT_LOG_ERR("addRegEvent FAILED due duplicated keyform %d has been detected", lKeyForm);
            mRegMap.get(lKeyForm) = aHandle;
        }
        ZT_EXIT();
    }

private:
    unsigned int mBoardId;
    ZTCPointer<ZTCWorldWideName> mWwnn;
    ZTCPointer<ZTCWorldWideName> mWwpn;
    ZTCScopeEventRegMap mRegMap;
};

#endif
