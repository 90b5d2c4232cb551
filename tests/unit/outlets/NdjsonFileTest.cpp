#include "sensor/outlets/include/NdjsonFile.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/SmallFileSystem.h"
#include "tests/support/TemporaryDirectory.h"

TEST(NdjsonFile, IsRotatedByNameBeforeItGrowsTooLarge) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("events");
    ZTCNdjsonFile lFile(lPath, 10, 2);
    for (const char* lpLine : {"11111\n", "22222\n", "33333\n", "44444\n"}) {
        lFile.append(lpLine);
    }
    EXPECT_EQ(readFile(lPath), "44444\n");
    EXPECT_EQ(readFile(lPath + ".1"), "33333\n");
    EXPECT_EQ(readFile(lPath + ".2"), "22222\n");
    EXPECT_FALSE(exists(lPath + ".3"));
}

TEST(NdjsonFile, KeepingNoneRemovesTheOldFile) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("events");
    ZTCNdjsonFile lFile(lPath, 10, 0);
    lFile.append("11111\n");
    lFile.append("22222\n");
    EXPECT_EQ(readFile(lPath), "22222\n");
    EXPECT_FALSE(exists(lPath + ".1"));
}

TEST(NdjsonFile, ALineLongerThanTheLimitIsWrittenWhole) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("events");
    ZTCNdjsonFile lFile(lPath, 10, 1);
    lFile.append(std::string(100, 'x') + "\n");
    lFile.append("y\n");
    EXPECT_EQ(readFile(lPath), "y\n");
    EXPECT_EQ(readFile(lPath + ".1"), std::string(100, 'x') + "\n");
}

TEST(NdjsonFile, AFileThatAnotherProgramTookAwayIsMadeAnew) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("events");
    ZTCNdjsonFile lFile(lPath, 1000, 1);
    lFile.append("1\n");
    ASSERT_EQ(rename(lPath.c_str(), lDirectory.path("taken").c_str()), 0);
    lFile.append("2\n");
    EXPECT_EQ(readFile(lPath), "2\n");
    EXPECT_EQ(readFile(lDirectory.path("taken")), "1\n");
    struct stat lStatus {};
    ASSERT_EQ(stat(lPath.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode & 0137U, 0U);
}

TEST(NdjsonFile, OnAFullDiskNoPartOfALineStays) {
    const ZTCTemporaryDirectory lDirectory;
    ASSERT_EQ(mkdir(lDirectory.path("small").c_str(), 0700), 0);
    ZTCSmallFileSystem lSmall(lDirectory.path("small"), 64);
    if (!lSmall.isMounted()) {
        // Without a small file system: a device that is always full.
        ZTCNdjsonFile lFull("/dev/full", 1 << 20, 1);
        EXPECT_THROW(lFull.append("line\n"), ZTCSystemCallEx);
        return;
    }
    const std::string lPath = lDirectory.path("small/events");
    ZTCNdjsonFile lFile(lPath, 1 << 20, 1);
    lFile.append("first\n");
    const std::string lLong = std::string(200000, 'x') + "\n";
    EXPECT_THROW(lFile.append(lLong), ZTCSystemCallEx);
    EXPECT_EQ(readFile(lPath), "first\n");
    lFile.append("second\n");
    EXPECT_EQ(readFile(lPath), "first\nsecond\n");
}

TEST(NdjsonFile, WhatAKilledProcessLeftOfALineIsTakenBack) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("events");
    const std::string lWhole = "first\n" + std::string(5000, 'x') + "\n";
    for (const std::string& lrBefore : {std::string(), lWhole}) {
        for (const std::size_t lPart : {0U, 1U, 4095U, 4096U, 4097U, 20000U}) {
            writeFile(lPath, lrBefore + std::string(lPart, 'p'));
            ZTCNdjsonFile lFile(lPath, 1 << 20, 1);
            lFile.append("second\n");
            lFile.append("third\n");
            EXPECT_EQ(readFile(lPath), lrBefore + "second\nthird\n") << lPart;
        }
    }
}

TEST(NdjsonFile, OfAFileThatTookItsPlaceAPartOfALineIsTakenBackToo) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("events");
    ZTCNdjsonFile lFile(lPath, 1 << 20, 1);
    lFile.append("first\n");
    writeFile(lDirectory.path("other"), "older\npart of a li");
    ASSERT_EQ(rename(lDirectory.path("other").c_str(), lPath.c_str()), 0);
    lFile.append("second\n");
    EXPECT_EQ(readFile(lPath), "older\nsecond\n");
}

TEST(NdjsonFile, ASymbolicLinkIsNotFollowed) {
    const ZTCTemporaryDirectory lDirectory;
    ASSERT_EQ(symlink(lDirectory.path("elsewhere").c_str(), lDirectory.path("events").c_str()), 0);
    ZTCNdjsonFile lFile(lDirectory.path("events"), 10, 1);
    EXPECT_THROW(lFile.append("x\n"), ZTCSystemCallEx);
    EXPECT_FALSE(exists(lDirectory.path("elsewhere")));
}
