#include "common/include/Log.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/common/LogTesting.h"

namespace {

/// Stands in for the wrapper of the layer above that the macro names.
int ClibSprintf(char* apBuffer, std::size_t aSize, const char* apFormat, ...) __attribute__((format(printf, 3, 4)));
int ClibSprintf(char* apBuffer, std::size_t aSize, const char* apFormat, ...) {
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    const int lCount = std::vsnprintf(apBuffer, aSize, apFormat, lArguments);
    va_end(lArguments);
    return lCount;
}

/// The log goes into a file of the test's own.
class Log : public testing::Test {
protected:
    Log() {
        setLogCode(gcDefaultLogCode);
        setLogFilePath(mPath.c_str());
    }
    ~Log() override {
        setLogFilePath("/dev/null");
        setLogCode(gcDefaultLogCode);
        setLogFileBound(gcDefaultLogFileBound);
        allowLogRotation(false);
    }

    /// The lines without their time stamps, and with # for the number of the source line.
    std::vector<std::string> lines() const {
        std::vector<std::string> lLines;
        for (const std::string& lrLine : linesOfFile(mPath)) {
            lLines.push_back(withoutLineNumber(withoutStamp(lrLine)));
        }
        return lLines;
    }

    ZTCTemporaryDirectory mDirectory;
    std::string mPath = mDirectory.path("log");
};

using Lines = std::vector<std::string>;

const std::string scPlace = "tests/unit/common/LogTest:# ";

std::string sHere(const char* apMark, const std::string& acrText, const char* apFunction = "TestBody") {
    return std::string(apMark) + " " + scPlace + apFunction + ": " + acrText;
}

void sTraced() {
    ZT_ENTRY();
    ZT_TRACE();
    ZT_TRACE_MSG("value %d", 5);
    ZT_EXIT();
}

[[noreturn]] void sThrowing() {
    ZT_THROW(ZTCInvalidEx, "thrown", 7);
}

[[noreturn]] void sRethrowing(const ZTCInvalidEx& acrException) {
    ZT_RETHROW(acrException, ZTCInvalidEx);
}

[[noreturn]] void sLoggingAndThrowing(int aValue) {
    ZT_LOGERR_THROW(ZTCNotFoundEx, "no %s %d", "value", aValue);
}

void sChecking(bool aCondition) {
    CHECKLOGTHROWEXCEPTION(aCondition, ZTCExistsEx, "checked");
}

}  // namespace

TEST_F(Log, WithTheDefaultCodeTracesAreSilentAndNoticesAreNot) {
    unsigned lCode = 0;
    getLogCode(lCode);
    EXPECT_EQ(63u, lCode);
    ZT_ENTRY();
    ZT_LOG_INFO("info");
    ZT_LOG_NOTICE("notice");
    EXPECT_EQ((Lines{sHere("-N-", "notice")}), lines());
}

TEST_F(Log, EveryLevelHasItsBitAndItsMark) {
    EXPECT_EQ(1, ZTLL_Halt);
    EXPECT_EQ(2, ZTLL_Alert);
    EXPECT_EQ(4, ZTLL_Critical);
    EXPECT_EQ(8, ZTLL_Error);
    EXPECT_EQ(16, ZTLL_Warning);
    EXPECT_EQ(32, ZTLL_Notice);
    EXPECT_EQ(64, ZTLL_Info);
    EXPECT_EQ(128, ZTLL_Debug);
    Lines lExpected;
    const char* const lcMarks[] = {"-H-", "-A-", "-C-", "-E-", "-W-", "-N-", "-I-", "-T-"};
    for (unsigned lBit = 0; lBit < 8; ++lBit) {
        setLogCode(1u << lBit);
        ZT_LOG_HALT("text");
        ZT_LOG_ALERT("text");
        ZT_LOG_CRIT("text");
        ZT_LOG_ERR("text");
        ZT_LOG_WARN("text");
        ZT_LOG_NOTICE("text");
        ZT_LOG_INFO("text");
        ZT_TRACE_MSG("text");
        lExpected.push_back(sHere(lcMarks[lBit], "text"));
    }
    EXPECT_EQ(lExpected, lines());
}

TEST_F(Log, TracesCarryTheFunctionsOwnName) {
    setLogCode(255);
    sTraced();
    EXPECT_EQ((Lines{sHere("-T-", "Entered", "sTraced"), sHere("-T-", "At", "sTraced"),
                     sHere("-T-", "value 5", "sTraced"), sHere("-T-", "Left", "sTraced")}),
              lines());
}

TEST_F(Log, ALineCarriesTheNumberOfItsSourceLine) {
    const int lLine = __LINE__ + 1;
    ZT_LOG_ERR("here");
    EXPECT_EQ("-E- tests/unit/common/LogTest:" + std::to_string(lLine) + " TestBody: here",
              withoutStamp(linesOfFile(mPath).at(0)));
}

TEST_F(Log, ProtocolDumpsAreMarkAndTextAloneWhateverTheLogCode) {
    setLogCode(0);
    ZT_LOG_NAP("%02x %02x", 1, 255);
    ZT_LOG_HALT("silent");
    EXPECT_EQ("-PROT- 01 ff\n", readFile(mPath));
    EXPECT_TRUE(isLogLevelEnabled(ZTLL_Nap));
    EXPECT_FALSE(isLogLevelEnabled(ZTLL_Halt));
}

TEST_F(Log, NoPrefixLinesAreGatedByTheirLevel) {
    ZT_LOG_NOPREFIX(ZTLL_Notice, "-N-", "shown");
    ZT_LOG_NOPREFIX(ZTLL_Info, "-I-", "silent");
    EXPECT_EQ("-N- shown\n", readFile(mPath));
}

TEST_F(Log, TheCallsThemselvesAreGatedToo) {
    setLogCode(ZTLL_Notice);
    PrintLogMessageWithTimeStamp(ZTLL_Info, "-I-", 1, "f", "F", "silent");
    PrintLogMessageWithTimeStamp(ZTLL_Notice, "-N-", 1, "f", "F", "shown");
    PrintLogMessage(ZTLL_Info, "-I-", "silent");
    EXPECT_EQ((Lines{"-N- F:# f: shown"}), lines());
}

TEST_F(Log, ArgumentsOfADisabledLevelAreNotEvaluated) {
    int lCount = 0;
    ZT_LOG_INFO("%d", ++lCount);
    EXPECT_EQ(0, lCount);
    ZT_LOG_NOTICE("%d", ++lCount);
    EXPECT_EQ(1, lCount);
}

TEST_F(Log, AMacroIsOneStatement) {
    const bool lIsFalse = lines().size() == 77;
    if (lIsFalse)
        ZT_LOG_ERR("silent");
    else
        ZT_LOG_ERR("shown");
    EXPECT_EQ((Lines{sHere("-E-", "shown")}), lines());
}

TEST_F(Log, TheCodeIsReadAsItWasSet) {
    for (const unsigned lCode : {0u, 1u, 63u, 255u}) {
        setLogCode(lCode);
        unsigned lRead = 777;
        getLogCode(lRead);
        EXPECT_EQ(lCode, lRead);
    }
}

TEST_F(Log, ErrnoIsKept) {
    setLogFilePath("/dev/full");
    ZTCCapturedStandardError lStandardError;
    errno = ENOTTY;
    ZT_LOG_ERR("lost");
    EXPECT_EQ(ENOTTY, errno);
    ZT_LOG_NAP("lost");
    EXPECT_EQ(ENOTTY, errno);
    setLogFilePath("/no/such/directory/log");
    EXPECT_EQ(ENOTTY, errno);
    reopenLogFile();
    EXPECT_EQ(ENOTTY, errno);

    // The lines that were lost on purpose are not to be reported in the file of another test.
    setLogFilePath(mPath.c_str());
    ZT_LOG_ERR("found");
    EXPECT_EQ(2u, lines().size());
}

TEST_F(Log, ThrowLogsLeftAndThrows) {
    setLogCode(255);
    try {
        sThrowing();
    } catch (const ZTCInvalidEx& lrException) {
        EXPECT_STREQ("thrown", lrException.what());
        EXPECT_EQ(7u, lrException.getError());
        EXPECT_THROW(sRethrowing(lrException), ZTCInvalidEx);
    }
    EXPECT_EQ((Lines{sHere("-T-", "Left", "sThrowing"), sHere("-T-", "Left", "sRethrowing")}), lines());
}

TEST_F(Log, LogErrThrowLogsTheTextAndThrowsItWithTheTypesCode) {
    setLogCode(255);
    try {
        sLoggingAndThrowing(5);
    } catch (const ZTCNotFoundEx& lrException) {
        EXPECT_STREQ("no value 5", lrException.what());
        EXPECT_EQ(8u, lrException.getError());
    }
    EXPECT_EQ((Lines{sHere("-E-", "no value 5", "sLoggingAndThrowing"), sHere("-T-", "Left", "sLoggingAndThrowing")}),
              lines());
}

TEST_F(Log, LogErrThrowInterpretsItsTextASecondTime) {
    try {
        ZT_LOGERR_THROW(ZTCNotFoundEx, "%s", "a %% sign");
    } catch (const ZTCNotFoundEx& lrException) {
        EXPECT_STREQ("a %% sign", lrException.what());
    }
    EXPECT_EQ((Lines{sHere("-E-", "a % sign")}), lines());
}

TEST_F(Log, LogErrThrowBoundsItsText) {
    const std::string lLong(2000, 'x');
    try {
        ZT_LOGERR_THROW(ZTCNotFoundEx, "%s", lLong.c_str());
    } catch (const ZTCNotFoundEx& lrException) {
        EXPECT_EQ(std::string(511, 'x'), lrException.what());
    }
}

TEST_F(Log, CheckLogThrowThrowsOnlyWhereTheConditionHolds) {
    sChecking(false);
    EXPECT_TRUE(lines().empty());
    try {
        sChecking(true);
        FAIL() << "nothing thrown";
    } catch (const ZTCExistsEx& lrException) {
        EXPECT_STREQ("checked", lrException.what());
        EXPECT_EQ(10u, lrException.getError());
    }
    EXPECT_EQ((Lines{sHere("-E-", "checked", "sChecking")}), lines());
}

TEST_F(Log, TheProcessesLogRotatesAndReopens) {
    setLogFileBound(200);
    allowLogRotation(true);
    const std::string lLong(150, 'x');
    ZT_LOG_ERR("%s", lLong.c_str());
    ZT_LOG_ERR("next");
    EXPECT_EQ((Lines{sHere("-E-", "next")}), lines());
    EXPECT_EQ(1u, linesOfFile(mPath + ".1").size());

    std::rename(mPath.c_str(), mDirectory.path("moved").c_str());
    reopenLogFile();
    ZT_LOG_ERR("anew");
    EXPECT_EQ((Lines{sHere("-E-", "anew")}), lines());
}

TEST_F(Log, TheCodeMayChangeWhileOthersLog) {
    ZTCTestThread lOther([] {
        for (int i = 0; i < 200; ++i) {
            ZT_LOG_INFO("other %d", i);
        }
    });
    for (unsigned i = 0; i < 200; ++i) {
        setLogCode(i % 2 == 0 ? 255u : 63u);
    }
    lOther.join();
    for (const std::string& lrLine : linesOfFile(mPath)) {
        EXPECT_EQ(0u, withoutStamp(lrLine).find("-I- tests/unit/common/LogTest:")) << lrLine;
    }
}

TEST_F(Log, NothingThrows) {
    EXPECT_TRUE(noexcept(PrintLogMessageWithTimeStamp(1, "", 1, "", "", "%s", "")));
    EXPECT_TRUE(noexcept(PrintLogMessage(1, "", "%s", "")));
    EXPECT_TRUE(noexcept(setLogFilePath("")));
    EXPECT_TRUE(noexcept(reopenLogFile()));
    EXPECT_TRUE(noexcept(isLogLevelEnabled(1)));
}

TEST(LogWithoutFileDeathTest, HeldLinesAppearAtTheEndOfAProcessThatNeverSetALogFile) {
    EXPECT_EXIT(
        {
            ZT_LOG_ERR("held");
            std::exit(3);
        },
        testing::ExitedWithCode(3), "-E- tests/unit/common/LogTest:[0-9]+ TestBody: held");
}

TEST(LogWithoutFileDeathTest, LoggingWorksDuringTheExit) {
    EXPECT_EXIT(
        {
            std::atexit([] {
                ZT_LOG_ERR("from a handler");
                // The log's own handler has run already: only a file gets the line now.
                setLogFilePath("/dev/full");
            });
            ZT_LOG_ERR("before");
            std::exit(3);
        },
        testing::ExitedWithCode(3), "from a handler");
}
