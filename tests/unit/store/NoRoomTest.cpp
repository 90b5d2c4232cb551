// A full or read-only disk: nothing is stored by halves, and the same work succeeds once there is room.
#include "tests/support/SmallFileSystem.h"
#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/PowerCut.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

class NoRoomTest : public ZTCStoreTest {
protected:
    ZTCBytes makeBigBody() {
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = 0; i < 2000; ++i) {
            lRecords.push_back(makeQueueFull(gcPortA + i, gcBase, gcBase));
        }
        return makeBody(lRecords);
    }
};

}  // namespace

TEST_F(NoRoomTest, AFullDiskIsSaidAndLeavesTheStoreUsable) {
    ZTCSmallFileSystem lDisk(mDirectory.path(), 2048);
    if (!lDisk.isMounted()) {
        GTEST_SKIP() << "AnyFailingWriteIsSaidAndTheSameWorkSucceedsLater holds the same without a file system";
    }
    take({makeQueueFull(gcPortA, gcBase, gcBase, 5)});
    lDisk.fill();
    const ZTCBytes lBody = makeBigBody();
    for (int i = 0; i < 3; ++i) {
        EXPECT_THROW(takeBody(lBody), ZTCStoreNoRoomEx);
        EXPECT_FALSE(store().hasFrame(2));
        EXPECT_EQ(episodes().size(), 1U);
    }
    lDisk.empty();
    EXPECT_EQ(takeBody(lBody).mOccurrences, 2000U);
    EXPECT_EQ(episodes().size(), 2000U) << "the first port's episode goes on";
    expectIntegrity(path());
    mHistory.reset();
    closeStore();
}

TEST_F(NoRoomTest, AReadOnlyDiskIsSaidAtTheOpeningAndTheOpeningSucceedsLater) {
    ZTCSmallFileSystem lDisk(mDirectory.path(), 4096);
    if (!lDisk.isMounted()) {
        GTEST_SKIP() << "no file system can be mounted here";
    }
    take({makeQueueFull(gcPortA, gcBase, gcBase, 5)});
    closeStore();
    lDisk.makeReadOnly();
    EXPECT_THROW(store(), ZTCStoreNoRoomEx);
    EXPECT_EQ(ZTCHistory(mDirectory.path()).readEpisodes({}).size(), 1U) << "what is there can be read";
    lDisk.makeWritable();
    take({makeQueueFull(gcPortA, gcBase, gcBase, 5)});
    EXPECT_EQ(episodes()[0].mCount, 10U);
    mHistory.reset();
    closeStore();
}

TEST_F(NoRoomTest, AnyFailingWriteIsSaidAndTheSameWorkSucceedsLater) {
    ZTCPowerCut lWrites;
    std::uint64_t lSum = 0;
    for (std::uint64_t lNth = 1;; lNth += 5) {
        SCOPED_TRACE("write " + std::to_string(lNth));
        const ZTCBytes lBody =
            makeBody({makeQueueFull(gcPortA + lNth, gcBase, gcBase, 5), makeQueueFull(gcPortA, gcBase, gcBase, 1)});
        store();
        lWrites.failFrom(lNth);
        bool lIsStored = false;
        try {
            takeBody(lBody);
            lIsStored = true;
        } catch (const ZTCStoreNoRoomEx&) {
        }
        const bool lHasFailed = lWrites.hasFailed();
        lWrites.failFrom(0);
        ASSERT_TRUE(lIsStored || lHasFailed);
        if (!lIsStored) {
            EXPECT_EQ(takeBody(lBody).mOccurrences, 6U);
        }
        lSum += 6;
        ASSERT_EQ(queryNumber(path(), "SELECT sum(count) FROM episode"), static_cast<std::int64_t>(lSum));
        if (!lHasFailed) {
            break;
        }
    }
    expectIntegrity(path());
    mHistory.reset();
    closeStore();
}
