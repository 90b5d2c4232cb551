/// Calls the agent's callbacks with what a delivery holds, and takes it back afterwards.
#ifndef LIBKPM_SIM_SRC_LENDING_H
#define LIBKPM_SIM_SRC_LENDING_H

#include "libkpm/common/include/Registry.h"
#include "libkpm/sim/src/Delivery.h"

/// Calls the callback that was registered for the delivery's kind. What the callback is lent lives for the call alone
/// and is overwritten then. It lies at odd addresses where `aIsOdd` says so. To be called with no lock held.
void lendSimDelivery(const ZTSLibraryRegistration& acrRegistration, const ZTSSimDelivery& acrDelivery, bool aIsOdd);

#endif
