#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <string>
#include <vector>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/client/include/StatusPageReader.h"
#include "tests/support/AgentProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/system/AdapterEvents.h"

// The real agent with a status page and a bell, read from beside as a sensor reads them.

namespace {

class AgentStatusPage : public ::testing::Test {
protected:
    ~AgentStatusPage() override { close(mBell); }

    /// An agent that has a page and a bell.
    void prepare(ZTCAgentProcess& arAgent) {
        mPath = arAgent.workingDirectory() + "/page";
        arAgent.setEnvironment("ZT_TVK_STATUS_PAGE", mPath);
        arAgent.setEnvironment("ZT_TVK_BELL_FD", std::to_string(mBell));
    }

    ZTSStatusSnapshot page() {
        ZTCStatusPageReader lReader;
        ZTSStatusSnapshot lPage;
        EXPECT_TRUE(lReader.open(mPath) && lReader.read(lPage)) << lReader.getReason();
        return lPage;
    }

    std::uint64_t takeRings() const {
        std::uint64_t lRings = 0;
        return read(mBell, &lRings, sizeof lRings) > 0 ? lRings : 0;
    }

    static const ZTSStatusRowCopy& row(const ZTSStatusSnapshot& acrPage, std::size_t aBoard, const char* apKind) {
        return acrPage.mBoards.at(aBoard).mRows.at(findKindIndex(apKind).value());
    }

    /// The reason in the page of an agent that was made to end so.
    std::string endOf(const std::function<void(ZTCAgentProcess&)>& acrLive) {
        ZTCAgentProcess lAgent;
        prepare(lAgent);
        acrLive(lAgent);
        const ZTSStatusSnapshot lPage = page();
        EXPECT_EQ(lPage.mEndReason == ZTSE_Running, lPage.mEndTime == 0);
        return gcStatusEndNames[lPage.mEndReason];
    }

    // The agent inherits it: it is not close-on-exec, and above the numbers that are closed for a child.
    const int mBell = [] {
        const int lLow = eventfd(0, EFD_NONBLOCK);
        const int lBell = fcntl(lLow, F_DUPFD, 300);
        close(lLow);
        return lBell;
    }();
    std::string mPath;
};

}  // namespace

TEST_F(AgentStatusPage, CountsEveryEventOfAStormThatTheLibraryDeliveredAndWhatTheResponsesDeliver) {
    ZTCAgentProcess lAgent(2);
    prepare(lAgent);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    const std::vector<ZTSLibraryEvent> lEvents = {
        ZTSLibraryEvent::scope(0, 4, 0x01, scsiData(gcRemotePort, 3)),
        ZTSLibraryEvent::scope(1, 4, 0x01, scsiData(gcOtherPort, 4)),
        ZTSLibraryEvent::scope(0, 4, 0x01, ZTCBytes(15, 0)),
        ZTSLibraryEvent::scope(1, 4, 0x80, ZTCBytes(64, 0)),
        ZTSLibraryEvent::rscn(1, rscnPayload({1, 2, 3})),
        ZTSLibraryEvent::temperature(0),
        ZTSLibraryEvent::link(7, ZTCScriptedLibrary::portName(0)),
    };
    constexpr std::uint64_t lcRounds = 400;
    constexpr std::uint64_t lcThreads = 4;
    constexpr std::uint64_t lcEach = lcRounds * lcThreads;
    lAgent.library().startStorm(lcThreads, lcRounds, lEvents);
    std::uint64_t lDelivered = 0;
    const auto lRetrieve = [&] {
        for (const ZTSEncodedRecordList& lcrList : lAgent.retrieve().mLists) {
            for (const ZTSEncodedRecord& lcrRecord : lcrList.mRecords) {
                lDelivered += lcrRecord.mOccurrences;
            }
        }
    };
    for (int lRetrieval = 0; lRetrieval < 5; ++lRetrieval) {
        lRetrieve();
    }
    ASSERT_EQ(lEvents.size() * lcEach, lAgent.library().waitForStorm());
    const ZTSStatusSnapshot lHeld = page();
    lRetrieve();

    const ZTSStatusSnapshot lPage = page();
    EXPECT_TRUE(lPage.mIsConsistent);
    // The limit may have refused some: an RSCN then counts as one.
    EXPECT_EQ(2 * lcEach, row(lPage, 0, "queue-full").getReceived());
    EXPECT_EQ(lcEach, row(lPage, 1, "queue-full").getReceived());
    EXPECT_EQ(lcEach, row(lPage, 0, "temperature").getReceived());
    EXPECT_EQ(lcEach, lPage.mBoards[1].mRows[gcStatusOtherRow].getReceived());
    EXPECT_EQ(lcEach, lPage.mUnknownBoards.getReceived());
    const ZTSStatusRowCopy& lcrRscn = row(lPage, 1, "rscn");
    EXPECT_EQ(lcEach, lcrRscn.mConsolidated / 3 + lcrRscn.mRefused[ZTSR_TotalLimit]);
    EXPECT_EQ(0u, lPage.getHeld());
    EXPECT_EQ(lDelivered, lPage.mHandedOverOccurrences);
    EXPECT_EQ(lHeld.mHandedOverOccurrences + lHeld.getHeld(), lPage.mHandedOverOccurrences);
    EXPECT_EQ(6u, lPage.mRetrievals);
    EXPECT_EQ(readFile(lAgent.pidFilePath()), std::to_string(lPage.mPid) + "\n");
}

TEST_F(AgentStatusPage, RingsWhenMuchIsHeldAndWhenEventsAreRefused) {
    ZTCAgentProcess lAgent;
    prepare(lAgent);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    std::vector<std::uint32_t> lPages;
    for (std::uint32_t lPage = 0; lPage < 16382; ++lPage) {
        lPages.push_back(lPage);
    }
    const ZTSLibraryEvent lRscn = ZTSLibraryEvent::rscn(0, rscnPayload(lPages));
    lAgent.library().deliver(lRscn);
    EXPECT_EQ(0u, takeRings()) << "131056 bytes are not past half of the limit";
    lAgent.library().deliver(lRscn);
    EXPECT_EQ(1u, takeRings());
    lAgent.library().deliverAll({lRscn, ZTSLibraryEvent::temperature(0), ZTSLibraryEvent::temperature(0)});
    EXPECT_EQ(1u, takeRings()) << "once for all that is refused";
    EXPECT_EQ(2u, row(page(), 0, "temperature").mRefused[ZTSR_TotalLimit]);
    lAgent.retrieve();
    lAgent.library().deliver(ZTSLibraryEvent::temperature(0));
    EXPECT_EQ(0u, takeRings());
}

TEST_F(AgentStatusPage, SeesAdaptersComeAndGoWithoutACommand) {
    ZTCAgentProcess lAgent(2);
    prepare(lAgent);
    lAgent.startAndConnectQuietly();
    for (const unsigned lAdapters : {3u, 1u}) {
        lAgent.library().configure("adapters " + std::to_string(lAdapters));
        waitUntil([&] { return page().mAdaptersNow == lAdapters; }, "the adapters on the page");
    }
    EXPECT_EQ(2u, page().mAdaptersAtStart);
}

TEST_F(AgentStatusPage, ShowsTheStatesThatRegistrationsAndReportsGive) {
    ZTCAgentProcess lAgent;
    prepare(lAgent);
    lAgent.library().configure("register-status 0 1 1 7");
    lAgent.startAndConnectQuietly();
    EXPECT_EQ(ZTSS_Off, row(page(), 0, "plogi").mState);
    lAgent.startScope();
    EXPECT_EQ(ZTSS_NoRights, row(page(), 0, "plogi").mState);
    EXPECT_EQ(ZTSS_Listening, row(page(), 0, "rscn").mState);
    lAgent.library().configure("state 0 1 32 3 needs a right");
    EXPECT_EQ(ZTSS_NoRights, row(page(), 0, "rscn").mState);
    EXPECT_EQ("needs a right", row(page(), 0, "rscn").mStateReason);
    lAgent.library().configure("loss 5 messages");
    ASSERT_EQ(1u, page().mLosses.size());
    EXPECT_EQ("messages", page().mLosses[0].mName);
    EXPECT_EQ(5u, page().mLosses[0].mTotal);
}

TEST_F(AgentStatusPage, ShowsTheStatesAndLossesOfASimulatedLibrary) {
    ZTCAgentProcess lAgent;
    prepare(lAgent);
    const std::string lScenario = lAgent.workingDirectory() + "/states.kpm";
    writeFile(lScenario,
              "adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80\n"
              "state temperature no-source reason=\"no sensor\"\n"
              "state rscn no-rights reason=\"needs CAP_NET_ADMIN\"\n"
              "state check-condition no-rights reason=\"needs CAP_SYS_ADMIN\"\n"
              "state link failed reason=\"no light\"\n"
              "state queue-full failed at=0 reason=broken\n"
              "loss \"trace events\" count=7 at=0 every=1 times=3\n");
    lAgent.setEnvironment("ZT_LIBKPM_PATH", TAVIK_SIM_LIBRARY);
    lAgent.setEnvironment("KPM_SIM_SCENARIO", lScenario);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    waitUntil([&] { return !page().mLosses.empty() && page().mLosses[0].mTotal == 21; }, "the last loss");
    const ZTSStatusSnapshot lPage = page();
    EXPECT_EQ("trace events", lPage.mLosses[0].mName);
    struct Row {
        const char* mpKind;
        ZTEStatusState mState;
        const char* mpReason;
    };
    for (const Row& lcrRow :
         {Row{.mpKind = "temperature", .mState = ZTSS_NoSource, .mpReason = "no sensor"},
          Row{.mpKind = "rscn", .mState = ZTSS_NoRights, .mpReason = "needs CAP_NET_ADMIN"},
          Row{.mpKind = "check-condition", .mState = ZTSS_NoRights, .mpReason = "needs CAP_SYS_ADMIN"},
          Row{.mpKind = "link", .mState = ZTSS_Failed, .mpReason = "no light"},
          Row{.mpKind = "queue-full", .mState = ZTSS_Failed, .mpReason = "broken"},
          Row{.mpKind = "plogi", .mState = ZTSS_Listening, .mpReason = ""}}) {
        SCOPED_TRACE(lcrRow.mpKind);
        EXPECT_EQ(lcrRow.mState, row(lPage, 0, lcrRow.mpKind).mState);
        EXPECT_EQ(lcrRow.mpReason, row(lPage, 0, lcrRow.mpKind).mStateReason);
    }
}

TEST_F(AgentStatusPage, SaysWhyTheAgentEnded) {
    EXPECT_EQ("shut-down", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.startAndConnectQuietly();
                  EXPECT_EQ(gcSuccessHex, arAgent.request("04"));
                  EXPECT_EQ(0, arAgent.waitForExit());
              }));
    EXPECT_EQ("signal", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.startAndConnectQuietly();
                  EXPECT_EQ(0, arAgent.stop());
              }));
    EXPECT_EQ("signal", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.start();
                  arAgent.log().waitFor("Waiting for a reader of '" + arAgent.responseFifoPath() + "'");
                  EXPECT_EQ(0, arAgent.stop());
              }));
    EXPECT_EQ("running", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.startAndConnectQuietly();
                  arAgent.kill();
              }));
    EXPECT_EQ("other", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.startAndConnectQuietly();
                  arAgent.pipes().sendRequest({6});
                  EXPECT_EQ(1, arAgent.waitForExit());
              }));
    EXPECT_EQ("other", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.library().configure("init-status 5");
                  EXPECT_EQ(0, arAgent.run(arAgent.defaultArguments()).mStatus);
              }));
    EXPECT_EQ("sensor-gone", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.startAndConnectQuietly();
                  arAgent.pipes().closeResponse();
                  arAgent.pipes().sendRequest({2});
                  EXPECT_EQ(0, arAgent.waitForExit());
              }));
    EXPECT_EQ("sensor-gone", endOf([](ZTCAgentProcess& arAgent) {
                  arAgent.startAndConnectQuietly(1, {"-b", "1"});
                  EXPECT_EQ(0, arAgent.waitForExit());
              }));
}

TEST_F(AgentStatusPage, SaysWhyTheAgentCouldNotStart) {
    const auto lEndOf = [this](const std::function<void(ZTCAgentProcess&)>& acrPrepare) {
        return endOf([&](ZTCAgentProcess& arAgent) {
            acrPrepare(arAgent);
            EXPECT_EQ(0, arAgent.run(arAgent.defaultArguments()).mStatus);
        });
    };
    EXPECT_EQ("no-library",
              lEndOf([](ZTCAgentProcess& arAgent) { arAgent.setEnvironment("ZT_LIBKPM_PATH", "/no/libkpm.so"); }));
    EXPECT_EQ("no-library", lEndOf([](ZTCAgentProcess& arAgent) { arAgent.setEnvironment("ZT_LIBKPM_PATH", ""); }));
    EXPECT_EQ("no-adapters", lEndOf([](ZTCAgentProcess& arAgent) { arAgent.library().configure("adapters 0"); }));
    EXPECT_EQ("no-event-support",
              lEndOf([](ZTCAgentProcess& arAgent) { arAgent.library().configure("ztapi-supported 0"); }));
}

TEST_F(AgentStatusPage, OutlivesAnAgentThatIsKilledWithWhatItHeld) {
    ZTCAgentProcess lAgent;
    prepare(lAgent);
    lAgent.startAndConnectQuietly();
    lAgent.startScope();
    lAgent.library().deliverAll({ZTSLibraryEvent::temperature(0), ZTSLibraryEvent::temperature(0)});
    lAgent.kill();
    const ZTSStatusSnapshot lPage = page();
    EXPECT_EQ(2u, lPage.getHeld());
    EXPECT_EQ(4u, lPage.mHeldBytes);
    EXPECT_TRUE(lPage.mIsCollecting);
}
