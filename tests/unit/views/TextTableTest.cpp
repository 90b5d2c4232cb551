#include "sensor/views/include/TextTable.h"

#include <gmock/gmock.h>

using testing::ElementsAre;

static ZTCTextTable sTable(std::size_t aWidth) {
    return {{{.mpTitle = "A"},
             {.mpTitle = "N", .mIsRight = true},
             {.mpTitle = "MAY GO", .mDropOrder = 1},
             {.mpTitle = "TEXT", .mDropOrder = 2, .mLeastWidth = 6}},
            aWidth};
}

TEST(TextTable, ColumnsAreAsWideAsTheirWidestCell) {
    ZTCTextTable lTable = sTable(0);
    lTable.addRow({"one", "1", "x", "tail"});
    lTable.addRow({"two", "1,000", "x", "a longer tail"});
    EXPECT_EQ(lTable.takeText(),
              "A        N  MAY GO  TEXT\n"
              "one      1  x       tail\n"
              "two  1,000  x       a longer tail\n");
}

TEST(TextTable, LaterRowsStayAlignedAndHaveNoSecondHeading) {
    ZTCTextTable lTable = sTable(0);
    lTable.addRow({"a", "100", "x", "y"});
    EXPECT_EQ(lTable.takeText(), "A    N  MAY GO  TEXT\na  100  x       y\n");
    lTable.addRow({"b", "2", "x", "y"});
    EXPECT_EQ(lTable.takeText(), "b    2  x       y\n");
    EXPECT_EQ(lTable.takeText(), "");
}

TEST(TextTable, ANarrowTerminalCutsThenDropsColumns) {
    const auto lFormat = [](std::size_t aWidth) {
        ZTCTextTable lTable = sTable(aWidth);
        lTable.addRow({"a", "1", "middle", "a long text"});
        const std::string lText = lTable.takeText();
        return lText.substr(lText.find('\n') + 1);
    };
    EXPECT_EQ(lFormat(25), "a  1  middle  a long text\n");
    EXPECT_EQ(lFormat(22), "a  1  middle  a long..\n");
    EXPECT_EQ(lFormat(20), "a  1  middle  a lo..\n");
    EXPECT_EQ(lFormat(19), "a  1  middle\n");
    EXPECT_EQ(lFormat(8), "a  1\n");
    EXPECT_EQ(lFormat(2), "a  1\n") << "what may not go stays, however narrow it is";
}

TEST(TextTable, ControlCharactersAreEscapedAndUtf8Stays) {
    EXPECT_EQ(escapeControls("a\x1b[2Jb\n"), "a\\x1b[2Jb\\x0a");
    EXPECT_EQ(escapeControls("Gr\xc3\xb6\xc3\x9f"
                             "e \xe2\x82\xac"),
              "Gr\xc3\xb6\xc3\x9f"
              "e \xe2\x82\xac");
    EXPECT_EQ(escapeControls("\xc3"), "\\xc3");
    EXPECT_EQ(escapeControls("\xff\xc0\x80"), "\\xff\\xc0\\x80") << "overlong forms are no UTF-8";
    EXPECT_EQ(escapeControls("\xc2\x9b"), "\\xc2\\x9b") << "a control character of one byte in other encodings";
    EXPECT_EQ(escapeControls("\xed\xa0\x80"), "\\xed\\xa0\\x80") << "half of a surrogate pair";
}

TEST(TextTable, CharactersAreCountedAndCutWhole) {
    EXPECT_EQ(countCharacters("Gr\xc3\xb6\xc3\x9f"
                              "e"),
              5U);
    EXPECT_EQ(cutText("Gr\xc3\xb6\xc3\x9f"
                      "e",
                      5),
              "Gr\xc3\xb6\xc3\x9f"
              "e");
    EXPECT_EQ(cutText("Gr\xc3\xb6\xc3\x9f"
                      "en",
                      5),
              "Gr\xc3\xb6..");
    EXPECT_EQ(cutText("abc", 1), ".");
    EXPECT_EQ(cutText("abc", 0), "");
}

TEST(TextTable, NumbersAndSizesAreForPeople) {
    EXPECT_EQ(formatNumber(0), "0");
    EXPECT_EQ(formatNumber(999), "999");
    EXPECT_EQ(formatNumber(1000), "1,000");
    EXPECT_EQ(formatNumber(18446744073709551615ULL), "18,446,744,073,709,551,615");
    EXPECT_EQ(formatCount(1, "event"), "1 event");
    EXPECT_EQ(formatCount(1204, "event"), "1,204 events");
    EXPECT_EQ(formatBytes(17), "17 B");
    EXPECT_EQ(formatBytes(262144), "256 KiB");
    EXPECT_EQ(formatBytes(1610612736), "1.5 GiB");
}

TEST(TextTable, LinesAreWrappedAtBlanks) {
    EXPECT_THAT(wrapText("one two  three four", 8), ElementsAre("one two", "three", "four"));
    EXPECT_THAT(wrapText("a verylongword b", 6), ElementsAre("a", "verylongword", "b"));
    EXPECT_THAT(wrapText("one two", 0), ElementsAre("one two"));
    EXPECT_TRUE(wrapText("", 10).empty());
}
