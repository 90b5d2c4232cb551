#include "sensor/collector/include/FrameReception.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <memory>
#include <span>

#include "tests/support/Seed.h"
#include "tests/support/SmallFileSystem.h"
#include "tests/support/TemporaryDirectory.h"

static std::vector<std::uint8_t> sFrame(std::size_t aBodySize) {
    std::vector<std::uint8_t> lFrame;
    for (int lShift = 24; lShift >= 0; lShift -= 8) {
        lFrame.push_back(static_cast<std::uint8_t>(aBodySize >> lShift));
    }
    for (std::size_t i = 0; i < aBodySize; ++i) {
        lFrame.push_back(static_cast<std::uint8_t>(i * 7 + i / 256));
    }
    return lFrame;
}

class FrameReceptionTest : public testing::Test {
protected:
    FrameReceptionTest() {
        std::array<int, 2> lEnds{};
        EXPECT_EQ(pipe2(lEnds.data(), O_NONBLOCK | O_CLOEXEC), 0);
        mReadEnd = ZTCFileDescriptor(lEnds[0]);
        mWriteEnd = ZTCFileDescriptor(lEnds[1]);
        EXPECT_GT(fcntl(mWriteEnd.get(), F_SETPIPE_SZ, 1 << 20), 0);
    }
    void start(const std::string& acrFolder, std::uint64_t aReserve = gcShortReserve) {
        mSpool = std::make_unique<ZTCSpool>(acrFolder);
        mSpool->open();
        mPart = mSpool->createPart(1, "ab", aReserve);
    }
    void put(std::span<const std::uint8_t> aBytes) {
        ASSERT_EQ(write(mWriteEnd.get(), aBytes.data(), aBytes.size()), static_cast<ssize_t>(aBytes.size()));
    }
    ZTEReception receive() { return receiveFrame(*mSpool, mPart, mReadEnd.get()).mReception; }
    int bytesInFifo() const {
        int lCount = 0;
        EXPECT_EQ(ioctl(mReadEnd.get(), FIONREAD, &lCount), 0);
        return lCount;
    }
    std::vector<std::uint8_t> content() { return mSpool->read(mSpool->finish(mPart)); }

    ZTCTemporaryDirectory mDirectory;
    ZTCFileDescriptor mReadEnd;
    ZTCFileDescriptor mWriteEnd;
    std::unique_ptr<ZTCSpool> mSpool;
    ZTSSpoolPart mPart;
};

TEST_F(FrameReceptionTest, AWholeFrameIsMovedAndNoByteBehindIt) {
    start(mDirectory.path("spool"));
    const std::vector<std::uint8_t> lFrame = sFrame(300000);
    put(lFrame);
    put(std::array<std::uint8_t, 3>{1, 2, 3});
    EXPECT_EQ(receive(), ZTRX_Whole);
    EXPECT_EQ(receive(), ZTRX_Whole);
    EXPECT_EQ(bytesInFifo(), 3);
    EXPECT_TRUE(content() == lFrame);
}

TEST_F(FrameReceptionTest, AFrameWithoutABodyIsFourBytes) {
    start(mDirectory.path("spool"));
    put(sFrame(0));
    put(sFrame(1));
    EXPECT_EQ(receive(), ZTRX_Whole);
    EXPECT_EQ(mPart.mSize, 4U);
    EXPECT_EQ(bytesInFifo(), 5);
}

TEST_F(FrameReceptionTest, AnEmptyFifoIsWaitedForAndOneWithoutAWriterHasHungUp) {
    start(mDirectory.path("spool"));
    EXPECT_EQ(receive(), ZTRX_Waiting);
    put(std::array<std::uint8_t, 2>{0, 0});
    EXPECT_EQ(receive(), ZTRX_Waiting);
    EXPECT_EQ(mPart.mSize, 2U);
    mWriteEnd.reset();
    EXPECT_EQ(receive(), ZTRX_HungUp);
}

TEST_F(FrameReceptionTest, AFrameCutAnywhereIsPutTogetherByAnotherProcessWithTheFileAlone) {
    ZTCTestSeed lSeed;
    const std::vector<std::uint8_t> lFrame = sFrame(2000);
    for (std::size_t lCut = 0; lCut <= lFrame.size(); lCut = lCut < 12 ? lCut + 1 : lCut + 1 + lSeed.below(97)) {
        const std::string lFolder = mDirectory.path("spool" + std::to_string(lCut));
        start(lFolder);
        put(std::span(lFrame).first(lCut));
        EXPECT_EQ(receive(), lCut == lFrame.size() ? ZTRX_Whole : ZTRX_Waiting);
        put(std::span(lFrame).subspan(lCut));
        mPart = mSpool->openPart(mPart.mName);  // all that a process after this one knows
        EXPECT_EQ(mPart.mSize, lCut);
        EXPECT_EQ(receive(), ZTRX_Whole);
        EXPECT_TRUE(content() == lFrame) << "cut at " << lCut;
    }
}

TEST_F(FrameReceptionTest, MoreRoomIsReservedWhereTheAnnouncedLengthNeedsIt) {
    start(mDirectory.path("spool"));
    put(std::array<std::uint8_t, 4>{0, 0x20, 0, 0});
    EXPECT_EQ(receive(), ZTRX_Waiting);
    EXPECT_EQ(mPart.mReserved, 0x200004U);
}

TEST_F(FrameReceptionTest, OnAFullDiskNoByteIsLost) {
    const ZTCTemporaryDirectory lMountPoint;
    ZTCSmallFileSystem lFileSystem(lMountPoint.path(), 1024);
    if (!lFileSystem.isMounted()) {
        GTEST_SKIP() << "no file system can be mounted here";
    }
    start(lMountPoint.path("spool"));
    lFileSystem.fill();
    const std::vector<std::uint8_t> lFrame = sFrame(200000);
    put(lFrame);
    EXPECT_THROW(receive(), ZTCSpoolTroubleEx);
    EXPECT_EQ(static_cast<std::size_t>(bytesInFifo()) + mPart.mSize, lFrame.size());
    EXPECT_THROW(receive(), ZTCSpoolTroubleEx);
    lFileSystem.empty();
    EXPECT_EQ(receive(), ZTRX_Whole);
    EXPECT_TRUE(content() == lFrame);
    mPart.mFile.reset();
}

TEST_F(FrameReceptionTest, OnAReadOnlyDiskNoByteIsLost) {
    const ZTCTemporaryDirectory lMountPoint;
    ZTCSmallFileSystem lFileSystem(lMountPoint.path(), 1024);
    if (!lFileSystem.isMounted()) {
        GTEST_SKIP() << "no file system can be mounted here";
    }
    start(lMountPoint.path("spool"));
    const std::vector<std::uint8_t> lFrame = sFrame(1000);
    put(lFrame);
    EXPECT_EQ(receive(), ZTRX_Whole);
    lFileSystem.makeReadOnly();
    EXPECT_THROW(mSpool->finish(mPart), ZTCSpoolTroubleEx);
    lFileSystem.makeWritable();
    EXPECT_TRUE(content() == lFrame);
}
