// Random schedules of storms, kills, power cuts, full disks and restarts, against a small model. Spool and database are
// on layers that drop what was not synced, and one cut of the power hits both at the same moment. Afterwards
// all that was committed or synced is there, once. Any part of the rest may be missing.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <map>

#include "sensor/collector/include/HistoryWorker.h"
#include "sensor/collector/include/Leftovers.h"
#include "sensor/collector/include/PageCounts.h"
#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/support/Seed.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/collector/SyncedFiles.h"
#include "tests/unit/store/Frames.h"
#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/PowerCut.h"

namespace {

constexpr unsigned scSchedules = 4;
constexpr unsigned scSteps = 10;
constexpr unsigned scPorts = 4;

/// A response that was handed over, and that the model has not yet seen in the history.
struct ZTSModelFrame {
    std::vector<ZTSTestRecord> mRecords;
    std::vector<unsigned> mPorts;  ///< of each record
    ZTCBytes mBytes;               ///< as in the spool
    std::string mPath;
};

ZTCBytes makeFrame(const std::vector<ZTSTestRecord>& acrRecords) {
    const ZTCBytes lBody = makeBody(acrRecords);
    return ZTCByteWriter().u32(lBody.size()).raw(lBody).bytes();
}

class PowerCutTest : public testing::Test, public testing::WithParamInterface<unsigned> {
protected:
    PowerCutTest() { std::filesystem::create_directories(mDirectory.path("agent")); }

    // ---- the collector's life ----
    void start() {
        mSpool.emplace(state() + "/spool");
        mWorker = std::make_unique<ZTCHistoryWorker>(
            *mSpool, state(), ZTSStoreLimits{.mRecordsPerEnd = 2}, [](const std::string& acrLine) {
                EXPECT_THAT(acrLine, testing::Not(testing::HasSubstr("set aside"))) << "nothing is damaged";
            });
        waitUntil([this] { return mWorker->getState().mIsOpen; }, "the open history");
        ZTCLeftovers lLeftovers(mDirectory.path("agent"), *mSpool, *mWorker, nullptr);
        lLeftovers.takeInWaiting(mWorker->getState().mLastFrame);
        resumePart();
        lLeftovers.tearParts();
        mWorker->endForgottenAgents(generation());
        mWorker->notePage(makePage());
        waitUntil([this] { return mWorker->getState().mGeneration == generation(); }, "the agent in the history");
    }
    /// One thread at a time uses the databases. So the end comes first, and then the look.
    void end() { mWorker.reset(); }
    void endInOrder() {
        EXPECT_TRUE(mWorker->finish(3 * gcTestPatience));
        end();
    }
    void waitUntilStored() {
        waitUntil([this] { return mWorker->getState().mWaitingFrames == 0; }, "all frames in the history",
                  ZTCDeadline(3 * gcTestPatience));
    }
    /// Until each frame is in the database or is on the disk as it is: older than the last second.
    void waitUntilSafe() {
        waitUntil(
            [this] {
                return std::ranges::all_of(mOpen, [this](const auto& acrFrame) { return isSafe(acrFrame.second); });
            },
            "all frames on the disk", ZTCDeadline(3 * gcTestPatience));
    }
    /// A file is removed behind its commit.
    bool isSafe(const ZTSModelFrame& acrFrame) const {
        return !std::filesystem::exists(acrFrame.mPath) || mSynced.isOnDisk(acrFrame.mPath);
    }

    // ---- responses ----
    ZTSModelFrame makeModelFrame() {
        ZTSModelFrame lFrame;
        for (unsigned i = 1 + mSeed.below(4); i > 0; --i) {
            mTime += (1 + mSeed.below(50)) * gcSecond;
            lFrame.mPorts.push_back(mSeed.below(scPorts));
            lFrame.mRecords.push_back(
                makeQueueFull(gcPortA + lFrame.mPorts.back(), mTime, mTime, 1 + mSeed.below(500)));
        }
        lFrame.mBytes = makeFrame(lFrame.mRecords);
        return lFrame;
    }
    static void append(ZTSSpoolPart& arPart, std::span<const unsigned char> aBytes) {
        ASSERT_EQ(pwrite(arPart.mFile.get(), aBytes.data(), aBytes.size(), static_cast<off_t>(arPart.mSize)),
                  static_cast<ssize_t>(aBytes.size()));
        arPart.mSize += aBytes.size();
    }
    /// The page of the agent that runs: it has handed over what came until now, and holds a few.
    ZTCPagePointer makePage() {
        auto lpPage = std::make_shared<ZTSStatusSnapshot>();
        lpPage->mStartId = generation();
        ZTSStatusBoardCopy& lrBoard = lpPage->mBoards.emplace_back();
        lrBoard.mWwpn = makeName(gcLocalPort).mBytes;
        lrBoard.mWwnn = makeName(gcLocalNode).mBytes;
        for (std::size_t i = 0; i < lrBoard.mRows.size(); ++i) {
            if (getRowKind(i) == gcQueueFull) {
                lrBoard.mRows[i].mHandedOver = mHandedOver;
                lrBoard.mRows[i].mConsolidated = mHandedOver + mSeed.below(1000);
            }
        }
        return lpPage;
    }
    void handOver(ZTSSpoolPart& arPart, ZTSModelFrame aFrame) {
        for (const ZTSTestRecord& lrRecord : aFrame.mRecords) {
            mHandedOver += lrRecord.mOccurrences;
        }
        const ZTSSpoolEntry lEntry{mSpool->finish(arPart), aFrame.mBytes.size()};
        aFrame.mPath = mSpool->pathOf(lEntry.mName);
        mOpen[lEntry.mName.mNumber] = std::move(aFrame);
        mWorker->takeIn(lEntry, makePage());
    }
    void storm() {
        for (unsigned i = 1 + mSeed.below(4); i > 0; --i) {
            ZTSModelFrame lFrame = makeModelFrame();
            ZTSSpoolPart lPart = mSpool->createPart(mSpool->takeNumber(), generation(), lFrame.mBytes.size());
            append(lPart, lFrame.mBytes);
            handOver(lPart, std::move(lFrame));
        }
    }
    /// A response of which a part has come.
    void beginPart() {
        ZTSModelFrame lFrame = makeModelFrame();
        ZTSSpoolPart lPart = mSpool->createPart(mSpool->takeNumber(), generation(), lFrame.mBytes.size());
        append(lPart, std::span(lFrame.mBytes).first(mSeed.below(static_cast<unsigned>(lFrame.mBytes.size()))));
        lFrame.mPath = mSpool->pathOf(lPart.mName);
        mPart = {lPart.mName, std::move(lFrame)};
    }
    /// The agent that was writing still runs: the rest comes.
    void resumePart() {
        if (mPart) {
            auto& [lrName, lrFrame] = *mPart;
            ZTSSpoolPart lPart = mSpool->openPart(lrName);
            append(lPart, std::span(lrFrame.mBytes).subspan(lPart.mSize));
            handOver(lPart, std::move(lrFrame));
            mPart.reset();
        }
    }

    // ---- the model ----
    std::string state() const { return mDirectory.path(); }
    std::string generation() const { return "a" + std::to_string(mGaps); }
    void count(const ZTSModelFrame& acrFrame, std::size_t aRecords) {
        for (std::size_t i = 0; i < aRecords; ++i) {
            mCounts[acrFrame.mPorts[i]] += acrFrame.mRecords[i].mOccurrences;
        }
    }
    /// How many records are whole in so many bytes of the file.
    static std::size_t countWhole(const ZTSModelFrame& acrFrame, std::size_t aSize) {
        std::size_t lWhole = 0;
        for (std::size_t i = 1; i <= acrFrame.mRecords.size(); ++i) {
            lWhole =
                makeFrame({acrFrame.mRecords.begin(), acrFrame.mRecords.begin() + static_cast<long>(i)}).size() <= aSize
                    ? i
                    : lWhole;
        }
        return lWhole;
    }
    void countAll() {
        for (const auto& [lNumber, lrFrame] : mOpen) {
            count(lrFrame, lrFrame.mRecords.size());
            mLast = lrFrame;
        }
        mOpen.clear();
    }

    // ---- the steps ----
    void fillDisk() { mPower.failFrom(1 + mSeed.below(40)); }
    void emptyDisk() { mPower.failFrom(0); }
    unsigned draw(unsigned aBound) { return mSeed.below(aBound); }

    void kill() {
        if (draw(2) == 0) {
            fillDisk();
        }
        storm();
        beginPart();
        end();
        mPower.cut(true, nullptr);
        expectIntegrity(mDirectory.path("history.db"));
        start();
    }
    void cutPower() {
        if (draw(2) == 0) {  // it has been full for more than a second
            fillDisk();
            storm();
            ASSERT_NO_FATAL_FAILURE(waitUntilSafe());
        }
        mIsCut = true;
        if (!mPower.hasFailed()) {
            fillDisk();
        }
        storm();
        beginPart();
        end();
        mPower.cut(false, [this](unsigned aBound) { return draw(aBound); });
        expectIntegrity(mDirectory.path("history.db"));
        cutSpool();
        mIsCut = false;
        ++mGaps;  // with the power the agent and its page went
        mHandedOver = 0;
        start();
    }
    /// A file that was not synced is left whole, in part or not at all, perhaps under its former name.
    void cutSpool() {
        const ZTCStore lStore(state(), {}, nullptr);
        if (mPart) {
            mOpen[mPart->first.mNumber] = std::move(mPart->second);
            mPart.reset();
        }
        for (const auto& [lNumber, lrFrame] : mOpen) {
            const bool lIsThere = std::filesystem::exists(lrFrame.mPath);
            if (lStore.hasFrame(lNumber)) {
                count(lrFrame, lrFrame.mRecords.size());
            } else {
                ASSERT_TRUE(lIsThere) << "frame " << lNumber << " was removed and is not in the database";
                count(lrFrame, countWhole(lrFrame, cutFile(lrFrame.mPath)));
            }
        }
        if (mLast && draw(2) == 0) {
            // That it was removed was not synced: it is back.
            writeFile(mLast->mPath, std::string(mLast->mBytes.begin(), mLast->mBytes.end()).substr(0, draw(500)));
        }
        mOpen.clear();
        mLast.reset();
    }
    /// Returns the bytes of it that are left.
    std::size_t cutFile(const std::string& acrPath) {
        const std::size_t lSize = std::filesystem::file_size(acrPath);
        const unsigned lFate = mSynced.isOnDisk(acrPath) ? 0 : draw(4);
        if (lFate == 0) {
            return lSize;
        }
        const std::size_t lLeft = lFate == 1 ? 0 : draw(static_cast<unsigned>(lSize) + 1);
        std::filesystem::resize_file(acrPath, lLeft);
        if (lFate == 1) {
            std::filesystem::remove(acrPath);
        } else if (lFate == 2) {
            std::filesystem::rename(acrPath, std::filesystem::path(acrPath).replace_extension(".part"));
        }
        return lLeft;
    }
    void step() {
        storm();
        switch (draw(6)) {
            case 0:
                break;  // the next step follows at once
            case 1:
                fillDisk();
                storm();
                ASSERT_NO_FATAL_FAILURE(waitUntilSafe());
                emptyDisk();
                waitUntilStored();
                break;
            case 2:
                kill();
                break;
            case 3:
                waitUntilStored();
                countAll();
                endInOrder();
                start();
                break;
            default:
                cutPower();
                break;
        }
    }
    void expectAsModel() {
        waitUntilStored();
        countAll();
        mWorker->notePage(makePage());
        endInOrder();
        expectSoundHistory(state());
        expectIntegrity(mDirectory.path("history.db"));
        std::map<unsigned, std::uint64_t> lTotals;
        const ZTCHistory lHistory(state());
        for (const ZTSTotal& lrTotal : lHistory.readTotals()) {
            for (unsigned i = 0; i < scPorts; ++i) {
                if (lrTotal.mRemotePort && lrTotal.mRemotePort->mWwpn == makeName(gcPortA + i)) {
                    lTotals[i] += lrTotal.mOccurrences;
                }
            }
        }
        EXPECT_EQ(lTotals, mCounts);
        EXPECT_EQ(lHistory.readGaps().size(), mGaps) << "one for each power cut";
        start();
    }

    ZTCTestSeed mSeed;
    ZTCTemporaryDirectory mDirectory;
    ZTCPowerCut mPower;
    std::atomic<bool> mIsCut{false};
    ZTCSyncedFiles mSynced{[this] { return !mIsCut || !mPower.hasFailed(); }};
    std::optional<ZTCSpool> mSpool;
    std::unique_ptr<ZTCHistoryWorker> mWorker;
    std::map<std::uint64_t, ZTSModelFrame> mOpen;
    std::optional<std::pair<ZTSSpoolName, ZTSModelFrame>> mPart;
    std::optional<ZTSModelFrame> mLast;  ///< one that was stored and removed
    std::map<unsigned, std::uint64_t> mCounts;
    std::uint64_t mHandedOver = 0;  ///< by the agent that runs
    std::size_t mGaps = 0;
    std::int64_t mTime = gcBase;
};

}  // namespace

TEST_P(PowerCutTest, LosesOnlyWhatWasNotOnTheDiskYetAndCountsNothingTwice) {
    start();
    for (unsigned i = 0; i < scSteps && !HasFailure(); ++i) {
        SCOPED_TRACE("step " + std::to_string(i));
        ASSERT_NO_FATAL_FAILURE(step());
        if (i % 3 == 2) {
            expectAsModel();
        }
    }
    expectAsModel();
    end();
}

INSTANTIATE_TEST_SUITE_P(Schedules, PowerCutTest, testing::Range(0U, scSchedules));
