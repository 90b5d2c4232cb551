// All descriptions here are built by hand (BtfBytes.h).
#include "libkpm/linux/src/Btf.h"

#include <gtest/gtest.h>

#include <array>

#include "tests/unit/linux/BtfBytes.h"

static std::optional<ZTSBtfStructure> sFind(const ZTCBytes& acrKernel, const ZTCBytes& acrModule,
                                            std::string_view aName, std::vector<std::string_view> aMembers) {
    return ZTCBtf(acrKernel, acrModule).find(aName, aMembers);
}

TEST(Btf, MembersAreFoundInBothPartsAndBothByteOrders) {
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        const ZTSScsiBtf lBtf = scsiBtf(lOrder);
        const auto lRequest = sFind(lBtf.mKernel, lBtf.mModule, "request", {"internal_tag", "tag"});
        ASSERT_TRUE(lRequest.has_value());
        EXPECT_EQ(lRequest->mSize, 264u);
        EXPECT_EQ(lRequest->mMembers[0].mOffset, 36u);
        EXPECT_EQ(lRequest->mMembers[1].mOffset, 32u);
        const auto lCommand = sFind(lBtf.mKernel, lBtf.mModule, "scsi_cmnd", {"device", "cmnd", "result"});
        ASSERT_TRUE(lCommand.has_value());
        EXPECT_EQ(lCommand->mMembers[0].mForm, ZTBF_Pointer);
        EXPECT_EQ(lCommand->mMembers[1].mForm, ZTBF_Array);
        EXPECT_EQ(lCommand->mMembers[1].mOffset, 164u);
        EXPECT_EQ(lCommand->mMembers[2].mForm, ZTBF_Number);
        EXPECT_EQ(lCommand->mMembers[2].mSize, 4u);
        const auto lDevice = sFind(lBtf.mKernel, lBtf.mModule, "scsi_device", {"lun"});
        ASSERT_TRUE(lDevice.has_value());
        EXPECT_EQ(lDevice->mMembers[0].mSize, 8u) << "through its other name";
    }
}

TEST(Btf, WhatIsNotThereIsNotFound) {
    const ZTSScsiBtf lBtf = scsiBtf();
    EXPECT_FALSE(sFind(lBtf.mKernel, lBtf.mModule, "nothing", {}).has_value());
    EXPECT_FALSE(sFind(lBtf.mKernel, lBtf.mModule, "request", {"tag", "nothing"}).has_value());
    EXPECT_FALSE(sFind(lBtf.mKernel, {}, "scsi_cmnd", {"device"}).has_value());
    EXPECT_FALSE(sFind(lBtf.mKernel, {}, "u64", {}).has_value()) << "no structure";
}

TEST(Btf, MembersOfMembersWithoutANameCountFromTheOuterStructure) {
    ZTCBtfBuilder lBuilder;
    const std::uint32_t lInt = lBuilder.addInteger("int", 4);
    const std::uint32_t lUnion = lBuilder.addStructure("", 8, {{"a", lInt, 0}, {"b", lInt, 32}}, false, 5);
    const std::uint32_t lInner = lBuilder.addStructure("", 16, {{"x", lInt, 0}, {"", lUnion, 64}});
    lBuilder.addStructure("outer", 64, {{"first", lInt, 0}, {"", lBuilder.addConst(lInner), 128}});
    const auto lOuter = sFind(lBuilder.make(), {}, "outer", {"x", "b"});
    ASSERT_TRUE(lOuter.has_value());
    EXPECT_EQ(lOuter->mMembers[0].mOffset, 16u);
    EXPECT_EQ(lOuter->mMembers[1].mOffset, 16u + 8u + 4u);
}

TEST(Btf, BitFieldsAreNotTakenAndTheirNeighborsAre) {
    ZTCBtfBuilder lBuilder;
    const std::uint32_t lInt = lBuilder.addInteger("int", 4);
    lBuilder.addStructure("s", 16, {{"bit", lInt, 1u << 24 | 32}, {"whole", lInt, 64}}, true);
    lBuilder.addStructure("odd", 16, {{"shifted", lInt, 33}});
    const ZTCBytes lBytes = lBuilder.make();
    EXPECT_FALSE(sFind(lBytes, {}, "s", {"bit"}).has_value());
    EXPECT_EQ(sFind(lBytes, {}, "s", {"whole"})->mMembers[0].mOffset, 8u);
    EXPECT_FALSE(sFind(lBytes, {}, "odd", {"shifted"}).has_value());
}

TEST(Btf, OfStructuresOfOneNameTheOneWithTheMembersIsTaken) {
    ZTCBtfBuilder lBuilder;
    const std::uint32_t lInt = lBuilder.addInteger("int", 4);
    lBuilder.addStructure("request", 8, {{"other", lInt, 0}});
    lBuilder.addStructure("request", 16, {{"tag", lInt, 64}});
    EXPECT_EQ(sFind(lBuilder.make(), {}, "request", {"tag"})->mSize, 16u);
}

TEST(Btf, RecordsOfEveryKindArePassedOver) {
    static constexpr std::array<std::array<std::size_t, 2>, 20> scRests{
        {{0, 0}, {4, 0}, {0, 0}, {12, 0}, {0, 12}, {0, 12}, {0, 8}, {0, 0}, {0, 0}, {0, 0},
         {0, 0}, {0, 0}, {0, 0}, {0, 8},  {4, 0},  {0, 12}, {0, 0}, {4, 0}, {0, 0}, {0, 12}}};
    ZTCBtfBuilder lBuilder;
    for (std::uint32_t lKind = 1; lKind < scRests.size(); ++lKind) {
        lBuilder.addRaw(lKind, 3, scRests[lKind][0] + 3 * scRests[lKind][1]);
    }
    const std::uint32_t lInt = lBuilder.addInteger("int", 4);
    lBuilder.addStructure("last", 8, {{"member", lInt, 32}});
    EXPECT_TRUE(sFind(lBuilder.make(), {}, "last", {"member"}).has_value());
    lBuilder.addRaw(20, 0, 0);
    EXPECT_FALSE(ZTCBtf(lBuilder.make(), {}).isWhole()) << "a kind of which nobody knows how long it is";
}

TEST(Btf, TypesThatLeadInACircleEnd) {
    ZTCBtfBuilder lBuilder;
    lBuilder.addStructure("s", 8, {{"", 1, 0}, {"m", 2, 0}});  // contains itself
    lBuilder.addTypedef("t", 3);
    lBuilder.addTypedef("u", 2);
    EXPECT_FALSE(sFind(lBuilder.make(), {}, "s", {"x"}).has_value());
    EXPECT_FALSE(sFind(lBuilder.make(), {}, "s", {"m"}).has_value());
}

TEST(Btf, ADescriptionThatIsCutAnywhereIsNotWholeOrLacksItsStrings) {
    const ZTSScsiBtf lBtf = scsiBtf();
    for (std::size_t lSize = 0; lSize < lBtf.mKernel.size(); ++lSize) {
        const ZTCByteSpan lCut = ZTCByteSpan(lBtf.mKernel).first(lSize);
        EXPECT_FALSE(ZTCBtf(lCut, {}).isWhole()) << lSize;
        EXPECT_FALSE(ZTCBtf(lBtf.mKernel, lCut.size() < 2 ? lCut.first(0) : lCut).find("scsi_cmnd", {}).has_value());
    }
    EXPECT_TRUE(ZTCBtf(lBtf.mKernel, {}).isWhole());
}
