#include "libkpm/sim/src/Scenario.h"

#include <gtest/gtest.h>

#include <cctype>
#include <ostream>
#include <string>
#include <variant>
#include <vector>

#include "tests/unit/sim/Recorder.h"

static ZTSSimEvent sEvent(const std::string& acrLine) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters);
    return std::get<ZTSSimEvent>(parseSimEventLine(acrLine, lScenario));
}

/// The reason for which a line behind the two adapters is refused, after a check of the line number.
static std::string sRefusal(const std::string& acrLine) {
    try {
        parseSimScenario(gcTwoAdapters + std::string("\n# a comment\n") + acrLine + "\n");
    } catch (const ZTCSimRefusal& lrRefusal) {
        EXPECT_EQ(lrRefusal.getLine(), 7u) << acrLine;
        return lrRefusal.what();
    }
    return "accepted";
}

TEST(Scenario, AnEmptyTextIsAHostWithoutAdapters) {
    const ZTSSimScenario lScenario = parseSimScenario("");
    EXPECT_TRUE(lScenario.mAdapters.empty());
    EXPECT_TRUE(lScenario.mIsZtapiSupported);
    EXPECT_EQ(lScenario.mInitStatus, 0u);
}

TEST(Scenario, TheDefaultHasTwoAdaptersAndNoEvents) {
    const ZTSSimScenario lScenario = parseSimScenario(getDefaultSimScenario());
    EXPECT_EQ(lScenario.mAdapters.size(), 2u);
    EXPECT_EQ(lScenario.mPorts.size(), 4u);
    EXPECT_TRUE(lScenario.mEvents.empty());
    EXPECT_TRUE(lScenario.mStorms.empty());
}

TEST(Scenario, AdaptersAndPortsKeepTheirNames) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters);
    ASSERT_EQ(lScenario.mAdapters.size(), 2u);
    EXPECT_EQ(lScenario.mAdapters[1].mName, "hba1");
    EXPECT_EQ(lScenario.mAdapters[1].mWwpn.wwn[0], 0x30);
    EXPECT_EQ(lScenario.mAdapters[1].mWwpn.wwn[7], 0x02);
    EXPECT_EQ(lScenario.mAdapters[1].mWwnn.wwn[7], 0x82);
    EXPECT_EQ(lScenario.mAdapters[1].mFcId, 0x020000u);
    ASSERT_EQ(lScenario.mPorts.size(), 2u);
    EXPECT_EQ(lScenario.mPorts[1].mFcId, 0x040506u);
}

TEST(Scenario, BlanksCommentsAndCarriageReturnsAreSkipped) {
    const ZTSSimScenario lScenario = parseSimScenario("\t # nothing\r\n\r\n  ztapi \t no  # too old\r\n");
    EXPECT_FALSE(lScenario.mIsZtapiSupported);
}

TEST(Scenario, TheLastLineNeedsNoLineBreak) {
    EXPECT_EQ(parseSimScenario("init status=0x2A").mInitStatus, 42u);
}

TEST(Scenario, AnEventLineHoldsItsTimes) {
    const ZTSSimEvent lEvent = sEvent("queue-full board=all at=10 every=5 times=7 threads=3 as=9");
    EXPECT_TRUE(lEvent.mBoards.mAll);
    EXPECT_EQ(lEvent.mAt, 10u);
    EXPECT_EQ(lEvent.mEvery, 5u);
    EXPECT_EQ(lEvent.mTimes, 7u);
    EXPECT_EQ(lEvent.mThreads, 3u);
    EXPECT_EQ(lEvent.mAs, 9u);
    EXPECT_TRUE(lEvent.mIsTimed);
}

TEST(Scenario, AnEventLineMayRepeatForever) {
    EXPECT_EQ(sEvent("plogi every=1 times=forever").mTimes, 0u);
}

TEST(Scenario, AnEventWithoutFieldsComesOnceFromTheFirstPortOnTheFirstBoard) {
    const ZTSSimEvent lEvent = sEvent("plogi");
    EXPECT_EQ(lEvent.mBoards.mBoards, std::vector<std::uint32_t>{0});
    ASSERT_EQ(lEvent.mPorts.size(), 1u);
    EXPECT_EQ(lEvent.mPorts[0].mName, "disk0");
    EXPECT_EQ(lEvent.mTimes, 1u);
    EXPECT_FALSE(lEvent.mIsTimed);
}

TEST(Scenario, BoardsAreNamedByNumberOrName) {
    EXPECT_EQ(sEvent("plogi board=1,hba0").mBoards.mBoards, (std::vector<std::uint32_t>{1, 0}));
}

TEST(Scenario, AWorldWideNameOfADeclaredPortMeansThatPort) {
    EXPECT_EQ(sEvent("plogi port=30:00:00:00:00:00:01:02").mPorts[0].mName, "tape0");
    EXPECT_EQ(sEvent("plogi port=30:00:00:00:00:00:09:09").mPorts[0].mFcId, 0u);
}

TEST(Scenario, NumberListsHoldRangesAndWords) {
    const ZTSSimEvent lEvent = sEvent("queue-full lun=0-2,0x10,all");
    ASSERT_EQ(lEvent.mSettings.size(), 1u);
    const std::vector<std::vector<std::uint8_t>> lExpected{
        {0, 0, 0, 0}, {1, 0, 0, 0}, {2, 0, 0, 0}, {16, 0, 0, 0}, {255, 255, 255, 255}};
    EXPECT_EQ(lEvent.mSettings[0].mValues, lExpected);
}

TEST(Scenario, RscnPagesHaveFourFormats) {
    const ZTSSimEvent lEvent = sEvent("rscn pages=port:disk0,area:0x010000,domain:131072,fabric,word:0xFFFFFFFF");
    EXPECT_EQ(lEvent.mPages, (std::vector<std::uint32_t>{0x00010203, 0x01010000, 0x02020000, 0x03000000, 0xFFFFFFFF}));
    EXPECT_EQ(sEvent("rscn pages=none").mPages, std::vector<std::uint32_t>());
    EXPECT_EQ(sEvent("rscn").mPages, std::nullopt);
}

TEST(Scenario, AStormHoldsItsSeedKindsPortsAndLuns) {
    const ZTSSimScenario lScenario = readScenario(
        gcTwoAdapters +
        std::string("storm count=50 seed=7 threads=2 at=3 over=4 kind=plogi,link board=1 port=tape0 lun=1-3"));
    ASSERT_EQ(lScenario.mStorms.size(), 1u);
    const ZTSSimStorm& lrStorm = lScenario.mStorms[0];
    EXPECT_EQ(lrStorm.mCount, 50u);
    EXPECT_EQ(lrStorm.mSeed, 7u);
    EXPECT_EQ(lrStorm.mThreads, 2u);
    EXPECT_EQ(lrStorm.mAt, 3u);
    EXPECT_EQ(lrStorm.mOver, 4u);
    EXPECT_EQ(lrStorm.mKinds, (std::vector<std::size_t>{0, 17}));
    EXPECT_EQ(lrStorm.mBoards, std::vector<std::uint32_t>{1});
    EXPECT_EQ(lrStorm.mPorts[0].mName, "tape0");
    EXPECT_EQ(lrStorm.mLuns, (std::vector<std::uint32_t>{1, 2, 3}));
}

TEST(Scenario, AStormTakesEverythingByDefault) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters + std::string("storm count=1"));
    const ZTSSimStorm& lrStorm = lScenario.mStorms.at(0);
    EXPECT_EQ(lrStorm.mKinds.size(), gcSimKindCount);
    EXPECT_EQ(lrStorm.mBoards.size(), 2u);
    EXPECT_EQ(lrStorm.mPorts.size(), 2u);
    EXPECT_EQ(lrStorm.mLuns.size(), 16u);
}

TEST(Scenario, AnswersNameOperationKindAndBoard) {
    const ZTSSimScenario lScenario = readScenario(
        gcTwoAdapters + std::string("info board=1 status=3\nregister rscn status=9 times=2\n"
                                    "unregister all board=hba0 status=8\nregister plogi status=5 handle=0"));
    ASSERT_EQ(lScenario.mAnswers.size(), 4u);
    EXPECT_EQ(lScenario.mAnswers[0].mOperation, ZTSO_GetAdapterInfo);
    EXPECT_EQ(lScenario.mAnswers[0].mBoard, 1u);
    EXPECT_EQ(lScenario.mAnswers[1].mKind, findKindIndex("rscn"));
    EXPECT_EQ(lScenario.mAnswers[1].mTimes, 2u);
    EXPECT_EQ(lScenario.mAnswers[2].mOperation, ZTSO_Unregister);
    EXPECT_EQ(lScenario.mAnswers[2].mKind, std::nullopt);
    EXPECT_EQ(lScenario.mAnswers[3].mHandle, 0u);
}

TEST(Scenario, TheNumberOfBoardsIsSetAtFirstAndAtTimes) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters + std::string("count 1\ncount 2 at=50"));
    EXPECT_EQ(lScenario.mCount, 1u);
    ASSERT_EQ(lScenario.mCountChanges.size(), 1u);
    EXPECT_EQ(lScenario.mCountChanges[0].mAt, 50u);
    EXPECT_EQ(lScenario.mCountChanges[0].mCount, 2u);
}

struct ZTSRefusedLine {
    const char* mpLine;
    const char* mpReason;
};

/// For the list of tests: the line without what a test's name cannot hold.
static void PrintTo(const ZTSRefusedLine& acrLine, std::ostream* apStream) {
    for (const char* lpChar = acrLine.mpLine; *lpChar != '\0'; ++lpChar) {
        *apStream << (std::isalnum(static_cast<unsigned char>(*lpChar)) != 0 ? *lpChar : '_');
    }
}

class ScenarioRefusal : public testing::TestWithParam<ZTSRefusedLine> {};

TEST_P(ScenarioRefusal, NamesLineWordLimitAndValue) {
    EXPECT_EQ(sRefusal(GetParam().mpLine), GetParam().mpReason);
}

INSTANTIATE_TEST_SUITE_P(
    Lines, ScenarioRefusal,
    testing::Values(
        ZTSRefusedLine{"qfull board=0", "\"qfull\" is neither a directive nor an event kind"},
        ZTSRefusedLine{"a\x01"
                       "b",
                       "\"a\\x01b\" is neither a directive nor an event kind"},
        ZTSRefusedLine{"board=0 plogi", "the line begins with \"board=0\", not with a directive or an event kind"},
        ZTSRefusedLine{"plogi lun=1", "plogi has no field \"lun\""},
        ZTSRefusedLine{"plogi often", "plogi does not take the word \"often\""},
        ZTSRefusedLine{"plogi board=", "board= has no value"}, ZTSRefusedLine{"plogi at=1 at=2", "at= is given twice"},
        ZTSRefusedLine{"plogi board=2", "board= names the board 2, but the lines above have 2 adapters"},
        ZTSRefusedLine{"plogi board=hba7", "board= names \"hba7\", which is not an adapter of the lines above"},
        ZTSRefusedLine{"plogi board=0,,1", "board= has an empty value in its list"},
        ZTSRefusedLine{"plogi port=disk7",
                       "port= names \"disk7\", which is neither a port of the lines above nor a world wide name"},
        ZTSRefusedLine{
            "plogi portname=30:00",
            "portname= takes a world wide name (30:00:00:00:00:00:00:01) or the name of an adapter or a port, "
            "not \"30:00\""},
        ZTSRefusedLine{"plogi at=soon", "at= takes a number, not \"soon\""},
        ZTSRefusedLine{"plogi at=0x", "at= takes a number, not \"0x\""},
        ZTSRefusedLine{"plogi at=-1", "at= takes a number, not \"-1\""},
        ZTSRefusedLine{"plogi at=86400001", "at= takes a number from 0 to 86400000, not \"86400001\""},
        ZTSRefusedLine{"plogi times=0", "times= takes a number from 1 to 1000000000, not \"0\""},
        ZTSRefusedLine{"plogi times=forever", "times=forever needs every= of at least 1"},
        ZTSRefusedLine{"plogi threads=65", "threads= takes a number from 1 to 64, not \"65\""},
        ZTSRefusedLine{"queue-full lun=4294967296", "lun= takes a number from 0 to 4294967295, not \"4294967296\""},
        ZTSRefusedLine{"queue-full lun=99999999999999999999",
                       "lun= takes a number from 0 to 4294967295, not \"99999999999999999999\""},
        ZTSRefusedLine{"queue-full lun=5-3", "lun= has the range \"5-3\" that ends before it begins"},
        ZTSRefusedLine{"queue-full lun=0-4096", "lun= lists more than 4096 values"},
        ZTSRefusedLine{"link state=256", "state= takes a number from 0 to 255, not \"256\""},
        ZTSRefusedLine{"link state=all", "state= takes a number from 0 to 255, not \"all\""},
        ZTSRefusedLine{"link alpamap=0", "alpamap= takes pairs of hex digits, not \"0\""},
        ZTSRefusedLine{"plogi data=0g", "data= takes pairs of hex digits, not \"0g\""},
        ZTSRefusedLine{"plogi length=65537", "length= takes a number from 0 to 65536, not \"65537\""},
        ZTSRefusedLine{"plogi size=65577", "size= has low 32 bits of 65577, more than 65576"},
        ZTSRefusedLine{"plogi payload=none", "payload= takes null, not \"none\""},
        ZTSRefusedLine{"plogi data=00 version=1", "plogi takes either data= or fields of its data, not both"},
        ZTSRefusedLine{"rscn category=1", "rscn has no field \"category\""},
        ZTSRefusedLine{"temperature data=00", "temperature has no field \"data\""},
        ZTSRefusedLine{"rscn pages=zone:1",
                       "pages= takes port:ID, area:ID, domain:ID, fabric or word:NUMBER, not \"zone:1\""},
        ZTSRefusedLine{"rscn pages=port:0x1000000", "pages= takes a number from 0 to 16777215, not \"0x1000000\""},
        ZTSRefusedLine{"rscn payloadlength=65536", "payloadlength= takes a number from 0 to 65535, not \"65536\""},
        ZTSRefusedLine{"storm threads=2", "storm needs count="},
        ZTSRefusedLine{"storm count=1 kind=qfull", "kind= names \"qfull\", which is not an event kind"},
        ZTSRefusedLine{"storm count=1 every=3", "storm has no field \"every\""},
        ZTSRefusedLine{"adapter", "adapter needs a name"}, ZTSRefusedLine{"adapter hba2", "adapter needs wwpn="},
        ZTSRefusedLine{"adapter hba0 wwpn=30:00:00:00:00:00:00:01", "the name \"hba0\" is given twice"},
        ZTSRefusedLine{
            "port all",
            "\"all\" is not a name: a name begins with a letter, has no comma or colon, and is not all or none"},
        ZTSRefusedLine{"port t wwpn=3000000000000001",
                       "wwpn= takes a world wide name (30:00:00:00:00:00:00:01), not \"3000000000000001\""},
        ZTSRefusedLine{"port t wwpn=30:00:00:00:00:00:00:01 wwnn=30:00:00:00:00:00:00:01 fcid=0x1000000",
                       "fcid= takes a number from 0 to 16777215, not \"0x1000000\""},
        ZTSRefusedLine{"count", "count needs a number of boards"},
        ZTSRefusedLine{"count 3", "count 3 is more than the 2 adapters of the lines above"},
        ZTSRefusedLine{"init", "init needs status="},
        ZTSRefusedLine{"ztapi perhaps", "ztapi takes yes or no, not \"perhaps\""},
        ZTSRefusedLine{"start soon", "start takes registered or first or init, not \"soon\""},
        ZTSRefusedLine{"addresses even", "addresses takes odd or aligned, not \"even\""},
        ZTSRefusedLine{"register qfull status=1", "\"qfull\" is not an event kind"},
        ZTSRefusedLine{"register plogi board=0", "register needs status="},
        ZTSRefusedLine{"info board=0 status=1 handle=2", "info has no field \"handle\""},
        ZTSRefusedLine{"plogi \"a b", "the quotation mark before \"a b\" is not closed"},
        ZTSRefusedLine{"plogi port=\"a b", "the quotation mark before \"a b\" is not closed"},
        ZTSRefusedLine{"plogi port=\"a\"b", "there must be a blank after the quoted \"a\""},
        ZTSRefusedLine{"loss \"\" count=1", "there is nothing between the quotation marks"},
        ZTSRefusedLine{"plogi port=\"\"", "port= has no value"},
        ZTSRefusedLine{"state", "state needs an event kind, or all"},
        ZTSRefusedLine{"state qfull failed", "\"qfull\" is not an event kind"},
        ZTSRefusedLine{"state link", "state needs working or no-source or no-rights or failed"},
        ZTSRefusedLine{"state link broken", "state takes working or no-source or no-rights or failed, not \"broken\""},
        ZTSRefusedLine{"state link failed every=1", "state has no field \"every\""},
        ZTSRefusedLine{"loss count=1", "loss needs a name"}, ZTSRefusedLine{"loss messages", "loss needs count="},
        ZTSRefusedLine{"loss messages count=0", "count= takes a number from 1 to 1000000000, not \"0\""},
        ZTSRefusedLine{"loss messages count=1 times=forever", "times=forever needs every= of at least 1"}));

TEST(Scenario, AStateNamesAKindOrAllAndHoldsFromTheBeginningOrFromATimeOn) {
    const ZTSSimScenario lScenario =
        readTwoAdapters("state link no-rights board=1 reason=\"needs CAP_NET_ADMIN\"\nstate all failed at=20");
    ASSERT_EQ(lScenario.mStates.size(), 2u);
    const ZTSSimState& lrFirst = lScenario.mStates[0];
    EXPECT_EQ(lrFirst.mKind, findKindIndex("link"));
    EXPECT_EQ(lrFirst.mState, KPM_STATE_NO_RIGHTS);
    EXPECT_EQ(lrFirst.mBoards.mBoards, std::vector<std::uint32_t>{1});
    EXPECT_EQ(lrFirst.mReason, "needs CAP_NET_ADMIN");
    EXPECT_FALSE(lrFirst.mIsTimed);
    const ZTSSimState& lrSecond = lScenario.mStates[1];
    EXPECT_EQ(lrSecond.mKind, std::nullopt);
    EXPECT_TRUE(lrSecond.mBoards.mAll);
    EXPECT_EQ(lrSecond.mReason, "");
    EXPECT_EQ(lrSecond.mAt, 20u);
    EXPECT_TRUE(lrSecond.mIsTimed);
}

TEST(Scenario, ALossHasANameACountAndTimes) {
    const ZTSSimScenario lScenario =
        readTwoAdapters("loss \"trace events\" count=3 at=1 every=2 times=4\nloss x count=1");
    ASSERT_EQ(lScenario.mLosses.size(), 2u);
    EXPECT_EQ(lScenario.mLosses[0].mName, "trace events");
    EXPECT_EQ(lScenario.mLosses[0].mCount, 3u);
    EXPECT_EQ(lScenario.mLosses[0].mAt, 1u);
    EXPECT_EQ(lScenario.mLosses[0].mEvery, 2u);
    EXPECT_EQ(lScenario.mLosses[0].mTimes, 4u);
    EXPECT_EQ(lScenario.mLosses[1].mTimes, 1u);
}

TEST(Scenario, TextsHaveALimitOfTheirLength) {
    const std::string lLongest(gcSimMaxTextValue, 'x');
    EXPECT_NO_THROW(readTwoAdapters("loss " + lLongest + " count=1\nstate link failed reason=" + lLongest));
    EXPECT_EQ(sRefusal("loss x" + lLongest + " count=1"), "the name of a loss has 1025 bytes, more than 1024");
    EXPECT_EQ(sRefusal("state link failed reason=x" + lLongest), "reason= has 1025 bytes, more than 1024");
}

TEST(Scenario, ARefusalShowsAnUnknownFieldCutAndWithoutControlCharacters) {
    EXPECT_EQ(sRefusal("plogi a\x1b[2J="), "a\\x1b[2J= has no value");
    const std::string lLong(1000, 'z');
    EXPECT_EQ(sRefusal("plogi " + lLong + "=1 " + lLong + "=1"), std::string(40, 'z') + "...= is given twice");
}

TEST(Scenario, AllThreadsTogetherHaveALimit) {
    std::string lText = gcTwoAdapters;
    for (int lLine = 0; lLine < 4; ++lLine) {
        lText += "storm count=64 threads=64\n";
    }
    EXPECT_NO_THROW(parseSimScenario(lText));
    try {
        parseSimScenario(lText + "plogi threads=2 times=2\n");
        FAIL() << "accepted";
    } catch (const ZTCSimRefusal& lrRefusal) {
        EXPECT_EQ(lrRefusal.getLine(), 9u);
        EXPECT_STREQ(lrRefusal.what(), "threads= of all lines so far make 258, more than 256");
    }
}

TEST(Scenario, ALineHasALimitOfItsLength) {
    const std::string lPadding(gcSimMaxLineSize - 5, ' ');
    EXPECT_NO_THROW(parseSimScenario("ztapi" + lPadding.substr(4) + "no"));
    try {
        parseSimScenario("\nztapi" + lPadding + "no");
        FAIL() << "accepted";
    } catch (const ZTCSimRefusal& lrRefusal) {
        EXPECT_EQ(lrRefusal.getLine(), 2u);
        EXPECT_STREQ(lrRefusal.what(), "the line has 262146 bytes, more than 262144");
    }
}

TEST(Scenario, ATextHasALimitOfItsLength) {
    EXPECT_NO_THROW(parseSimScenario(std::string(gcSimMaxTextSize, '\n')));
    EXPECT_THROW(parseSimScenario(std::string(gcSimMaxTextSize + 1, '\n')), ZTCSimRefusal);
}

TEST(Scenario, LinesWithEventsHaveALimit) {
    std::string lText = gcTwoAdapters;
    for (std::size_t lLine = 0; lLine < gcSimMaxEventLines; ++lLine) {
        lText += "plogi\n";
    }
    EXPECT_NO_THROW(parseSimScenario(lText));
    EXPECT_THROW(parseSimScenario(lText + "plogi\n"), ZTCSimRefusal);
}

TEST(Scenario, EventsNeedAnAdapter) {
    for (const char* lpLine : {"plogi", "plogi board=all", "storm count=1"}) {
        EXPECT_THROW(parseSimScenario(lpLine), ZTCSimRefusal) << lpLine;
    }
}

TEST(Scenario, EventsStormsStatesAndLossesAreEventLines) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters);
    EXPECT_TRUE(std::holds_alternative<ZTSSimStorm>(parseSimEventLine("storm count=1", lScenario)));
    EXPECT_TRUE(std::holds_alternative<ZTSSimState>(parseSimEventLine("state all working", lScenario)));
    EXPECT_TRUE(std::holds_alternative<ZTSSimLoss>(parseSimEventLine("loss x count=1", lScenario)));
    for (const char* lpLine : {"", "# nothing", "count 1", "adapter x", "unknown"}) {
        EXPECT_THROW(parseSimEventLine(lpLine, lScenario), ZTCSimRefusal) << lpLine;
    }
}
