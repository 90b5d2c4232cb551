/// What a collector does with the files that it finds in the spool folder. Pure: no file is touched.
#ifndef SENSOR_COLLECTOR_INCLUDE_SPOOLRECOVERY_H
#define SENSOR_COLLECTOR_INCLUDE_SPOOLRECOVERY_H

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "sensor/collector/include/Spool.h"

/// Every file of the folder is in one place of the plan, exactly once.
struct ZTSSpoolPlan {
    std::vector<ZTSSpoolEntry> mWaiting;   ///< frames and torn files, to be stored in this order
    std::optional<ZTSSpoolEntry> mResume;  ///< the `.part` of the given start that goes on
    std::vector<ZTSSpoolEntry> mTear;      ///< `.part` files that will never be whole
    std::uint64_t mNextNumber = 1;         ///< above every number in the folder
};

/// @param acrGeneration  of the agent whose response FIFO is there to be read; empty: of none
ZTSSpoolPlan planSpoolRecovery(std::span<const ZTSSpoolEntry> aEntries, const std::string& acrGeneration);

/// What the bytes of a frame or torn file are.
struct ZTSSpooledBody {
    std::span<const std::uint8_t> mBody;  ///< the response's body, as far as it is there
    std::uint64_t mMissing = 0;           ///< bytes of the body that are not there
    std::uint64_t mBehind = 0;            ///< bytes behind the frame, which belong to nothing
    bool mHasLength = false;              ///< the four bytes of the length are there

    bool isWhole() const { return mHasLength && mMissing == 0 && mBehind == 0; }
};

/// Never fails, whatever the bytes are.
ZTSSpooledBody readSpooledBody(std::span<const std::uint8_t> aBytes);

#endif
