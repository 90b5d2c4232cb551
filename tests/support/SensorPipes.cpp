#include "tests/support/SensorPipes.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <stdexcept>

#include "tests/support/TemporaryDirectory.h"

[[noreturn]] static void sFail(const std::string& acrWhat) {
    throw std::runtime_error(acrWhat + ": " + std::strerror(errno));
}

static void sClose(int& arDescriptor) {
    if (arDescriptor >= 0) {
        close(arDescriptor);
        arDescriptor = -1;
    }
}

ZTCSensorPipes::~ZTCSensorPipes() {
    close();
}

void ZTCSensorPipes::lock() {
    if (mLock < 0) {
        const std::string lPath = mDirectory + "/qrv-sn.lock";
        mLock = ::open(lPath.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
        if (mLock < 0 || flock(mLock, LOCK_EX | LOCK_NB) != 0) {
            sFail("lock of " + lPath);
        }
    }
}

void ZTCSensorPipes::open() {
    lock();
    openResponse();
    openCommand();
}

bool ZTCSensorPipes::openUnless(const std::function<bool()>& acrIsOver, const ZTCDeadline& acrDeadline) {
    lock();
    signal(SIGPIPE, SIG_IGN);
    waitUntil(
        [&] {
            if (mResponse < 0) {
                mResponse = ::open(responsePath().c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
            }
            if (mResponse >= 0 && mCommand < 0) {
                mCommand = ::open(commandPath().c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
            }
            return mCommand >= 0 || acrIsOver();
        },
        "the FIFOs, or the end of waiting for them", acrDeadline);
    return mCommand >= 0;
}

void ZTCSensorPipes::openResponse() {
    waitUntil([this] { return isFifo(responsePath()); }, "the response FIFO");
    mResponse = ::open(responsePath().c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (mResponse < 0) {
        sFail("open of " + responsePath());
    }
}

void ZTCSensorPipes::openCommand() {
    signal(SIGPIPE, SIG_IGN);
    waitUntil(
        [this] {
            mCommand = ::open(commandPath().c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
            return mCommand >= 0;
        },
        "a reader of the command FIFO");
}

void ZTCSensorPipes::close() {
    closeCommand();
    closeResponse();
    sClose(mLock);
}

void ZTCSensorPipes::closeCommand() {
    sClose(mCommand);
}

void ZTCSensorPipes::closeResponse() {
    sClose(mResponse);
}

/// Whether the descriptor is ready before the deadline.
bool ZTCSensorPipes::waitFor(int aDescriptor, short aEvent, const ZTCDeadline& acrDeadline) const {
    constexpr int lcSlice = 20;  // milliseconds between two questions whether it is over
    while (true) {
        // Asked first: what was written before the end is still there.
        const bool lIsOver = isOver();
        const int lLeft = acrDeadline.remainingMilliseconds();
        pollfd lPoll{aDescriptor, aEvent, 0};
        const int lReady = poll(&lPoll, 1, lIsOver ? 0 : mIsOver ? std::min(lLeft, lcSlice) : lLeft);
        if (lReady != 0) {
            return true;  // also where a signal came: the caller tries and asks again
        }
        if (lIsOver) {
            throw std::runtime_error("the agent has ended");
        }
        if (acrDeadline.isOver()) {
            return false;
        }
    }
}

void ZTCSensorPipes::sendRaw(const ZTCBytes& acrBytes) {
    const ZTCDeadline lDeadline;
    for (std::size_t lSent = 0; lSent < acrBytes.size();) {
        const ssize_t lCount = write(mCommand, acrBytes.data() + lSent, acrBytes.size() - lSent);
        if (lCount >= 0) {
            lSent += static_cast<std::size_t>(lCount);
        } else if (errno == EAGAIN) {
            if (!waitFor(mCommand, POLLOUT, lDeadline)) {
                throw std::runtime_error("the agent does not read its command FIFO");
            }
        } else if (errno != EINTR) {
            sFail("write to " + commandPath());
        }
    }
}

std::size_t ZTCSensorPipes::sendSome(const ZTCBytes& acrBytes, std::size_t aFrom) {
    std::size_t lSent = aFrom;
    while (lSent < acrBytes.size()) {
        // Few enough bytes at a time that a FIFO with a little room takes them.
        const ssize_t lCount = write(mCommand, acrBytes.data() + lSent, std::min(acrBytes.size() - lSent, size_t{512}));
        if (lCount >= 0) {
            lSent += static_cast<std::size_t>(lCount);
        } else if (errno == EAGAIN) {
            break;
        } else if (errno != EINTR) {
            sFail("write to " + commandPath());
        }
    }
    return lSent - aFrom;
}

static std::size_t sWaitingBytes(int aDescriptor) {
    int lCount = 0;
    if (ioctl(aDescriptor, FIONREAD, &lCount) != 0) {
        sFail("FIONREAD");
    }
    return static_cast<std::size_t>(lCount);
}

void ZTCSensorPipes::waitUntilTaken() const {
    waitUntil([this] { return hasNothingToTake() || isOver(); }, "the agent to empty its command FIFO");
    if (!hasNothingToTake()) {
        throw std::runtime_error("the agent has ended");
    }
}

bool ZTCSensorPipes::hasNothingToTake() const {
    return sWaitingBytes(mCommand) == 0;
}

std::size_t ZTCSensorPipes::waitingResponseBytes() const {
    return sWaitingBytes(mResponse);
}

std::optional<ZTCBytes> ZTCSensorPipes::readBytes(std::size_t aCount, const ZTCDeadline& acrDeadline) {
    ZTCBytes lBytes(aCount);
    for (std::size_t lRead = 0; lRead < aCount;) {
        if (!waitFor(mResponse, POLLIN, acrDeadline)) {
            throw std::runtime_error("no response: got " + std::to_string(lRead) + " of " + std::to_string(aCount) +
                                     " bytes before the deadline");
        }
        const ssize_t lCount = read(mResponse, lBytes.data() + lRead, aCount - lRead);
        if (lCount > 0) {
            lRead += static_cast<std::size_t>(lCount);
        } else if (lCount == 0) {
            if (lRead != 0) {
                throw std::runtime_error("the response FIFO was closed after " + std::to_string(lRead) + " of " +
                                         std::to_string(aCount) + " bytes");
            }
            return std::nullopt;
        } else if (errno != EAGAIN && errno != EINTR) {
            sFail("read of " + responsePath());
        }
    }
    return lBytes;
}

ZTCBytes ZTCSensorPipes::readResponse(const ZTCDeadline& acrDeadline) {
    const std::optional<ZTCBytes> lHeader = readBytes(4, acrDeadline);
    if (!lHeader) {
        throw std::runtime_error("no response: the agent has closed the response FIFO");
    }
    const std::uint32_t lLength = ZTCByteReader(*lHeader).u32();
    if (lLength == 0) {
        return {};
    }
    const std::optional<ZTCBytes> lBody = readBytes(lLength, acrDeadline);
    if (!lBody) {
        throw std::runtime_error("the response FIFO was closed behind a header");
    }
    return *lBody;
}

unsigned char ZTCSensorPipes::readByte(const ZTCDeadline& acrDeadline) {
    const std::optional<ZTCBytes> lByte = readBytes(1, acrDeadline);
    if (!lByte) {
        throw std::runtime_error("the agent has closed the response FIFO");
    }
    return lByte->front();
}

void ZTCSensorPipes::discardResponses() {
    unsigned char lScrap[4096];
    while (read(mResponse, lScrap, sizeof(lScrap)) > 0) {
    }
}

bool ZTCSensorPipes::isAtEnd() {
    unsigned char lByte = 0;
    return read(mResponse, &lByte, 1) == 0;
}

ZTCBytes ZTCSensorPipes::request(const ZTCBytes& acrBody) {
    sendRequest(acrBody);
    return readResponse();
}

ZTCBytes ZTCSensorPipes::frame(const ZTCBytes& acrBody) {
    return ZTCByteWriter().u32(acrBody.size()).raw(acrBody).bytes();
}
