#include <gtest/gtest.h>

#include <cstdarg>
#include <filesystem>
#include <string>

#include "tests/support/TestThreads.h"
#include "tests/unit/common/LogSinkTesting.h"

namespace {

using LogRotation = ZTCLogSinkFixture;

/// Writes a line with a stamp; returns its length.
std::size_t sWriteStampedTo(ZTCLogSink& arSink) {
    ZTCLogLine lLine("-M-", 1, "function", "file");
    std::va_list lNone = {};
    lLine.finish("line", lNone);
    arSink.write(lLine);
    return lLine.getLength();
}

}  // namespace

TEST_F(LogRotation, AtItsBoundTheFileIsRenamedAndBegunAnew) {
    mpSink->allowRotation(true);
    mpSink->setBound(30);
    mpSink->setPath(mPath.c_str());
    for (const char* lpText : {"12345", "23456", "34567"}) {
        writeTo(*mpSink, "%s", lpText);
    }
    EXPECT_FALSE(std::filesystem::exists(mPath + ".1")) << "30 bytes are within the bound";
    writeTo(*mpSink, "45678");
    EXPECT_EQ((Lines{"-M- 12345", "-M- 23456", "-M- 34567"}), sinkLines(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- 45678"}), sinkLines(mPath));
    for (const char* lpText : {"56789", "67890", "78901"}) {
        writeTo(*mpSink, "%s", lpText);
    }
    EXPECT_EQ((Lines{"-M- 45678", "-M- 56789", "-M- 67890"}), sinkLines(mPath + ".1")) << "the one before is replaced";
    EXPECT_EQ((Lines{"-M- 78901"}), sinkLines(mPath));
    EXPECT_FALSE(std::filesystem::exists(mPath + ".2"));
}

TEST_F(LogRotation, WhatOthersWriteIntoTheFileCountsTowardsTheBound) {
    constexpr std::uint64_t lcBound = 1024 * 1024;
    mpSink->allowRotation(true);
    mpSink->setBound(lcBound);
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    std::filesystem::resize_file(mPath, lcBound);
    writeTo(*mpSink, "two");
    EXPECT_EQ(lcBound, std::filesystem::file_size(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- two"}), sinkLines(mPath));

    // A file that somebody has cut is far from the bound again.
    std::filesystem::resize_file(mPath, lcBound - 1);
    std::filesystem::resize_file(mPath, 0);
    writeTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- three"}), sinkLines(mPath));
    EXPECT_EQ(lcBound, std::filesystem::file_size(mPath + ".1"));
}

TEST_F(LogRotation, WhatOthersWriteCountsAlsoWhenTheClockWasSetBack) {
    constexpr std::uint64_t lcBound = 1024 * 1024;
    constexpr std::int64_t lcNoon = 1'700'000'000'000'000'000;
    constexpr std::int64_t lcSecond = 1'000'000'000;
    ZTCLogFile lFile;
    lFile.allowRotation(true);
    lFile.setBound(lcBound);
    ASSERT_TRUE(lFile.setPath(mPath.c_str()));
    ASSERT_TRUE(lFile.write("one\n", 4, lcNoon));
    std::filesystem::resize_file(mPath, lcBound);
    ASSERT_TRUE(lFile.write("two\n", 4, lcNoon - lcSecond));
    lFile.close();
    EXPECT_EQ(lcBound, std::filesystem::file_size(mPath + ".1"));
    EXPECT_EQ(4u, std::filesystem::file_size(mPath));
}

TEST_F(LogRotation, ManyStampedLinesStayWithinTheBound) {
    constexpr std::uint64_t lcBound = 200 * 1024;
    mpSink->allowRotation(true);
    mpSink->setBound(lcBound);
    mpSink->setPath(mPath.c_str());
    std::uint64_t lWritten = 0;
    while (!std::filesystem::exists(mPath + ".1")) {
        lWritten += sWriteStampedTo(*mpSink);
        ASSERT_LE(std::filesystem::file_size(mPath), lcBound);
    }
    EXPECT_EQ(lWritten, std::filesystem::file_size(mPath + ".1") + std::filesystem::file_size(mPath));
    EXPECT_GT(std::filesystem::file_size(mPath + ".1") + 100, lcBound);
}

TEST_F(LogRotation, LinesOfOneMomentStayWithinTheBound) {
    constexpr std::uint64_t lcBound = 200 * 1024;
    constexpr std::int64_t lcNoon = 1'700'000'000'000'000'000;
    ZTCLogFile lFile;
    lFile.allowRotation(true);
    lFile.setBound(lcBound);
    ASSERT_TRUE(lFile.setPath(mPath.c_str()));
    const std::string lLine = std::string(4095, 'x') + "\n";
    for (std::uint64_t lWritten = 0; lWritten <= lcBound; lWritten += lLine.size()) {
        ASSERT_TRUE(lFile.write(lLine.data(), lLine.size(), lcNoon));
        ASSERT_LE(std::filesystem::file_size(mPath), lcBound);
    }
    lFile.close();
    EXPECT_EQ(lcBound, std::filesystem::file_size(mPath + ".1"));
    EXPECT_EQ(lLine.size(), std::filesystem::file_size(mPath));
}

TEST_F(LogRotation, ALineLongerThanTheBoundIsWrittenIntoAFileOfItsOwn) {
    mpSink->allowRotation(true);
    mpSink->setBound(20);
    mpSink->setPath(mPath.c_str());
    const std::string lLong(50, 'x');
    writeTo(*mpSink, "%s", lLong.c_str());
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- " + lLong}), sinkLines(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
}

TEST_F(LogRotation, WhoIsNotAllowedToRotateWritesOn) {
    mpSink->setBound(10);
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "12345");
    writeTo(*mpSink, "23456");
    EXPECT_FALSE(std::filesystem::exists(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- 12345", "-M- 23456"}), sinkLines(mPath));
}

TEST_F(LogRotation, TheBoundHoldsWhereTheFileCannotBeRenamed) {
    std::filesystem::create_directory(mPath + ".1");
    mpSink->allowRotation(true);
    mpSink->setBound(200);
    mpSink->setPath(mPath.c_str());
    const std::string lLong(190, 'x');
    writeTo(*mpSink, "%s", lLong.c_str());
    writeTo(*mpSink, "lost one");
    std::filesystem::remove(mPath + ".1");
    writeTo(*mpSink, "lost two");  // not yet tried again
    EXPECT_EQ("-M- lost one\n-M- lost two\n", mStandardError.take());
    EXPECT_EQ((Lines{"-M- " + lLong}), sinkLines(mPath));
    gNowMs += ZTCLogFile::gcRetryIntervalMs;
    mpSink->setBound(400);
    mpSink->setBound(200);
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- " + lLong}), sinkLines(mPath + ".1"));
    EXPECT_EQ("-M- one", sinkLines(mPath).back());
}

TEST_F(LogRotation, ARenamedFileIsNotRotatedByItsFormerName) {
    mpSink->allowRotation(true);
    mpSink->setBound(10);
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "12345");
    std::filesystem::rename(mPath, mDirectory.path("moved"));
    writeFile(mPath, "foreign\n");
    writeTo(*mpSink, "1");
    EXPECT_FALSE(std::filesystem::exists(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- 12345"}), sinkLines(mDirectory.path("moved")));
    EXPECT_EQ((Lines{"foreign", "-M- 1"}), sinkLines(mPath));
}

TEST_F(LogRotation, ManyThreadsLoseNothingOverRotationsAndReopenings) {
    constexpr int lcThreads = 4;
    constexpr int lcLines = 200;
    mpSink->allowRotation(true);
    mpSink->setBound(lcThreads * lcLines * 7 / 2);  // one rotation in all
    mpSink->setPath(mPath.c_str());
    runOnThreads(lcThreads, [this](unsigned) {
        for (int i = 0; i < lcLines; ++i) {
            writeTo(*mpSink, "xx");  // 7 bytes with mark and line break
            if (i % 50 == 0) {
                mpSink->reopen();
            }
        }
    });
    EXPECT_EQ(static_cast<std::size_t>(lcThreads * lcLines), sinkLines(mPath).size() + sinkLines(mPath + ".1").size());
    EXPECT_EQ("", mStandardError.take());
}
