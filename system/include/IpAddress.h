/// The address of a host.

#ifndef SYSTEM_INCLUDE_IPADDRESS_H
#define SYSTEM_INCLUDE_IPADDRESS_H

#include "common/include/String.h"

/// Never changes after construction. The text is not examined.
class ZTCIpAddress {
public:
    explicit ZTCIpAddress(const ZTCString& acrText) : mText(acrText) {}

    ZTCString getText() const { return mText; }

private:
    const ZTCString mText;
};

#endif
