#include "sensor/collector/include/SpoolingConversation.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"

static_assert(gcMaxTargetsPerSpooledRequest * 20 + 5 + gcFrameHeaderSize <= PIPE_BUF);

const char* getRequestName(ZTERequest aRequest) {
    static constexpr std::array<const char*, 7> scNames{
        "start", "get scope data", "stop", "register targets", "shut down", "marker", "an earlier request"};
    return scNames[aRequest];
}

void ZTCSpoolingConversation::attach(ZTCFileDescriptor&& arResponseFifo, std::string aGeneration,
                                     const std::optional<ZTSSpoolName>& acrPart) {
    std::optional<ZTSSpoolPart> lPart;
    if (acrPart) {
        lPart = mrSpool.openPart(*acrPart);
    }
    mNeedsMarker = lPart && lPart->mSize == 0;
    mRequest.reset();
    if (lPart && !mNeedsMarker) {
        mRequest = ZTRQ_Unknown;
    }
    mPart = std::move(lPart);
    mGeneration = std::move(aGeneration);
    mResponseFifo = std::move(arResponseFifo);
    mCommandFifo.reset();
}

ZTESending ZTCSpoolingConversation::openCommandFifo() {
    if (mCommandFifo.isOpen()) {
        return ZTSND_Sent;
    }
    const std::string lPath = mDirectory + gcCommandFifoName;
    ZTCFileDescriptor lFifo = ZTCFileDescriptor::open(lPath.c_str(), O_WRONLY | O_NONBLOCK | O_NOCTTY | O_NOFOLLOW);
    if (!lFifo.isOpen()) {
        if (errno == ENOENT || errno == ENXIO) {
            return ZTSND_NoAgent;
        }
        throw ZTCSystemCallEx("cannot open " + lPath, errno);
    }
    struct stat lStatus {};
    if (fstat(lFifo.get(), &lStatus) != 0) {
        throw ZTCSystemCallEx("cannot look at " + lPath, errno);
    }
    if (!S_ISFIFO(lStatus.st_mode)) {
        throw ZTCBadInputEx(lPath + " is not a FIFO");
    }
    mCommandFifo = std::move(lFifo);
    return ZTSND_Sent;
}

ZTESending ZTCSpoolingConversation::request(ZTERequest aRequest, std::span<const std::uint8_t> aBody) {
    const ZTCWireBytes lFrame = makeRequestFrame(aBody);
    if (lFrame.size() > PIPE_BUF) {
        throw ZTCBadInputEx("a request of " + std::to_string(lFrame.size()) +
                            " bytes cannot be sent at once: at most " + std::to_string(PIPE_BUF));
    }
    if (openCommandFifo() != ZTSND_Sent) {
        return ZTSND_NoAgent;
    }
    const std::uint64_t lReserve = aRequest == ZTRQ_Get || aRequest == ZTRQ_Marker ? gcResponseReserve : gcShortReserve;
    if (!mPart) {
        mPart = mrSpool.createPart(mrSpool.takeNumber(), mGeneration, lReserve);
    } else {
        mrSpool.reserve(*mPart, lReserve);
    }
    ssize_t lWritten;
    do {
        lWritten = write(mCommandFifo.get(), lFrame.data(), lFrame.size());
    } while (lWritten < 0 && errno == EINTR);
    if (lWritten == static_cast<ssize_t>(lFrame.size())) {
        mRequest = aRequest;
        mNeedsMarker = false;
        return ZTSND_Sent;
    }
    const int lErrno = errno;
    if (lErrno != EAGAIN) {
        mCommandFifo.reset();
    }
    if (!mNeedsMarker) {
        // Nothing was sent, so the file stands for nothing. Where it cannot be removed now, an answer that nobody
        // asked for goes into it, or the next collector clears it up.
        ZTSSpoolPart lPart = std::move(*mPart);
        mPart.reset();
        mrSpool.discard(lPart);
    }
    if (lErrno != EAGAIN && lErrno != EPIPE) {
        throw ZTCSystemCallEx("cannot write " + mDirectory + gcCommandFifoName, lErrno);
    }
    return lErrno == EAGAIN ? ZTSND_NotNow : ZTSND_NoAgent;
}

/// Whether a frame of this outcome can be the answer to the request. No other request than the marker is refused as
/// invalid.
bool ZTCSpoolingConversation::isAnswer(std::uint8_t aOutcome, std::uint16_t aStatus) const {
    if (!mRequest) {
        return false;
    }
    if (*mRequest == ZTRQ_Unknown || aOutcome > ZTRO_ScopeData) {
        return true;
    }
    const bool lIsMarker = aOutcome == ZTRO_Failed && aStatus == ZTSAPS_Invalid;
    if (*mRequest == ZTRQ_Marker) {
        return lIsMarker;
    }
    return !lIsMarker && (*mRequest == ZTRQ_Get) == (aOutcome == ZTRO_ScopeData);
}

void ZTCSpoolingConversation::settleFrame(ZTSProgress& arProgress) {
    std::array<std::uint8_t, 3> lBegin{ZTRO_Success, 0, 0};
    ssize_t lCount;
    do {
        lCount = pread(mPart->mFile.get(), lBegin.data(), lBegin.size(), gcFrameHeaderSize);
    } while (lCount < 0 && errno == EINTR);
    if (lCount < 0) {
        throw ZTCSpoolTroubleEx("cannot read " + mrSpool.pathOf(mPart->mName), errno);
    }
    const std::uint8_t lOutcome = lBegin[0];
    const auto lStatus = static_cast<std::uint16_t>(lBegin[1] << 8U | lBegin[2]);
    if (lOutcome >= ZTRO_ScopeData) {
        const std::uint64_t lSize = mPart->mSize;
        arProgress.mSpooled.push_back({mrSpool.finish(*mPart), lSize});
    } else {
        mrSpool.discard(*mPart);
    }
    mPart.reset();
    if (isAnswer(lOutcome, lStatus)) {
        arProgress.mAnswers.push_back({*mRequest, lOutcome, lStatus});
        mRequest.reset();
    } else {
        ++arProgress.mLateAnswers;
    }
}

/// Whether the FIFO is empty and nobody has it open for writing. poll() does not say so where nobody ever had, and a
/// read could take a byte away. tee(2) copies, and says it.
static bool sIsAtItsEnd(int aFifo) {
    std::array<int, 2> lEnds{-1, -1};
    if (pipe2(lEnds.data(), O_NONBLOCK | O_CLOEXEC) != 0) {
        throw ZTCSystemCallEx("cannot make a pipe", errno);
    }
    const ZTCFileDescriptor lReadEnd(lEnds[0]);
    const ZTCFileDescriptor lWriteEnd(lEnds[1]);
    ssize_t lCopied;
    do {
        lCopied = tee(aFifo, lWriteEnd.get(), 1, SPLICE_F_NONBLOCK);
    } while (lCopied < 0 && errno == EINTR);
    return lCopied == 0;
}

static bool sHasBytes(int aFifo) {
    int lWaiting = 0;
    return ioctl(aFifo, FIONREAD, &lWaiting) == 0 && lWaiting != 0;
}

/// Makes the next `.part` where one is needed. False: none is, since nothing comes.
bool ZTCSpoolingConversation::preparePart(bool aIsExpecting) {
    if (!mPart && (aIsExpecting || sHasBytes(mResponseFifo.get()))) {
        mPart = mrSpool.createPart(mrSpool.takeNumber(), mGeneration, gcResponseReserve);
    }
    return mPart.has_value();
}

/// False: nothing more is there.
bool ZTCSpoolingConversation::receiveOne(ZTSProgress& arProgress) {
    const std::uint64_t lBefore = mPart->mSize;
    try {
        const ZTSReceptionResult lResult = receiveFrame(mrSpool, *mPart, mResponseFifo.get());
        arProgress.mMoved += lResult.mMoved;
        if (lResult.mReception != ZTRX_Whole) {
            return false;
        }
    } catch (const ZTCSpoolTroubleEx&) {
        arProgress.mMoved += mPart->mSize - lBefore;
        throw;
    }
    settleFrame(arProgress);
    return true;
}

void ZTCSpoolingConversation::advance(ZTSProgress& arProgress) {
    while (isAttached() && preparePart(mRequest.has_value()) && receiveOne(arProgress)) {
    }
}

bool ZTCSpoolingConversation::drain(ZTSProgress& arProgress) {
    if (!isAttached()) {
        return true;
    }
    mCommandFifo.reset();
    mRequest.reset();
    mNeedsMarker = false;
    while (preparePart(false) && receiveOne(arProgress)) {
    }
    if (!sIsAtItsEnd(mResponseFifo.get())) {
        return false;
    }
    if (mPart) {
        const std::uint64_t lSize = mPart->mSize;
        const ZTSSpoolName lName = mrSpool.tear(*mPart);
        mPart.reset();
        if (lName.mState == ZTSPS_Torn) {
            arProgress.mSpooled.push_back({lName, lSize});
        }
    }
    mResponseFifo.reset();
    return true;
}
