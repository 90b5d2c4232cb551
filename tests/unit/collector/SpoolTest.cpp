#include "sensor/collector/include/Spool.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "tests/support/SmallFileSystem.h"
#include "tests/support/TemporaryDirectory.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class SpoolTest : public testing::Test {
protected:
    SpoolTest() { mSpool.open(); }

    /// A `.part` with these bytes.
    ZTSSpoolPart makePart(std::uint64_t aNumber, const std::string& acrBytes) {
        ZTSSpoolPart lPart = mSpool.createPart(aNumber, "ab", gcShortReserve);
        EXPECT_EQ(write(lPart.mFile.get(), acrBytes.data(), acrBytes.size()), static_cast<ssize_t>(acrBytes.size()));
        lPart.mSize = acrBytes.size();
        return lPart;
    }
    std::vector<std::string> names() const {
        std::vector<std::string> lNames;
        for (const ZTSSpoolEntry& lrEntry : mSpool.list()) {
            lNames.push_back(lrEntry.mName.toText());
        }
        return lNames;
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCSpool mSpool{mDirectory.path("spool")};
};

TEST_F(SpoolTest, ItsFolderIsItsOwnersAlone) {
    struct stat lStatus {};
    ASSERT_EQ(stat(mSpool.getFolder().c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode & 0777U, 0700U);
    mSpool.open();  // one that is there is taken
}

TEST_F(SpoolTest, APartHasRoomAndNoSize) {
    const ZTSSpoolPart lPart = mSpool.createPart(1, "ab", gcResponseReserve);
    struct stat lStatus {};
    ASSERT_EQ(fstat(lPart.mFile.get(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_size, 0);
    EXPECT_GE(static_cast<std::uint64_t>(lStatus.st_blocks) * 512, gcResponseReserve);
    EXPECT_EQ(lPart.mReserved, gcResponseReserve);
    EXPECT_THAT(names(), ElementsAre("1.ab.part"));
}

TEST_F(SpoolTest, AFinishedPartIsAFrameThatTakesNoMoreRoomThanItNeeds) {
    ZTSSpoolPart lPart = makePart(1, "frame");
    mSpool.reserve(lPart, gcResponseReserve);
    const ZTSSpoolName lName = mSpool.finish(lPart);
    EXPECT_EQ(lName.toText(), "1.ab.frame");
    EXPECT_FALSE(lPart.mFile.isOpen());
    struct stat lStatus {};
    ASSERT_EQ(stat(mSpool.pathOf(lName).c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_size, 5);
    EXPECT_LE(lStatus.st_blocks * 512, 65536);
    EXPECT_EQ(mSpool.read(lName), (std::vector<std::uint8_t>{'f', 'r', 'a', 'm', 'e'}));
}

TEST_F(SpoolTest, ATornPartKeepsItsBytes) {
    ZTSSpoolPart lPart = makePart(1, "fra");
    const ZTSSpoolName lName = mSpool.tear(lPart);
    EXPECT_EQ(lName.toText(), "1.ab.torn");
    EXPECT_EQ(mSpool.read(lName).size(), 3U);
}

TEST_F(SpoolTest, ATornPartWithoutAByteIsGone) {
    ZTSSpoolPart lPart = makePart(1, "");
    mSpool.tear(lPart);
    EXPECT_THAT(names(), IsEmpty());
}

TEST_F(SpoolTest, AnExistingPartIsNeverMadeAnew) {
    makePart(1, "precious");
    EXPECT_THROW(mSpool.createPart(1, "ab", 1), ZTCSpoolTroubleEx);
    EXPECT_EQ(mSpool.openPart({.mNumber = 1, .mGeneration = "ab", .mState = ZTSPS_Part}).mSize, 8U);
}

TEST_F(SpoolTest, ListsItsFilesByNumberAndLeavesOthersAlone) {
    for (const std::uint64_t lNumber : {10U, 9U, 100U}) {
        ZTSSpoolPart lPart = makePart(lNumber, "x");
        mSpool.finish(lPart);
    }
    writeFile(mSpool.getFolder() + "/note", "of a person");
    std::filesystem::create_directory(mSpool.getFolder() + "/11.ab.frame");
    EXPECT_THAT(names(), ElementsAre("9.ab.frame", "10.ab.frame", "100.ab.frame"));
    EXPECT_TRUE(exists(mSpool.getFolder() + "/note"));
}

TEST_F(SpoolTest, ASyncedFileIsAsItWas) {
    ZTSSpoolPart lPart = makePart(1, "frame");
    const ZTSSpoolName lName = mSpool.finish(lPart);
    mSpool.sync(lName);
    EXPECT_EQ(mSpool.read(lName).size(), 5U);
}

TEST_F(SpoolTest, RemovingAFileThatIsGoneIsNoError) {
    ZTSSpoolPart lPart = makePart(1, "frame");
    const ZTSSpoolName lName = mSpool.finish(lPart);
    mSpool.remove(lName);
    mSpool.remove(lName);
    EXPECT_THAT(names(), IsEmpty());
}

TEST_F(SpoolTest, AFolderThatCannotBeMadeIsTroubleWithItsName) {
    ZTCSpool lSpool(mDirectory.path("missing/spool"));
    try {
        lSpool.open();
        FAIL() << "it was made";
    } catch (const ZTCSpoolTroubleEx& lrEx) {
        EXPECT_THAT(lrEx.what(), HasSubstr(mDirectory.path("missing/spool")));
        EXPECT_EQ(lrEx.getErrno(), ENOENT);
    }
}

class SpoolTroubleTest : public testing::Test {
protected:
    SpoolTroubleTest() {
        if (mFileSystem.isMounted()) {
            mSpool.open();
        }
    }
    void SetUp() override {
        if (!mFileSystem.isMounted()) {
            GTEST_SKIP() << "no file system can be mounted here";
        }
    }
    int createErrno(std::uint64_t aReserve) {
        try {
            ZTSSpoolPart lPart = mSpool.createPart(1, "ab", aReserve);
            mSpool.discard(lPart);
        } catch (const ZTCSpoolTroubleEx& lrEx) {
            return lrEx.getErrno();
        }
        return 0;
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCSmallFileSystem mFileSystem{mDirectory.path(), 12 << 10};
    ZTCSpool mSpool{mDirectory.path("spool")};
};

TEST_F(SpoolTroubleTest, WithoutRoomThereIsNoPartAndTheRoomThatThereWasIsLeft) {
    ASSERT_EQ(createErrno(gcResponseReserve), 0);
    EXPECT_EQ(createErrno(2 * gcResponseReserve), ENOSPC);
    EXPECT_THAT(mSpool.list(), IsEmpty());
    EXPECT_EQ(createErrno(gcResponseReserve), 0);
    mFileSystem.fill();
    EXPECT_EQ(createErrno(gcResponseReserve), ENOSPC);
    EXPECT_THAT(mSpool.list(), IsEmpty());
    mFileSystem.empty();
    EXPECT_EQ(createErrno(gcResponseReserve), 0);
}

TEST_F(SpoolTroubleTest, AReadOnlyFileSystemIsLikeAFullOne) {
    mFileSystem.makeReadOnly();
    EXPECT_EQ(createErrno(gcShortReserve), EROFS);
    mFileSystem.makeWritable();
    EXPECT_EQ(createErrno(gcShortReserve), 0);
}
