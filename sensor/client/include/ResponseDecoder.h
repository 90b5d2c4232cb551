/// Response bodies turned into values.
///
/// Nothing of the input is trusted: a count never makes the decoder allocate, only bytes that are there do.
#ifndef SENSOR_CLIENT_INCLUDE_RESPONSEDECODER_H
#define SENSOR_CLIENT_INCLUDE_RESPONSEDECODER_H

#include <cstdint>
#include <optional>
#include <span>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/Response.h"

/// What could be decoded, and the problem that ended it.
struct ZTSDecodeResult {
    ZTSResponse mResponse;                ///< every list and record in front of the problem
    std::optional<ZTCDecodeEx> mProblem;  ///< nothing: the whole body was decoded
};

/// Decodes as much as there is: the agent hands scope data out only once, so nothing that has arrived may be lost. A
/// payload that ends where a list would begin is whole, whatever the announced count.
ZTSDecodeResult decodeAsFarAsPossible(std::span<const std::uint8_t> aBody);

/// The whole body, or ZTCDecodeEx naming the offset, what was wanted there and what was found.
ZTSResponse decodeResponse(std::span<const std::uint8_t> aBody);

#endif
