/// A remote port that the sensor registered: a target.
#ifndef TAVIK_INCLUDE_TAVIKTARGET_H
#define TAVIK_INCLUDE_TAVIKTARGET_H

#include "common/include/Log.h"
#include "common/include/Pointer.h"
#include "sensor/agentcommon/include/WorldWideName.h"

/// Never changed after construction, so it may be read by any thread.
class ZTCTavikTarget {
public:
    /// Shares the two names.
    ZTCTavikTarget(const ZTCPointer<ZTCWorldWideName>& acrWwnn, const ZTCPointer<ZTCWorldWideName>& acrWwpn,
                   unsigned int aFcId)
        : mWwnn(acrWwnn), mWwpn(acrWwpn), mFcId(aFcId) {
        ZT_ENTRY();
        ZT_EXIT();
    }
    virtual ~ZTCTavikTarget() = default;

    const ZTCPointer<ZTCWorldWideName>& getWwnn() const { return mWwnn; }
    const ZTCPointer<ZTCWorldWideName>& getWwpn() const { return mWwpn; }

    /// The port's Fibre Channel address.
    unsigned int getFcId() const { return mFcId; }

private:
    ZTCPointer<ZTCWorldWideName> mWwnn;
    ZTCPointer<ZTCWorldWideName> mWwpn;
    unsigned int mFcId;
};

#endif
