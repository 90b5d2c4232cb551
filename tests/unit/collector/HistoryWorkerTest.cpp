#include "sensor/collector/include/HistoryWorker.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <unistd.h>

#include <filesystem>
#include <mutex>

#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/SmallFileSystem.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/store/Frames.h"

using std::chrono::milliseconds;
using std::chrono::seconds;
using testing::HasSubstr;
using testing::IsEmpty;

static constexpr const char* scGeneration = "a1";

class HistoryWorkerTest : public testing::Test {
protected:
    HistoryWorkerTest() {
        std::filesystem::create_directory(state());
        mSpool = std::make_unique<ZTCSpool>(state() + "/spool");
    }
    std::string state() const { return mDirectory.path("state"); }

    void start() {
        mWorker = std::make_unique<ZTCHistoryWorker>(
            *mSpool, state(), ZTSStoreLimits{},
            [this](const std::string& acrLine) {
                const std::lock_guard lLock(mMutex);
                mLines.push_back(acrLine);
            },
            milliseconds(5));
    }
    void startAndOpen() {
        start();
        waitUntil([this] { return mWorker->getState().mIsOpen; }, "the open history");
        mSpool->open();
    }
    std::vector<std::string> lines() {
        const std::lock_guard lLock(mMutex);
        return mLines;
    }
    /// A whole response with so many records in the spool.
    ZTSSpoolEntry spool(std::uint64_t aNumber, unsigned aRecords) {
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = 0; i < aRecords; ++i) {
            lRecords.push_back(makeQueueFull(gcPortA + i, gcBase, gcBase));
        }
        const ZTCBytes lBody = makeBody(lRecords);
        const auto lSize = static_cast<std::uint32_t>(lBody.size());
        ZTCBytes lFrame{static_cast<std::uint8_t>(lSize >> 24), static_cast<std::uint8_t>(lSize >> 16),
                        static_cast<std::uint8_t>(lSize >> 8), static_cast<std::uint8_t>(lSize)};
        lFrame.insert(lFrame.end(), lBody.begin(), lBody.end());
        ZTSSpoolPart lPart = mSpool->createPart(aNumber, scGeneration, lFrame.size());
        EXPECT_EQ(write(lPart.mFile.get(), lFrame.data(), lFrame.size()), static_cast<ssize_t>(lFrame.size()));
        lPart.mSize = lFrame.size();
        return {mSpool->finish(lPart), lFrame.size()};
    }
    void waitUntilStored(std::uint64_t aCount) {
        waitUntil([&] { return countStored(state()) == aCount && mWorker->getState().mWaitingFrames == 0; },
                  std::to_string(aCount) + " occurrences in the history");
    }

    ZTCTemporaryDirectory mDirectory;
    std::unique_ptr<ZTCSpool> mSpool;
    std::mutex mMutex;
    std::vector<std::string> mLines;
    std::unique_ptr<ZTCHistoryWorker> mWorker;
};

TEST_F(HistoryWorkerTest, AFrameIsRemovedFromTheSpoolOnceItIsInTheHistory) {
    startAndOpen();
    mWorker->takeIn(spool(7, 3), nullptr);
    waitUntilStored(3);
    EXPECT_THAT(listSpool(state()), IsEmpty());
    const ZTSHistoryState lState = mWorker->getState();
    EXPECT_EQ(lState.mTakenFrames, 1U);
    EXPECT_EQ(lState.mTakenRecords, 3U);
    EXPECT_EQ(lState.mWaitingBytes, 0U);
    EXPECT_EQ(lState.mOpenEpisodes, 3U);
    EXPECT_EQ(lState.mStoreId, ZTCHistory(state()).getStoreId());
}

TEST_F(HistoryWorkerTest, AFrameThatTheHistoryHasIsRemovedAndCountsOnce) {
    startAndOpen();
    mWorker->takeIn(spool(7, 3), nullptr);
    waitUntilStored(3);
    mWorker->takeIn(spool(7, 3), nullptr);
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    EXPECT_EQ(countStored(state()), 3U);
    EXPECT_THAT(listSpool(state()), IsEmpty());
}

TEST_F(HistoryWorkerTest, TheNextOneKnowsTheHighestNumber) {
    startAndOpen();
    EXPECT_EQ(mWorker->getState().mLastFrame, 0U);
    mWorker->takeIn(spool(7, 1), nullptr);
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    startAndOpen();
    EXPECT_EQ(mWorker->getState().mLastFrame, 7U);
}

TEST_F(HistoryWorkerTest, AnOrderlyEndStoresAllThatWaitsAndClosesTheRun) {
    startAndOpen();
    for (std::uint64_t i = 1; i <= 50; ++i) {
        mWorker->takeIn(spool(i, 2), nullptr);
    }
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    EXPECT_EQ(countStored(state()), 100U);
    const std::vector<ZTSRun> lRuns = ZTCHistory(state()).readRuns();
    ASSERT_EQ(lRuns.size(), 1U);
    EXPECT_FALSE(lRuns[0].mIsOpen);
}

TEST_F(HistoryWorkerTest, WithoutAnOrderlyEndWhatWaitsStaysInTheSpoolForTheNextOne) {
    const ZTSSpoolEntry lEntry = [this] {
        startAndOpen();
        return spool(1, 2);
    }();
    mWorker.reset();
    EXPECT_EQ(listSpool(state()).size(), 1U);
    startAndOpen();
    EXPECT_TRUE(ZTCHistory(state()).readRuns().front().mIsOpen) << "the first one has vanished";
    mWorker->takeIn(lEntry, nullptr);
    waitUntilStored(2);
}

TEST_F(HistoryWorkerTest, AnEndedAgentsPageIsRemovedOnceItsGapIsStored) {
    startAndOpen();
    writeFile(mDirectory.path("page.1"), "x");
    ZTSEndedAgent lAgent;
    lAgent.mGeneration = scGeneration;
    lAgent.mPagePath = mDirectory.path("page.1");
    lAgent.mFrom = fromMicroseconds(gcBase);
    lAgent.mTo = fromMicroseconds(gcBase + gcSecond);
    lAgent.mIsVanished = true;
    lAgent.mReason = "killed";
    mWorker->endAgent(lAgent);
    mWorker->endAgent(lAgent);
    waitUntil([this] { return !exists(mDirectory.path("page.1")); }, "the page's end");
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    const std::vector<ZTSGap> lGaps = ZTCHistory(state()).readGaps();
    ASSERT_EQ(lGaps.size(), 1U) << "written once";
    EXPECT_EQ(lGaps[0].mReason, "killed");
    EXPECT_EQ(toMicroseconds(lGaps[0].mFrom), gcBase);
}

TEST_F(HistoryWorkerTest, AMarkIsReportedOnceItIsStored) {
    startAndOpen();
    mWorker->setMark(11, "before", fromMicroseconds(gcBase));
    std::vector<ZTSMarkResult> lResults;
    waitUntil([&] { return !(lResults = mWorker->takeMarkResults()).empty(); }, "the mark");
    EXPECT_EQ(lResults[0].mTicket, 11U);
    EXPECT_EQ(lResults[0].mError, "");
    ASSERT_EQ(ZTCHistory(state()).readMarks().size(), 1U);
    EXPECT_THAT(mWorker->takeMarkResults(), IsEmpty());
}

TEST_F(HistoryWorkerTest, AFrameThatCannotBeReadIsSetAsideWithAGap) {
    startAndOpen();
    ZTSSpoolEntry lEntry;
    lEntry.mName = {.mNumber = 3, .mGeneration = scGeneration, .mState = ZTSPS_Frame};
    lEntry.mSize = 100;
    mWorker->takeIn(lEntry, nullptr);
    mWorker->takeIn(spool(4, 2), nullptr);
    waitUntilStored(2);
    EXPECT_EQ(ZTCHistory(state()).readGaps().size(), 1U);
    EXPECT_THAT(lines(), testing::Contains(HasSubstr("3.a1.frame")));
}

TEST_F(HistoryWorkerTest, ACutResponseOfAnAgentThatNobodyKnowsIsOneGap) {
    startAndOpen();
    for (const std::uint64_t lNumber : {3U, 4U}) {
        ZTSSpoolPart lPart = mSpool->createPart(lNumber, scGeneration, 100);
        EXPECT_EQ(write(lPart.mFile.get(), "\0\0\0\x64", 4), 4);
        lPart.mSize = 4;
        mWorker->takeIn({mSpool->tear(lPart), 4}, nullptr);
        mWorker->endForgottenAgents("");
    }
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    const std::vector<ZTSGap> lGaps = ZTCHistory(state()).readGaps();
    ASSERT_EQ(lGaps.size(), 1U);
    EXPECT_EQ(lGaps[0].mGeneration, scGeneration);
    EXPECT_FALSE(lGaps[0].mIsCountKnown);
    EXPECT_THAT(listSpool(state()), IsEmpty());
}

TEST_F(HistoryWorkerTest, AFrameThatCanNeverBeReadIsGivenUpAndTheOthersFollow) {
    startAndOpen();
    const ZTSSpoolEntry lEntry = spool(3, 2);
    std::filesystem::remove(mSpool->pathOf(lEntry.mName));
    std::filesystem::create_symlink("elsewhere", mSpool->pathOf(lEntry.mName));  // which is never followed
    mWorker->takeIn(lEntry, nullptr);
    mWorker->takeIn(spool(4, 2), nullptr);
    waitUntilStored(2);
    EXPECT_EQ(ZTCHistory(state()).readGaps().size(), 1U);
    EXPECT_THAT(lines(), testing::Contains(HasSubstr("3.a1.frame.unreadable")));
    EXPECT_THAT(listSpool(state()), testing::ElementsAre("3.a1.frame.unreadable"));
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST_F(HistoryWorkerTest, WithoutDescriptorsNoFrameIsGivenUpHoweverLongThatLasts) {
    startAndOpen();
    const ZTSSpoolEntry lEntry = spool(3, 2);
    {
        const ZTCResourceLimit lNoMore(RLIMIT_NOFILE, 1);  // poll() of one descriptor needs as much
        mWorker->takeIn(lEntry, nullptr);
        // It rings twice a try at most: reading and syncing fail. Ten tries are all that another file gets.
        for (int i = 0; i < 40; ++i) {
            pollfd lBell{.fd = mWorker->getBell().getDescriptor(), .events = POLLIN, .revents = 0};
            ASSERT_EQ(poll(&lBell, 1, ZTCDeadline().remainingMilliseconds()), 1);
            mWorker->getBell().clear();
        }
        EXPECT_THAT(mWorker->getState().mProblem, HasSubstr("3.a1.frame: Too many open files"));
        EXPECT_EQ(mWorker->getState().mWaitingFrames, 1U);
    }
    waitUntilStored(2);
    EXPECT_THAT(ZTCHistory(state()).readGaps(), IsEmpty());
    EXPECT_THAT(listSpool(state()), IsEmpty());
}
#endif

TEST_F(HistoryWorkerTest, ANewerSchemaIsFatalAndNamed) {
    startAndOpen();
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    setSchemaVersion(state(), 99);
    start();
    waitUntil([this] { return !mWorker->getState().mFatal.empty(); }, "the refusal");
    EXPECT_THAT(mWorker->getState().mFatal, HasSubstr("version 99"));
    EXPECT_FALSE(mWorker->getState().mIsOpen);
}

TEST_F(HistoryWorkerTest, ADamagedHistoryIsSetAsideAndTheWorkGoesIntoANewOne) {
    startAndOpen();
    const std::string lStoreId = mWorker->getState().mStoreId;
    mWorker->takeIn(spool(1, 3), nullptr);
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    writeFile(state() + "/history.db", std::string(8192, 'x'));
    startAndOpen();
    EXPECT_NE(mWorker->getState().mStoreId, lStoreId);
    mWorker->takeIn(spool(2, 5), nullptr);
    waitUntilStored(5);
    EXPECT_THAT(lines(), testing::Contains(HasSubstr("history.damaged-")));
}

TEST_F(HistoryWorkerTest, DamageThatShowsAtWorkIsSetAsideAndTheWorkIsDoneAgainInANewOne) {
    startAndOpen();
    const std::string lStoreId = mWorker->getState().mStoreId;
    mWorker->takeIn(spool(1, 200), nullptr);
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    startAndOpen();
    std::string lContent = readFile(state() + "/history.db");
    std::fill(lContent.begin() + 4096 * 2, lContent.end(), '\x55');
    writeFile(state() + "/history.db", lContent);
    setSchemaVersion(state(), getSchemaVersion(state()));  // another's change: pages are read anew
    for (std::uint64_t i = 2; i < 12; ++i) {
        mWorker->takeIn(spool(i, 1), nullptr);
    }
    waitUntil([&] { return mWorker->getState().mStoreId != lStoreId; }, "another history");
    waitUntil([this] { return mWorker->getState().mWaitingFrames == 0; }, "the rest");
    EXPECT_TRUE(mWorker->finish(seconds(20)));
    EXPECT_EQ(countStored(state()), 10U);
    EXPECT_THAT(listSpool(state()), IsEmpty());
    EXPECT_EQ(checkIntegrity(state()), "ok");
}

class HistoryWorkerDiskTest : public HistoryWorkerTest {
protected:
    void SetUp() override {
        if (!mFileSystem.isMounted()) {
            GTEST_SKIP() << "no file system can be mounted here";
        }
        startAndOpen();
        mWorker->takeIn(spool(1, 3), nullptr);
        waitUntilStored(3);
        mEntry = spool(2, 200);
    }
    void expectProblem(bool aIsReadOnly) {
        mWorker->takeIn(mEntry, nullptr);
        waitUntil([this] { return !mWorker->getState().mProblem.empty(); }, "the problem");
        EXPECT_EQ(mWorker->getState().mIsReadOnly, aIsReadOnly);
        EXPECT_EQ(mWorker->getState().mWaitingFrames, 1U) << "nothing is dropped";
    }
    void expectGoesOn() {
        waitUntilStored(203);
        EXPECT_EQ(mWorker->getState().mProblem, "");
        EXPECT_THAT(lines(), testing::Contains("the history can be written again"));
        EXPECT_TRUE(mWorker->finish(seconds(20)));
    }

    ZTCSmallFileSystem mFileSystem{state(), 4 << 10};
    ZTSSpoolEntry mEntry;
};

TEST_F(HistoryWorkerDiskTest, OnAFullDiskTheWorkWaitsAndIsDoneWhenThereIsRoom) {
    mFileSystem.fill();
    expectProblem(false);
    EXPECT_EQ(countStored(state()), 3U);
    mFileSystem.empty();
    expectGoesOn();
}

TEST_F(HistoryWorkerDiskTest, OnAReadOnlyDiskTheWorkWaitsAndIsDoneWhenItCanBeWritten) {
    mFileSystem.makeReadOnly();
    expectProblem(true);
    mFileSystem.makeWritable();
    expectGoesOn();
}
