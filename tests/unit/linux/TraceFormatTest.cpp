// The descriptions here are built by hand after those of kernels 6.1 and 6.12.
#include "libkpm/linux/src/TraceFormat.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/unit/linux/KernelBytes.h"

static std::string sWithout(std::string aText, const std::string& acrField) {
    const std::size_t lName = aText.find(" " + acrField + ";");
    EXPECT_NE(lName, std::string::npos) << acrField;
    const std::size_t lBegin = aText.rfind('\n', lName) + 1;
    return aText.erase(lBegin, aText.find('\n', lName) + 1 - lBegin);
}

static std::string sProblem(const std::string& acrFormat) {
    const auto lLayout = makeScsiDoneLayout(parseTraceFormat(acrFormat));
    const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lLayout);
    return lpProblem == nullptr ? "" : lpProblem->mText;
}

static std::string sPageProblem(const std::string& acrText) {
    const auto lLayout = makeTracePageLayout(parseTraceFormat(acrText));
    const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lLayout);
    return lpProblem == nullptr ? "" : lpProblem->mText;
}

TEST(TraceFormat, EveryFieldIsFoundWithItsPlace) {
    const ZTSTraceFormat lFormat = parseTraceFormat(doneFormat());
    EXPECT_EQ(lFormat.mId, 385u);
    EXPECT_EQ(lFormat.mFields.size(), 20u);
    ASSERT_NE(lFormat.find("cmnd"), nullptr);
    EXPECT_EQ(lFormat.find("cmnd")->mOffset, 56u);
    EXPECT_EQ(lFormat.find("cmnd")->mSize, 4u);
    EXPECT_EQ(lFormat.find("nothing"), nullptr);
}

TEST(TraceFormat, NamesAreTakenOutOfAnyDeclaration) {
    const ZTSTraceFormat lFormat = parseTraceFormat(
        "field:char comm[16];offset:1;size:16;signed:0;\n field:const char * text;\toffset:2;\tsize:8;\tsigned:0;\n"
        "field:const char *name;offset:3;size:8;\nfield:__data_loc char[] data;offset:4;size:4;\r\n"
        "field:u8 table[2][16];offset:5;size:32;\nfield:u8 spaced [4];offset:6;size:4;\n");
    ASSERT_EQ(lFormat.mFields.size(), 6u);
    EXPECT_EQ(lFormat.mFields[0].mName, "comm");
    EXPECT_EQ(lFormat.mFields[1].mName, "text");
    EXPECT_EQ(lFormat.mFields[2].mName, "name");
    EXPECT_EQ(lFormat.mFields[3].mName, "data");
    EXPECT_EQ(lFormat.mFields[4].mName, "table");
    EXPECT_EQ(lFormat.mFields[5].mName, "spaced");
}

TEST(TraceFormat, LinesThatAreNoFieldsArePassedOver) {
    const char* const lLines[] = {"",
                                  "field:",
                                  "field:int x",
                                  "field:int x; offset:0;",
                                  "field:int x; size:4;",
                                  "field:int x; offset:; size:4;",
                                  "field:int x; offset:-4; size:4;",
                                  "field:int x; offset:4x; size:4;",
                                  "field:int x; offset:99999999999999999999; size:4;",
                                  "field:int x; offset:0; size:1048577;",
                                  "; offset:0; size:4;",
                                  "field:[][4]; offset:0; size:4;",
                                  "ID: x",
                                  "ID: 4294967296",
                                  ":::;;;"};
    for (const char* lpLine : lLines) {
        const ZTSTraceFormat lFormat = parseTraceFormat(lpLine);
        EXPECT_TRUE(lFormat.mFields.empty()) << lpLine;
        EXPECT_FALSE(lFormat.mId.has_value()) << lpLine;
    }
}

TEST(TraceFormat, FinishedCommandsOfANewerKernelHaveSenseData) {
    const auto lLayout = std::get<ZTSScsiDoneLayout>(makeScsiDoneLayout(parseTraceFormat(doneFormat(true))));
    EXPECT_EQ(lLayout.mId, 385u);
    EXPECT_TRUE(lLayout.hasSense());
    EXPECT_EQ(lLayout.mAscq.mOffset, 62u);
    EXPECT_EQ(lLayout.mResult.mOffset, 24u);
}

TEST(TraceFormat, FinishedCommandsOfAnOlderKernelHaveNone) {
    const auto lLayout = std::get<ZTSScsiDoneLayout>(makeScsiDoneLayout(parseTraceFormat(doneFormat(false))));
    EXPECT_FALSE(lLayout.hasSense());
}

TEST(TraceFormat, SenseDataThatAreNotWholeAreNone) {
    for (const char* lpField : {"sense_key", "asc", "ascq"}) {
        const auto lLayout =
            std::get<ZTSScsiDoneLayout>(makeScsiDoneLayout(parseTraceFormat(sWithout(doneFormat(), lpField))));
        EXPECT_FALSE(lLayout.hasSense()) << lpField;
        EXPECT_EQ(lLayout.mAsc.mSize, 0u);
    }
}

TEST(TraceFormat, AFieldThatIsGoneIsNamed) {
    for (const char* lpField : {"common_type", "host_no", "channel", "id", "lun", "result", "opcode"}) {
        EXPECT_EQ(sProblem(sWithout(doneFormat(), lpField)), std::string("the format has no field ") + lpField);
    }
    EXPECT_EQ(sProblem("format:\n"), "the format has no ID");
    EXPECT_EQ(sProblem(""), "the format has no ID");
}

TEST(TraceFormat, AFieldThatIsNoIntegerIsNamedWithItsSize) {
    std::string lText = doneFormat();
    lText.replace(lText.find("lun;\toffset:20;\tsize:4"), 22, "lun;\toffset:20;\tsize:3");
    EXPECT_EQ(sProblem(lText), "the format's field lun has 3 bytes, which is no integer's size");
}

TEST(TraceFormat, FieldsMoveAndGrowWithTheirDescription) {
    std::string lText = doneFormat();
    lText.replace(lText.find("lun;\toffset:20;\tsize:4"), 22, "lun;\toffset:64;\tsize:8");
    const auto lLayout = std::get<ZTSScsiDoneLayout>(makeScsiDoneLayout(parseTraceFormat(lText)));
    EXPECT_EQ(lLayout.mLun.mOffset, 64u);
    EXPECT_EQ(lLayout.mLun.mSize, 8u);
}

TEST(TraceFormat, APageIsAsLongAsItsDescriptionSays) {
    const auto lLayout = std::get<ZTSTracePageLayout>(makeTracePageLayout(parseTraceFormat(headerPage())));
    EXPECT_EQ(lLayout.mCommitOffset, 8u);
    EXPECT_EQ(lLayout.mCommitSize, 8u);
    EXPECT_EQ(lLayout.mDataOffset, 16u);
    EXPECT_EQ(lLayout.mPageSize, 4096u);
}

TEST(TraceFormat, APageThatCannotBeIsNamedWithWhatIsWrong) {
    EXPECT_EQ(sPageProblem(""), "header_page has no field commit");
    EXPECT_EQ(sPageProblem(sWithout(headerPage(), "data")), "header_page has no field data");
    const char* const lpCommit = "field: local_t commit; offset:8; size:8; signed:1;\n";
    for (const char* lpData : {"field: char data; offset:12; size:4080;", "field: char data; offset:16; size:63;",
                               "field: char data; offset:16; size:1048576;"}) {
        EXPECT_NE(sPageProblem(std::string(lpCommit) + lpData).find("which cannot be"), std::string::npos) << lpData;
    }
    EXPECT_EQ(sPageProblem("field: x commit; offset:8; size:2;\nfield: char data; offset:16; size:4080;"),
              "header_page gives commit 2 bytes at 8 and data 4080 bytes at 16, which cannot be");
}
