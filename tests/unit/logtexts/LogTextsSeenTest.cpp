#include <gtest/gtest.h>

#include "tests/support/LogTextsSeen.h"

TEST(LogTextsSeen, AFormatFitsTheTextsThatItPrintsAndNoOther) {
    EXPECT_TRUE(isOfFormat("Plain", "Plain"));
    EXPECT_FALSE(isOfFormat("Plainer", "Plain"));
    EXPECT_FALSE(isOfFormat("Plai", "Plain"));
    EXPECT_TRUE(isOfFormat("a 12 b", "a %u b"));
    EXPECT_FALSE(isOfFormat("a  b", "a %u b"));
    EXPECT_FALSE(isOfFormat("a -1 b", "a %u b"));
    EXPECT_TRUE(isOfFormat("a -1 b", "a %d b"));
    EXPECT_FALSE(isOfFormat("a - b", "a %d b"));
    EXPECT_TRUE(isOfFormat("1 2 3 4", "%hu %zu %lu %llu"));
    EXPECT_TRUE(isOfFormat("at 0x7f12 or (nil)", "at %p or %p"));
    EXPECT_TRUE(isOfFormat("<, >", "<%s, %s>"));
    EXPECT_TRUE(isOfFormat("<a, b, c>", "<%s, %s>"));
    EXPECT_FALSE(isOfFormat("<a; b>", "<%s, %s>"));
    EXPECT_TRUE(isOfFormat("", "%s"));
}

TEST(LogTextsSeen, ALineMakesItsOwnRowSeenAndOneOfNoRowIsAStranger) {
    const std::string lcStart = "2026-01-02 03:04:05.000006 ";
    ZTCLogTextsSeen lSeen;
    const std::size_t lRows = lSeen.unseen(ZTELogTextPath::Agent).size();
    EXPECT_EQ(logTexts().size(), lRows + lSeen.unseen(ZTELogTextPath::Process).size());
    lSeen.add(
        {lcStart + "-N- .//TavikMain:16 main: Starting the Tavik", lcStart + "-T- .//TavikMain:15 main: Entered"});
    EXPECT_EQ(lRows - 1, lSeen.unseen(ZTELogTextPath::Agent).size());
    EXPECT_TRUE(lSeen.strangers().empty());
    // Another mark, another place, another function, another text.
    lSeen.add({lcStart + "-I- .//TavikMain:16 main: Starting the Tavik",
               lcStart + "-N- .//TavikCore:16 main: Starting the Tavik",
               lcStart + "-N- .//TavikMain:16 init: Starting the Tavik",
               lcStart + "-N- .//TavikMain:16 main: Starting the tavik", "no log line at all"});
    EXPECT_EQ(lRows - 1, lSeen.unseen(ZTELogTextPath::Agent).size());
    EXPECT_EQ(5u, lSeen.strangers().size());
    lSeen.add({"-PROT- 02                                               ."});
    EXPECT_EQ(lRows - 2, lSeen.unseen(ZTELogTextPath::Agent).size());
    EXPECT_EQ(5u, lSeen.strangers().size());
}
