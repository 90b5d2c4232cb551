#include "common/include/Assert.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "tests/unit/common/LogTesting.h"

namespace {

/// The process that dies logs into a file that the test looks at afterwards.
class AssertDeathTest : public testing::Test {
protected:
    /// The process of a death test is begun anew and makes a directory of its own, so the path is handed down to it.
    AssertDeathTest() {
        if (const char* const lpPath = std::getenv("COMMON_TESTS_ASSERT_LOG")) {
            mLogPath = lpPath;
        } else {
            mDirectory.emplace();
            mLogPath = mDirectory->path("log");
            setenv("COMMON_TESTS_ASSERT_LOG", mLogPath.c_str(), 1);
        }
    }
    ~AssertDeathTest() override {
        if (mDirectory) {
            unsetenv("COMMON_TESTS_ASSERT_LOG");
        }
    }

    void beginLog(unsigned aLogCode = gcDefaultLogCode) const {
        setLogCode(aLogCode);
        setLogFilePath(mLogPath.c_str());
    }

    /// The log's lines from their marks on; the file is begun anew.
    std::string takeLog() const {
        std::string lText;
        for (const std::string& lrLine : linesOfFile(mLogPath)) {
            lText += withoutLineNumber(withoutStamp(lrLine)) + "\n";
        }
        std::filesystem::remove(mLogPath);
        return lText;
    }

    std::optional<ZTCTemporaryDirectory> mDirectory;
    std::string mLogPath;
};

const std::string scPlace = "tests/unit/common/AssertTest:# TestBody: ";

}  // namespace

TEST_F(AssertDeathTest, AFailedAssertionLogsTheTextOfTheConditionAndExits) {
    const int lLeft = 1;
    EXPECT_EXIT(
        {
            beginLog();
            ZT_ASSERT(0 == lLeft);
        },
        testing::ExitedWithCode(1), "");
    EXPECT_EQ("-H- " + scPlace + "Assertion [ 0 == lLeft ] failed\n", takeLog());
}

TEST_F(AssertDeathTest, WithLogCodeZeroTheLineIsSuppressedAndTheProcessExitsAllTheSame) {
    EXPECT_EXIT(
        {
            beginLog(0);
            ZT_ASSERT(1 == 2);
        },
        testing::ExitedWithCode(1), "");
    EXPECT_EQ("", takeLog());
}

TEST_F(AssertDeathTest, NeverGetHereFailsWithTheTextFalse) {
    EXPECT_EXIT(
        {
            beginLog();
            ZT_NEVER_GET_HERE();
        },
        testing::ExitedWithCode(1), "");
    EXPECT_EQ("-H- " + scPlace + "Assertion [ false ] failed\n", takeLog());
}

TEST_F(AssertDeathTest, TheMessageComesBeforeTheCondition) {
    EXPECT_EXIT(
        {
            beginLog();
            ZT_ASSERT_MSG(1 == 2, "%s %d", "value", 5);
        },
        testing::ExitedWithCode(1), "");
    EXPECT_EQ("-H- " + scPlace + "value 5\n-H- " + scPlace + "Assertion [ 1 == 2 ] failed\n", takeLog());
}

#define EXPECT_LOGGED_EXIT(aStatement, aLog)                                              \
    do {                                                                                  \
        EXPECT_EXIT((beginLog(), [&] { aStatement; }()), testing::ExitedWithCode(1), ""); \
        EXPECT_NE(std::string::npos, takeLog().find(aLog)) << #aStatement;                \
    } while (false)

TEST_F(AssertDeathTest, EveryOtherNameDoesTheSame) {
    const char* const lpText = "Assertion [ 1 == 2 ] failed\n";
    EXPECT_LOGGED_EXIT(ZT_CHECK(1 == 2), lpText);
    EXPECT_LOGGED_EXIT(ZT_CHECK_RETERR(1 == 2, 5), lpText);
    EXPECT_LOGGED_EXIT(ZT_REQUIRE(1 == 2), lpText);
    EXPECT_LOGGED_EXIT(ZT_ENSURE(1 == 2), lpText);
    EXPECT_LOGGED_EXIT(ZT_INVARIANT(1 == 2), lpText);
    EXPECT_LOGGED_EXIT(ZT_BASE_INVARIANT(1 == 2), lpText);
    EXPECT_LOGGED_EXIT(ZT_CHECK_MSG(1 == 2, "m%d", 1), lpText);
    EXPECT_LOGGED_EXIT(ZT_CHECK_RETERR_MSG(1 == 2, 5, "m%d", 1), lpText);
    EXPECT_LOGGED_EXIT(ZT_REQUIRE_MSG(1 == 2, "m%d", 1), lpText);
    EXPECT_LOGGED_EXIT(ZT_ENSURE_MSG(1 == 2, "m%d", 1), lpText);
    EXPECT_LOGGED_EXIT(ZT_INVARIANT_MSG(1 == 2, "m%d", 1), lpText);
    EXPECT_LOGGED_EXIT(ZT_BASE_INVARIANT_MSG(1 == 2, "m%d", 1), lpText);
}

TEST_F(AssertDeathTest, ManyThreadsFailingAtOnceEndWithStatusOne) {
    EXPECT_EXIT(
        {
            beginLog();
            for (int i = 0; i < 8; ++i) {
                std::thread([] { ZT_NEVER_GET_HERE(); }).detach();
            }
            ZT_NEVER_GET_HERE();
        },
        testing::ExitedWithCode(1), "");
}

TEST_F(AssertDeathTest, AFailureInsideOfTheExitStillEndsTheProcess) {
    EXPECT_EXIT(
        {
            beginLog();
            std::atexit([] { ZT_ASSERT(1 == 2); });
            ZT_NEVER_GET_HERE();
        },
        testing::ExitedWithCode(1), "");
    const std::string lLog = takeLog();
    EXPECT_NE(std::string::npos, lLog.find("[ false ]"));
    EXPECT_NE(std::string::npos, lLog.find("[ 1 == 2 ]"));
}

TEST(Assert, ATrueConditionIsEvaluatedOnceAndChangesNothing) {
    int lCount = 0;
    ZT_ASSERT(1 == ++lCount);
    ZT_ASSERT_MSG(2 == ++lCount, "never %d", lCount);
    ZT_CHECK_CONSISTENCY(3 == ++lCount);
    EXPECT_EQ(3, lCount);
}

TEST(Assert, IsOneStatement) {
    int lBranch = 0;
    if (lBranch != 0)
        ZT_ASSERT(false);
    else
        lBranch = 1;
    if (lBranch != 1)
        ZT_CHECK_CONSISTENCY_MSG(false, "never");
    else
        lBranch = 2;
    EXPECT_EQ(2, lBranch);
}

TEST(Assert, AFailedConsistencyCheckLogsAtErrorLevelAndGoesOn) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("log");
    setLogFilePath(lPath.c_str());
    int lCount = 0;
    ZT_CHECK_CONSISTENCY(0 == ++lCount);
    ZT_CHECK_CONSISTENCY_MSG(0 == ++lCount, "count %d", lCount);
    ZT_REPORT_INCONSISTENCY("report %d", 7);
    setLogFilePath("/dev/null");

    EXPECT_EQ(2, lCount);
    std::vector<std::string> lLines;
    for (const std::string& lrLine : linesOfFile(lPath)) {
        lLines.push_back(withoutLineNumber(withoutStamp(lrLine)));
    }
    EXPECT_EQ((std::vector<std::string>{"-E- " + scPlace + "Check consistency [ 0 == ++lCount ] failed",
                                        "-E- " + scPlace + "Check consistency [ 0 == ++lCount ] failed",
                                        "-E- " + scPlace + "count 2", "-E- " + scPlace + "report 7"}),
              lLines);
}
