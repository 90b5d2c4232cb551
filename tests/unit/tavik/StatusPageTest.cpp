#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <set>

#include "common/include/Log.h"
#include "os/common/include/ProcessEvents.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/StatusPageFixture.h"

using StatusPage = ZTCStatusPageFixture;

TEST_F(StatusPage, WithoutTheVariableThereIsNone) {
    unsetenv(gcStatusPageVariable);
    collect();
    deliverTemperature(0);
    EXPECT_FALSE(mSystem->getStatusPage().isOpen());
    EXPECT_FALSE(exists(pagePath()));
    EXPECT_EQ(1u, retrieveTexts().size());
}

TEST_F(StatusPage, AnEmptyVariableIsNone) {
    setenv(gcStatusPageVariable, "", 1);
    bringUp();
    EXPECT_FALSE(mSystem->getStatusPage().isOpen());
}

TEST_F(StatusPage, IsAPrivateFileWhateverTheUmask) {
    const mode_t lMask = umask(0777);
    // As a killed start leaves it.
    writeFile(pagePath(), "of another start");
    writeFile(pagePath() + ".new", "of a start that was killed");
    umask(0277);
    mSystem->getStatusPage().open(pagePath().c_str(), 1);
    umask(lMask);
    struct stat lStatus {};
    ASSERT_EQ(0, stat(pagePath().c_str(), &lStatus));
    EXPECT_EQ(0600u, lStatus.st_mode & 07777);
    EXPECT_FALSE(exists(pagePath() + ".new"));
}

TEST_F(StatusPage, NamesTheAgentAndItsBoards) {
    bringUp(3);
    const ZTSStatusSnapshot lPage = page();
    EXPECT_EQ(static_cast<std::uint32_t>(getpid()), lPage.mPid);
    EXPECT_EQ(32u, lPage.mStartId.size());
    EXPECT_LT(0, lPage.mStartTime);
    EXPECT_EQ(ZTSE_Running, lPage.mEndReason);
    EXPECT_EQ(3u, lPage.mAdaptersAtStart);
    EXPECT_EQ(3u, lPage.mAdaptersNow);
    EXPECT_EQ(gcMaxScopeDataSize, lPage.mTotalLimit);
    ASSERT_EQ(3u, lPage.mBoards.size());
    for (unsigned lBoard = 0; lBoard < 3; ++lBoard) {
        EXPECT_EQ(ZTCAdaptersLibraryDouble::nodeName(lBoard).mBytes, lPage.mBoards[lBoard].mWwnn);
        EXPECT_EQ(ZTCAdaptersLibraryDouble::portName(lBoard).mBytes, lPage.mBoards[lBoard].mWwpn);
    }
}

TEST_F(StatusPage, AStopSignalIsTheReasonOfWhatGoesWrongBecauseOfIt) {
    bringUp();
    getStopEvent().raise();
    mSystem->getStatusPage().setEnd(ZTSE_Other);
    EXPECT_EQ(ZTSE_Signal, page().mEndReason);
}

TEST_F(StatusPage, AShutDownStaysTheReasonThoughAStopSignalHasCome) {
    bringUp();
    getStopEvent().raise();
    mSystem->getStatusPage().setEnd(ZTSE_ShutDown);
    EXPECT_EQ(ZTSE_ShutDown, page().mEndReason);
}

TEST_F(StatusPage, TheFirstReasonOfTheEndStays) {
    bringUp();
    mSystem->getStatusPage().setEnd(ZTSE_SensorGone);
    mSystem->getStatusPage().setEnd(ZTSE_Other);
    EXPECT_EQ(ZTSE_SensorGone, page().mEndReason);
}

TEST_F(StatusPage, EveryStartHasAnIdOfItsOwn) {
    std::set<std::string> lIds;
    for (int lStart = 0; lStart < 20; ++lStart) {
        ZTCStatusPageWriter lWriter;
        lWriter.open(pagePath().c_str(), 1);
        ZTCStatusPageReader lReader;
        ZTSStatusSnapshot lPage;
        ASSERT_TRUE(lReader.open(pagePath()) && lReader.read(lPage)) << lReader.getReason();
        EXPECT_TRUE(lIds.insert(lPage.mStartId).second) << lPage.mStartId;
    }
}

TEST_F(StatusPage, WithAPlaceThatTakesNoFileTheAgentWorksWithoutOne) {
    setenv(gcStatusPageVariable, mDirectory.path("nowhere/page").c_str(), 1);
    collect();
    EXPECT_FALSE(mSystem->getStatusPage().isOpen());
    deliverTemperature(0);
    EXPECT_EQ(1u, retrieveTexts().size());
}

TEST_F(StatusPage, AFileSystemThatIsFullLeavesNoPageBehind) {
    ZTCForkedProcess lChild(
        [&](ZTCForkedProcess&) {
            signal(SIGXFSZ, SIG_IGN);
            const rlimit lLimit{1000, RLIM_INFINITY};
            setrlimit(RLIMIT_FSIZE, &lLimit);
            ZTCStatusPageWriter lWriter;
            EXPECT_THROW(lWriter.open(pagePath().c_str(), 1), ZTCClibEx);
            return lWriter.isOpen() || exists(pagePath()) || exists(pagePath() + ".new") ? 1 : 0;
        },
        mDirectory.path("child"));
    EXPECT_EQ(0, lChild.waitForExit());
}

TEST_F(StatusPage, APageThatCannotGrowCountsAsOfUnknownBoardsAndHoldsItsEquations) {
    ZTCForkedProcess lChild(
        [&](ZTCForkedProcess&) {
            setLogCode(0);
            signal(SIGXFSZ, SIG_IGN);
            const rlimit lLimit{4096, RLIM_INFINITY};
            setrlimit(RLIMIT_FSIZE, &lLimit);
            collect(2);
            deliverTemperature(0);
            deliverTemperature(1);
            EXPECT_EQ(2u, page().getHeld());
            retrieve();
            deliverTemperature(0);
            const ZTSStatusSnapshot lPage = page();
            expectEquations(lPage);
            EXPECT_TRUE(lPage.mBoards.empty());
            EXPECT_EQ(2u, lPage.mAdaptersAtStart);
            EXPECT_EQ(3u, lPage.mUnknownBoards.mConsolidated);
            EXPECT_EQ(2u, lPage.mUnknownBoards.mHandedOver);
            return HasFailure() ? 1 : 0;
        },
        mDirectory.path("child"));
    EXPECT_EQ(0, lChild.waitForExit()) << readFile(mDirectory.path("child.err"));
}

TEST_F(StatusPage, BytesThatAreAppendedToARecordAreHeldToo) {
    collect(1, 0xFFFFFFFF);
    mSystem->makePendingRecord(0, 4);
    mSystem->appendToPendingRecord(ZTCBytes(8, 0));
    EXPECT_EQ(4u + 8, page().mHeldBytes);
    EXPECT_EQ(1u, page().mHeldRecords);
}

TEST_F(StatusPage, ARetrievalHandsOverAllThatIsHeld) {
    collect(2);
    deliverTemperature(0);
    deliverTemperature(0);
    deliverRscn(1, makeRscn({1, 2}));
    ZTSStatusSnapshot lPage = page();
    EXPECT_EQ(2u, rowNamed(lPage.mBoards[0], "temperature").getHeld());
    EXPECT_EQ(2u, rowNamed(lPage.mBoards[1], "rscn").getHeld());
    EXPECT_EQ(3u, lPage.mHeldRecords);
    EXPECT_EQ(4u + 8 + 8, lPage.mHeldBytes);
    EXPECT_EQ(0u, lPage.mRetrievals);
    EXPECT_EQ(0, lPage.mLastRetrieval);

    retrieve();

    lPage = page();
    expectEquations(lPage);
    EXPECT_EQ(2u, rowNamed(lPage.mBoards[0], "temperature").mHandedOver);
    EXPECT_EQ(0u, lPage.getHeld());
    EXPECT_EQ(0u, lPage.mHeldRecords);
    EXPECT_EQ(0u, lPage.mHeldBytes);
    EXPECT_EQ(1u, lPage.mRetrievals);
    EXPECT_EQ(3u, lPage.mHandedOverRecords);
    EXPECT_EQ(4u, lPage.mHandedOverOccurrences);
    EXPECT_EQ(20u, lPage.mHandedOverBytes);
    EXPECT_LE(lPage.mStartTime, lPage.mLastRetrieval);
}

TEST_F(StatusPage, ARetrievalThatFailsBeforeTheSwapHandsNothingOver) {
    collect();
    deliverTemperature(0);
    mLibrary.mBeforeCounted = [] { throw ZTCNoMemoryEx(); };
    EXPECT_THROW(retrieve(), ZTCNoMemoryEx);
    const ZTSStatusSnapshot lPage = page();
    expectEquations(lPage);
    EXPECT_EQ(1u, lPage.getHeld());
    EXPECT_EQ(0u, lPage.mRetrievals);
}

TEST_F(StatusPage, ARetrievalThatFailsAfterTheSwapHasHandedOver) {
    collect();
    setLogCode(0);
    bool lHasFailedAfter = false;
    for (unsigned lNth = 1; !lHasFailedAfter && lNth < 100; ++lNth) {
        deliverTemperature(0);
        const std::uint64_t lRetrievals = page().mRetrievals;
        bool lHasThrown = false;
        const ZTCPointer<ZTCBuffer> lRequest = makeBuffer(ZTCBytes{1});
        mLibrary.mNotesCounting = false;
        failAllocation(lNth, [&] {
            ZTCPointer<ZTCBuffer> lResponse;
            try {
                mSystem->getProtocolHandler()->handleGetScopeDataCommand(lRequest, lResponse);
            } catch (const ZTCException&) {
                lHasThrown = true;
            }
        });
        const ZTSStatusSnapshot lPage = page();
        expectEquations(lPage);
        lHasFailedAfter = lHasThrown && lPage.mRetrievals > lRetrievals;
        EXPECT_EQ(lPage.mRetrievals > lRetrievals, lPage.getHeld() == 0);
    }
    EXPECT_TRUE(lHasFailedAfter);
}

TEST_F(StatusPage, ARecordThatIsDroppedWhenItIsFiledIsALoss) {
    collect(2);
    deliverTemperature(1);
    deliverTemperature(1);
    deliverTemperature(1);
    mSystem->exchangeRecordLists(1);
    deliverTemperature(0);
    const ZTSStatusSnapshot lPage = page();
    expectEquations(lPage);
    EXPECT_EQ(3u, rowNamed(lPage.mBoards[1], "temperature").mDropped);
    EXPECT_EQ(0u, rowNamed(lPage.mBoards[1], "temperature").getHeld());
    EXPECT_EQ(1u, lPage.mHeldRecords);
}

TEST_F(StatusPage, TheTimeOfTheLastEventIsThatOfItsOutcomeWhateverItIs) {
    collect();
    deliverTemperature(0);
    const std::int64_t lFirst = row(0, "temperature").mLastEvent;
    EXPECT_LE(page().mStartTime, lFirst);
    requestHex("02");
    deliverTemperature(0);
    EXPECT_LE(lFirst, row(0, "temperature").mLastEvent);
    deliverLink(0, makeWwn(1));
    EXPECT_LT(0, row(0, "link").mLastEvent);
}

TEST_F(StatusPage, ShowsTheAdaptersOfTheLastLook) {
    collect(2);
    mLibrary.mNumberOfAdapters = 3;
    mSystem->showAdapters();
    EXPECT_EQ(3u, page().mAdaptersNow);
    mLibrary.mNumberOfAdapters = 1;
    retrieve();
    EXPECT_EQ(1u, page().mAdaptersNow);
    EXPECT_EQ(2u, page().mAdaptersAtStart);
}

TEST_F(StatusPage, ShowsTheLimitsAndWhetherItCollects) {
    bringUp();
    EXPECT_FALSE(page().mIsCollecting);
    startScope(900);
    EXPECT_TRUE(page().mIsCollecting);
    EXPECT_EQ(900u, page().mRecordLimit);
    requestHex("02");
    EXPECT_FALSE(page().mIsCollecting);
}
