#include "sensor/client/include/RecordFields.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <random>

#include "sensor/client/include/RecordJson.h"
#include "sensor/client/include/RecordTable.h"
#include "tests/support/Seed.h"
#include "tests/unit/client/WireSamples.h"

using testing::AllOf;
using testing::HasSubstr;

static ZTSReceivedRecord sRecord(const ZTSSampleKind& acrKind) {
    ZTSReceivedRecord lRecord;
    lRecord.mCategory = acrKind.mCategory;
    lRecord.mSubcategory = acrKind.mSubcategory;
    lRecord.mEventData = acrKind.mData;
    return lRecord;
}

static const ZTSSampleKind& sKind(const std::vector<ZTSSampleKind>& acrKinds, const std::string& acrName) {
    for (const ZTSSampleKind& lrKind : acrKinds) {
        if (lrKind.mpName == acrName) {
            return lrKind;
        }
    }
    throw std::runtime_error("no sample of " + acrName);
}

TEST(RecordFields, TheTableHoldsTheTwentyKindsInCatalogueOrder) {
    const std::vector<ZTSSampleKind> lKinds = makeSampleKinds();
    ASSERT_EQ(getKindRules().size(), lKinds.size());
    for (std::size_t i = 0; i < lKinds.size(); ++i) {
        EXPECT_EQ(getKindRules()[i].mpKind->mDeliveredCategory, lKinds[i].mCategory);
        EXPECT_EQ(getKindRules()[i].mpKind->mDeliveredSubcategory, lKinds[i].mSubcategory);
        EXPECT_EQ(findKindRule(lKinds[i].mCategory, lKinds[i].mSubcategory), &getKindRules()[i]);
        EXPECT_EQ(getKindRules()[i].mpKind->mRecordSize, lKinds[i].mRecordSize) << lKinds[i].mpName;
    }
    EXPECT_EQ(findKindRule(0, 2), nullptr);
}

TEST(RecordFields, EveryKindsDataIsDecodedToNamedFields) {
    for (const ZTSSampleKind& lrKind : makeSampleKinds()) {
        SCOPED_TRACE(lrKind.mpName);
        const ZTSReceivedRecord lRecord = sRecord(lrKind);
        const nlohmann::ordered_json lJson = toJson(lRecord);
        EXPECT_EQ(lJson["kind"], lrKind.mpName);
        EXPECT_EQ(lJson["data"].dump(), lrKind.mJson);
        EXPECT_TRUE(lJson["dataProblem"].is_null()) << lJson["dataProblem"];
        EXPECT_EQ(lJson["dataHex"], hexOf(lrKind.mData));
        EXPECT_EQ(formatDetails(lRecord), lrKind.mDetails);
        EXPECT_EQ(formatKind(lRecord), lrKind.mpName);
    }
}

TEST(RecordFields, DataCutAnywhereKeepsItsWholeFieldsAndSaysSo) {
    for (const ZTSSampleKind& lrKind : makeSampleKinds()) {
        const ZTSDecodedData lWhole = decodeEventData(lrKind.mCategory, lrKind.mSubcategory, lrKind.mData);
        const std::size_t lRecordSize = lrKind.mRecordSize;
        for (std::size_t lSize = 0; lSize < lrKind.mData.size(); ++lSize) {
            SCOPED_TRACE(std::string(lrKind.mpName) + " " + std::to_string(lSize));
            const ZTSDecodedData lCut =
                decodeEventData(lrKind.mCategory, lrKind.mSubcategory, {lrKind.mData.data(), lSize});
            const std::size_t lEntry = lCut.mpKind->mEntrySize;
            const bool lIsWhole = lSize >= lRecordSize && (lSize - lRecordSize) % lEntry == 0;
            EXPECT_EQ(lCut.mProblem.empty(), lIsWhole) << lCut.mProblem;
            ASSERT_LE(lCut.mFields.size(), lWhole.mFields.size());
            for (std::size_t i = 0; i < lCut.mFields.size(); ++i) {
                EXPECT_EQ(lCut.mFields[i].mValue, lWhole.mFields[i].mValue);
            }
            ASSERT_LE(lCut.mEntries.size(), lWhole.mEntries.size());
        }
    }
}

TEST(RecordFields, BytesBehindAKindThatAppendsNothingAreAProblem) {
    ZTCBytes lData = sKind(makeSampleKinds(), "plogi").mData;
    lData.push_back(0);
    const ZTSDecodedData lDecoded = decodeEventData(1, 0x01, lData);
    EXPECT_THAT(lDecoded.mProblem, HasSubstr("1 bytes behind the last field"));
    EXPECT_EQ(lDecoded.mFields.size(), 3U);
}

TEST(RecordFields, EveryBitOfABitFieldHasItsNumber) {
    for (unsigned lBit = 0; lBit < 256; ++lBit) {
        ZTCBytes lData(48, 0);
        lData[13] = 1;
        lData[16 + lBit / 8] = static_cast<unsigned char>(1U << (lBit % 8));
        const ZTSDecodedData lDecoded = decodeEventData(4, 0x01, lData);
        ASSERT_EQ(std::get<std::vector<std::uint32_t>>(lDecoded.find("luns")->mValue),
                  std::vector<std::uint32_t>{lBit});
    }
}

TEST(RecordFields, AFullBitFieldReadsAll) {
    ZTSReceivedRecord lRecord = sRecord(sKind(makeSampleKinds(), "queue-full"));
    std::fill(lRecord.mEventData.begin() + 16, lRecord.mEventData.end(), std::uint8_t{0xFF});
    EXPECT_EQ(formatDetails(lRecord), "luns=all");
    EXPECT_EQ(toJson(lRecord)["data"]["luns"].size(), 256U);
}

TEST(RecordFields, ABitFieldOfAnotherLengthAndAnotherVersionAreProblems) {
    ZTCBytes lData = sKind(makeSampleKinds(), "device-busy").mData;
    lData[0] = 2;
    lData[12] = 9;
    EXPECT_THAT(decodeEventData(4, 0x02, lData).mProblem,
                AllOf(HasSubstr("version 2"), HasSubstr("luns announces 265 bits, wanted 256")));
}

TEST(RecordFields, UnknownKindsKeepTheirBytes) {
    ZTSReceivedRecord lRecord;
    lRecord.mCategory = 9;
    lRecord.mSubcategory = 3;
    lRecord.mEventData = bytesOf("00ff10");
    EXPECT_EQ(formatKind(lRecord), "unknown-9/3");
    EXPECT_EQ(formatDetails(lRecord), "data=00ff10");
    const nlohmann::ordered_json lJson = toJson(lRecord);
    EXPECT_TRUE(lJson["kind"].is_null());
    EXPECT_TRUE(lJson["data"].is_null());
    EXPECT_EQ(lJson["dataHex"], "00ff10");
}

TEST(RecordFields, EachAddressFormatHasItsName) {
    const char* const lNames[] = {"port", "area", "domain", "fabric"};
    for (unsigned lFormat = 0; lFormat < 4; ++lFormat) {
        ZTCByteWriter lWriter;
        const ZTSDecodedData lDecoded =
            decodeEventData(1, 0x20, lWriter.le32(1).le32(0xFC000000U | lFormat << 24 | 0xABCDEFU).bytes());
        EXPECT_EQ(std::get<std::uint32_t>(lDecoded.find("addressFormat")->mValue), lFormat);
        EXPECT_STREQ(lDecoded.find("addressFormat")->findValueName(), lNames[lFormat]);
        EXPECT_EQ(std::get<std::uint32_t>(lDecoded.find("fcAddress")->mValue), 0xABCDEFU);
    }
}

TEST(RecordFields, RandomDataOfAnyKindNeverCrashesIt) {
    ZTCTestSeed lSeed;
    std::mt19937& lRandom = lSeed.engine();
    for (int i = 0; i < 20000; ++i) {
        ZTCBytes lData(lRandom() % 140);
        for (unsigned char& lrByte : lData) {
            lrByte = static_cast<unsigned char>(lRandom());
        }
        ZTSReceivedRecord lRecord;
        const ZTSKindRule& lrRule = getKindRules()[lRandom() % getKindRules().size()];
        lRecord.mCategory = lrRule.mpKind->mDeliveredCategory;
        lRecord.mSubcategory = lrRule.mpKind->mDeliveredSubcategory;
        lRecord.mEventData = lData;
        ASSERT_FALSE(formatDetails(lRecord).empty());
        ASSERT_FALSE(toJson(lRecord)["data"].is_null());
    }
}
