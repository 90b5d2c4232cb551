/// One event ready to be delivered, and the two sources it is made from: the lines of a scenario and its storms. Pure
/// functions of their arguments, so that the same occurrence is the same event on whichever thread it is made.
#ifndef LIBKPM_SIM_SRC_DELIVERY_H
#define LIBKPM_SIM_SRC_DELIVERY_H

#include <cstddef>
#include <cstdint>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "libkpm/sim/src/Scenario.h"

struct ZTSSimDelivery {
    std::size_t mKind = 0;
    std::uint32_t mBoard = 0;      ///< whose registration is used
    std::uint32_t mToldBoard = 0;  ///< the board that the callback gets
    HBA_wwn mLocal{};
    std::uint32_t mCategory = 0;
    std::uint32_t mSubcategory = 0;
    bool mIsPayloadNull = false;
    bool mIsDataNull = false;
    std::uint64_t mEventSize = 0;     ///< zt_evt_size
    std::uint32_t mLength = 0;        ///< RSCN: length argument
    std::vector<std::uint8_t> mData;  ///< at least as many bytes as the event or the RSCN claims to have
};

/// Occurrence `aOccurrence` of a line on a board of the scenario. `aLinkTag` numbers the board's link events from 1
/// (used for that kind only).
ZTSSimDelivery makeSimDelivery(const ZTSSimScenario& acrScenario, const ZTSSimEvent& acrEvent, std::uint32_t aBoard,
                               std::uint64_t aOccurrence, std::uint32_t aLinkTag);

/// Event `aNumber` of a storm as a line of its own with one occurrence. Depends on the storm's seed, kinds, boards,
/// ports and LUNs only.
ZTSSimEvent drawSimEvent(const ZTSSimStorm& acrStorm, std::uint64_t aNumber);

/// The pages that an agent finds in an RSCN of this length argument and these data; 0 for other kinds.
std::uint32_t countSimPages(const ZTSSimDelivery& acrDelivery);

#endif
