/// Asks the agent, and puts every frame that comes into the spool.
///
/// One request at a time. Each fits one atomic write to the command FIFO, so that a request is sent whole or not at
/// all, whenever the process dies. Nothing here waits: the owner polls the response FIFO and calls advance().
///
/// One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_SPOOLINGCONVERSATION_H
#define SENSOR_COLLECTOR_INCLUDE_SPOOLINGCONVERSATION_H

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "sensor/client/include/CommandEncoder.h"
#include "sensor/client/include/FileDescriptor.h"
#include "sensor/collector/include/FrameReception.h"
#include "sensor/collector/include/Spool.h"

enum ZTERequest : std::uint8_t {
    ZTRQ_Start,
    ZTRQ_Get,
    ZTRQ_Stop,
    ZTRQ_RegisterTargets,
    ZTRQ_ShutDown,
    ZTRQ_Marker,  ///< set-period of 0, which is always refused: what comes before the refusal was asked by others
    ZTRQ_Unknown  ///< what an earlier collector asked; its answer has begun to come
};

/// For people: "get scope data".
const char* getRequestName(ZTERequest aRequest);

/// Most targets in one request of this conversation.
inline constexpr std::size_t gcMaxTargetsPerSpooledRequest = (4096 - gcFrameHeaderSize - 5) / 20;

enum ZTESending : std::uint8_t {
    ZTSND_Sent,
    ZTSND_NoAgent,  ///< nobody reads the command FIFO: the agent is starting or has ended
    ZTSND_NotNow    ///< the command FIFO is full
};

/// The agent's answer to the request.
struct ZTSRequestAnswer {
    ZTERequest mRequest = ZTRQ_Unknown;
    std::uint8_t mOutcome = 0;  ///< a ZTEResponseOutcome, or another value, as received
    std::uint16_t mStatus = 0;  ///< of ZTRO_Failed
};

/// What has happened since the last call.
struct ZTSProgress {
    std::uint64_t mMoved = 0;                ///< bytes that came
    std::vector<ZTSSpoolEntry> mSpooled;     ///< new frames and torn files, to be stored
    std::vector<ZTSRequestAnswer> mAnswers;  ///< at most one
    std::uint64_t mLateAnswers = 0;          ///< frames that were no answer to the request
};

class ZTCSpoolingConversation {
public:
    /// @param arSpool     outlives this object
    /// @param aDirectory  the agent's, with the command FIFO
    ZTCSpoolingConversation(ZTCSpool& arSpool, std::string aDirectory)
        : mrSpool(arSpool), mDirectory(std::move(aDirectory)) {}

    /// Begins to read from an agent.
    /// @param arResponseFifo  taken over; it stays the caller's where this throws, for the next try
    /// @param acrPart  the `.part` that an earlier collector left for this agent
    /// Throws ZTCSpoolTroubleEx, and is not attached then.
    void attach(ZTCFileDescriptor&& arResponseFifo, std::string aGeneration,
                const std::optional<ZTSSpoolName>& acrPart = std::nullopt);
    bool isAttached() const { return mResponseFifo.isOpen(); }
    const std::string& getGeneration() const { return mGeneration; }
    /// To be polled for POLLIN; -1 where it is not attached.
    int getResponseFifo() const { return mResponseFifo.get(); }

    /// Whether a request may be sent now: none is waiting for its answer, and no frame is half received.
    bool isIdle() const { return isAttached() && !mRequest && !mPart; }
    std::optional<ZTERequest> getRequest() const { return mRequest; }
    /// An earlier collector may have asked and got no byte of an answer: the first request has to be ZTRQ_Marker.
    bool needsMarker() const { return mNeedsMarker; }

    /// Reserves room, then sends. To be called when idle, or with ZTRQ_Marker when needsMarker().
    /// Throws ZTCSpoolTroubleEx where there is no room (nothing has been sent then), ZTCSystemCallEx, ZTCBadInputEx.
    ZTESending request(ZTERequest aRequest, std::span<const std::uint8_t> aBody);

    /// Takes in what has come, asked or not; adds to arProgress. Throws ZTCSpoolTroubleEx where the disk refuses; to be
    /// called again later then.
    void advance(ZTSProgress& arProgress);

    /// For an agent that has ended: takes in what is left, to the FIFO's end, and detaches. Returns false while the
    /// FIFO still has a writer. Throws as advance() does.
    bool drain(ZTSProgress& arProgress);

private:
    ZTESending openCommandFifo();
    bool preparePart(bool aIsExpecting);
    bool receiveOne(ZTSProgress& arProgress);
    void settleFrame(ZTSProgress& arProgress);
    bool isAnswer(std::uint8_t aOutcome, std::uint16_t aStatus) const;

    ZTCSpool& mrSpool;
    const std::string mDirectory;
    std::string mGeneration;
    ZTCFileDescriptor mResponseFifo;
    ZTCFileDescriptor mCommandFifo;
    std::optional<ZTSSpoolPart> mPart;
    std::optional<ZTERequest> mRequest;
    bool mNeedsMarker = false;
};

#endif
