#include "libkpm/sim/src/Sources.h"

#include <gtest/gtest.h>

#include <mutex>
#include <string>
#include <vector>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/sim/src/EntryPoints.h"
#include "tests/support/Waiting.h"
#include "tests/unit/sim/Recorder.h"

namespace {

/// An agent that keeps what is reported to it, one text a report.
class ZTCReports {
public:
    ZTCReports() { setLibraryReport(this, onState, onLoss); }
    ~ZTCReports() { setLibraryReport(nullptr, nullptr, nullptr); }
    ZTCReports(const ZTCReports&) = delete;
    ZTCReports& operator=(const ZTCReports&) = delete;

    std::vector<std::string> take() {
        const std::lock_guard<std::mutex> lGuard(mLock);
        return std::exchange(mTexts, {});
    }

    void waitFor(const std::string& acrText) {
        waitUntil(
            [&] {
                const std::lock_guard<std::mutex> lGuard(mLock);
                return !mTexts.empty() && mTexts.back() == acrText;
            },
            "the report " + acrText);
    }

    static void onState(void* apContext, std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory,
                        std::uint32_t aState, const char* apReason) {
        static_cast<ZTCReports*>(apContext)->add("board " + std::to_string(aBoard) + " " + std::to_string(aCategory) +
                                                 "/" + std::to_string(aSubcategory) + " state " +
                                                 std::to_string(aState) + " " + apReason);
    }

    static void onLoss(void* apContext, const char* apName, std::uint64_t aTotal) {
        static_cast<ZTCReports*>(apContext)->add(std::string(apName) + " " + std::to_string(aTotal));
    }

private:
    void add(const std::string& acrText) {
        const std::lock_guard<std::mutex> lGuard(mLock);
        mTexts.push_back(acrText);
    }

    std::mutex mLock;
    std::vector<std::string> mTexts;  // guarded by mLock
};

using Texts = std::vector<std::string>;

}  // namespace

TEST(Sources, TheStatesOfTheBeginningAreReportedByInitBeforeAnythingElse) {
    ZTCReports lReports;
    ZTCSimEngine lEngine(
        readTwoAdapters("state rscn no-rights reason=\"needs CAP_NET_ADMIN\"\n"
                        "state queue-full failed board=1 reason=broken\n"
                        "state plogi working\nstate prlo failed at=86400000"));
    EXPECT_EQ(lReports.take(), Texts{});
    lEngine.start();
    EXPECT_EQ(lReports.take(), (Texts{"board 0 1/32 state 3 needs CAP_NET_ADMIN",
                                      "board 1 1/32 state 3 needs CAP_NET_ADMIN", "board 1 4/1 state 4 broken"}));
}

TEST(Sources, AStateIsReportedWhenItChangesAndNotWhenItIsSaidAgain) {
    ZTCReports lReports;
    ZTCSimEngine lEngine(readTwoAdapters());
    EXPECT_EQ(injectLine(lEngine, "state link failed board=0 reason=\"no light\""), 1u);
    EXPECT_EQ(injectLine(lEngine, "state link failed board=0 reason=\"no light\""), 0u);
    EXPECT_EQ(injectLine(lEngine, "state link failed board=0 reason=\"no laser\""), 1u);
    EXPECT_EQ(injectLine(lEngine, "state link working"), 1u);
    EXPECT_EQ(lReports.take(),
              (Texts{"board 0 8/2 state 4 no light", "board 0 8/2 state 4 no laser", "board 0 8/2 state 1 "}));
    EXPECT_EQ(injectLine(lEngine, "state all no-source"), 40u);
}

TEST(Sources, AStateOfTheScheduleIsReportedAtItsTime) {
    ZTCReports lReports;
    ZTCSimEngine lEngine(
        readTwoAdapters("start init\nstate link failed board=0 at=10 reason=pulled\nstate link working board=0 at=20"));
    lEngine.start();
    lReports.waitFor("board 0 8/2 state 1 ");
    EXPECT_EQ(lReports.take(), (Texts{"board 0 8/2 state 4 pulled", "board 0 8/2 state 1 "}));
}

TEST(Sources, NothingIsDeliveredOfAKindThatDoesNotWork) {
    ZTCRecorder lRecorder;
    for (const char* lpState : {"no-source", "no-rights", "failed"}) {
        ZTCSimEngine lEngine(readTwoAdapters());
        lRecorder.registerAll(lEngine, 0);
        lRecorder.registerAll(lEngine, 1);
        injectLine(lEngine, std::string("state queue-full board=0 ") + lpState);
        EXPECT_EQ(injectLine(lEngine, "queue-full board=all"), 1u) << lpState;
        EXPECT_EQ(injectLine(lEngine, "plogi board=all"), 2u) << lpState;
        injectLine(lEngine, "state queue-full working");
        EXPECT_EQ(injectLine(lEngine, "queue-full board=all"), 2u) << lpState;
        EXPECT_EQ(lEngine.getStatus().mDropped, 1u) << lpState;
    }
}

TEST(Sources, ARegistrationAnswersWithTheStatusOfItsState) {
    struct Row {
        const char* mpState;
        std::uint32_t mStatus;
        std::uint64_t mDeliveredOnceItWorks;
    };
    for (const Row& lcrRow : {Row{.mpState = "working", .mStatus = 0, .mDeliveredOnceItWorks = 1},
                              Row{.mpState = "no-source", .mStatus = 6, .mDeliveredOnceItWorks = 0},
                              Row{.mpState = "no-rights", .mStatus = 7, .mDeliveredOnceItWorks = 1},
                              Row{.mpState = "failed", .mStatus = 0, .mDeliveredOnceItWorks = 1}}) {
        SCOPED_TRACE(lcrRow.mpState);
        ZTCRecorder lRecorder;
        ZTCSimEngine lEngine(readTwoAdapters());
        injectLine(lEngine, std::string("state queue-full board=0 ") + lcrRow.mpState);
        std::uint32_t lHandle = 0;
        EXPECT_EQ(lEngine.registerForPort(0, lEngine.getScenario().mAdapters[0].mWwpn, 4, 0x01, &lRecorder, &lHandle,
                                          ZTCRecorder::onScope),
                  lcrRow.mStatus);
        EXPECT_NE(lHandle, 0u);
        injectLine(lEngine, "state queue-full working");
        EXPECT_EQ(injectLine(lEngine, "queue-full board=0"), lcrRow.mDeliveredOnceItWorks);
    }
}

TEST(Sources, ARegistrationThatAnswersWithAHandleAloneReportsItsStateFirst) {
    ZTCRecorder lRecorder;
    ZTCReports lReports;
    ZTCSimEngine lEngine(
        readTwoAdapters("state link no-source reason=\"no such adapter\"\nstate temperature no-source\n"
                        "register rscn board=1 status=7\nregister link board=1 status=33"));
    lEngine.start();
    lReports.take();
    EXPECT_NE(lRecorder.registerKind(lEngine, 0, "rscn"), 0u);
    EXPECT_EQ(lReports.take(), Texts{"board 0 1/32 state 1 "});
    EXPECT_NE(lRecorder.registerKind(lEngine, 0, "link"), 0u);
    EXPECT_EQ(lReports.take(), Texts{"board 0 8/2 state 2 no such adapter"});
    EXPECT_EQ(lRecorder.registerKind(lEngine, 0, "temperature"), 0u);
    EXPECT_EQ(lReports.take(), Texts{"board 0 8/4 state 2 "});
    EXPECT_NE(lRecorder.registerKind(lEngine, 1, "rscn"), 0u);
    EXPECT_EQ(lReports.take(), Texts{"board 1 1/32 state 3 "});
    EXPECT_EQ(lRecorder.registerKind(lEngine, 1, "link"), 0u);
    EXPECT_EQ(lReports.take(), Texts{"board 1 8/2 state 4 refused with status 33"});
    EXPECT_NE(lRecorder.registerKind(lEngine, 1, "queue-full"), 0u);
    EXPECT_EQ(lReports.take(), Texts{});
}

TEST(Sources, LossesAreReportedAsRunningTotalsByTheirNames) {
    ZTCReports lReports;
    ZTCSimEngine lEngine(readTwoAdapters());
    EXPECT_EQ(injectLine(lEngine, "loss \"trace events\" count=3 times=2"), 2u);
    EXPECT_EQ(injectLine(lEngine, "loss messages count=1"), 1u);
    EXPECT_EQ(injectLine(lEngine, "loss \"trace events\" count=5"), 1u);
    EXPECT_EQ(lReports.take(), (Texts{"trace events 3", "trace events 6", "messages 1", "trace events 11"}));
}

TEST(Sources, LossesOfTheScheduleComeAtTheirTimes) {
    ZTCReports lReports;
    ZTCSimEngine lEngine(readTwoAdapters("start init\nloss messages count=2 at=5 every=5 times=3"));
    lEngine.start();
    lReports.waitFor("messages 6");
    EXPECT_EQ(lReports.take(), (Texts{"messages 2", "messages 4", "messages 6"}));
}

TEST(Sources, TheTableTakesTheAgentsFunctionsForReports) {
    ZTCReports lReports;
    const KPM_FunctionList& lrList = *getSimFunctionList();
    ASSERT_GE(lrList.size, KPM_FUNCTION_LIST_SIZE_REPORT);
    ASSERT_NE(lrList.SetReport, nullptr);
    ZTCSimSources lSources(1);
    lrList.SetReport(nullptr, nullptr, nullptr);
    lSources.lose({.mName = "messages", .mCount = 1});
    EXPECT_EQ(lReports.take(), Texts{});
    lrList.SetReport(&lReports, ZTCReports::onState, ZTCReports::onLoss);
    lSources.lose({.mName = "messages", .mCount = 1});
    EXPECT_EQ(lReports.take(), Texts{"messages 2"});
}
