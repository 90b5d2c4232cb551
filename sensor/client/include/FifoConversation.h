/// Frames to and from an agent over its two FIFOs.
///
/// Connecting takes four steps:
///   1. Open the response FIFO for reading. An agent that starts waits for this reader.
///   2. Take the client's lock.
///   3. Open the command FIFO without blocking.
///   4. Discard old answers from the response FIFO. Where it has bytes, send a request that the agent always refuses (a
///      collection period of 0), and discard everything up to that refusal.
/// A step that fails because something is missing is tried again until the time limit: the agent may just be starting.
///
/// Any failure disconnects, since later bytes from the agent can no longer be assigned to a request.
///
/// One thread at a time. No call raises SIGPIPE or returns EINTR.
#ifndef SENSOR_CLIENT_INCLUDE_FIFOCONVERSATION_H
#define SENSOR_CLIENT_INCLUDE_FIFOCONVERSATION_H

#include <sys/types.h>

#include <cstdint>
#include <span>
#include <string>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/ClientLock.h"
#include "sensor/client/include/CommandEncoder.h"
#include "sensor/client/include/FileDescriptor.h"
#include "sensor/client/include/TimeLimit.h"

class ZTCFifoConversation {
public:
    /// @param aDirectory         the install directory
    /// @param aCancelDescriptor  not owned; -1: none. Once it is readable, waiting ends with ZTCCancelledEx, as long as
    ///                           no byte of a request has been sent.
    explicit ZTCFifoConversation(std::string aDirectory, int aCancelDescriptor = -1);

    /// Does nothing when connected. Throws ZTCNoAnswerEx when the limit passes first, ZTCCancelledEx, ZTCSystemCallEx.
    void connect(const ZTCTimeLimit& acrLimit);
    bool isConnected() const { return mCommandFifo.isOpen(); }
    /// Gives up lock and FIFOs.
    void disconnect() noexcept;

    /// Connects where that is needed, and sends one frame. Throws as connect does, and ZTCBadInputEx for a body whose
    /// length no frame can have.
    void send(std::span<const std::uint8_t> aBody, const ZTCTimeLimit& acrLimit);

    /// The next frame's body. Reads no byte behind that frame; memory grows with the bytes that come, not with the
    /// length that is announced. Throws ZTCNoAnswerEx naming the bytes had and wanted.
    ZTCWireBytes receive(const ZTCTimeLimit& acrLimit);

    /// Bytes that stood in the response FIFO and were thrown away, since construction.
    std::uint64_t getDiscardedBytes() const { return mDiscardedBytes; }
    const std::string& getDirectory() const { return mDirectory; }

private:
    bool tryOpenResponseFifo();
    bool tryTakeLock();
    bool tryOpenCommandFifo();
    ZTCFileDescriptor openFifo(const std::string& acrPath, int aFlags);
    void discardStaleBytes(const ZTCTimeLimit& acrLimit);
    void discardSome(ZTCWireBytes& arTail);
    void writeAll(std::span<const std::uint8_t> aFrame, const ZTCTimeLimit& acrLimit);
    void readExactly(ZTCWireBytes& arBytes, std::size_t aCount, const char* apWhat, const ZTCTimeLimit& acrLimit);
    /// As read(): bytes, 0 = no writer, -1 = nothing yet.
    ssize_t readSome(std::span<std::uint8_t> aPlace);

    const std::string mDirectory;
    const std::string mCommandPath;
    const std::string mResponsePath;
    const int mCancelDescriptor;

    ZTCClientLock mLock;
    ZTCFileDescriptor mResponseFifo;
    ZTCFileDescriptor mCommandFifo;
    std::uint64_t mDiscardedBytes = 0;

    // Why the last try to connect was not enough.
    ZTENoAnswerReason mObstacle = ZTNA_NoFifo;
    std::string mObstacleText;
};

#endif
