// Kills and power cuts at every write: what was committed is there, nothing is there twice, and the rest can follow.
#include <unistd.h>

#include <csignal>

#include "tests/support/Seed.h"
#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/PowerCut.h"
#include "tests/unit/store/StoreFixture.h"
#include "tests/unit/system/ForkedProcess.h"

namespace {

constexpr std::uint64_t scFrames = 6;

/// Frames with several kinds and ports, episodes that grow over frames, and one that closes in between.
ZTCBytes makeFrame(std::uint64_t aNumber) {
    const std::int64_t lTime = gcBase + static_cast<std::int64_t>(aNumber) * 40 * gcSecond;
    const auto lCount = static_cast<std::uint32_t>(aNumber);
    std::vector<ZTSTestRecord> lRecords = {
        makeQueueFull(gcPortA, lTime, lTime + gcSecond, lCount, lCount % 256),
        {.mKind = gcLsRjt,
         .mData = makeLsRjtData(gcPortB, 3, {{9, lCount}}),
         .mBegin = lTime,
         .mEnd = lTime,
         .mPortName = {}},
    };
    if (aNumber % 3 == 0) {
        lRecords.push_back({.mKind = gcLink,
                            .mData = makeGenericData(),
                            .mBegin = lTime,
                            .mEnd = lTime,
                            .mOccurrences = 7,
                            .mPortName = {}});
    }
    return makeBody(lRecords);
}

/// Takes in every frame that the database does not have. `aCommitted` becomes the last one whose commit returned.
void runAll(const std::string& acrDirectory, std::uint64_t& arCommitted) {
    std::unique_ptr<ZTCStore> lpStore;
    for (std::uint64_t lFrame = 1; lFrame <= scFrames; ++lFrame) {
        if (!lpStore || lFrame == scFrames / 2) {
            lpStore.reset();
            lpStore = std::make_unique<ZTCStore>(acrDirectory, ZTSStoreLimits{.mRecordsPerEnd = 2}, nullptr);
        }
        if (lpStore->hasFrame(lFrame)) {
            continue;
        }
        const ZTCHistoryTime lNow = fromMicroseconds(gcBase + static_cast<std::int64_t>(lFrame) * 40 * gcSecond);
        ZTCStoreTransaction lTransaction = lpStore->begin();
        lpStore->takeIn(lFrame, gcGeneration, makeFrame(lFrame), false, lNow);
        lpStore->closeEpisodes(lNow, [](const ZTSInitiator&, ZTCKindKey) { return true; });
        lTransaction.commit();
        arCommitted = lFrame;
    }
}

void expectAllFrames(const std::string& acrDirectory) {
    const std::string lPath = acrDirectory + "/history.db";
    expectIntegrity(lPath);
    EXPECT_EQ(queryNumber(lPath, "SELECT count(*) FROM frame"), static_cast<std::int64_t>(scFrames));
    EXPECT_EQ(queryNumber(lPath, "SELECT sum(taken) FROM total"), 21 + 6 + 14);
    // The episodes are those of a run without a crash: the time between frames is less than the gap for two of them.
    EXPECT_EQ(queryNumber(lPath, "SELECT count(*) FROM episode"), 4);
}

/// Cuts the power at every operation, one run each, until a run passes without a cut. Returns the number of cuts.
unsigned cutEverywhere(bool aKeepsAll, unsigned aFirst, unsigned aStep, ZTCTestSeed& arSeed) {
    for (unsigned lNth = aFirst;; lNth += aStep) {
        SCOPED_TRACE("operation " + std::to_string(lNth));
        ZTCTemporaryDirectory lDirectory;
        ZTCPowerCut lPower;
        lPower.failFrom(lNth);
        std::uint64_t lCommitted = 0;
        bool lIsThrough = false;
        try {
            runAll(lDirectory.path(), lCommitted);
            lIsThrough = true;
        } catch (const ZTCStoreNoRoomEx&) {
        }
        if (lIsThrough && !lPower.hasFailed()) {
            return lNth;
        }
        lPower.cut(aKeepsAll, [&](unsigned aBound) { return arSeed.below(aBound); });
        {
            const ZTCStore lStore(lDirectory.path(), {}, [](const std::string& acrLine) { ADD_FAILURE() << acrLine; });
            for (std::uint64_t i = 1; i <= lCommitted; ++i) {
                EXPECT_TRUE(lStore.hasFrame(i)) << "committed frame " << i;
            }
        }
        expectIntegrity(lDirectory.path("history.db"));
        runAll(lDirectory.path(), lCommitted);
        expectAllFrames(lDirectory.path());
        if (testing::Test::HasFailure()) {
            return lNth;
        }
    }
}

}  // namespace

TEST(CrashTest, APowerCutAtAnyWriteLosesNothingThatWasCommitted) {
    ZTCTestSeed lSeed;
    EXPECT_GT(cutEverywhere(false, 1 + lSeed.below(6), 6, lSeed), 100U);
}

TEST(CrashTest, AKillAtAnyWriteLosesNothingThatWasCommitted) {
    ZTCTestSeed lSeed;
    EXPECT_GT(cutEverywhere(true, 1 + lSeed.below(6), 6, lSeed), 100U);
}

TEST(CrashTest, AKilledProcessLeavesWholeFramesOnly) {
    ZTCTestSeed lSeed;
    ZTCTemporaryDirectory lDirectory;
    std::int64_t lBefore = 0;
    for (int i = 0; i < 15; ++i) {
        ZTCForkedProcess lWriter([&](ZTCForkedProcess& arProcess) {
            ZTCStore lStore(lDirectory.path(), ZTSStoreLimits{.mRecordsPerEnd = 2}, nullptr);
            arProcess.tellParent();
            for (;;) {
                const std::uint64_t lFrame = lStore.getLastFrame() + 1;
                ZTCStoreTransaction lTransaction = lStore.begin();
                lStore.takeIn(lFrame, gcGeneration, makeFrame(lFrame), false, getHistoryTime());
                lTransaction.commit();
            }
            return 0;
        });
        lWriter.waitForChild();
        usleep(lSeed.below(20000));
        lWriter.sendSignal(SIGKILL);
        EXPECT_EQ(lWriter.waitForExit(), 1000 + SIGKILL);
        expectIntegrity(lDirectory.path("history.db"));
        const std::int64_t lFrames = queryNumber(lDirectory.path("history.db"), "SELECT count(*) FROM frame");
        EXPECT_GE(lFrames, lBefore);
        EXPECT_EQ(queryNumber(lDirectory.path("history.db"), "SELECT max(number) FROM frame"), lFrames);
        lBefore = lFrames;
    }
    EXPECT_GT(lBefore, 0);
}
