#include "common/include/LogLine.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/support/FailingAllocation.h"

namespace {

void sFinish(ZTCLogLine& arLine, const char* apFormat, ...) __attribute__((format(printf, 2, 3)));
void sFinish(ZTCLogLine& arLine, const char* apFormat, ...) {
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    arLine.finish(apFormat, lArguments);
    va_end(lArguments);
}

std::string sText(ZTCLogLine& arLine) {
    return {arLine.getData(), arLine.getLength()};
}

std::string sLineOf(const std::string& acrText) {
    ZTCLogLine lLine("-M-");
    sFinish(lLine, "%s", acrText.c_str());
    return sText(lLine);
}

}  // namespace

TEST(LogLine, IsMarkAndTextWithoutAStamp) {
    ZTCLogLine lLine("-PROT-");
    sFinish(lLine, "%02x %s", 5, "text");
    EXPECT_EQ("-PROT- 05 text\n", sText(lLine));
    EXPECT_FALSE(lLine.isStamped());
}

TEST(LogLine, LeavesRoomForTheStampInFrontOfThePlace) {
    ZTCLogLine lLine("-N-", 12, "function", "path/File");
    sFinish(lLine, "text");
    EXPECT_EQ(std::string(26, ' ') + " -N- path/File:12 function: text\n", sText(lLine));
    EXPECT_TRUE(lLine.isStamped());
}

TEST(LogLine, DropsOneLineBreakAtTheEnd) {
    EXPECT_EQ("-M- text\n", sLineOf("text\n"));
    EXPECT_EQ("-M- text\\n\n", sLineOf("text\n\n"));
    EXPECT_EQ("-M- \n", sLineOf(""));
    EXPECT_EQ("-M- \n", sLineOf("\n"));
}

TEST(LogLine, EscapesControlCharactersAndNothingElse) {
    EXPECT_EQ("-M- a\\nb\\rc\\td\\x1b[31me\\x7f\\x01\n", sLineOf("a\nb\rc\td\x1b[31me\x7f\x01"));
    EXPECT_EQ("-M- \\ ~ \xc3\xa4 %\n", sLineOf("\\ ~ \xc3\xa4 %"));
    ZTCLogLine lLine("-M-");
    sFinish(lLine, "a%cb", '\0');
    EXPECT_EQ("-M- a\\x00b\n", sText(lLine));
}

TEST(LogLine, LosesNothingOfALongText) {
    for (const std::size_t lLength : {1000u, 1023u, 1024u, 1025u, 2040u, 2048u, 2049u, 100000u}) {
        EXPECT_EQ("-M- " + std::string(lLength, 'x') + "\n", sLineOf(std::string(lLength, 'x')));
    }
    std::string lEscaped;
    for (int i = 0; i < 3000; ++i) {
        lEscaped += "\\x02";
    }
    EXPECT_EQ("-M- " + lEscaped + "\n", sLineOf(std::string(3000, '\x02')));
}

TEST(LogLine, IsCutVisiblyWhereMemoryIsOut) {
    const std::string lLong(3000, 'x');
    for (const unsigned lNth : {1u, 2u}) {  // the text's, the line's
        ZTCLogLine lLine("-M-");
        {
            ZTCFailingAllocation lFailure(lNth);
            sFinish(lLine, "%s", lLong.c_str());
            EXPECT_TRUE(lFailure.hasFailed());
        }
        const std::string lCut = sText(lLine);
        EXPECT_GE(lCut.size(), 1000u);
        EXPECT_EQ("xxx...\n", lCut.substr(lCut.size() - 7));
    }
}

TEST(LogLine, AFormatThatCannotBeCarriedOutIsShownAsItStands) {
    const wchar_t lBad[] = {static_cast<wchar_t>(0x110000), 0};
    ZTCLogLine lLine("-M-");
    sFinish(lLine, "bad %ls", lBad);
    EXPECT_EQ("-M- bad %ls\n", sText(lLine));
}
