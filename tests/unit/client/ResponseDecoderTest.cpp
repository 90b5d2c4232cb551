#include "sensor/client/include/ResponseDecoder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <random>
#include <sstream>

#include "sensor/client/include/RecordJson.h"
#include "sensor/client/include/RecordTable.h"
#include "tests/support/Seed.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/client/WireSamples.h"

using testing::AllOf;
using testing::HasSubstr;

static std::string sProblemOf(const ZTCBytes& acrBody) {
    const ZTSDecodeResult lResult = decodeAsFarAsPossible(acrBody);
    return lResult.mProblem ? lResult.mProblem->what() : "";
}

TEST(ResponseDecoder, DecodesSuccessWithItsSignedResult) {
    const ZTSResponse lResponse = decodeResponse(bytesOf("00 00000000"));
    EXPECT_EQ(lResponse.mOutcome, ZTRO_Success);
    EXPECT_EQ(lResponse.mResult, 0);
    EXPECT_EQ(decodeResponse(bytesOf("00 fffffffe")).mResult, -2);
}

TEST(ResponseDecoder, DecodesAFailureWithItsStatus) {
    const ZTSResponse lResponse = decodeResponse(bytesOf("01 0006"));
    EXPECT_EQ(lResponse.mOutcome, ZTRO_Failed);
    EXPECT_EQ(lResponse.mStatus, ZTSAPS_Invalid);
}

TEST(ResponseDecoder, NamesEveryStatusAndNoOther) {
    const std::pair<unsigned, const char*> lNames[] = {
        {0, "ZTSAPS_Success"},        {4, "ZTSAPS_VarCreate"},     {6, "ZTSAPS_Invalid"},
        {8, "ZTSAPS_NotFound"},       {9, "ZTSAPS_NotAllowed"},    {10, "ZTSAPS_Exists"},
        {11, "ZTSAPS_Repeat"},        {12, "ZTSAPS_NotSupported"}, {325, "ZTSAPS_ConnectFailed"},
        {326, "ZTSAPS_OpenFailed"},   {335, "ZTSAPS_LockFailed"},  {336, "ZTSAPS_UnlockFailed"},
        {490, "ZTSAPS_RefreshFailed"}};
    std::size_t lNamed = 0;
    for (unsigned lStatus = 0; lStatus <= 0xFFFF; ++lStatus) {
        lNamed += std::string(getStatusName(static_cast<std::uint16_t>(lStatus))) != "unknown status" ? 1 : 0;
    }
    EXPECT_EQ(lNamed, std::size(lNames));
    for (const auto& [lStatus, lpName] : lNames) {
        EXPECT_STREQ(getStatusName(static_cast<std::uint16_t>(lStatus)), lpName);
    }
}

TEST(ResponseDecoder, DecodesScopeDataFieldByField) {
    const ZTCBytes lPlain = makeSampleRecord(4, 1, bytesOf("0102"), false, 7);
    const ZTCBytes lNamed = makeSampleRecord(9, 9, {}, true, 0xFFFFFFFF);
    const ZTSResponse lResponse =
        decodeResponse(makeSampleResponse(2, {makeSampleList(gcSampleKey, {lPlain, lNamed}), makeSampleList("", {})}));
    EXPECT_EQ(lResponse.mOutcome, ZTRO_ScopeData);
    EXPECT_EQ(lResponse.mAnnouncedLists, 2U);
    EXPECT_EQ(lResponse.mUnreadBytes, 0U);
    ASSERT_EQ(lResponse.mLists.size(), 2U);
    EXPECT_EQ(lResponse.mLists[0].mInitiatorKey, gcSampleKey);
    EXPECT_EQ(lResponse.mLists[0].getInitiatorNames()->mNodeName.toText(), "20:00:00:00:c9:00:00:01");
    EXPECT_EQ(lResponse.mLists[0].getInitiatorNames()->mPortName.toText(), "10:00:00:00:c9:00:00:01");
    EXPECT_EQ(lResponse.mLists[1].mInitiatorKey, "");
    EXPECT_FALSE(lResponse.mLists[1].getInitiatorNames());
    EXPECT_TRUE(lResponse.mLists[1].mRecords.empty());

    ASSERT_EQ(lResponse.mLists[0].mRecords.size(), 2U);
    const ZTSReceivedRecord& lrFirst = lResponse.mLists[0].mRecords[0];
    EXPECT_EQ(lrFirst.mOccurrences, 7U);
    EXPECT_EQ(lrFirst.mCategory, 4);
    EXPECT_EQ(lrFirst.mSubcategory, 1);
    EXPECT_FALSE(lrFirst.mNames);
    EXPECT_EQ(lrFirst.mEventData, bytesOf("0102"));
    const ZTSReceivedTime lTime{2026, 3, 4, 5, 6, 7, '.', 89, 12, 1772600767};
    EXPECT_EQ(lrFirst.mBegin, lTime);
    EXPECT_EQ(lrFirst.mEnd, lTime);
    EXPECT_EQ(lTime.toText(), "2026-03-04 05:06:07.089012");

    const ZTSReceivedRecord& lrSecond = lResponse.mLists[0].mRecords[1];
    EXPECT_EQ(lrSecond.mOccurrences, 0xFFFFFFFFU);
    EXPECT_EQ(lrSecond.mNames->mPortName.toText(), gcSamplePortText);
    EXPECT_EQ(lrSecond.mNames->mNodeName.toText(), gcSampleNodeText);
    EXPECT_TRUE(lrSecond.mEventData.empty());

    EXPECT_EQ(lResponse.countRecords(), 2U);
    EXPECT_EQ(lResponse.countOccurrences(), 0x100000006U);
}

TEST(ResponseDecoder, NoBoardsAreNoLists) {
    const ZTSResponse lResponse = decodeResponse(bytesOf("02 00000000"));
    EXPECT_EQ(lResponse.mAnnouncedLists, 0U);
    EXPECT_TRUE(lResponse.mLists.empty());
}

TEST(ResponseDecoder, TakesMoreAnnouncedListsThanFollow) {
    const ZTCBytes lList = makeSampleList(gcSampleKey, {makeSampleRecord(1, 1, {})});
    const ZTSResponse lResponse = decodeResponse(makeSampleResponse(3, {lList}));
    EXPECT_EQ(lResponse.mAnnouncedLists, 3U);
    EXPECT_EQ(lResponse.mLists.size(), 1U);
    EXPECT_TRUE(decodeResponse(makeSampleResponse(0xFFFFFFFF, {})).mLists.empty());
}

TEST(ResponseDecoder, CountsTheBytesBehindTheLastField) {
    EXPECT_EQ(decodeResponse(bytesOf("01 0006 aabb")).mUnreadBytes, 2U);
    EXPECT_EQ(decodeResponse(bytesOf("02 00000000 00")).mUnreadBytes, 1U);
}

TEST(ResponseDecoder, NamesTheOffsetAndWhatWasWanted) {
    EXPECT_THAT(sProblemOf({}), AllOf(HasSubstr("the outcome"), HasSubstr("offset 0"), HasSubstr("found 0 bytes")));
    EXPECT_THAT(sProblemOf(bytesOf("03")), AllOf(HasSubstr("outcome 3"), HasSubstr("offset 0")));
    EXPECT_THAT(sProblemOf(bytesOf("01 00")), AllOf(HasSubstr("status (2 bytes)"), HasSubstr("offset 1")));
    EXPECT_THAT(sProblemOf(bytesOf("02 00000001 00000009 616263")),
                AllOf(HasSubstr("initiator key (9 bytes)"), HasSubstr("offset 9"), HasSubstr("found 3 bytes")));
    try {
        decodeResponse(bytesOf("02 0000"));
        FAIL() << "a list count of two bytes was taken";
    } catch (const ZTCDecodeEx& lrEx) {
        EXPECT_EQ(lrEx.getOffset(), 1U);
    }
}

TEST(ResponseDecoder, RefusesANamesFlagAbove1) {
    ZTCBytes lRecord = makeSampleRecord(1, 1, {});
    lRecord[46] = 2;
    EXPECT_THAT(sProblemOf(makeSampleResponse(1, {makeSampleList("k", {lRecord})})),
                AllOf(HasSubstr("names flag 2"), HasSubstr("offset " + std::to_string(5 + 4 + 1 + 4 + 46))));
}

TEST(ResponseDecoder, HandsOutWhatStandsInFrontOfAProblem) {
    ZTCBytes lBody =
        makeSampleResponse(1, {makeSampleList("k", {makeSampleRecord(1, 1, {}), makeSampleRecord(1, 2, {})})});
    lBody.pop_back();
    const ZTSDecodeResult lResult = decodeAsFarAsPossible(lBody);
    ASSERT_TRUE(lResult.mProblem);
    ASSERT_EQ(lResult.mResponse.mLists.size(), 1U);
    ASSERT_EQ(lResult.mResponse.mLists[0].mRecords.size(), 1U);
    EXPECT_EQ(lResult.mResponse.mLists[0].mRecords[0].mSubcategory, 1);
}

TEST(ResponseDecoder, CountsAndLengthsThatNothingFollowsAreProblemsNotAllocations) {
    for (const char* lpBody :
         {"02 00000001 ffffffff", "02 00000001 00000000 ffffffff", "02 ffffffff 00000000 00000000 00000000 ffffffff"}) {
        EXPECT_NE(sProblemOf(bytesOf(lpBody)), "") << lpBody;
    }
    ZTCBytes lRecord = makeSampleRecord(1, 1, {});
    std::fill(lRecord.end() - 4, lRecord.end(), static_cast<unsigned char>(0xFF));
    EXPECT_THAT(sProblemOf(makeSampleResponse(1, {makeSampleList("k", {lRecord})})),
                HasSubstr("event data (4294967295 bytes)"));
}

TEST(ResponseDecoder, AResponseCutAnywhereIsAProblemUnlessAListBeginsThere) {
    const ZTCBytes lWhole = makeFullSampleResponse();
    const ZTSResponse lExpected = decodeResponse(lWhole);
    const std::size_t lSecondList = lWhole.size() - makeSampleList("other.key", {}).size();
    std::size_t lLastRecords = 0;
    for (std::size_t lSize = 0; lSize < lWhole.size(); ++lSize) {
        SCOPED_TRACE(lSize);
        const ZTSDecodeResult lResult = decodeAsFarAsPossible({lWhole.data(), lSize});
        const bool lIsBoundary = lSize == 5 || lSize == lSecondList;
        ASSERT_EQ(lResult.mProblem.has_value(), !lIsBoundary);
        if (lResult.mProblem) {
            ASSERT_LE(lResult.mProblem->getOffset(), lSize);
        }
        const std::size_t lRecords = lResult.mResponse.countRecords();
        ASSERT_TRUE(lRecords == lLastRecords || lRecords == lLastRecords + 1);
        lLastRecords = lRecords;
        for (std::size_t i = 0; i < lRecords; ++i) {
            ASSERT_EQ(lResult.mResponse.mLists[0].mRecords[i], lExpected.mLists[0].mRecords[i]);
        }
    }
    EXPECT_EQ(lLastRecords, 20U);
}

/// The bytes of the dump in the protocol's page, whose offsets must follow each other.
static ZTCBytes sReadDocumentedFrame() {
    std::istringstream lPage(readFile(TAVIK_PROTOCOL_PAGE));
    std::string lLine;
    while (std::getline(lPage, lLine) && lLine != "```hexdump") {
    }
    ZTCBytes lFrame;
    while (std::getline(lPage, lLine) && lLine != "```") {
        EXPECT_EQ(std::stoul(lLine.substr(0, 4), nullptr, 16), lFrame.size()) << lLine;
        const ZTCBytes lBytes = bytesOf(lLine.substr(6, 47));
        lFrame.insert(lFrame.end(), lBytes.begin(), lBytes.end());
    }
    return lFrame;
}

TEST(ResponseDecoder, DecodesTheExampleOfTheProtocolsPage) {
    const ZTCBytes lFrame = sReadDocumentedFrame();
    ASSERT_EQ(lFrame.size(), 218U);
    ASSERT_EQ(hexOf({lFrame.begin(), lFrame.begin() + 4}), "000000d6");
    const ZTSResponse lResponse = decodeResponse({lFrame.data() + 4, lFrame.size() - 4});
    ASSERT_EQ(lResponse.mUnreadBytes, 0U);
    ASSERT_EQ(lResponse.countRecords(), 2U);
    const ZTSReceivedRecord& lrReject = lResponse.mLists[0].mRecords[0];
    EXPECT_EQ(lrReject.mBegin.toText(), "2026-03-04 05:06:07.089012");
    EXPECT_EQ(lrReject.mEnd.toText(), "2026-03-04 05:06:09.001500");
    EXPECT_EQ(formatRemotePort(lrReject), gcSamplePortText);
    EXPECT_EQ(formatDetails(lrReject),
              "originalCommand=0x03(PLOGI) rejections=[0x09(unable to perform)/0x2a 0x05(logical busy)/0x00]");
    const ZTSReceivedRecord& lrLink = lResponse.mLists[0].mRecords[1];
    EXPECT_EQ(formatKind(lrLink), "link");
    EXPECT_EQ(lrLink.mBegin, lrLink.mEnd);
    EXPECT_EQ(formatDetails(lrLink), "-");
}

/// Decodes, prints and checks what must hold for any bytes.
static void sFeed(const ZTCBytes& acrBody) {
    const ZTSDecodeResult lResult = decodeAsFarAsPossible(acrBody);
    if (lResult.mProblem) {
        ASSERT_LE(lResult.mProblem->getOffset(), acrBody.size());
        ASSERT_NE(std::string(lResult.mProblem->what()).find("offset"), std::string::npos);
    }
    ASSERT_LE(lResult.mResponse.countRecords() * 51, acrBody.size());
    ASSERT_LE(lResult.mResponse.mLists.size() * 8, acrBody.size());
    ASSERT_FALSE(dumpJson(toJson(lResult.mResponse), -1).empty());
    ASSERT_FALSE(formatTable(lResult.mResponse).empty());
}

TEST(ResponseDecoder, RandomBytesNeverCrashIt) {
    ZTCTestSeed lSeed;
    std::mt19937& lRandom = lSeed.engine();
    for (int i = 0; i < 5000; ++i) {
        ZTCBytes lBody(lRandom() % 300);
        for (unsigned char& lrByte : lBody) {
            lrByte = static_cast<unsigned char>(lRandom() % 8 == 0 ? lRandom() : lRandom() % 3);
        }
        if (!lBody.empty() && lRandom() % 2 == 0) {
            lBody[0] = 2;
        }
        ASSERT_NO_FATAL_FAILURE(sFeed(lBody)) << hexOf(lBody);
    }
}

TEST(ResponseDecoder, DamagedResponsesNeverCrashIt) {
    ZTCTestSeed lSeed;
    std::mt19937& lRandom = lSeed.engine();
    const ZTCBytes lWhole = makeFullSampleResponse();
    for (int i = 0; i < 1000; ++i) {
        ZTCBytes lBody = lWhole;
        for (int lDamages = 0; lDamages <= i % 4; ++lDamages) {
            lBody[lRandom() % lBody.size()] = static_cast<unsigned char>(lRandom());
        }
        if (i % 5 == 0) {
            lBody.resize(lRandom() % lBody.size());
        }
        ASSERT_NO_FATAL_FAILURE(sFeed(lBody)) << hexOf(lBody);
    }
}
