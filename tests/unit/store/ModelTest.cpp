// Random schedules of frames, closings, rollbacks, restarts, kills and power cuts against a small model.
#include <algorithm>
#include <map>
#include <set>

#include "tests/support/Seed.h"
#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/PowerCut.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

struct ZTSModelEpisode {
    std::uint64_t mPort = 0;
    std::uint64_t mLocalPort = 0;
    std::uint64_t mCount = 0;
    std::uint64_t mRecords = 0;
    std::int64_t mFirst = 0;
    std::int64_t mLast = 0;
    bool mIsOpen = true;
    bool mHasClockFlag = false;
    std::set<std::uint32_t> mLuns;
};

/// The rules of episodes, written down plainly. Episodes stand in the order in which they began.
struct ZTSModel {
    static constexpr std::int64_t scGap = 60 * gcSecond;
    std::vector<ZTSModelEpisode> mEpisodes;

    void add(const ZTSTestRecord& acrRecord, std::uint64_t aPort, std::uint64_t aLocalPort, std::uint32_t aLun) {
        auto lPlace = std::ranges::find_if(mEpisodes, [&](const ZTSModelEpisode& acrEpisode) {
            return acrEpisode.mIsOpen && acrEpisode.mPort == aPort && acrEpisode.mLocalPort == aLocalPort;
        });
        if (lPlace != mEpisodes.end() && acrRecord.mBegin - lPlace->mLast > scGap) {
            lPlace->mIsOpen = false;
            lPlace = mEpisodes.end();
        }
        if (lPlace == mEpisodes.end()) {
            ZTSModelEpisode lNew;
            lNew.mPort = aPort;
            lNew.mLocalPort = aLocalPort;
            lNew.mFirst = acrRecord.mBegin;
            lNew.mLast = acrRecord.mEnd;
            lPlace = mEpisodes.insert(mEpisodes.end(), lNew);
        }
        lPlace->mCount += acrRecord.mOccurrences;
        ++lPlace->mRecords;
        lPlace->mFirst = std::min(lPlace->mFirst, acrRecord.mBegin);
        lPlace->mLast = std::max(lPlace->mLast, acrRecord.mEnd);
        lPlace->mHasClockFlag = lPlace->mHasClockFlag || acrRecord.mEnd < acrRecord.mBegin;
        lPlace->mLuns.insert(aLun);
    }
    void close(std::int64_t aNow) {
        for (ZTSModelEpisode& lrEpisode : mEpisodes) {
            lrEpisode.mIsOpen = lrEpisode.mIsOpen && aNow - lrEpisode.mLast <= scGap;
        }
    }
};

class ModelTest : public ZTCStoreTest {
protected:
    /// A frame of random records around the present time; the model learns of it too.
    ZTCBytes makeFrame(ZTSModel& arModel) {
        const std::uint64_t lLocalPort = gcLocalPort + mSeed.below(2);
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = mSeed.below(30); i > 0; --i) {
            const std::uint64_t lPort = gcPortA + mSeed.below(5);
            const std::uint32_t lLun = mSeed.below(256);
            const std::int64_t lBegin = mNow - mSeed.below(90) * gcSecond;
            const std::int64_t lEnd = lBegin + static_cast<std::int64_t>(mSeed.below(20)) * gcSecond -
                                      (mSeed.below(20) == 0 ? 30 * gcSecond : 0);
            lRecords.push_back(makeQueueFull(lPort, lBegin, lEnd, 1 + mSeed.below(9), lLun));
            arModel.add(lRecords.back(), lPort, lLocalPort, lLun);
        }
        return makeBody(lRecords, lLocalPort);
    }
    void expectModel() {
        const auto lEpisodes = episodes();
        ASSERT_EQ(lEpisodes.size(), mModel.mEpisodes.size());
        std::uint64_t lSeq = 0;
        for (std::size_t i = 0; i < lEpisodes.size(); ++i) {
            SCOPED_TRACE("episode " + std::to_string(i));
            const ZTSModelEpisode& lrModel = mModel.mEpisodes[i];
            EXPECT_EQ(lEpisodes[i].mRemotePort->mWwpn, makeName(lrModel.mPort));
            EXPECT_EQ(lEpisodes[i].mInitiator.mWwpn, makeName(lrModel.mLocalPort));
            EXPECT_EQ(lEpisodes[i].mCount, lrModel.mCount);
            EXPECT_EQ(lEpisodes[i].mRecords, lrModel.mRecords);
            EXPECT_EQ(toMicroseconds(lEpisodes[i].mFirst), lrModel.mFirst);
            EXPECT_EQ(toMicroseconds(lEpisodes[i].mLast), lrModel.mLast);
            EXPECT_EQ(lEpisodes[i].isOpen(), lrModel.mIsOpen);
            EXPECT_EQ(lEpisodes[i].mHasClockFlag, lrModel.mHasClockFlag);
            EXPECT_EQ(lEpisodes[i].mDetail.mLuns->mNumbers,
                      std::vector<std::uint32_t>(lrModel.mLuns.begin(), lrModel.mLuns.end()));
            EXPECT_GT(lEpisodes[i].mEpisode, lSeq);
            lSeq = lEpisodes[i].mEpisode;
        }
    }
    /// One transaction with frames and a closing; true where it was committed. The model follows only then.
    bool step() {
        ZTSModel lModel = mModel;
        std::uint64_t lFrame = mLastFrame;
        try {
            ZTCStoreTransaction lTransaction = store().begin();
            // At least one frame: by it a commit is known whose last sync failed.
            for (unsigned i = 1 + mSeed.below(3); i > 0; --i) {
                store().takeIn(++lFrame, gcGeneration, makeFrame(lModel), false, fromMicroseconds(mNow));
            }
            if (mSeed.below(2) == 0) {
                store().closeEpisodes(fromMicroseconds(mNow), [](const ZTSInitiator&, ZTCKindKey) { return true; });
                lModel.close(mNow);
            }
            if (mSeed.below(8) == 0) {
                return true;  // rolled back
            }
            mPending = lModel;
            mPendingFrame = lFrame;
            lTransaction.commit();
        } catch (const ZTCStoreNoRoomEx&) {
            return false;
        }
        mModel = lModel;
        mLastFrame = lFrame;
        return true;
    }

    ZTCTestSeed mSeed;
    ZTSModel mModel;
    ZTSModel mPending;  ///< after the commit that was tried last
    std::uint64_t mPendingFrame = 0;
    std::uint64_t mLastFrame = 0;
    std::int64_t mNow = gcBase;
};

}  // namespace

TEST_F(ModelTest, RandomSchedulesWithCutsAndKillsFollowTheModel) {
    mLimits.mRecordsPerEnd = 3;
    ZTCPowerCut lPower;
    for (int i = 0; i < 150 && !HasFailure(); ++i) {
        SCOPED_TRACE("step " + std::to_string(i));
        mNow += mSeed.below(120) * gcSecond;
        const bool lIsCut = mSeed.below(4) == 0;
        lPower.failFrom(lIsCut ? 1 + mSeed.below(150) : 0);
        mPendingFrame = mLastFrame;
        const bool lIsDone = step();
        if (lIsCut) {
            mHistory.reset();
            closeStore();
            lPower.cut(mSeed.below(2) == 0, [&](unsigned aBound) { return mSeed.below(aBound); });
            // A commit that failed in its last sync may have reached the disk: then all of it is there.
            if (!lIsDone && mPendingFrame != mLastFrame && store().hasFrame(mPendingFrame)) {
                mModel = mPending;
                mLastFrame = mPendingFrame;
            }
        }
        lPower.failFrom(0);
        if (mSeed.below(10) == 0) {
            mHistory.reset();
            closeStore();
        }
        if (mSeed.below(5) == 0) {
            expectModel();
        }
    }
    expectModel();
    mHistory.reset();
    closeStore();
    expectIntegrity(path());
}
