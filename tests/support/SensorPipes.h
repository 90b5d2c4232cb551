/// The sensor's ends of the two FIFOs: what a test sends and reads is bytes, so that a message can be cut anywhere and
/// every byte of a response can be asserted.
#ifndef TESTS_SUPPORT_SENSORPIPES_H
#define TESTS_SUPPORT_SENSORPIPES_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "tests/support/Bytes.h"
#include "tests/support/Waiting.h"

class ZTCSensorPipes {
public:
    /// `acrDirectory` is the sensor's directory; nothing is opened yet.
    explicit ZTCSensorPipes(std::string aDirectory) : mDirectory(std::move(aDirectory)) {}
    ~ZTCSensorPipes();
    ZTCSensorPipes(const ZTCSensorPipes&) = delete;
    ZTCSensorPipes& operator=(const ZTCSensorPipes&) = delete;

    std::string commandPath() const { return mDirectory + "/qrvtvkcmd.fifo"; }
    std::string responsePath() const { return mDirectory + "/qrvtvkout.fifo"; }

    /// Takes the sensor's lock, waits until the agent has made the FIFOs and opens both, the response FIFO's reader
    /// first.
    void open();
    /// The same, given up as soon as the condition holds: then it returns false.
    bool openUnless(const std::function<bool()>& acrIsOver, const ZTCDeadline& acrDeadline = ZTCDeadline());
    void openResponse();
    void openCommand();
    void close();
    void closeCommand();
    void closeResponse();

    /// From now on, waiting for the agent to read or to answer is given up as soon as the condition holds, and throws
    /// std::runtime_error. For tests whose agent may end: a FIFO does not tell of a writer that has never come.
    void giveUpWhen(std::function<bool()> aIsOver) { mIsOver = std::move(aIsOver); }

    /// Writes the bytes as they stand.
    void sendRaw(const ZTCBytes& acrBytes);
    /// Writes what the command FIFO has room for, from this position on, and returns how much that was.
    std::size_t sendSome(const ZTCBytes& acrBytes, std::size_t aFrom);
    bool hasNothingToTake() const;
    /// Waits until the agent has taken every byte out of the command FIFO.
    void waitUntilTaken() const;
    /// Bytes that wait in the response FIFO now.
    std::size_t waitingResponseBytes() const;

    /// Frames the body and sends it.
    void sendRequest(const ZTCBytes& acrBody) { sendRaw(frame(acrBody)); }
    /// Reads one frame; throws std::runtime_error where the deadline is over or the agent has closed the FIFO first.
    ZTCBytes readResponse(const ZTCDeadline& acrDeadline = ZTCDeadline());
    unsigned char readByte(const ZTCDeadline& acrDeadline = ZTCDeadline());
    /// Throws away what waits in the response FIFO.
    void discardResponses();
    /// Whether the agent has closed the FIFO with nothing left in it. To be called once the agent has ended.
    bool isAtEnd();

    /// One request, one response.
    ZTCBytes request(const ZTCBytes& acrBody);

    static ZTCBytes frame(const ZTCBytes& acrBody);

private:
    void lock();
    bool isOver() const { return mIsOver && mIsOver(); }
    bool waitFor(int aDescriptor, short aEvent, const ZTCDeadline& acrDeadline) const;
    std::optional<ZTCBytes> readBytes(std::size_t aCount, const ZTCDeadline& acrDeadline);

    std::string mDirectory;
    std::function<bool()> mIsOver;
    int mLock = -1;
    int mCommand = -1;
    int mResponse = -1;
};

#endif
