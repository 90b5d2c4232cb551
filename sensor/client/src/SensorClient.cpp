#include "sensor/client/include/SensorClient.h"

ZTCSensorClient::ZTCSensorClient(std::string aDirectory, std::chrono::milliseconds aTimeout, int aCancelDescriptor)
    : mConversation(std::move(aDirectory), aCancelDescriptor), mTimeout(aTimeout) {}

ZTSAnswer ZTCSensorClient::startScope(std::uint32_t aMaxRecordBytes) {
    return ask(encodeStartScope(aMaxRecordBytes));
}

ZTSAnswer ZTCSensorClient::getScopeData() {
    return ask(encodeGetScopeData());
}

ZTSAnswer ZTCSensorClient::stop() {
    return ask(encodeStop());
}

ZTSAnswer ZTCSensorClient::registerTargets(std::span<const ZTSTargetPort> aTargets) {
    return ask(encodeRegisterTargets(aTargets));
}

ZTSAnswer ZTCSensorClient::shutDown() {
    return ask(encodeShutDown());
}

ZTSAnswer ZTCSensorClient::setCollectionPeriod(std::uint32_t aSeconds) {
    return ask(encodeCollectionPeriod(aSeconds));
}

/// Whether the answer may be the request's own. What cannot be decoded is nobody else's either.
static bool sBelongsTo(const ZTSAnswer& acrAnswer, std::span<const std::uint8_t> aRequest) {
    if (acrAnswer.mBody.empty() || acrAnswer.mBody[0] > ZTRO_ScopeData) {
        return true;
    }
    return (aRequest[0] == ZTSTVKC_GetScopeData) == (acrAnswer.mBody[0] == ZTRO_ScopeData);
}

ZTSAnswer ZTCSensorClient::ask(std::span<const std::uint8_t> aRequest) {
    const ZTCTimeLimit lLimit(mTimeout);
    mConversation.send(aRequest, lLimit);
    while (true) {
        ZTSAnswer lAnswer;
        lAnswer.mBody = mConversation.receive(lLimit);
        lAnswer.mDecoded = decodeAsFarAsPossible(lAnswer.mBody);
        if (sBelongsTo(lAnswer, aRequest)) {
            return lAnswer;
        }
        mLateAnswers.push_back(std::move(lAnswer));
    }
}

std::vector<ZTSAnswer> ZTCSensorClient::takeLateAnswers() {
    return std::exchange(mLateAnswers, {});
}
