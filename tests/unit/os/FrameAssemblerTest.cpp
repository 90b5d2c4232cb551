#include "os/common/include/FrameAssembler.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "common/include/Exception.h"

#include "tests/support/Seed.h"

static std::string sHeader(std::uint32_t aLength) {
    std::string lHeader;
    for (int lShift = 24; lShift >= 0; lShift -= 8) {
        lHeader += static_cast<char>((aLength >> lShift) & 0xff);
    }
    return lHeader;
}

static std::string sFrame(const std::string& acrBody) {
    return sHeader(static_cast<std::uint32_t>(acrBody.size())) + acrBody;
}

static std::string sText(const ZTCPointer<ZTCBuffer>& acrBuffer) {
    return std::string(reinterpret_cast<const char*>(acrBuffer->getData()), acrBuffer->getSize());
}

/// Feeds a piece as a reader would, never more than the assembler wants; the bodies that were completed.
static std::vector<std::string> sFeed(ZTCFrameAssembler& arAssembler, const std::string& acrPiece) {
    std::vector<std::string> lBodies;
    std::size_t lOffset = 0;
    while (lOffset < acrPiece.size()) {
        const std::size_t lCount = std::min<std::size_t>(arAssembler.getWanted(), acrPiece.size() - lOffset);
        if (lCount == 0) {
            ADD_FAILURE() << "nothing is wanted of what remains";
            break;
        }
        std::memcpy(arAssembler.getSpace(), acrPiece.data() + lOffset, lCount);
        arAssembler.commit(static_cast<Size>(lCount));
        lOffset += lCount;
        if (arAssembler.getState() == ZTFS_Complete) {
            lBodies.push_back(sText(arAssembler.take()));
        }
    }
    return lBodies;
}

TEST(FrameAssembler, AStreamMayBeCutAtEveryPlace) {
    const std::vector<std::string> lcBodies = {"x", std::string("\0\0\0\1", 4), "a longer body", "y"};
    std::string lStream;
    for (const std::string& lcrBody : lcBodies) {
        lStream += sFrame(lcrBody);
    }
    for (std::size_t lFirst = 0; lFirst <= lStream.size(); ++lFirst) {
        for (std::size_t lSecond = lFirst; lSecond <= lStream.size(); ++lSecond) {
            ZTCFrameAssembler lAssembler;
            std::vector<std::string> lGot;
            for (const std::string& lcrPiece :
                 {lStream.substr(0, lFirst), lStream.substr(lFirst, lSecond - lFirst), lStream.substr(lSecond)}) {
                const std::vector<std::string> lBodies = sFeed(lAssembler, lcrPiece);
                lGot.insert(lGot.end(), lBodies.begin(), lBodies.end());
            }
            ASSERT_EQ(lGot, lcBodies) << "cut at " << lFirst << " and " << lSecond;
        }
    }
}

TEST(FrameAssembler, RandomCutsOfRandomFramesYieldTheSameBodies) {
    ZTCTestSeed lSeed;
    std::mt19937& lRandom = lSeed.engine();
    for (int lRound = 0; lRound < 200; ++lRound) {
        std::vector<std::string> lBodies;
        std::string lStream;
        for (int lFrame = 0; lFrame < 8; ++lFrame) {
            lBodies.emplace_back(1 + lRandom() % 300, static_cast<char>('a' + lFrame));
            lStream += sFrame(lBodies.back());
        }
        ZTCFrameAssembler lAssembler;
        std::vector<std::string> lGot;
        for (std::size_t lOffset = 0; lOffset < lStream.size();) {
            const std::size_t lCount = 1 + lRandom() % 97;
            const std::vector<std::string> lPart = sFeed(lAssembler, lStream.substr(lOffset, lCount));
            lGot.insert(lGot.end(), lPart.begin(), lPart.end());
            lOffset += lCount;
        }
        ASSERT_EQ(lGot, lBodies);
    }
}

TEST(FrameAssembler, TheLengthHasExactLimits) {
    const struct {
        std::uint32_t mLength;
        ZTEFrameState mState;
    } lcRows[] = {{0, ZTFS_BadLength},          {1, ZTFS_Incomplete},          {1048575, ZTFS_Incomplete},
                  {1048576, ZTFS_Incomplete},   {1048577, ZTFS_BadLength},     {0x7fffffff, ZTFS_BadLength},
                  {0x80000000, ZTFS_BadLength}, {0xfffffffcu, ZTFS_BadLength}, {0xffffffffu, ZTFS_BadLength}};
    for (const auto& lcrRow : lcRows) {
        ZTCFrameAssembler lAssembler;
        const std::string lHeader = sHeader(lcrRow.mLength);
        std::memcpy(lAssembler.getSpace(), lHeader.data(), lHeader.size());
        lAssembler.commit(4);
        EXPECT_EQ(lAssembler.getState(), lcrRow.mState) << lcrRow.mLength;
        EXPECT_EQ(lAssembler.getLength(), lcrRow.mLength);
        EXPECT_EQ(lAssembler.getWanted(), lcrRow.mState == ZTFS_BadLength ? 0 : lcrRow.mLength);
        EXPECT_EQ(lAssembler.getTotal(), std::uint64_t{lcrRow.mLength} + 4);
        EXPECT_EQ(lAssembler.getHad(), 4u);
    }
}

TEST(FrameAssembler, TheLargestBodyIsTakenWhole) {
    const std::string lcBody(1048576, 'z');
    ZTCFrameAssembler lAssembler;
    const std::vector<std::string> lBodies = sFeed(lAssembler, sFrame(lcBody));
    ASSERT_EQ(lBodies.size(), 1u);
    EXPECT_EQ(lBodies[0], lcBody);
}

TEST(FrameAssembler, ItSaysWhatItHasAndWhatTheFrameIs) {
    ZTCFrameAssembler lAssembler;
    EXPECT_EQ(lAssembler.getHad(), 0u);
    EXPECT_EQ(lAssembler.getTotal(), 4u);
    EXPECT_EQ(lAssembler.getWanted(), 4u);
    sFeed(lAssembler, sHeader(10).substr(0, 3));
    EXPECT_EQ(lAssembler.getHad(), 3u);
    EXPECT_EQ(lAssembler.getTotal(), 4u);
    EXPECT_EQ(lAssembler.getWanted(), 1u);
    sFeed(lAssembler, sHeader(10).substr(3) + "abc");
    EXPECT_EQ(lAssembler.getHad(), 7u);
    EXPECT_EQ(lAssembler.getTotal(), 14u);
    EXPECT_EQ(lAssembler.getWanted(), 7u);
}

TEST(FrameAssembler, MoreThanIsWantedIsRefused) {
    ZTCFrameAssembler lAssembler;
    EXPECT_THROW(lAssembler.commit(5), ZTCInvalidEx);
    EXPECT_EQ(lAssembler.getHad(), 0u);
}

TEST(FrameAssembler, OnlyACompleteFrameCanBeTaken) {
    ZTCFrameAssembler lAssembler;
    EXPECT_THROW(lAssembler.take(), ZTCInvalidEx);
    sFeed(lAssembler, sHeader(2) + "a");
    EXPECT_THROW(lAssembler.take(), ZTCInvalidEx);
}

TEST(FrameAssembler, ABodyThatWasTakenIsNotTouchedByTheNextFrame) {
    ZTCFrameAssembler lAssembler;
    const std::string lStream = sFrame("first");
    std::memcpy(lAssembler.getSpace(), lStream.data(), 4);
    lAssembler.commit(4);
    std::memcpy(lAssembler.getSpace(), lStream.data() + 4, 5);
    lAssembler.commit(5);
    const ZTCPointer<ZTCBuffer> lFirst = lAssembler.take();
    EXPECT_EQ(sFeed(lAssembler, sFrame("other")), std::vector<std::string>{"other"});
    EXPECT_EQ(sText(lFirst), "first");
}

TEST(FrameAssembler, AResetForgetsWhatWasBroken) {
    ZTCFrameAssembler lAssembler;
    std::memcpy(lAssembler.getSpace(), "\0\0\0\0", 4);
    lAssembler.commit(4);
    ASSERT_EQ(lAssembler.getState(), ZTFS_BadLength);
    lAssembler.reset();
    EXPECT_EQ(sFeed(lAssembler, sFrame("good")), std::vector<std::string>{"good"});
}

TEST(FrameAssembler, TheLimitIsItsOwn) {
    ZTCFrameAssembler lAssembler(3);
    EXPECT_EQ(sFeed(lAssembler, sFrame("abc")), std::vector<std::string>{"abc"});
    std::memcpy(lAssembler.getSpace(), "\0\0\0\4", 4);
    lAssembler.commit(4);
    EXPECT_EQ(lAssembler.getState(), ZTFS_BadLength);
}
