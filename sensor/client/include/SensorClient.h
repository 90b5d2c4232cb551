/// The sensor's side of the protocol in one object: asks the agent a command, returns the decoded answer.
#ifndef SENSOR_CLIENT_INCLUDE_SENSORCLIENT_H
#define SENSOR_CLIENT_INCLUDE_SENSORCLIENT_H

#include <chrono>
#include <span>
#include <string>
#include <vector>

#include "sensor/client/include/FifoConversation.h"
#include "sensor/client/include/ResponseDecoder.h"

/// An answer: its bytes as received, and what they mean.
struct ZTSAnswer {
    ZTCWireBytes mBody;
    ZTSDecodeResult mDecoded;

    const ZTSResponse& getResponse() const { return mDecoded.mResponse; }
};

/// One thread at a time.
class ZTCSensorClient {
public:
    /// @param aDirectory  the install directory that the agent runs in
    /// @param aTimeout    of each question, from connecting to the answer's last byte
    /// @param aCancelDescriptor  see ZTCFifoConversation
    ZTCSensorClient(std::string aDirectory, std::chrono::milliseconds aTimeout, int aCancelDescriptor = -1);

    // Each returns the agent's answer, refusals included; throws ZTCNoAnswerEx, ZTCCancelledEx, ZTCSystemCallEx or
    // ZTCBadInputEx. The connection stays open for the next question until disconnect() or a failure.
    ZTSAnswer startScope(std::uint32_t aMaxRecordBytes);
    ZTSAnswer getScopeData();
    ZTSAnswer stop();
    ZTSAnswer registerTargets(std::span<const ZTSTargetPort> aTargets);
    ZTSAnswer shutDown();
    ZTSAnswer setCollectionPeriod(std::uint32_t aSeconds);

    /// Connects without asking anything, so that the agent that will be asked is the one that is there now.
    void connect() { mConversation.connect(ZTCTimeLimit(mTimeout)); }

    /// Any request body. An answer that cannot belong to it (scope data for another command than get, none for get) is
    /// the late answer of a request that its sender gave up: it is set aside, and the next one waited for.
    ZTSAnswer ask(std::span<const std::uint8_t> aRequest);

    /// The answers that were set aside since the last call, also by a question that failed.
    std::vector<ZTSAnswer> takeLateAnswers();

    /// Lets other clients talk.
    void disconnect() noexcept { mConversation.disconnect(); }
    std::uint64_t getDiscardedBytes() const { return mConversation.getDiscardedBytes(); }
    const std::string& getDirectory() const { return mConversation.getDirectory(); }

private:
    ZTCFifoConversation mConversation;
    std::chrono::milliseconds mTimeout;
    std::vector<ZTSAnswer> mLateAnswers;
};

#endif
