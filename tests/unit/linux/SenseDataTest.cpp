#include "libkpm/linux/src/SenseData.h"

#include <gtest/gtest.h>

#include "tests/unit/linux/BtfBytes.h"

static std::string sText(const ZTSSenseValues& acrValues) {
    return std::to_string(acrValues.mSenseKey) + "/" + std::to_string(acrValues.mAsc) + "/" +
           std::to_string(acrValues.mAscq);
}

TEST(SenseData, FixedFormatHasItsKeyInByteTwoAndItsCodesInTwelveAndThirteen) {
    for (const std::uint8_t lCode : {std::uint8_t{0x70}, std::uint8_t{0x71}, std::uint8_t{0xF0}}) {
        const ZTCBytes lSense{lCode, 0, 0xA5, 0, 0, 0, 0, 10, 0, 0, 0, 0, 0x24, 0x07, 0, 0, 0, 0, 0, 0};
        EXPECT_EQ(sText(parseSense(lSense)), "5/36/7");
    }
}

TEST(SenseData, FixedFormatThatEndsBeforeItsCodesHasZeros) {
    ZTCBytes lSense{0x70, 0, 0x06, 0, 0, 0, 0, 4, 0, 0, 0, 0, 0x29, 0x03, 0, 0, 0, 0, 0, 0};
    EXPECT_EQ(sText(parseSense(lSense)), "6/0/0");
    lSense[7] = 5;
    EXPECT_EQ(sText(parseSense(lSense)), "6/41/0");
    lSense[7] = 6;
    EXPECT_EQ(sText(parseSense(lSense)), "6/41/3");
}

TEST(SenseData, DescriptorFormatHasThemInTheFirstFourBytes) {
    for (const std::uint8_t lCode : {std::uint8_t{0x72}, std::uint8_t{0x73}}) {
        EXPECT_EQ(sText(parseSense(ZTCBytes{lCode, 0x0B, 0x44, 0x01, 0, 0, 0, 0})), "11/68/1");
    }
}

TEST(SenseData, WhatIsNeitherIsUnknown) {
    for (const std::uint8_t lCode : {std::uint8_t{0}, std::uint8_t{0x6F}, std::uint8_t{0x74}, std::uint8_t{0x7F}}) {
        EXPECT_EQ(sText(parseSense(ZTCBytes{lCode, 5, 5, 5})), "4294967295/4294967295/4294967295");
    }
    EXPECT_EQ(parseSense({}).mSenseKey, gcUnknownSense);
}

TEST(SenseData, TheProbeReadsEveryFieldAtThisKernelsOffsets) {
    const ZTSScsiBtf lBytes = scsiBtf();
    const ZTCBtf lBtf(lBytes.mKernel, lBytes.mModule);
    const auto lLine = makeSenseProbe(lBtf, "group", "$arg1");
    ASSERT_TRUE(std::holds_alternative<std::string>(lLine));
    EXPECT_EQ(std::get<std::string>(lLine),
              "p:group/check_sense scsi_check_sense host=+404(+0(+0($arg1))):u32 channel=+148(+0($arg1)):u32 "
              "id=+144(+0($arg1)):u32 lun=+152(+0($arg1)):u64 result=+288($arg1):u32 opcode=+164($arg1):x8 "
              "driver_tag=-232($arg1):s32 scheduler_tag=-228($arg1):s32 sense=+0(+248($arg1)):x8[20]");
}

TEST(SenseData, ADescriptionThatLacksSomethingIsRefusedByName) {
    const ZTSScsiBtf lBytes = scsiBtf();
    const auto lProblem = [](const ZTCBtf& acrBtf) {
        return std::get<ZTSTraceProblem>(makeSenseProbe(acrBtf, "group", "$arg1")).mText;
    };
    EXPECT_EQ(
        lProblem(ZTCBtf(lBytes.mKernel, {})),
        "the kernel's description of its types (BTF) has no structure scsi_cmnd with the members that are needed");
    EXPECT_EQ(lProblem(ZTCBtf({}, {})), "the kernel's description of its types (BTF) does not parse");
    ZTCBtfBuilder lWrong;
    const std::uint32_t lInt = lWrong.addInteger("int", 4);
    lWrong.addStructure("scsi_cmnd", 8,
                        {{"device", lInt, 0}, {"cmnd", lInt, 0}, {"result", lInt, 0}, {"sense_buffer", lInt, 0}});
    lWrong.addStructure("scsi_device", 8, {{"host", lInt, 0}, {"id", lInt, 0}, {"channel", lInt, 0}, {"lun", lInt, 0}});
    lWrong.addStructure("Scsi_Host", 8, {{"host_no", lInt, 0}});
    lWrong.addStructure("request", 8, {{"tag", lInt, 0}, {"internal_tag", lInt, 0}});
    const ZTCBytes lMade = lWrong.make();
    EXPECT_EQ(lProblem(ZTCBtf(lMade, {})),
              "the kernel's description of its types (BTF) has a member of another form than expected");
}

TEST(SenseData, TheFilterNamesTheHostsAsTheProbeDoes) {
    EXPECT_EQ(makeSenseFilter({1, 2, 5}), "(host >= 1 && host <= 2) || host == 5");
    std::vector<std::uint32_t> lMany;
    for (std::uint32_t lHost = 0; lHost < 1000; lHost += 2) {
        lMany.push_back(lHost);
    }
    EXPECT_EQ(makeSenseFilter(lMany), "0");
}

TEST(SenseData, ARecordIsReadByItsFormatInBothByteOrdersAndNotIfItIsShort) {
    const auto lLayout = std::get<ZTSSenseLayout>(makeSenseLayout(parseTraceFormat(senseFormat())));
    EXPECT_EQ(lLayout.mId, gcSenseId);
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        ZTSSenseRecordBytes lBytes{.mHost = 3, .mTarget = 5, .mLun = 0x11, .mOpcode = 0x2A, .mDriverTag = 7};
        lBytes.mOrder = lOrder;
        const ZTCBytes lRecord = lBytes.make();
        const auto lRead = parseSenseRecord(lRecord, lLayout, lOrder);
        ASSERT_TRUE(lRead.has_value());
        EXPECT_EQ(lRead->mCommand, (ZTSCommandName{3, 0, 5, 0x11, 0x2A, 7, 79}));
        EXPECT_EQ(sText(lRead->mValues), "5/33/0");
        for (std::size_t lSize = 0; lSize + 1 < lRecord.size(); ++lSize) {
            EXPECT_FALSE(parseSenseRecord(ZTCByteSpan(lRecord).first(lSize), lLayout, lOrder).has_value());
        }
    }
}

TEST(SenseData, AFormatWithoutAFieldIsRefused) {
    for (const char* lpName : {"host", "lun", "driver_tag", "sense[20]"}) {
        std::string lText = senseFormat();
        lText.erase(lText.find(std::string(" ") + lpName + ";"), std::string(lpName).size() + 1);
        EXPECT_TRUE(std::holds_alternative<ZTSTraceProblem>(makeSenseLayout(parseTraceFormat(lText)))) << lpName;
    }
    EXPECT_TRUE(std::holds_alternative<ZTSTraceProblem>(makeSenseLayout(parseTraceFormat(""))));
}
