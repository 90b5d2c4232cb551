// Random schedules of storms, kills, power cuts, full disks and restarts, against a small model: which frames were
// committed, and how often each port's event has occurred in them. On a layer that drops what was not synced.
#include <map>

#include "tests/support/Seed.h"
#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/PowerCut.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

constexpr unsigned scSchedules = 8;
constexpr unsigned scSteps = 60;

struct ZTSModelFrame {
    std::uint64_t mPort = 0;
    std::uint32_t mOccurrences = 0;
    std::int64_t mTime = 0;
};

class RestartModelTest : public testing::Test {
protected:
    ZTCStore& store() {
        if (!mpStore) {
            mpStore = std::make_unique<ZTCStore>(mDirectory.path(), ZTSStoreLimits{.mRecordsPerEnd = 2},
                                                 [](const std::string& acrLine) { ADD_FAILURE() << acrLine; });
        }
        return *mpStore;
    }
    /// Responses come in, and wait until they are taken in.
    void storm() {
        for (unsigned i = 1 + mSeed.below(5); i > 0; --i) {
            mTime += (1 + mSeed.below(50)) * gcSecond;
            mWaiting[++mLast] = {
                .mPort = gcPortA + mSeed.below(4), .mOccurrences = 1 + mSeed.below(1000), .mTime = mTime};
        }
    }
    /// Takes in what waits, several frames in a transaction. What a commit has returned for waits no more.
    void takeIn() {
        while (!mWaiting.empty()) {
            ZTCStoreTransaction lTransaction = store().begin();
            std::map<std::uint64_t, ZTSModelFrame> lTaken;
            for (auto lNext = mWaiting.begin(); lNext != mWaiting.end() && lTaken.size() < 3; ++lNext) {
                const auto& [lNumber, lrFrame] = *lNext;
                if (!store().hasFrame(
                        lNumber)) {  // otherwise its commit had arrived, and the power went before it said so
                    const ZTCBytes lBody =
                        makeBody({makeQueueFull(lrFrame.mPort, lrFrame.mTime, lrFrame.mTime, lrFrame.mOccurrences)});
                    store().takeIn(lNumber, gcGeneration, lBody, false, fromMicroseconds(lrFrame.mTime));
                }
                lTaken.insert(*lNext);
            }
            store().closeEpisodes(fromMicroseconds(mTime), [](const ZTSInitiator&, ZTCKindKey) { return true; });
            lTransaction.commit();
            for (const auto& [lNumber, lrFrame] : lTaken) {
                mWaiting.erase(lNumber);
                mCommitted[lNumber] = lrFrame;
            }
        }
    }
    /// The same, until an operation fails: the disk is full, or the process or the machine is about to end.
    void takeInUntilFailure() {
        mPower.failFrom(1 + mSeed.below(40));
        try {
            takeIn();
        } catch (const ZTCStoreNoRoomEx&) {
        }
    }
    void end(bool aKeepsAll) {
        mpStore.reset();
        mPower.cut(aKeepsAll, [this](unsigned aBound) { return mSeed.below(aBound); });
        mPower.failFrom(0);
    }
    void step() {
        storm();
        switch (mSeed.below(6)) {
            case 0:
                takeIn();
                break;
            case 1:  // full, until there is room again
                takeInUntilFailure();
                mPower.failFrom(0);
                takeIn();
                break;
            case 2:  // killed
                takeInUntilFailure();
                end(true);
                break;
            case 3:  // a power cut
                takeInUntilFailure();
                end(false);
                break;
            case 4:  // an orderly restart
                takeIn();
                mpStore.reset();
                break;
            default:  // nobody takes anything in for a while
                break;
        }
    }
    void expectAsModel() {
        for (const auto& [lNumber, lrFrame] : mCommitted) {
            EXPECT_TRUE(store().hasFrame(lNumber)) << "committed frame " << lNumber;
        }
        takeIn();
        std::map<std::uint64_t, std::uint64_t> lWanted;
        for (const auto& [lNumber, lrFrame] : mCommitted) {
            lWanted[lrFrame.mPort] += lrFrame.mOccurrences;
        }
        std::map<std::uint64_t, std::uint64_t> lTotals;
        std::map<std::uint64_t, std::uint64_t> lEpisodes;
        const ZTCHistory lHistory(mDirectory.path());
        for (unsigned i = 0; i < 4; ++i) {
            const ZTSFcName lPort = makeName(gcPortA + i);
            for (const ZTSTotal& lrTotal : lHistory.readTotals()) {
                if (lrTotal.mRemotePort && lrTotal.mRemotePort->mWwpn == lPort) {
                    lTotals[gcPortA + i] += lrTotal.mOccurrences;
                }
            }
            ZTSHistoryFilter lFilter;
            lFilter.mPorts = {lPort};
            for (const ZTSEpisode& lrEpisode : lHistory.readEpisodes(lFilter)) {
                lEpisodes[gcPortA + i] += lrEpisode.mCount;
            }
        }
        EXPECT_EQ(lTotals, lWanted);
        EXPECT_EQ(lEpisodes, lWanted);
        expectIntegrity(mDirectory.path("history.db"));
    }

    ZTCTestSeed mSeed;
    ZTCTemporaryDirectory mDirectory;
    ZTCPowerCut mPower;
    std::unique_ptr<ZTCStore> mpStore;
    std::map<std::uint64_t, ZTSModelFrame> mWaiting;
    std::map<std::uint64_t, ZTSModelFrame> mCommitted;
    std::uint64_t mLast = 0;
    std::int64_t mTime = gcBase;
};

class RestartModel : public RestartModelTest, public testing::WithParamInterface<unsigned> {};

}  // namespace

TEST_P(RestartModel, HasExactlyWhatWasCommittedAndTheRestFollows) {
    for (unsigned i = 0; i < scSteps && !HasFailure(); ++i) {
        SCOPED_TRACE("step " + std::to_string(i));
        step();
        if (i % 10 == 9) {
            expectAsModel();
        }
    }
    EXPECT_GT(mCommitted.size(), scSteps / 2);
}

INSTANTIATE_TEST_SUITE_P(Schedules, RestartModel, testing::Range(0U, scSchedules));
