#include "common/include/LogLine.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <limits>
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

TEST(LogLine, FormatsAsTheCLibraryDoes) {
    const auto lHold = [](const char* apFormat, auto... aArguments) {
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
#pragma GCC diagnostic ignored "-Wformat-security"
        char lWanted[256];
        std::snprintf(lWanted, sizeof lWanted, apFormat, aArguments...);
        ZTCLogLine lLine("-M-");
        sFinish(lLine, apFormat, aArguments...);
#pragma GCC diagnostic pop
        EXPECT_EQ("-M- " + std::string(lWanted) + "\n", sText(lLine)) << apFormat;
    };
    lHold("plain");
    lHold("%s|%s", "", "two");
    lHold("%d %d %d %d", 0, -1, std::numeric_limits<int>::min(), std::numeric_limits<int>::max());
    lHold("%u %u", 0u, std::numeric_limits<unsigned>::max());
    lHold("%ld %ld", std::numeric_limits<long>::min(), std::numeric_limits<long>::max());
    lHold("%lu", std::numeric_limits<unsigned long>::max());
    lHold("<%u> at %s%%", 7u, "half");
    lHold("%5u|%-5d|%05d|%.2s|%x|%c|%hu|%zu|%llu", 1u, 2, 3, "abc", 255u, 'c', static_cast<unsigned short>(9),
          std::size_t{10}, 11ull);
    lHold("%s then %08x", "late", 0xbeefu);
}

TEST(LogLine, FindsAControlCharacterAtEveryPlace) {
    for (std::size_t lLength = 1; lLength <= 40; ++lLength) {
        for (std::size_t lPlace = 0; lPlace < lLength; ++lPlace) {
            std::string lText(lLength, '\xe9');
            lText[lPlace] = '\x1f';
            EXPECT_EQ("-M- " + std::string(lPlace, '\xe9') + "\\x1f" + std::string(lLength - lPlace - 1, '\xe9') + "\n",
                      sLineOf(lText));
        }
    }
}
