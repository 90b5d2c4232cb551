#include "sensor/client/include/CommandEncoder.h"

#include "sensor/client/src/WireBytes.h"

static ZTCWireBytes sEncode(ZTETavikCommand aCommand) {
    return {static_cast<std::uint8_t>(aCommand)};
}

static ZTCWireBytes sEncode(ZTETavikCommand aCommand, std::uint32_t aValue) {
    ZTCWireBytes lBody = sEncode(aCommand);
    appendNumber(lBody, aValue);
    return lBody;
}

ZTCWireBytes encodeStartScope(std::uint32_t aMaxRecordBytes) {
    return sEncode(ZTSTVKC_StartScope, aMaxRecordBytes);
}

ZTCWireBytes encodeGetScopeData() {
    return sEncode(ZTSTVKC_GetScopeData);
}

ZTCWireBytes encodeStop() {
    return sEncode(ZTSTVKC_Stop);
}

ZTCWireBytes encodeRegisterTargets(std::span<const ZTSTargetPort> aTargets) {
    if (aTargets.size() > gcMaxTargetsPerRequest) {
        throw ZTCBadInputEx(std::to_string(aTargets.size()) + " targets do not fit one request: at most " +
                            std::to_string(gcMaxTargetsPerRequest));
    }
    ZTCWireBytes lBody = sEncode(ZTSTVKC_RegisterTargets, static_cast<std::uint32_t>(aTargets.size()));
    for (const ZTSTargetPort& lrTarget : aTargets) {
        appendName(lBody, lrTarget.mNodeName);
        appendName(lBody, lrTarget.mPortName);
        appendNumber(lBody, lrTarget.mFcId);
    }
    return lBody;
}

ZTCWireBytes encodeShutDown() {
    return sEncode(ZTSTVKC_ShutDown);
}

ZTCWireBytes encodeCollectionPeriod(std::uint32_t aSeconds) {
    return sEncode(ZTSTVKC_CollectionPeriod, aSeconds);
}

ZTCWireBytes makeRequestFrame(std::span<const std::uint8_t> aBody) {
    if (aBody.empty() || aBody.size() > gcMaxRequestSize) {
        throw ZTCBadInputEx("a request of " + std::to_string(aBody.size()) + " bytes fits no frame: 1 to " +
                            std::to_string(gcMaxRequestSize));
    }
    ZTCWireBytes lFrame;
    lFrame.reserve(gcFrameHeaderSize + aBody.size());
    appendNumber(lFrame, static_cast<std::uint32_t>(aBody.size()));
    lFrame.insert(lFrame.end(), aBody.begin(), aBody.end());
    return lFrame;
}
