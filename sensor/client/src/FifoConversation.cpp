#include "sensor/client/include/FifoConversation.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <ctime>

/// Pause between two tries to connect, and between two looks where poll() has nothing to wait for.
static constexpr int scRetryMilliseconds = 20;

/// For how long nothing more may come behind the mark before stale bytes count as all.
static constexpr int scQuietMilliseconds = 50;

/// For how long nothing may come before a peer counts as one that does not answer what marks the end of stale bytes.
static constexpr int scSilentMilliseconds = 1000;

static constexpr std::size_t scReadSize = 65536;

/// Blocks SIGPIPE for this thread, and takes back one that the write has caused.
class ZTCSigpipeBlock {
public:
    ZTCSigpipeBlock() {
        sigemptyset(&mSigpipe);
        sigaddset(&mSigpipe, SIGPIPE);
        sigset_t lPending;
        sigpending(&lPending);
        mWasPending = sigismember(&lPending, SIGPIPE) == 1;
        pthread_sigmask(SIG_BLOCK, &mSigpipe, &mPrevious);
    }
    ~ZTCSigpipeBlock() {
        const timespec lNow{};
        while (!mWasPending && sigtimedwait(&mSigpipe, nullptr, &lNow) < 0 && errno == EINTR) {
        }
        pthread_sigmask(SIG_SETMASK, &mPrevious, nullptr);
    }
    ZTCSigpipeBlock(const ZTCSigpipeBlock&) = delete;
    ZTCSigpipeBlock& operator=(const ZTCSigpipeBlock&) = delete;

private:
    sigset_t mSigpipe;
    sigset_t mPrevious;
    bool mWasPending;
};

/// poll() that takes an interruption for a wake without events. Returns whether something is to be seen.
static bool sPoll(std::span<pollfd> aFds, int aMilliseconds) {
    const int lCount = poll(aFds.data(), static_cast<nfds_t>(aFds.size()), aMilliseconds);
    if (lCount < 0 && errno != EINTR) {
        throw ZTCSystemCallEx("cannot wait for the FIFOs", errno);
    }
    if (lCount < 0) {
        for (pollfd& lrFd : aFds) {
            lrFd.revents = 0;
        }
    }
    return lCount > 0;
}

static std::string sCountOf(std::size_t aHad, std::size_t aWanted, const char* apWhat) {
    return std::to_string(aHad) + " of " + std::to_string(aWanted) + " bytes of " + apWhat;
}

ZTCFifoConversation::ZTCFifoConversation(std::string aDirectory, int aCancelDescriptor)
    : mDirectory(std::move(aDirectory)),
      mCommandPath(mDirectory + gcCommandFifoName),
      mResponsePath(mDirectory + gcResponseFifoName),
      mCancelDescriptor(aCancelDescriptor),
      mLock(mDirectory) {}

void ZTCFifoConversation::disconnect() noexcept {
    mCommandFifo.reset();
    mResponseFifo.reset();
    mLock.release();
}

ZTCFileDescriptor ZTCFifoConversation::openFifo(const std::string& acrPath, int aFlags) {
    ZTCFileDescriptor lFifo = ZTCFileDescriptor::open(acrPath.c_str(), aFlags | O_NONBLOCK | O_NOCTTY | O_NOFOLLOW);
    if (!lFifo.isOpen()) {
        if (errno == ENOENT) {
            mObstacle = ZTNA_NoFifo;
            mObstacleText = acrPath + " does not exist";
        } else if (errno == ENXIO) {
            mObstacle = ZTNA_NobodyListens;
            mObstacleText = "no process listens on " + acrPath;
        } else {
            throw ZTCSystemCallEx("cannot open " + acrPath, errno);
        }
        return lFifo;
    }
    struct stat lStatus {};
    if (fstat(lFifo.get(), &lStatus) != 0) {
        throw ZTCSystemCallEx("cannot look at " + acrPath, errno);
    }
    if (!S_ISFIFO(lStatus.st_mode)) {
        throw ZTCBadInputEx(acrPath + " is no FIFO");
    }
    return lFifo;
}

bool ZTCFifoConversation::tryOpenResponseFifo() {
    if (mResponseFifo.isOpen() && !mResponseFifo.isAtPath(mResponsePath.c_str())) {
        mResponseFifo.reset();  // an agent has ended in order since, and perhaps a new one has made its own
    }
    if (!mResponseFifo.isOpen()) {
        mResponseFifo = openFifo(mResponsePath, O_RDONLY);
    }
    return mResponseFifo.isOpen();
}

bool ZTCFifoConversation::tryTakeLock() {
    if (!mLock.tryAcquire()) {
        mObstacle = ZTNA_LockHeld;
        mObstacleText = mLock.describeHolder();
        if (mLock.getNamedHolder() != 0) {
            throw ZTCNoAnswerEx(mObstacle, "cannot talk to the agent in " + mDirectory + ": " + mObstacleText +
                                               " as long as it runs; ask it with 'tavik', or stop it");
        }
        return false;
    }
    return true;
}

bool ZTCFifoConversation::tryOpenCommandFifo() {
    mCommandFifo = openFifo(mCommandPath, O_WRONLY);
    return mCommandFifo.isOpen();
}

void ZTCFifoConversation::connect(const ZTCTimeLimit& acrLimit) {
    if (isConnected()) {
        return;
    }
    try {
        // The FIFO may be replaced until the command FIFO is open: an agent makes that one first.
        while (!(tryOpenResponseFifo() && tryTakeLock() && tryOpenCommandFifo() && tryOpenResponseFifo())) {
            mCommandFifo.reset();
            if (acrLimit.hasPassed()) {
                throw ZTCNoAnswerEx(
                    mObstacle, (mObstacle == ZTNA_LockHeld ? "cannot talk to the agent in " : "no agent in ") +
                                   mDirectory + ": " + mObstacleText + " (waited " + acrLimit.describeSpan() + ")");
            }
            pollfd lCancel{.fd = mCancelDescriptor, .events = POLLIN, .revents = 0};
            if (sPoll({&lCancel, 1}, std::min(scRetryMilliseconds, acrLimit.remainingMilliseconds()))) {
                throw ZTCCancelledEx("gave up waiting for an agent in " + mDirectory);
            }
        }
        discardStaleBytes(acrLimit);
    } catch (...) {
        disconnect();
        throw;
    }
}

ssize_t ZTCFifoConversation::readSome(std::span<std::uint8_t> aPlace) {
    const ssize_t lCount = read(mResponseFifo.get(), aPlace.data(), aPlace.size());
    if (lCount < 0 && errno != EAGAIN && errno != EINTR) {
        throw ZTCSystemCallEx("cannot read " + mResponsePath, errno);
    }
    return lCount;
}

/// The frame that answers a collection period of 0: "failed", status ZTSAPS_Invalid.
static constexpr std::array<std::uint8_t, 7> scRefusalFrame{0, 0, 0, 3, ZTRO_Failed, 0, ZTSAPS_Invalid};

/// Somebody has given an answer up, and the agent may still be writing it, with pauses of any length. Answers come in
/// order: a collection period of 0, which the agent always refuses, marks the end of what is stale.
void ZTCFifoConversation::discardStaleBytes(const ZTCTimeLimit& acrLimit) {
    pollfd lResponse{.fd = mResponseFifo.get(), .events = POLLIN, .revents = 0};
    if (!sPoll({&lResponse, 1}, 0) || (lResponse.revents & POLLIN) == 0) {
        return;
    }
    writeAll(makeRequestFrame(encodeCollectionPeriod(0)), acrLimit);
    ZTCWireBytes lTail;
    const auto lHasMark = [&] { return std::ranges::equal(lTail, scRefusalFrame); };
    while (sPoll({&lResponse, 1}, lHasMark() ? scQuietMilliseconds : scSilentMilliseconds) &&
           (lResponse.revents & POLLIN) != 0) {
        discardSome(lTail);
        if (acrLimit.hasPassed()) {
            throw ZTCNoAnswerEx(ZTNA_Silence,
                                "the agent in " + mDirectory +
                                    " is still sending an earlier answer, which no client waits for, after " +
                                    acrLimit.describeSpan());
        }
    }
    mDiscardedBytes -= lHasMark() ? lTail.size() : 0;
}

/// Reads once, and keeps the last bytes of the stream, as many as a refusal has.
void ZTCFifoConversation::discardSome(ZTCWireBytes& arTail) {
    std::array<std::uint8_t, 4096> lBytes;
    const std::size_t lCount = static_cast<std::size_t>(std::max<ssize_t>(readSome(lBytes), 0));
    arTail.insert(arTail.end(), lBytes.begin(), lBytes.begin() + static_cast<std::ptrdiff_t>(lCount));
    arTail.erase(arTail.begin(),
                 arTail.end() - static_cast<std::ptrdiff_t>(std::min(arTail.size(), scRefusalFrame.size())));
    mDiscardedBytes += lCount;
}

void ZTCFifoConversation::send(std::span<const std::uint8_t> aBody, const ZTCTimeLimit& acrLimit) {
    const ZTCWireBytes lFrame = makeRequestFrame(aBody);
    connect(acrLimit);
    try {
        writeAll(lFrame, acrLimit);
    } catch (...) {
        disconnect();
        throw;
    }
}

void ZTCFifoConversation::writeAll(std::span<const std::uint8_t> aFrame, const ZTCTimeLimit& acrLimit) {
    const ZTCSigpipeBlock lBlock;
    std::size_t lWritten = 0;
    while (lWritten < aFrame.size()) {
        const ssize_t lCount = write(mCommandFifo.get(), aFrame.data() + lWritten, aFrame.size() - lWritten);
        if (lCount > 0) {
            lWritten += static_cast<std::size_t>(lCount);
            continue;
        }
        if (lCount < 0 && errno == EINTR) {
            continue;
        }
        if (lCount < 0 && errno == EPIPE) {
            throw ZTCNoAnswerEx(ZTNA_AgentDied, "the agent in " + mDirectory + " ended: it had taken " +
                                                    sCountOf(lWritten, aFrame.size(), "the request"));
        }
        if (lCount < 0 && errno != EAGAIN) {
            throw ZTCSystemCallEx("cannot write " + mCommandPath, errno);
        }
        if (acrLimit.hasPassed()) {
            throw ZTCNoAnswerEx(ZTNA_Silence, "the agent in " + mDirectory + " took only " +
                                                  sCountOf(lWritten, aFrame.size(), "the request") + " within " +
                                                  acrLimit.describeSpan());
        }
        // The kernel calls the FIFO writable only from a whole page of room on: look again from time to time.
        pollfd lCommand{.fd = mCommandFifo.get(), .events = POLLOUT, .revents = 0};
        sPoll({&lCommand, 1}, std::min(scQuietMilliseconds, acrLimit.remainingMilliseconds()));
    }
}

void ZTCFifoConversation::readExactly(ZTCWireBytes& arBytes, std::size_t aCount, const char* apWhat,
                                      const ZTCTimeLimit& acrLimit) {
    std::array<std::uint8_t, scReadSize> lChunk;
    while (arBytes.size() < aCount) {
        std::array<pollfd, 2> lFds{{{.fd = mResponseFifo.get(), .events = POLLIN, .revents = 0},
                                    {.fd = mCommandFifo.get(), .events = 0, .revents = 0}}};
        sPoll(lFds, acrLimit.remainingMilliseconds());
        if (lFds[0].revents != 0 || lFds[1].revents != 0) {
            const ssize_t lRead = readSome({lChunk.data(), std::min(aCount - arBytes.size(), lChunk.size())});
            if (lRead > 0) {
                arBytes.insert(arBytes.end(), lChunk.begin(), lChunk.begin() + lRead);
                continue;
            }
            // No writer and no reader of commands: the agent is gone. One of the two alone is an agent that starts or
            // ends.
            if (lRead == 0 && (lFds[1].revents & POLLERR) != 0) {
                throw ZTCNoAnswerEx(ZTNA_AgentDied, "the agent in " + mDirectory + " ended: it had sent " +
                                                        sCountOf(arBytes.size(), aCount, apWhat));
            }
            sPoll({}, std::min(scRetryMilliseconds, acrLimit.remainingMilliseconds()));
        }
        if (acrLimit.hasPassed()) {
            throw ZTCNoAnswerEx(ZTNA_Silence, "the agent in " + mDirectory + " sent only " +
                                                  sCountOf(arBytes.size(), aCount, apWhat) + " within " +
                                                  acrLimit.describeSpan());
        }
    }
}

ZTCWireBytes ZTCFifoConversation::receive(const ZTCTimeLimit& acrLimit) {
    if (!isConnected()) {
        throw ZTCBadInputEx("nothing has been asked in " + mDirectory);
    }
    try {
        ZTCWireBytes lHeader;
        readExactly(lHeader, gcFrameHeaderSize, "its answer's length", acrLimit);
        std::size_t lLength = 0;
        for (const std::uint8_t lByte : lHeader) {
            lLength = lLength << 8 | lByte;
        }
        ZTCWireBytes lBody;
        readExactly(lBody, lLength, "its answer", acrLimit);
        return lBody;
    } catch (...) {
        disconnect();
        throw;
    }
}
