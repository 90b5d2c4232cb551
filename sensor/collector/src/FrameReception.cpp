#include "sensor/collector/include/FrameReception.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"

std::optional<std::uint64_t> getFrameSize(const ZTSSpoolPart& acrPart) {
    if (acrPart.mSize < gcFrameHeaderSize) {
        return std::nullopt;
    }
    std::array<std::uint8_t, gcFrameHeaderSize> lHeader{};
    ssize_t lCount;
    do {
        lCount = pread(acrPart.mFile.get(), lHeader.data(), lHeader.size(), 0);
    } while (lCount < 0 && errno == EINTR);
    if (lCount != static_cast<ssize_t>(lHeader.size())) {
        throw ZTCSpoolTroubleEx("cannot read the length in " + acrPart.mName.toText(), lCount < 0 ? errno : EIO);
    }
    std::uint64_t lLength = 0;
    for (const std::uint8_t lByte : lHeader) {
        lLength = lLength << 8U | lByte;
    }
    return lLength + gcFrameHeaderSize;
}

ZTSReceptionResult receiveFrame(ZTCSpool& arSpool, ZTSSpoolPart& arPart, int aFifo) {
    ZTSReceptionResult lResult;
    std::optional<std::uint64_t> lFrameSize = getFrameSize(arPart);
    while (true) {
        if (!lFrameSize) {
            lFrameSize = getFrameSize(arPart);
        }
        const std::uint64_t lGoal = lFrameSize.value_or(gcFrameHeaderSize);
        if (lFrameSize && arPart.mSize >= lGoal) {
            lResult.mReception = ZTRX_Whole;
            return lResult;
        }
        arSpool.reserve(arPart, lGoal);
        off_t lOffset = static_cast<off_t>(arPart.mSize);
        const ssize_t lMoved = splice(aFifo, nullptr, arPart.mFile.get(), &lOffset, lGoal - arPart.mSize,
                                      SPLICE_F_NONBLOCK | SPLICE_F_MOVE);
        if (lMoved > 0) {
            arPart.mSize += static_cast<std::uint64_t>(lMoved);
            lResult.mMoved += static_cast<std::uint64_t>(lMoved);
        } else if (lMoved == 0) {
            lResult.mReception = ZTRX_HungUp;
            return lResult;
        } else if (errno == EAGAIN) {
            return lResult;
        } else if (errno != EINTR) {
            throw ZTCSpoolTroubleEx("cannot write " + arSpool.pathOf(arPart.mName), errno);
        }
    }
}
