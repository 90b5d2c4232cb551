/// Encodes the six commands as request bodies: the bytes of a frame after its length.
#ifndef SENSOR_CLIENT_INCLUDE_COMMANDENCODER_H
#define SENSOR_CLIENT_INCLUDE_COMMANDENCODER_H

#include <cstdint>
#include <span>
#include <vector>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/FcName.h"

using ZTCWireBytes = std::vector<std::uint8_t>;

/// A remote port that the agent is to recognise.
struct ZTSTargetPort {
    ZTSFcName mNodeName;
    ZTSFcName mPortName;
    std::uint32_t mFcId = 0;

    bool operator==(const ZTSTargetPort&) const = default;
};

/// Most targets that one request can carry.
inline constexpr std::size_t gcMaxTargetsPerRequest = (gcMaxRequestSize - 5) / 20;

/// @param aMaxRecordBytes  most bytes of event data in one record
ZTCWireBytes encodeStartScope(std::uint32_t aMaxRecordBytes);
ZTCWireBytes encodeGetScopeData();
ZTCWireBytes encodeStop();
/// Throws ZTCBadInputEx for more than gcMaxTargetsPerRequest targets. No targets at all can be encoded; the agent
/// refuses it.
ZTCWireBytes encodeRegisterTargets(std::span<const ZTSTargetPort> aTargets);
ZTCWireBytes encodeShutDown();
/// @param aSeconds  the agent refuses 0
ZTCWireBytes encodeCollectionPeriod(std::uint32_t aSeconds);

/// The body with its length in front. Throws ZTCBadInputEx where the length is 0 or above gcMaxRequestSize.
ZTCWireBytes makeRequestFrame(std::span<const std::uint8_t> aBody);

#endif
