/// Moves one frame from the response FIFO into a `.part`, with splice(2): see Spool.h for the reasons.
#ifndef SENSOR_COLLECTOR_INCLUDE_FRAMERECEPTION_H
#define SENSOR_COLLECTOR_INCLUDE_FRAMERECEPTION_H

#include <cstdint>
#include <optional>

#include "sensor/collector/include/Spool.h"

enum ZTEReception : std::uint8_t {
    ZTRX_Waiting,  ///< the FIFO is empty
    ZTRX_Whole,    ///< the frame is complete
    ZTRX_HungUp    ///< the FIFO is empty and has no writer
};

struct ZTSReceptionResult {
    ZTEReception mReception = ZTRX_Waiting;
    std::uint64_t mMoved = 0;  ///< bytes that this call moved
};

/// Moves what is in the FIFO, up to the frame's last byte and none behind it. Goes on where an earlier call, or an
/// earlier process, stopped. Never waits.
///
/// @param aFifo  read end. It need not be non-blocking.
///
/// Throws ZTCSpoolTroubleEx where the disk refuses; the FIFO keeps the bytes then. arPart's size is right in any case.
ZTSReceptionResult receiveFrame(ZTCSpool& arSpool, ZTSSpoolPart& arPart, int aFifo);

/// Bytes of the whole frame, the four of the length included; empty while these have not all come.
std::optional<std::uint64_t> getFrameSize(const ZTSSpoolPart& acrPart);

#endif
