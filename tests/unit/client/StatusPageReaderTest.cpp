#include "sensor/client/include/StatusPageReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <random>

#include "libkpm/include/ScopeEventKinds.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/Seed.h"
#include "tests/support/StatusPageFile.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/TestThreads.h"

namespace {

using ::testing::HasSubstr;

class StatusPageReader : public ::testing::Test {
protected:
    ZTCTemporaryDirectory mDirectory;
    const std::string mPath = mDirectory.path("page");
    ZTCStatusPageReader mReader;
    ZTSStatusSnapshot mSnapshot;

    void expectRefused(const std::string& acrReason) {
        EXPECT_FALSE(mReader.open(mPath));
        EXPECT_FALSE(mReader.isOpen());
        EXPECT_THAT(mReader.getReason(), HasSubstr(acrReason));
        EXPECT_THAT(mReader.getReason(), HasSubstr(mPath));
        EXPECT_FALSE(mReader.read(mSnapshot));
        EXPECT_THAT(mReader.getReason(), HasSubstr("no page is open"));
    }
};

TEST_F(StatusPageReader, CopiesTheHeader) {
    ZTCStatusPageFile lFile(mPath);
    ZTSStatusHeader& lrHeader = lFile.header();
    lrHeader.mStartId[0] = 0x0123456789abcdef;
    lrHeader.mStartId[1] = 0x00000000000000ff;
    lrHeader.mPid = 4711;
    lrHeader.mStartTime = 11;
    lrHeader.mAdaptersAtStart = 2;
    lrHeader.mAdaptersNow = 3;
    lrHeader.mCollecting = 1;
    lrHeader.mRecordLimit = 900;
    lrHeader.mTotalLimit = 262144;
    lrHeader.mEndTime = 12;
    lrHeader.mEndReason = ZTSE_NoAdapters;
    lrHeader.mHeldBytes = 13;
    lrHeader.mHeldRecords = 14;
    lrHeader.mRetrievals = 15;
    lrHeader.mHandedOverRecords = 16;
    lrHeader.mHandedOverOccurrences = 17;
    lrHeader.mHandedOverBytes = 18;
    lrHeader.mLastRetrieval = 19;
    lrHeader.mLossesLost = 20;

    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();

    EXPECT_TRUE(mSnapshot.mIsConsistent);
    EXPECT_EQ(mSnapshot.mStartId, "0123456789abcdef00000000000000ff");
    EXPECT_EQ(mSnapshot.mPid, 4711U);
    EXPECT_EQ(mSnapshot.mStartTime, 11);
    EXPECT_EQ(mSnapshot.mAdaptersAtStart, 2U);
    EXPECT_EQ(mSnapshot.mAdaptersNow, 3U);
    EXPECT_TRUE(mSnapshot.mIsCollecting);
    EXPECT_EQ(mSnapshot.mRecordLimit, 900U);
    EXPECT_EQ(mSnapshot.mTotalLimit, 262144U);
    EXPECT_EQ(mSnapshot.mEndTime, 12);
    EXPECT_EQ(mSnapshot.mEndReason, ZTSE_NoAdapters);
    EXPECT_EQ(mSnapshot.mHeldBytes, 13U);
    EXPECT_EQ(mSnapshot.mHeldRecords, 14U);
    EXPECT_EQ(mSnapshot.mRetrievals, 15U);
    EXPECT_EQ(mSnapshot.mHandedOverRecords, 16U);
    EXPECT_EQ(mSnapshot.mHandedOverOccurrences, 17U);
    EXPECT_EQ(mSnapshot.mHandedOverBytes, 18U);
    EXPECT_EQ(mSnapshot.mLastRetrieval, 19);
    EXPECT_EQ(mSnapshot.mLossesLost, 20U);
    EXPECT_TRUE(mSnapshot.mBoards.empty());
}

TEST_F(StatusPageReader, CopiesTheRowsOfABoard) {
    ZTCStatusPageFile lFile(mPath, 2);
    std::memcpy(lFile.board(1).mWwnn, "nodename", 8);
    std::memcpy(lFile.board(1).mWwpn, "portname", 8);
    ZTSStatusRow& lrRow = lFile.row(1, 5);
    lrRow.mConsolidated = 100;
    lrRow.mHandedOver = 60;
    lrRow.mDropped = 7;
    lrRow.mLastConsolidated = 1000;
    lrRow.mLastRefused = 2000;
    lrRow.mRefused[ZTSR_TotalLimit] = 5;
    lrRow.mRefused[ZTSR_Failed] = 6;
    lrRow.mState = ZTSS_NoRights;
    lrRow.mStateSince = 3000;
    setText(lrRow.mStateReason, "needs CAP_NET_ADMIN");

    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();

    ASSERT_EQ(mSnapshot.mBoards.size(), 2U);
    EXPECT_EQ(std::memcmp(mSnapshot.mBoards[1].mWwnn.data(), "nodename", 8), 0);
    EXPECT_EQ(std::memcmp(mSnapshot.mBoards[1].mWwpn.data(), "portname", 8), 0);
    const ZTSStatusRowCopy& lrCopy = mSnapshot.mBoards[1].mRows[5];
    EXPECT_EQ(lrCopy.mConsolidated, 100U);
    EXPECT_EQ(lrCopy.mHandedOver, 60U);
    EXPECT_EQ(lrCopy.mDropped, 7U);
    EXPECT_EQ(lrCopy.getHeld(), 33U);
    EXPECT_EQ(lrCopy.mRefused[ZTSR_TotalLimit], 5U);
    EXPECT_EQ(lrCopy.getRefused(), 11U);
    EXPECT_EQ(lrCopy.getReceived(), 111U);
    EXPECT_EQ(lrCopy.mLastEvent, 2000);
    EXPECT_EQ(lrCopy.mState, ZTSS_NoRights);
    EXPECT_EQ(lrCopy.mStateSince, 3000);
    EXPECT_EQ(lrCopy.mStateReason, "needs CAP_NET_ADMIN");
    EXPECT_EQ(mSnapshot.getHeld(), 33U);
    EXPECT_EQ(mSnapshot.mBoards[0].mRows[5].getReceived(), 0U);
}

TEST_F(StatusPageReader, CopiesLossesAndUnknownBoards) {
    ZTCStatusPageFile lFile(mPath);
    setText(lFile.page().mLosses[0].mName, "fc messages");
    lFile.page().mLosses[0].mTotal = 3;
    // As long as a name can be, with no null byte behind it.
    setText(lFile.page().mLosses[1].mName, std::string(56, 'x'));
    lFile.header().mLossesUsed = 2;
    lFile.page().mUnknownBoards.mRefused[ZTSR_UnknownBoard] = 9;

    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();

    ASSERT_EQ(mSnapshot.mLosses.size(), 2U);
    EXPECT_EQ(mSnapshot.mLosses[0].mName, "fc messages");
    EXPECT_EQ(mSnapshot.mLosses[0].mTotal, 3U);
    EXPECT_EQ(mSnapshot.mLosses[1].mName, std::string(56, 'x'));
    EXPECT_EQ(mSnapshot.mUnknownBoards.getReceived(), 9U);
}

TEST_F(StatusPageReader, NamesTheRowsAsTheTableOfKindsDoes) {
    for (std::size_t lRow = 0; lRow < gcStatusKinds; ++lRow) {
        EXPECT_STREQ(getStatusRowName(lRow), gcScopeEventKinds[lRow].mpName);
    }
    EXPECT_STREQ(getStatusRowName(gcStatusOtherRow), "other");
}

TEST_F(StatusPageReader, SeesThatThePageHasGrown) {
    ZTCStatusPageFile lFile(mPath);
    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();
    ASSERT_TRUE(mSnapshot.mBoards.empty());
    lFile.grow(3);
    lFile.row(2, 20).mConsolidated = 8;

    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();

    ASSERT_EQ(mSnapshot.mBoards.size(), 3U);
    EXPECT_EQ(mSnapshot.mBoards[2].mRows[20].mConsolidated, 8U);
}

TEST_F(StatusPageReader, ReadsThePageOfAnEndedAgentAfterItsFileWasRemoved) {
    ZTCStatusPageFile lFile(mPath, 1);
    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    ASSERT_EQ(unlink(mPath.c_str()), 0);
    EXPECT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();
}

TEST_F(StatusPageReader, RefusesAFileThatIsNotThere) {
    expectRefused("cannot be opened: No such file or directory");
}

TEST_F(StatusPageReader, RefusesWhatIsNotARegularFile) {
    ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
    expectRefused("is not a regular file");
}

TEST_F(StatusPageReader, HasLookedWhereThePathIsWrongButNotWhereDescriptorsAreMissing) {
    const ZTCStatusPageFile lFile(mPath);
    {
        const ZTCResourceLimit lNoDescriptor(RLIMIT_NOFILE, 0);
        EXPECT_FALSE(mReader.open(mPath));
        EXPECT_FALSE(mReader.hasLooked()) << mReader.getReason();
    }
    EXPECT_FALSE(mReader.open(mPath + "/below a file"));
    EXPECT_TRUE(mReader.hasLooked()) << mReader.getReason();
    EXPECT_FALSE(mReader.open(mPath + std::string(300, 'x')));
    EXPECT_TRUE(mReader.hasLooked()) << mReader.getReason();
    EXPECT_TRUE(mReader.open(mPath)) << mReader.getReason();
    EXPECT_TRUE(mReader.hasLooked());
}

TEST_F(StatusPageReader, RefusesASymbolicLink) {
    ZTCStatusPageFile lFile(mDirectory.path("real"));
    ASSERT_EQ(symlink("real", mPath.c_str()), 0);
    expectRefused("cannot be opened");
}

TEST_F(StatusPageReader, RefusesAForeignFile) {
    writeFile(mPath, std::string(getStatusPageSize(0), 'x'));
    expectRefused("is not a status page");
}

TEST_F(StatusPageReader, RefusesAnotherVersionAndNamesBoth) {
    ZTCStatusPageFile lFile(mPath);
    lFile.header().mVersion = 2;
    expectRefused("has version 2, and this program reads version 1");
}

TEST_F(StatusPageReader, RefusesEachSizeThatIsNotThatOfItsVersion) {
    for (std::uint32_t ZTSStatusHeader::*lpSize :
         {&ZTSStatusHeader::mHeaderSize, &ZTSStatusHeader::mLossSize, &ZTSStatusHeader::mLosses,
          &ZTSStatusHeader::mRowSize, &ZTSStatusHeader::mRowsPerBoard, &ZTSStatusHeader::mBoardSize}) {
        ZTCStatusPageFile lFile(mPath);
        ++(lFile.header().*lpSize);
        expectRefused("is torn");
    }
}

TEST_F(StatusPageReader, SurvivesAPageThatIsCutAnywhere) {
    const std::size_t lWhole = getStatusPageSize(1);
    for (std::size_t lSize = 0; lSize < lWhole; lSize += 7) {
        ZTCStatusPageFile lFile(mPath, 1);
        lFile.setSize(lSize);
        if (lSize < getStatusPageSize(0)) {
            expectRefused("is too short");
        } else {
            ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
            EXPECT_FALSE(mReader.read(mSnapshot)) << lSize;
            EXPECT_THAT(mReader.getReason(), HasSubstr("too few for 1 boards"));
        }
    }
}

TEST_F(StatusPageReader, RefusesToReadAPageThatHasBecomeShorter) {
    ZTCStatusPageFile lFile(mPath, 1);
    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    lFile.setSize(0);
    EXPECT_FALSE(mReader.read(mSnapshot));
    EXPECT_THAT(mReader.getReason(), HasSubstr("has become shorter"));
}

TEST_F(StatusPageReader, SurvivesAPageOfAnyBytesBehindItsSizes) {
    ZTCTestSeed lSeed;
    std::mt19937& lRandom = lSeed.engine();
    for (int lRound = 0; lRound < 20; ++lRound) {
        ZTCStatusPageFile lFile(mPath, 2);
        auto* lpBytes = reinterpret_cast<unsigned char*>(&lFile.page());
        for (std::size_t lByte = offsetof(ZTSStatusHeader, mPid); lByte < getStatusPageSize(2); ++lByte) {
            lpBytes[lByte] = static_cast<unsigned char>(lRandom());
        }
        lFile.header().mBoards = lRound % 2 == 0 ? 2 : 0xFFFFFFFF;

        ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
        ASSERT_EQ(mReader.read(mSnapshot), lRound % 2 == 0) << mReader.getReason();
        if (lRound % 2 == 0) {
            EXPECT_LE(mSnapshot.mEndReason, ZTSE_Other);
            EXPECT_LE(mSnapshot.mBoards[0].mRows[0].mState, ZTSS_NoSource);
            EXPECT_LE(mSnapshot.mLosses.size(), gcStatusLosses);
        }
    }
}

TEST_F(StatusPageReader, SaysThatACopyWasInterruptedByARetrieval) {
    ZTCStatusPageFile lFile(mPath);
    lFile.header().mRetrievalSequence = 7;
    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();
    EXPECT_FALSE(mSnapshot.mIsConsistent);
}

TEST_F(StatusPageReader, WordsThatTheirWriterHasNotFinishedAreNotTaken) {
    ZTCStatusPageFile lFile(mPath, 1);
    ZTSStatusRow& lrRow = lFile.row(0, 5);
    lrRow.mState = ZTSS_NoRights;
    setText(lrRow.mStateReason, "needs CAP_NEoo many open files");
    lrRow.mStateSequence = 3;
    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();
    EXPECT_EQ(mSnapshot.mBoards[0].mRows[5].mState, ZTSS_NoRights);
    EXPECT_EQ(mSnapshot.mBoards[0].mRows[5].mStateReason, "");

    lrRow.mStateSequence = 4;
    ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();
    EXPECT_EQ(mSnapshot.mBoards[0].mRows[5].mStateReason, "needs CAP_NEoo many open files");
}

TEST_F(StatusPageReader, SeesOneMomentOfWhatIsHandedOverInAStorm) {
    constexpr std::uint32_t lcBoards = 2;
    ZTCStatusPageFile lFile(mPath, lcBoards);
    // As the agent does: events, and every now and then a retrieval that takes all of them.
    ZTCTestSeed lSeed;
    const ZTCTestThread lAgent([&](const std::stop_token& acrStop) {
        std::mt19937& lRandom = lSeed.engine();
        ZTSStatusHeader& lrHeader = lFile.header();
        while (!acrStop.stop_requested()) {
            for (int lEvent = 0; lEvent < 1000; ++lEvent) {
                const auto lWhere = static_cast<std::uint32_t>(lRandom());
                ++lFile.row(lWhere % lcBoards, lWhere / lcBoards % gcStatusRowsPerBoard).mConsolidated;
            }
            ++lrHeader.mRetrievalSequence;
            std::uint64_t lTaken = 0;
            for (std::uint32_t lRow = 0; lRow < lcBoards * gcStatusRowsPerBoard; ++lRow) {
                ZTSStatusRow& lrRow = lFile.row(lRow / gcStatusRowsPerBoard, lRow % gcStatusRowsPerBoard);
                lTaken += lrRow.mConsolidated;
                lrRow.mHandedOver = lrRow.mConsolidated.load();
            }
            lrHeader.mHandedOverOccurrences = lTaken;
            ++lrHeader.mRetrievalSequence;
        }
    });
    ASSERT_TRUE(mReader.open(mPath)) << mReader.getReason();
    int lConsistent = 0;
    for (int lCopy = 0; lCopy < 2000 || lConsistent < 10; ++lCopy) {
        ASSERT_TRUE(mReader.read(mSnapshot)) << mReader.getReason();
        std::uint64_t lHandedOver = 0;
        for (const ZTSStatusBoardCopy& lrBoard : mSnapshot.mBoards) {
            for (const ZTSStatusRowCopy& lrRow : lrBoard.mRows) {
                ASSERT_GE(lrRow.mConsolidated, lrRow.mHandedOver + lrRow.mDropped);
                lHandedOver += lrRow.mHandedOver;
            }
        }
        if (mSnapshot.mIsConsistent) {
            ++lConsistent;
            ASSERT_EQ(lHandedOver, mSnapshot.mHandedOverOccurrences);
        }
    }
}

}  // namespace
