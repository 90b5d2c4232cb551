#include "os/common/include/NamedPipe.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cinttypes>
#include <climits>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"
#include "os/common/include/Descriptor.h"
#include "os/common/include/ProcessEvents.h"

namespace {

constexpr ::mode_t scFifoMode = 0600;
constexpr int scRetryMilliseconds = 100;
constexpr int scWriterMilliseconds = 100;  // a writer that found room goes on within
constexpr int scNoTimeLimit = -1;
constexpr int scNotOpen = 0;

[[noreturn]] void sThrowNoFifo(const char* apPath, ::mode_t aMode) {
    throwWith<ZTCInvalidEx>("'%s' is %s, not a FIFO; it is left untouched", apPath, ClibFileKind(aMode));
}

[[noreturn]] void sThrowOpenFailed(const char* apPath, const char* apReason) {
    throwWith<ZTCClibOpenFailedEx>("Opening the FIFO '%s' failed: %s", apPath, apReason);
}

/// Before the path is opened: opening a device or the like could have effects of its own.
struct stat sRequireFifo(const char* apPath) {
    struct stat lStatus {};
    if (!ClibLstat(apPath, &lStatus)) {
        sThrowOpenFailed(apPath, "there is none");
    }
    if (!S_ISFIFO(lStatus.st_mode)) {
        sThrowNoFifo(apPath, lStatus.st_mode);
    }
    return lStatus;
}

/// A FIFO that is taken over may be open to more than the one that would have been made.
void sWarnOfSharedFifo(const char* apPath, const struct stat& acrStatus) {
    const unsigned lMode = acrStatus.st_mode & 07777;
    if ((lMode & ~scFifoMode) != 0 || acrStatus.st_uid != ::geteuid()) {
        char lShown[16];
        ClibSprintf(lShown, sizeof(lShown), "%04o", lMode);
        ZT_LOG_WARN(
            "The FIFO '%s' was there already, with owner %u and mode %s: whoever may open it can talk in the place of "
            "the sensor or the agent; to have it made anew, stop the agent and remove it",
            apPath, acrStatus.st_uid, lShown);
    }
}

struct stat sStatusOfFifo(const char* apPath, int aDescriptor) {
    struct stat lStatus {};
    ClibFstat(aDescriptor, &lStatus);
    if (!S_ISFIFO(lStatus.st_mode)) {
        sThrowNoFifo(apPath, lStatus.st_mode);
    }
    return lStatus;
}

/// Waits until the pipe can be read or written, as aEvents says. False when the exit event or the end of the time comes
/// first; a signal begins the time anew.
bool sWaitFor(int aDescriptor, short aEvents, int aMilliseconds) {
    for (;;) {
        struct pollfd lDescriptors[2] = {{aDescriptor, aEvents, 0}, {getExitEvent().getDescriptor(), POLLIN, 0}};
        const int lReady = ClibPoll(lDescriptors, 2, aMilliseconds);
        if (lReady == -EINTR) {
            continue;
        }
        if (lReady == 0 || lDescriptors[1].revents != 0) {
            return false;
        }
        if (lDescriptors[0].revents != 0) {
            return true;
        }
    }
}

[[noreturn]] void sThrowWriteFailed(const char* apPath, std::uint64_t aWritten, std::uint64_t aWanted,
                                    const char* apReason) {
    throwWith<ZTCClibWriteFailedEx>("Writing to '%s' ended after %" PRIu64 " of %" PRIu64 " bytes: %s", apPath,
                                    aWritten, aWanted, apReason);
}

}  // namespace

ZTCNamedPipe::ZTCNamedPipe(const ZTCString& acrPath, ZTEFileMode aFileMode, ZTEPipeState aPipeState,
                           ZTEConnectionMode aConnectionMode)
    : mPath(acrPath), mPipeState(aPipeState), mFileMode(aFileMode), mConnectionMode(aConnectionMode) {}

ZTCNamedPipe::~ZTCNamedPipe() {
    ZTCNamedPipe::close();
}

void ZTCNamedPipe::create() {
    if (mConnectionMode == ZTCM_Client) {
        sRequireFifo(mPath.get());
        return;
    }
    try {
        ClibMkfifo(mPath.get(), scFifoMode);
        return;
    } catch (const ZTCExistsEx&) {
        sWarnOfSharedFifo(mPath.get(), sRequireFifo(mPath.get()));
    }
    ZT_LOG_INFO("The FIFO '%s' is there already and is taken over", mPath.get());
}

void ZTCNamedPipe::open() {
    if (mDescriptor != scNotOpen) {
        sThrowOpenFailed(mPath.get(), "it is open already");
    }
    switch (mFileMode) {
        case ZTFM_Read:
            openForReading();
            break;
        case ZTFM_Write:
            openForWriting();
            break;
        default:
            throw ZTCNotImplementedEx("A FIFO is opened for reading or for writing alone");
    }
}

void ZTCNamedPipe::openForReading() {
    const char* lpPath = mPath.get();
    sRequireFifo(lpPath);
    ZTCDescriptor lReader(ClibOpen(lpPath, O_RDONLY | O_NONBLOCK | O_NOFOLLOW));
    const struct stat lReaderStatus = sStatusOfFifo(lpPath, lReader.get());

    ZTCDescriptor lWriter(ClibOpen(lpPath, O_WRONLY | O_NONBLOCK | O_NOFOLLOW));
    const struct stat lWriterStatus = sStatusOfFifo(lpPath, lWriter.get());
    if (lReaderStatus.st_dev != lWriterStatus.st_dev || lReaderStatus.st_ino != lWriterStatus.st_ino) {
        sThrowOpenFailed(lpPath, "it was replaced meanwhile");
    }
    mDescriptor = lReader.release();
    mOwnWriterDescriptor = lWriter.release();
}

void ZTCNamedPipe::openForWriting() {
    const char* lpPath = mPath.get();
    bool lIsAnnounced = false;
    for (;;) {
        sRequireFifo(lpPath);
        const int lDescriptor = ClibTryOpen(lpPath, O_WRONLY | O_NONBLOCK | O_NOFOLLOW);
        if (lDescriptor >= 0) {
            ZTCDescriptor lWriter(lDescriptor);
            sStatusOfFifo(lpPath, lWriter.get());
            mDescriptor = lWriter.release();
            return;
        }
        if (lDescriptor != -ENXIO) {
            sThrowOpenFailed(lpPath, ZTCErrnoText(-lDescriptor).get());
        }
        if (mPipeState != ZTNPS_Block) {
            sThrowOpenFailed(lpPath, "nobody reads it");
        }
        if (!lIsAnnounced) {
            ZT_LOG_NOTICE("Waiting for a reader of '%s'", lpPath);
            lIsAnnounced = true;
        }
        if (getStopEvent().waitFor(scRetryMilliseconds)) {
            char lText[512];
            ClibSprintf(lText, sizeof(lText), "Told to stop while waiting for a reader of '%s'", lpPath);
            ZT_LOG_NOTICE("%s", lText);
            throw ZTCExitConditionEx(lText, gcErrStop);
        }
    }
}

void ZTCNamedPipe::close() {
    if (mDescriptor != scNotOpen) {
        ClibClose(mDescriptor);
        mDescriptor = scNotOpen;
    }
    if (mOwnWriterDescriptor != scNotOpen) {
        ClibClose(mOwnWriterDescriptor);
        mOwnWriterDescriptor = scNotOpen;
    }
    mAssembler.reset();
}

void ZTCNamedPipe::destroy() {
    if (mConnectionMode == ZTCM_Client) {
        return;
    }
    struct stat lStatus {};
    if (!ClibLstat(mPath.get(), &lStatus)) {
        return;
    }
    if (!S_ISFIFO(lStatus.st_mode)) {
        ZT_LOG_WARN("'%s' is %s now, not a FIFO; it is left where it is", mPath.get(), ClibFileKind(lStatus.st_mode));
        return;
    }
    ClibUnlink(mPath.get());
}

void ZTCNamedPipe::accept() {}

void ZTCNamedPipe::read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) {
    arCount = 0;
    if (mAssembler.getState() != ZTFS_Complete) {
        throwWith<ZTCClibReadFailedEx>("Reading from '%s' failed: no whole message is there", mPath.get());
    }
    arBuffer = mAssembler.take();
    arCount = arBuffer->getSize();
}

void ZTCNamedPipe::write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) {
    constexpr std::uint64_t lcHeaderSize = ZTCFrameAssembler::gcHeaderSize;
    arCount = 0;

    // The parts are only read, but the system's structure has no const.
    Size lHeader = ClibHtonl(acrBuffer->getSize());
    struct iovec lParts[2] = {{&lHeader, sizeof(lHeader)}, {acrBuffer->getData(), acrBuffer->getSize()}};
    const std::uint64_t lWanted = lcHeaderSize + acrBuffer->getSize();
    std::uint64_t lWritten = 0;

    if (mDescriptor == scNotOpen) {
        sThrowWriteFailed(mPath.get(), lWritten, lWanted, "it is not open");
    }
    while (lWritten < lWanted) {
        const int lFirst = lParts[0].iov_len > 0 ? 0 : 1;
        const int lNumberOfParts = lParts[1].iov_len > 0 ? 2 - lFirst : 1;
        const ::ssize_t lResult = ClibWritev(mDescriptor, lParts + lFirst, lNumberOfParts);
        if (lResult > 0) {
            std::size_t lCount = static_cast<std::size_t>(lResult);
            lWritten += lCount;
            for (struct iovec& lrPart : lParts) {
                const std::size_t lOfPart = ZT_MIN(lCount, lrPart.iov_len);
                if (lOfPart > 0) {
                    lrPart.iov_base = static_cast<unsigned char*>(lrPart.iov_base) + lOfPart;
                    lrPart.iov_len -= lOfPart;
                    lCount -= lOfPart;
                }
            }
            arCount = lWritten > lcHeaderSize ? static_cast<unsigned>(lWritten - lcHeaderSize) : 0;
        } else if (lResult == 0) {
            sThrowWriteFailed(mPath.get(), lWritten, lWanted, "it takes nothing");
        } else if (lResult == -EINTR) {
            continue;
        } else if (lResult == -EPIPE) {
            sThrowWriteFailed(mPath.get(), lWritten, lWanted, "its reader has gone");
        } else if (!sWaitFor(mDescriptor, POLLOUT, scNoTimeLimit)) {
            sThrowWriteFailed(mPath.get(), lWritten, lWanted, "the threads are to exit and its reader does not read");
        }
    }
}

void ZTCNamedPipe::waitForActivity(unsigned aSeconds) {
    waitForActivity(std::chrono::seconds(aSeconds));
}

void ZTCNamedPipe::waitForActivity(std::chrono::milliseconds aTime) {
    const std::int64_t lIdleDeadline = ClibMonotonicMilliseconds() + aTime.count();
    std::int64_t lDeadline = lIdleDeadline;
    if (mAssembler.getHad() == 0 && mDescriptor == scNotOpen) {
        throwWith<ZTCClibReadFailedEx>("Waiting on '%s' failed: it is not open", mPath.get());
    }

    while (mAssembler.getState() != ZTFS_Complete) {
        const std::int64_t lLeft = ZT_MAX(lDeadline - ClibMonotonicMilliseconds(), std::int64_t{0});
        const int lMilliseconds = static_cast<int>(ZT_MIN(lLeft, std::int64_t{INT_MAX}));
        struct pollfd lDescriptors[2] = {{mDescriptor, POLLIN, 0}, {getExitEvent().getDescriptor(), POLLIN, 0}};
        const int lReady = ClibPoll(lDescriptors, 2, lMilliseconds);
        if (lReady == -EINTR) {
            continue;
        }
        if (lDescriptors[1].revents != 0) {
            return;
        }
        if (lReady == 0) {
            if (lLeft > lMilliseconds) {
                continue;
            }
            if (mAssembler.getHad() > 0) {
                discardPartialFrame();
            }
            throw ZTCTimeOutEx();
        }
        if (readAvailable()) {
            lDeadline = ClibMonotonicMilliseconds() + aTime.count();
        }
        if (mAssembler.getState() == ZTFS_BadLength) {
            discardBrokenFrame();
            lDeadline = lIdleDeadline;
        }
    }
}

/// Reads once. True where bytes came.
bool ZTCNamedPipe::readAvailable() {
    const ::ssize_t lCount = ClibRead(mDescriptor, mAssembler.getSpace(), mAssembler.getWanted());
    if (lCount == -EINTR || lCount == -EAGAIN) {
        return false;
    }
    if (lCount == 0) {
        // The own writing end rules this out; going on would spin.
        throwWith<ZTCClibReadFailedEx>("Reading from '%s' failed: unexpected end of file", mPath.get());
    }
    mAssembler.commit(static_cast<Size>(lCount));
    return true;
}

void ZTCNamedPipe::discardBrokenFrame() {
    const Size lLength = mAssembler.getLength();
    mAssembler.reset();
    const std::size_t lDrained = drain(ZT_MAX(lLength, gcMaxRequestSize));
    ZT_LOG_ERR(
        "A message of %u bytes on '%s' is refused, its length has to be 1 to %u; %zu bytes behind it are thrown away",
        lLength, mPath.get(), gcMaxRequestSize, lDrained);
}

void ZTCNamedPipe::discardPartialFrame() {
    ZT_LOG_ERR("A message on '%s' broke off after %u of %" PRIu64 " bytes, its length included; it is thrown away",
               mPath.get(), mAssembler.getHad(), mAssembler.getTotal());
    mAssembler.reset();
}

/// Throws away what waits in the pipe, and says how much that was. A pipe that is full has a writer in the middle of a
/// write: what it still has to write belongs to the same message and goes too, up to aMost bytes in all, so that a
/// sensor that writes without end does not keep this from ending.
std::size_t ZTCNamedPipe::drain(std::uint64_t aMost) {
    std::size_t lDrained = 0;
    std::size_t lWaiting = ClibBytesWaiting(mDescriptor);
    const bool lIsWriterBusy = lWaiting + PIPE_BUF >= ClibPipeCapacity(mDescriptor);
    while (lWaiting > 0) {
        unsigned char lScrap[4096];
        const ::ssize_t lCount = ClibRead(mDescriptor, lScrap, ZT_MIN(lWaiting, sizeof(lScrap)));
        if (lCount == 0) {
            break;
        }
        if (lCount > 0) {
            lDrained += static_cast<std::size_t>(lCount);
            lWaiting -= static_cast<std::size_t>(lCount);
        } else {
            // Interrupted, or another reader has taken some.
            lWaiting = ZT_MIN(lWaiting, ClibBytesWaiting(mDescriptor));
        }
        if (lWaiting == 0 && lIsWriterBusy && lDrained < aMost && sWaitFor(mDescriptor, POLLIN, scWriterMilliseconds)) {
            lWaiting = ClibBytesWaiting(mDescriptor);
        }
    }
    return lDrained;
}
