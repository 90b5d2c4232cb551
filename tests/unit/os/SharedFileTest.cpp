#include "os/common/include/SharedFile.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

#include "common/include/Exception.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

class SharedFile : public ::testing::Test {
protected:
    ZTCTemporaryDirectory mDirectory;
    const std::string mPath = mDirectory.path("file");
    ZTCSharedFile mFile;
};

}  // namespace

TEST_F(SharedFile, HasItsNameOnlyOnceItIsPublished) {
    mFile.make(mPath.c_str(), 100);
    EXPECT_FALSE(exists(mPath));
    std::memcpy(mFile.get(), "content", 7);
    mFile.publish();
    EXPECT_EQ("content" + std::string(93, '\0'), readFile(mPath));
    EXPECT_FALSE(exists(mPath + ".new"));
}

TEST_F(SharedFile, TakesThePlaceOfAnotherFileWithoutTouchingIt) {
    writeFile(mPath, "former");
    const int lFormer = open(mPath.c_str(), O_RDONLY | O_CLOEXEC);
    mFile.make(mPath.c_str(), 100);
    mFile.publish();
    char lBytes[10] = {};
    EXPECT_EQ(6, read(lFormer, lBytes, sizeof lBytes));
    EXPECT_STREQ("former", lBytes);
    close(lFormer);
}

TEST_F(SharedFile, ReplacesWhatAKilledStartLeftUnderItsOtherNameAndFollowsNoLink) {
    writeFile(mDirectory.path("victim"), "untouched");
    ASSERT_EQ(0, symlink("victim", (mPath + ".new").c_str()));
    mFile.make(mPath.c_str(), 100);
    mFile.publish();
    EXPECT_EQ("untouched", readFile(mDirectory.path("victim")));
    EXPECT_EQ(100u, readFile(mPath).size());
}

TEST_F(SharedFile, GrowsByZerosAndKeepsItsContentAndNeverFaultsAReader) {
    mFile.make(mPath.c_str(), 100);
    std::memcpy(mFile.get(), "content", 7);
    mFile.publish();
    const int lReader = open(mPath.c_str(), O_RDONLY | O_CLOEXEC);
    const auto* lpMapped = static_cast<const char*>(mmap(nullptr, 100, PROT_READ, MAP_SHARED, lReader, 0));
    mFile.grow(100000);
    EXPECT_EQ(0, std::memcmp(mFile.get(), "content", 7));
    static_cast<char*>(mFile.get())[99999] = 'x';
    static_cast<char*>(mFile.get())[8] = 'y';
    EXPECT_EQ('y', lpMapped[8]) << "both mappings are of one file";
    const std::string lContent = readFile(mPath);
    EXPECT_EQ(100000u, lContent.size());
    EXPECT_EQ('\0', lContent[5000]);
    EXPECT_EQ('x', lContent[99999]);
    munmap(const_cast<char*>(lpMapped), 100);
    close(lReader);
}

TEST_F(SharedFile, IsMappedOnceHoweverOftenItGrows) {
    mFile.make(mPath.c_str(), 100);
    mFile.publish();
    for (const std::size_t lSize : {10000u, 100000u, 1000000u}) {
        mFile.grow(lSize);
    }
    const std::string lMappings = readFile("/proc/self/maps");
    const std::size_t lFirst = lMappings.find(mPath);
    ASSERT_NE(lFirst, std::string::npos);
    EXPECT_EQ(lMappings.find(mPath, lFirst + 1), std::string::npos);
}

TEST_F(SharedFile, StaysWhenItsOwnerGoes) {
    {
        ZTCSharedFile lFile;
        lFile.make(mPath.c_str(), 100);
        lFile.publish();
    }
    EXPECT_EQ(100u, readFile(mPath).size());
}

TEST_F(SharedFile, APathWithoutAFolderIsRefusedByItsName) {
    const std::string lPath = mDirectory.path("nowhere/file");
    try {
        mFile.make(lPath.c_str(), 100);
        FAIL() << "it was made";
    } catch (const ZTCClibEx& lrException) {
        EXPECT_NE(nullptr, std::strstr(lrException.what(), lPath.c_str())) << lrException.what();
    }
}

TEST_F(SharedFile, APathThatIsTakenByAFolderIsRefusedAndNothingIsLeftBehind) {
    ASSERT_EQ(0, mkdir(mPath.c_str(), 0700));
    mFile.make(mPath.c_str(), 100);
    EXPECT_THROW(mFile.publish(), ZTCClibEx);
    EXPECT_FALSE(exists(mPath + ".new"));
}

TEST_F(SharedFile, ASizeThatDoesNotFitIsRefusedAndNothingIsLeftBehind) {
    EXPECT_THROW(mFile.make(mPath.c_str(), std::size_t{1} << 62), ZTCClibEx);
    EXPECT_FALSE(exists(mPath + ".new"));
    ZTCSharedFile lFile;
    lFile.make(mPath.c_str(), 100);
    lFile.publish();
    EXPECT_THROW(lFile.grow(std::size_t{1} << 62), ZTCClibEx);
    static_cast<char*>(lFile.get())[99] = 'x';
    EXPECT_EQ('x', readFile(mPath).at(99));
}
